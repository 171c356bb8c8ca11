#pragma once
// One file in a receiver's memory (IReceiverFile), source of _IReceiverFileEvents; it runs
// its own download on the model's timer.
#include <memory>

#include "CalvexDeviceMgrLib.h"
#include "SimDispatch.h"
#include "SimDownload.h"
#include "SimEventSource.h"
#include "SimModel.h"
#include "com/ComObject.h"

class SimReceiverFile : public ComObjectRoot,
                        public SimDispatch<IReceiverFile, &IID_IReceiverFile>,
                        public SimEventSource,
                        public SimDownloadTicker {
public:
    SimReceiverFile(std::shared_ptr<SimModel> model, std::shared_ptr<SimReceiverRecord> receiver,
                    std::shared_ptr<SimFileRecord> file);
    static HRESULT Create(const std::shared_ptr<SimModel>& model, const std::shared_ptr<SimReceiverRecord>& receiver,
                          const std::shared_ptr<SimFileRecord>& file, IDispatch** out);

    using Primary = IReceiverFile;  // the interface by which it is handed out

    BEGIN_INTERFACE_TABLE(SimReceiverFile)
        INTERFACE_ENTRY(IReceiverFile)
        INTERFACE_ENTRY_IID(IID_IDispatch, IReceiverFile)
        INTERFACE_ENTRY(IConnectionPointContainer)
    END_INTERFACE_TABLE()

    // IReceiverFile
    STDMETHODIMP get_Name(BSTR* name) override;
    STDMETHODIMP get_Receiver(IDispatch** receiver) override;
    STDMETHODIMP get_Size(LONG* size) override;
    STDMETHODIMP get_Time(DATE* time) override;
    STDMETHODIMP Delete() override;
    STDMETHODIMP Download(VARIANT destination) override;
    STDMETHODIMP get_Downloading(VARIANT_BOOL* downloading) override;
    STDMETHODIMP Cancel() override;

    bool Tick() override;

private:
    HRESULT Fault(const wchar_t* call) const { return m_model->CallFault(call, m_receiver.get(), m_file->name); }
    HRESULT StartDownload(const VARIANT& destination);
    void FireStep(const SimDownload::Event& event);
    void ChangeTreeFile(bool grow);

    std::shared_ptr<SimModel> m_model;
    std::shared_ptr<SimReceiverRecord> m_receiver;
    std::shared_ptr<SimFileRecord> m_file;
    std::unique_ptr<SimDownload> m_download;
};
