#include "items/ItemPath.h"

#include <algorithm>

namespace {
std::vector<std::wstring> Split(const wchar_t* text, const wchar_t* separators, bool keepEmpty) {
    std::vector<std::wstring> parts;
    if (!text) return parts;
    std::wstring current;
    for (const wchar_t* p = text;; ++p) {
        const bool end = *p == L'\0';
        if (end || wcschr(separators, *p)) {
            if (keepEmpty || !current.empty()) parts.push_back(current);
            current.clear();
            if (end) break;
        } else {
            current += *p;
        }
    }
    return parts;
}

std::wstring Replace(std::wstring text, wchar_t from, wchar_t to) {
    std::replace(text.begin(), text.end(), from, to);
    return text;
}
}  // namespace

std::vector<std::wstring> SplitItemPath(const wchar_t* path) { return Split(path, L"\\/", false); }

std::wstring JoinItemPath(const std::vector<std::wstring>& parts, size_t first) {
    std::wstring joined;
    for (size_t i = first; i < parts.size(); ++i) {
        if (i > first) joined += L'\\';
        joined += parts[i];
    }
    return joined;
}

std::vector<std::wstring> SplitReceiverKey(const wchar_t* key) {
    if (!key || !*key) return {};
    return Split(key, L"!", true);
}

std::wstring ModelToKeyField(const std::wstring& model) { return Replace(model, L'/', L'#'); }
std::wstring ModelFromKeyField(const std::wstring& field) { return Replace(field, L'#', L'/'); }

std::wstring MakeReceiverKey(const std::wstring& serial, const std::wstring& model,
                             const std::wstring& portText) {
    return serial + L"!" + ModelToKeyField(model) + L"!" + portText;
}

std::wstring ReceiverLookupKey(const wchar_t* receiverKey) {
    std::vector<std::wstring> fields = SplitReceiverKey(receiverKey);
    if (fields.size() != 3) return std::wstring();
    return fields[2] + L"-" + fields[0];
}
