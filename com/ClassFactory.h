#pragma once
#include <windows.h>
#include "com/ComObject.h"

using CreateInstanceFn = HRESULT (*)(IUnknown* outer, REFIID riid, void** ppv);

// The one class factory kind of the module: it creates whatever its creator makes.
// The class table keeps one reference to each factory it made; that reference alone does
// not hold the module lock, or the module could never unload once a class was asked for.
// Every further reference does.
class ClassFactory final : public IClassFactory {
public:
    // A new factory holding the table's reference.
    static ClassFactory* CreateCached(CreateInstanceFn create);

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override;
    STDMETHODIMP_(ULONG) AddRef() override;
    STDMETHODIMP_(ULONG) Release() override;
    STDMETHODIMP CreateInstance(IUnknown* outer, REFIID riid, void** ppv) override;
    STDMETHODIMP LockServer(BOOL lock) override;

private:
    explicit ClassFactory(CreateInstanceFn create) : m_create(create) {}

    volatile LONG m_refCount = 1;
    CreateInstanceFn m_create;
};
