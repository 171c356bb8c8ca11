#include "LayoutPattern.h"

#include <cwchar>

namespace {
const struct {
    const wchar_t* name;
    int field;  // LayoutPattern::Field, from Receiver on
} kFields[] = {{L"receiver", 1}, {L"serial", 2}, {L"model", 3}, {L"brand", 4}, {L"yyyy", 5},
               {L"yy", 6},       {L"mm", 7},     {L"dd", 8},    {L"doy", 9}};

bool IsSeparator(wchar_t c) { return c == L'\\' || c == L'/'; }

bool Refuse(std::wstring& error, const std::wstring& why) {
    error = why;
    return false;
}

std::wstring Digits(int value, int width) {
    wchar_t text[16];
    swprintf(text, 16, L"%0*d", width, value);
    return text;
}

int DayOfYear(const SYSTEMTIME& day) {
    static const int kBefore[12] = {0, 31, 59, 90, 120, 151, 181, 212, 243, 273, 304, 334};
    const int year = day.wYear;
    const bool leap = (year % 4 == 0 && year % 100 != 0) || year % 400 == 0;
    const int month = day.wMonth >= 1 && day.wMonth <= 12 ? day.wMonth : 1;
    return kBefore[month - 1] + day.wDay + (leap && month > 2 ? 1 : 0);
}
}  // namespace

bool LayoutPattern::Parse(const std::wstring& pattern, std::wstring& error) {
    m_components.clear();
    if (pattern.empty()) return Refuse(error, L"empty pattern");
    if (IsSeparator(pattern[0])) return Refuse(error, L"absolute path \"" + pattern + L"\"");
    if (pattern.size() >= 2 && pattern[1] == L':' && iswalpha(pattern[0]))
        return Refuse(error, L"drive \"" + pattern.substr(0, 2) + L"\"");
    std::wstring text;
    for (size_t i = 0; i <= pattern.size(); ++i) {
        if (i < pattern.size() && !IsSeparator(pattern[i])) {
            text += pattern[i];
            continue;
        }
        if (text.empty()) return Refuse(error, L"empty folder name in \"" + pattern + L"\"");
        Component component;
        if (!ParseComponent(text, component, error)) return false;
        m_components.push_back(component);
        text.clear();
    }
    return true;
}

bool LayoutPattern::ParseComponent(const std::wstring& text, Component& component, std::wstring& error) {
    if (text == L"." || text == L"..") return Refuse(error, L"\"" + text + L"\" would leave the target");
    std::wstring sample;  // every field as "0": the literal text must name a folder as it stands
    for (size_t at = 0; at < text.size();) {
        const size_t open = text.find(L'{', at), close = text.find(L'}', at);
        if (close < open) return Refuse(error, L"\"}\" without \"{\" in \"" + text + L"\"");
        const size_t end = open == std::wstring::npos ? text.size() : open;
        if (end > at) component.push_back({Field::Text, text.substr(at, end - at)}), sample += component.back().text;
        if (open == std::wstring::npos) break;
        if (close == std::wstring::npos) return Refuse(error, L"unclosed field " + text.substr(open));
        const std::wstring name = text.substr(open + 1, close - open - 1), written = text.substr(open, close - open + 1);
        Field field = Field::Text;
        for (const auto& known : kFields)
            if (name == known.name) field = static_cast<Field>(known.field);
        if (field == Field::Text) return Refuse(error, L"unknown field " + written);
        component.push_back({field, written});
        sample += L"0";
        at = close + 1;
    }
    const SafeName safe = MakeSafeDescriptorName(sample, 0);
    if (safe.refused || !safe.reason.empty() || safe.name.find(L'\\') != std::wstring::npos)
        return Refuse(error, L"\"" + text + L"\" cannot name a folder (" + (safe.reason.empty() ? L"a separator" : safe.reason) + L")");
    return true;
}

bool LayoutPattern::IsDated() const {
    for (const Component& component : m_components)
        for (const Piece& piece : component)
            if (piece.field >= Field::Year) return true;
    return false;
}

bool LayoutPattern::Value(const Piece& piece, const LayoutReceiver& receiver, const SYSTEMTIME* logged,
                          std::wstring& value, SafeName& refusal) {
    const std::wstring* named = piece.field == Field::Receiver ? &receiver.display
                                : piece.field == Field::Serial ? &receiver.serial
                                : piece.field == Field::Model  ? &receiver.model
                                : piece.field == Field::Brand  ? &receiver.brand
                                                               : nullptr;
    if (named) {
        refusal = MakeSafeFolderName(*named, 0);
        value = refusal.name;
        return !refusal.refused;
    }
    if (piece.field == Field::Text || !logged) {
        value = piece.text;
        return true;
    }
    const int year = logged->wYear;
    switch (piece.field) {
    case Field::Year: value = Digits(year, 4); break;
    case Field::Year2: value = Digits(year % 100, 2); break;
    case Field::Month: value = Digits(logged->wMonth, 2); break;
    case Field::Day: value = Digits(logged->wDay, 2); break;
    default: value = Digits(DayOfYear(*logged), 3); break;
    }
    return true;
}

bool LayoutPattern::Expand(const LayoutReceiver& receiver, const SYSTEMTIME* logged, std::wstring& joined,
                           SafeName& refusal) const {
    for (const Component& component : m_components) {
        if (!joined.empty()) joined += L"\\";
        for (const Piece& piece : component) {
            std::wstring value;
            if (!Value(piece, receiver, logged, value, refusal)) return false;
            joined += value;
        }
    }
    return true;
}

SafeName LayoutPattern::Folder(const LayoutReceiver& receiver, const SYSTEMTIME& logged, size_t targetLength) const {
    std::wstring joined;
    SafeName refusal;
    // Written through extended paths: a deep target is limited only by each name's 255.
    return Expand(receiver, &logged, joined, refusal) ? MakeSafeDescriptorName(joined, targetLength, kLongPathLimit) : refusal;
}

SafeName LayoutPattern::Check(const LayoutReceiver& receiver, size_t targetLength) const {
    const SYSTEMTIME any = {2000, 1, 6, 1};
    return Folder(receiver, any, targetLength);
}

std::wstring LayoutPattern::Shown(const LayoutReceiver& receiver) const {
    std::wstring shown;
    SafeName refusal;
    Expand(receiver, nullptr, shown, refusal);  // a receiver refused is never shown
    return shown;
}
