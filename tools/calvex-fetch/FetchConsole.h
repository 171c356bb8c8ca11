#pragma once
// What calvex-fetch tells the person running it: plain lines on stdout, a live progress bar per
// file when stdout is a terminal, errors on stderr; lines and errors also go to the log file,
// if there is one, each with its time. Safe to call from more than one thread.
#include <windows.h>

#include <mutex>
#include <string>

#include "FetchLog.h"

class FetchConsole {
public:
    FetchConsole();
    bool IsTerminal() const { return m_terminal; }
    // Every later line starts with the local time, for a console left open all day.
    void SetStamped(bool stamped) { m_stamped = stamped; }
    void SetLog(const std::wstring& path) { m_log.Open(path); }
    const std::wstring& LogPath() const { return m_log.Path(); }
    void Line(const std::wstring& text);
    void Error(const std::wstring& text);  // "calvex-fetch: " + text on stderr
    // Redraws the file's progress bar in place; nothing when stdout is not a terminal.
    void Progress(const std::wstring& name, ULONGLONG done, ULONGLONG total, double seconds);

private:
    void Write(const std::wstring& text);
    void EndProgress();

    std::mutex m_lock;
    HANDLE m_out;
    bool m_terminal;
    bool m_stamped = false;
    size_t m_progressWidth = 0;  // characters of the bar line on screen, 0 when none
    FetchLog m_log;
};

// "1.5 MB", "12.0 KB", "512 bytes".
std::wstring ByteText(ULONGLONG bytes);
