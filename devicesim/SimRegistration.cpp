#include "SimRegistration.h"

#include <oleauto.h>

#include "CalvexDeviceMgrLib.h"
#include "com/ComPtr.h"
#include "com/Handles.h"

namespace {

std::wstring GuidText(REFGUID guid) {
    wchar_t text[64] = L"";
    StringFromGUID2(guid, text, 64);
    return text;
}

std::wstring ClassKey() { return L"CLSID\\" + GuidText(CLSID_DeviceMgr); }

LONG SetText(const std::wstring& keyName, const wchar_t* valueName, const std::wstring& value) {
    UniqueRegKey key;
    LONG status = RegCreateKeyExW(HKEY_CLASSES_ROOT, keyName.c_str(), 0, nullptr, 0, KEY_WRITE, nullptr, key.Put(),
                                  nullptr);
    if (status != ERROR_SUCCESS) return status;
    return RegSetValueExW(key.Get(), valueName, 0, REG_SZ, reinterpret_cast<const BYTE*>(value.c_str()),
                          static_cast<DWORD>((value.size() + 1) * sizeof(wchar_t)));
}

}  // namespace

const wchar_t SimRegistration::kProgId[] = L"CalvexDeviceSim.DeviceMgr";

HRESULT SimRegistration::Register(const std::wstring& exePath) {
    const std::wstring clsid = ClassKey();
    const struct {
        std::wstring key;
        const wchar_t* name;
        std::wstring value;
    } values[] = {
        {clsid, nullptr, L"Calvex Device Manager (simulated)"},
        {clsid + L"\\LocalServer32", nullptr, L"\"" + exePath + L"\""},
        {clsid + L"\\ProgID", nullptr, kProgId},
        {clsid + L"\\TypeLib", nullptr, GuidText(LIBID_CalvexDeviceMgrLib)},
        {clsid + L"\\Version", nullptr, L"1.0"},
        {kProgId, nullptr, L"Calvex Device Manager (simulated)"},
        {std::wstring(kProgId) + L"\\CLSID", nullptr, GuidText(CLSID_DeviceMgr)},
    };
    for (const auto& v : values) {
        LONG status = SetText(v.key, v.name, v.value);
        if (status != ERROR_SUCCESS) return HRESULT_FROM_WIN32(status);
    }
    ComPtr<ITypeLib> library;
    HRESULT hr = LoadTypeLibEx(exePath.c_str(), REGKIND_NONE, &library);
    if (FAILED(hr)) return hr;
    std::wstring path = exePath;  // the API takes a non-const path
    return RegisterTypeLib(library.Get(), &path[0], nullptr);
}

HRESULT SimRegistration::Unregister() {
    UnRegisterTypeLib(LIBID_CalvexDeviceMgrLib, 1, 0, LOCALE_NEUTRAL, SYS_WIN64);
    HRESULT result = S_OK;
    for (const std::wstring& key : {ClassKey(), std::wstring(kProgId)}) {
        LONG status = RegDeleteTreeW(HKEY_CLASSES_ROOT, key.c_str());
        if (status != ERROR_SUCCESS && status != ERROR_FILE_NOT_FOUND && SUCCEEDED(result))
            result = HRESULT_FROM_WIN32(status);
    }
    return result;
}
