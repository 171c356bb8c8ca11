#include "SimRecords.h"

std::wstring SimReceiverRecord::PortText() const {
    switch (description.portType) {
    case 1:
        return description.portName;
    case 2:
        return L"USB";
    default:
        return L"Unknown";
    }
}

std::wstring SimReceiverRecord::LookupKey() const { return PortText() + L"-" + description.serialNumber; }

std::shared_ptr<SimFileRecord> SimReceiverRecord::FindFile(const std::wstring& name) const {
    for (const auto& file : files)  // an exact match wins over one that differs in case only
        if (file->name == name) return file;
    for (const auto& file : files)
        if (SameTextNoCase(file->name, name)) return file;
    return nullptr;
}
