#pragma once
// The watch's icon in the notification area: a tooltip that says what it is doing, a balloon
// for each notice, and the person's clicks and keys on it (NOTIFYICON_VERSION_4), handed to a
// listener. It never takes the focus by itself. Its hidden window belongs to the thread that
// made it, whose message loop must run; the other members may be called from any thread. When
// Explorer starts anew ("TaskbarCreated") the icon is added again, and an icon that could not
// be added at logon, before the taskbar was there, comes then too. The window stays while the
// icon is hidden (notifications off): a second start finds the watch by it.
#include <windows.h>
#include <shellapi.h>

#include <mutex>
#include <string>

class TrayIcon {
public:
    class Listener {
    public:
        virtual ~Listener() = default;
        virtual void OnOpen() = 0;          // a click, or Enter or space on the icon
        virtual void OnNoticeClicked() = 0; // a click on the balloon
        virtual void OnMenu(POINT at) = 0;  // a right-click, or the menu key
        virtual void OnShowSettings() = 0;  // asked by a second start (FindRunningWatch)
    };

    TrayIcon(const std::wstring& tip, bool shown, Listener* listener = nullptr);
    ~TrayIcon();
    TrayIcon(const TrayIcon&) = delete;
    TrayIcon& operator=(const TrayIcon&) = delete;

    HWND Window() const { return m_window; }
    void SetTip(const std::wstring& tip);
    void Notify(const std::wstring& text, bool warning);
    void SetShown(bool shown);
    void SetPaused(bool paused);  // the icon with a pause sign

    // The window of the user's running watch, or null.
    static HWND FindRunningWatch();
    // What a second start posts to it: bring the settings forward.
    static UINT ShowSettingsMessage();

private:
    static LRESULT CALLBACK WindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam);
    void OnCallback(WPARAM wParam, LPARAM lParam);
    NOTIFYICONDATAW Data(UINT flags) const;
    void Add();

    std::mutex m_lock;
    HWND m_window = nullptr;
    HICON m_icon = nullptr;        // shared: never destroyed
    HICON m_pausedIcon = nullptr;  // ours
    Listener* m_listener;
    std::wstring m_tip;
    bool m_shown;
    bool m_paused = false;
    bool m_added = false;
};
