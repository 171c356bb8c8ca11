#pragma once
// The simulator's own log, "%TEMP%\CalvexDeviceSim.log": start, stop, the root it serves,
// receivers it skipped and why, faults it acted out. One UTF-8 line per call.
#include <string>

class SimLog {
public:
    static void Write(const std::wstring& line);
    static std::wstring Path();
};
