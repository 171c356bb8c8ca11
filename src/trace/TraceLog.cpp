#include "trace/TraceLog.h"

#include <cstdarg>
#include <cstdio>
#include <string>
#include <vector>

#include "com/CriticalSection.h"

namespace {
HANDLE g_traceFile = INVALID_HANDLE_VALUE;

// One recursive lock for the whole process: the trace calls hold it while the prefix
// writer takes it again, so a prefix and its message are never split by another thread.
CriticalSection& TraceLock() {
    static CriticalSection lock;
    return lock;
}

void WriteBytes(const char* bytes, DWORD length) {
    DWORD written = 0;
    WriteFile(g_traceFile, bytes, length, &written, nullptr);
}

int CountFormatted(const char* format, va_list args) { return _vscprintf(format, args); }
int CountFormatted(const wchar_t* format, va_list args) { return _vscwprintf(format, args); }
void PrintFormatted(char* out, size_t size, const char* format, va_list args) { _vsnprintf(out, size, format, args); }
void PrintFormatted(wchar_t* out, size_t size, const wchar_t* format, va_list args) {
    _vsnwprintf(out, size, format, args);
}

// The Microsoft printf family on purpose: in the wide form %s takes a wide string.
template <class Char>
std::basic_string<Char> Format(const Char* format, va_list args) {
    va_list copy;
    va_copy(copy, args);
    int n = CountFormatted(format, copy);
    va_end(copy);
    if (n <= 0) return std::basic_string<Char>();
    std::basic_string<Char> text(static_cast<size_t>(n) + 1, Char());
    PrintFormatted(&text[0], text.size(), format, args);
    text.resize(static_cast<size_t>(n));
    return text;
}
}  // namespace

void OpenTraceLog() {
    wchar_t path[MAX_PATH] = L"";
    DWORD length = GetTempPathW(MAX_PATH, path);
    if (length == 0 || length >= MAX_PATH) path[0] = L'\0';  // then the current directory
    wcsncat(path, L"CalvexReceiversShellExt.log", MAX_PATH - wcslen(path) - 1);
    CriticalSectionLock lock(TraceLock());
    g_traceFile = CreateFileW(path, GENERIC_WRITE, FILE_SHARE_READ, nullptr, CREATE_ALWAYS,
                              FILE_ATTRIBUTE_HIDDEN, nullptr);
}

void CloseTraceLog() {
    CriticalSectionLock lock(TraceLock());
    CloseHandle(g_traceFile);
    g_traceFile = INVALID_HANDLE_VALUE;
}

void WriteTracePrefix() {
    CriticalSectionLock lock(TraceLock());
    SYSTEMTIME now;
    GetLocalTime(&now);
    char prefix[32];
    int n = _snprintf(prefix, sizeof prefix, "%02u:%02u:%02u.%04u\t", now.wHour, now.wMinute,
                      now.wSecond, now.wMilliseconds);
    if (n > 0) WriteBytes(prefix, static_cast<DWORD>(n));
}

void TraceA(const char* format, ...) {
    CriticalSectionLock lock(TraceLock());
    WriteTracePrefix();
    va_list args;
    va_start(args, format);
    std::string text = Format(format, args);
    va_end(args);
    WriteBytes(text.data(), static_cast<DWORD>(text.size()));
}

void TraceW(const wchar_t* format, ...) {
    CriticalSectionLock lock(TraceLock());
    WriteTracePrefix();
    va_list args;
    va_start(args, format);
    std::wstring text = Format(format, args);
    va_end(args);
    const size_t n = text.size();
    // Exactly n bytes go out, n being the count of UTF-16 units: a message whose code page
    // form is longer is cut there, and one that does not convert is not written at all.
    std::vector<char> converted(2 * (n + 1));
    int bytes = WideCharToMultiByte(CP_THREAD_ACP, 0, text.c_str(), -1, converted.data(),
                                    static_cast<int>(converted.size()), nullptr, nullptr);
    if (bytes == 0) return;
    WriteBytes(converted.data(), static_cast<DWORD>(n));
}
