#include "ReceiverTreeLoader.h"

#include <algorithm>
#include <functional>

#include "com/Handles.h"

namespace {

struct FindTraits {
    using Type = HANDLE;
    static Type Invalid() { return INVALID_HANDLE_VALUE; }
    static bool IsValid(Type h) { return h != INVALID_HANDLE_VALUE; }
    static void Close(Type h) { FindClose(h); }
};
using UniqueFind = UniqueResource<FindTraits>;

std::wstring Win32Reason(const wchar_t* what, DWORD error) {
    wchar_t code[32];
    swprintf(code, 32, L" (error %lu)", error);
    return what + std::wstring(code);
}

// Calls visit for every entry but "." and ".."; the Win32 error when the folder cannot be read.
DWORD ForEachEntry(const std::wstring& folder, const std::function<void(const WIN32_FIND_DATAW&)>& visit) {
    WIN32_FIND_DATAW data;
    UniqueFind find(FindFirstFileExW((folder + L"\\*").c_str(), FindExInfoBasic, &data, FindExSearchNameMatch,
                                     nullptr, 0));
    if (!find) return GetLastError();
    do {
        if (wcscmp(data.cFileName, L".") != 0 && wcscmp(data.cFileName, L"..") != 0) visit(data);
    } while (FindNextFileW(find.Get(), &data));
    DWORD error = GetLastError();
    return error == ERROR_NO_MORE_FILES ? ERROR_SUCCESS : error;
}

DATE LocalOleDate(const FILETIME& utc) {
    SYSTEMTIME universal, local;
    DATE date = 0;
    if (FileTimeToSystemTime(&utc, &universal) && SystemTimeToTzSpecificLocalTime(nullptr, &universal, &local))
        SystemTimeToVariantTime(&local, &date);
    return date;
}

bool IsFolder(const WIN32_FIND_DATAW& data) { return (data.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY) != 0; }

}  // namespace

const wchar_t ReceiverTreeLoader::kDescriptionFile[] = L"receiver.ini";

DWORD ReceiverTreeLoader::ReadBytes(const std::wstring& path, std::string* bytes) {
    bytes->clear();
    UniqueFile file(CreateFileW(path.c_str(), GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE,
                                nullptr, OPEN_EXISTING, FILE_ATTRIBUTE_NORMAL, nullptr));
    if (!file) return GetLastError();
    char buffer[65536];
    DWORD read = 0;
    for (;;) {
        if (!ReadFile(file.Get(), buffer, sizeof buffer, &read, nullptr)) return GetLastError();
        if (read == 0) return ERROR_SUCCESS;
        bytes->append(buffer, read);
    }
}

SimTreeScan ReceiverTreeLoader::Scan(const std::wstring& root) {
    SimTreeScan scan;
    std::vector<std::wstring> names;
    DWORD error = ForEachEntry(root, [&](const WIN32_FIND_DATAW& data) {
        if (IsFolder(data)) names.push_back(data.cFileName);
    });
    scan.rootFound = error == ERROR_SUCCESS;
    std::sort(names.begin(), names.end(),
              [](const std::wstring& a, const std::wstring& b) { return CompareTextNoCase(a, b) < 0; });
    for (const std::wstring& name : names) {
        const std::wstring path = root + L"\\" + name;
        scan.folders.push_back(path);
        auto record = std::make_shared<SimReceiverRecord>();
        std::wstring reason;
        if (LoadReceiver(path, name, record.get(), &reason))
            scan.receivers.push_back(record);
        else
            scan.skipped.push_back({name, reason});
    }
    return scan;
}

bool ReceiverTreeLoader::LoadReceiver(const std::wstring& folderPath, const std::wstring& folderName,
                                      SimReceiverRecord* record, std::wstring* reason) {
    record->folderName = folderName;
    record->folderPath = folderPath;
    std::string bytes;
    DWORD error = ReadBytes(folderPath + L"\\" + kDescriptionFile, &bytes);
    if (error != ERROR_SUCCESS) {
        *reason = error == ERROR_FILE_NOT_FOUND ? std::wstring(L"no ") + kDescriptionFile
                                                : Win32Reason(L"description file unreadable", error);
        return false;
    }
    IniText ini;
    std::wstring detail;
    if (!ini.Parse(bytes, &detail) || !record->description.Parse(ini, &detail)) {
        *reason = std::wstring(kDescriptionFile) + L" " + detail;
        return false;
    }
    return ListFiles(folderPath, record->description, &record->files, reason);
}

bool ReceiverTreeLoader::ListFiles(const std::wstring& folderPath, const ReceiverDescription& description,
                                   std::vector<std::shared_ptr<SimFileRecord>>* files, std::wstring* reason) {
    DWORD error = ForEachEntry(folderPath, [&](const WIN32_FIND_DATAW& data) {
        if (IsFolder(data) || SameTextNoCase(data.cFileName, kDescriptionFile)) return;
        auto file = std::make_shared<SimFileRecord>();
        file->name = data.cFileName;
        file->path = folderPath + L"\\" + data.cFileName;
        ULONGLONG size = (static_cast<ULONGLONG>(data.nFileSizeHigh) << 32) | data.nFileSizeLow;
        file->size = static_cast<long>(std::min<ULONGLONG>(size, 0x7FFFFFFF));
        if (!description.FindTime(file->name, &file->time)) file->time = LocalOleDate(data.ftLastWriteTime);
        description.ApplyReport(&file->name, &file->size, &file->time);
        files->push_back(file);
    });
    if (error != ERROR_SUCCESS) {
        *reason = Win32Reason(L"folder unreadable", error);
        return false;
    }
    std::sort(files->begin(), files->end(), [](const auto& a, const auto& b) {
        return CompareTextNoCase(a->name, b->name) < 0;
    });
    return true;
}
