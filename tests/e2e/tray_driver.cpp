// tray_driver: does to the running calvex-fetchw's icon what a person's mouse and keyboard do, for
// tray_menu_check.sh: the icon's own callback messages (NOTIFYICON_VERSION_4, as the taskbar sends them), then
// keys to the menu that opens. Exit code 0 when done, 1 when the watch or its menu cannot be found.
//   tray_driver click | enter | notice      a click on the icon, Enter on it, a click on the balloon
//   tray_driver menu [KEYS]                 a right-click; once the menu shows, types KEYS into it (a letter picks by its mnemonic, ">" is Enter,
//                                           "v" Down)
//   tray_driver keys KEYS                   the same KEYS into the menu that is open ("\e" closes it)
//   tray_driver close TITLE                 closes the window of that title (an Explorer window it opened)
#include <windows.h>
#include <shellapi.h>

#include <cstdio>
#include <string>

namespace {
constexpr UINT kCallback = WM_APP + 1;  // the icon's callback message
constexpr UINT kIconId = 1;

HWND Watch() { return FindWindowW(L"calvex-fetch notification icon", nullptr); }

struct MenuSearch { DWORD process; HWND found; };

BOOL CALLBACK FindMenu(HWND window, LPARAM param) {
    auto* search = reinterpret_cast<MenuSearch*>(param);
    wchar_t name[16] = L"";
    DWORD process = 0;
    GetClassNameW(window, name, 16);
    GetWindowThreadProcessId(window, &process);
    if (lstrcmpW(name, L"#32768") || process != search->process || !IsWindowVisible(window)) return TRUE;
    search->found = window;
    return FALSE;
}

HWND OpenMenu(HWND watch) {
    MenuSearch search = {0, nullptr};
    GetWindowThreadProcessId(watch, &search.process);
    for (int i = 0; i < 100 && !search.found; ++i, Sleep(100)) EnumWindows(FindMenu, reinterpret_cast<LPARAM>(&search));
    return search.found;
}

void Type(HWND menuWindow, const std::string& keys) {
    for (char key : keys) {
        Sleep(400);
        if (key == '\x1b') {
            PostMessageW(menuWindow, WM_KEYDOWN, VK_ESCAPE, 1);
        } else if (key == '>' || key == 'v') {
            const WPARAM code = key == '>' ? VK_RETURN : VK_DOWN;
            PostMessageW(menuWindow, WM_KEYDOWN, code, 1);
            PostMessageW(menuWindow, WM_KEYUP, code, 0xC0000001);
        } else {
            PostMessageW(menuWindow, WM_CHAR, static_cast<WPARAM>(key), 1);
        }
    }
}
}  // namespace

int main(int argc, char** argv) {
    const std::string what = argc > 1 ? argv[1] : "";
    if (what == "close" && argc > 2) {
        const HWND window = FindWindowA(nullptr, argv[2]);
        return window && PostMessageW(window, WM_CLOSE, 0, 0) ? 0 : 1;
    }
    const HWND watch = Watch();
    if (!watch) return std::fprintf(stderr, "tray_driver: no running calvex-fetchw\n"), 1;
    const WPARAM at = MAKEWPARAM(600, 500);
    if (what == "click" || what == "enter" || what == "notice") {
        const UINT event = what == "click" ? NIN_SELECT : what == "enter" ? NIN_KEYSELECT : NIN_BALLOONUSERCLICK;
        return PostMessageW(watch, kCallback, at, MAKELPARAM(event, kIconId)) ? 0 : 1;
    }
    if (what != "menu" && what != "keys")
        return std::fprintf(stderr, "tray_driver: click | enter | notice | menu [KEYS] | keys KEYS\n"), 1;
    if (what == "menu") PostMessageW(watch, kCallback, at, MAKELPARAM(WM_CONTEXTMENU, kIconId));
    const HWND menu = OpenMenu(watch);
    if (!menu) return std::fprintf(stderr, "tray_driver: no menu came\n"), 1;
    if (argc > 2) Type(menu, argv[2]);
    return 0;
}
