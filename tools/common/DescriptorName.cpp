#include "DescriptorName.h"

#include <windows.h>

#include <vector>

const wchar_t kPartialSuffix[] = L".calvex-partial";

namespace {
constexpr size_t MaxName = 255;  // what file systems keep of one name

bool IsSeparator(wchar_t c) { return c == L'\\' || c == L'/'; }

std::vector<std::wstring> Split(const std::wstring& name) {
    std::vector<std::wstring> parts(1);
    for (wchar_t c : name) {
        if (IsSeparator(c)) parts.emplace_back();
        else parts.back() += c;
    }
    return parts;
}

SafeName Refuse(const std::wstring& reason) {
    SafeName result;
    result.refused = true;
    result.reason = reason;
    return result;
}

void Note(SafeName& result, const wchar_t* change) {
    if (result.reason.find(change) != std::wstring::npos) return;
    if (!result.reason.empty()) result.reason += L"; ";
    result.reason += change;
}

// CON, PRN, AUX, NUL, COM1-9, LPT1-9 (also with the superscript digits 1-3, which Windows
// reserves as well), CONIN$ and CONOUT$: in any case, with any extension ("nul.tar.gz") and
// with spaces before it.
bool IsReservedDeviceName(const std::wstring& component) {
    std::wstring base = component.substr(0, component.find(L'.'));
    while (!base.empty() && base.back() == L' ') base.pop_back();
    for (wchar_t& c : base) c = static_cast<wchar_t>(towupper(c));
    if (base == L"CON" || base == L"PRN" || base == L"AUX" || base == L"NUL" || base == L"CONIN$" || base == L"CONOUT$")
        return true;
    return base.size() == 4 && (base.compare(0, 3, L"COM") == 0 || base.compare(0, 3, L"LPT") == 0) &&
           ((base[3] >= L'1' && base[3] <= L'9') || wcschr(L"\u00B9\u00B2\u00B3", base[3]) != nullptr);
}

bool IsForbiddenCharacter(wchar_t c) {
    return c < 0x20 || c == 0x7F || wcschr(L"<>:\"|?*", c) != nullptr;
}

// One component made safe in place; false with the reason when it is refused.
bool MakeSafeComponent(std::wstring& part, SafeName& result) {
    if (part.empty()) {
        result = Refuse(L"empty path component");
        return false;
    }
    if (part == L"." || part == L"..") {
        result = Refuse(L"\"" + part + L"\" component");
        return false;
    }
    for (wchar_t& c : part) {
        if (!IsForbiddenCharacter(c)) continue;
        Note(result, c < 0x20 || c == 0x7F ? L"control characters replaced" : L"characters not allowed in names replaced");
        c = L'_';
    }
    size_t end = part.size();
    while (end > 0 && (part[end - 1] == L'.' || part[end - 1] == L' ')) --end;
    if (end == 0) {
        result = Refuse(L"component of dots and spaces only");
        return false;
    }
    if (end != part.size()) {
        Note(result, L"trailing dots and spaces removed");
        part.resize(end);
    }
    if (IsReservedDeviceName(part)) {
        Note(result, L"reserved device name prefixed");
        part.insert(0, 1, L'_');
    }
    return true;
}

SafeName MakeSafeParts(std::vector<std::wstring> parts, size_t targetLength, size_t pathLimit) {
    SafeName result;
    std::wstring joined;
    for (std::wstring& part : parts) {
        if (!MakeSafeComponent(part, result)) return result;
        joined += (joined.empty() ? L"" : L"\\") + part;
    }
    // The last name also carries the temporary suffix while it is written.
    if (parts.back().size() + wcslen(kPartialSuffix) > MaxName) return Refuse(L"too long for the target folder");
    for (const std::wstring& part : parts)
        if (part.size() > MaxName) return Refuse(L"too long for the target folder");
    if (targetLength + 1 + joined.size() + wcslen(kPartialSuffix) > pathLimit) return Refuse(L"too long for the target folder");
    result.name = joined;
    return result;
}
}  // namespace

SafeName MakeSafeDescriptorName(const std::wstring& name, size_t targetLength, size_t pathLimit) {
    if (name.empty()) return Refuse(L"empty name");
    if (name.size() >= 2 && IsSeparator(name[0]) && IsSeparator(name[1])) return Refuse(L"UNC or device path");
    if (IsSeparator(name[0])) return Refuse(L"absolute path");
    if (name.size() >= 2 && name[1] == L':' && iswalpha(name[0])) return Refuse(L"drive prefix");
    return MakeSafeParts(Split(name), targetLength, pathLimit);
}

SafeName MakeSafeFolderName(const std::wstring& displayName, size_t targetLength, size_t pathLimit) {
    std::wstring flat = displayName;
    bool changed = false;
    for (wchar_t& c : flat) {
        if (!IsSeparator(c)) continue;
        c = L'_';
        changed = true;
    }
    SafeName result = MakeSafeParts({flat}, targetLength, pathLimit);
    if (changed && !result.refused) Note(result, L"separators replaced");
    return result;
}
