#include "SimSettings.h"

#include <windows.h>

#include "SimLog.h"
#include "com/Handles.h"

namespace {

void LogBadValue(const std::wstring& name, const std::wstring& reason) {
    SimLog::Write(L"registry value " + name + L" ignored: " + reason);
}

void ReadTransfer(HKEY key, SimFaults* faults) {
    for (const wchar_t* name :
         {L"Rate", L"FailAtPercent", L"FailResult", L"ExitAtPercent", L"GrowAtPercent", L"RetimeAtPercent"}) {
        DWORD value = 0, size = sizeof value;
        if (RegGetValueW(key, nullptr, name, RRF_RT_REG_DWORD, nullptr, &value, &size) != ERROR_SUCCESS) continue;
        std::wstring reason;
        if (!faults->SetTransfer(name, static_cast<long>(value), &reason)) LogBadValue(name, reason);
    }
}

void ReadCallFailures(HKEY key, SimFaults* faults) {
    UniqueRegKey fail;
    if (RegOpenKeyExW(key, L"Fail", 0, KEY_READ, fail.Put()) != ERROR_SUCCESS) return;
    for (DWORD index = 0;; ++index) {
        wchar_t name[256];
        DWORD nameLength = 256, type = 0, value = 0, size = sizeof value;
        LONG status = RegEnumValueW(fail.Get(), index, name, &nameLength, nullptr, &type,
                                    reinterpret_cast<BYTE*>(&value), &size);
        if (status == ERROR_NO_MORE_ITEMS) return;
        if (status != ERROR_SUCCESS || type != REG_DWORD) {
            LogBadValue(std::wstring(L"Fail\\") + name, L"not a DWORD");
            continue;
        }
        std::wstring reason;
        if (!faults->SetCallFailure(name, static_cast<HRESULT>(value), &reason))
            LogBadValue(std::wstring(L"Fail\\") + name, reason);
    }
}

}  // namespace

const wchar_t SimSettings::kKey[] = L"Software\\Calvex\\DeviceSim";

std::wstring SimSettings::RegistryRoot() {
    wchar_t root[MAX_PATH * 2] = L"";
    DWORD size = sizeof root;
    // RRF_RT_REG_EXPAND_SZ without RRF_NOEXPAND is ERROR_INVALID_PARAMETER.
    if (RegGetValueW(HKEY_CURRENT_USER, kKey, L"Root", RRF_RT_REG_SZ | RRF_RT_REG_EXPAND_SZ | RRF_NOEXPAND, nullptr,
                     root, &size) != ERROR_SUCCESS)
        return std::wstring();
    return root;
}

SimFaults SimSettings::GlobalFaults() {
    SimFaults faults;
    UniqueRegKey key;
    if (RegOpenKeyExW(HKEY_CURRENT_USER, kKey, 0, KEY_READ, key.Put()) != ERROR_SUCCESS) return faults;
    ReadTransfer(key.Get(), &faults);
    ReadCallFailures(key.Get(), &faults);
    return faults;
}
