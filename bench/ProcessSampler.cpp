// calvex_process_sampler NAME [INTERVAL_MS]: waits for a process of that executable name, then
// prints one line per interval until it ends: seconds since the first sample, its handle count
// and its thread count. The soak (scripts/soak-watch.sh) judges from these, with the private
// memory it reads on the Linux side, whether a long watch leaks.
//
// Handles are counted in the system's handle table: Wine 8 answers GetProcessHandleCount and
// GetProcessMemoryInfo for another process with zeros, but fills SystemHandleInformation.
#include <windows.h>
#include <winternl.h>
#include <tlhelp32.h>

#include <cstdio>
#include <cstdlib>
#include <vector>

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

using QuerySystem = NTSTATUS(NTAPI*)(SYSTEM_INFORMATION_CLASS, PVOID, ULONG, PULONG);

long HandleCount(DWORD process) {
    static const auto query = reinterpret_cast<QuerySystem>(
        reinterpret_cast<void*>(GetProcAddress(GetModuleHandleW(L"ntdll.dll"), "NtQuerySystemInformation")));
    std::vector<BYTE> buffer(1 << 20);
    for (;;) {
        ULONG needed = 0;
        const NTSTATUS status = query(SystemHandleInformation, buffer.data(), static_cast<ULONG>(buffer.size()), &needed);
        if (status == static_cast<NTSTATUS>(0xC0000004L)) {  // STATUS_INFO_LENGTH_MISMATCH
            buffer.resize(buffer.size() * 2);
            continue;
        }
        if (status < 0) return -1;
        break;
    }
    const auto* table = reinterpret_cast<const SYSTEM_HANDLE_INFORMATION*>(buffer.data());
    long count = 0;
    for (ULONG i = 0; i < table->Count; ++i) count += table->Handle[i].OwnerPid == process;
    return count;
}
}  // namespace

int wmain(int argc, wchar_t** argv) {
    if (argc < 2) {
        std::fprintf(stderr, "usage: calvex_process_sampler NAME [INTERVAL_MS]\n");
        return 2;
    }
    const DWORD interval = argc > 2 ? static_cast<DWORD>(_wtoi(argv[2])) : 5000;
    DWORD threads = 0, id = 0;
    for (int tries = 0; !(id = FindProcess(argv[1], &threads)) && tries < 600; ++tries) Sleep(100);
    HANDLE process = id ? OpenProcess(SYNCHRONIZE, FALSE, id) : nullptr;
    if (!process) {
        std::fprintf(stderr, "no process %ls\n", argv[1]);
        return 2;
    }
    const ULONGLONG started = GetTickCount64();
    do {
        FindProcess(argv[1], &threads);
        std::printf("%llu %ld %lu\n", (GetTickCount64() - started) / 1000, HandleCount(id), threads);
        std::fflush(stdout);
    } while (WaitForSingleObject(process, interval) == WAIT_TIMEOUT);
    CloseHandle(process);
    return 0;
}
