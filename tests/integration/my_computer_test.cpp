// Guards registration as Wine's shell reads it: a brand folder missing under My Computer.
#include <windows.h>
#include <shlobj.h>
#include <shlwapi.h>

#include <set>
#include <string>

#include <gtest/gtest.h>

#include "com/ComPtr.h"
#include "support/TestSupport.h"

namespace {
std::wstring DisplayName(IShellFolder* folder, PCUITEMID_CHILD item, SHGDNF flags) {
    STRRET name = {};
    if (FAILED(folder->GetDisplayNameOf(item, flags, &name))) return std::wstring();
    wchar_t* text = nullptr;
    if (FAILED(StrRetToStrW(&name, item, &text))) return std::wstring();
    std::wstring result = text;
    CoTaskMemFree(text);
    return result;
}
}  // namespace

TEST(MyComputer, ListsBothBrandFolders) {
    ComPtr<IShellFolder> desktop;
    ASSERT_EQ(S_OK, SHGetDesktopFolder(&desktop));
    PIDLIST_ABSOLUTE drivesPidl = nullptr;
    ASSERT_EQ(S_OK, SHGetSpecialFolderLocation(nullptr, CSIDL_DRIVES, &drivesPidl));
    ComPtr<IShellFolder> drives;
    HRESULT hr = desktop->BindToObject(drivesPidl, nullptr, IID_IShellFolder, drives.PutVoid());
    CoTaskMemFree(drivesPidl);
    ASSERT_EQ(S_OK, hr);

    ComPtr<IEnumIDList> items;
    ASSERT_EQ(S_OK, drives->EnumObjects(nullptr, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &items));
    std::set<std::wstring> names, parsingNames;
    PITEMID_CHILD item = nullptr;
    while (items->Next(1, &item, nullptr) == S_OK) {
        names.insert(DisplayName(drives.Get(), item, SHGDN_NORMAL));
        parsingNames.insert(DisplayName(drives.Get(), item, SHGDN_FORPARSING | SHGDN_INFOLDER));
        SFGAOF attributes = SFGAO_FOLDER;
        drives->GetAttributesOf(1, const_cast<PCUITEMID_CHILD*>(&item), &attributes);
        CoTaskMemFree(item);
    }
    EXPECT_EQ(1u, names.count(L"Calvex GNSS Receivers"));
    EXPECT_EQ(1u, names.count(L"Brennor GNSS Receivers"));
}
