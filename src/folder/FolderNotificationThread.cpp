#include "folder/FolderNotificationThread.h"

#include <algorithm>
#include <new>

#include "trace/TraceLog.h"

namespace {
const LONGLONG kUpdateDelay = 50000000;  // 5 s in units of 100 ns
}  // namespace

FolderNotificationThread::~FolderNotificationThread() {
    RequestStop();
    WaitStopped();
}

void FolderNotificationThread::Start() {
    m_updateTimer.Reset(CreateWaitableTimerW(nullptr, FALSE, nullptr));
    m_stopEvent.Reset(CreateEventW(nullptr, FALSE, FALSE, nullptr));
    if (m_updateTimer && m_stopEvent) m_thread.Reset(CreateThread(nullptr, 0, ThreadProc, this, 0, nullptr));
}

void FolderNotificationThread::ArmUpdateTimer() {
    FILETIME now;
    GetSystemTimeAsFileTime(&now);
    LARGE_INTEGER due;
    due.LowPart = now.dwLowDateTime;
    due.HighPart = static_cast<LONG>(now.dwHighDateTime);
    due.QuadPart += kUpdateDelay;  // absolute, no period
    if (m_updateTimer) SetWaitableTimer(m_updateTimer.Get(), &due, 0, nullptr, nullptr, FALSE);
}

void FolderNotificationThread::CancelUpdateTimer() {
    if (m_updateTimer) CancelWaitableTimer(m_updateTimer.Get());
}

void FolderNotificationThread::RequestStop() {
    CancelUpdateTimer();
    if (m_stopEvent) SetEvent(m_stopEvent.Get());
}

void FolderNotificationThread::WaitStopped() {
    if (m_thread) WaitForSingleObject(m_thread.Get(), INFINITE);
    m_thread.Reset();
    m_updateTimer.Reset();
    m_stopEvent.Reset();
    m_viewWindows.clear();
}

void FolderNotificationThread::AddViewWindow(HWND hwnd) {
    CriticalSectionLock lock(m_viewWindowsLock);
    RemoveViewWindowLocked(hwnd);
    const size_t count = m_viewWindows.size();
    if (count == m_viewWindows.capacity()) {
        const size_t capacity = count == 0 ? 1 : count * 2;
        if (capacity > 0x0FFFFFFF || (count & 0x40000000)) return;
        try {
            m_viewWindows.reserve(capacity);
        } catch (const std::bad_alloc&) {
            return;
        }
    }
    m_viewWindows.push_back(hwnd);
}

void FolderNotificationThread::RemoveViewWindow(HWND hwnd) {
    CriticalSectionLock lock(m_viewWindowsLock);
    RemoveViewWindowLocked(hwnd);
}

void FolderNotificationThread::RemoveViewWindowLocked(HWND hwnd) {
    auto found = std::find(m_viewWindows.begin(), m_viewWindows.end(), hwnd);
    if (found != m_viewWindows.end()) m_viewWindows.erase(found);
}

size_t FolderNotificationThread::ViewWindowCount() {
    CriticalSectionLock lock(m_viewWindowsLock);
    return m_viewWindows.size();
}

DWORD WINAPI FolderNotificationThread::ThreadProc(void* self) {
    return static_cast<FolderNotificationThread*>(self)->ThreadFunc();
}

DWORD FolderNotificationThread::ThreadFunc() {
    const HANDLE handles[] = {m_stopEvent.Get(), m_updateTimer.Get()};
    for (;;) {
        const DWORD result = WaitForMultipleObjects(2, handles, FALSE, INFINITE);
        if (result == WAIT_OBJECT_0) return 0;
        if (result != WAIT_OBJECT_0 + 1) {
            TraceA("IReceiversShellFolderImpl::ThreadFunc - dwRes is %u (error: %u)\r\n", result, GetLastError());
            continue;
        }
        TraceA("IReceiversShellFolderImpl::ThreadFunc - direct injection for notify message are used\r\n");
        const UINT message = RegisterWindowMessageW(L"CCalvexReceiversShellView - Notification Message");
        CriticalSectionLock lock(m_viewWindowsLock);
        for (HWND hwnd : m_viewWindows) PostMessageW(hwnd, message, 0, 0);
    }
}
