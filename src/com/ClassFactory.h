#pragma once
#include <windows.h>
#include "com/ComObject.h"

using CreateInstanceFn = HRESULT (*)(IUnknown* outer, REFIID riid, void** ppv);

// The one class factory kind of the module: it creates whatever its creator makes.
class ClassFactory : public ComObjectRoot, public IClassFactory {
public:
    explicit ClassFactory(CreateInstanceFn create) : m_create(create) {}

    BEGIN_INTERFACE_TABLE(ClassFactory)
        INTERFACE_ENTRY(IClassFactory)
    END_INTERFACE_TABLE()

    STDMETHODIMP CreateInstance(IUnknown* outer, REFIID riid, void** ppv) override;
    STDMETHODIMP LockServer(BOOL lock) override;

private:
    CreateInstanceFn m_create;
};
