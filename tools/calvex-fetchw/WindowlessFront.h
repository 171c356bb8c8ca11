#pragma once
// calvex-fetchw's front: no console, so its log lives in the target (or where --log says), and
// what stops it before the target's log is open goes to %LOCALAPPDATA%\calvex-fetch.log. Its
// downloads run off the screen, a logoff stops it cleanly, and its watch has a face in the
// notification area (unless --no-notify).
#include "FetchFront.h"
#include "FetchOptions.h"
#include "FetchSettings.h"

class WindowlessFront : public FetchFront {
public:
    // A watch of the stored settings, the arguments' options winning over them; lines: what
    // was damaged in them, for the log.
    void UseStored(const FetchSettings& stored, const std::vector<std::wstring>& lines);

    bool Parse(const std::vector<std::wstring>& arguments, FetchOptions& options, std::wstring& error) override;
    void LogOpened(FetchConsole& console) override;

    std::wstring DefaultLog(const std::wstring& target) const override;
    void LogWhereTheUserLooks(FetchConsole& console) const override;
    int Around(const std::function<int()>& fetch) override;
    int Watch(ReceiverWatch& watch, TargetLock& lock) override;

private:
    bool m_stored = false;
    FetchSettings m_settings;
    std::vector<std::wstring> m_lines;
};
