#include "SessionEndWindow.h"

namespace {
const wchar_t kClassName[] = L"calvex-fetch session end";
}

SessionEndWindow::SessionEndWindow(Handler handler)
    : m_handler(std::move(handler)), m_ready(CreateEventW(nullptr, TRUE, FALSE, nullptr)) {
    m_thread.Reset(CreateThread(nullptr, 0, Run, this, 0, nullptr));
    if (m_thread) WaitForSingleObject(m_ready.Get(), 5000);
}

SessionEndWindow::~SessionEndWindow() {
    if (!m_thread) return;
    if (m_window) PostMessageW(m_window, WM_CLOSE, 0, 0);
    WaitForSingleObject(m_thread.Get(), 5000);
}

DWORD WINAPI SessionEndWindow::Run(void* self) {
    auto* owner = static_cast<SessionEndWindow*>(self);
    WNDCLASSW windowClass = {};
    windowClass.lpfnWndProc = WindowProc;
    windowClass.hInstance = GetModuleHandleW(nullptr);
    windowClass.lpszClassName = kClassName;
    RegisterClassW(&windowClass);
    // Never shown: a window that is not visible still gets the session's messages.
    owner->m_window = CreateWindowExW(WS_EX_TOOLWINDOW, kClassName, L"calvex-fetch", WS_POPUP, 0, 0, 0, 0, nullptr,
                                      nullptr, windowClass.hInstance, nullptr);
    if (owner->m_window) SetWindowLongPtrW(owner->m_window, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(owner));
    SetEvent(owner->m_ready.Get());
    MSG message;
    while (owner->m_window && GetMessageW(&message, nullptr, 0, 0) > 0) DispatchMessageW(&message);
    return 0;
}

LRESULT CALLBACK SessionEndWindow::WindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
    auto* owner = reinterpret_cast<SessionEndWindow*>(GetWindowLongPtrW(window, GWLP_USERDATA));
    switch (message) {
    case WM_QUERYENDSESSION:
        return TRUE;  // never in the way of a logoff: the download in progress is discarded
    case WM_ENDSESSION:
        if (wParam && owner) owner->m_handler();
        return 0;
    case WM_CLOSE:
        DestroyWindow(window);
        return 0;
    case WM_DESTROY:
        PostQuitMessage(0);
        return 0;
    default:
        return DefWindowProcW(window, message, wParam, lParam);
    }
}
