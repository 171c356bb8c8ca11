#include "com/ClassFactory.h"

#include <new>

ClassFactory* ClassFactory::CreateCached(CreateInstanceFn create) {
    return new (std::nothrow) ClassFactory(create);
}

STDMETHODIMP ClassFactory::QueryInterface(REFIID riid, void** ppv) {
    if (!ppv) return E_POINTER;
    *ppv = nullptr;
    if (!IsEqualIID(riid, IID_IUnknown) && !IsEqualIID(riid, IID_IClassFactory)) return E_NOINTERFACE;
    *ppv = static_cast<IClassFactory*>(this);
    AddRef();
    return S_OK;
}

STDMETHODIMP_(ULONG) ClassFactory::AddRef() {
    ULONG count = InterlockedIncrement(&m_refCount);
    if (count == 2) ModuleLock::Add();  // the first reference beyond the table's
    return count;
}

STDMETHODIMP_(ULONG) ClassFactory::Release() {
    ULONG count = InterlockedDecrement(&m_refCount);
    if (count == 1) ModuleLock::Release();
    if (count == 0) delete this;
    return count;
}

STDMETHODIMP ClassFactory::CreateInstance(IUnknown* outer, REFIID riid, void** ppv) {
    if (!ppv) return E_POINTER;
    *ppv = nullptr;
    return m_create(outer, riid, ppv);
}

STDMETHODIMP ClassFactory::LockServer(BOOL lock) {
    if (lock)
        ModuleLock::Add();
    else
        ModuleLock::Release();
    return S_OK;
}
