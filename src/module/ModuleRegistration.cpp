#include "module/ModuleRegistration.h"

#include <oleauto.h>

#include <string>

#include "com/ComPtr.h"
#include "com/Handles.h"
#include "module/ClassIds.h"
#include "module/ClassTable.h"
#include "module/ModuleState.h"
#include "module/Registrar.h"
#include "trace/TraceLog.h"

namespace {
// SFGAO_FOLDER | SFGAO_HASSUBFOLDER: the shell shows both brand nodes as expandable folders.
const DWORD kFolderAttributes = 0xA0000000;

const CLSID* const kFolderClasses[] = {&CLSID_CalvexReceiversShellFolder, &CLSID_BrennorReceiversShellFolder};

std::wstring ModulePath() {
    wchar_t path[MAX_PATH] = L"";
    DWORD length = GetModuleFileNameW(ModuleInstance(), path, MAX_PATH);
    return (length > 0 && length < MAX_PATH) ? std::wstring(path, length) : std::wstring();
}

// "CLSID\{...}" + suffix, or empty when the CLSID cannot be turned into text.
std::wstring ClassKey(const CLSID& clsid, const wchar_t* suffix) {
    LPOLESTR text = nullptr;
    if (FAILED(StringFromCLSID(clsid, &text))) return std::wstring();
    std::wstring key = std::wstring(L"CLSID\\") + text + suffix;
    CoTaskMemFree(text);
    return key;
}

void WriteFolderAttributes() {
    for (const CLSID* clsid : kFolderClasses) {
        std::wstring keyName = ClassKey(*clsid, L"\\ShellFolder");
        if (keyName.empty()) continue;
        UniqueRegKey key;
        if (RegCreateKeyExW(HKEY_CLASSES_ROOT, keyName.c_str(), 0, nullptr, REG_OPTION_NON_VOLATILE,
                            KEY_WRITE, nullptr, key.Put(), nullptr) != ERROR_SUCCESS)
            continue;
        RegSetValueExW(key.Get(), L"Attributes", 0, REG_DWORD,
                       reinterpret_cast<const BYTE*>(&kFolderAttributes), sizeof kFolderAttributes);
    }
}

void RemoveFolderAttributes() {
    for (const CLSID* clsid : kFolderClasses) {
        // A value named like a path never exists directly under the root; the removal is
        // harmless and stays as it always was.
        std::wstring oddName = ClassKey(*clsid, L"\\ShellFolder\\Attributes");
        if (!oddName.empty()) RegDeleteValueW(HKEY_CLASSES_ROOT, oddName.c_str());
        std::wstring keyName = ClassKey(*clsid, L"\\ShellFolder");
        UniqueRegKey key;
        if (!keyName.empty() &&
            RegOpenKeyExW(HKEY_CLASSES_ROOT, keyName.c_str(), 0, KEY_WRITE, key.Put()) == ERROR_SUCCESS)
            RegDeleteValueW(key.Get(), L"Attributes");
    }
}

HRESULT RegisterTypeLibraryFromResources(const std::wstring& path) {
    ComPtr<ITypeLib> library;
    HRESULT hr = LoadTypeLibEx(path.c_str(), REGKIND_NONE, &library);
    if (FAILED(hr)) return hr;
    std::wstring mutablePath = path;  // the API takes a non-const path
    return RegisterTypeLib(library.Get(), &mutablePath[0], nullptr);
}
}  // namespace

HRESULT RegisterModule() {
    const std::wstring path = ModulePath();
    if (path.empty()) return HRESULT_FROM_WIN32(GetLastError());
    Registrar registrar(path);
    for (ClassEntry* entry = ClassTableBegin(); entry != ClassTableEnd(); ++entry) {
        HRESULT hr = registrar.RunResource(ModuleInstance(), entry->registryScript, true);
        if (FAILED(hr)) return hr;
    }
    return RegisterTypeLibraryFromResources(path);
}

HRESULT RegisterServerWith(HRESULT (*registerModule)()) {
    TraceA("DllRegisterServer\r\n");
    HRESULT hr = registerModule();
    if (SUCCEEDED(hr)) WriteFolderAttributes();
    TraceA("DllRegisterServer - complete [0x%08X]\r\n", static_cast<unsigned>(hr));
    return hr;
}

HRESULT RegisterServer() { return RegisterServerWith(RegisterModule); }

HRESULT UnregisterServer() {
    TraceA("DllUnregisterServer\r\n");
    Registrar registrar(ModulePath());
    bool failed = false;
    for (ClassEntry* entry = ClassTableBegin(); entry != ClassTableEnd() && !failed; ++entry) {
        // No class registers component categories, so there are none to remove first.
        failed = FAILED(registrar.RunResource(ModuleInstance(), entry->registryScript, false));
    }
    // The module sets no extra unregistration hook.
    if (!failed) UnRegisterTypeLib(LIBID_CalvexReceiversShellExtLib, 1, 0, LOCALE_NEUTRAL, SYS_WIN64);
    RemoveFolderAttributes();
    return S_OK;  // removal failures are not reported, on purpose
}
