#include "items/CCalvexReceiversEnumIDList.h"

#include <cstdint>
#include <new>
#include <vector>

#include "items/DeviceManagerClient.h"
#include "items/ItemPath.h"
#include "module/ClassCreators.h"
#include "trace/TraceLog.h"

namespace {
const wchar_t kDefaultRootName[] = L"Calvex Receivers";
}  // namespace

CCalvexReceiversEnumIDList::CCalvexReceiversEnumIDList(IMalloc* malloc) : m_pidlMgr(malloc) {
    if (m_pidlMgr.IsValid()) m_malloc = ComPtr<IMalloc>(m_pidlMgr.Malloc());
}

CCalvexReceiversEnumIDList::~CCalvexReceiversEnumIDList() { DeleteList(); }

HRESULT CCalvexReceiversEnumIDList::FinalConstruct() {
    return m_malloc && m_pidlMgr.IsValid() ? S_OK : E_OUTOFMEMORY;
}

void CCalvexReceiversEnumIDList::Init(const wchar_t* path, DWORD flags, IUnknown* collection, DWORD brand,
                                      HRESULT* result) {
    TraceA("CCalvexReceiversEnumIDList::Init\r\n");
    if (result) *result = S_OK;
    DeleteList();
    if (CreateEnumList(path, flags, collection, brand)) return;
    if (result) *result = E_OUTOFMEMORY;
    // Drops the caller's reference: the caller returns the result and never touches us again.
    static_cast<IEnumIDList*>(this)->Release();
}

BOOL CCalvexReceiversEnumIDList::CreateEnumList(const wchar_t* path, DWORD flags, IUnknown* collection,
                                                DWORD brand) {
    // Only the address's low 32 bits fit the 8-digit field; that is all the trace wants.
    TraceW(L"CCalvexReceiversEnumIDList::CreateEnumList(%s, %u, 0x%08X, %i)\r\n", path, flags,
           static_cast<unsigned>(reinterpret_cast<uintptr_t>(collection)), static_cast<int>(brand));
    try {
        const std::wstring folderPath = path ? path : L"";
        const std::vector<std::wstring> parts = SplitItemPath(folderPath.empty() ? kDefaultRootName : path);
        if ((flags & (SHCONTF_FOLDERS | SHCONTF_NONFOLDERS)) && parts.empty()) return FALSE;
        if ((flags & SHCONTF_FOLDERS) && !ListReceivers(folderPath, collection, brand)) return FALSE;
        if ((flags & SHCONTF_NONFOLDERS) &&
            !ListFiles(folderPath, FilesShowExtension(brand, parts.size() < 2 ? std::wstring() : parts[1]), collection,
                       brand))
            return FALSE;
        return TRUE;
    } catch (const std::bad_alloc&) {
        return FALSE;
    }
}

bool CCalvexReceiversEnumIDList::ListReceivers(const std::wstring& path, IUnknown* collection, DWORD brand) {
    ComPtr<IReceiversColl> receivers;
    if (FAILED(QueryReceiversColl(collection, receivers))) return true;
    const long count = CollectionCount(receivers.Get());
    TraceA("CCalvexReceiversEnumIDList::CreateEnumList - receivers:%i %p\r\n", static_cast<int>(count), this);
    for (long index = 0; index < count; ++index) {
        ComPtr<IReceiver> receiver;
        std::wstring key;
        if (FAILED(GetReceiverAt(receivers.Get(), index, receiver)) ||
            !ReadListedReceiverKey(receiver.Get(), brand, &key))
            continue;
        // The path as given, not the default root name: the folder always gives one.
        UniquePidl pidl(m_pidlMgr, m_pidlMgr.CreateLastFromPath((path + L"\\" + key).c_str(), brand));
        if (pidl && !AddToEnumList(pidl)) return false;
    }
    return true;
}

bool CCalvexReceiversEnumIDList::ListFiles(const std::wstring& path, bool withExtension, IUnknown* collection,
                                           DWORD brand) {
    ComPtr<IFilesColl> files;
    if (FAILED(QueryFilesColl(collection, files))) return true;
    const long count = CollectionCount(files.Get());
    TraceA("CCalvexReceiversEnumIDList::CreateEnumList - files: %i %p\r\n", static_cast<int>(count), this);
    for (long index = 0; index < count; ++index) {
        ComPtr<IReceiverFile> file;
        if (FAILED(GetFileAt(files.Get(), index, file))) continue;
        const ReceiverFileInfo info = ReadFileInfo(file.Get());
        const std::wstring itemPath = path + L"\\" + FileDisplayName(info.name, withExtension);
        UniquePidl pidl(m_pidlMgr, m_pidlMgr.CreateLastFromPath(itemPath.c_str(), brand));
        if (!pidl) continue;  // an item that cannot be made is skipped
        ReceiverItemData* data = m_pidlMgr.GetData(pidl.Get());
        data->size = static_cast<DWORD>(info.size);
        data->time = info.time;
        if (!AddToEnumList(pidl)) return false;
    }
    return true;
}

bool CCalvexReceiversEnumIDList::AddToEnumList(UniquePidl& pidl) {
    auto* node = static_cast<EnumNode*>(m_malloc->Alloc(sizeof(EnumNode)));
    if (!node) return false;
    node->next = nullptr;
    node->pidl = pidl.Release();
    if (m_last) {
        m_last->next = node;
    } else {
        m_first = m_current = node;
    }
    m_last = node;
    return true;
}

void CCalvexReceiversEnumIDList::DeleteList() {
    while (m_first) {
        EnumNode* next = m_first->next;
        m_pidlMgr.Delete(m_first->pidl);
        m_malloc->Free(m_first);
        m_first = next;
    }
    m_last = m_current = nullptr;
}

// IEnumIDList

STDMETHODIMP CCalvexReceiversEnumIDList::Next(ULONG celt, PITEMID_CHILD* rgelt, ULONG* pceltFetched) {
    TraceA("CCalvexReceiversEnumIDList::Next\r\n");
    if (celt >= 2 && !pceltFetched) return E_INVALIDARG;
    if (celt > 0 && !rgelt) return E_INVALIDARG;
    HRESULT hr = S_OK;
    ULONG delivered = 0;
    while (delivered < celt) {
        if (!m_current) {
            hr = S_FALSE;
            break;
        }
        // A copy that fails still counts: its slot stays null and the cursor moves on.
        rgelt[delivered++] = static_cast<PITEMID_CHILD>(m_pidlMgr.Copy(m_current->pidl));
        m_current = m_current->next;
    }
    if (pceltFetched) *pceltFetched = delivered;
    return hr;
}

STDMETHODIMP CCalvexReceiversEnumIDList::Skip(ULONG celt) {
    TraceA("CCalvexReceiversEnumIDList::Skip\r\n");
    for (ULONG i = 0; i < celt; ++i) {
        if (!m_current) return S_FALSE;
        m_current = m_current->next;
    }
    return S_OK;
}

STDMETHODIMP CCalvexReceiversEnumIDList::Reset() {
    TraceA("CCalvexReceiversEnumIDList::Reset\r\n");
    m_current = m_first;
    return S_OK;
}

STDMETHODIMP CCalvexReceiversEnumIDList::Clone(IEnumIDList** ppenum) {
    TraceA("CCalvexReceiversEnumIDList::Clone\r\n");
    if (ppenum) *ppenum = nullptr;
    return E_NOTIMPL;  // the shell makes a new enumerator instead
}

HRESULT CreateCalvexReceiversEnumIDList(IUnknown* outer, REFIID riid, void** ppv) {
    return CreateComInstance<CCalvexReceiversEnumIDList>(outer, riid, ppv);
}
