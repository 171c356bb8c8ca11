#include "view/CShellViewListWindow.h"

#include <commctrl.h>

bool CShellViewListWindow::Subclass(HWND list) {
    Unsubclass();
    if (!list || !SetWindowSubclass(list, SubclassProc, 1, reinterpret_cast<DWORD_PTR>(this))) return false;
    m_window = list;
    return true;
}

void CShellViewListWindow::Unsubclass() {
    if (m_window && IsWindow(m_window)) RemoveWindowSubclass(m_window, SubclassProc, 1);
    m_window = nullptr;
}

LRESULT CALLBACK CShellViewListWindow::SubclassProc(HWND hwnd, UINT message, WPARAM wParam, LPARAM lParam, UINT_PTR,
                                                    DWORD_PTR) {
    switch (message) {
    case WM_GETDLGCODE:
        return DefSubclassProc(hwnd, message, wParam, lParam) | DLGC_WANTALLKEYS;
    case WM_COMMAND:
        // A command without a control window came from a menu or an accelerator.
        if (!lParam || !IsWindow(reinterpret_cast<HWND>(lParam))) return 0;
        break;
    default:
        break;
    }
    return DefSubclassProc(hwnd, message, wParam, lParam);
}
