#pragma once
// What the watch tells the person at the PC: after a receiver's pass a notice (a line of the
// console and the log, and a balloon of the notification area icon, if there is one), and the
// icon's tooltip while it works. A pass that brings no news of its receiver says nothing: the
// full comparison every minute and a receiver still logging would otherwise repeat the same
// words all day. News is a pass that did something and says other than the last one of that
// receiver, or any pass of a receiver not heard of for longer than a full comparison takes to
// come round (plugged in again) or unplugged since.
//
// It hears the watch on the watch's thread and keeps what the icon's menu shows (where the
// watch stands, the last passes spoken of, the folder of the last balloon) for the face's
// thread, under a lock.
#include <windows.h>

#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <vector>

#include "FetchConsole.h"
#include "ReceiverPass.h"
#include "RecentPasses.h"
#include "TrayIcon.h"
#include "TrayStatus.h"

// What the face shows, as the watch last told it.
struct WatchView {
    WatchStatus status;
    RecentPasses recent;
    std::wstring noticeFolder;  // the folder of the last balloon's pass
    std::vector<LayoutReceiver> connected;
    std::wstring logPath;  // empty: none
};

class TrayNotifier : public WatchObserver {
public:
    using Clock = std::function<ULONGLONG()>;

    // icon: null without one (--no-notify, or the console build); the lines are written anyway.
    TrayNotifier(FetchConsole& console, const std::wstring& target, TrayIcon* icon, Clock clock = GetTickCount64);

    void SetIcon(TrayIcon* icon);
    WatchView View();

    void Idle() override;
    void Working(const std::wstring& receiver, int left) override;
    void PassEnded(const ReceiverPass& pass) override;
    void Paused(ULONGLONG left) override;
    void SettingsApplied(const FetchOptions& options, const std::wstring& target) override;
    void Connected(const std::vector<LayoutReceiver>& receivers) override;

private:
    struct Said {
        std::wstring notice;
        ULONGLONG at = 0;
    };

    bool IsNews(const ReceiverPass& pass, const std::wstring& notice);

    FetchConsole& m_console;
    TrayIcon* m_icon;
    Clock m_clock;
    std::map<std::wstring, Said> m_said;  // by receiver: its last notice and its last pass
    std::mutex m_lock;
    WatchView m_view;
    ULONGLONG m_pausedAt = 0;  // when the pause was told, by m_clock
};
