#pragma once
// The simulator's settings in HKEY_CURRENT_USER\Software\Calvex\DeviceSim: the tree it serves
// ("Root") and the faults it acts out for every receiver ("Rate", "FailAtPercent",
// "FailResult", "ExitAtPercent" as DWORDs; the subkey "Fail" with one DWORD result per call).
#include <string>

#include "SimFaults.h"

class SimSettings {
public:
    static const wchar_t kKey[];
    // Empty when no root is set.
    static std::wstring RegistryRoot();
    // Values that do not read are logged and left out.
    static SimFaults GlobalFaults();
};
