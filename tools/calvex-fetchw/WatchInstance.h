#pragma once
// One watch per user, found again: the running watch holds a per-user mutex for its whole run,
// and a second start (the Start menu's entry, or calvex-fetchw without a command line of its
// own) asks it, through its icon's window, to bring its settings forward.
#include <string>

#include "com/Handles.h"

class WatchInstance {
public:
    // Held until destroyed; false when the user's watch runs already.
    bool Claim();
    static bool IsRunning();
    // Asks the running watch to show its settings; false when it cannot be found in time.
    static bool BringRunningForward();

private:
    UniqueHandle m_mutex;
};

// "Local\calvex-fetchw-watch-" and the user's name.
std::wstring WatchInstanceName();
