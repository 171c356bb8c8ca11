// The searching dialog shown over the list while receivers are being detected.
#include <windows.h>

#include <string>

#include "module/ModuleState.h"
#include "resource.h"
#include "trace/TraceLog.h"
#include "view/CCalvexReceiversShellView.h"

namespace {
// Moves the four controls without resizing them so that the text is centred and the others
// keep their places around it.
void CentreControls(HWND dialog, int width, int height) {
    HWND text = GetDlgItem(dialog, IDC_FIND_TEXT);
    if (!text) return;
    RECT textRect;
    GetWindowRect(text, &textRect);
    MapWindowPoints(nullptr, dialog, reinterpret_cast<POINT*>(&textRect), 2);
    const int dx = width / 2 - (textRect.right - textRect.left) / 2 - textRect.left;
    const int dy = height / 2 - (textRect.bottom - textRect.top) / 2 - textRect.top;
    const int ids[] = {IDC_FIND_ANIMATION, IDC_FIND_STATIC, IDC_FIND_TEXT, IDCANCEL};
    for (int id : ids) {
        HWND control = GetDlgItem(dialog, id);
        if (!control) continue;
        RECT rect;
        GetWindowRect(control, &rect);
        MapWindowPoints(nullptr, dialog, reinterpret_cast<POINT*>(&rect), 2);
        SetWindowPos(control, nullptr, rect.left + dx, rect.top + dy, 0, 0, SWP_NOSIZE | SWP_NOZORDER | SWP_NOACTIVATE);
    }
}
}  // namespace

void CCalvexReceiversShellView::ShowFindAnimation() {
    TraceA("CCalvexReceiversShellView::ShowFindAnimation\n");
    HideFindAnimation();
    m_findDialog = CreateDialogParamW(ResourceInstance(), MAKEINTRESOURCEW(IDD_FIND), m_listWindow, FindDialogProc, 0);
    if (!m_findDialog) return;
    m_findAnimation = GetDlgItem(m_findDialog, IDC_FIND_ANIMATION);
    ShowWindow(m_findDialog, SW_SHOW);
}

void CCalvexReceiversShellView::HideFindAnimation() {
    TraceA("CCalvexReceiversShellView::HideFindAnimation dialog=%x\n", static_cast<unsigned>(reinterpret_cast<UINT_PTR>(m_findDialog)));
    if (m_findDialog && IsWindow(m_findDialog)) {
        TraceA("EndDialog dialog=%x\n", static_cast<unsigned>(reinterpret_cast<UINT_PTR>(m_findDialog)));
        EndDialog(m_findDialog, 0);
        // A modeless dialog is only hidden by EndDialog; it must not outlive its view.
        DestroyWindow(m_findDialog);
    }
    m_findDialog = nullptr;
    m_findAnimation = nullptr;
}

INT_PTR CALLBACK CCalvexReceiversShellView::FindDialogProc(HWND dialog, UINT message, WPARAM wParam, LPARAM lParam) {
    switch (message) {
    case WM_INITDIALOG:
        SetDlgItemTextW(dialog, IDC_FIND_TEXT, LoadModuleString(IDS_DETECTING).c_str());
        SetDlgItemTextW(dialog, IDCANCEL, LoadModuleString(IDS_CANCEL).c_str());
        return TRUE;
    case WM_SIZE:
        CentreControls(dialog, LOWORD(lParam), HIWORD(lParam));
        return TRUE;
    case WM_COMMAND:
        if (LOWORD(wParam) == IDCANCEL) {
            EndDialog(dialog, IDCANCEL);
            return TRUE;
        }
        return FALSE;
    default:
        return FALSE;
    }
}
