#pragma once
// calvex-fetch's log file: every line appended as it is written, so the file can be read,
// copied or deleted while a watch runs. It never grows without bound: past kLogLimit bytes it
// becomes NAME.1 (replacing an older one) and a new file starts.
#include <windows.h>

#include <string>

constexpr ULONGLONG kLogLimit = 1024 * 1024;

// The local time as every line starts with it, "15:05:11 ", or with date the day, "2026-11-24".
std::wstring LocalTimeText(bool date = false);

class FetchLog {
public:
    void Open(const std::wstring& path) { m_path = path; }
    bool IsOpen() const { return !m_path.empty(); }
    const std::wstring& Path() const { return m_path; }
    // One line, UTF-8, ending in CR LF; a line that cannot be written is lost, not retried.
    void Write(const std::wstring& line);
    // The same, written at the local time now: the day decides the date lines.
    void Write(const std::wstring& line, const SYSTEMTIME& now);

private:
    std::wstring m_path;
    DWORD m_day = 0;  // the date of the last line (yyyymmdd), so that a new day gets a line of its date
};
