#include "transfer/TransferNames.h"

#include "items/DeviceManagerClient.h"
#include "items/ItemPath.h"

std::wstring TransferFileName(const std::wstring& itemPath) {
    const std::vector<std::wstring> parts = SplitItemPath(itemPath.c_str());
    return parts.size() < 3 ? std::wstring() : JoinItemPath(parts, 2);
}

std::wstring DeviceFileName(const std::wstring& itemPath) { return FileDeviceName(TransferFileName(itemPath)); }

std::wstring ShownFileName(const std::wstring& itemPath) {
    const size_t lastSeparator = itemPath.find_last_of(L"\\/");
    return lastSeparator == std::wstring::npos ? itemPath : itemPath.substr(lastSeparator + 1);
}
