#pragma once
// /RegServer and /UnregServer: the LocalServer32 class of DeviceMgr and the type library that
// the executable embeds.
#include <windows.h>

#include <string>

class SimRegistration {
public:
    static const wchar_t kProgId[];
    static HRESULT Register(const std::wstring& exePath);
    // Removes what Register wrote; what is already gone is no failure.
    static HRESULT Unregister();
};
