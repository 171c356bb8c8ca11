#pragma once
// Follows the product's download dialog while it runs modally on this thread: a thread timer,
// dispatched by the dialog's own message loop, reads the dialog's progress bar. The dialog's
// window is also what a Ctrl+C cancels, from the console's handler thread.
#include <windows.h>

#include <atomic>
#include <functional>

class DownloadDialogWatch {
public:
    using Tick = std::function<void(int percent)>;

    explicit DownloadDialogWatch(Tick tick);
    ~DownloadDialogWatch();
    DownloadDialogWatch(const DownloadDialogWatch&) = delete;
    DownloadDialogWatch& operator=(const DownloadDialogWatch&) = delete;

    // Presses the running dialog's Cancel, as a person would; false when none is showing.
    static bool CancelRunningDialog();

private:
    static void CALLBACK OnTimer(HWND, UINT, UINT_PTR, DWORD);

    static DownloadDialogWatch* s_current;
    static std::atomic<HWND> s_dialog;
    Tick m_tick;
    UINT_PTR m_timer;
};
