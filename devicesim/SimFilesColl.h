#pragma once
// The files in one receiver's memory (IFilesColl), source of _IFilesCollEvents.
#include <memory>

#include "CalvexDeviceMgrLib.h"
#include "SimDispatch.h"
#include "SimEventSource.h"
#include "SimModel.h"
#include "com/ComObject.h"

class SimFilesColl : public ComObjectRoot,
                     public SimDispatch<IFilesColl, &IID_IFilesColl>,
                     public SimEventSource,
                     public SimTreeListener {
public:
    SimFilesColl(std::shared_ptr<SimModel> model, std::shared_ptr<SimReceiverRecord> record);
    ~SimFilesColl() override;
    static HRESULT Create(const std::shared_ptr<SimModel>& model, const std::shared_ptr<SimReceiverRecord>& record,
                          IDispatch** out);

    using Primary = IFilesColl;  // the interface by which it is handed out

    BEGIN_INTERFACE_TABLE(SimFilesColl)
        INTERFACE_ENTRY(IFilesColl)
        INTERFACE_ENTRY_IID(IID_IDispatch, IFilesColl)
        INTERFACE_ENTRY(IConnectionPointContainer)
    END_INTERFACE_TABLE()

    // IFilesColl
    STDMETHODIMP get__NewEnum(IUnknown** enumerator) override;
    STDMETHODIMP get_Item(LONG index, IDispatch** file) override;
    STDMETHODIMP get_Count(LONG* count) override;
    STDMETHODIMP get_ItemByName(BSTR name, IDispatch** file) override;

    void OnTreeEvent(const SimTreeEvent& event) override;

private:
    std::shared_ptr<SimModel> m_model;
    std::shared_ptr<SimReceiverRecord> m_record;
};
