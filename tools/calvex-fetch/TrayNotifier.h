#pragma once
// What the watch tells the person at the PC: after a receiver's pass a notice (a line of the
// console and the log, and a balloon of the notification area icon, if there is one), and the
// icon's tooltip while it works. A pass that brings no news of its receiver says nothing: the
// full comparison every minute and a receiver still logging would otherwise repeat the same
// words all day. News is a pass that did something and says other than the last one of that
// receiver, or any pass of a receiver not heard of for longer than a full comparison takes to
// come round (plugged in again) or unplugged since.
#include <windows.h>

#include <functional>
#include <map>
#include <string>

#include "FetchConsole.h"
#include "ReceiverPass.h"
#include "TrayIcon.h"

class TrayNotifier : public WatchObserver {
public:
    using Clock = std::function<ULONGLONG()>;

    // icon: null without one (--no-notify, or the console build); the lines are written anyway.
    TrayNotifier(FetchConsole& console, const std::wstring& target, TrayIcon* icon, Clock clock = GetTickCount64);

    void Idle() override;
    void Working(const std::wstring& receiver, int left) override;
    void PassEnded(const ReceiverPass& pass) override;

private:
    struct Said {
        std::wstring notice;
        ULONGLONG at = 0;
    };

    bool IsNews(const ReceiverPass& pass, const std::wstring& notice);

    FetchConsole& m_console;
    const std::wstring m_target;
    TrayIcon* m_icon;
    Clock m_clock;
    std::map<std::wstring, Said> m_said;  // by receiver: its last notice and its last pass
};
