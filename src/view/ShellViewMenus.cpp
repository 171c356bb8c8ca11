// The view's menus: its items merged into the browser's File, Edit and View menus, and the
// right-click menu.
#include <windows.h>
#include <shlobj.h>

#include <string>

#include "module/ModuleState.h"
#include "resource.h"
#include "trace/TraceLog.h"
#include "view/CCalvexReceiversShellView.h"
#include "view/ViewCommands.h"

namespace {
const UINT kAtEnd = static_cast<UINT>(-1);

// pos: a position when byPosition, else the id of the item to insert before; kAtEnd appends.
void InsertItem(HMENU menu, UINT pos, bool byPosition, UINT id, UINT textId, UINT type, UINT state) {
    std::wstring text = LoadModuleString(textId);
    MENUITEMINFOW item = {};
    item.cbSize = sizeof(item);
    item.fMask = MIIM_TYPE | MIIM_ID | MIIM_STATE;
    item.fType = type;
    item.fState = state;
    item.wID = id;
    item.dwTypeData = &text[0];
    if (pos == kAtEnd) {
        pos = static_cast<UINT>(GetMenuItemCount(menu));
        byPosition = true;
    }
    InsertMenuItemW(menu, pos, byPosition, &item);
}

void InsertSeparator(HMENU menu, UINT pos, bool byPosition) {
    MENUITEMINFOW item = {};
    item.cbSize = sizeof(item);
    item.fMask = MIIM_TYPE | MIIM_STATE;
    item.fType = MFT_SEPARATOR;
    item.fState = MFS_GRAYED;
    if (pos == kAtEnd) {
        if (GetMenuItemCount(menu) <= 0) return;  // no leading separator
        pos = static_cast<UINT>(GetMenuItemCount(menu));
        byPosition = true;
    }
    InsertMenuItemW(menu, pos, byPosition, &item);
}

HMENU SubMenuWithId(HMENU menu, UINT id) {
    const int count = GetMenuItemCount(menu);
    for (int i = 0; i < count; ++i) {
        MENUITEMINFOW item = {};
        item.cbSize = sizeof(item);
        item.fMask = MIIM_ID | MIIM_SUBMENU;
        if (GetMenuItemInfoW(menu, static_cast<UINT>(i), TRUE, &item) && item.wID == id && item.hSubMenu)
            return item.hSubMenu;
    }
    return nullptr;
}
}  // namespace

void CCalvexReceiversShellView::UpdateMenu() {
    TraceA("CCalvexReceiversShellView::UpdateMenu\n");
    m_menu = CreateMenu();  // the previous one goes only on deactivation
    if (!m_menu || !m_shellBrowser) return;
    OLEMENUGROUPWIDTHS widths = {{0, 0, 0, 0, 0, 0}};
    m_shellBrowser->InsertMenusSB(m_menu, &widths);
    if (HMENU file = SubMenuWithId(m_menu, FCIDM_MENU_FILE)) AddOpenItems(file, false);
    if (HMENU view = SubMenuWithId(m_menu, FCIDM_MENU_VIEW)) AddViewItems(view, false);
    if (m_activationState == SVUIA_ACTIVATE_FOCUS) {
        if (HMENU edit = SubMenuWithId(m_menu, FCIDM_MENU_EDIT)) {
            for (int i = GetMenuItemCount(edit) - 1; i >= 0; --i) DeleteMenu(edit, static_cast<UINT>(i), MF_BYPOSITION);
            AddCopyItems(edit, false);
        }
    }
    m_shellBrowser->SetMenuSB(m_menu, nullptr, m_viewWindow);
}

void CCalvexReceiversShellView::AddOpenItems(HMENU menu, bool append) {
    const DWORD type = FolderType();
    if (!menu || type == 0) return;
    const UINT selected = HasSelection() ? 0 : MFS_GRAYED;
    InsertSeparator(menu, append ? kAtEnd : 0, true);
    InsertItem(menu, append ? kAtEnd : 0, true, ViewCommandOpen, m_commDlgBrowser ? IDS_MENU_SELECT : IDS_MENU_OPEN,
               MFT_STRING, MFS_DEFAULT | selected);
    // Properties goes after the separator, Delete before it: both places are meant.
    if (IsRootType(type))
        InsertItem(menu, append ? kAtEnd : 2, true, ViewCommandProperties, IDS_PROPERTIES, MFT_STRING, selected);
    else if (IsReceiverType(type))
        InsertItem(menu, append ? kAtEnd : 1, true, ViewCommandDelete, IDS_MENU_DELETE, MFT_STRING, selected);
}

void CCalvexReceiversShellView::AddCopyItems(HMENU menu, bool append) {
    if (!menu || !IsReceiverType(FolderType())) return;
    const UINT selected = HasSelection() ? 0 : MFS_GRAYED;
    InsertSeparator(menu, append ? kAtEnd : FCIDM_MENU_EDIT, false);
    InsertItem(menu, append ? kAtEnd : FCIDM_MENU_EDIT, false, ViewCommandCopy, IDS_MENU_COPY, MFT_STRING, selected);
}

void CCalvexReceiversShellView::AddViewItems(HMENU menu, bool append) {
    if (!menu || FolderType() == 0) return;
    if (append) {
        InsertSeparator(menu, kAtEnd, true);
        InsertItem(menu, kAtEnd, true, ViewCommandRefresh, IDS_MENU_REFRESH, MFT_STRING, 0);
    } else {
        InsertSeparator(menu, FCIDM_MENU_VIEW_SEP_OPTIONS, false);
    }
    const UINT titles[] = {IDS_MENU_LARGE_ICONS, IDS_MENU_SMALL_ICONS, IDS_MENU_LIST, IDS_MENU_DETAILS};
    for (UINT i = 0; i < 4; ++i) {
        const UINT state = m_folderSettings.ViewMode == FVM_ICON + i ? MFS_CHECKED : 0;
        InsertItem(menu, append ? kAtEnd : FCIDM_MENU_VIEW_SEP_OPTIONS, false, ViewCommandLargeIcons + i, titles[i],
                   MFT_STRING | MFT_RADIOCHECK, state);
    }
}

HMENU CCalvexReceiversShellView::BuildContextMenu() {
    const DWORD type = FolderType();
    if (!m_listWindow || !IsWindowEnabled(m_listWindow) || type == 0) return nullptr;
    HMENU menu = CreatePopupMenu();
    if (!menu) return nullptr;
    if (HasSelection()) {
        AddOpenItems(menu, true);
        AddCopyItems(menu, true);
    } else {
        if (IsRootType(type)) AddOpenItems(menu, true);
        AddCopyItems(menu, true);
        AddViewItems(menu, true);
    }
    return menu;
}

void CCalvexReceiversShellView::OnContextMenu(int x, int y) {
    TraceA("CCalvexReceiversShellView::OnContextMenu\n");
    UniqueMenu menu(BuildContextMenu());
    if (!menu) return;
    LVHITTESTINFO hit = {};
    hit.pt = {x, y};
    ScreenToClient(m_listWindow, &hit.pt);
    SendMessageW(m_listWindow, LVM_HITTEST, 0, reinterpret_cast<LPARAM>(&hit));  // result unused
    TrackPopupMenu(menu.Get(), TPM_RIGHTBUTTON, x, y, 0, m_viewWindow, nullptr);
}
