#pragma once
// The watch's icon in the notification area: a tooltip that says what it is doing, and a
// balloon for each notice. It asks nothing of the user: no menu, no click waited for, never the
// focus. Its hidden window belongs to the thread that made it, whose message loop must run (the
// watch's wait runs it); when Explorer starts anew ("TaskbarCreated") the icon is added again,
// and an icon that could not be added at logon, before the taskbar was there, comes then too.
#include <windows.h>
#include <shellapi.h>

#include <string>

class TrayIcon {
public:
    explicit TrayIcon(const std::wstring& tip);
    ~TrayIcon();
    TrayIcon(const TrayIcon&) = delete;
    TrayIcon& operator=(const TrayIcon&) = delete;

    void SetTip(const std::wstring& tip);
    void Notify(const std::wstring& text, bool warning);

private:
    static LRESULT CALLBACK WindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam);
    NOTIFYICONDATAW Data(UINT flags) const;
    void Add();

    HWND m_window = nullptr;
    HICON m_icon = nullptr;  // shared: never destroyed
    std::wstring m_tip;
    bool m_added = false;
};
