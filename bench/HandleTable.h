#pragma once
// The system's handle table, read the way that works under Wine 8: it answers
// GetProcessHandleCount (even for the calling process) and GetProcessMemoryInfo for another
// process with zeros, but fills SystemHandleInformation.
#include <windows.h>
#include <winternl.h>

#include <vector>

// The raw SYSTEM_HANDLE_INFORMATION, empty when the system will not tell.
inline std::vector<BYTE> HandleTable() {
    using QuerySystem = NTSTATUS(NTAPI*)(SYSTEM_INFORMATION_CLASS, PVOID, ULONG, PULONG);
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
        if (status < 0) return {};
        return buffer;
    }
}

// How many handles the process holds, -1 when the system will not tell.
inline long HandleCount(DWORD process) {
    const std::vector<BYTE> buffer = HandleTable();
    if (buffer.empty()) return -1;
    const auto* table = reinterpret_cast<const SYSTEM_HANDLE_INFORMATION*>(buffer.data());
    long count = 0;
    for (ULONG i = 0; i < table->Count; ++i) count += table->Handle[i].OwnerPid == process;
    return count;
}
