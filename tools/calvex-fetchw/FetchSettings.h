#pragma once
// The windowless watch's settings, kept per user in the registry beside what the installer
// writes there, so that the logon start and the settings window agree.
#include <functional>
#include <string>

struct FetchSettings {
    std::wstring target;                 // absolute folder
    bool move = false;
    std::wstring layout = L"{receiver}";
    bool notify = true;
    bool startAtLogon = true;
};

// Reads the user's stored settings; a damaged/unreadable value gets its default and one line
// through `report` (for the log). Never throws.
FetchSettings LoadFetchSettings(const std::function<void(const std::wstring&)>& report);
bool SaveFetchSettings(const FetchSettings& settings, std::wstring& error);
