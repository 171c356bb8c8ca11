// The view's list control: creation, columns, filling, cell texts and icons, sorting,
// mode switches and the start of a drag.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>

#include <string>

#include "module/ModuleState.h"
#include "resource.h"
#include "trace/TraceLog.h"
#include "transfer/CCalvexReceiversDataObject.h"
#include "view/CCalvexReceiversShellView.h"

namespace {
const DWORD kListCommonStyle = WS_CHILD | WS_VISIBLE | WS_TABSTOP | LVS_SHAREIMAGELISTS | LVS_AUTOARRANGE;
const DWORD kSingleClickStyle = LVS_EX_TRACKSELECT | LVS_EX_ONECLICKACTIVATE | LVS_EX_UNDERLINEHOT;

DWORD ModeStyle(UINT mode) {
    switch (mode) {
    case FVM_SMALLICON: return LVS_SMALLICON;
    case FVM_LIST: return LVS_LIST;
    case FVM_DETAILS: return LVS_REPORT;
    default: return LVS_ICON;
    }
}

struct SortRequest {
    IReceiversShellFolderImpl* folder;
    LPARAM param;
};

bool InsertColumn(HWND list, int index, UINT title, int width) {
    std::wstring text = LoadModuleString(title);
    LVCOLUMNW column = {};
    column.mask = LVCF_FMT | LVCF_TEXT | LVCF_WIDTH | LVCF_SUBITEM;
    column.fmt = LVCFMT_LEFT;
    column.cx = width;
    column.pszText = &text[0];
    column.iSubItem = index;
    return SendMessageW(list, LVM_INSERTCOLUMNW, index, reinterpret_cast<LPARAM>(&column)) == index;
}

void CopyText(const std::wstring& text, NMLVDISPINFOW* info) {
    if (!info->item.pszText || info->item.cchTextMax <= 0) return;
    lstrcpynW(info->item.pszText, text.c_str(), info->item.cchTextMax);
}
}  // namespace

bool CCalvexReceiversShellView::CreateList() {
    TraceA("CCalvexReceiversShellView::CreateList\n");
    if (m_folderSettings.ViewMode < FVM_ICON || m_folderSettings.ViewMode > FVM_DETAILS)
        m_folderSettings.ViewMode = FVM_ICON;
    m_listWindow = CreateWindowExW(WS_EX_CLIENTEDGE, WC_LISTVIEWW, nullptr,
                                   kListCommonStyle | ModeStyle(m_folderSettings.ViewMode), 0, 0, 0, 0, m_viewWindow,
                                   reinterpret_cast<HMENU>(static_cast<UINT_PTR>(kListId)), ModuleInstance(), nullptr);
    if (FolderType() == 0 || !m_listWindow) return false;
    ApplyClickSettings();
    m_listControl.Subclass(m_listWindow);
    return true;
}

void CCalvexReceiversShellView::ApplyClickSettings() {
    if (!m_listWindow) return;
    SHELLFLAGSTATE state = {};
    state.fWin95Classic = TRUE;  // no SHGetSettings means classic behaviour
    HMODULE shell = LoadLibraryW(L"shell32.dll");
    if (shell) {
        using GetSettings = void(WINAPI*)(SHELLFLAGSTATE*, DWORD);
        auto get = reinterpret_cast<GetSettings>(reinterpret_cast<void*>(GetProcAddress(shell, "SHGetSettings")));
        if (get) get(&state, SSF_DOUBLECLICKINWEBVIEW | SSF_WIN95CLASSIC);
        FreeLibrary(shell);
    }
    const DWORD extended = !state.fWin95Classic && !state.fDoubleClickInWebView ? kSingleClickStyle : 0;
    SendMessageW(m_listWindow, LVM_SETEXTENDEDLISTVIEWSTYLE, 0, extended);
}

bool CCalvexReceiversShellView::InitColumns() {
    TraceA("CCalvexReceiversShellView::InitColumns\n");
    SendMessageW(m_listWindow, LVM_DELETEALLITEMS, 0, 0);
    while (SendMessageW(m_listWindow, LVM_DELETECOLUMN, 0, 0)) {
    }
    const DWORD type = FolderType();
    if (type == 0) return false;
    if (m_folderSettings.ViewMode != FVM_DETAILS) {
        if (m_folderSettings.ViewMode == FVM_ICON)
            SendMessageW(m_listWindow, LVM_SETIMAGELIST, LVSIL_NORMAL, reinterpret_cast<LPARAM>(LargeImageList()));
        else
            SendMessageW(m_listWindow, LVM_SETIMAGELIST, LVSIL_SMALL, reinterpret_cast<LPARAM>(SmallImageList()));
        return true;
    }
    SendMessageW(m_listWindow, LVM_SETIMAGELIST, LVSIL_SMALL, reinterpret_cast<LPARAM>(SmallImageList()));
    const DisplayState& display = Display();
    bool ok = InsertColumn(m_listWindow, 0, IDS_COLUMN_NAME, display.NameColumnWidth);
    if (IsRootType(type)) {
        ok = ok && InsertColumn(m_listWindow, 1, IDS_COLUMN_SERIAL, display.NameColumnWidth) &&
             InsertColumn(m_listWindow, 2, IDS_COLUMN_MODEL, display.NameColumnWidth) &&
             InsertColumn(m_listWindow, 3, IDS_COLUMN_PORT, display.NameColumnWidth);
    } else if (IsReceiverType(type)) {
        ok = ok && InsertColumn(m_listWindow, 1, IDS_COLUMN_SIZE, display.NameColumnWidth) &&
             InsertColumn(m_listWindow, 2, IDS_COLUMN_TIME, display.SecondColumnWidth);
    }
    return ok;
}

void CCalvexReceiversShellView::FillList() {
    TraceA("CCalvexReceiversShellView::FillList\n");
    if (!m_folder || !m_listWindow) return;
    // A change picked up now must not come again through the folder's timer.
    m_folder->EventReceived();
    SendMessageW(m_listWindow, LVM_DELETEALLITEMS, 0, 0);
    ComPtr<IEnumIDList> enumerator;
    m_folder->EnumObjects(m_viewWindow, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &enumerator);
    OnEnumIdList(enumerator.Detach());
}

void CCalvexReceiversShellView::OnEnumIdList(IEnumIDList* enumerator) {
    TraceA("CCalvexReceiversShellView::OnEnumIdList [%p]\r\n", enumerator);
    if (!enumerator) return;
    HideFindAnimation();
    HCURSOR previous = SetCursor(LoadCursorW(nullptr, IDC_WAIT));
    SendMessageW(m_listWindow, WM_SETREDRAW, FALSE, 0);
    const DWORD type = FolderType();
    // Left as it is on purpose: redrawing off, the wait cursor shown, the enumerator held.
    if (type == 0) return;
    LPITEMIDLIST item = nullptr;
    while (enumerator->Next(1, &item, nullptr) == S_OK && item) {
        UniquePidl owned(m_malloc.Get(), item);
        item = nullptr;
        if (IsReceiverType(type) && m_commDlgBrowser &&
            m_commDlgBrowser->IncludeObject(this, owned.Get()) == S_FALSE)
            continue;
        AppendItem(owned.Get());
    }
    SortList(0);
    SendMessageW(m_listWindow, WM_SETREDRAW, TRUE, 0);
    InvalidateRect(m_listWindow, nullptr, TRUE);
    UpdateWindow(m_listWindow);
    SetCursor(previous);
    enumerator->Release();
    TraceA("CCalvexReceiversShellView::OnEnumIdList - OK\r\n");
}

void CCalvexReceiversShellView::AppendItem(LPCITEMIDLIST item) {
    LVITEMW entry = {};
    entry.mask = LVIF_TEXT | LVIF_IMAGE | LVIF_PARAM;
    entry.iItem = static_cast<int>(SendMessageW(m_listWindow, LVM_GETITEMCOUNT, 0, 0));
    entry.pszText = LPSTR_TEXTCALLBACKW;
    entry.iImage = I_IMAGECALLBACK;
    LPITEMIDLIST copy = m_pidlManager->Copy(item);
    entry.lParam = reinterpret_cast<LPARAM>(copy);
    if (SendMessageW(m_listWindow, LVM_INSERTITEMW, 0, reinterpret_cast<LPARAM>(&entry)) < 0)
        m_pidlManager->Delete(copy);
}

void CCalvexReceiversShellView::OnChangeNotify(WPARAM wParam, LPARAM lParam) {
    // Whatever changed, the whole level is read again.
    TraceA("CCalvexReceiversShellView::OnChangeNotify [W:%u] [L:%u]\r\n", static_cast<UINT>(wParam),
           static_cast<UINT>(lParam));
    FillList();
}

void CCalvexReceiversShellView::SortList(LPARAM param) {
    if (!m_folder) return;
    SortRequest request = {m_folder.Get(), param};
    SendMessageW(m_listWindow, LVM_SORTITEMS, reinterpret_cast<WPARAM>(&request),
                 reinterpret_cast<LPARAM>(CompareItems));
}

int CALLBACK CCalvexReceiversShellView::CompareItems(LPARAM item1, LPARAM item2, LPARAM request) {
    auto* sort = reinterpret_cast<SortRequest*>(request);
    return static_cast<int>(sort->folder->CompareIDs(sort->param, reinterpret_cast<LPCITEMIDLIST>(item1),
                                                      reinterpret_cast<LPCITEMIDLIST>(item2)));
}

LRESULT CCalvexReceiversShellView::OnNotify(NMHDR* header) {
    if (!header) return 0;
    switch (header->code) {
    case LVN_DELETEITEM:
        m_pidlManager->Delete(reinterpret_cast<LPITEMIDLIST>(reinterpret_cast<NMLISTVIEW*>(header)->lParam));
        return 0;
    case LVN_ITEMCHANGED:
        if (m_commDlgBrowser) m_commDlgBrowser->OnStateChange(this, CDBOSC_SELCHANGE);
        return 0;
    case NM_SETFOCUS:
        if (m_shellBrowser) m_shellBrowser->OnViewWindowActive(this);
        OnActivate(SVUIA_ACTIVATE_FOCUS);
        return 0;
    case NM_KILLFOCUS:
        OnDeactivate();
        return 0;
    case LVN_ITEMACTIVATE:
        OnCommand(1289);
        return 0;
    case LVN_BEGINDRAG:
        OnBeginDrag();
        return 0;
    case HDN_ENDTRACKW: {
        // The second column's width is what "Time" gets; every other column takes the first's.
        DisplayState& display = Display();
        display.NameColumnWidth = static_cast<LONG>(SendMessageW(m_listWindow, LVM_GETCOLUMNWIDTH, 0, 0));
        display.SecondColumnWidth = static_cast<LONG>(SendMessageW(m_listWindow, LVM_GETCOLUMNWIDTH, 1, 0));
        return 0;
    }
    case LVN_GETDISPINFOW:
        OnGetDispInfo(reinterpret_cast<NMLVDISPINFOW*>(header));
        return 0;
    case LVN_COLUMNCLICK:
        OnColumnClick(reinterpret_cast<NMLISTVIEW*>(header)->iSubItem);
        return 0;
    default:
        return 0;
    }
}

void CCalvexReceiversShellView::OnGetDispInfo(NMLVDISPINFOW* info) {
    auto item = reinterpret_cast<LPCITEMIDLIST>(info->item.lParam);
    if (!m_folder) return;
    if ((info->item.mask & LVIF_TEXT) && info->item.iSubItem == 0 && item) {
        STRRET name = {};
        if (SUCCEEDED(m_folder->GetDisplayNameOf(item, SHGDN_INFOLDER, &name)) && name.uType == STRRET_WSTR) {
            CopyText(name.pOleStr ? name.pOleStr : L"", info);
            m_malloc->Free(name.pOleStr);
        }
    } else if (info->item.mask & LVIF_TEXT) {
        wchar_t text[kPathCapacity] = L"";
        if (item) m_pidlManager->GetItemText(item, info->item.iSubItem, text, kPathCapacity);
        CopyText(text, info);
    }
    if ((info->item.mask & LVIF_IMAGE) && info->item.iSubItem == 0 && item) {
        ComPtr<IExtractIconW> extract;
        LPCITEMIDLIST items[1] = {item};
        if (SUCCEEDED(m_folder->GetUIObjectOf(m_viewWindow, 1, items, IID_IExtractIconW, nullptr, extract.PutVoid()))) {
            wchar_t file[MAX_PATH] = L"";
            int index = 0;
            UINT flags = 0;
            if (SUCCEEDED(extract->GetIconLocation(GIL_FORSHELL, file, MAX_PATH, &index, &flags)))
                info->item.iImage = index;
        }
    }
}

void CCalvexReceiversShellView::OnColumnClick(int column) {
    DisplayState& display = Display();
    if (column + 1 == display.SortColumn) display.SortDirection = -display.SortDirection;
    display.SortColumn = column + 1;
    SortList(display.SortDirection * display.SortColumn);
}

void CCalvexReceiversShellView::SwitchMode(UINT command) {
    const UINT mode = command - 1283 + FVM_ICON;
    m_folderSettings.ViewMode = mode;
    const DWORD style = kListCommonStyle | ModeStyle(mode);
    if (static_cast<DWORD>(GetWindowLongW(m_listWindow, GWL_STYLE)) != style) {
        SetWindowLongW(m_listWindow, GWL_STYLE, static_cast<LONG>(style));
        SetWindowPos(m_listWindow, nullptr, 0, 0, 0, 0,
                     SWP_NOSIZE | SWP_NOMOVE | SWP_NOZORDER | SWP_NOACTIVATE | SWP_SHOWWINDOW);
    }
    switch (mode) {
    case FVM_ICON:
        SendMessageW(m_listWindow, LVM_SETIMAGELIST, LVSIL_NORMAL, reinterpret_cast<LPARAM>(LargeImageList()));
        SendMessageW(m_listWindow, LVM_ARRANGE, LVA_SNAPTOGRID, 0);
        break;
    case FVM_SMALLICON:
        SendMessageW(m_listWindow, LVM_SETIMAGELIST, LVSIL_SMALL, reinterpret_cast<LPARAM>(SmallImageList()));
        SendMessageW(m_listWindow, LVM_ARRANGE, LVA_SNAPTOGRID, 0);
        break;
    case FVM_LIST:
        SendMessageW(m_listWindow, LVM_SETIMAGELIST, LVSIL_SMALL, reinterpret_cast<LPARAM>(SmallImageList()));
        break;
    default:
        // Only details reads the items again.
        if (InitColumns()) FillList();
        break;
    }
    UpdateMenu();
}

void CCalvexReceiversShellView::OnBeginDrag() {
    if (!IsReceiverType(FolderType())) return;
    ComPtr<IDataObject> data;
    if (FAILED(MakeDataObject(&data))) return;
    int last = -1;
    for (int i = FirstSelected(); i >= 0;
         i = static_cast<int>(SendMessageW(m_listWindow, LVM_GETNEXTITEM, i, LVNI_SELECTED)))
        last = i;
    POINT corner = {0, 0};
    m_dragImageList = reinterpret_cast<HIMAGELIST>(
        SendMessageW(m_listWindow, LVM_CREATEDRAGIMAGE, last, reinterpret_cast<LPARAM>(&corner)));
    ClientToScreen(m_listWindow, &corner);
    m_dragImageOrigin = corner;
    POINT cursor = {0, 0};
    GetCursorPos(&cursor);
    POINT hotSpot = {cursor.x - corner.x, cursor.y - corner.y};
    auto* object = static_cast<CCalvexReceiversDataObject*>(data.Get());
    object->SetDragImage(m_dragImageList, m_listWindow, hotSpot);
    m_dragImageList = nullptr;  // the data object destroys it
    ComPtr<IDropSource> source;
    data.QueryTo(IID_IDropSource, source.PutVoid());
    DWORD effect = DROPEFFECT_NONE;
    TraceA("DoDragDrop dwEffect=%d, pDropSource=%p, pDataObject=%p\n", effect, source.Get(), data.Get());
    DoDragDrop(data.Get(), source.Get(), DROPEFFECT_COPY, &effect);
}
