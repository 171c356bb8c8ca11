#pragma once
// The server's class object for DeviceMgr. It lives as long as the server and holds no lock
// of its own, so that the server can tell when no client needs it any more; every device
// manager it makes serves the tree that the settings name at that moment.
#include <windows.h>
#include <unknwn.h>

#include <functional>
#include <string>

class SimClassFactory final : public IClassFactory {
public:
    explicit SimClassFactory(std::function<std::wstring()> root) : m_root(std::move(root)) {}

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override;
    STDMETHODIMP_(ULONG) AddRef() override { return 2; }
    STDMETHODIMP_(ULONG) Release() override { return 1; }
    STDMETHODIMP CreateInstance(IUnknown* outer, REFIID riid, void** ppv) override;
    STDMETHODIMP LockServer(BOOL lock) override;

private:
    std::function<std::wstring()> m_root;
};
