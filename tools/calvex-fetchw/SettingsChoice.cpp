#include "SettingsChoice.h"

#include <cwctype>

#include "com/Handles.h"

const SettingsChoice::Layout SettingsChoice::kLayouts[] = {
    {L"by receiver", L"{receiver}"},
    {L"by receiver, year and day of year", L"{receiver}\\{yyyy}\\{doy}"},
    {L"by year and day, then receiver", L"{yyyy}\\{doy}\\{receiver}"},
    {L"a pattern of my own", nullptr},
};
const int SettingsChoice::kLayoutCount = 4;
const int SettingsChoice::kOwnPattern = 3;

int SettingsChoice::LayoutIndex(const std::wstring& pattern) {
    for (int i = 0; i < kOwnPattern; ++i)
        if (pattern == kLayouts[i].pattern) return i;
    return kOwnPattern;
}

std::wstring SettingsChoice::LayoutOf(int index, const std::wstring& typed) {
    return index >= 0 && index < kOwnPattern ? kLayouts[index].pattern : typed;
}

std::wstring SettingsChoice::TrimmedTarget(const std::wstring& text) {
    const size_t first = text.find_first_not_of(L" \t");
    if (first == std::wstring::npos) return L"";
    std::wstring target = text.substr(first, text.find_last_not_of(L" \t") - first + 1);
    while (target.size() > 3 && (target.back() == L'\\' || target.back() == L'/')) target.pop_back();
    return target;
}

std::wstring SettingsChoice::TargetFormProblem(const std::wstring& text) {
    const std::wstring target = TrimmedTarget(text);
    if (target.empty()) return L"Choose the folder for the files.";
    const bool drive = target.size() >= 3 && iswalpha(target[0]) && target[1] == L':' &&
                       (target[2] == L'\\' || target[2] == L'/');
    const bool share = target.size() > 2 && target[0] == L'\\' && target[1] == L'\\';
    if (!drive && !share) return L"Give the whole path of the folder, such as D:\\Survey.";
    if (target.find_first_of(L"<>\"|?*", 2) != std::wstring::npos || target.find(L':', 2) != std::wstring::npos)
        return L"A folder name cannot hold any of : < > \" | ? *";
    return L"";
}

SettingsChoice::Target SettingsChoice::CheckTarget(const std::wstring& text, std::wstring& problem) {
    problem = TargetFormProblem(text);
    if (!problem.empty()) return Target::Unusable;
    const std::wstring target = TrimmedTarget(text);
    const DWORD attributes = GetFileAttributesW(target.c_str());
    if (attributes == INVALID_FILE_ATTRIBUTES) {
        const DWORD error = GetLastError();
        if (error == ERROR_FILE_NOT_FOUND || error == ERROR_PATH_NOT_FOUND) {
            problem = L"This folder does not exist yet.";
            return Target::Missing;
        }
        problem = L"This folder cannot be reached.";
        return Target::Unusable;
    }
    if (!(attributes & FILE_ATTRIBUTE_DIRECTORY)) {
        problem = L"This is a file, not a folder.";
        return Target::Unusable;
    }
    // A folder shown as writable may still refuse a new file (rights, a full or read-only disk).
    const std::wstring probe = target + (target.back() == L'\\' ? L"" : L"\\") + L".calvex-settings-probe";
    UniqueFile file(CreateFileW(probe.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS,
                                FILE_ATTRIBUTE_TEMPORARY | FILE_FLAG_DELETE_ON_CLOSE, nullptr));
    if (!file) {
        problem = L"Files cannot be written in this folder.";
        return Target::Unusable;
    }
    return Target::Fine;
}

LayoutReceiver SettingsChoice::SampleReceiver() {
    return {L"Q9 GNSS@USB", L"5211-40125", L"Q9 GNSS", L"Calvex"};
}

bool SettingsChoice::Example(const std::wstring& target, const std::wstring& layout,
                             const std::vector<LayoutReceiver>& connected, const SYSTEMTIME& logged, std::wstring& text) {
    LayoutPattern pattern;
    if (!pattern.Parse(layout, text)) return false;
    const LayoutReceiver receiver = connected.empty() ? SampleReceiver() : connected.front();
    const std::wstring folder = TrimmedTarget(target);
    const SafeName name = pattern.Folder(receiver, logged, folder.size());
    if (name.refused) {
        text = name.reason;
        return false;
    }
    wchar_t day[16];
    swprintf(day, 16, L"%04u-%02u-%02u", logged.wYear, logged.wMonth, logged.wDay);
    text = L"A file that " + receiver.display + L" logs on " + day + L" goes to " +
           (folder.empty() ? L"..." : folder) + (folder.empty() || folder.back() != L'\\' ? L"\\" : L"") + name.name;
    return true;
}
