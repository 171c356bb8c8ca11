#pragma once
// The icon of one item for the shell: the image index follows from the item's kind alone,
// and the pictures come from the module's shared image lists.
#include <windows.h>
#include <shlobj.h>

#include "com/ComObject.h"
#include "items/CReceiversPidlMgr.h"

class CCalvexReceiversExtractIcon : public ComObjectRoot, public IExtractIconW {
public:
    BEGIN_INTERFACE_TABLE(CCalvexReceiversExtractIcon)
        INTERFACE_ENTRY(IExtractIconW)
    END_INTERFACE_TABLE()

    explicit CCalvexReceiversExtractIcon(IMalloc* malloc = nullptr) : m_pidlMgr(malloc) {}
    HRESULT FinalConstruct() { return m_pidlMgr.IsValid() ? S_OK : E_OUTOFMEMORY; }

    // Keeps a copy of the item list; the folder calls it right after making the object.
    HRESULT SetItem(LPCITEMIDLIST pidl);

    // IExtractIconW
    STDMETHODIMP GetIconLocation(UINT uFlags, PWSTR pszIconFile, UINT cchMax, int* piIndex,
                                 UINT* pwFlags) override;
    STDMETHODIMP Extract(PCWSTR pszFile, UINT nIconIndex, HICON* phiconLarge, HICON* phiconSmall,
                         UINT nIconSize) override;

private:
    CReceiversPidlMgr m_pidlMgr;
    UniquePidl m_item;
};
