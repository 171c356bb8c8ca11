#pragma once
// One receiver as the device manager hands it out (IReceiver).
#include <memory>

#include "CalvexDeviceMgrLib.h"
#include "SimDispatch.h"
#include "SimModel.h"
#include "com/ComObject.h"

class SimReceiver : public ComObjectRoot, public SimDispatch<IReceiver, &IID_IReceiver> {
public:
    SimReceiver(std::shared_ptr<SimModel> model, std::shared_ptr<SimReceiverRecord> record);
    static HRESULT Create(const std::shared_ptr<SimModel>& model, const std::shared_ptr<SimReceiverRecord>& record,
                          IDispatch** out);

    using Primary = IReceiver;  // the interface by which it is handed out

    BEGIN_INTERFACE_TABLE(SimReceiver)
        INTERFACE_ENTRY(IReceiver)
        INTERFACE_ENTRY_IID(IID_IDispatch, IReceiver)
    END_INTERFACE_TABLE()

    // IReceiver
    STDMETHODIMP get_Files(IDispatch** files) override;
    STDMETHODIMP get_Connected(VARIANT_BOOL* connected) override;
    STDMETHODIMP get_FirmwareVersion(BSTR* version) override;
    STDMETHODIMP get_PortName(BSTR* portName) override;
    STDMETHODIMP get_PortType(LONG* portType) override;
    STDMETHODIMP get_SerialNumber(BSTR* serialNumber) override;
    STDMETHODIMP get_Model(BSTR* model) override;
    STDMETHODIMP get_Brand(LONG* brand) override;
    STDMETHODIMP get_BatteryLevel(LONG* percent) override;
    STDMETHODIMP get_FreeMemory(LONG* bytes) override;
    STDMETHODIMP get_Label(BSTR* label) override;

private:
    HRESULT Fault(const wchar_t* call) const { return m_model->CallFault(call, m_record.get()); }
    const ReceiverDescription& Description() const { return m_record->description; }

    std::shared_ptr<SimModel> m_model;
    std::shared_ptr<SimReceiverRecord> m_record;
    ComPtr<IDispatch> m_files;  // one files collection per receiver object
};
