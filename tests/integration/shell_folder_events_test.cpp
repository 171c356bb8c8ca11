// Guards live events: a tree change from the out-of-process simulator lost, notified under a wrong path, or not refreshing the view five seconds later.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "com/ComPtr.h"
#include "folder/CCalvexReceiversShellFolder.h"
#include "items/CCalvexReceiversNotifyWindow.h"
#include "module/ClassCreators.h"
#include "module/ModuleApp.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
std::vector<std::wstring> g_notified;
std::map<HWND, int> g_viewMessages;

void WINAPI RecordNotify(LONG, UINT, LPCVOID item1, LPCVOID) { g_notified.push_back(static_cast<const wchar_t*>(item1)); }

LRESULT CALLBACK ViewProc(HWND hwnd, UINT message, WPARAM wParam, LPARAM lParam) {
    if (message == RegisterWindowMessageW(L"CCalvexReceiversShellView - Notification Message")) {
        ++g_viewMessages[hwnd];
        return 0;
    }
    return DefWindowProcW(hwnd, message, wParam, lParam);
}

HWND NewViewWindow() {
    WNDCLASSW windowClass = {};
    windowClass.lpfnWndProc = ViewProc;
    windowClass.hInstance = GetModuleHandleW(nullptr);
    windowClass.lpszClassName = L"TestEventsViewWindow";
    RegisterClassW(&windowClass);
    return CreateWindowExW(0, windowClass.lpszClassName, L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr,
                           windowClass.hInstance, nullptr);
}

IReceiversShellFolderImpl* Impl(IShellFolder* folder) {
    return static_cast<IReceiversShellFolderImpl*>(static_cast<IShellFolder2*>(folder));
}

// Waits for a line written after the trace had `from` bytes.
bool WaitForTrace(const std::string& line, size_t from, DWORD timeout = 15000) {
    return PumpUntil([&] { return ReadTraceLog().find(line, from) != std::string::npos; }, timeout);
}

const wchar_t kRootPath[] = L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\::{E102076F-4057-4e7f-8209-511258F12B62}";

class ShellFolderEventsTest : public testing::Test {
protected:
    static void SetUpTestSuite() { ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized()); }
    void SetUp() override {
        g_notified.clear();
        g_viewMessages.clear();
        CCalvexReceiversNotifyWindow::SetChangeNotify(RecordNotify);
        tree.AddReceiver({L"Calvex A"});  // 1000-0001, Q9 GNSS, on USB
        tree.AddFile(L"Calvex A", L"LOG0001", 100);
        scope.reset(new DeviceSimScope(tree.Root()));
    }
    void TearDown() override {
        scope.reset();
        CCalvexReceiversNotifyWindow::DestroyInstance();
        CCalvexReceiversNotifyWindow::SetChangeNotify(nullptr);
    }
    ReceiverTree tree;
    std::unique_ptr<DeviceSimScope> scope;
};
}  // namespace

TEST_F(ShellFolderEventsTest, TreeChangesRefreshTheBoundFolders) {
    ComPtr<IShellFolder> root;
    ASSERT_EQ(S_OK, CreateCalvexReceiversShellFolder(nullptr, IID_IShellFolder, root.PutVoid()));
    ComPtr<IPersistFolder> persist;
    root.QueryTo(IID_IPersistFolder, persist.PutVoid());
    ASSERT_EQ(S_OK, persist->Initialize(nullptr));
    persist.Reset();
    // Listed as Explorer lists them, which binds each folder to its collection.
    std::vector<TaskPidl> receivers = ListItems(root.Get(), SHCONTF_FOLDERS);
    ASSERT_EQ(1u, receivers.size());
    ComPtr<IShellFolder> receiver;
    ASSERT_EQ(S_OK, root->BindToObject(receivers[0].get(), nullptr, IID_IShellFolder, receiver.PutVoid()));
    EXPECT_EQ(1u, ListItems(receiver.Get(), SHCONTF_NONFOLDERS).size());

    HWND rootView = NewViewWindow(), receiverView = NewViewWindow();
    Impl(root.Get())->AddViewWindow(rootView);
    Impl(receiver.Get())->AddViewWindow(receiverView);
    const std::wstring receiverPath = std::wstring(kRootPath) + L"\\1000-0001!Q9 GNSS!USB";

    struct Step {
        const char* name;
        void (*change)(ReceiverTree& tree);
        const char* handlerLine;
        std::wstring notifiedPath;
        HWND view;
    } steps[] = {
        {"file added", [](ReceiverTree& t) { t.AddFile(L"Calvex A", L"LOG0002", 200); },
         "CCalvexFilesShellFolderEventHandler::OnFileAdded\r\n", receiverPath, receiverView},
        {"file deleted", [](ReceiverTree& t) { t.RemoveFile(L"Calvex A", L"LOG0001"); },
         "CCalvexFilesShellFolderEventHandler::OnFileDeleted\r\n", receiverPath, receiverView},
        {"receiver plugged in", [](ReceiverTree& t) { t.AddReceiver({L"Calvex B", 1, L"B", L"1000-0002"}); },
         "CCalvexReceiversShellFolderEventHandler::OnReceiverOnline\r\n", kRootPath, rootView},
    };
    for (Step& step : steps) {
        SCOPED_TRACE(step.name);
        g_notified.clear();
        g_viewMessages.clear();
        const size_t from = ReadTraceLog().size();
        step.change(tree);
        ASSERT_TRUE(WaitForTrace(step.handlerLine, from));
        EXPECT_TRUE(WaitForTrace("IReceiversShellFolderImpl::DoUpdateList\r\n", from));
        EXPECT_TRUE(WaitForTrace("==>CCalvexReceiversNotifyWindow::SendUpdateEvents " + Narrow(step.notifiedPath) + "\r\n",
                                 from));
        ASSERT_TRUE(PumpUntil([&] { return g_viewMessages[step.view] > 0; }, 12000)) << "the view message";
        PumpMessagesFor(1500);
        EXPECT_EQ(1, g_viewMessages[step.view]);
        EXPECT_NE(g_notified.end(), std::find(g_notified.begin(), g_notified.end(), step.notifiedPath));
    }
    EXPECT_TRUE(TraceContains("Advised for receivers, 0x"));
    EXPECT_TRUE(TraceContains("Advised for files, 0x"));

    root.Reset();
    receiver.Reset();  // releases the root last: the receiver folder holds its parent
    EXPECT_TRUE(TraceContains("IReceiversShellFolderImpl::FinalRelease - unadvised from files collection\r\n"));
    EXPECT_TRUE(TraceContains("IReceiversShellFolderImpl::FinalRelease - unadvised from receivers collection\r\n"));
    DestroyWindow(rootView);
    DestroyWindow(receiverView);
}
