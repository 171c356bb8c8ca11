#include "module/Settings.h"

#include "com/Handles.h"

const wchar_t kSettingsKey[] = L"Software\\Calvex\\Shell Extensions\\Calvex Receivers";
const wchar_t kDisplaySettingsValue[] = L"Display Settings";

bool ReadDisplaySettings(DisplayState& state) {
    state.NameColumnWidth = 100;
    state.SecondColumnWidth = 100;
    UniqueRegKey key;
    if (RegOpenKeyExW(HKEY_CURRENT_USER, kSettingsKey, 0, KEY_READ, key.Put()) != ERROR_SUCCESS)
        return false;
    // Room for 16 bytes: a longer value fails the query and the defaults stay.
    DWORD words[4] = {};
    DWORD size = sizeof words;
    DWORD type = 0;
    if (RegQueryValueExW(key.Get(), kDisplaySettingsValue, nullptr, &type,
                         reinterpret_cast<BYTE*>(words), &size) != ERROR_SUCCESS)
        return false;
    state.NameColumnWidth = static_cast<LONG>(words[0]);
    state.SecondColumnWidth = static_cast<LONG>(words[1]);
    return true;
}

bool WriteDisplaySettings(const DisplayState& state) {
    UniqueRegKey key;
    if (RegCreateKeyExW(HKEY_CURRENT_USER, kSettingsKey, 0, nullptr, REG_OPTION_NON_VOLATILE,
                        KEY_ALL_ACCESS, nullptr, key.Put(), nullptr) != ERROR_SUCCESS)
        return false;
    const DWORD words[3] = {static_cast<DWORD>(state.NameColumnWidth),
                            static_cast<DWORD>(state.SecondColumnWidth), 0};
    return RegSetValueExW(key.Get(), kDisplaySettingsValue, 0, REG_BINARY,
                          reinterpret_cast<const BYTE*>(words), sizeof words) == ERROR_SUCCESS;
}
