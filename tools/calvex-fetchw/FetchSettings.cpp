#include "FetchSettings.h"

#include <shlobj.h>

#include <vector>

#include "com/Handles.h"
#include "LayoutPattern.h"
#include "SettingsChoice.h"

const wchar_t kFetchSettingsKey[] = L"Software\\Calvex\\Receivers Shell Extension";

namespace {
using Report = std::function<void(const std::wstring&)>;

enum class Stored { Missing, Text, Damaged };

// A string value as stored; Damaged with the reason when it is of another type or too long.
Stored ReadText(HKEY key, const wchar_t* name, std::wstring& text) {
    DWORD type = 0, bytes = 0;
    if (!key || RegQueryValueExW(key, name, nullptr, &type, nullptr, &bytes) != ERROR_SUCCESS) return Stored::Missing;
    if ((type != REG_SZ && type != REG_EXPAND_SZ) || bytes > 64 * 1024) {
        text = L"not a string";
        return Stored::Damaged;
    }
    std::vector<wchar_t> buffer(bytes / sizeof(wchar_t) + 2, L'\0');
    bytes = static_cast<DWORD>(buffer.size() * sizeof(wchar_t));
    if (RegQueryValueExW(key, name, nullptr, &type, reinterpret_cast<BYTE*>(buffer.data()), &bytes) != ERROR_SUCCESS) {
        text = L"unreadable";
        return Stored::Damaged;
    }
    text = buffer.data();
    if (type == REG_EXPAND_SZ) {
        wchar_t expanded[MAX_PATH];
        const DWORD length = ExpandEnvironmentStringsW(text.c_str(), expanded, MAX_PATH);
        if (length && length <= MAX_PATH) text = expanded;
    }
    return Stored::Text;
}

void Damaged(const Report& report, const wchar_t* name, const std::wstring& why, const std::wstring& used) {
    if (report) report(std::wstring(L"settings: ") + name + L" is damaged (" + why + L"), " + used + L" is used");
}

// "1" or "0"; empty is "not given" (the installer writes a property left out as empty).
void ReadSwitch(HKEY key, const wchar_t* name, bool& value, const Report& report) {
    std::wstring text;
    const Stored stored = ReadText(key, name, text);
    if (stored == Stored::Missing || (stored == Stored::Text && text.empty())) return;
    if (stored == Stored::Text && (text == L"1" || text == L"0")) {
        value = text == L"1";
        return;
    }
    Damaged(report, name, stored == Stored::Text ? L"\"" + text + L"\" is neither 1 nor 0" : text, value ? L"on" : L"off");
}

void ReadTarget(HKEY key, FetchSettings& settings, const Report& report) {
    std::wstring text;
    const Stored stored = ReadText(key, L"FetchDir", text);
    if (stored == Stored::Missing) return;
    std::wstring why = text;
    if (stored == Stored::Text) {
        why = SettingsChoice::TargetFormProblem(text);
        if (why.empty()) {
            settings.target = SettingsChoice::TrimmedTarget(text);
            return;
        }
    }
    Damaged(report, L"FetchDir", why, settings.target);
}

void ReadLayout(HKEY key, FetchSettings& settings, const Report& report) {
    std::wstring text;
    const Stored stored = ReadText(key, L"FetchLayout", text);
    if (stored == Stored::Missing || (stored == Stored::Text && text.empty())) return;
    std::wstring why = text;
    LayoutPattern pattern;
    if (stored == Stored::Text && pattern.Parse(text, why)) {
        settings.layout = text;
        return;
    }
    Damaged(report, L"FetchLayout", why, settings.layout);
}

bool WriteText(HKEY key, const wchar_t* name, const std::wstring& text, std::wstring& error) {
    const LONG result = RegSetValueExW(key, name, 0, REG_SZ, reinterpret_cast<const BYTE*>(text.c_str()),
                                       static_cast<DWORD>((text.size() + 1) * sizeof(wchar_t)));
    if (result == ERROR_SUCCESS) return true;
    error = std::wstring(L"the setting ") + name + L" cannot be stored (error " + std::to_wstring(result) + L")";
    return false;
}
}  // namespace

std::wstring DefaultFetchTarget() {
    wchar_t documents[MAX_PATH] = L"";
    if (FAILED(SHGetFolderPathW(nullptr, CSIDL_PERSONAL, nullptr, SHGFP_TYPE_CURRENT, documents))) return L"C:\\Survey";
    return std::wstring(documents) + L"\\Survey";
}

FetchSettings ReadFetchSettings(HKEY key, const Report& report) {
    FetchSettings settings;
    settings.target = DefaultFetchTarget();
    ReadTarget(key, settings, report);
    ReadSwitch(key, L"FetchMove", settings.move, report);
    ReadLayout(key, settings, report);
    ReadSwitch(key, L"FetchNotify", settings.notify, report);
    ReadSwitch(key, L"FetchStartAtLogon", settings.startAtLogon, report);
    return settings;
}

bool WriteFetchSettings(HKEY key, const FetchSettings& settings, std::wstring& error) {
    return WriteText(key, L"FetchDir", settings.target, error) &&
           WriteText(key, L"FetchMove", settings.move ? L"1" : L"0", error) &&
           WriteText(key, L"FetchLayout", settings.layout, error) &&
           WriteText(key, L"FetchNotify", settings.notify ? L"1" : L"0", error) &&
           WriteText(key, L"FetchStartAtLogon", settings.startAtLogon ? L"1" : L"0", error);
}

FetchSettings LoadFetchSettings(const Report& report) {
    try {
        UniqueRegKey key;
        RegOpenKeyExW(HKEY_CURRENT_USER, kFetchSettingsKey, 0, KEY_QUERY_VALUE, key.Put());
        return ReadFetchSettings(key.Get(), report);
    } catch (...) {  // out of memory: the defaults still let the watch run
        FetchSettings settings;
        settings.target = DefaultFetchTarget();
        return settings;
    }
}

bool SaveFetchSettings(const FetchSettings& settings, std::wstring& error) {
    UniqueRegKey key;
    const LONG result = RegCreateKeyExW(HKEY_CURRENT_USER, kFetchSettingsKey, 0, nullptr, 0, KEY_SET_VALUE, nullptr,
                                        key.Put(), nullptr);
    if (result != ERROR_SUCCESS) {
        error = L"the settings cannot be stored (error " + std::to_wstring(result) + L")";
        return false;
    }
    return WriteFetchSettings(key.Get(), settings, error);
}
