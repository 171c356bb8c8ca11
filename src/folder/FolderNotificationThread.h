#pragma once
// A folder's notification thread with what it shares: the views registered with the folder
// and the update timer that the folder's events arm. When the timer runs out, the thread
// posts the view notification message to every registered view. It touches nothing of the
// folder but this.
#include <windows.h>

#include <vector>

#include "com/CriticalSection.h"
#include "com/Handles.h"

class FolderNotificationThread {
public:
    FolderNotificationThread() = default;
    ~FolderNotificationThread();
    FolderNotificationThread(const FolderNotificationThread&) = delete;
    FolderNotificationThread& operator=(const FolderNotificationThread&) = delete;

    // Makes the timer and the stop event and starts the thread; nothing runs if either fails.
    void Start();
    // Once, five seconds from now: a new event within them moves the view message on.
    void ArmUpdateTimer();
    void CancelUpdateTimer();
    // The folder's teardown in its two steps: first tell the thread (and stop the timer),
    // later wait for it without limit and close everything.
    void RequestStop();
    void WaitStopped();

    // A window is listed once; one that cannot be added for lack of memory is left out.
    void AddViewWindow(HWND hwnd);
    void RemoveViewWindow(HWND hwnd);
    size_t ViewWindowCount();

private:
    static DWORD WINAPI ThreadProc(void* self);
    DWORD ThreadFunc();
    void RemoveViewWindowLocked(HWND hwnd);

    std::vector<HWND> m_viewWindows;
    CriticalSection m_viewWindowsLock;  // recursive: adding removes first
    UniqueHandle m_updateTimer;
    UniqueHandle m_stopEvent;
    UniqueHandle m_thread;
};
