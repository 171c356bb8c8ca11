// Stand-in bodies so the view links until the data object's own implementation is merged.
#include "transfer/CCalvexReceiversDataObject.h"

CCalvexReceiversDataObject::CCalvexReceiversDataObject() = default;
CCalvexReceiversDataObject::~CCalvexReceiversDataObject() {
    if (m_dragImage) ImageList_Destroy(m_dragImage);
}

HRESULT CCalvexReceiversDataObject::AddPidl(LPCITEMIDLIST pidl, IUnknown* device) {
    Entry entry{UniquePidl(m_pidlMgr, m_pidlMgr.Copy(pidl)), ComPtr<IUnknown>(device)};
    m_items.push_back(std::move(entry));
    return S_OK;
}
void CCalvexReceiversDataObject::SetDragImage(HIMAGELIST image, HWND window, POINT offset) {
    if (m_dragImage) ImageList_Destroy(m_dragImage);
    m_dragImage = image;
    m_dragWindow = window;
    m_dragOffset = offset;
}
STDMETHODIMP CCalvexReceiversDataObject::GetData(FORMATETC*, STGMEDIUM*) { return E_NOTIMPL; }
STDMETHODIMP CCalvexReceiversDataObject::GetDataHere(FORMATETC*, STGMEDIUM*) { return E_NOTIMPL; }
STDMETHODIMP CCalvexReceiversDataObject::QueryGetData(FORMATETC*) { return E_NOTIMPL; }
STDMETHODIMP CCalvexReceiversDataObject::GetCanonicalFormatEtc(FORMATETC*, FORMATETC*) { return E_NOTIMPL; }
STDMETHODIMP CCalvexReceiversDataObject::SetData(FORMATETC*, STGMEDIUM*, BOOL) { return E_NOTIMPL; }
STDMETHODIMP CCalvexReceiversDataObject::EnumFormatEtc(DWORD, IEnumFORMATETC**) { return E_NOTIMPL; }
STDMETHODIMP CCalvexReceiversDataObject::DAdvise(FORMATETC*, DWORD, IAdviseSink*, DWORD*) { return E_NOTIMPL; }
STDMETHODIMP CCalvexReceiversDataObject::DUnadvise(DWORD) { return E_NOTIMPL; }
STDMETHODIMP CCalvexReceiversDataObject::EnumDAdvise(IEnumSTATDATA**) { return E_NOTIMPL; }
STDMETHODIMP CCalvexReceiversDataObject::QueryContinueDrag(BOOL escape, DWORD keys) {
    if (escape) return DRAGDROP_S_CANCEL;
    return (keys & (MK_LBUTTON | MK_RBUTTON)) ? S_OK : DRAGDROP_S_DROP;
}
STDMETHODIMP CCalvexReceiversDataObject::GiveFeedback(DWORD) { return DRAGDROP_S_USEDEFAULTCURSORS; }
