#pragma once
// The server's class object for DeviceMgr. It lives as long as the server and holds no lock
// of its own, so that the server can tell when no client needs it any more; every device
// manager it makes serves the tree that the settings name at that moment.
#include <windows.h>
#include <unknwn.h>

#include <functional>
#include <string>

#include "com/UncountedObject.h"

class SimClassFactory final : public Uncounted<SimClassFactory, IClassFactory> {
public:
    explicit SimClassFactory(std::function<std::wstring()> root) : m_root(std::move(root)) {}

    BEGIN_INTERFACE_TABLE(SimClassFactory)
        INTERFACE_ENTRY(IClassFactory)
    END_INTERFACE_TABLE()

    STDMETHODIMP CreateInstance(IUnknown* outer, REFIID riid, void** ppv) override;
    STDMETHODIMP LockServer(BOOL lock) override;

private:
    std::function<std::wstring()> m_root;
};
