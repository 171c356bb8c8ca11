// calvex-fetch: every new file of every receiver into a project folder, through the same shell
// namespace that the user browses (see the README for the options and an example run).
//
// Exit code: 0 all good, 1 some files failed, 2 nothing could be done (no device manager, no
// such receiver, target not writable, another calvex-fetch fetching into the target, bad
// arguments). With --watch (ReceiverWatch.h) it runs until stopped, also through a restart of
// the device manager: 0 or 1 as above.
//
// Built twice: calvex-fetch.exe for a console, calvex-fetchw.exe (CALVEX_WINDOWLESS) without
// one, to be started at logon; that one logs to TARGET\calvex-fetch.log unless told otherwise
// (to %LOCALAPPDATA%\calvex-fetch.log when it cannot get that far).
#include <windows.h>
#include <ole2.h>

#include <atomic>
#include <memory>
#include <string>
#include <vector>

#include "DescriptorName.h"
#include "DownloadDialogWatch.h"
#include "FetchConsole.h"
#include "FetchOptions.h"
#include "LayoutPattern.h"
#include "MessageBoxAnswerer.h"
#include "OffScreenDialogs.h"
#include "ReceiverFetcher.h"
#include "ReceiverList.h"
#include "ReceiverWatch.h"
#include "SessionEndWindow.h"
#include "ShellNamespace.h"
#include "TargetLock.h"
#include "TrayIcon.h"
#include "TrayNotifier.h"
#include "WatchNotice.h"
#ifdef CALVEX_WINDOWLESS
#include "FetchStart.h"
#endif

namespace {
const wchar_t kNoReceiver[] = L"no receiver is connected";

std::atomic<bool> g_interrupted{false};
HANDLE g_stop = nullptr;      // set when the user stops the tool
HANDLE g_finished = nullptr;  // set once the summary is out
std::vector<std::wstring> g_settingsLines;  // damaged stored settings, for the log once it is open

// Ctrl+C cancels the running download through its dialog, as the user would; no file that
// looks complete is left, and the summary is still printed. Closing the console, logging off
// or shutting down ends the process as soon as the handler returns, so that waits (briefly)
// until the tool has wound up.
void Stop(bool windUp) {
    g_interrupted = true;
    DownloadDialogWatch::CancelRunningDialog();
    SetEvent(g_stop);
    if (windUp) WaitForSingleObject(g_finished, 4000);
}

BOOL WINAPI OnConsoleControl(DWORD event) {
    Stop(event == CTRL_CLOSE_EVENT || event == CTRL_LOGOFF_EVENT || event == CTRL_SHUTDOWN_EVENT);
    return TRUE;
}

std::wstring FullPath(const std::wstring& path) {
    wchar_t full[MAX_PATH];
    const DWORD length = GetFullPathNameW(path.c_str(), MAX_PATH, full, nullptr);
    std::wstring result = length && length < MAX_PATH ? full : path;
    while (result.size() > 3 && (result.back() == L'\\' || result.back() == L'/')) result.pop_back();
    return result;
}

// The target exists (made if need be) and takes a new file.
bool IsWritableFolder(const std::wstring& target) {
    CreateDirectoryW(target.c_str(), nullptr);
    const std::wstring probe = target + L"\\.calvex-fetch-probe";
    HANDLE file = CreateFileW(probe.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS,
                              FILE_ATTRIBUTE_TEMPORARY | FILE_FLAG_DELETE_ON_CLOSE, nullptr);
    if (file == INVALID_HANDLE_VALUE) return false;
    CloseHandle(file);
    return true;
}

// The receivers that the options name, in listing order; false with the first unknown name.
bool Select(const FetchOptions& options, std::vector<Receiver>& receivers, std::wstring& unknown) {
    for (const std::wstring& wanted : options.receivers) {
        bool found = false;
        for (const Receiver& receiver : receivers) found = found || Matches(receiver, wanted);
        if (found) continue;
        unknown = wanted;
        return false;
    }
    std::vector<Receiver> chosen;
    for (Receiver& receiver : receivers)
        if (IsWanted(options, receiver)) chosen.push_back(std::move(receiver));
    receivers.swap(chosen);
    return true;
}

#ifdef CALVEX_WINDOWLESS
// Without a console, what cannot go to the target's log (bad arguments, a target that cannot
// be written) goes to one place of the user's own: %LOCALAPPDATA%\calvex-fetch.log.
void LogWhereTheUserLooks(FetchConsole& console) {
    wchar_t folder[MAX_PATH];
    const DWORD length = GetEnvironmentVariableW(L"LOCALAPPDATA", folder, MAX_PATH);
    if (length && length < MAX_PATH) console.SetLog(std::wstring(folder) + L"\\calvex-fetch.log");
}
#else
void LogWhereTheUserLooks(FetchConsole&) {}
#endif

// Why nothing was listed: the device manager cannot be reached, or no receiver is connected.
std::wstring WhyNoReceivers() {
    ComPtr<IDispatch> manager;
    const HRESULT hr = ConnectDeviceManager(manager);
    return FAILED(hr) ? NoDeviceManagerText(hr) : std::wstring(kNoReceiver);
}

void FetchReceiver(Receiver& receiver, const std::wstring& target, const FetchOptions& options,
                   const LayoutPattern& layout, FetchConsole& console, FetchTotals& totals) {
    const SafeName folder = layout.Check(receiver.Fields(), target.size());
    const std::wstring header = receiver.Title();
    if (folder.refused) {
        ++totals.failed;
        return console.Line(header + L": FAILED, no folder name: " + folder.reason);
    }
    console.Line(header + L" -> " + target + L"\\" + layout.Shown(receiver.Fields()));
    ComPtr<IShellFolder> files;
    HRESULT hr = receiver.parent->BindToObject(receiver.item.get(), nullptr, IID_IShellFolder, files.PutVoid());
    if (FAILED(hr)) {
        ++totals.failed;
        return console.Line(L"  FAILED      the receiver cannot be opened");
    }
    ReceiverFetcher(options, layout, console, totals, g_interrupted).Run(files.Get(), receiver, target);
}

std::wstring Summary(const FetchOptions& options, const FetchTotals& totals, ULONGLONG milliseconds) {
    wchar_t seconds[32];
    swprintf(seconds, 32, L"%.1f s", milliseconds / 1000.0);
    return std::wstring(options.dryRun ? L"dry run: " : L"") + std::to_wstring(totals.fetched) +
           (options.dryRun ? L" to fetch, " : L" fetched, ") + std::to_wstring(totals.skipped) + L" skipped, " +
           std::to_wstring(totals.failed) + L" failed, " +
           (options.move ? std::to_wstring(totals.deleted) + (options.dryRun ? L" to delete, " : L" deleted, ") : L"") +
           ByteText(totals.bytes) + L" in " + seconds +
           (g_interrupted ? L" (interrupted)" : L"");
}

// The windowless watch has an icon in the notification area unless told not to (--no-notify);
// the console build has its console. Either way the notices are lines of the console and log.
int Watch(const FetchOptions& options, const LayoutPattern& layout, const std::wstring& target, FetchConsole& console) {
    std::unique_ptr<TrayIcon> icon;
#ifdef CALVEX_WINDOWLESS
    if (options.notify) icon.reset(new TrayIcon(IdleTip(target)));
#endif
    TrayNotifier notifier(console, target, icon.get());
    ReceiverWatch watch(options, layout, target, console, g_interrupted, g_stop);
    watch.SetObserver(&notifier);
    return watch.Run();
}

int Fetch(const FetchOptions& options, const LayoutPattern& layout, FetchConsole& console) {
    const std::wstring target = FullPath(options.target);
#ifdef CALVEX_WINDOWLESS
    console.SetLog(options.log.empty() ? target + L"\\calvex-fetch.log" : FullPath(options.log));
    for (const std::wstring& line : g_settingsLines) console.Line(line);
#else
    if (!options.log.empty()) console.SetLog(FullPath(options.log));
#endif
    if (!options.dryRun && !IsWritableFolder(target)) {
        if (options.log.empty()) LogWhereTheUserLooks(console);
        console.Error(L"target not writable: " + target);
        return 2;
    }
    TargetLock lock;  // a dry run writes nothing: it may look at a watched folder
    if (!options.dryRun && !lock.Acquire(target)) {
        console.Error(L"another calvex-fetch is fetching into " + target + L" already: one at a time per folder");
        return 2;
    }
    if (options.watch) {
        console.SetStamped(true);
        return Watch(options, layout, target, console);
    }
    std::vector<Receiver> receivers;
    const HRESULT hr = ListReceivers(options, receivers);
    if (FAILED(hr)) {
        console.Error(L"the receivers folders cannot be opened: is the extension registered?");
        return 2;
    }
    std::wstring unknown;
    if (receivers.empty()) {
        const std::wstring why = WhyNoReceivers();
        // A device manager that was quitting as the folders bound lists nothing; once started
        // anew (by the question above) it is asked once more.
        if (why == kNoReceiver) ListReceivers(options, receivers);
        if (receivers.empty()) {
            console.Error(why);
            return 2;
        }
    }
    if (!Select(options, receivers, unknown)) {
        console.Error(L"no such receiver: " + unknown);
        return 2;
    }
    const ULONGLONG started = GetTickCount64();
    FetchTotals totals;
    for (Receiver& receiver : receivers) {
        if (g_interrupted) break;
        FetchReceiver(receiver, target, options, layout, console, totals);
    }
    console.Line(Summary(options, totals, GetTickCount64() - started));
    return totals.failed || g_interrupted ? 1 : 0;
}

// The logon start and the Start menu's watch with the stored settings (the logon start not at
// all when they say so), the settings window alone, or the command line as it stands.
bool ParseArguments(std::vector<std::wstring> arguments, FetchOptions& options, std::wstring& error, int& done) {
#ifdef CALVEX_WINDOWLESS
    const FetchStart start = TakeFetchStart(arguments);
    if (start == FetchStart::Settings) {
        if (FAILED(OleInitialize(nullptr))) return done = 2, false;
        done = RunSettingsAlone();
        OleUninitialize();
        return false;
    }
    if (start != FetchStart::CommandLine) {
        const FetchSettings stored = LoadFetchSettings([](const std::wstring& line) { g_settingsLines.push_back(line); });
        if (start == FetchStart::Logon && !stored.startAtLogon) return done = 0, false;
        return OptionsOverSettings(stored, arguments, options, error);
    }
#endif
    return ParseFetchOptions(arguments, options, error);
}
}  // namespace

int wmain(int argc, wchar_t** argv) {
    FetchConsole console;
    FetchOptions options;
    std::wstring error;
    int done = -1;
    if (!ParseArguments(std::vector<std::wstring>(argv + 1, argv + argc), options, error, done)) {
        if (done >= 0) return done;
        LogWhereTheUserLooks(console);
        console.Error(error);
        console.Line(kFetchUsage);
        return 2;
    }
    LayoutPattern layout;  // refused before anything is touched, the target's log included
    if (!layout.Parse(options.layout, error)) {
        LogWhereTheUserLooks(console);
        console.Error(L"--layout: " + error);
        return 2;
    }
    if (FAILED(OleInitialize(nullptr))) return 2;
    g_stop = CreateEventW(nullptr, TRUE, FALSE, nullptr);
    g_finished = CreateEventW(nullptr, TRUE, FALSE, nullptr);
    SetConsoleCtrlHandler(OnConsoleControl, TRUE);
    int result;
    {
#ifdef CALVEX_WINDOWLESS
        SessionEndWindow sessionEnd([] { Stop(true); });
        OffScreenDialogs offScreen;
#endif
        MessageBoxAnswerer answerer([&](const std::wstring& title, const std::wstring& text) {
            std::wstring flat = text;
            for (wchar_t& c : flat) if (c == L'\r' || c == L'\n') c = L' ';
            console.Line(L"  message box: " + title + L": " + flat);
        });
        result = Fetch(options, layout, console);
        SetEvent(g_finished);
    }
    OleUninitialize();
    return result;
}
