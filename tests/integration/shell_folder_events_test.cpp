// Guards live events: a tree change from the out-of-process simulator lost, notified under a wrong path, or not refreshing the view five seconds later; sinks not unadvised at the end.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "folder/CCalvexReceiversShellFolder.h"
#include "items/CCalvexReceiversNotifyWindow.h"
#include "module/ModuleApp.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"
#include "support/ViewHost.h"

using namespace testsupport;

namespace {
std::vector<std::wstring> g_notified;

void WINAPI RecordNotify(LONG, UINT, LPCVOID item1, LPCVOID) { g_notified.push_back(static_cast<const wchar_t*>(item1)); }

// A stand-in for a view's window, registered with the folder as a view registers itself.
HWND AddViewWindow(IShellFolder* folder) {
    HWND view = CountingViewWindow();
    static_cast<IReceiversShellFolderImpl*>(static_cast<IShellFolder2*>(folder))->AddViewWindow(view);
    return view;
}

bool WaitForTrace(const std::string& line, size_t from) {
    return PumpUntil([&] { return ReadTraceLog().find(line, from) != std::string::npos; }, 15000);
}
}  // namespace

TEST(ShellFolderEventsTest, TreeChangesRefreshTheBoundFolders) {
    ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized());
    CCalvexReceiversNotifyWindow::SetChangeNotify(RecordNotify);
    ReceiverTree tree;
    tree.AddReceiver({L"Calvex A"});  // 1000-0001, Q9 GNSS, on USB
    tree.AddFile(L"Calvex A", L"LOG0001", 100);
    DeviceSimScope scope(tree.Root());
    // Listed as Explorer lists them, which binds each folder to its collection.
    ComPtr<IShellFolder> root = OurFolder(false), receiver = OurFolder(true);
    ASSERT_EQ(1u, ListItems(root.Get(), SHCONTF_FOLDERS).size());
    ASSERT_TRUE(receiver);
    EXPECT_EQ(1u, ListItems(receiver.Get(), SHCONTF_NONFOLDERS).size());
    HWND rootView = AddViewWindow(root.Get()), receiverView = AddViewWindow(receiver.Get());

    const std::wstring& rootPath = kCalvexRootPath;
    const std::wstring receiverPath = rootPath + L"\\1000-0001!Q9 GNSS!USB";
    const struct { void (*change)(ReceiverTree& tree); const char* handlerLine; std::wstring notifiedPath; HWND view; } steps[] = {
        {[](ReceiverTree& t) { t.AddFile(L"Calvex A", L"LOG0002", 200); }, "CCalvexFilesShellFolderEventHandler::OnFileAdded\r\n",
         receiverPath, receiverView},
        {[](ReceiverTree& t) { t.RemoveFile(L"Calvex A", L"LOG0001"); }, "CCalvexFilesShellFolderEventHandler::OnFileDeleted\r\n",
         receiverPath, receiverView},
        {[](ReceiverTree& t) { t.AddReceiver({L"Calvex B", 1, L"B", L"1000-0002"}); },
         "CCalvexReceiversShellFolderEventHandler::OnReceiverOnline\r\n", rootPath, rootView},
    };
    for (const auto& step : steps) {
        SCOPED_TRACE(step.handlerLine);
        g_notified.clear();
        ViewMessages().clear();
        const size_t from = ReadTraceLog().size();
        step.change(tree);
        ASSERT_TRUE(WaitForTrace(step.handlerLine, from));
        EXPECT_TRUE(WaitForTrace("IReceiversShellFolderImpl::DoUpdateList\r\n", from));
        EXPECT_TRUE(WaitForTrace("==>CCalvexReceiversNotifyWindow::SendUpdateEvents " + Narrow(step.notifiedPath) + "\r\n",
                                 from));
        ASSERT_TRUE(PumpUntil([&] { return ViewMessages()[step.view] > 0; }, 12000)) << "the view message";
        PumpMessagesFor(1500);
        EXPECT_EQ(1, ViewMessages()[step.view]);
        EXPECT_NE(g_notified.end(), std::find(g_notified.begin(), g_notified.end(), step.notifiedPath));
    }
    EXPECT_TRUE(TraceContains("\tIReceiversShellFolderImpl::InitCollections\r\n"));
    EXPECT_TRUE(TraceContains("Advised for receivers, 0x"));
    EXPECT_TRUE(TraceContains("Advised for files, 0x"));

    root.Reset();
    receiver.Reset();  // and its own parent
    EXPECT_TRUE(TraceContains("IReceiversShellFolderImpl::FinalRelease - unadvised from files collection\r\n"));
    EXPECT_TRUE(TraceContains("IReceiversShellFolderImpl::FinalRelease - unadvised from receivers collection\r\n"));
    DestroyWindow(rootView);
    DestroyWindow(receiverView);
    CCalvexReceiversNotifyWindow::DestroyInstance();
    CCalvexReceiversNotifyWindow::SetChangeNotify(nullptr);
}
