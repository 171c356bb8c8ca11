#pragma once
// One calvex-fetch at a time per target folder, across the users logged on: two of them would
// race for the same files. A named mutex per target, held for the tool's whole run and let go
// by Windows when the process ends, however it ends. Two spellings of one folder (case, a
// short 8.3 name, a trailing "\") are one target.
#include <windows.h>

#include <string>

#include "com/Handles.h"

class TargetLock {
public:
    // target: a full path. False when another process holds the target already.
    bool Acquire(const std::wstring& target);

private:
    UniqueHandle m_mutex;
};

// "Global\calvex-fetch-" and a hash of the target's normalized path (a mutex name cannot hold
// a "\" and is short).
std::wstring TargetLockName(const std::wstring& target);
