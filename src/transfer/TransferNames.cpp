#include "transfer/TransferNames.h"

#include <windows.h>

#include "items/ItemPath.h"

std::wstring TransferFileName(const std::wstring& itemPath) {
    const std::vector<std::wstring> parts = SplitItemPath(itemPath.c_str());
    return parts.size() < 3 ? std::wstring() : JoinItemPath(parts, 2);
}

std::wstring DeviceFileName(const std::wstring& itemPath) {
    std::wstring name = TransferFileName(itemPath);
    const size_t lastSeparator = name.find_last_of(L"\\/");
    const size_t dot = name.rfind(L'.');
    if (dot == std::wstring::npos || (lastSeparator != std::wstring::npos && dot < lastSeparator)) return name;
    if (CompareStringOrdinal(name.c_str() + dot, -1, L".qpr", -1, TRUE) == CSTR_EQUAL) name.erase(dot);
    return name;
}

std::wstring ShownFileName(const std::wstring& itemPath) {
    const size_t lastSeparator = itemPath.find_last_of(L"\\/");
    return lastSeparator == std::wstring::npos ? itemPath : itemPath.substr(lastSeparator + 1);
}
