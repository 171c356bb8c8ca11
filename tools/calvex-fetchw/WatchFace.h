#pragma once
// The watch's face on a thread of its own, so that a menu or the settings window never waits
// for a download and a download never waits for them: the icon (TrayIcon.h), its menu
// (TrayMenu.h) and the settings window. What the person asks goes to the watch through
// WatchControl, taken there between files; what the watch did comes from TrayNotifier.
#include <windows.h>

#include "FetchOptions.h"
#include "TrayIcon.h"
#include "TrayNotifier.h"
#include "WatchControl.h"
#include "com/Handles.h"

class WatchFace : public TrayIcon::Listener {
public:
    // options: the watch's as it starts.
    WatchFace(TrayNotifier& notifier, WatchControl& control, const FetchOptions& options);
    ~WatchFace();
    WatchFace(const WatchFace&) = delete;
    WatchFace& operator=(const WatchFace&) = delete;

    void OnOpen() override;
    void OnNoticeClicked() override;
    void OnMenu(POINT at) override;
    void OnShowSettings() override;

private:
    static DWORD WINAPI Run(void* self);
    void Do(UINT command, const WatchView& view);
    void ShowSettings();

    TrayNotifier& m_notifier;
    WatchControl& m_control;
    FetchOptions m_options;  // as last applied: what the settings window starts from
    bool m_inSettings = false;
    TrayIcon* m_icon = nullptr;
    DWORD m_threadId = 0;
    UniqueHandle m_ready;
    UniqueHandle m_thread;
};

// Opens folder in an Explorer window; one not made yet opens the nearest folder above it.
void OpenFolderWindow(const std::wstring& folder);
