#pragma once
// Reads the folder tree that stands for the receivers: one sub-folder per receiver with its
// description file; every other file of the sub-folder is a file in the receiver's memory.
#include <windows.h>

#include <memory>
#include <string>
#include <vector>

#include "SimRecords.h"

struct SimTreeScan {
    std::vector<std::shared_ptr<SimReceiverRecord>> receivers;  // sorted by folder name
    struct Skipped {
        std::wstring folder;
        std::wstring reason;
    };
    std::vector<Skipped> skipped;
    std::vector<std::wstring> folders;  // every sub-folder, skipped ones too (their files may come)
    bool rootFound = false;
};

class ReceiverTreeLoader {
public:
    static const wchar_t kDescriptionFile[];  // "receiver.ini"

    static SimTreeScan Scan(const std::wstring& root);
    // One receiver folder; false with the reason to log when it is not a usable receiver.
    static bool LoadReceiver(const std::wstring& folderPath, const std::wstring& folderName,
                             SimReceiverRecord* record, std::wstring* reason);
    // The whole file; the Win32 error on failure.
    static DWORD ReadBytes(const std::wstring& path, std::string* bytes);

private:
    static bool ListFiles(const std::wstring& folderPath, const ReceiverDescription& description,
                          std::vector<std::shared_ptr<SimFileRecord>>* files, std::wstring* reason);
};
