#pragma once
// What the watch's face says of where the watch stands: the first, greyed line of the icon's
// menu and the icon's tooltip while paused.
#include <windows.h>

#include <string>

struct WatchStatus {
    std::wstring target;    // absolute
    std::wstring receiver;  // the receiver being worked on, or empty
    int left = 0;           // of its files, still to look at
    bool paused = false;
    ULONGLONG pauseLeft = 0;  // milliseconds; 0 while paused: until resumed
};

// "Watching D:\Survey", "Q9 GNSS@USB: 5 files left", "Paused until 15:30" (the local time now
// is `now`).
std::wstring StatusLine(const WatchStatus& status, const SYSTEMTIME& now);
// "calvex-fetch: paused until 15:30"
std::wstring PausedTip(const WatchStatus& status, const SYSTEMTIME& now);
// "15:30", or "2026-11-24 15:30" when not of the day `today`.
std::wstring ClockText(const SYSTEMTIME& at, const SYSTEMTIME& today);
