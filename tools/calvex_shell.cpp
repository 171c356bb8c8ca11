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

namespace {
const wchar_t kMyComputer[] = L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}";
const wchar_t* const kBrandFolders[] = {
    L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\::{E102076F-4057-4e7f-8209-511258F12B62}",
    L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\::{E65CDE76-B4FC-447f-A9DD-A011176B14E7}",
};

template <class T>
struct Ref {
    T* p = nullptr;
    ~Ref() { if (p) p->Release(); }
    T* operator->() const { return p; }
    void** out() { return reinterpret_cast<void**>(&p); }
};

struct ItemList {
    LPITEMIDLIST p = nullptr;
    ~ItemList() { CoTaskMemFree(p); }
};

// UTF-8 whatever the console's code page, so that names survive a pipe.
void Print(const std::wstring& text) {
    int n = WideCharToMultiByte(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), nullptr, 0, nullptr, nullptr);
    std::string bytes(static_cast<size_t>(n), '\0');
    WideCharToMultiByte(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), &bytes[0], n, nullptr, nullptr);
    fwrite(bytes.data(), 1, bytes.size(), stdout);
}

std::wstring Name(IShellFolder* folder, PCUITEMID_CHILD item, SHGDNF flags) {
    STRRET name = {};
    wchar_t* text = nullptr;
    if (FAILED(folder->GetDisplayNameOf(item, flags, &name)) || FAILED(StrRetToStrW(&name, item, &text)))
        return L"?";
    std::wstring result = text;
    CoTaskMemFree(text);
    return result;
}

std::wstring InfoTip(IShellFolder* folder, PCUITEMID_CHILD item) {
    Ref<IQueryInfo> info;
    if (FAILED(folder->GetUIObjectOf(nullptr, 1, &item, IID_IQueryInfo, nullptr, info.out()))) return L"";
    wchar_t* tip = nullptr;
    if (FAILED(info->GetInfoTip(0, &tip)) || !tip) return L"";
    std::wstring result = tip;
    CoTaskMemFree(tip);
    return result;
}

HRESULT Bind(const std::wstring& path, IShellFolder** folder) {
    *folder = nullptr;
    Ref<IShellFolder> desktop;
    HRESULT hr = SHGetDesktopFolder(reinterpret_cast<IShellFolder**>(desktop.out()));
    if (FAILED(hr)) return hr;
    ItemList pidl;
    std::wstring text = path;
    hr = desktop->ParseDisplayName(nullptr, nullptr, &text[0], nullptr, &pidl.p, nullptr);
    if (FAILED(hr)) return hr;
    return desktop->BindToObject(pidl.p, nullptr, IID_IShellFolder, reinterpret_cast<void**>(folder));
}

HRESULT List(IShellFolder* folder, int depth, bool recurse) {
    Ref<IEnumIDList> items;
    HRESULT hr = folder->EnumObjects(nullptr, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, reinterpret_cast<IEnumIDList**>(&items.p));
    if (hr != S_OK) return hr == S_FALSE ? S_OK : hr;
    LPITEMIDLIST item = nullptr;
    while (items->Next(1, &item, nullptr) == S_OK) {
        ItemList owned{item};
        SFGAOF attributes = SFGAO_FOLDER;
        PCUITEMID_CHILD child = item;
        folder->GetAttributesOf(1, &child, &attributes);
        const bool isFolder = (attributes & SFGAO_FOLDER) != 0;
        std::wstring tip = InfoTip(folder, item);
        Print(std::wstring(depth * 2, L' ') + (isFolder ? L"[+] " : L" -  ") + Name(folder, item, SHGDN_NORMAL) +
              (tip.empty() ? L"" : L"    " + tip) + L"\n");
        if (recurse && isFolder) {
            Ref<IShellFolder> sub;
            if (SUCCEEDED(folder->BindToObject(item, nullptr, IID_IShellFolder, sub.out())))
                List(sub.p, depth + 1, true);
        }
    }
    return S_OK;
}

int Run(const std::wstring& command, const std::wstring& path) {
    if (command == L"ls" || command == L"tree") {
        const bool tree = command == L"tree";
        const wchar_t* const* paths = tree && path.empty() ? kBrandFolders : nullptr;
        std::wstring single = path.empty() ? kMyComputer : path;
        const size_t count = paths ? 2 : 1;
        for (size_t i = 0; i < count; ++i) {
            std::wstring target = paths ? paths[i] : single;
            Ref<IShellFolder> folder;
            HRESULT hr = Bind(target, reinterpret_cast<IShellFolder**>(&folder.p));
            Print(target + L"\n");
            if (SUCCEEDED(hr)) hr = List(folder.p, 1, tree);
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
