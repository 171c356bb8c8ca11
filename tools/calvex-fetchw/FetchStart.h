#pragma once
// How calvex-fetchw was started: by the logon value ("--logon"), from the Start menu (no
// argument), for its settings window alone ("--settings"), or with a command line of its own as
// before. The first two watch with the stored settings; options given with them still win.
#include <string>
#include <vector>

#include "FetchOptions.h"
#include "FetchSettings.h"

enum class FetchStart { CommandLine, Logon, Plain, Settings };

// Takes "--logon" or "--settings" off the arguments.
FetchStart TakeFetchStart(std::vector<std::wstring>& arguments);

// A watch of the stored settings, what the arguments give winning over them; false with the
// reason on bad usage, as ParseFetchOptions.
bool OptionsOverSettings(const FetchSettings& stored, const std::vector<std::wstring>& arguments, FetchOptions& options,
                         std::wstring& error);

// The settings window alone, its example from the receivers connected now: 0 when OK saved a
// choice, 1 when it was cancelled.
int RunSettingsAlone();
