#include "transfer/CCalvexReceiversDataObject.h"

#include <cstring>
#include <memory>
#include <new>

#include "com/Handles.h"
#include "module/ClassCreators.h"
#include "trace/TraceLog.h"
#include "transfer/CEnumFormatEtc.h"
#include "transfer/CProgressDialogMFC.h"
#include "transfer/TransferNames.h"

HRESULT CreateCalvexReceiversDataObject(IUnknown* outer, REFIID riid, void** ppv) {
    return CreateComInstance<CCalvexReceiversDataObject>(outer, riid, ppv);
}

namespace {
constexpr UINT BlockFlags = 0x2042;  // GMEM_MOVEABLE | GMEM_ZEROINIT | GMEM_SHARE
constexpr UINT PathCapacity = 260;

// Registered anew on every use, never cached.
UINT Format(const wchar_t* name) { return RegisterClipboardFormatW(name); }

bool IsFormat(const FORMATETC* format, const wchar_t* name) { return format->cfFormat == Format(name); }

void TraceFormatName(const wchar_t* line, CLIPFORMAT format) {
    wchar_t name[PathCapacity];
    if (GetClipboardFormatNameW(format, name, PathCapacity) > 0) TraceW(line, name);
}

void SetGlobalMedium(STGMEDIUM* medium, HGLOBAL block) {
    medium->tymed = TYMED_HGLOBAL;
    medium->hGlobal = block;
    medium->pUnkForRelease = nullptr;
}
}  // namespace

CCalvexReceiversDataObject::CCalvexReceiversDataObject() = default;

CCalvexReceiversDataObject::~CCalvexReceiversDataObject() {
    TraceA("CCalvexReceiversDataObject::~CCalvexReceiversDataObject()\n");
}

HRESULT CCalvexReceiversDataObject::AddPidl(LPCITEMIDLIST pidl, IUnknown* device) {
    TraceA("CCalvexReceiversDataObject::AddPidl\r\n");
    UniquePidl copy(m_pidlMgr, m_pidlMgr.Copy(pidl));
    if (!copy) return E_OUTOFMEMORY;
    m_items.push_back(Entry{std::move(copy), ComPtr<IUnknown>(device)});
    return S_OK;
}

void CCalvexReceiversDataObject::SetDragImage(HIMAGELIST image, HWND window, POINT offset) {
    m_dragImage = image;
    m_dragWindow = window;
    m_dragOffset = offset;
}

STDMETHODIMP CCalvexReceiversDataObject::GetData(FORMATETC* format, STGMEDIUM* medium) {
    if (!format || !medium) return E_INVALIDARG;
    TraceA("CCalvexReceiversDataObject::GetData, pformatetcIn->cfFormat=%d, pformatetcIn->tymed=%d\r\n",
           format->cfFormat, static_cast<int>(format->tymed));
    TraceFormatName(L"CCalvexReceiversDataObject::GetData, pformatetc->cfFormat=%s\r\n", format->cfFormat);
    if (IsFormat(format, CFSTR_PREFERREDDROPEFFECT) && format->tymed == TYMED_HGLOBAL) {
        TraceA("pformatetcIn->cfFormat == RegisterClipboardFormat(CFSTR_PREFERREDDROPEFFECT) && "
               "pformatetcIn->tymed == TYMED_HGLOBAL\r\n");
        return GetPreferredDropEffect(medium);
    }
    if (IsFormat(format, CFSTR_FILEDESCRIPTORW) && format->tymed == TYMED_HGLOBAL) {
        TraceA("pformatetcIn->cfFormat == RegisterClipboardFormat(CFSTR_FILEDESCRIPTORW) && "
               "pformatetcIn->tymed == TYMED_HGLOBAL\n");
        return GetFileDescriptors(medium);
    }
    if (IsFormat(format, CFSTR_FILECONTENTS) && (format->tymed & TYMED_ISTREAM)) {
        TraceA("pformatetcIn->cfFormat == RegisterClipboardFormat(CFSTR_FILECONTENTS) && "
               "(pformatetcIn->tymed&TYMED_ISTREAM)\n");
        return GetFileContents(format->lindex, medium);
    }
    if (IsFormat(format, CFSTR_SHELLIDLIST) && format->tymed == TYMED_HGLOBAL) return GetIdListArray(medium);
    return E_INVALIDARG;
}

HRESULT CCalvexReceiversDataObject::GetPreferredDropEffect(STGMEDIUM* medium) const {
    HGLOBAL block = GlobalAlloc(BlockFlags, sizeof(DWORD));
    if (GlobalLockGuard<DWORD> effect{block}) *effect.Get() = DROPEFFECT_COPY;
    SetGlobalMedium(medium, block);
    return S_OK;
}

HRESULT CCalvexReceiversDataObject::GetFileDescriptors(STGMEDIUM* medium) const {
    if (m_items.empty()) return S_FALSE;
    const size_t count = m_items.size();
    HGLOBAL block = GlobalAlloc(BlockFlags, sizeof(UINT) + sizeof(FILEDESCRIPTORW) * count);
    {
        GlobalLockGuard<FILEGROUPDESCRIPTORW> group(block);
        group.Get()->cItems = static_cast<UINT>(count);
        for (size_t i = 0; i < count; ++i) FillDescriptor(m_items[i].pidl.Get(), group.Get()->fgd[i]);
    }
    SetGlobalMedium(medium, block);
    return S_OK;
}

void CCalvexReceiversDataObject::FillDescriptor(LPCITEMIDLIST pidl, FILEDESCRIPTORW& descriptor) const {
    lstrcpynW(descriptor.cFileName, TransferFileName(RawPath(pidl)).c_str(), MAX_PATH);
    if (!IsFileType(m_pidlMgr.GetLastItemType(pidl))) return;
    const ReceiverItemData* data = m_pidlMgr.GetData(m_pidlMgr.GetLastItem(pidl));
    DWORD size = 0;
    DATE time = 0;
    memcpy(&size, &data->size, sizeof(size));  // the record is packed: read field by field
    memcpy(&time, &data->time, sizeof(time));
    descriptor.dwFlags = FD_WRITESTIME | FD_FILESIZE;
    descriptor.nFileSizeLow = size;
    // The device's local time goes out as it stands: no time zone shift.
    SYSTEMTIME systemTime;
    if (VariantTimeToSystemTime(time, &systemTime)) SystemTimeToFileTime(&systemTime, &descriptor.ftLastWriteTime);
}

HRESULT CCalvexReceiversDataObject::GetFileContents(LONG index, STGMEDIUM* medium) const {
    if (m_items.empty() || index < 0 || static_cast<size_t>(index) >= m_items.size()) return S_FALSE;
    const Entry& entry = m_items[static_cast<size_t>(index)];
    if (!IsFileType(m_pidlMgr.GetLastItemType(entry.pidl.Get()))) return S_FALSE;
    std::unique_ptr<CProgressDialogMFC> dialog(
        new (std::nothrow) CProgressDialogMFC(nullptr, entry.pidl.Get(), entry.device.Get()));
    if (!dialog) return E_OUTOFMEMORY;
    if (dialog->DoModal() == IDCANCEL) return S_FALSE;
    medium->tymed = TYMED_ISTREAM;
    medium->pUnkForRelease = nullptr;
    medium->pstm = dialog->DownloadStream();
    if (medium->pstm) medium->pstm->AddRef();  // handed over as the device left it
    return S_OK;
}

HRESULT CCalvexReceiversDataObject::GetIdListArray(STGMEDIUM* medium) const {
    if (m_items.empty()) return S_FALSE;
    UniquePidl parent(m_pidlMgr, m_pidlMgr.CopyParent(m_items.front().pidl.Get()));
    if (!parent) return S_FALSE;
    const UINT count = static_cast<UINT>(m_items.size());
    const UINT parentSize = m_pidlMgr.GetSize(parent.Get());
    UINT size = parentSize + sizeof(UINT) * (count + 2);
    for (const Entry& entry : m_items) size += LastItemSize(entry.pidl.Get());
    HGLOBAL block = GlobalAlloc(BlockFlags, size);
    {
        GlobalLockGuard<BYTE> bytes(block);
        auto* cida = reinterpret_cast<CIDA*>(bytes.Get());
        cida->cidl = count;
        UINT offset = sizeof(UINT) * count + 8;
        cida->aoffset[0] = offset;
        memcpy(bytes.Get() + offset, parent.Get(), parentSize);
        offset += parentSize;
        // Every child is taken to share the first item's parent.
        for (UINT i = 0; i < count; ++i) {
            const UINT itemSize = LastItemSize(m_items[i].pidl.Get());
            cida->aoffset[i + 1] = offset;
            UniquePidl last(m_pidlMgr, m_pidlMgr.CopyItem(m_pidlMgr.GetLastItem(m_items[i].pidl.Get())));
            if (last) memcpy(bytes.Get() + offset, last.Get(), itemSize);
            offset += itemSize;
        }
    }
    SetGlobalMedium(medium, block);
    return S_OK;
}

UINT CCalvexReceiversDataObject::LastItemSize(LPCITEMIDLIST pidl) const {
    LPCITEMIDLIST last = m_pidlMgr.GetLastItem(pidl);
    return last ? last->mkid.cb + 2u : 2u;
}

std::wstring CCalvexReceiversDataObject::RawPath(LPCITEMIDLIST pidl) const {
    wchar_t path[PathCapacity] = L"";
    m_pidlMgr.GetPath(pidl, path, PathCapacity, true);
    return path;
}

STDMETHODIMP CCalvexReceiversDataObject::GetDataHere(FORMATETC*, STGMEDIUM*) {
    TraceA("CCalvexReceiversDataObject::GetDataHere\n");
    return E_NOTIMPL;
}

STDMETHODIMP CCalvexReceiversDataObject::QueryGetData(FORMATETC* format) {
    if (!format) return E_INVALIDARG;
    TraceA("CCalvexReceiversDataObject::QueryGetData pformatetc->cfFormat = %d\r\n", format->cfFormat);
    if (IsFormat(format, CFSTR_FILECONTENTS) && (format->tymed & TYMED_ISTREAM)) return S_OK;
    const bool globalFormat = IsFormat(format, CFSTR_FILEDESCRIPTORW) || IsFormat(format, CFSTR_SHELLIDLIST) ||
                              IsFormat(format, CFSTR_PREFERREDDROPEFFECT);
    // S_FALSE rather than DV_E_FORMATETC for what is not offered.
    return globalFormat && format->tymed == TYMED_HGLOBAL ? S_OK : S_FALSE;
}

STDMETHODIMP CCalvexReceiversDataObject::GetCanonicalFormatEtc(FORMATETC*, FORMATETC*) {
    TraceA("CCalvexReceiversDataObject::GetCanonicalFormatEtc\r\n");
    return E_NOTIMPL;
}

// Drop targets report the performed effect and the like here: accepted and forgotten.
STDMETHODIMP CCalvexReceiversDataObject::SetData(FORMATETC* format, STGMEDIUM*, BOOL release) {
    if (!format) return S_OK;
    TraceA("CCalvexReceiversDataObject::SetData, pformatetc->cfFormat = %d, pformatetc->tymed = %d, fRelease=%d\r\n",
           format->cfFormat, static_cast<int>(format->tymed), release);
    TraceFormatName(L"CCalvexReceiversDataObject::SetData, pformatetc->cfFormat = %s\r\n", format->cfFormat);
    return S_OK;
}

// The same three formats for either direction; "Preferred DropEffect" is answered but not listed.
STDMETHODIMP CCalvexReceiversDataObject::EnumFormatEtc(DWORD, IEnumFORMATETC** enumerator) {
    FORMATETC formats[3] = {
        {static_cast<CLIPFORMAT>(Format(CFSTR_FILECONTENTS)), nullptr, DVASPECT_CONTENT, -1, TYMED_ISTREAM},
        {static_cast<CLIPFORMAT>(Format(CFSTR_FILEDESCRIPTORW)), nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL},
        {static_cast<CLIPFORMAT>(Format(CFSTR_SHELLIDLIST)), nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL},
    };
    TraceA("CCalvexReceiversDataObject::EnumFormatEtc, fmtetc=%p\r\n", static_cast<void*>(formats));
    if (!enumerator) return E_POINTER;
    auto* created = new (std::nothrow) CEnumFormatEtc(3, formats);
    *enumerator = created;
    if (!created) return E_OUTOFMEMORY;
    created->AddRef();
    return S_OK;
}

STDMETHODIMP CCalvexReceiversDataObject::DAdvise(FORMATETC*, DWORD, IAdviseSink*, DWORD*) {
    TraceA("CCalvexReceiversDataObject::DAdvise\r\n");
    return E_NOTIMPL;
}

STDMETHODIMP CCalvexReceiversDataObject::DUnadvise(DWORD) {
    TraceA("CCalvexReceiversDataObject::DUnadvise\r\n");
    return E_NOTIMPL;
}

// The DUnadvise text is written here too, as it always was.
STDMETHODIMP CCalvexReceiversDataObject::EnumDAdvise(IEnumSTATDATA**) {
    TraceA("CCalvexReceiversDataObject::DUnadvise\r\n");
    return E_NOTIMPL;
}

STDMETHODIMP CCalvexReceiversDataObject::QueryContinueDrag(BOOL escapePressed, DWORD keyState) {
    TraceA("CCalvexReceiversDataObject::QueryContinueDrag %d, %d\r\n", escapePressed, static_cast<int>(keyState));
    if (keyState == 0) {
        // The handle is kept: it is not used again once the buttons are up.
        ImageList_EndDrag();
        ImageList_DragLeave(m_dragWindow);
        ImageList_Destroy(m_dragImage);
        m_dragImageShown = false;
    }
    if (escapePressed) return DRAGDROP_S_CANCEL;
    return (keyState & MK_LBUTTON) ? S_OK : DRAGDROP_S_DROP;
}

STDMETHODIMP CCalvexReceiversDataObject::GiveFeedback(DWORD) {
    TraceA("CCalvexReceiversDataObject::GiveFeedback\r\n");
    if (!m_dragImage) return DRAGDROP_S_USEDEFAULTCURSORS;
    if (!m_dragImageShown) {
        // Entered before the drag begins, and not moved on this first call: kept in this order.
        ImageList_DragEnter(m_dragWindow, 0, 0);
        ImageList_BeginDrag(m_dragImage, 0, 0, 0);
        m_dragImageShown = true;
        return DRAGDROP_S_USEDEFAULTCURSORS;
    }
    MoveDragImage();
    return DRAGDROP_S_USEDEFAULTCURSORS;
}

// The image shows only over the view's own list; elsewhere the default cursors alone do.
void CCalvexReceiversDataObject::MoveDragImage() const {
    POINT cursor;
    if (!GetCursorPos(&cursor)) return;
    const HWND under = WindowFromPoint(cursor);
    if (under != m_dragWindow && !IsChild(m_dragWindow, under)) {
        ImageList_DragShowNolock(FALSE);
        return;
    }
    ImageList_DragMove(cursor.x + m_dragOffset.x, cursor.y + m_dragOffset.y);
    ImageList_DragShowNolock(TRUE);
}
