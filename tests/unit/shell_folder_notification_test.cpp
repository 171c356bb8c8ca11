// Guards a folder's update path: views refreshed after a refresh of their own, after release, twice or not at all; a folder without a path posting.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <map>
#include <string>
#include <vector>

#include "folder/CBrennorReceiversShellFolder.h"
#include "folder/CCalvexReceiversShellFolder.h"
#include "items/CCalvexReceiversNotifyWindow.h"
#include "module/ModuleApp.h"
#include "support/TestSupport.h"

namespace {
std::map<HWND, std::vector<ULONGLONG>> g_viewMessages;
size_t g_shellNotifications = 0;

void WINAPI RecordNotify(LONG, UINT, LPCVOID, LPCVOID) { ++g_shellNotifications; }

LRESULT CALLBACK ViewProc(HWND hwnd, UINT message, WPARAM wParam, LPARAM lParam) {
    if (message == RegisterWindowMessageW(L"CCalvexReceiversShellView - Notification Message")) {
        g_viewMessages[hwnd].push_back(GetTickCount64());
        return 0;
    }
    return DefWindowProcW(hwnd, message, wParam, lParam);
}

HWND NewViewWindow() {
    static ATOM atom = [] {
        WNDCLASSW windowClass = {0, ViewProc, 0, 0, GetModuleHandleW(nullptr)};
        windowClass.lpszClassName = L"TestFolderViewWindow";
        return RegisterClassW(&windowClass);
    }();
    return CreateWindowExW(0, MAKEINTATOM(atom), L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr, nullptr, nullptr);
}

template <class T>
ComObject<T>* NewRootFolder() {
    ComObject<T>* folder = nullptr;
    EXPECT_EQ(S_OK, CreateComObject<T>(&folder));
    if (folder) folder->Initialize(nullptr);
    return folder;
}

class FolderNotificationTest : public testing::Test {
protected:
    static void SetUpTestSuite() { ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized()); }
    void SetUp() override {
        g_viewMessages.clear();
        g_shellNotifications = 0;
        CCalvexReceiversNotifyWindow::SetChangeNotify(RecordNotify);
    }
    void TearDown() override {
        for (HWND hwnd : windows) DestroyWindow(hwnd);
        CCalvexReceiversNotifyWindow::DestroyInstance();
        CCalvexReceiversNotifyWindow::SetChangeNotify(nullptr);
    }
    HWND View() {
        windows.push_back(NewViewWindow());
        return windows.back();
    }
    std::vector<HWND> windows;
};

}  // namespace

TEST_F(FolderNotificationTest, RefreshedViewOrReleasedFolderGetsNoMessage) {
    struct Case {
        const char* name;
        void (*afterUpdate)(IReceiversShellFolderImpl*& folder);
        size_t messages;
    } cases[] = {
        {"untouched", [](IReceiversShellFolderImpl*&) {}, 1},
        {"EventReceived", [](IReceiversShellFolderImpl*& f) { EXPECT_EQ(S_OK, f->EventReceived()); }, 0},
        {"released", [](IReceiversShellFolderImpl*& f) { f->Release(); f = nullptr; }, 0},
    };
    std::vector<IReceiversShellFolderImpl*> folders;
    std::vector<HWND> views;
    for (size_t i = 0; i < sizeof cases / sizeof cases[0]; ++i) {
        folders.push_back(NewRootFolder<CBrennorReceiversShellFolder>());
        views.push_back(View());
        folders.back()->AddViewWindow(views.back());
        EXPECT_EQ(S_OK, folders.back()->DoUpdateList());
    }
    testsupport::PumpMessagesFor(1000);
    for (size_t i = 0; i < folders.size(); ++i) cases[i].afterUpdate(folders[i]);
    testsupport::PumpMessagesFor(6000);
    for (size_t i = 0; i < folders.size(); ++i) {
        SCOPED_TRACE(cases[i].name);
        EXPECT_EQ(cases[i].messages, g_viewMessages[views[i]].size());
        if (folders[i]) folders[i]->Release();
    }
    EXPECT_TRUE(testsupport::TraceContains("IReceiversShellFolderImpl2::EventReceived\r\n"));
}

TEST_F(FolderNotificationTest, ViewWindowsAreListedOnceEach) {
    ComObject<CCalvexReceiversShellFolder>* folder = NewRootFolder<CCalvexReceiversShellFolder>();
    ASSERT_NE(nullptr, folder);
    HWND a = View(), b = View(), removed = View(), never = View();
    struct { bool add; HWND hwnd; size_t count; } steps[] = {
        {true, a, 1}, {true, a, 1}, {true, b, 2}, {true, removed, 3}, {false, removed, 2}, {false, never, 2},
    };
    for (const auto& step : steps) {
        step.add ? folder->AddViewWindow(step.hwnd) : folder->RemoveViewWindow(step.hwnd);
        EXPECT_EQ(step.count, folder->ViewWindowCount());
    }
    EXPECT_EQ(S_OK, folder->DoUpdateList());
    testsupport::PumpMessagesFor(6500);
    EXPECT_EQ(1u, g_viewMessages[a].size());
    EXPECT_EQ(1u, g_viewMessages[b].size());
    EXPECT_EQ(0u, g_viewMessages[removed].size());
    EXPECT_EQ(0u, g_viewMessages[never].size());

    // The array grows past its first capacities and shrinks back.
    for (UINT_PTR i = 1; i <= 100; ++i) folder->AddViewWindow(reinterpret_cast<HWND>(i * 16));
    EXPECT_EQ(102u, folder->ViewWindowCount());
    for (UINT_PTR i = 1; i <= 100; ++i) folder->RemoveViewWindow(reinterpret_cast<HWND>(i * 16));
    EXPECT_EQ(2u, folder->ViewWindowCount());
    folder->Release();
    EXPECT_EQ(1u, g_shellNotifications) << "the shell heard once of the folder";

    ASSERT_EQ(S_OK, CreateComObject<CCalvexReceiversShellFolder>(&folder));  // never initialised: no path
    EXPECT_EQ(S_FALSE, folder->DoUpdateList());
    testsupport::PumpMessagesFor(1500);
    EXPECT_EQ(1u, g_shellNotifications);
    folder->Release();
}
