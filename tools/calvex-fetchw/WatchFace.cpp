#include "WatchFace.h"

#include <shellapi.h>

#include "FetchRun.h"
#include "FetchSettings.h"
#include "SettingsDialog.h"
#include "TrayMenu.h"
#include "WatchNotice.h"

namespace {
constexpr ULONGLONG kHourMs = 60 * 60 * 1000;

SYSTEMTIME LocalNow() {
    SYSTEMTIME now = {};
    GetLocalTime(&now);
    return now;
}

TrayMenuModel MenuModel(const WatchView& view) {
    TrayMenuModel model;
    model.status = StatusLine(view.status, LocalNow());
    model.target = view.status.target;
    model.paused = view.status.paused;
    model.hasLog = !view.logPath.empty();
    for (const RecentPass& pass : view.recent.Newest()) model.recent.push_back(RecentMenuText(pass, LocalNow()));
    return model;
}

void OpenLog(const std::wstring& log) {
    const HINSTANCE opened = ShellExecuteW(nullptr, L"open", log.c_str(), nullptr, nullptr, SW_SHOWNORMAL);
    // A .log without a program of its own: Notepad reads it.
    if (reinterpret_cast<INT_PTR>(opened) <= 32)
        ShellExecuteW(nullptr, L"open", L"notepad.exe", (L"\"" + log + L"\"").c_str(), nullptr, SW_SHOWNORMAL);
}
}  // namespace

void OpenFolderWindow(const std::wstring& folder) {
    std::wstring path = folder;
    while (path.size() > 3 && GetFileAttributesW(path.c_str()) == INVALID_FILE_ATTRIBUTES) {
        const size_t up = path.find_last_of(L'\\');
        if (up == std::wstring::npos || up < 2) break;
        path.erase(up > 2 ? up : 3);
    }
    ShellExecuteW(nullptr, L"open", L"explorer.exe", (L"\"" + path + L"\"").c_str(), nullptr, SW_SHOWNORMAL);
}

WatchFace::WatchFace(TrayNotifier& notifier, WatchControl& control, const FetchOptions& options)
    : m_notifier(notifier), m_control(control), m_options(options),
      m_ready(CreateEventW(nullptr, TRUE, FALSE, nullptr)) {
    m_thread.Reset(CreateThread(nullptr, 0, Run, this, 0, &m_threadId));
    if (m_thread) WaitForSingleObject(m_ready.Get(), 5000);
}

WatchFace::~WatchFace() {
    if (!m_thread) return;
    m_notifier.SetIcon(nullptr);
    PostThreadMessageW(m_threadId, WM_QUIT, 0, 0);
    WaitForSingleObject(m_thread.Get(), 5000);
}

DWORD WINAPI WatchFace::Run(void* self) {
    auto* face = static_cast<WatchFace*>(self);
    OleInitialize(nullptr);  // the folder picker of the settings window
    {
        TrayIcon icon(IdleTip(FullPath(face->m_options.target)), face->m_options.notify, face);
        face->m_icon = &icon;
        face->m_notifier.SetIcon(&icon);
        SetEvent(face->m_ready.Get());
        MSG message;
        while (GetMessageW(&message, nullptr, 0, 0) > 0) {
            TranslateMessage(&message);
            DispatchMessageW(&message);
        }
        face->m_icon = nullptr;
    }
    OleUninitialize();
    return 0;
}

void WatchFace::OnOpen() { OpenFolderWindow(m_notifier.View().status.target); }

void WatchFace::OnNoticeClicked() {
    const WatchView view = m_notifier.View();
    OpenFolderWindow(view.noticeFolder.empty() ? view.status.target : view.noticeFolder);
}

void WatchFace::OnMenu(POINT at) {
    if (at.x == 0 && at.y == 0) GetCursorPos(&at);
    const WatchView view = m_notifier.View();
    Do(TrackTrayMenu(m_icon->Window(), at, MenuModel(view)), view);
}

void WatchFace::OnShowSettings() {
    if (m_inSettings) BringSettingsDialogForward();
    else ShowSettings();
}

void WatchFace::Do(UINT command, const WatchView& view) {
    const auto& recent = view.recent.Newest();
    if (command >= kRecentFirst && command - kRecentFirst < recent.size())
        return OpenFolderWindow(recent[command - kRecentFirst].folder);
    switch (command) {
    case kOpenTarget: return OpenFolderWindow(view.status.target);
    case kDownloadNow: return m_control.DownloadNow();
    case kPauseHour: return m_control.PauseFor(kHourMs);
    case kPauseUntilResumed: return m_control.PauseUntilResumed();
    case kResume: return m_control.Resume();
    case kOpenLog: return OpenLog(view.logPath);
    case kSettings: return OnShowSettings();
    case kQuit: return StopFetch(false);  // as a logoff: the file in progress is discarded
    default: return;
    }
}

// OK saved the choice already; the watch takes it between files.
void WatchFace::ShowSettings() {
    m_inSettings = true;
    const WatchView view = m_notifier.View();
    FetchSettings settings = LoadFetchSettings(nullptr);
    settings.target = view.status.target;  // what runs, command line options included
    settings.move = m_options.move;
    settings.layout = m_options.layout;
    settings.notify = m_options.notify;
    const bool chosen = ShowSettingsDialog(nullptr, settings, view.connected);
    m_inSettings = false;
    if (!chosen) return;
    m_options.target = settings.target;
    m_options.move = settings.move;
    m_options.layout = settings.layout;
    m_options.notify = settings.notify;
    m_control.Apply(m_options);
}
