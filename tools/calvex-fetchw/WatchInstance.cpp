#include "WatchInstance.h"

#include <windows.h>

#include "TrayIcon.h"

namespace {
constexpr int kFindTries = 50;  // 5 s: a watch just started makes its window a moment later
}

std::wstring WatchInstanceName() {
    wchar_t user[256] = L"";
    DWORD length = 256;
    GetUserNameW(user, &length);
    std::wstring name = L"calvex-fetchw-watch-" + std::wstring(user);
    for (wchar_t& c : name) if (c == L'\\') c = L'_';  // a mutex name holds no "\" past its namespace
    return L"Local\\" + name;
}

bool WatchInstance::Claim() {
    m_mutex.Reset(CreateMutexW(nullptr, FALSE, WatchInstanceName().c_str()));
    if (m_mutex && GetLastError() != ERROR_ALREADY_EXISTS) return true;
    m_mutex.Reset();
    return false;
}

bool WatchInstance::IsRunning() {
    UniqueHandle mutex(OpenMutexW(SYNCHRONIZE, FALSE, WatchInstanceName().c_str()));
    return static_cast<bool>(mutex);
}

bool WatchInstance::BringRunningForward() {
    for (int i = 0; i < kFindTries; ++i) {
        if (const HWND window = TrayIcon::FindRunningWatch()) {
            // The watch may put its window in front of ours.
            DWORD process = 0;
            GetWindowThreadProcessId(window, &process);
            AllowSetForegroundWindow(process);
            return PostMessageW(window, TrayIcon::ShowSettingsMessage(), 0, 0) != FALSE;
        }
        Sleep(100);
    }
    return false;
}
