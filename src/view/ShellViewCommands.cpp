// The view's commands (one dispatcher for menus, the right-click menu and Exec), its
// IOleCommandTarget and the re-reading of its level from the device manager.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>

#include <string>
#include <vector>

#include "com/Bstr.h"
#include "items/DeviceManagerClient.h"
#include "items/ItemPath.h"
#include "module/ModuleState.h"
#include "module/SystemErrorText.h"
#include "resource.h"
#include "trace/TraceLog.h"
#include "transfer/CCalvexReceiversDataObject.h"
#include "view/CCalvexReceiversShellView.h"
#include "view/CRcvDlg.h"
#include "view/ViewCommands.h"

namespace {
// {E102076F-4057-4E7F-8209-511258F12B62}, the Calvex folder class, answered like the standard group.
const GUID kCalvexFolderGroup = {0xE102076F, 0x4057, 0x4E7F, {0x82, 0x09, 0x51, 0x12, 0x58, 0xF1, 0x2B, 0x62}};

std::string GroupText(const GUID* group) {
    if (!group) return std::string();
    wchar_t wide[64] = L"";
    StringFromGUID2(*group, wide, 64);
    char narrow[64] = "";
    WideCharToMultiByte(CP_ACP, 0, wide, -1, narrow, sizeof(narrow), nullptr, nullptr);
    return narrow;
}

bool IsAcceptedGroup(const GUID* group) {
    return !group || IsEqualGUID(*group, kCalvexFolderGroup) || IsEqualGUID(*group, CGID_Explorer) ||
           IsEqualGUID(*group, CGID_ShellDocView);
}

void ShowDeleteError(HWND owner, HRESULT result) {
    MessageBoxW(owner, SystemErrorText(result).c_str(), LoadModuleString(IDS_MENU_DELETE).c_str(),
                MB_OK | MB_ICONERROR);
}
}  // namespace

void CCalvexReceiversShellView::OnCommand(UINT id) {
    TraceA("CCalvexReceiversShellView::OnCommand %u\n", id);
    switch (id) {
    case ViewCommandRefresh: Refresh(); break;
    case ViewCommandFind: ShowFindAnimation(); break;
    case ViewCommandCopy: OnCopy(); break;
    case ViewCommandLargeIcons:
    case ViewCommandSmallIcons:
    case ViewCommandList:
    case ViewCommandDetails: SwitchMode(id); break;
    case ViewCommandProperties: OnProperties(); break;
    case ViewCommandDelete: OnDelete(); break;
    case ViewCommandOpen: OnOpen(); break;
    default:
        if (id >= ViewCommandFirstItemWalk) ReadSelectedItems();
        break;
    }
}

int CCalvexReceiversShellView::FirstSelected() const {
    if (!m_listWindow) return -1;
    return static_cast<int>(SendMessageW(m_listWindow, LVM_GETNEXTITEM, static_cast<WPARAM>(-1), LVNI_SELECTED));
}

bool CCalvexReceiversShellView::HasSelection() const { return FirstSelected() >= 0; }

LPCITEMIDLIST CCalvexReceiversShellView::ItemAt(int index) const {
    LVITEMW item = {};
    item.mask = LVIF_PARAM;
    item.iItem = index;
    if (!SendMessageW(m_listWindow, LVM_GETITEMW, 0, reinterpret_cast<LPARAM>(&item))) return nullptr;
    return reinterpret_cast<LPCITEMIDLIST>(item.lParam);
}

void CCalvexReceiversShellView::ReadSelectedItems() {
    for (int i = FirstSelected(); i >= 0; i = static_cast<int>(SendMessageW(m_listWindow, LVM_GETNEXTITEM, i, LVNI_SELECTED)))
        m_pidlManager->GetData(ItemAt(i));
}

void CCalvexReceiversShellView::OnOpen() {
    const int index = FirstSelected();
    if (index < 0 || !m_shellBrowser) return;
    HRESULT hr = m_shellBrowser->BrowseObject(ItemAt(index), SBSP_RELATIVE);
    if (FAILED(hr) && m_commDlgBrowser) m_commDlgBrowser->OnDefaultCommand(this);
}

HRESULT CCalvexReceiversShellView::MakeDataObject(IDataObject** out) {
    *out = nullptr;
    ComObject<CCalvexReceiversDataObject>* object = nullptr;
    HRESULT hr = CreateComObject<CCalvexReceiversDataObject>(&object);
    if (FAILED(hr)) return hr;
    ComPtr<IDataObject> data;
    data.Attach(object);
    const std::wstring path = m_folder ? m_folder->FolderPath(false) : std::wstring();
    const DWORD brand = m_folder ? m_folder->BrandKind() : BrandCalvex;
    for (int i = FirstSelected(); i >= 0; i = static_cast<int>(SendMessageW(m_listWindow, LVM_GETNEXTITEM, i, LVNI_SELECTED))) {
        LPCITEMIDLIST item = ItemAt(i);
        if (!m_pidlManager->GetData(item)) return E_INVALIDARG;
        UniquePidl folder(*m_pidlManager, m_pidlManager->CreateFromPath(path.c_str(), brand));
        UniquePidl absolute(*m_pidlManager, m_pidlManager->Concatenate(folder.Get(), item));
        object->AddPidl(absolute.Get(), m_folder ? m_folder->EventSourceCollection() : nullptr);
    }
    *out = data.Detach();
    return S_OK;
}

void CCalvexReceiversShellView::OnCopy() {
    if (!IsReceiverType(FolderType()) || !HasSelection()) return;
    ComPtr<IDataObject> data;
    if (SUCCEEDED(MakeDataObject(&data))) OleSetClipboard(data.Get());
}

void CCalvexReceiversShellView::OnDelete() {
    if (!IsReceiverType(FolderType()) || !HasSelection() || !m_folder) return;
    // Each delete refreshes the list, so the selection is taken before the first one.
    std::vector<UniquePidl> selected;
    for (int i = FirstSelected(); i >= 0; i = static_cast<int>(SendMessageW(m_listWindow, LVM_GETNEXTITEM, i, LVNI_SELECTED)))
        selected.emplace_back(*m_pidlManager, m_pidlManager->Copy(ItemAt(i)));
    for (const UniquePidl& item : selected) {
        const ReceiverItemData* data = m_pidlManager->GetData(item.Get());
        if (!data || !IsFileType(data->type)) continue;
        wchar_t name[kPathCapacity] = L"";
        m_pidlManager->GetPath(item.Get(), name, kPathCapacity, true);
        FoundReceiverFile found;
        if (FAILED(FindShownFile(m_folder->EventSourceCollection(), name, found))) continue;
        const HRESULT hr = found.file->Delete();
        if (hr != 0) ShowDeleteError(m_listWindow, hr);
        Refresh();
    }
}

void CCalvexReceiversShellView::OnProperties() {
    const int index = FirstSelected();
    if (index < 0) return;
    LPCITEMIDLIST item = ItemAt(index);
    const ReceiverItemData* data = m_pidlManager->GetData(item);
    if (!data || !IsReceiverType(data->type)) return;
    CRcvDlg sheet(m_viewWindow, item);
    sheet.DoModal();
}

STDMETHODIMP CCalvexReceiversShellView::Refresh() {
    TraceA("CCalvexReceiversShellView::Refresh\r\n");
    ComPtr<IDeviceMgr> manager;
    HRESULT hr = CreateDeviceManager(manager);
    if (FAILED(hr) || !manager) {
        TraceA("CCalvexReceiversShellView::Refresh - access to receiver manager is failed [0x%08X]\r\n",
               static_cast<unsigned>(hr));
        return S_FALSE;
    }
    if (!m_folder || !m_pidlManager || !IsReceiverType(FolderType())) {
        manager->Refresh();
        FillList();
        return S_OK;
    }
    hr = RefreshFiles(manager.Get());
    if (FAILED(hr)) {
        TraceA("CCalvexReceiversShellView::Refresh - get files is failed [0x%08X]\r\n", static_cast<unsigned>(hr));
        return S_OK;
    }
    FillList();
    return S_OK;
}

HRESULT CCalvexReceiversShellView::RefreshFiles(IDeviceMgr* manager) {
    ComPtr<IDispatch> object;
    ComPtr<IReceiversColl> receivers;
    HRESULT hr = GetReceivers(manager, object, receivers);
    const std::wstring lookup =
        ReceiverLookupKey(m_pidlManager->GetItemName(m_pidlManager->GetLastItem(m_folderPidl.Get())).c_str());
    TraceW(L"CCalvexReceiversShellView::Refresh - get files on receiver [%s]\r\n", lookup.c_str());
    if (FAILED(hr)) return hr;
    Bstr key(lookup);
    ComPtr<IDispatch> item;
    ComPtr<IReceiver> receiver;
    ComPtr<IDispatch> files;
    hr = GetReceiverByKey(receivers.Get(), key.Get(), item);
    if (SUCCEEDED(hr)) hr = GetReceiverFiles(item.Get(), receiver, files);
    return hr;
}

STDMETHODIMP CCalvexReceiversShellView::QueryStatus(const GUID* group, ULONG count, OLECMD* commands, OLECMDTEXT*) {
    TraceA("CCalvexReceiversShellView::QueryStatus, pguidCmdGroup = %s\r\n", GroupText(group).c_str());
    if (!IsAcceptedGroup(group)) return OLECMDERR_E_UNKNOWNGROUP;
    if (!commands) return E_POINTER;
    for (ULONG i = 0; i < count; ++i) {
        TraceA("CCalvexReceiversShellView::QueryStatus CMDID=%d\n", static_cast<int>(commands[i].cmdID));
        const ULONG id = commands[i].cmdID;
        commands[i].cmdf = id == OLECMDID_PROPERTIES || id == OLECMDID_COPY || id == OLECMDID_REFRESH
                               ? OLECMDF_SUPPORTED | OLECMDF_ENABLED
                               : 0;
    }
    return S_OK;
}

STDMETHODIMP CCalvexReceiversShellView::Exec(const GUID* group, DWORD id, DWORD option, VARIANT*, VARIANT*) {
    TraceA("CCalvexReceiversShellView::Exec, pguidCmdGroup=%s, nCmdID=%d nCmdExecOpt=%d\r\n", GroupText(group).c_str(),
           static_cast<int>(id), static_cast<int>(option));
    // Every group is executed, the unknown ones too: that is what callers have always seen.
    OnCommand(id);
    return S_OK;
}
