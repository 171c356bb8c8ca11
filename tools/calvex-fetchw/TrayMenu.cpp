#include "TrayMenu.h"

namespace {
struct MenuOwner {
    HMENU menu;
    ~MenuOwner() { DestroyMenu(menu); }  // and its submenus with it
};

void Item(HMENU menu, UINT id, const std::wstring& text, bool enabled = true) {
    AppendMenuW(menu, MF_STRING | (enabled ? MF_ENABLED : MF_GRAYED), id, text.c_str());
}

HMENU RecentMenu(const TrayMenuModel& model) {
    const HMENU recent = CreatePopupMenu();
    for (size_t i = 0; i < model.recent.size(); ++i) Item(recent, kRecentFirst + static_cast<UINT>(i), model.recent[i]);
    if (model.recent.empty()) Item(recent, 0, L"Nothing downloaded yet", false);
    return recent;
}
}  // namespace

std::wstring MenuEscaped(const std::wstring& text) {
    std::wstring escaped;
    for (wchar_t c : text) escaped += c == L'&' ? std::wstring(L"&&") : std::wstring(1, c);
    return escaped;
}

UINT TrackTrayMenu(HWND window, POINT at, const TrayMenuModel& model) {
    MenuOwner owner{CreatePopupMenu()};
    const HMENU menu = owner.menu;
    Item(menu, 0, MenuEscaped(model.status), false);
    AppendMenuW(menu, MF_SEPARATOR, 0, nullptr);
    Item(menu, kOpenTarget, L"&Open " + MenuEscaped(model.target));
    Item(menu, kDownloadNow, L"&Download now", !model.paused);
    Item(menu, kPauseHour, L"&Pause for 1 hour");
    Item(menu, kPauseUntilResumed, L"Pause &until I resume");
    Item(menu, kResume, L"&Resume", model.paused);
    AppendMenuW(menu, MF_POPUP, reinterpret_cast<UINT_PTR>(RecentMenu(model)), L"Re&cent");
    AppendMenuW(menu, MF_SEPARATOR, 0, nullptr);
    Item(menu, kOpenLog, L"Open the &log", model.hasLog);
    Item(menu, kSettings, L"&Settings...");
    Item(menu, kQuit, L"&Quit");
    SetMenuDefaultItem(menu, kOpenTarget, FALSE);
    // Without the foreground the menu would not close when the person clicks elsewhere; the
    // message afterwards lets the next click on the icon work at once.
    SetForegroundWindow(window);
    const UINT chosen = static_cast<UINT>(
        TrackPopupMenuEx(menu, TPM_RETURNCMD | TPM_NONOTIFY | TPM_RIGHTBUTTON | TPM_BOTTOMALIGN, at.x, at.y, window, nullptr));
    PostMessageW(window, WM_NULL, 0, 0);
    return chosen;
}
