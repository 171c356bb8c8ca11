#pragma once
// calvex-fetchw's front: no console, so its log lives in the target (or where --log says), and
// what stops it before the target's log is open goes to %LOCALAPPDATA%\calvex-fetch.log. Its
// downloads run off the screen, a logoff stops it cleanly, and its watch has a face in the
// notification area (unless --no-notify).
#include "FetchFront.h"
#include "FetchOptions.h"

class WindowlessFront : public FetchFront {
public:
    // openSettings: the watch shows its settings window as soon as it starts.
    explicit WindowlessFront(bool openSettings = false) : m_openSettings(openSettings) {}

    std::wstring DefaultLog(const std::wstring& target) const override;
    void LogWhereTheUserLooks(FetchConsole& console) const override;
    int Around(const std::function<int()>& fetch) override;
    int Watch(ReceiverWatch& watch, TargetLock& lock) override;

private:
    bool m_openSettings;
};
