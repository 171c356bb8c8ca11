#pragma once
// The windowless watch downloads through the product's own dialog, as Explorer does, and the
// product may show a message box; started at logon, neither may come in the user's way. While
// one of these lives, every dialog that this thread creates is kept off the screen, out of the
// taskbar and never activated. It stays "visible" to Windows, so the tool follows its progress
// and answers its message boxes exactly as on a console.
#include <windows.h>

class OffScreenDialogs {
public:
    OffScreenDialogs();
    ~OffScreenDialogs();
    OffScreenDialogs(const OffScreenDialogs&) = delete;
    OffScreenDialogs& operator=(const OffScreenDialogs&) = delete;

private:
    static LRESULT CALLBACK OnCbt(int code, WPARAM wParam, LPARAM lParam);

    HHOOK m_hook;
};
