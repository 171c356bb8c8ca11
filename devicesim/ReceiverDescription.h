#pragma once
// The content of one receiver's description file ("receiver.ini"): what the receiver reports
// about itself, how it misbehaves, and the time stamps of its files (git keeps no file times).
#include <windows.h>
#include <oleauto.h>

#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "IniText.h"
#include "SimFaults.h"

struct ReceiverDescription {
    long brand = 0;
    std::wstring label;
    std::wstring serialNumber;
    std::wstring model;
    long portType = 0;
    std::wstring portName;
    std::wstring firmwareVersion = L"1.00";
    long batteryLevel = 100;
    long freeMemory = 64L * 1024 * 1024;
    SimFaults faults;
    std::vector<std::pair<std::wstring, DATE>> times;  // [Times]: file name -> local time
    // [Report]: what every file reports instead of the truth, for garbage a real device might send.
    struct Report {
        bool sizeSet = false;
        long size = 0;
        bool timeSet = false;
        DATE time = 0;
        long nameLength = 0;  // names padded with "_" up to this length; 0: as they are
        bool foundAsNothing = false;  // a lookup that finds it answers S_OK with no object
    } report;

    // False with a reason when a required key is missing or a value does not read.
    bool Parse(const IniText& ini, std::wstring* error);
    bool FindTime(const std::wstring& fileName, DATE* time) const;
    // The file's name, size and time as the [Report] section makes the device tell them.
    void ApplyReport(std::wstring* name, long* size, DATE* time) const;

    // "YYYY-MM-DD HH:MM:SS" (local time) to an OLE date.
    static bool ParseLocalTime(const std::wstring& text, DATE* time);

private:
    bool ParseReceiver(const IniText::Section& section, std::wstring* error);
    bool ParseTransfer(const IniText::Section& section, std::wstring* error);
    bool ParseFail(const IniText::Section& section, std::wstring* error);
    bool ParseTimes(const IniText::Section& section, std::wstring* error);
    bool ParseExit(const IniText::Section& section, std::wstring* error);
    bool ParseReport(const IniText::Section& section, std::wstring* error);
    // Every entry a number handed to set, which may refuse it with a reason.
    using NumberSetter = std::function<bool(const IniText::Entry&, long, std::wstring*)>;
    static bool ParseNumbers(const IniText::Section& section, const wchar_t* notANumber, std::wstring* error,
                             const NumberSetter& set);
};
