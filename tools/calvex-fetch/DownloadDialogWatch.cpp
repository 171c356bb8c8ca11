#include "DownloadDialogWatch.h"

#include <commctrl.h>

#include "resources/resource.h"

namespace {
constexpr UINT TickMs = 100;

BOOL CALLBACK FindDialog(HWND window, LPARAM found) {
    if (!GetDlgItem(window, IDC_PROGRESS_BAR) || !IsWindowVisible(window)) return TRUE;
    *reinterpret_cast<HWND*>(found) = window;
    return FALSE;
}
}  // namespace

DownloadDialogWatch* DownloadDialogWatch::s_current = nullptr;
std::atomic<HWND> DownloadDialogWatch::s_dialog{nullptr};

DownloadDialogWatch::DownloadDialogWatch(Tick tick) : m_tick(std::move(tick)) {
    s_current = this;
    m_timer = SetTimer(nullptr, 0, TickMs, OnTimer);
}

DownloadDialogWatch::~DownloadDialogWatch() {
    KillTimer(nullptr, m_timer);
    s_current = nullptr;
    s_dialog = nullptr;
}

void CALLBACK DownloadDialogWatch::OnTimer(HWND, UINT, UINT_PTR, DWORD) {
    HWND dialog = nullptr;
    EnumThreadWindows(GetCurrentThreadId(), FindDialog, reinterpret_cast<LPARAM>(&dialog));
    s_dialog = dialog;
    if (!dialog || !s_current) return;
    s_current->m_tick(static_cast<int>(SendDlgItemMessageW(dialog, IDC_PROGRESS_BAR, PBM_GETPOS, 0, 0)));
}

bool DownloadDialogWatch::CancelRunningDialog() {
    HWND dialog = s_dialog;
    return dialog && PostMessageW(dialog, WM_COMMAND, IDCANCEL, 0);
}
