// calvex_process_sampler NAME [INTERVAL_MS] [--types]: waits for a process of that executable
// name, then prints one line per interval until it ends: seconds since the first sample, its
// handle count and its thread count; with --types also a line of its handles by kind (and the
// names of its file and key handles), to tell what a growing count is made of. The soak (scripts/soak-watch.sh) judges from these, with the private
// memory it reads on the Linux side, whether a long watch leaks.
//
// Handles are counted in the system's handle table (HandleTable.h).
#include <windows.h>
#include <winternl.h>
#include <tlhelp32.h>

#include <cstdio>
#include <cstdlib>
#include <map>
#include <string>
#include <vector>

#include "HandleTable.h"

namespace {
// The process id and thread count of the first process of that name, 0 when there is none.
DWORD FindProcess(const wchar_t* name, DWORD* threads) {
    HANDLE snapshot = CreateToolhelp32Snapshot(TH32CS_SNAPPROCESS, 0);
    if (snapshot == INVALID_HANDLE_VALUE) return 0;
    PROCESSENTRY32W entry = {sizeof(entry)};
    DWORD found = 0;
    for (BOOL more = Process32FirstW(snapshot, &entry); more && !found; more = Process32NextW(snapshot, &entry)) {
        if (lstrcmpiW(entry.szExeFile, name) != 0) continue;
        found = entry.th32ProcessID;
        *threads = entry.cntThreads;
    }
    CloseHandle(snapshot);
    return found;
}

using QueryObject = NTSTATUS(NTAPI*)(HANDLE, OBJECT_INFORMATION_CLASS, PVOID, ULONG, PULONG);

// What NtQueryObject says of a handle: its kind, or its name (ObjectNameInformation is 1).
std::wstring ObjectText(HANDLE handle, int what) {
    static const auto query = reinterpret_cast<QueryObject>(
        reinterpret_cast<void*>(GetProcAddress(GetModuleHandleW(L"ntdll.dll"), "NtQueryObject")));
    alignas(8) BYTE buffer[4096];
    if (query(handle, static_cast<OBJECT_INFORMATION_CLASS>(what), buffer, sizeof(buffer), nullptr) < 0) return L"?";
    const auto* text = reinterpret_cast<const UNICODE_STRING*>(buffer);
    return std::wstring(text->Buffer, text->Length / sizeof(wchar_t));
}

// "Event=12 File=30 ... | File:\\Device\\NamedPipe\\x ..." for the process's handles.
void PrintKinds(DWORD id, HANDLE process) {
    const std::vector<BYTE> buffer = HandleTable();
    if (buffer.empty()) return;
    const auto* table = reinterpret_cast<const SYSTEM_HANDLE_INFORMATION*>(buffer.data());
    std::map<std::wstring, int> kinds, names;
    for (ULONG i = 0; i < table->Count; ++i) {
        if (table->Handle[i].OwnerPid != id) continue;
        HANDLE copy = nullptr;
        if (!DuplicateHandle(process, reinterpret_cast<HANDLE>(static_cast<ULONG_PTR>(table->Handle[i].HandleValue)),
                             GetCurrentProcess(), &copy, 0, FALSE, DUPLICATE_SAME_ACCESS)) {
            ++kinds[L"(not copied)"];
            continue;
        }
        const std::wstring kind = ObjectText(copy, 2);  // ObjectTypeInformation
        ++kinds[kind];
        if (kind == L"File" || kind == L"Key") ++names[kind + L":" + ObjectText(copy, 1)];
        CloseHandle(copy);
    }
    std::wstring line = L"kinds";
    for (const auto& kind : kinds) line += L" " + kind.first + L"=" + std::to_wstring(kind.second);
    line += L" |";
    for (const auto& name : names) line += L" " + name.first + L"=" + std::to_wstring(name.second);
    std::printf("%ls\n", line.c_str());
}
}  // namespace

int wmain(int argc, wchar_t** argv) {
    if (argc < 2) {
        std::fprintf(stderr, "usage: calvex_process_sampler NAME [INTERVAL_MS] [--types]\n");
        return 2;
    }
    const DWORD interval = argc > 2 ? static_cast<DWORD>(_wtoi(argv[2])) : 5000;
    DWORD threads = 0, id = 0;
    for (int tries = 0; !(id = FindProcess(argv[1], &threads)) && tries < 600; ++tries) Sleep(100);
    const bool kinds = argc > 3 && lstrcmpW(argv[3], L"--types") == 0;
    HANDLE process = id ? OpenProcess(SYNCHRONIZE | PROCESS_DUP_HANDLE, FALSE, id) : nullptr;
    if (!process) {
        std::fprintf(stderr, "no process %ls\n", argv[1]);
        return 2;
    }
    const ULONGLONG started = GetTickCount64();
    do {
        FindProcess(argv[1], &threads);
        std::printf("%llu %ld %lu\n", (GetTickCount64() - started) / 1000, HandleCount(id), threads);
        if (kinds) PrintKinds(id, process);
        std::fflush(stdout);
    } while (WaitForSingleObject(process, interval) == WAIT_TIMEOUT);
    CloseHandle(process);
    return 0;
}
