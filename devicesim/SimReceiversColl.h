#pragma once
// The receivers the device manager sees now (IReceiversColl), source of _IReceiversCollEvents.
#include <functional>
#include <memory>

#include "CalvexDeviceMgrLib.h"
#include "SimDispatch.h"
#include "SimEventSource.h"
#include "SimModel.h"
#include "com/ComObject.h"

class SimReceiversColl : public ComObjectRoot,
                         public SimDispatch<IReceiversColl, &IID_IReceiversColl>,
                         public SimEventSource,
                         public SimTreeListener {
public:
    explicit SimReceiversColl(std::shared_ptr<SimModel> model);
    ~SimReceiversColl() override;
    static HRESULT Create(const std::shared_ptr<SimModel>& model, IDispatch** out);

    using Primary = IReceiversColl;  // the interface by which it is handed out

    BEGIN_INTERFACE_TABLE(SimReceiversColl)
        INTERFACE_ENTRY(IReceiversColl)
        INTERFACE_ENTRY_IID(IID_IDispatch, IReceiversColl)
        INTERFACE_ENTRY(IConnectionPointContainer)
    END_INTERFACE_TABLE()

    // IReceiversColl
    STDMETHODIMP get__NewEnum(IUnknown** enumerator) override;
    STDMETHODIMP get_Item(LONG index, IDispatch** receiver) override;
    STDMETHODIMP get_Count(LONG* count) override;
    STDMETHODIMP get_ItemBySerialNumber(BSTR serialNumber, IDispatch** receiver) override;
    STDMETHODIMP get_ItemByKey(BSTR key, IDispatch** receiver) override;

    void OnTreeEvent(const SimTreeEvent& event) override;

private:
    using Match = std::function<bool(const SimReceiverRecord&)>;
    HRESULT FindReceiver(const wchar_t* call, const Match& match, IDispatch** receiver);

    std::shared_ptr<SimModel> m_model;
};
