#include "SimReceiversColl.h"

#include <utility>

#include "SimCreate.h"
#include "SimReceiver.h"
#include "SimResults.h"
#include "SimVariantEnum.h"

namespace {

std::wstring Text(BSTR text) { return text ? std::wstring(text, SysStringLen(text)) : std::wstring(); }

}  // namespace

SimReceiversColl::SimReceiversColl(std::shared_ptr<SimModel> model)
    : SimEventSource(DIID__IReceiversCollEvents), m_model(std::move(model)) {
    m_model->AddListener(this);
}

SimReceiversColl::~SimReceiversColl() { m_model->RemoveListener(this); }

HRESULT SimReceiversColl::Create(const std::shared_ptr<SimModel>& model, IDispatch** out) {
    return CreateSimObject<SimReceiversColl>(out, model);
}

STDMETHODIMP SimReceiversColl::get__NewEnum(IUnknown** enumerator) {
    if (!enumerator) return E_POINTER;
    *enumerator = nullptr;
    HRESULT hr = m_model->CallFault(L"IReceiversColl.get__NewEnum", nullptr);
    if (FAILED(hr)) return hr;
    std::vector<ComPtr<IDispatch>> items;
    for (const auto& record : m_model->Receivers()) {
        ComPtr<IDispatch> item;
        if (SUCCEEDED(SimReceiver::Create(m_model, record, &item))) items.push_back(item);
    }
    return SimVariantEnum::Create(std::move(items), enumerator);
}

STDMETHODIMP SimReceiversColl::get_Item(LONG index, IDispatch** receiver) {
    if (!receiver) return E_POINTER;
    *receiver = nullptr;
    const auto& receivers = m_model->Receivers();
    if (index < 0 || static_cast<size_t>(index) >= receivers.size()) return E_INVALIDARG;
    const auto record = receivers[static_cast<size_t>(index)];
    HRESULT hr = m_model->CallFault(L"IReceiversColl.get_Item", record.get());
    if (FAILED(hr)) return hr;
    HRESULT created = SimReceiver::Create(m_model, record, receiver);
    return FAILED(created) ? created : hr;
}

STDMETHODIMP SimReceiversColl::get_Count(LONG* count) {
    return SimHandOut<LONG>(m_model->CallFault(L"IReceiversColl.get_Count", nullptr),
                            static_cast<LONG>(m_model->Receivers().size()), count);
}

STDMETHODIMP SimReceiversColl::get_ItemBySerialNumber(BSTR serialNumber, IDispatch** receiver) {
    const std::wstring wanted = Text(serialNumber);
    return FindReceiver(L"IReceiversColl.get_ItemBySerialNumber",
                        [&](const SimReceiverRecord& r) { return r.description.serialNumber == wanted; }, receiver);
}

STDMETHODIMP SimReceiversColl::get_ItemByKey(BSTR key, IDispatch** receiver) {
    const std::wstring wanted = Text(key);
    return FindReceiver(L"IReceiversColl.get_ItemByKey",
                        [&](const SimReceiverRecord& r) { return r.LookupKey() == wanted; }, receiver);
}

HRESULT SimReceiversColl::FindReceiver(const wchar_t* call, const Match& match, IDispatch** receiver) {
    if (!receiver) return E_POINTER;
    *receiver = nullptr;
    for (const auto& record : m_model->Receivers()) {
        if (!match(*record)) continue;
        HRESULT hr = m_model->CallFault(call, record.get());
        if (FAILED(hr) || record->description.report.foundAsNothing) return hr;
        HRESULT created = SimReceiver::Create(m_model, record, receiver);
        return FAILED(created) ? created : hr;
    }
    HRESULT hr = m_model->CallFault(call, nullptr);
    return FAILED(hr) ? hr : E_INVALIDARG;
}

void SimReceiversColl::OnTreeEvent(const SimTreeEvent& event) {
    DISPID id = event.kind == SimTreeEvent::ReceiverOnline ? 1 : event.kind == SimTreeEvent::ReceiverOffline ? 2 : 0;
    if (id == 0) return;
    ComPtr<IDispatch> receiver;
    if (SUCCEEDED(SimReceiver::Create(m_model, event.receiver, &receiver))) m_point.Fire(id, receiver.Get());
}
