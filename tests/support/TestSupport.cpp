#include "support/TestSupport.h"

#include <shellapi.h>

#include "com/Handles.h"

#include <algorithm>
#include <atomic>
#include <cstdlib>
#include <thread>

namespace testsupport {

// "/work/x" -> "Z:\work\x": Wine maps the Unix root to drive Z:.
static std::wstring DirFromEnvironment(const char* name) {
    const char* value = std::getenv(name);
    std::wstring path = value ? L"Z:" + Wide(value) : std::wstring();
    std::replace(path.begin(), path.end(), L'/', L'\\');
    return path;
}

std::wstring BuildDir() { return DirFromEnvironment("CALVEX_BUILD_DIR"); }
std::wstring SourceDir() { return DirFromEnvironment("CALVEX_SOURCE_DIR"); }
std::wstring ModuleDllPath() { return BuildDir() + L"\\CalvexReceiversShellExt.dll"; }

void PumpMessagesFor(DWORD milliseconds) { PumpUntil([] { return false; }, milliseconds); }

bool PumpUntil(const std::function<bool()>& done, DWORD timeoutMilliseconds) {
    const ULONGLONG end = GetTickCount64() + timeoutMilliseconds;
    for (;;) {
        MSG msg;
        while (PeekMessageW(&msg, nullptr, 0, 0, PM_REMOVE)) {
            TranslateMessage(&msg);
            DispatchMessageW(&msg);
        }
        if (done()) return true;
        const ULONGLONG now = GetTickCount64();
        if (now >= end) return false;
        MsgWaitForMultipleObjects(0, nullptr, FALSE, static_cast<DWORD>(std::min<ULONGLONG>(end - now, 20)), QS_ALLINPUT);
    }
}

// An inheritable file that takes a child's output; read into text and deleted at the end.
struct OutputCapture {
    explicit OutputCapture(std::string* text) : text(text) {
        wchar_t dir[MAX_PATH] = L"", name[MAX_PATH] = L"";
        if (!text || !GetTempPathW(MAX_PATH, dir) || !GetTempFileNameW(dir, L"out", 0, name)) return;
        path = name;
        SECURITY_ATTRIBUTES inherit = {sizeof inherit, nullptr, TRUE};
        file.Reset(CreateFileW(name, GENERIC_WRITE, FILE_SHARE_READ, &inherit, CREATE_ALWAYS, 0, nullptr));
    }
    ~OutputCapture() {
        file.Reset();
        if (text) *text = ReadFileBytes(path);
        if (!path.empty()) DeleteFileW(path.c_str());
    }
    std::string* text;
    std::wstring path;
    UniqueFile file;
};

DWORD RunProcess(std::wstring commandLine, DWORD timeoutMilliseconds, std::string* out, std::string* err) {
    OutputCapture output(out), errors(err == out ? nullptr : err);  // one file when both go to one text
    STARTUPINFOW startup = {sizeof startup};
    if (out || err) startup.dwFlags = STARTF_USESTDHANDLES;
    startup.hStdOutput = output.file.Get();
    startup.hStdError = err == out ? output.file.Get() : errors.file.Get();
    PROCESS_INFORMATION process = {};
    if (!CreateProcessW(nullptr, &commandLine[0], nullptr, nullptr, out || err, 0, nullptr, nullptr, &startup, &process))
        return GetLastError();
    UniqueHandle thread(process.hThread), owned(process.hProcess);
    DWORD exitCode = WAIT_TIMEOUT;
    if (PumpUntil([&] { return WaitForSingleObject(process.hProcess, 0) == WAIT_OBJECT_0; }, timeoutMilliseconds))
        GetExitCodeProcess(process.hProcess, &exitCode);
    else
        TerminateProcess(process.hProcess, WAIT_TIMEOUT);
    return exitCode;
}

std::wstring ChildText(HWND parent, int id) {
    wchar_t text[260] = L"";
    GetWindowTextW(GetDlgItem(parent, id), text, 260);
    return text;
}

std::vector<std::wstring> WithDialogsClosed(const wchar_t* title, const std::function<void()>& action,
                                            const std::function<std::wstring(HWND)>& read) {
    std::vector<std::wstring> seen;
    std::atomic<bool> done(false);
    std::thread closer([&] {
        for (HWND last = nullptr; !done; Sleep(50)) {
            HWND dialog = FindWindowW(L"#32770", title);
            if (!dialog || dialog == last || !IsWindowVisible(dialog)) continue;
            Sleep(200);  // let it finish initialising
            seen.push_back(read(last = dialog));
            PostMessageW(dialog, WM_COMMAND, IDCANCEL, 0);
            PostMessageW(dialog, WM_COMMAND, IDOK, 0);
        }
    });
    action();
    done = true;
    closer.join();
    return seen;
}

static std::wstring TempPath() {
    wchar_t dir[MAX_PATH] = L"";
    GetTempPathW(MAX_PATH, dir);
    return dir;
}

std::wstring TraceLogPath() { return TempPath() + L"CalvexReceiversShellExt.log"; }

std::string ReadFileBytes(const std::wstring& path) {
    UniqueFile file(CreateFileW(path.c_str(), GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE,
                                nullptr, OPEN_EXISTING, FILE_ATTRIBUTE_NORMAL, nullptr));
    std::string bytes;
    char buffer[65536];
    DWORD read = 0;
    while (file && ReadFile(file.Get(), buffer, sizeof buffer, &read, nullptr) && read > 0) bytes.append(buffer, read);
    return bytes;
}

bool WriteFileBytes(const std::wstring& path, const std::string& bytes, bool append) {
    UniqueFile file(CreateFileW(path.c_str(), append ? FILE_APPEND_DATA : GENERIC_WRITE, 0, nullptr,
                                append ? OPEN_ALWAYS : CREATE_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr));
    DWORD written = 0;
    return file && WriteFile(file.Get(), bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
}

std::string ReadTraceLog() { return ReadFileBytes(TraceLogPath()); }

std::vector<std::string> TraceMessages() {
    std::vector<std::string> messages;
    const std::string log = ReadTraceLog();
    for (size_t start = 0, end; start < log.size(); start = end) {
        end = std::min(log.find('\n', start), log.size() - 1) + 1;
        const size_t tab = log.find('\t', start);
        messages.push_back(log.substr(tab < end ? tab + 1 : start, end - (tab < end ? tab + 1 : start)));
    }
    return messages;
}

bool TraceContains(const std::string& message) {
    return ReadTraceLog().find(message) != std::string::npos;
}

std::vector<TaskPidl> ListItems(IShellFolder* folder, SHCONTF flags, HRESULT* result) {
    std::vector<TaskPidl> items;
    IEnumIDList* enumerator = nullptr;
    const HRESULT hr = folder->EnumObjects(nullptr, flags, &enumerator);
    if (result) *result = hr;
    LPITEMIDLIST item = nullptr;
    while (enumerator && enumerator->Next(1, &item, nullptr) == S_OK) items.emplace_back(item);
    if (enumerator) enumerator->Release();
    return items;
}

std::string Narrow(const std::wstring& text) {
    std::string out(WideCharToMultiByte(CP_UTF8, 0, text.data(), int(text.size()), nullptr, 0, nullptr, nullptr), '\0');
    WideCharToMultiByte(CP_UTF8, 0, text.data(), int(text.size()), &out[0], int(out.size()), nullptr, nullptr);
    return out;
}

std::wstring Wide(const std::string& text) {
    std::wstring out(MultiByteToWideChar(CP_UTF8, 0, text.data(), int(text.size()), nullptr, 0), L'\0');
    MultiByteToWideChar(CP_UTF8, 0, text.data(), int(text.size()), &out[0], int(out.size()));
    return out;
}

TempDirectory::TempDirectory(const std::wstring& name)
    : m_path(TempPath() + name + L"-" + std::to_wstring(GetCurrentProcessId()) + L"-" + std::to_wstring(GetTickCount64())) {
    CreateDirectoryW(m_path.c_str(), nullptr);
}

TempDirectory::~TempDirectory() { DeleteTree(m_path); }

bool DeleteTree(const std::wstring& path) {
    std::wstring from = path + L'\0';  // SHFileOperation wants a double-terminated list
    SHFILEOPSTRUCTW op = {};
    op.wFunc = FO_DELETE;
    op.pFrom = from.c_str();
    op.fFlags = FOF_NO_UI;
    return SHFileOperationW(&op) == 0;
}

std::vector<std::wstring> ListFiles(const std::wstring& dir, const std::wstring& prefix) {
    std::vector<std::wstring> files;
    WIN32_FIND_DATAW found;
    HANDLE find = FindFirstFileW((dir + L"\\*").c_str(), &found);
    for (BOOL more = find != INVALID_HANDLE_VALUE; more; more = FindNextFileW(find, &found)) {
        const std::wstring name = found.cFileName;
        if (name == L"." || name == L"..") continue;
        if (!(found.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY)) files.push_back(prefix + name);
        for (const std::wstring& file : ListFiles(dir + L"\\" + name, prefix + name + L"\\")) files.push_back(file);
    }
    if (find != INVALID_HANDLE_VALUE) FindClose(find);
    std::sort(files.begin(), files.end());
    return files;
}

int CountOf(const std::string& text, const std::string& part) {
    int count = 0;
    for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) ++count;
    return count;
}

LONGLONG Ticks(const FILETIME& time) { return static_cast<LONGLONG>(time.dwHighDateTime) << 32 | time.dwLowDateTime; }

LONGLONG WriteTime(const std::wstring& path) {
    WIN32_FILE_ATTRIBUTE_DATA data = {};
    GetFileAttributesExW(path.c_str(), GetFileExInfoStandard, &data);
    return Ticks(data.ftLastWriteTime);
}

LONGLONG Ticks(const SYSTEMTIME& utc) {
    FILETIME time = {};
    SystemTimeToFileTime(&utc, &time);
    return Ticks(time);
}

void SetWriteTime(const std::wstring& path, const SYSTEMTIME& utc) {
    FILETIME time = {};
    SystemTimeToFileTime(&utc, &time);
    HANDLE file = CreateFileW(path.c_str(), FILE_WRITE_ATTRIBUTES, 0, nullptr, OPEN_EXISTING, 0, nullptr);
    SetFileTime(file, nullptr, nullptr, &time);
    CloseHandle(file);
}

}  // namespace testsupport
