#include "LongPath.h"

#include <windows.h>

#include <vector>

namespace {
const wchar_t kExtended[] = L"\\\\?\\";
const wchar_t kExtendedUnc[] = L"\\\\?\\UNC\\";

bool StartsWith(const std::wstring& text, const wchar_t* start) { return text.compare(0, wcslen(start), start) == 0; }
}  // namespace

std::wstring LongPath(const std::wstring& path) {
    if (StartsWith(path, kExtended) || StartsWith(path, L"\\\\.\\")) return path;
    if (StartsWith(path, L"\\\\")) return kExtendedUnc + path.substr(2);
    if (path.size() >= 3 && iswalpha(path[0]) && path[1] == L':' && path[2] == L'\\') return kExtended + path;
    return path;
}

std::wstring FullPlainPath(const std::wstring& path) {
    std::vector<wchar_t> full(MAX_PATH);
    DWORD length = GetFullPathNameW(path.c_str(), static_cast<DWORD>(full.size()), full.data(), nullptr);
    if (length >= full.size()) {
        full.resize(length + 1);
        length = GetFullPathNameW(path.c_str(), static_cast<DWORD>(full.size()), full.data(), nullptr);
    }
    std::wstring result = length && length < full.size() ? std::wstring(full.data(), length) : path;
    if (StartsWith(result, kExtendedUnc)) result = L"\\\\" + result.substr(wcslen(kExtendedUnc));
    else if (StartsWith(result, kExtended)) result = result.substr(wcslen(kExtended));
    while (result.size() > 3 && (result.back() == L'\\' || result.back() == L'/')) result.pop_back();
    return result;
}
