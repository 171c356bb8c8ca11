#include "FetchConsole.h"

#include <cstdio>

#include "ConsoleText.h"

namespace {
constexpr int BarCells = 20;

bool IsConsole(HANDLE handle) {
    DWORD mode = 0;
    return GetFileType(handle) == FILE_TYPE_CHAR && GetConsoleMode(handle, &mode);
}

std::wstring Format(const wchar_t* format, double value) {
    wchar_t text[64];
    swprintf(text, 64, format, value);
    return text;
}
}  // namespace

std::wstring ByteText(ULONGLONG bytes) {
    if (bytes < 1024) return std::to_wstring(bytes) + L" bytes";
    if (bytes < 1024 * 1024) return Format(L"%.1f KB", bytes / 1024.0);
    return Format(L"%.1f MB", bytes / (1024.0 * 1024.0));
}

FetchConsole::FetchConsole() : m_out(GetStdHandle(STD_OUTPUT_HANDLE)), m_terminal(IsConsole(m_out)) {}

void FetchConsole::Write(const std::wstring& text) {
    if (m_terminal) {
        DWORD written = 0;
        WriteConsoleW(m_out, text.c_str(), static_cast<DWORD>(text.size()), &written, nullptr);
    } else {
        WriteUtf8(stdout, text);
    }
}

void FetchConsole::EndProgress() {
    if (m_progressWidth == 0) return;
    Write(L"\r" + std::wstring(m_progressWidth, L' ') + L"\r");
    m_progressWidth = 0;
}

void FetchConsole::Line(const std::wstring& text) {
    std::lock_guard<std::mutex> hold(m_lock);
    EndProgress();
    Write((m_stamped ? LocalTimeText() : std::wstring()) + text + L"\n");
    m_log.Write(LocalTimeText() + text);
}

void FetchConsole::Error(const std::wstring& text) {
    std::lock_guard<std::mutex> hold(m_lock);
    EndProgress();
    WriteUtf8(stderr, L"calvex-fetch: " + text + L"\n");
    m_log.Write(LocalTimeText() + L"calvex-fetch: " + text);
}

void FetchConsole::Progress(const std::wstring& name, ULONGLONG done, ULONGLONG total, double seconds) {
    if (!m_terminal) return;
    const int percent = total ? static_cast<int>(done * 100 / total) : 100;
    const int cells = percent * BarCells / 100;
    std::wstring line = L"  " + name + L" [" + std::wstring(cells, L'#') + std::wstring(BarCells - cells, L'.') + L"] " +
                        std::to_wstring(percent) + L"%  " + std::to_wstring(done) + L"/" + std::to_wstring(total) +
                        L" bytes  " + (seconds > 0 ? ByteText(static_cast<ULONGLONG>(done / seconds)) + L"/s" : L"");
    std::lock_guard<std::mutex> hold(m_lock);
    const size_t width = line.size();
    if (width < m_progressWidth) line += std::wstring(m_progressWidth - width, L' ');
    Write(L"\r" + line);
    m_progressWidth = width > m_progressWidth ? width : m_progressWidth;
}
