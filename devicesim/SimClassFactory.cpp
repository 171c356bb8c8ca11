#include "SimClassFactory.h"

#include "SimDeviceManager.h"
#include "SimLog.h"
#include "com/ModuleLock.h"

STDMETHODIMP SimClassFactory::CreateInstance(IUnknown* outer, REFIID riid, void** ppv) {
    if (!ppv) return E_POINTER;
    *ppv = nullptr;
    if (outer) return CLASS_E_NOAGGREGATION;
    const std::wstring root = m_root();
    HRESULT hr = CreateSimDeviceManager(root.c_str(), riid, ppv);
    if (FAILED(hr)) SimLog::Write(L"DeviceMgr for \"" + root + L"\" could not be made");
    return hr;
}

STDMETHODIMP SimClassFactory::LockServer(BOOL lock) {
    if (lock)
        ModuleLock::Add();
    else
        ModuleLock::Release();
    return S_OK;
}
