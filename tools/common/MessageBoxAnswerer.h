#pragma once
// Answers message boxes on the user's behalf so that a tool never waits for a click: those of
// its own process and those owned by the product's download dialog in another process (the
// data object's process shows them). Each box's text is reported once, then the box is closed.
#include <windows.h>

#include <functional>
#include <set>
#include <string>

class MessageBoxAnswerer {
public:
    using Report = std::function<void(const std::wstring& title, const std::wstring& text)>;

    explicit MessageBoxAnswerer(Report report);
    ~MessageBoxAnswerer();
    MessageBoxAnswerer(const MessageBoxAnswerer&) = delete;
    MessageBoxAnswerer& operator=(const MessageBoxAnswerer&) = delete;

private:
    static DWORD WINAPI Run(void* self);
    static BOOL CALLBACK Visit(HWND window, LPARAM self);
    bool IsOurs(HWND box) const;
    void Answer(HWND box);

    Report m_report;
    std::set<HWND> m_answered;
    HANDLE m_stop;
    HANDLE m_thread;
};
