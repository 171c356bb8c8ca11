#pragma once
// Listens to the shell's change notifications in this process, the ones that refresh an open
// Explorer window, and hands each event's first item identifier on.
//
// Registered on My Computer (recursive) as well as on the folders asked for: Wine matches no
// registration on an identifier of ours, but one on My Computer does see the notifications
// sent for our folders below it. So the receiver must filter by prefix itself (PrefixRest).
#include <windows.h>
#include <shlobj.h>

#include <functional>
#include <vector>

class ShellChangeListener {
public:
    using Handler = std::function<void(LONG event, PCIDLIST_ABSOLUTE item)>;

    explicit ShellChangeListener(Handler handler) : m_handler(std::move(handler)) {}
    ~ShellChangeListener();
    ShellChangeListener(const ShellChangeListener&) = delete;
    ShellChangeListener& operator=(const ShellChangeListener&) = delete;

    // Calls arrive on this thread, from its messages (also those of a modal loop).
    HRESULT Start(const std::vector<PCIDLIST_ABSOLUTE>& folders);

private:
    static LRESULT CALLBACK WindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam);

    Handler m_handler;
    HWND m_window = nullptr;
    ULONG m_registration = 0;
};

// When item is prefix itself or lies below it: true, with the identifier list that follows
// the prefix (empty for prefix itself).
bool PrefixRest(PCIDLIST_ABSOLUTE item, PCIDLIST_ABSOLUTE prefix, PCUIDLIST_RELATIVE* rest);
