#pragma once
// A small INI reader for the receiver description files: "[section]" lines, "key=value"
// lines, ";" comments. Unlike GetPrivateProfileString it reads UTF-8 (and UTF-16 with a byte
// order mark), so labels and file names may hold any character, and it reports what is wrong.
#include <string>
#include <vector>

class IniText {
public:
    struct Entry {
        std::wstring key;
        std::wstring value;
        int line = 0;
    };
    struct Section {
        std::wstring name;
        std::vector<Entry> entries;
    };

    // False with a one-line reason for text that is not an INI file (a line that is neither a
    // section, a key nor a comment; a key before any section; a key twice in one section).
    bool Parse(const std::string& bytes, std::wstring* error);

    const std::vector<Section>& Sections() const { return m_sections; }
    // Section names compare without regard to case; null when absent.
    const Section* Find(const std::wstring& name) const;

    static std::wstring DecodeText(const std::string& bytes);

private:
    Section* FindOrAdd(const std::wstring& name);
    bool ParseLine(const std::wstring& line, int number, Section** current, std::wstring* error);

    std::vector<Section> m_sections;
};

// Ordinal comparison without regard to case, as the file system compares names.
bool SameTextNoCase(const std::wstring& a, const std::wstring& b);
int CompareTextNoCase(const std::wstring& a, const std::wstring& b);

// Decimal (optionally negative) or "0x" hexadecimal; false for anything else or a value that
// does not fit in 32 bits (hexadecimal up to 0xFFFFFFFF, read as the bits of the result).
bool ParseInteger32(const std::wstring& text, long* value);
