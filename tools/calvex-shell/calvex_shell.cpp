// calvex-shell: looks at the receivers namespace through the Windows shell only, the way
// Explorer does: parse a path from the desktop, bind, enumerate, name, describe.
//
//   calvex-shell ls [PATH]    items of PATH (default: My Computer)
//   calvex-shell tree [PATH]  PATH and everything below it (default: both brand folders)
//
// PATH is a shell parsing path such as
//   ::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\::{E102076F-4057-4e7f-8209-511258F12B62}
#include <windows.h>
#include <shlobj.h>
#include <shlwapi.h>

#include <cstdio>
#include <string>

#include "ConsoleText.h"
#include "ShellNamespace.h"

namespace {
std::wstring InfoTip(IShellFolder* folder, PCUITEMID_CHILD item) {
    ComPtr<IQueryInfo> info;
    if (FAILED(folder->GetUIObjectOf(nullptr, 1, &item, IID_IQueryInfo, nullptr, info.PutVoid()))) return L"";
    wchar_t* tip = nullptr;
    if (FAILED(info->GetInfoTip(0, &tip)) || !tip) return L"";
    std::wstring result = tip;
    CoTaskMemFree(tip);
    return result;
}

HRESULT List(IShellFolder* folder, int depth, bool recurse) {
    HRESULT hr = S_OK;
    for (const OwnedItem& owned : ShellChildren(folder, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &hr)) {
        PCUITEMID_CHILD item = owned.get();
        SFGAOF attributes = SFGAO_FOLDER;
        folder->GetAttributesOf(1, &item, &attributes);
        const bool isFolder = (attributes & SFGAO_FOLDER) != 0;
        std::wstring tip = InfoTip(folder, item);
        WriteUtf8(stdout, std::wstring(depth * 2, L' ') + (isFolder ? L"[+] " : L" -  ") + ShellName(folder, item, SHGDN_NORMAL) +
              (tip.empty() ? L"" : L"    " + tip) + L"\n");
        if (recurse && isFolder) {
            ComPtr<IShellFolder> sub;
            if (SUCCEEDED(folder->BindToObject(item, nullptr, IID_IShellFolder, sub.PutVoid()))) List(sub.Get(), depth + 1, true);
        }
    }
    return hr == S_FALSE ? S_OK : hr;
}

int Run(const std::wstring& command, const std::wstring& path) {
    if (command == L"ls" || command == L"tree") {
        const bool tree = command == L"tree";
        const wchar_t* const* paths = tree && path.empty() ? kBrandFolderPaths : nullptr;
        std::wstring single = path.empty() ? kMyComputerPath : path;
        const size_t count = paths ? 2 : 1;
        for (size_t i = 0; i < count; ++i) {
            std::wstring target = paths ? paths[i] : single;
            ComPtr<IShellFolder> folder;
            HRESULT hr = BindShellPath(target, folder);
            WriteUtf8(stdout, target + L"\n");
            if (SUCCEEDED(hr)) hr = List(folder.Get(), 1, tree);
            if (FAILED(hr)) {
                fwprintf(stderr, L"calvex-shell: %ls: error 0x%08lX\n", target.c_str(), static_cast<unsigned long>(hr));
                return 1;
            }
        }
        return 0;
    }
    fwprintf(stderr, L"usage: calvex-shell ls|tree [PATH]\n");
    return 2;
}
}  // namespace

int wmain(int argc, wchar_t** argv) {
    CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED);
    int result = Run(argc > 1 ? argv[1] : L"ls", argc > 2 ? argv[2] : L"");
    CoUninitialize();
    return result;
}
