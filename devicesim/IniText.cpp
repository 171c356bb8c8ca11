#include "IniText.h"

#include <windows.h>

#include <cerrno>
#include <cwchar>

namespace {

std::wstring Trim(const std::wstring& text) {
    const wchar_t* blanks = L" \t\r\n";
    size_t first = text.find_first_not_of(blanks);
    if (first == std::wstring::npos) return std::wstring();
    size_t last = text.find_last_not_of(blanks);
    return text.substr(first, last - first + 1);
}

std::wstring LineError(int number, const wchar_t* what) {
    return L"line " + std::to_wstring(number) + L": " + what;
}

}  // namespace

bool SameTextNoCase(const std::wstring& a, const std::wstring& b) { return CompareTextNoCase(a, b) == 0; }

int CompareTextNoCase(const std::wstring& a, const std::wstring& b) {
    int result = CompareStringOrdinal(a.c_str(), static_cast<int>(a.size()), b.c_str(),
                                      static_cast<int>(b.size()), TRUE);
    return result - CSTR_EQUAL;
}

std::wstring IniText::DecodeText(const std::string& bytes) {
    if (bytes.size() >= 2 && static_cast<unsigned char>(bytes[0]) == 0xFF &&
        static_cast<unsigned char>(bytes[1]) == 0xFE) {
        return std::wstring(reinterpret_cast<const wchar_t*>(bytes.data() + 2), (bytes.size() - 2) / 2);
    }
    size_t skip = bytes.compare(0, 3, "\xEF\xBB\xBF") == 0 ? 3 : 0;
    int size = static_cast<int>(bytes.size() - skip);
    int n = MultiByteToWideChar(CP_UTF8, 0, bytes.data() + skip, size, nullptr, 0);
    std::wstring text(static_cast<size_t>(n), L'\0');
    if (n > 0) MultiByteToWideChar(CP_UTF8, 0, bytes.data() + skip, size, &text[0], n);
    return text;
}

bool IniText::Parse(const std::string& bytes, std::wstring* error) {
    m_sections.clear();
    const std::wstring text = DecodeText(bytes);
    Section* current = nullptr;
    size_t start = 0;
    for (int number = 1; start <= text.size(); ++number) {
        size_t end = text.find(L'\n', start);
        if (end == std::wstring::npos) end = text.size();
        if (!ParseLine(Trim(text.substr(start, end - start)), number, &current, error)) return false;
        start = end + 1;
    }
    return true;
}

bool IniText::ParseLine(const std::wstring& line, int number, Section** current, std::wstring* error) {
    if (line.empty() || line[0] == L';') return true;
    if (line[0] == L'[') {
        if (line.back() != L']' || line.size() < 3) {
            *error = LineError(number, L"bad section header");
            return false;
        }
        *current = FindOrAdd(Trim(line.substr(1, line.size() - 2)));
        return true;
    }
    size_t equals = line.find(L'=');
    if (equals == std::wstring::npos || equals == 0) {
        *error = LineError(number, L"expected key=value");
        return false;
    }
    if (!*current) {
        *error = LineError(number, L"key outside a section");
        return false;
    }
    Entry entry{Trim(line.substr(0, equals)), Trim(line.substr(equals + 1)), number};
    for (const Entry& existing : (*current)->entries) {
        if (SameTextNoCase(existing.key, entry.key)) {
            *error = LineError(number, L"key given twice");
            return false;
        }
    }
    (*current)->entries.push_back(entry);
    return true;
}

const IniText::Section* IniText::Find(const std::wstring& name) const {
    for (const Section& section : m_sections)
        if (SameTextNoCase(section.name, name)) return &section;
    return nullptr;
}

IniText::Section* IniText::FindOrAdd(const std::wstring& name) {
    for (Section& section : m_sections)
        if (SameTextNoCase(section.name, name)) return &section;
    m_sections.push_back(Section{name, {}});
    return &m_sections.back();
}

bool ParseInteger32(const std::wstring& text, long* value) {
    if (text.empty()) return false;
    const bool hex = text.size() > 2 && text[0] == L'0' && (text[1] == L'x' || text[1] == L'X');
    wchar_t* end = nullptr;
    errno = 0;
    if (hex) {
        unsigned long long bits = wcstoull(text.c_str() + 2, &end, 16);
        if (errno || *end || bits > 0xFFFFFFFFull || text[2] == L'-' || text[2] == L'+') return false;
        *value = static_cast<long>(static_cast<unsigned long>(bits));
        return true;
    }
    long long number = wcstoll(text.c_str(), &end, 10);
    if (errno || *end || number < -2147483648LL || number > 2147483647LL) return false;
    *value = static_cast<long>(number);
    return true;
}
