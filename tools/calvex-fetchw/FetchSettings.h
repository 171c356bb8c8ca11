#pragma once
// The windowless watch's settings, kept per user in the registry beside what the installer
// writes there ("Software\Calvex\Receivers Shell Extension"), so that the logon start, the
// settings window and a repair of the installation agree. Every value is a string, as the
// installer writes its own: switches are "1" or "0".
#include <windows.h>

#include <functional>
#include <string>

struct FetchSettings {
    std::wstring target;                 // absolute folder
    bool move = false;
    std::wstring layout = L"{receiver}";
    bool notify = true;
    bool startAtLogon = true;
};

extern const wchar_t kFetchSettingsKey[];

// Where the files go when nothing says otherwise: "Survey" in the user's Documents, as the
// installer's own default.
std::wstring DefaultFetchTarget();

// Reads the user's stored settings; a damaged/unreadable value gets its default and one line
// through `report` (for the log). Never throws.
FetchSettings LoadFetchSettings(const std::function<void(const std::wstring&)>& report);
bool SaveFetchSettings(const FetchSettings& settings, std::wstring& error);

// The same on an open key (a scratch key in the tests).
FetchSettings ReadFetchSettings(HKEY key, const std::function<void(const std::wstring&)>& report);
bool WriteFetchSettings(HKEY key, const FetchSettings& settings, std::wstring& error);
