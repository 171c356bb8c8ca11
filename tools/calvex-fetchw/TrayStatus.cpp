#include "TrayStatus.h"

#include <cstdio>

namespace {
constexpr ULONGLONG kTicksPerMs = 10000;  // FILETIME counts 100 ns

SYSTEMTIME Later(const SYSTEMTIME& now, ULONGLONG milliseconds) {
    FILETIME file = {};
    SystemTimeToFileTime(&now, &file);
    ULARGE_INTEGER value = {};
    value.LowPart = file.dwLowDateTime;
    value.HighPart = file.dwHighDateTime;
    value.QuadPart += milliseconds * kTicksPerMs;
    file.dwLowDateTime = value.LowPart;
    file.dwHighDateTime = value.HighPart;
    SYSTEMTIME later = {};
    FileTimeToSystemTime(&file, &later);
    return later;
}

std::wstring PausedText(const WatchStatus& status, const SYSTEMTIME& now) {
    if (!status.pauseLeft) return L"Paused until you resume";
    return L"Paused until " + ClockText(Later(now, status.pauseLeft), now);
}
}  // namespace

std::wstring ClockText(const SYSTEMTIME& at, const SYSTEMTIME& today) {
    wchar_t text[32];
    if (at.wYear == today.wYear && at.wMonth == today.wMonth && at.wDay == today.wDay)
        swprintf(text, 32, L"%02u:%02u", at.wHour, at.wMinute);
    else
        swprintf(text, 32, L"%04u-%02u-%02u %02u:%02u", at.wYear, at.wMonth, at.wDay, at.wHour, at.wMinute);
    return text;
}

std::wstring StatusLine(const WatchStatus& status, const SYSTEMTIME& now) {
    if (status.paused) return PausedText(status, now);
    if (status.receiver.empty()) return L"Watching " + status.target;
    if (status.left <= 0) return L"Looking at " + status.receiver;
    return status.receiver + L": " + std::to_wstring(status.left) + (status.left == 1 ? L" file left" : L" files left");
}

std::wstring PausedTip(const WatchStatus& status, const SYSTEMTIME& now) {
    std::wstring text = PausedText(status, now);
    text[0] = L'p';
    return L"calvex-fetch: " + text;
}
