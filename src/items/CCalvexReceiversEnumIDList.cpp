#include "items/CCalvexReceiversEnumIDList.h"

#include <cstdint>
#include <new>
#include <vector>

#include "CalvexDeviceMgrLib.h"
#include "com/Bstr.h"
#include "items/ItemPath.h"
#include "module/ClassCreators.h"
#include "module/ModuleState.h"
#include "resources/resource.h"
#include "trace/TraceLog.h"

namespace {
const wchar_t kDefaultRootName[] = L"Calvex Receivers";
const DWORD kPortTypeNamed = 1;
const DWORD kPortTypeUsb = 2;

// The receiver key of one listed receiver, or false when the receiver is not listed here:
// another brand, or a label that is missing or empty.
bool ReadReceiverKey(IDispatch* item, DWORD brand, std::wstring* key) {
    ComPtr<IReceiver> receiver;
    if (FAILED(item->QueryInterface(IID_IReceiver, receiver.PutVoid())) || !receiver) return false;
    long receiverBrand = 0;
    // Exactly S_OK: a receiver that answers S_FALSE has not told its brand.
    if (receiver->get_Brand(&receiverBrand) != S_OK || static_cast<DWORD>(receiverBrand) != brand) return false;
    Bstr label;
    if (receiver->get_Label(label.Put()) != S_OK || label.Length() == 0) return false;

    Bstr serial, model, portName;
    long portType = 0;
    receiver->get_SerialNumber(serial.Put());
    receiver->get_Model(model.Put());
    receiver->get_PortType(&portType);
    std::wstring port;
    if (static_cast<DWORD>(portType) == kPortTypeNamed) {
        receiver->get_PortName(portName.Put());
        port = portName.Str();
    } else {
        port = LoadModuleString(static_cast<DWORD>(portType) == kPortTypeUsb ? IDS_PORT_USB : IDS_PORT_UNKNOWN);
    }
    *key = MakeReceiverKey(serial.Str(), model.Str(), port);
    return true;
}

// Brand 1 files always show as ".qpr"; of brand 2 only the HVL3 family's do, the others
// show the names the service gives.
bool FilesGetExtension(DWORD brand, const std::vector<std::wstring>& pathParts) {
    if (brand == BrandCalvex) return true;
    if (pathParts.size() < 2) return false;
    const std::vector<std::wstring> fields = SplitReceiverKey(pathParts[1].c_str());
    if (fields.size() < 2) return false;
    return wcsncmp(ModelFromKeyField(fields[1]).c_str(), L"HVL3", 4) == 0;
}
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
            !ListFiles(folderPath, FilesGetExtension(brand, parts), collection, brand))
            return FALSE;
        return TRUE;
    } catch (const std::bad_alloc&) {
        return FALSE;
    }
}

bool CCalvexReceiversEnumIDList::ListReceivers(const std::wstring& path, IUnknown* collection, DWORD brand) {
    ComPtr<IReceiversColl> receivers;
    if (!collection || FAILED(collection->QueryInterface(IID_IReceiversColl, receivers.PutVoid())) || !receivers)
        return true;
    long count = 0;
    receivers->get_Count(&count);
    TraceA("CCalvexReceiversEnumIDList::CreateEnumList - receivers:%i %p\r\n", static_cast<int>(count), this);
    for (long index = 0; index < count; ++index) {
        ComPtr<IDispatch> item;
        if (FAILED(receivers->get_Item(index, &item)) || !item) continue;
        std::wstring key;
        if (!ReadReceiverKey(item.Get(), brand, &key)) continue;
        // The path as given, not the default root name: the folder always gives one.
        UniquePidl pidl(m_pidlMgr, m_pidlMgr.CreateLastFromPath((path + L"\\" + key).c_str(), brand));
        if (pidl && !AddToEnumList(pidl)) return false;
    }
    return true;
}

bool CCalvexReceiversEnumIDList::ListFiles(const std::wstring& path, bool withExtension, IUnknown* collection,
                                           DWORD brand) {
    ComPtr<IFilesColl> files;
    if (!collection || FAILED(collection->QueryInterface(IID_IFilesColl, files.PutVoid())) || !files) return true;
    long count = 0;
    files->get_Count(&count);
    TraceA("CCalvexReceiversEnumIDList::CreateEnumList - files: %i %p\r\n", static_cast<int>(count), this);
    for (long index = 0; index < count; ++index) {
        ComPtr<IDispatch> item;
        if (FAILED(files->get_Item(index, &item)) || !item) continue;
        ComPtr<IReceiverFile> file;
        if (FAILED(item->QueryInterface(IID_IReceiverFile, file.PutVoid())) || !file) continue;
        Bstr name;
        DATE time = 0;
        long size = 0;
        // Results not looked at: a value that cannot be read stays 0.
        file->get_Name(name.Put());
        file->get_Time(&time);
        file->get_Size(&size);
        std::wstring itemPath = path + L"\\" + name.Str();
        if (withExtension) itemPath += L".qpr";
        UniquePidl pidl(m_pidlMgr, m_pidlMgr.CreateLastFromPath(itemPath.c_str(), brand));
        if (!pidl) continue;  // an item that cannot be made is skipped
        ReceiverItemData* data = m_pidlMgr.GetData(pidl.Get());
        data->size = static_cast<DWORD>(size);
        data->time = time;
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
