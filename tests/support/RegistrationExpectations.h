#pragma once
// What the registry holds when the module is registered and when it is not; shared by the
// registration test (regsvr32, the exports) and the installer test (msiexec).
#include <windows.h>

#include <string>

namespace testsupport {

bool RegistryKeyExists(HKEY root, const std::wstring& path);
// A REG_SZ value's text, a DWORD in hexadecimal ("0x0000002A"), or "<none>".
std::wstring RegistryText(HKEY root, const std::wstring& path, const wchar_t* name = nullptr);

// Checks with gtest's EXPECT that every key Explorer needs names the module at dllPath.
void ExpectModuleRegistered(const std::wstring& dllPath);
// Checks that registration left nothing of the module behind but the kept shared keys.
void ExpectModuleUnregistered();

}  // namespace testsupport
