#include "items/CCalvexReceiversExtractIcon.h"

#include <commctrl.h>

#include "module/ClassCreators.h"
#include "module/ModuleState.h"
#include "trace/TraceLog.h"

HRESULT CCalvexReceiversExtractIcon::SetItem(LPCITEMIDLIST pidl) {
    TraceA("CCalvexReceiversExtractIcon::SetItem\r\n");
    m_item = UniquePidl(m_pidlMgr, m_pidlMgr.Copy(pidl));
    return pidl && !m_item ? E_OUTOFMEMORY : S_OK;
}

// IExtractIconW

STDMETHODIMP CCalvexReceiversExtractIcon::GetIconLocation(UINT uFlags, PWSTR pszIconFile, UINT cchMax,
                                                          int* piIndex, UINT* pwFlags) {
    TraceA("CCalvexReceiversExtractIcon::GetIconLocation\r\n");
    // The location stays untouched: with GIL_NOTFILENAME the shell comes back to Extract
    // with this index, and its icon cache keys on that pair.
    if (piIndex) *piIndex = static_cast<int>(m_pidlMgr.GetLastItemType(m_item.Get())) - 1;
    if (pwFlags) *pwFlags = GIL_NOTFILENAME;
    return S_OK;
}

STDMETHODIMP CCalvexReceiversExtractIcon::Extract(PCWSTR pszFile, UINT nIconIndex, HICON* phiconLarge,
                                                  HICON* phiconSmall, UINT nIconSize) {
    TraceA("CCalvexReceiversExtractIcon::Extract\r\n");
    // No check of the index: one outside the lists gives null icons, and still S_OK.
    const int index = static_cast<int>(nIconIndex);
    if (phiconLarge) *phiconLarge = ImageList_GetIcon(LargeImageList(), index, ILD_TRANSPARENT);
    if (phiconSmall) *phiconSmall = ImageList_GetIcon(SmallImageList(), index, ILD_TRANSPARENT);
    return S_OK;
}

HRESULT CreateCalvexReceiversExtractIcon(IUnknown* outer, REFIID riid, void** ppv) {
    return CreateComInstance<CCalvexReceiversExtractIcon>(outer, riid, ppv);
}
