#pragma once
// The icon's right-click menu: a greyed first line saying what the watch does, then what a
// person can ask of it. Built anew each time from what the watch last told.
#include <windows.h>

#include <string>
#include <vector>

enum TrayCommand : UINT {
    kOpenTarget = 1,
    kDownloadNow,
    kPauseHour,
    kPauseUntilResumed,
    kResume,
    kOpenLog,
    kSettings,
    kQuit,
    kRecentFirst = 100,  // then one per recent pass, newest first
};

struct TrayMenuModel {
    std::wstring status;              // the first line
    std::wstring target;
    bool paused = false;
    std::vector<std::wstring> recent;  // their menu texts (RecentMenuText)
    bool hasLog = false;
};

// Shows the menu at `at` (screen coordinates) for `window`, by the usual rules for a menu of
// the notification area; the command chosen, 0 when none was.
UINT TrackTrayMenu(HWND window, POINT at, const TrayMenuModel& model);
// "&" doubled: a path shows as itself in a menu.
std::wstring MenuEscaped(const std::wstring& text);
