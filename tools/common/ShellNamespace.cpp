#include "ShellNamespace.h"

#include <shlwapi.h>

const wchar_t kMyComputerPath[] = L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}";
const wchar_t* const kBrandFolderPaths[2] = {
    L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\::{E102076F-4057-4e7f-8209-511258F12B62}",
    L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\::{E65CDE76-B4FC-447f-A9DD-A011176B14E7}",
};

HRESULT ParseShellPath(const std::wstring& path, OwnedItem& item) {
    item.reset();
    ComPtr<IShellFolder> desktop;
    HRESULT hr = SHGetDesktopFolder(&desktop);
    if (FAILED(hr)) return hr;
    LPITEMIDLIST parsed = nullptr;
    std::wstring text = path;
    hr = desktop->ParseDisplayName(nullptr, nullptr, &text[0], nullptr, &parsed, nullptr);
    if (SUCCEEDED(hr)) item.reset(parsed);
    return hr;
}

HRESULT BindShellPath(const std::wstring& path, ComPtr<IShellFolder>& folder) {
    folder.Reset();
    ComPtr<IShellFolder> desktop;
    OwnedItem item;
    HRESULT hr = SHGetDesktopFolder(&desktop);
    if (SUCCEEDED(hr)) hr = ParseShellPath(path, item);
    if (FAILED(hr)) return hr;
    return desktop->BindToObject(item.get(), nullptr, IID_IShellFolder, folder.PutVoid());
}

std::vector<OwnedItem> ShellChildren(IShellFolder* folder, SHCONTF flags, HRESULT* result) {
    std::vector<OwnedItem> items;
    ComPtr<IEnumIDList> enumerator;
    const HRESULT hr = folder->EnumObjects(nullptr, flags, &enumerator);
    if (result) *result = hr;
    LPITEMIDLIST item = nullptr;
    while (hr == S_OK && enumerator && enumerator->Next(1, &item, nullptr) == S_OK) items.emplace_back(item);
    return items;
}

std::wstring ShellName(IShellFolder* folder, PCUITEMID_CHILD item, SHGDNF flags) {
    STRRET name = {};
    wchar_t* text = nullptr;
    if (FAILED(folder->GetDisplayNameOf(item, flags, &name)) || FAILED(StrRetToStrW(&name, item, &text)))
        return L"?";
    std::wstring result = text;
    CoTaskMemFree(text);
    return result;
}
