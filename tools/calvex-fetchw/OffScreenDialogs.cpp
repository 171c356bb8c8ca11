#include "OffScreenDialogs.h"

#include <commctrl.h>

namespace {
constexpr int kOffScreen = -32000;  // where Windows itself parks minimized windows
constexpr UINT_PTR kSubclassId = 1;

bool IsDialogWindow(HWND window) {
    wchar_t className[16] = L"";
    GetClassNameW(window, className, 16);
    return lstrcmpW(className, L"#32770") == 0;
}

// Every move, size or show of the dialog goes through here: it keeps its size and is put off
// the screen, without taking the focus from what the user is doing.
LRESULT CALLBACK KeepOffScreen(HWND window, UINT message, WPARAM wParam, LPARAM lParam, UINT_PTR, DWORD_PTR) {
    if (message == WM_WINDOWPOSCHANGING) {
        auto* position = reinterpret_cast<WINDOWPOS*>(lParam);
        position->x = position->y = kOffScreen;
        position->flags = (position->flags & ~SWP_NOMOVE) | SWP_NOACTIVATE;
    } else if (message == WM_NCDESTROY) {
        RemoveWindowSubclass(window, KeepOffScreen, kSubclassId);
    }
    return DefSubclassProc(window, message, wParam, lParam);
}
}  // namespace

OffScreenDialogs::OffScreenDialogs() : m_hook(SetWindowsHookExW(WH_CBT, OnCbt, nullptr, GetCurrentThreadId())) {}

OffScreenDialogs::~OffScreenDialogs() {
    if (m_hook) UnhookWindowsHookEx(m_hook);
}

LRESULT CALLBACK OffScreenDialogs::OnCbt(int code, WPARAM wParam, LPARAM lParam) {
    const HWND window = reinterpret_cast<HWND>(wParam);
    if (code == HCBT_CREATEWND && IsDialogWindow(window)) {
        // A tool window has no taskbar button and no place in Alt+Tab.
        const LONG_PTR style = GetWindowLongPtrW(window, GWL_EXSTYLE);
        SetWindowLongPtrW(window, GWL_EXSTYLE, (style & ~WS_EX_APPWINDOW) | WS_EX_TOOLWINDOW);
        SetWindowSubclass(window, KeepOffScreen, kSubclassId, 0);
    }
    return CallNextHookEx(nullptr, code, wParam, lParam);
}
