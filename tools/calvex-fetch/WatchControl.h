#pragma once
// What the person at the PC asks of a running watch from another thread (the notification
// area's menu): pause, resume, download now, new settings. Kept here as flags under a lock with
// an event that wakes the watch, which takes them between files, never inside its work.
#include <windows.h>

#include <mutex>

#include "FetchOptions.h"
#include "PauseClock.h"
#include "com/Handles.h"

class WatchControl {
public:
    explicit WatchControl(PauseClock::Clock clock = GetTickCount64);

    // From any thread.
    void PauseFor(ULONGLONG milliseconds);
    void PauseUntilResumed();
    void Resume();
    void DownloadNow();  // every receiver compared in full at once
    void Apply(const FetchOptions& options);  // target, move, layout and notify of these
    bool IsPaused();
    ULONGLONG PauseLeft();  // 0: not paused, or until resumed

    // The watch's side.
    HANDLE WakeEvent() const { return m_wake.Get(); }
    // Something for the watch to take before its next file: a pause or new settings.
    bool Holds();
    // True once after Download now, or after a pause ended.
    bool TakeFullComparison();
    bool TakeSettings(FetchOptions& options);

private:
    void Wake() { SetEvent(m_wake.Get()); }

    std::mutex m_lock;
    PauseClock m_pause;
    bool m_downloadNow = false;
    bool m_hasSettings = false;
    FetchOptions m_settings;
    UniqueHandle m_wake;
};
