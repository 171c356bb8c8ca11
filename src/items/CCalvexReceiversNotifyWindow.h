#pragma once
// The process's hidden window that turns folder updates into shell change notifications.
// Device manager events come in bursts and Explorer re-reads a folder for every notification,
// so paths are collected for a quiet second, without duplicates, and then sent once each.
#include <windows.h>

#include <set>
#include <string>

#include "com/CriticalSection.h"

class CCalvexReceiversNotifyWindow {
public:
    // SHChangeNotify's shape; tests put their own function in its place.
    using ChangeNotifyFn = void(WINAPI*)(LONG eventId, UINT flags, LPCVOID item1, LPCVOID item2);

    static constexpr UINT_PTR UpdateTimerId = 1000;
    static constexpr UINT UpdateTimerPeriod = 1000;

    // The window that folders post UpdateFolderMessage() to; made on first use, and again
    // whenever the last one is gone (its thread ended). Null when it cannot be made.
    static HWND GetNotifyWindow();
    // Module unload: destroys the window and the object, pending paths are dropped.
    static void DestroyInstance();
    // Replaces SHChangeNotify (null restores it); returns the one it replaced.
    static ChangeNotifyFn SetChangeNotify(ChangeNotifyFn notify);

    HRESULT BufferEventPath(const wchar_t* path);
    HRESULT SendUpdateEvents();

    CCalvexReceiversNotifyWindow(const CCalvexReceiversNotifyWindow&) = delete;
    CCalvexReceiversNotifyWindow& operator=(const CCalvexReceiversNotifyWindow&) = delete;

private:
    CCalvexReceiversNotifyWindow() = default;
    ~CCalvexReceiversNotifyWindow();

    HRESULT CreateNotifyWindow();
    void DestroyNotifyWindow();
    void ArmTimer(const char* traceLine);
    static LRESULT CALLBACK WindowProc(HWND hwnd, UINT message, WPARAM wParam, LPARAM lParam);
    static void OnUpdateMessage(CCalvexReceiversNotifyWindow* self, HGLOBAL block);

    std::set<std::wstring> m_pendingPaths;  // ordinal, case-sensitive
    CriticalSection m_lock;
    HWND m_hwnd = nullptr;
    bool m_busy = false;
};
