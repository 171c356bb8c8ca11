#include "FetchRun.h"

#include <windows.h>
#include <ole2.h>

#include <atomic>
#include <memory>
#include <string>
#include <vector>

#include "DescriptorName.h"
#include "DownloadDialogWatch.h"
#include "FetchOptions.h"
#include "LayoutPattern.h"
#include "LongPath.h"
#include "MessageBoxAnswerer.h"
#include "ReceiverFetcher.h"
#include "ReceiverList.h"
#include "ReceiverWatch.h"
#include "ShellNamespace.h"
#include "TargetLock.h"

namespace {
const wchar_t kNoReceiver[] = L"no receiver is connected";

std::atomic<bool> g_interrupted{false};
HANDLE g_stop = nullptr;      // set when the user stops the tool
HANDLE g_finished = nullptr;  // set once the summary is out

// Closing the console, logging off or shutting down ends the process as soon as the handler
// returns, so that waits (briefly) until the tool has wound up.
BOOL WINAPI OnConsoleControl(DWORD event) {
    StopFetch(event == CTRL_CLOSE_EVENT || event == CTRL_LOGOFF_EVENT || event == CTRL_SHUTDOWN_EVENT);
    return TRUE;
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

int Fetch(const FetchOptions& options, const LayoutPattern& layout, FetchFront& front, FetchConsole& console) {
    const std::wstring target = FullPath(options.target);
    const std::wstring log = options.log.empty() ? front.DefaultLog(target) : FullPath(options.log);
    if (!log.empty()) console.SetLog(log);
    front.LogOpened(console);
    if (!options.dryRun && !IsWritableFolder(target)) {
        if (options.log.empty()) front.LogWhereTheUserLooks(console);
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
        ReceiverWatch watch(options, layout, target, console, g_interrupted, g_stop);
        return front.Watch(watch, lock);
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
        if (FAILED(totals.targetLost)) {
            // One line for the lot: no other receiver's files could go anywhere either.
            ++totals.failed;
            console.Line(L"  FAILED      " + TargetLostText(target, totals.targetLost) + L"; nothing more is fetched");
            break;
        }
    }
    console.Line(Summary(options, totals, GetTickCount64() - started));
    return totals.failed || g_interrupted ? 1 : 0;
}
}  // namespace

void StopFetch(bool windUp) {
    g_interrupted = true;
    DownloadDialogWatch::CancelRunningDialog();
    SetEvent(g_stop);
    if (windUp) WaitForSingleObject(g_finished, 4000);
}

std::wstring FullPath(const std::wstring& path) { return FullPlainPath(path); }

bool IsWritableFolder(const std::wstring& target) {
    CreateDirectoryW(LongPath(target).c_str(), nullptr);
    const std::wstring probe = LongPath(target + L"\\.calvex-fetch-probe");
    HANDLE file = CreateFileW(probe.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS,
                              FILE_ATTRIBUTE_TEMPORARY | FILE_FLAG_DELETE_ON_CLOSE, nullptr);
    if (file == INVALID_HANDLE_VALUE) return false;
    CloseHandle(file);
    return true;
}

int RunFetch(const std::vector<std::wstring>& arguments, FetchFront& front, FetchConsole& console) {
    FetchOptions options;
    std::wstring error;
    if (!front.Parse(arguments, options, error)) {
        front.LogWhereTheUserLooks(console);
        console.Error(error);
        console.Line(kFetchUsage);
        return 2;
    }
    LayoutPattern layout;  // refused before anything is touched, the target's log included
    if (!layout.Parse(options.layout, error)) {
        front.LogWhereTheUserLooks(console);
        console.Error(L"--layout: " + error);
        return 2;
    }
    if (FAILED(OleInitialize(nullptr))) return 2;
    g_stop = CreateEventW(nullptr, TRUE, FALSE, nullptr);
    g_finished = CreateEventW(nullptr, TRUE, FALSE, nullptr);
    SetConsoleCtrlHandler(OnConsoleControl, TRUE);
    int result = front.Around([&] {
        MessageBoxAnswerer answerer([&](const std::wstring& title, const std::wstring& text) {
            std::wstring flat = text;
            for (wchar_t& c : flat) if (c == L'\r' || c == L'\n') c = L' ';
            console.Line(L"  message box: " + title + L": " + flat);
        });
        const int fetched = Fetch(options, layout, front, console);
        SetEvent(g_finished);  // before the front's windows go: a logoff waits for this
        return fetched;
    });
    OleUninitialize();
    return result;
}
