#pragma once
// Subclasses the view's list control: every key reaches the list inside the browser, and
// menu or accelerator commands sent to the list are swallowed (the view handles them).
#include <windows.h>

class CShellViewListWindow {
public:
    CShellViewListWindow() = default;
    ~CShellViewListWindow() { Unsubclass(); }
    CShellViewListWindow(const CShellViewListWindow&) = delete;
    CShellViewListWindow& operator=(const CShellViewListWindow&) = delete;

    bool Subclass(HWND list);
    void Unsubclass();
    HWND Window() const { return m_window; }

private:
    static LRESULT CALLBACK SubclassProc(HWND hwnd, UINT message, WPARAM wParam, LPARAM lParam, UINT_PTR id,
                                         DWORD_PTR self);

    HWND m_window = nullptr;
};
