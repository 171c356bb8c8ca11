// Guards against a view that Explorer shows with missing rows, columns or cell texts: reads our list control from outside.
// view_probe: finds the extension's view window in any process of this Wine session and
// prints what its list control shows: "columns: a|b|c", "widths: 100|100|100", then
// "row: a|b|c" per item, UTF-8.
// The list lives in Explorer's process, so the list-view messages carry a buffer allocated
// there; its owner fills the texts on demand, exactly as when it paints them.
#include <windows.h>
#include <commctrl.h>

#include <cstdio>
#include <string>
#include <vector>

namespace {
HWND FindViewList(HWND parent) {
    for (HWND child = FindWindowExW(parent, nullptr, nullptr, nullptr); child;
         child = FindWindowExW(parent, child, nullptr, nullptr)) {
        wchar_t cls[64] = {};
        GetClassNameW(child, cls, 64);
        if (wcscmp(cls, L"CalvexReceiversViewNSClass") == 0 && IsWindowVisible(child))
            return FindWindowExW(child, nullptr, L"SysListView32", nullptr);
        if (HWND found = FindViewList(child)) return found;
    }
    return nullptr;
}

// A block in the list owner's process: one LVITEMW/LVCOLUMNW followed by its text buffer.
class RemoteBlock {
public:
    explicit RemoteBlock(HWND window) {
        DWORD pid = 0;
        GetWindowThreadProcessId(window, &pid);
        m_process = OpenProcess(PROCESS_VM_OPERATION | PROCESS_VM_READ | PROCESS_VM_WRITE, FALSE, pid);
        if (m_process) m_base = VirtualAllocEx(m_process, nullptr, kSize, MEM_COMMIT, PAGE_READWRITE);
    }
    ~RemoteBlock() {
        if (m_base) VirtualFreeEx(m_process, m_base, 0, MEM_RELEASE);
        if (m_process) CloseHandle(m_process);
    }
    bool Valid() const { return m_base != nullptr; }
    wchar_t* RemoteText() const { return reinterpret_cast<wchar_t*>(static_cast<char*>(m_base) + 1024); }
    template <class T>
    void Put(const T& value) { WriteProcessMemory(m_process, m_base, &value, sizeof(T), nullptr); }
    void* Base() const { return m_base; }
    std::wstring Text() const {
        wchar_t text[kChars + 1] = {};
        ReadProcessMemory(m_process, RemoteText(), text, kChars * sizeof(wchar_t), nullptr);
        return text;
    }
    static constexpr int kChars = 512;

private:
    static constexpr SIZE_T kSize = 1024 + (kChars + 1) * sizeof(wchar_t);
    HANDLE m_process = nullptr;
    void* m_base = nullptr;
};

std::string Utf8(const std::wstring& text) {
    int size = WideCharToMultiByte(CP_UTF8, 0, text.c_str(), -1, nullptr, 0, nullptr, nullptr);
    std::string out(size > 0 ? size - 1 : 0, '\0');
    if (size > 1) WideCharToMultiByte(CP_UTF8, 0, text.c_str(), -1, &out[0], size, nullptr, nullptr);
    return out;
}

std::vector<std::wstring> Columns(HWND list, RemoteBlock& block) {
    std::vector<std::wstring> titles;
    for (int i = 0;; ++i) {
        LVCOLUMNW column = {};
        column.mask = LVCF_TEXT;
        column.pszText = block.RemoteText();
        column.cchTextMax = RemoteBlock::kChars;
        block.Put(column);
        if (!SendMessageW(list, LVM_GETCOLUMNW, i, reinterpret_cast<LPARAM>(block.Base()))) break;
        titles.push_back(block.Text());
    }
    return titles;
}

std::wstring Cell(HWND list, RemoteBlock& block, int row, int column) {
    LVITEMW item = {};
    item.iSubItem = column;
    item.pszText = block.RemoteText();
    item.cchTextMax = RemoteBlock::kChars;
    block.Put(item);
    SendMessageW(list, LVM_GETITEMTEXTW, row, reinterpret_cast<LPARAM>(block.Base()));
    return block.Text();
}

void PrintRow(const char* label, const std::vector<std::wstring>& cells) {
    std::wstring line;
    for (size_t i = 0; i < cells.size(); ++i) line += (i ? L"|" : L"") + cells[i];
    printf("%s: %s\n", label, Utf8(line).c_str());
}
}  // namespace

int main() {
    HWND list = FindViewList(GetDesktopWindow());
    if (!list) {
        printf("no view\n");
        return 1;
    }
    RemoteBlock block(list);
    if (!block.Valid()) {
        printf("no access to the view's process\n");
        return 1;
    }
    const std::vector<std::wstring> titles = Columns(list, block);
    PrintRow("columns", titles);
    std::vector<std::wstring> widths;
    for (size_t i = 0; i < titles.size(); ++i)
        widths.push_back(std::to_wstring(SendMessageW(list, LVM_GETCOLUMNWIDTH, i, 0)));
    PrintRow("widths", widths);
    const int rows = static_cast<int>(SendMessageW(list, LVM_GETITEMCOUNT, 0, 0));
    const int columns = titles.empty() ? 1 : static_cast<int>(titles.size());
    for (int row = 0; row < rows; ++row) {
        std::vector<std::wstring> cells;
        for (int column = 0; column < columns; ++column) cells.push_back(Cell(list, block, row, column));
        PrintRow("row", cells);
    }
    return 0;
}
