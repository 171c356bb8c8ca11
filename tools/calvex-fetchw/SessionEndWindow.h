#pragma once
// What a console's Ctrl+C handler is to the console build, this is to the windowless one: a
// hidden top-level window (the only kind Windows tells about a logoff or shutdown) on a thread
// of its own, so that its WM_ENDSESSION can wait for the main thread to wind up before it
// returns: Windows ends the process as soon as it has returned.
#include <windows.h>

#include <functional>

#include "com/Handles.h"

class SessionEndWindow {
public:
    using Handler = std::function<void()>;  // called on the window's thread; returns once wound up

    explicit SessionEndWindow(Handler handler);
    ~SessionEndWindow();
    SessionEndWindow(const SessionEndWindow&) = delete;
    SessionEndWindow& operator=(const SessionEndWindow&) = delete;

private:
    static DWORD WINAPI Run(void* self);
    static LRESULT CALLBACK WindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam);

    Handler m_handler;
    UniqueHandle m_ready;
    HWND m_window = nullptr;
    UniqueHandle m_thread;
};
