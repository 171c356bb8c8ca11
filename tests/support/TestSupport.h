#pragma once
// Helpers shared by the tests: paths of the build, message pumping, the trace file.
#include <windows.h>
#include <shobjidl.h>

#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace testsupport {

// The build and source trees, from CALVEX_BUILD_DIR / CALVEX_SOURCE_DIR set by ctest.
std::wstring BuildDir();
std::wstring SourceDir();
std::wstring ModuleDllPath();  // the built CalvexReceiversShellExt.dll

void PumpMessagesFor(DWORD milliseconds);
// Dispatches messages until done() or the timeout; returns done()'s last answer.
bool PumpUntil(const std::function<bool()>& done, DWORD timeoutMilliseconds);

// Runs a command line to its end, dispatching this thread's messages meanwhile (a server
// that is quitting may call back into it). The exit code, or the error that stopped it; what
// it wrote to its standard output and error when out and err are given.
DWORD RunProcess(std::wstring commandLine, DWORD timeoutMilliseconds = 60000, std::string* out = nullptr,
                 std::string* err = nullptr);

// A dialog control's text.
std::wstring ChildText(HWND parent, int id);
// Runs action on this thread while another thread reads and closes every dialog titled
// title that it opens (a message box or the properties sheet); returns what was read.
std::vector<std::wstring> WithDialogsClosed(const wchar_t* title, const std::function<void()>& action,
                                            const std::function<std::wstring(HWND)>& read);

// A file's bytes, also while another holds it open for writing; empty when it cannot be read.
std::string ReadFileBytes(const std::wstring& path);
// Writes bytes as the file's whole content, or after what it holds; false when it cannot.
bool WriteFileBytes(const std::wstring& path, const std::string& bytes, bool append = false);

std::wstring TraceLogPath();
std::string ReadTraceLog();  // the whole file, also while the module holds it
// The trace's messages without their time prefixes, split at "\n".
std::vector<std::string> TraceMessages();
bool TraceContains(const std::string& message);

// Item identifier lists owned as the shell hands them out.
struct TaskMemFree { void operator()(void* block) const { CoTaskMemFree(block); } };
using TaskPidl = std::unique_ptr<ITEMIDLIST, TaskMemFree>;
// The folder's items; EnumObjects' result where asked for.
std::vector<TaskPidl> ListItems(IShellFolder* folder, SHCONTF flags, HRESULT* result = nullptr);

std::string Narrow(const std::wstring& text);  // UTF-8
std::wstring Wide(const std::string& text);
bool DeleteTree(const std::wstring& path);  // a directory with its contents
// Every file below dir, as paths relative to it ("sub\\name"), sorted.
std::vector<std::wstring> ListFiles(const std::wstring& dir, const std::wstring& prefix = L"");
int CountOf(const std::string& text, const std::string& part);  // occurrences
// Times in 100 ns units: a file's last write, a FILETIME, a SYSTEMTIME read as UTC.
LONGLONG WriteTime(const std::wstring& path);
LONGLONG Ticks(const FILETIME& time);
LONGLONG Ticks(const SYSTEMTIME& utc);
void SetWriteTime(const std::wstring& path, const SYSTEMTIME& utc);

// A fresh empty directory under %TEMP%, removed with its contents on destruction.
class TempDirectory {
public:
    explicit TempDirectory(const std::wstring& name);
    ~TempDirectory();
    TempDirectory(const TempDirectory&) = delete;
    TempDirectory& operator=(const TempDirectory&) = delete;
    const std::wstring& Path() const { return m_path; }

private:
    std::wstring m_path;
};

}  // namespace testsupport
