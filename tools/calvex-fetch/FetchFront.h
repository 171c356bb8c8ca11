#pragma once
// What a program adds around the engine's run: calvex-fetch has its console and nothing more;
// calvex-fetchw, without one, keeps a log in the target and shows the watch in the
// notification area.
#include <functional>
#include <string>
#include <vector>

#include "FetchConsole.h"
#include "FetchOptions.h"

class ReceiverWatch;
class TargetLock;

class FetchFront {
public:
    virtual ~FetchFront() = default;
    // The arguments after the program's name; false with the reason on bad usage.
    virtual bool Parse(const std::vector<std::wstring>& arguments, FetchOptions& options, std::wstring& error) {
        return ParseFetchOptions(arguments, options, error);
    }
    // The log when --log names none; empty: no log.
    virtual std::wstring DefaultLog(const std::wstring& target) const { (void)target; return std::wstring(); }
    // The log is open: what the front had to say before goes there.
    virtual void LogOpened(FetchConsole& console) { (void)console; }
    // What stops the run before the target's log is open is also said here.
    virtual void LogWhereTheUserLooks(FetchConsole& console) const { (void)console; }
    // The whole fetch, inside whatever the program keeps alive meanwhile.
    virtual int Around(const std::function<int()>& fetch) { return fetch(); }
    // The watch, with whatever the program adds to it; lock holds the target.
    virtual int Watch(ReceiverWatch& watch, TargetLock& lock) = 0;
};
