// calvex-fetchw: calvex-fetch without a console window, started at logon ("--logon"), from the
// Start menu (no argument) or with a command line of its own (FetchStart.h); FetchRun.h for
// the run and its exit codes, WindowlessFront.h for what it adds. One watch per user: a start
// from the Start menu, or for the settings alone, while the user's watch runs brings that
// watch's settings forward instead.
#include <windows.h>
#include <ole2.h>

#include <string>
#include <vector>

#include "FetchRun.h"
#include "FetchStart.h"
#include "WatchInstance.h"
#include "WindowlessFront.h"

namespace {
int FindAgain(WindowlessFront& front, FetchConsole& console) {
    if (WatchInstance::BringRunningForward()) return 0;
    front.LogWhereTheUserLooks(console);
    console.Error(L"the running calvex-fetchw does not answer");
    return 2;
}

int SettingsAlone() {
    if (FAILED(OleInitialize(nullptr))) return 2;
    const int chosen = RunSettingsAlone();
    OleUninitialize();
    return chosen;
}
}  // namespace

int wmain(int argc, wchar_t** argv) {
    FetchConsole console;
    WindowlessFront front;
    std::vector<std::wstring> arguments(argv + 1, argv + argc);
    const FetchStart start = TakeFetchStart(arguments);
    const bool findsAgain = start == FetchStart::Plain || start == FetchStart::Settings;
    if (findsAgain && WatchInstance::IsRunning()) return FindAgain(front, console);
    if (start == FetchStart::Settings) return SettingsAlone();
    if (start != FetchStart::CommandLine) {
        std::vector<std::wstring> damaged;
        const FetchSettings stored = LoadFetchSettings([&](const std::wstring& line) { damaged.push_back(line); });
        if (start == FetchStart::Logon && !stored.startAtLogon) return 0;
        front.UseStored(stored, damaged);
    }
    return RunFetch(arguments, front, console);
}
