#include "SimDeviceManager.h"

#include <utility>

#include "SimReceiversColl.h"

HRESULT CreateSimDeviceManager(const wchar_t* rootFolder, REFIID riid, void** ppv) {
    if (!ppv) return E_POINTER;
    *ppv = nullptr;
    if (!rootFolder) return E_INVALIDARG;
    std::shared_ptr<SimModel> model = SimModel::Acquire(rootFolder);
    if (!model) return E_FAIL;
    ComObject<SimDeviceManager>* object = nullptr;
    HRESULT hr = CreateComObject<SimDeviceManager>(&object, model);
    if (FAILED(hr)) return hr;
    hr = object->QueryInterface(riid, ppv);
    object->Release();
    return hr;
}

SimDeviceManager::SimDeviceManager(std::shared_ptr<SimModel> model) : m_model(std::move(model)) {}

STDMETHODIMP SimDeviceManager::get_Receivers(IDispatch** receivers) {
    if (!receivers) return E_POINTER;
    *receivers = nullptr;
    HRESULT hr = m_model->CallFault(L"IDeviceMgr.get_Receivers", nullptr);
    if (FAILED(hr)) return hr;
    if (!m_receivers) {
        HRESULT created = SimReceiversColl::Create(m_model, m_receivers.ReleaseAndGetAddressOf());
        if (FAILED(created)) return created;
    }
    m_receivers.CopyTo(receivers);
    return hr;
}

STDMETHODIMP SimDeviceManager::Refresh() {
    HRESULT hr = m_model->CallFault(L"IDeviceMgr.Refresh", nullptr);
    if (hr != S_OK) return hr;
    m_model->ReloadSettings();
    m_model->Rescan();
    return S_OK;
}
