#include "FetchLog.h"

#include <cstdio>

#include "ConsoleText.h"
#include "LongPath.h"
#include "com/Handles.h"

namespace {
UniqueFile OpenForAppend(const std::wstring& path) {
    return UniqueFile(CreateFileW(LongPath(path).c_str(), FILE_APPEND_DATA, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE,
                                  nullptr, OPEN_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr));
}

std::wstring TimeText(const SYSTEMTIME& now, bool date) {
    wchar_t text[16];
    if (date) swprintf(text, 16, L"%04u-%02u-%02u", now.wYear, now.wMonth, now.wDay);
    else swprintf(text, 16, L"%02u:%02u:%02u ", now.wHour, now.wMinute, now.wSecond);
    return text;
}
}  // namespace

std::wstring LocalTimeText(bool date) {
    SYSTEMTIME now;
    GetLocalTime(&now);
    return TimeText(now, date);
}

void FetchLog::Write(const std::wstring& line) {
    SYSTEMTIME now;
    GetLocalTime(&now);
    Write(line, now);
}

void FetchLog::Write(const std::wstring& line, const SYSTEMTIME& now) {
    if (m_path.empty()) return;
    UniqueFile file = OpenForAppend(m_path);
    LARGE_INTEGER size = {};
    if (file && GetFileSizeEx(file.Get(), &size) && static_cast<ULONGLONG>(size.QuadPart) >= kLogLimit) {
        file.Reset();
        MoveFileExW(LongPath(m_path).c_str(), LongPath(m_path + L".1").c_str(), MOVEFILE_REPLACE_EXISTING);
        file = OpenForAppend(m_path);
        m_day = 0;
    }
    if (!file) return;
    // Lines carry the time of day only, as on the console: the date is said once a day.
    const DWORD day = now.wYear * 10000u + now.wMonth * 100u + now.wDay;
    const std::wstring date = m_day != day ? L"---- " + TimeText(now, true) + L" ----\r\n" : L"";
    const std::string bytes = Utf8(date + line + L"\r\n");
    m_day = day;
    DWORD written = 0;
    WriteFile(file.Get(), bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
}
