#pragma once
// What the simulator knows about its receivers: plain records read from the folder tree.
// The COM objects hold shared references to them, so an object handed out before a rescan
// still answers from memory after its receiver or file is gone.
#include <windows.h>
#include <oleauto.h>

#include <memory>
#include <string>
#include <vector>

#include "ReceiverDescription.h"

struct SimFileRecord {
    std::wstring name;  // as the device knows it (no ".qpr")
    std::wstring path;  // the file of the tree that holds its bytes
    long size = 0;
    DATE time = 0;
    bool present = true;  // false once the file has gone from the tree
};

struct SimReceiverRecord {
    std::wstring folderName;
    std::wstring folderPath;
    ReceiverDescription description;
    std::vector<std::shared_ptr<SimFileRecord>> files;  // sorted by name
    bool online = true;  // false once the folder has gone

    // Port name for port type 1, "USB" for 2, "Unknown" otherwise.
    std::wstring PortText() const;
    // What IReceiversColl::get_ItemByKey is asked for: port text, "-", serial number.
    std::wstring LookupKey() const;
    std::shared_ptr<SimFileRecord> FindFile(const std::wstring& name) const;
};
