// The source side of a real drag, driven from outside by transfer_drag_check.sh: guards that a file dragged out of a receiver onto another process's drop window arrives byte-identical.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <fstream>
#include <string>
#include <vector>

#include "module/ClassCreators.h"
#include "module/ModuleApp.h"
#include "support/DeviceSim.h"

using namespace testsupport;

namespace {
// Tells the driving script, which sets both variables, how far this program got.
void Mark(const char* line) { std::ofstream(Narrow(_wgetenv(L"CALVEX_DRAG_MARKER")), std::ios::app) << line; }

TEST(DragSource, FileDraggedOntoTheDropWindowArrives) {
    const wchar_t* target = _wgetenv(L"CALVEX_DRAG_TARGET");
    ASSERT_TRUE(target) << "run by transfer_drag_check.sh";
    ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized());
    ASSERT_TRUE(SUCCEEDED(OleInitialize(nullptr)));
    ReceiverTree tree;
    ReceiverSetup setup;
    setup.folder = L"Calvex A";
    tree.AddReceiver(setup);
    tree.AddFile(L"Calvex A", L"LOG0001", 300000);
    DeviceSimScope scope(tree.Root());

    ComPtr<IShellFolder> root, receiver;
    ASSERT_EQ(S_OK, CreateCalvexReceiversShellFolder(nullptr, IID_IShellFolder, root.PutVoid()));
    ComPtr<IPersistFolder> persist;
    root.QueryTo(IID_IPersistFolder, persist.PutVoid());
    ASSERT_EQ(S_OK, persist->Initialize(nullptr));
    const std::vector<TaskPidl> receivers = ListItems(root.Get(), SHCONTF_FOLDERS);  // at() fails the test if empty
    ASSERT_EQ(S_OK, root->BindToObject(receivers.at(0).get(), nullptr, IID_IShellFolder, receiver.PutVoid()));
    const std::vector<TaskPidl> files = ListItems(receiver.Get(), SHCONTF_NONFOLDERS);
    LPCITEMIDLIST file = files.at(0).get();
    ComPtr<IDataObject> data;
    ASSERT_EQ(S_OK, receiver->GetUIObjectOf(nullptr, 1, &file, IID_IDataObject, nullptr, data.PutVoid()));
    ComPtr<IDropSource> source;
    ASSERT_EQ(S_OK, data.QueryTo(IID_IDropSource, source.PutVoid()));

    // The button goes down on a window of ours, so that Wine sees it and keeps the pointer.
    const WNDCLASSW windowClass = {0, DefWindowProcW, 0, 0, GetModuleHandleW(nullptr), nullptr, nullptr,
                                   reinterpret_cast<HBRUSH>(COLOR_HIGHLIGHT + 1), nullptr, L"CalvexDragSource"};
    RegisterClassW(&windowClass);
    HWND window = CreateWindowExW(WS_EX_TOPMOST, windowClass.lpszClassName, L"drag source", WS_POPUP | WS_VISIBLE, 50,
                                  50, 300, 300, nullptr, nullptr, windowClass.hInstance, nullptr);
    PumpMessagesFor(500);
    Mark("window\n");
    ASSERT_TRUE(PumpUntil([] { return (GetAsyncKeyState(VK_LBUTTON) & 0x8000) != 0; }, 30000)) << "button pressed";
    Mark("dragging\n");
    DWORD effect = DROPEFFECT_NONE;
    EXPECT_EQ(DRAGDROP_S_DROP, DoDragDrop(data.Get(), source.Get(), DROPEFFECT_COPY, &effect));
    EXPECT_EQ(static_cast<DWORD>(DROPEFFECT_COPY), effect);
    const std::string copied = ReadFileBytes(target + std::wstring(L"\\LOG0001.qpr"));
    EXPECT_EQ(300000u, copied.size());
    EXPECT_TRUE(copied == ReadFileBytes(tree.FolderPath(L"Calvex A") + L"\\LOG0001"));
    DestroyWindow(window);
}
}  // namespace
