// calvex_move_bench: many small files moved by calvex-fetch --move, against the floor of the
// same run: the same files downloaded and deleted through the device manager contract alone,
// with the calls the tool makes (the listing, each download, the receiver asked again, the
// delete), but no shell, no download dialog and no disk; and between the two, the floor plus
// the tool's own proven write of each file (VirtualFiles.h), which tells the disk's share.
//
//   calvex_move_bench.exe [FILES] [BYTES]     (default 200 files of 4,096 bytes)
#include <windows.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "ContractDownload.h"
#include "SimServerProcess.h"
#include "VirtualFiles.h"

namespace {
const wchar_t kLookupKey[] = L"USB-9000-0002";

std::wstring TempPath(const wchar_t* name) {
    wchar_t temp[MAX_PATH];
    GetTempPathW(MAX_PATH, temp);
    return std::wstring(temp) + name;
}

std::wstring FileName(size_t index) {
    wchar_t name[16];
    swprintf(name, 16, L"F%05zu", index + 1);
    return name;
}

void WriteWhole(const std::wstring& path, const std::string& bytes) {
    UniqueFile out(CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr));
    DWORD written = 0;
    WriteFile(out.Get(), bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
}

// Deletes the folder's files (a receiver's, or the tool's copies from a run before).
void EmptyFolder(const std::wstring& folder, bool keepDescription) {
    WIN32_FIND_DATAW found;
    HANDLE search = FindFirstFileW((folder + L"\\*").c_str(), &found);
    if (search == INVALID_HANDLE_VALUE) return;
    do {
        if (found.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY) continue;
        if (!keepDescription || lstrcmpiW(found.cFileName, L"receiver.ini") != 0)
            DeleteFileW((folder + L"\\" + found.cFileName).c_str());
    } while (FindNextFileW(search, &found));
    FindClose(search);
}

// One receiver at full speed with the files; written again before each pass, as both delete them.
std::wstring WriteReceiver(size_t count, size_t bytes) {
    const std::wstring root = TempPath(L"calvex-move-bench"), folder = root + L"\\Calvex A";
    CreateDirectoryW(root.c_str(), nullptr);
    CreateDirectoryW(folder.c_str(), nullptr);
    EmptyFolder(folder, false);
    WriteWhole(folder + L"\\receiver.ini",
               "[Receiver]\r\nBrand=1\r\nLabel=Bench\r\nSerialNumber=9000-0002\r\nModel=A\r\nPortType=2\r\n");
    std::string content(bytes, '\0');
    for (size_t i = 0; i < count; ++i) {
        for (size_t b = 0; b < bytes; ++b) content[b] = static_cast<char>(((i * bytes + b) * 2654435761u) >> 13);
        WriteWhole(folder + L"\\" + FileName(i), content);
    }
    return root;
}

size_t FilesIn(const std::wstring& folder) {
    WIN32_FIND_DATAW found;
    size_t count = 0;
    HANDLE search = FindFirstFileW((folder + L"\\*").c_str(), &found);
    if (search == INVALID_HANDLE_VALUE) return 0;
    do count += !(found.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY); while (FindNextFileW(search, &found));
    FindClose(search);
    return count;
}

struct ListedFile {
    std::wstring name;
    long size = 0;
    DATE time = 0;
};

// What the namespace's listing asks of each file.
std::vector<ListedFile> ListFiles(IFilesColl* files) {
    std::vector<ListedFile> listed;
    long count = 0;
    files->get_Count(&count);
    for (long i = 0; i < count; ++i) {
        ComPtr<IDispatch> object;
        ComPtr<IReceiverFile> file;
        Bstr name;
        ListedFile entry;
        if (FAILED(files->get_Item(i, &object)) || FAILED(object.QueryTo(IID_IReceiverFile, file.PutVoid()))) continue;
        if (SUCCEEDED(file->get_Name(name.Put())) && SUCCEEDED(file->get_Time(&entry.time)) &&
            SUCCEEDED(file->get_Size(&entry.size))) {
            entry.name = name.Str();
            listed.push_back(entry);
        }
    }
    return listed;
}

// The descriptor the namespace gives for a Calvex file: ".qpr", the size, the receiver's clock.
FILEDESCRIPTORW DescriptorOf(const ListedFile& file) {
    FILEDESCRIPTORW descriptor = {};
    descriptor.dwFlags = FD_FILESIZE | FD_WRITESTIME;
    lstrcpynW(descriptor.cFileName, (file.name + L".qpr").c_str(), MAX_PATH);
    descriptor.nFileSizeLow = static_cast<DWORD>(file.size);
    SYSTEMTIME clock;
    VariantTimeToSystemTime(file.time, &clock);
    SystemTimeToFileTime(&clock, &descriptor.ftLastWriteTime);
    return descriptor;
}

// The download dialog's calls, then (with a folder) the tool's proven write of the file, then
// the delete's calls: found by name again, its report read, deleted.
bool MoveThroughContract(IFilesColl* files, const ListedFile& listed, const std::wstring& writeInto) {
    ComPtr<IDispatch> object;
    Bstr name(listed.name), answered;
    ComPtr<IStream> stream;
    CreateStreamOnHGlobal(nullptr, TRUE, stream.ReleaseAndGetAddressOf());
    if (FAILED(files->get_ItemByName(name.Get(), &object)) || DownloadThroughContract(object.Get(), stream.Get()) != S_OK)
        return false;
    std::wstring error;
    if (!writeInto.empty() && WriteVirtualFile(writeInto, DescriptorOf(listed), stream.Get(), error) != S_OK) return false;
    ComPtr<IReceiverFile> file;
    long size = 0;
    DATE time = 0;
    if (FAILED(files->get_ItemByName(name.Get(), &object)) || FAILED(object.QueryTo(IID_IReceiverFile, file.PutVoid())))
        return false;
    return SUCCEEDED(file->get_Name(answered.Put())) && SUCCEEDED(file->get_Size(&size)) &&
           SUCCEEDED(file->get_Time(&time)) && file->Delete() == S_OK;
}

size_t RawMove(const std::wstring& writeInto) {
    ComPtr<IFilesColl> files;
    if (FAILED(OpenReceiverFiles(kLookupKey, files))) return 0;
    size_t moved = 0;
    for (const ListedFile& listed : ListFiles(files.Get())) moved += MoveThroughContract(files.Get(), listed, writeInto);
    return moved;
}

// The tool itself, as a user starts it; its output (one line per file, the summary) kept aside.
DWORD ToolMove(const std::wstring& tool, const std::wstring& target, std::string& summary) {
    const std::wstring outPath = TempPath(L"calvex-move-bench.out");
    SECURITY_ATTRIBUTES inherit = {sizeof inherit, nullptr, TRUE};
    UniqueFile out(CreateFileW(outPath.c_str(), GENERIC_WRITE, FILE_SHARE_READ, &inherit, CREATE_ALWAYS, 0, nullptr));
    // Only the bench's receiver: whatever else a device manager serves is never touched.
    std::wstring command = L"\"" + tool + L"\" --move --receiver 9000-0002!A!USB \"" + target + L"\"";
    STARTUPINFOW startup = {sizeof startup};
    startup.dwFlags = STARTF_USESTDHANDLES;
    startup.hStdOutput = startup.hStdError = out.Get();
    PROCESS_INFORMATION info = {};
    if (!CreateProcessW(tool.c_str(), &command[0], nullptr, nullptr, TRUE, 0, nullptr, nullptr, &startup, &info))
        return GetLastError();
    CloseHandle(info.hThread);
    UniqueHandle process(info.hProcess);
    DWORD code = 0;
    while (MsgWaitForMultipleObjects(1, &info.hProcess, FALSE, INFINITE, QS_ALLINPUT) != WAIT_OBJECT_0) PumpOnce();
    GetExitCodeProcess(info.hProcess, &code);
    out.Reset();
    UniqueFile in(CreateFileW(outPath.c_str(), GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING, 0, nullptr));
    std::string text(GetFileSize(in.Get(), nullptr), '\0');
    DWORD read = 0;
    if (!text.empty()) ReadFile(in.Get(), &text[0], static_cast<DWORD>(text.size()), &read, nullptr);
    while (!text.empty() && (text.back() == '\n' || text.back() == '\r')) text.pop_back();
    summary = text.substr(text.rfind('\n') + 1);
    return code;
}

std::wstring ToolPath() {
    wchar_t self[MAX_PATH];
    GetModuleFileNameW(nullptr, self, MAX_PATH);
    std::wstring path = self;
    path = path.substr(0, path.rfind(L'\\'));
    return path.substr(0, path.rfind(L'\\')) + L"\\calvex-fetch.exe";  // bench\ sits beside the tool
}
}  // namespace

int main(int argc, char** argv) {
    const size_t count = argc > 1 ? std::strtoul(argv[1], nullptr, 10) : 200;
    const size_t bytes = argc > 2 ? std::strtoul(argv[2], nullptr, 10) : 4096;
    if (FAILED(OleInitialize(nullptr))) return 2;
    const std::wstring root = WriteReceiver(count, bytes), folder = root + L"\\Calvex A";
    SimServerProcess server(root);
    if (!server.Ready()) {
        std::printf("the simulator did not start\n");
        return 2;
    }
    // Each pass moves the same files out of the receiver, written anew before it, into a folder
    // of its own emptied first (copies already there would be deleted without a download).
    const std::wstring rawTarget = TempPath(L"calvex-move-bench-raw"), toolTarget = TempPath(L"calvex-move-bench-target");
    CreateDirectoryW(rawTarget.c_str(), nullptr);
    CreateDirectoryW(toolTarget.c_str(), nullptr);
    CreateDirectoryW((toolTarget + L"\\A@USB").c_str(), nullptr);
    double seconds[3] = {};
    const char* names[3] = {"raw download + delete (floor)", "the same + the tool's disk write", "calvex-fetch --move (product)"};
    std::string summary;
    DWORD code = 0;
    for (int pass = 0; pass < 3; ++pass) {
        const std::wstring into = pass == 0 ? L"" : pass == 1 ? rawTarget : toolTarget + L"\\A@USB";
        if (pass > 0) {
            WriteReceiver(count, bytes);
            EmptyFolder(into, false);
            Sleep(1000);  // the simulator's folder watch sees the files again before they are listed
        }
        LARGE_INTEGER start;
        QueryPerformanceCounter(&start);
        const size_t moved = pass < 2 ? RawMove(into) : 0;
        if (pass < 2 && moved != count) {
            std::printf("%s moved %zu of %zu files: is another device manager serving?\n", names[pass], moved, count);
            return 2;
        }
        if (pass == 2) code = ToolMove(ToolPath(), toolTarget, summary);
        seconds[pass] = SecondsSince(start);
        std::printf("%-33s %8.2f s  %6.1f ms a file  %zu %s, %zu left on the receiver\n", names[pass], seconds[pass],
                    seconds[pass] * 1000 / count, pass == 0 ? moved : FilesIn(into),
                    pass == 0 ? "moved" : "in the target", FilesIn(folder) - 1);
        std::fflush(stdout);
    }
    std::printf("  the tool's exit code %lu, its summary: %s\n", code, summary.c_str());
    std::printf("product / floor: %.3f   (floor + disk write) / floor: %.3f   product / (floor + disk write): %.3f\n",
                seconds[2] / seconds[0], seconds[1] / seconds[0], seconds[2] / seconds[1]);
    OleUninitialize();
    return 0;
}
