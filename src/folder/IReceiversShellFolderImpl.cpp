#include "folder/IReceiversShellFolderImpl.h"

#include <cstdlib>
#include <cstring>
#include <new>
#include <string>

#include "com/ComObject.h"
#include "folder/FolderEventHandlers.h"
#include "items/CCalvexReceiversEnumIDList.h"
#include "items/CCalvexReceiversExtractIcon.h"
#include "items/ItemPath.h"
#include "module/ClassIds.h"
#include "trace/TraceLog.h"
#include "transfer/CCalvexReceiversContextMenu.h"
#include "transfer/CCalvexReceiversDataObject.h"
#include "view/CCalvexReceiversQueryInfo.h"
#include "view/CCalvexReceiversShellView.h"

namespace {
const wchar_t kComputerParsingName[] = L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}";
const wchar_t kCalvexRootParsingName[] = L"::{E102076F-4057-4e7f-8209-511258F12B62}";
const wchar_t kBrennorRootParsingName[] = L"::{E65CDE76-B4FC-447f-A9DD-A011176B14E7}";

const SFGAOF kFileAttributes = SFGAO_REMOVABLE | SFGAO_CANCOPY;                         // 0x02000001
const SFGAOF kReceiverAttributes = SFGAO_FOLDER | SFGAO_REMOVABLE;                      // 0x22000000
const SFGAOF kRootAttributes = SFGAO_HASSUBFOLDER | SFGAO_FOLDER | SFGAO_REMOVABLE;     // 0xA2000000

// Hands a new object of the module out as riid, after the object's own setup.
template <class T, class Setup>
HRESULT CreateInitialized(REFIID riid, void** ppv, Setup setup) {
    ComObject<T>* object = nullptr;
    HRESULT hr = CreateComObject<T>(&object);
    if (FAILED(hr)) return hr;
    hr = setup(object);
    if (SUCCEEDED(hr)) hr = object->QueryInterface(riid, ppv);
    object->Release();
    return hr;
}

HRESULT NotImplemented(const char* traceLine) {
    TraceA(traceLine);
    return E_NOTIMPL;
}
}  // namespace

IReceiversShellFolderImpl::IReceiversShellFolderImpl(DWORD brandKind) : m_brandKind(brandKind) {
    TraceA("IReceiversShellFolderImpl::IReceiversShellFolderImpl 0x%p\r\n", this);
    m_pidlMgr.reset(new (std::nothrow) CReceiversPidlMgr());
    if (!m_pidlMgr || !m_pidlMgr->IsValid() || FAILED(SHGetMalloc(&m_malloc))) return;
    m_notification.Start();
}

// Released in the folder's long-standing order: the thread is told to stop first and only
// waited for once everything it cannot touch is gone; the device manager objects go last.
IReceiversShellFolderImpl::~IReceiversShellFolderImpl() {
    m_notification.RequestStop();
    TraceA("IReceiversShellFolderImpl::~IReceiversShellFolderImpl 0x%p\r\n", this);
    m_ownPidl.Reset();
    DeleteEventSinks();
    m_rootParsingName.clear();
    m_ownName.clear();
    m_parent.Reset();
    m_malloc.Reset();
    m_pidlMgr.reset();
    m_notification.WaitStopped();
    m_deviceMgrInterface.Reset();
    m_deviceMgr.Reset();
    m_eventSource.Reset();
}

// Internal

HRESULT IReceiversShellFolderImpl::Init(IReceiversShellFolderImpl* parent, LPCITEMIDLIST pidl) {
    TraceA("IReceiversShellFolderImpl::Init 0x%p (parent:0x%p) \r\n", this, parent);
    if (!m_pidlMgr || !m_pidlMgr->IsValid()) return E_OUTOFMEMORY;
    m_parent = ComPtr<IReceiversShellFolderImpl>(parent);
    LPITEMIDLIST own = pidl ? m_pidlMgr->Copy(pidl) : m_pidlMgr->CreateRoot(m_brandKind);
    m_ownPidl = UniquePidl(*m_pidlMgr, own);
    if (!own) return E_OUTOFMEMORY;
    const DWORD lastType = m_pidlMgr->GetLastItemType(own);
    m_rootParsingName.clear();
    if (IsRootType(lastType))
        m_rootParsingName = lastType == ItemTypeBrennorRoot ? kBrennorRootParsingName : kCalvexRootParsingName;
    m_ownName = KeyForm(own);
    TraceW(L"IReceiversShellFolderImpl::Init %s\r\n", GetFullPath().c_str());
    return S_OK;
}

bool IReceiversShellFolderImpl::IsWhole(const char* method, LPCITEMIDLIST list) const {
    if (!m_pidlMgr) return false;
    const PidlCheck check = m_pidlMgr->Check(list);
    if (check) return true;
    const char* prefix = "IReceiversShellFolderImpl::%s - malformed item identifier: item [%u] ";
    const std::string line = std::string(prefix) +
        (check.fault == PidlFault::ByteCount ? "counts [%u] bytes, fewer than its fixed fields\r\n"
         : check.fault == PidlFault::Length  ? "ends past the size a list can count\r\n"
                                             : "has no name terminator inside it\r\n");
    TraceA(line.c_str(), method, check.item, check.value);
    return false;
}

std::wstring IReceiversShellFolderImpl::KeyForm(LPCITEMIDLIST list) const {
    wchar_t text[PathCapacity] = L"";
    if (list && m_pidlMgr) m_pidlMgr->GetPath(list, text, PathCapacity, true);
    return text;
}

std::wstring IReceiversShellFolderImpl::DisplayForm(LPCITEMIDLIST list) const {
    wchar_t text[PathCapacity] = L"";
    if (list && m_pidlMgr) m_pidlMgr->GetPath(list, text, PathCapacity, false);
    return text;
}

bool IReceiversShellFolderImpl::GetFolderPath(wchar_t* buffer, UINT capacity, bool useRootParsingName) const {
    if (!buffer || capacity == 0) return false;
    buffer[0] = L'\0';
    std::wstring path = m_parent ? m_parent->FolderPath(useRootParsingName) : std::wstring();
    // The own name's length decides, even where the root parsing name is written.
    if (path.size() + 1 + m_ownName.size() > capacity) return false;
    if (!path.empty()) path += L'\\';
    path += useRootParsingName && !m_rootParsingName.empty() ? m_rootParsingName : m_ownName;
    wcsncpy(buffer, path.c_str(), capacity - 1);
    buffer[capacity - 1] = L'\0';
    return true;
}

std::wstring IReceiversShellFolderImpl::FolderPath(bool useRootParsingName) const {
    wchar_t path[PathCapacity] = L"";
    GetFolderPath(path, PathCapacity, useRootParsingName);
    return path;
}

std::wstring IReceiversShellFolderImpl::GetFullPath() const {
    const std::wstring path = FolderPath(true);
    return path.empty() ? path : std::wstring(kComputerParsingName) + L"\\" + path;
}

LPITEMIDLIST IReceiversShellFolderImpl::GetFullPidl() const {
    std::wstring path = GetFullPath();
    TraceW(L"IReceiversShellFolderImpl::GetFullPidl %s\r\n", path.c_str());
    ComPtr<IShellFolder> desktop;
    if (FAILED(SHGetDesktopFolder(&desktop))) return nullptr;
    LPITEMIDLIST pidl = nullptr;
    if (FAILED(desktop->ParseDisplayName(nullptr, nullptr, &path[0], nullptr, &pidl, nullptr))) return nullptr;
    return pidl;
}

// IPersist

STDMETHODIMP IReceiversShellFolderImpl::GetClassID(CLSID* pClassID) {
    TraceA("IReceiversShellFolderImpl::GetClassID\r\n");
    if (!pClassID) return E_POINTER;
    // Both brands report the Calvex class: it has always been so and saved views rely on it.
    *pClassID = CLSID_CalvexReceiversShellFolder;
    return S_OK;
}

// IPersistFolder

STDMETHODIMP IReceiversShellFolderImpl::Initialize(PCIDLIST_ABSOLUTE) {
    TraceA("IReceiversShellFolderImpl::Initialize\r\n");
    // Whatever Explorer passes, a folder it creates directly is the root of its own brand.
    Init(nullptr, nullptr);
    return S_OK;
}

// IShellFolder

STDMETHODIMP IReceiversShellFolderImpl::ParseDisplayName(HWND, IBindCtx*, LPWSTR pszDisplayName, ULONG*,
                                                         PIDLIST_RELATIVE* ppidl, ULONG*) {
    TraceA("IReceiversShellFolderImpl::ParseDisplayName\r\n");
    if (!ppidl) return E_INVALIDARG;
    *ppidl = nullptr;
    if (!pszDisplayName || !m_pidlMgr) return E_INVALIDARG;
    const std::wstring path = FolderPath(false) + L"\\" + pszDisplayName;
    UniquePidl list(*m_pidlMgr, m_pidlMgr->CreateFromPath(path.c_str(), m_brandKind));
    if (!list) {
        TraceA("IReceiversShellFolderImpl::ParseDisplayName - pidl is null\r\n");
        return E_INVALIDARG;
    }
    const UINT nParts = static_cast<UINT>(SplitItemPath(pszDisplayName).size());
    const UINT nItems = m_pidlMgr->GetItemCount(list.Get());
    if (nParts >= nItems) {
        TraceA("IReceiversShellFolderImpl::ParseDisplayName - nParts [%u] >= nItems [%u]\r\n", nParts, nItems);
        return E_INVALIDARG;
    }
    *ppidl = m_pidlMgr->CopyFrom(list.Get(), nItems - nParts);
    TraceW(L"IReceiversShellFolderImpl::ParseDisplayName - item [%s] pidl [0x%p] created \r\n", pszDisplayName,
           *ppidl);
    // A name without parts names nothing below this folder: success and no list, as always.
    return *ppidl || nParts == 0 ? S_OK : E_OUTOFMEMORY;
}

STDMETHODIMP IReceiversShellFolderImpl::EnumObjects(HWND, SHCONTF grfFlags, IEnumIDList** ppenumIDList) {
    const std::wstring path = FolderPath(false);
    TraceW(L"IReceiversShellFolderImpl::EnumObjects %s\r\n", path.c_str());
    if (!ppenumIDList) return E_INVALIDARG;
    *ppenumIDList = nullptr;
    ComObject<CCalvexReceiversEnumIDList>* enumerator = nullptr;
    HRESULT hr = CreateComObject<CCalvexReceiversEnumIDList>(&enumerator);
    if (FAILED(hr)) return hr;
    hr = InitCollections();
    if (FAILED(hr)) {
        enumerator->Release();
        return hr;
    }
    enumerator->Init(path.c_str(), grfFlags, m_eventSource.Get(), m_brandKind, &hr);
    if (FAILED(hr)) return hr;  // the enumerator is gone already
    hr = enumerator->QueryInterface(IID_IEnumIDList, reinterpret_cast<void**>(ppenumIDList));
    enumerator->Release();
    return hr;
}

STDMETHODIMP IReceiversShellFolderImpl::BindToObject(PCUIDLIST_RELATIVE pidl, IBindCtx*, REFIID riid, void** ppv) {
    if (ppv) *ppv = nullptr;
    if (m_pidlMgr && !IsWhole("BindToObject", pidl)) return E_INVALIDARG;
    const LPCITEMIDLIST last = m_pidlMgr ? m_pidlMgr->GetLastItem(pidl) : nullptr;
    TraceW(L"IReceiversShellFolderImpl::BindToObject   last=%s\r\n", KeyForm(last).c_str());
    TraceW(L"IReceiversShellFolderImpl::BindToObject   %s\r\n", KeyForm(pidl).c_str());
    if (!ppv) return E_INVALIDARG;
    *ppv = nullptr;
    if (!pidl || !m_pidlMgr) return E_INVALIDARG;
    if (IsFileType(m_pidlMgr->GetLastItemType(pidl))) return E_INVALIDARG;
    HRESULT hr = InitCollections();
    if (FAILED(hr)) return hr;
    return BindSubFolder(pidl, riid, ppv);
}

HRESULT IReceiversShellFolderImpl::BindSubFolder(LPCITEMIDLIST pidl, REFIID riid, void** ppv) {
    IReceiversShellFolderImpl* folder = CreateInstance();
    if (!folder) return E_OUTOFMEMORY;
    folder->TouchReference();
    folder->AddRef();
    HRESULT hr = folder->Init(this, pidl);
    if (SUCCEEDED(hr)) hr = folder->InitCollections();
    if (SUCCEEDED(hr)) hr = folder->QueryInterface(riid, ppv);
    folder->Release();
    return hr;
}

STDMETHODIMP IReceiversShellFolderImpl::BindToStorage(PCUIDLIST_RELATIVE, IBindCtx*, REFIID, void** ppv) {
    if (ppv) *ppv = nullptr;
    return NotImplemented("IReceiversShellFolderImpl::BindToStorage\r\n");
}

STDMETHODIMP IReceiversShellFolderImpl::CompareIDs(LPARAM lParam, PCUIDLIST_RELATIVE pidl1, PCUIDLIST_RELATIVE pidl2) {
    TraceA("IReceiversShellFolderImpl::CompareIDs\r\n");
    // A damaged item sorts after every whole one, in either direction, and equal to another
    // damaged one: the order stays consistent, so a sort over it cannot go wrong.
    const bool whole1 = IsWhole("CompareIDs", pidl1), whole2 = IsWhole("CompareIDs", pidl2);
    if (!whole1 || !whole2) return whole1 == whole2 ? 0 : whole1 ? -1 : 1;
    const ReceiverItemData* item1 = m_pidlMgr ? m_pidlMgr->GetData(pidl1) : nullptr;
    const ReceiverItemData* item2 = m_pidlMgr ? m_pidlMgr->GetData(pidl2) : nullptr;
    if (!item1 || !item2 || item1->type != item2->type) return 0;
    const LONG signedColumn = static_cast<LONG>(lParam);
    LONG result = 0;
    switch (std::labs(signedColumn)) {
    case 2:
        if (!IsFileType(item1->type)) return 0;
        result = static_cast<LONG>(static_cast<DWORD>(item1->size) - static_cast<DWORD>(item2->size));
        break;
    case 3:
        if (!IsFileType(item1->type)) return 0;
        // Equal times compare as +1 on purpose: the sort keeps their order.
        result = item2->time > item1->time ? -1 : 1;
        break;
    default: {
        const std::wstring key1 = KeyForm(pidl1), key2 = KeyForm(pidl2);
        TraceW(L"IReceiversShellFolderImpl::CompareIDs ID1=%s, ID2=%s\r\n", key1.c_str(), key2.c_str());
        result = _wcsicmp(key1.c_str(), key2.c_str());
    }
    }
    // The view passes a signed column and reads only the sign of what comes back, so the
    // product goes out as it stands rather than as a proper HRESULT.
    if (signedColumn != 0) result = static_cast<LONG>(static_cast<DWORD>(result) * static_cast<DWORD>(signedColumn));
    return static_cast<HRESULT>(result);
}

STDMETHODIMP IReceiversShellFolderImpl::CreateViewObject(HWND hwndOwner, REFIID riid, void** ppv) {
    TraceA("IReceiversShellFolderImpl::CreateViewObject from 0x%p\r\n", hwndOwner);
    if (!ppv) return E_INVALIDARG;
    *ppv = nullptr;
    if (IsEqualIID(riid, IID_IShellView)) {
        HRESULT hr = InitCollections();
        if (FAILED(hr)) return hr;
        return CreateView(riid, ppv);
    }
    if (IsEqualIID(riid, IID_IContextMenu)) {
        InitCollections();  // the menu needs nothing of it
        return CreateComInstance<CCalvexReceiversContextMenu>(nullptr, riid, ppv);
    }
    return E_NOINTERFACE;
}

HRESULT IReceiversShellFolderImpl::CreateView(REFIID riid, void** ppv) {
    ComObject<CCalvexReceiversShellView>* view = nullptr;
    HRESULT hr = CreateComObject<CCalvexReceiversShellView>(&view);
    if (FAILED(hr)) return hr;
    // The view reads its level from the whole list: root, then the receiver if any.
    UniquePidl absolute(*m_pidlMgr, m_pidlMgr->CreateFromPath(FolderPath(false).c_str(), m_brandKind));
    hr = view->Init(this, absolute.Get());
    if (SUCCEEDED(hr)) hr = view->QueryInterface(riid, ppv);
    view->Release();
    return hr;
}

STDMETHODIMP IReceiversShellFolderImpl::GetAttributesOf(UINT cidl, PCUITEMID_CHILD_ARRAY apidl, SFGAOF* rgfInOut) {
    TraceA("IReceiversShellFolderImpl::GetAttributesOf\r\n");
    if (!rgfInOut) return S_FALSE;
    // The caller's mask is replaced, not narrowed.
    *rgfInOut = 0xFFFFFFFF;
    for (UINT i = 0; i < cidl && apidl && m_pidlMgr; ++i) {
        if (!IsWhole("GetAttributesOf", apidl[i])) {
            *rgfInOut = 0;  // nothing may be done with it
            return E_INVALIDARG;
        }
        const DWORD type = m_pidlMgr->GetLastItemType(apidl[i]);
        *rgfInOut &= IsFileType(type) ? kFileAttributes : IsReceiverType(type) ? kReceiverAttributes : kRootAttributes;
    }
    TraceA("IReceiversShellFolderImpl::GetAttributesOf - attributes is collected [%u]\r\n", *rgfInOut);
    return S_OK;
}

STDMETHODIMP IReceiversShellFolderImpl::GetUIObjectOf(HWND, UINT cidl, PCUITEMID_CHILD_ARRAY apidl, REFIID riid,
                                                      UINT*, void** ppv) {
    TraceA("IReceiversShellFolderImpl::GetUIObjectOf\r\n");
    if (!ppv) return E_INVALIDARG;
    *ppv = nullptr;
    if (cidl != 1) return E_FAIL;
    if (!apidl || !apidl[0] || !m_pidlMgr || !IsWhole("GetUIObjectOf", apidl[0])) return E_INVALIDARG;
    const bool itemObject = IsEqualIID(riid, IID_IExtractIconW) || IsEqualIID(riid, IID_IQueryInfo) ||
                            IsEqualIID(riid, IID_IContextMenu) || IsEqualIID(riid, IID_IDataObject);
    if (!itemObject) return E_NOINTERFACE;
    if (IsEqualIID(riid, IID_IDataObject)) {
        HRESULT hr = InitCollections();
        if (FAILED(hr)) return hr;
    }
    UniquePidl folder(*m_pidlMgr, m_pidlMgr->CreateFromPath(FolderPath(false).c_str(), m_brandKind));
    UniquePidl item(*m_pidlMgr, m_pidlMgr->Concatenate(folder.Get(), apidl[0]));
    if (!item) return E_OUTOFMEMORY;
    return CreateItemObject(item.Get(), riid, ppv);
}

HRESULT IReceiversShellFolderImpl::CreateItemObject(LPCITEMIDLIST item, REFIID riid, void** ppv) {
    if (IsEqualIID(riid, IID_IExtractIconW))
        return CreateInitialized<CCalvexReceiversExtractIcon>(riid, ppv, [&](auto* icon) { return icon->SetItem(item); });
    if (IsEqualIID(riid, IID_IQueryInfo))
        return CreateInitialized<CCalvexReceiversQueryInfo>(riid, ppv, [&](auto* info) { return info->SetItem(item); });
    if (IsEqualIID(riid, IID_IDataObject)) {
        return CreateInitialized<CCalvexReceiversDataObject>(
            riid, ppv, [&](auto* data) { return data->AddPidl(item, EventSourceCollection()); });
    }
    // The context menu knows nothing of the items: the list is built but not handed over.
    return CreateComInstance<CCalvexReceiversContextMenu>(nullptr, riid, ppv);
}

STDMETHODIMP IReceiversShellFolderImpl::GetDisplayNameOf(PCUITEMID_CHILD pidl, SHGDNF uFlags, STRRET* pName) {
    TraceA("IReceiversShellFolderImpl::GetDisplayNameOf\r\n");
    if (!pName || !m_malloc || !IsWhole("GetDisplayNameOf", pidl)) return E_INVALIDARG;
    std::wstring name;
    HRESULT hr = DisplayName(pidl, uFlags, name);
    if (FAILED(hr)) return hr;
    if (name.size() >= PathCapacity) name.resize(PathCapacity - 1);  // built in a MAX_PATH buffer
    const size_t bytes = (name.size() + 1) * sizeof(wchar_t);
    auto* text = static_cast<LPWSTR>(m_malloc->Alloc(bytes));
    if (!text) return E_OUTOFMEMORY;
    memcpy(text, name.c_str(), bytes);
    pName->uType = STRRET_WSTR;
    pName->pOleStr = text;
    TraceW(L"IReceiversShellFolderImpl::GetDisplayNameOf - OK [%s]\r\n", text);
    return S_OK;
}

HRESULT IReceiversShellFolderImpl::DisplayName(LPCITEMIDLIST pidl, SHGDNF flags, std::wstring& name) const {
    const DWORD low = flags & 0xFF;
    if (flags & 0xBF00) {  // any high-byte flag but SHGDN_FORADDRESSBAR
        if ((flags & 0xFF00) != SHGDN_FORPARSING) return E_INVALIDARG;
        if (low == SHGDN_NORMAL) name = FolderPath(true) + L"\\" + KeyForm(pidl);
        else if (low == SHGDN_INFOLDER) name = KeyForm(pidl);
        return S_OK;
    }
    if (low > SHGDN_INFOLDER) return E_INVALIDARG;
    name = DisplayForm(pidl);
    return S_OK;
}

STDMETHODIMP IReceiversShellFolderImpl::SetNameOf(HWND, PCUITEMID_CHILD, LPCWSTR, SHGDNF, PITEMID_CHILD* ppidlOut) {
    if (ppidlOut) *ppidlOut = nullptr;
    return NotImplemented("IReceiversShellFolderImpl::SetNameOf - NOTIMPL\r\n");
}

// IShellFolder2: the columns are the view's business, not the folder's.

STDMETHODIMP IReceiversShellFolderImpl::GetDefaultSearchGUID(GUID*) {
    return NotImplemented("IReceiversShellFolderImpl2::GetDefaultSearchGUID - NOTIMPL\r\n");
}
STDMETHODIMP IReceiversShellFolderImpl::EnumSearches(IEnumExtraSearch** ppenum) {
    if (ppenum) *ppenum = nullptr;
    return NotImplemented("IReceiversShellFolderImpl2::EnumSearches - NOTIMPL\r\n");
}
STDMETHODIMP IReceiversShellFolderImpl::GetDefaultColumn(DWORD, ULONG*, ULONG*) {
    return NotImplemented("IReceiversShellFolderImpl2::GetDefaultColumn - NOTIMPL\r\n");
}
STDMETHODIMP IReceiversShellFolderImpl::GetDefaultColumnState(UINT, SHCOLSTATEF*) {
    return NotImplemented("IReceiversShellFolderImpl2::GetDefaultColumnState - NOTIMPL\r\n");
}
STDMETHODIMP IReceiversShellFolderImpl::GetDetailsEx(PCUITEMID_CHILD, const SHCOLUMNID*, VARIANT*) {
    return NotImplemented("IReceiversShellFolderImpl2::GetDetailsEx - NOTIMPL\r\n");
}
STDMETHODIMP IReceiversShellFolderImpl::GetDetailsOf(PCUITEMID_CHILD, UINT, SHELLDETAILS*) {
    return NotImplemented("IReceiversShellFolderImpl2::GetDetailsOf - NOTMIPL\r\n");  // sic
}
STDMETHODIMP IReceiversShellFolderImpl::MapColumnToSCID(UINT, SHCOLUMNID*) {
    return NotImplemented("IReceiversShellFolderImpl2::MapColumnToSCID - NOTIMPL\r\n");
}
