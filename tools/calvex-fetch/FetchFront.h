#pragma once
// What a program adds around the engine's run: calvex-fetch has its console and nothing more;
// calvex-fetchw, without one, keeps a log in the target and shows the watch in the
// notification area.
#include <functional>
#include <string>

#include "FetchConsole.h"

class ReceiverWatch;
class TargetLock;

class FetchFront {
public:
    virtual ~FetchFront() = default;
    // The log when --log names none; empty: no log.
    virtual std::wstring DefaultLog(const std::wstring& target) const { (void)target; return std::wstring(); }
    // What stops the run before the target's log is open is also said here.
    virtual void LogWhereTheUserLooks(FetchConsole& console) const { (void)console; }
    // The whole fetch, inside whatever the program keeps alive meanwhile.
    virtual int Around(const std::function<int()>& fetch) { return fetch(); }
    // The watch, with whatever the program adds to it; lock holds the target.
    virtual int Watch(ReceiverWatch& watch, TargetLock& lock) = 0;
};
