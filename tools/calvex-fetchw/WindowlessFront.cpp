#include "WindowlessFront.h"

#include <windows.h>

#include "FetchRun.h"
#include "FetchStart.h"
#include "OffScreenDialogs.h"
#include "ReceiverWatch.h"
#include "SessionEndWindow.h"
#include "TrayNotifier.h"
#include "WatchControl.h"
#include "WatchFace.h"
#include "WatchInstance.h"

void WindowlessFront::UseStored(const FetchSettings& stored, const std::vector<std::wstring>& lines) {
    m_stored = true;
    m_settings = stored;
    m_lines = lines;
}

bool WindowlessFront::Parse(const std::vector<std::wstring>& arguments, FetchOptions& options, std::wstring& error) {
    if (m_stored) return OptionsOverSettings(m_settings, arguments, options, error);
    return ParseFetchOptions(arguments, options, error);
}

void WindowlessFront::LogOpened(FetchConsole& console) {
    for (const std::wstring& line : m_lines) console.Line(line);
    m_lines.clear();
}

std::wstring WindowlessFront::DefaultLog(const std::wstring& target) const { return target + L"\\calvex-fetch.log"; }

void WindowlessFront::LogWhereTheUserLooks(FetchConsole& console) const {
    wchar_t folder[MAX_PATH];
    const DWORD length = GetEnvironmentVariableW(L"LOCALAPPDATA", folder, MAX_PATH);
    if (length && length < MAX_PATH) console.SetLog(std::wstring(folder) + L"\\calvex-fetch.log");
}

int WindowlessFront::Around(const std::function<int()>& fetch) {
    SessionEndWindow sessionEnd([] { StopFetch(true); });
    OffScreenDialogs offScreen;
    return fetch();
}

// The face comes last and goes first: it talks to the notifier and the control.
int WindowlessFront::Watch(ReceiverWatch& watch, TargetLock& lock) {
    WatchInstance instance;
    instance.Claim();  // a second watch of the same user, into another folder, runs unfound
    TrayNotifier notifier(watch.Console(), watch.Target(), nullptr);
    WatchControl control;
    watch.SetObserver(&notifier);
    watch.SetControl(&control, &lock);
    WatchFace face(notifier, control, watch.Options());
    return watch.Run();
}
