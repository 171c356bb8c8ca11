// calvex-paste: does what Explorer's paste does with the product's virtual files, in its own
// process, and writes them into a folder.
//
//   calvex-paste TARGET                 paste what is on the clipboard
//   calvex-paste --drop TARGET [SECS]   show a drop window (top left at 700,100, 300x300) and
//                                       take one drop, waiting at most SECS seconds (default 60)
//
// Prints one line per file ("copied NAME" or "failed NAME: why") and one line per message box
// of the product that it answered ("message box: TITLE: TEXT"); it never waits for a click.
// Exit code: 0 every file written, 1 some failed, 2 nothing to paste or bad arguments.
#include <windows.h>
#include <ole2.h>

#include <cstdio>
#include <cstdlib>
#include <string>

#include "MessageBoxAnswerer.h"
#include "PasteDropTarget.h"
#include "VirtualFiles.h"

namespace {
const wchar_t kDropWindowTitle[] = L"calvex-paste drop target";
constexpr UINT_PTR DoneTimer = 1;

CRITICAL_SECTION g_printLock;

void PrintLine(const std::wstring& line) {
    const int bytes = WideCharToMultiByte(CP_UTF8, 0, line.c_str(), -1, nullptr, 0, nullptr, nullptr);
    std::string text(bytes > 0 ? bytes - 1 : 0, '\0');
    if (bytes > 1) WideCharToMultiByte(CP_UTF8, 0, line.c_str(), -1, &text[0], bytes, nullptr, nullptr);
    EnterCriticalSection(&g_printLock);
    std::printf("%s\n", text.c_str());
    std::fflush(stdout);
    LeaveCriticalSection(&g_printLock);
}

void PrintBox(const std::wstring& title, const std::wstring& text) {
    std::wstring flat = text;
    for (wchar_t& c : flat) if (c == L'\r' || c == L'\n') c = L' ';
    PrintLine(L"message box: " + title + L": " + flat);
}

std::wstring FullPath(const wchar_t* path) {
    wchar_t full[MAX_PATH];
    return GetFullPathNameW(path, MAX_PATH, full, nullptr) ? std::wstring(full) : std::wstring(path);
}

int PasteClipboard(const std::wstring& target) {
    IDataObject* data = nullptr;
    HRESULT hr = OleGetClipboard(&data);
    if (FAILED(hr) || !data) {
        PrintLine(L"nothing on the clipboard");
        return 2;
    }
    int failed = 0;
    const int written = PasteVirtualFiles(data, target, PrintLine, failed);
    data->Release();
    if (written == 0 && failed == 0) PrintLine(L"no files");
    return failed ? 1 : (written ? 0 : 2);
}

LRESULT CALLBACK DropWindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
    if (message == WM_TIMER && wParam == DoneTimer) {
        auto* target = reinterpret_cast<PasteDropTarget*>(GetWindowLongPtrW(window, GWLP_USERDATA));
        if (target && target->Dropped()) PostQuitMessage(0);
        return 0;
    }
    return DefWindowProcW(window, message, wParam, lParam);
}

HWND CreateDropWindow() {
    WNDCLASSW windowClass = {};
    windowClass.lpfnWndProc = DropWindowProc;
    windowClass.hInstance = GetModuleHandleW(nullptr);
    windowClass.hbrBackground = reinterpret_cast<HBRUSH>(COLOR_WINDOW + 1);
    windowClass.lpszClassName = L"CalvexPasteDropTarget";
    RegisterClassW(&windowClass);
    return CreateWindowExW(WS_EX_TOPMOST, windowClass.lpszClassName, kDropWindowTitle, WS_POPUP | WS_VISIBLE | WS_BORDER,
                           700, 100, 300, 300, nullptr, nullptr, windowClass.hInstance, nullptr);
}

int PasteDrop(const std::wstring& target, DWORD seconds) {
    HWND window = CreateDropWindow();
    auto* dropTarget = new PasteDropTarget(target, PrintLine);
    SetWindowLongPtrW(window, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(dropTarget));
    if (!window || FAILED(RegisterDragDrop(window, dropTarget))) {
        PrintLine(L"cannot register the drop window");
        dropTarget->Release();
        return 2;
    }
    PrintLine(L"drop window ready");
    SetTimer(window, DoneTimer, 100, nullptr);
    const ULONGLONG deadline = GetTickCount64() + seconds * 1000ull;
    MSG message;
    while (GetTickCount64() < deadline) {
        if (MsgWaitForMultipleObjects(0, nullptr, FALSE, 100, QS_ALLINPUT) != WAIT_OBJECT_0) continue;
        bool quit = false;
        while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) {
            if (message.message == WM_QUIT) quit = true;
            TranslateMessage(&message);
            DispatchMessageW(&message);
        }
        if (quit) break;
    }
    RevokeDragDrop(window);
    const bool dropped = dropTarget->Dropped();
    const int failed = dropTarget->Failed(), written = dropTarget->Written();
    DestroyWindow(window);
    dropTarget->Release();
    if (!dropped) {
        PrintLine(L"no drop");
        return 2;
    }
    return failed ? 1 : (written ? 0 : 2);
}
}  // namespace

int wmain(int argc, wchar_t** argv) {
    InitializeCriticalSection(&g_printLock);
    const bool drop = argc >= 3 && lstrcmpW(argv[1], L"--drop") == 0;
    if (argc < 2 || (drop && argc < 3)) {
        std::fprintf(stderr, "usage: calvex-paste [--drop] TARGET [SECONDS]\n");
        return 2;
    }
    const std::wstring target = FullPath(argv[drop ? 2 : 1]);
    if (FAILED(OleInitialize(nullptr))) return 2;
    int result;
    {
        MessageBoxAnswerer answerer(PrintBox);
        result = drop ? PasteDrop(target, argc >= 4 ? wcstoul(argv[3], nullptr, 10) : 60) : PasteClipboard(target);
    }
    OleUninitialize();
    DeleteCriticalSection(&g_printLock);
    return result;
}
