#include "view/CCalvexReceiversQueryInfo.h"

#include <cstring>

#include "module/ClassCreators.h"
#include "trace/TraceLog.h"

CCalvexReceiversQueryInfo::CCalvexReceiversQueryInfo(IMalloc* malloc) : m_pidlMgr(malloc) {
    if (m_pidlMgr.IsValid()) m_malloc = ComPtr<IMalloc>(m_pidlMgr.Malloc());
}

HRESULT CCalvexReceiversQueryInfo::SetItem(LPCITEMIDLIST pidl) {
    TraceA("CCalvexReceiversQueryInfo::SetItem\r\n");
    m_item = UniquePidl(m_pidlMgr, m_pidlMgr.Copy(pidl));
    return pidl && !m_item ? E_OUTOFMEMORY : S_OK;
}

// IQueryInfo

STDMETHODIMP CCalvexReceiversQueryInfo::GetInfoTip(DWORD dwFlags, PWSTR* ppwszTip) {
    TraceA("CCalvexReceiversQueryInfo::GetInfoTip\r\n");
    if (!ppwszTip) return E_POINTER;
    *ppwszTip = nullptr;
    // Keep-keys: the item's stored name as it is, a receiver's "!" and "#" included.
    wchar_t text[MAX_PATH] = L"";
    m_pidlMgr.GetPath(m_item.Get(), text, MAX_PATH, true);
    const size_t bytes = (wcslen(text) + 1) * sizeof(wchar_t);
    auto* tip = static_cast<PWSTR>(m_malloc->Alloc(bytes));
    if (!tip) return E_OUTOFMEMORY;
    memcpy(tip, text, bytes);
    *ppwszTip = tip;
    return S_OK;
}

STDMETHODIMP CCalvexReceiversQueryInfo::GetInfoFlags(DWORD* pdwFlags) {
    TraceA("CCalvexReceiversQueryInfo::GetInfoFlags\r\n");
    if (pdwFlags) *pdwFlags = 0;
    return E_NOTIMPL;
}

HRESULT CreateCalvexReceiversQueryInfo(IUnknown* outer, REFIID riid, void** ppv) {
    return CreateComInstance<CCalvexReceiversQueryInfo>(outer, riid, ppv);
}
