// Guards against a view that Explorer shows with missing rows, columns, widths or cell texts: reads our list control from outside.
// Prints our view's list in any process of the session, UTF-8: "columns: a|b", "widths: 100|100", a
// "row: a|b" per item; the messages carry a block in the list's process, filled as when it paints.
#include <windows.h>
#include <commctrl.h>

#include <cstdio>
#include <string>

namespace {
// Stops the walk through every window of the session at our visible view; its list goes to found.
BOOL CALLBACK FindViewList(HWND window, LPARAM found) {
    wchar_t cls[64] = {};
    GetClassNameW(window, cls, 64);
    if (wcscmp(cls, L"CalvexReceiversViewNSClass") != 0 || !IsWindowVisible(window)) return TRUE;
    *reinterpret_cast<HWND*>(found) = FindWindowExW(window, nullptr, L"SysListView32", nullptr);
    return FALSE;
}

// A block in the list owner's process: one LVITEMW or LVCOLUMNW, then its text buffer.
struct RemoteBlock {
    explicit RemoteBlock(HWND list) : m_list(list) {
        DWORD pid = 0;
        GetWindowThreadProcessId(list, &pid);
        m_process = OpenProcess(PROCESS_VM_OPERATION | PROCESS_VM_READ | PROCESS_VM_WRITE, FALSE, pid);
        if (m_process) m_base = static_cast<char*>(VirtualAllocEx(m_process, nullptr, 2048, MEM_COMMIT, PAGE_READWRITE));
    }
    ~RemoteBlock() {
        if (m_base) VirtualFreeEx(m_process, m_base, 0, MEM_RELEASE);
        if (m_process) CloseHandle(m_process);
    }
    // Sends message with request, its text pointing into the block; the text the owner wrote.
    template <class T>
    std::wstring Ask(UINT message, int index, T request) {
        wchar_t text[kChars + 1] = {};
        request.pszText = reinterpret_cast<wchar_t*>(m_base + 1024);
        request.cchTextMax = kChars;
        WriteProcessMemory(m_process, m_base, &request, sizeof(T), nullptr);
        SendMessageW(m_list, message, index, reinterpret_cast<LPARAM>(m_base));
        ReadProcessMemory(m_process, request.pszText, text, kChars * sizeof(wchar_t), nullptr);
        return text;
    }
    static constexpr int kChars = 511;
    HWND m_list;
    HANDLE m_process = nullptr;
    char* m_base = nullptr;
};

// Prints "label: line" in UTF-8.
void Print(const char* label, const std::wstring& line) {
    std::string out(line.size() * 4, '\0');
    out.resize(WideCharToMultiByte(CP_UTF8, 0, line.data(), static_cast<int>(line.size()), &out[0],
                                   static_cast<int>(out.size()), nullptr, nullptr));
    printf("%s: %s\n", label, out.c_str());
}
}  // namespace

int main() {
    HWND list = nullptr;
    EnumChildWindows(GetDesktopWindow(), FindViewList, reinterpret_cast<LPARAM>(&list));
    RemoteBlock block(list);
    if (!list || !block.m_base) {
        printf(list ? "no access to the view's process\n" : "no view\n");
        return 1;
    }
    const int columns = Header_GetItemCount(ListView_GetHeader(list));
    std::wstring titles, widths;
    for (int i = 0; i < columns; ++i) {
        titles += (i ? L"|" : L"") + block.Ask(LVM_GETCOLUMNW, i, LVCOLUMNW{LVCF_TEXT});
        widths += (i ? L"|" : L"") + std::to_wstring(ListView_GetColumnWidth(list, i));
    }
    Print("columns", titles);
    Print("widths", widths);
    for (int row = 0; row < ListView_GetItemCount(list); ++row) {
        std::wstring cells;
        for (int column = 0; column < (columns ? columns : 1); ++column)
            cells += (column ? L"|" : L"") + block.Ask(LVM_GETITEMTEXTW, row, LVITEMW{0, 0, column});
        Print("row", cells);
    }
    return 0;
}
