// The source side of a real drag, driven from outside by transfer_drag_check.sh: guards that a file dragged out of a receiver onto another process's drop window arrives byte-identical.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <string>

#include "com/ComPtr.h"
#include "module/ClassCreators.h"
#include "module/ModuleApp.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
std::wstring Env(const wchar_t* name) {
    wchar_t value[MAX_PATH] = L"";
    GetEnvironmentVariableW(name, value, MAX_PATH);
    return value;
}

void Mark(const std::string& text) {
    HANDLE file = CreateFileW(Env(L"CALVEX_DRAG_MARKER").c_str(), FILE_APPEND_DATA, FILE_SHARE_READ, nullptr,
                              OPEN_ALWAYS, 0, nullptr);
    DWORD written = 0;
    WriteFile(file, (text + "\n").data(), static_cast<DWORD>(text.size() + 1), &written, nullptr);
    CloseHandle(file);
}

ComPtr<IShellFolder> BindFirst(IShellFolder* parent, SHCONTF flags, LPITEMIDLIST* child) {
    ComPtr<IEnumIDList> items;
    parent->EnumObjects(nullptr, flags, &items);
    ComPtr<IShellFolder> folder;
    if (items && items->Next(1, child, nullptr) == S_OK && (flags & SHCONTF_FOLDERS))
        parent->BindToObject(*child, nullptr, IID_IShellFolder, folder.PutVoid());
    return folder;
}

LRESULT CALLBACK SourceProc(HWND w, UINT m, WPARAM wp, LPARAM lp) { return DefWindowProcW(w, m, wp, lp); }

TEST(DragSource, FileDraggedOntoTheDropWindowArrives) {
    ASSERT_FALSE(Env(L"CALVEX_DRAG_TARGET").empty()) << "run by transfer_drag_check.sh";
    ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized());
    ASSERT_TRUE(SUCCEEDED(OleInitialize(nullptr)));
    ReceiverTree tree;
    ReceiverSetup setup;
    setup.folder = L"Calvex A";
    tree.AddReceiver(setup);
    tree.AddFile(L"Calvex A", L"LOG0001", 300000);
    DeviceSimScope scope(tree.Root());

    ComPtr<IShellFolder> root;
    ASSERT_EQ(S_OK, CreateCalvexReceiversShellFolder(nullptr, IID_IShellFolder, root.PutVoid()));
    ComPtr<IPersistFolder> persist;
    root.QueryTo(IID_IPersistFolder, persist.PutVoid());
    ASSERT_EQ(S_OK, persist->Initialize(nullptr));
    LPITEMIDLIST receiverItem = nullptr, fileItem = nullptr;
    ComPtr<IShellFolder> receiver = BindFirst(root.Get(), SHCONTF_FOLDERS, &receiverItem);
    ASSERT_TRUE(receiver);
    BindFirst(receiver.Get(), SHCONTF_NONFOLDERS, &fileItem);
    ASSERT_TRUE(fileItem);
    ComPtr<IDataObject> data;
    ASSERT_EQ(S_OK, receiver->GetUIObjectOf(nullptr, 1, const_cast<LPCITEMIDLIST*>(&fileItem), IID_IDataObject,
                                            nullptr, data.PutVoid()));
    ComPtr<IDropSource> source;
    ASSERT_EQ(S_OK, data.QueryTo(IID_IDropSource, source.PutVoid()));

    // The button goes down on a window of ours, so that Wine sees it and keeps the pointer.
    WNDCLASSW windowClass = {};
    windowClass.lpfnWndProc = SourceProc;
    windowClass.hInstance = GetModuleHandleW(nullptr);
    windowClass.hbrBackground = reinterpret_cast<HBRUSH>(COLOR_HIGHLIGHT + 1);
    windowClass.lpszClassName = L"CalvexDragSource";
    RegisterClassW(&windowClass);
    HWND window = CreateWindowExW(WS_EX_TOPMOST, windowClass.lpszClassName, L"drag source", WS_POPUP | WS_VISIBLE, 50,
                                  50, 300, 300, nullptr, nullptr, windowClass.hInstance, nullptr);
    PumpMessagesFor(500);
    Mark("window");
    ASSERT_TRUE(PumpUntil([] { return (GetAsyncKeyState(VK_LBUTTON) & 0x8000) != 0; }, 30000)) << "button pressed";
    Mark("dragging");
    DWORD effect = DROPEFFECT_NONE;
    EXPECT_EQ(DRAGDROP_S_DROP, DoDragDrop(data.Get(), source.Get(), DROPEFFECT_COPY, &effect));
    EXPECT_EQ(static_cast<DWORD>(DROPEFFECT_COPY), effect);

    const std::wstring copied = Env(L"CALVEX_DRAG_TARGET") + L"\\LOG0001.qpr";
    EXPECT_TRUE(ReadFileBytes(copied) == ReadFileBytes(tree.FolderPath(L"Calvex A") + L"\\LOG0001"));
    DestroyWindow(window);
    CoTaskMemFree(receiverItem);
    CoTaskMemFree(fileItem);
    data.Reset();
    source.Reset();
    receiver.Reset();
    root.Reset();
}
}  // namespace
