#pragma once
// Reaching the receivers namespace through the Windows shell only, the way Explorer does:
// parse a path from the desktop, bind, enumerate, name.
#include <windows.h>
#include <shlobj.h>

#include <memory>
#include <string>
#include <vector>

#include "com/ComPtr.h"

// My Computer and the two brand folders below it (Calvex first, then Brennor).
extern const wchar_t kMyComputerPath[];
extern const wchar_t* const kBrandFolderPaths[2];

struct OwnedItemFree {
    void operator()(ITEMIDLIST* item) const { CoTaskMemFree(item); }
};
using OwnedItem = std::unique_ptr<ITEMIDLIST, OwnedItemFree>;

// SHGetDesktopFolder()->ParseDisplayName: the absolute item identifier of a path.
HRESULT ParseShellPath(const std::wstring& path, OwnedItem& item);
// ParseShellPath, then BindToObject.
HRESULT BindShellPath(const std::wstring& path, ComPtr<IShellFolder>& folder);
// The folder's items of the given kinds; EnumObjects' failure where asked for.
std::vector<OwnedItem> ShellChildren(IShellFolder* folder, SHCONTF flags, HRESULT* result = nullptr);
// GetDisplayNameOf through StrRetToStrW; "?" when the folder gives none.
std::wstring ShellName(IShellFolder* folder, PCUITEMID_CHILD item, SHGDNF flags);
