#pragma once
// The info tip of one item: its stored text, raw (a receiver shows its whole key).
#include <windows.h>
#include <shlobj.h>

#include "com/ComObject.h"
#include "com/ComPtr.h"
#include "items/CReceiversPidlMgr.h"

class CCalvexReceiversQueryInfo : public ComObjectRoot, public IQueryInfo {
public:
    BEGIN_INTERFACE_TABLE(CCalvexReceiversQueryInfo)
        INTERFACE_ENTRY(IQueryInfo)
    END_INTERFACE_TABLE()

    // The tip text and the item copy come from the shell's task allocator unless a test
    // gives another.
    explicit CCalvexReceiversQueryInfo(IMalloc* malloc = nullptr);
    HRESULT FinalConstruct() { return m_malloc && m_pidlMgr.IsValid() ? S_OK : E_OUTOFMEMORY; }

    // Keeps a copy of the item; the folder calls it right after making the object.
    HRESULT SetItem(LPCITEMIDLIST pidl);

    // IQueryInfo
    STDMETHODIMP GetInfoTip(DWORD dwFlags, PWSTR* ppwszTip) override;
    STDMETHODIMP GetInfoFlags(DWORD* pdwFlags) override;

private:
    CReceiversPidlMgr m_pidlMgr;
    ComPtr<IMalloc> m_malloc;
    UniquePidl m_item;
};
