// Guards the notify window and a folder's update path: a path lost or told twice, a burst not held for a second, an order not ordinal; views refreshed after a refresh of their own, after release, twice or not at all.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

#include "folder/CCalvexReceiversShellFolder.h"
#include "items/CCalvexReceiversNotifyWindow.h"
#include "module/ModuleApp.h"
#include "support/ViewHost.h"

namespace {
struct Notification { std::wstring call; ULONGLONG tick; };  // call: "event flags path has-second-item"
std::vector<Notification> g_notifications;
void (*g_duringNotify)() = nullptr;

void WINAPI RecordNotify(LONG eventId, UINT flags, LPCVOID item1, LPCVOID item2) {
    wchar_t call[1024];
    swprintf(call, 1024, L"%lX %X %ls %d", eventId, flags, static_cast<const wchar_t*>(item1), item2 != nullptr);
    g_notifications.push_back({call, GetTickCount64()});
    if (auto during = g_duringNotify) g_duringNotify = nullptr, during();
}

LPARAM PathBlock(const std::wstring& path) {
    HGLOBAL block = GlobalAlloc(GHND, (path.size() + 1) * sizeof(wchar_t));
    wcscpy(static_cast<wchar_t*>(GlobalLock(block)), path.c_str());
    GlobalUnlock(block);
    return reinterpret_cast<LPARAM>(block);
}
// What RecordNotify writes for one updated folder.
std::wstring UpdateDir(const std::wstring& path) { return L"1000 1005 " + path + L" 0"; }

void PostPath(const std::wstring& path) {
    ASSERT_TRUE(PostMessageW(CCalvexReceiversNotifyWindow::GetNotifyWindow(), UpdateFolderMessage(), 0, PathBlock(path)));
}

IReceiversShellFolderImpl* Impl(const ComPtr<IShellFolder>& folder) {
    return static_cast<IReceiversShellFolderImpl*>(static_cast<IShellFolder2*>(folder.Get()));
}

const std::wstring& kRoot = testsupport::kCalvexRootPath;

class NotifyWindowTest : public testing::Test {
protected:
    void SetUp() override {
        ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized());
        g_notifications.clear();
        testsupport::ViewMessages().clear();
        CCalvexReceiversNotifyWindow::SetChangeNotify(RecordNotify);
    }
    void TearDown() override {
        for (HWND hwnd : windows) DestroyWindow(hwnd);
        CCalvexReceiversNotifyWindow::DestroyInstance();
        CCalvexReceiversNotifyWindow::SetChangeNotify(nullptr);
    }
    HWND View() {  // a window that counts the view notification messages it gets
        windows.push_back(testsupport::CountingViewWindow());
        return windows.back();
    }
    std::vector<HWND> windows;
};
}  // namespace

TEST_F(NotifyWindowTest, BurstGoesOutOnceEachPathInOrdinalOrderASecondAfterTheLast) {
    ULONGLONG lastPost = 0;
    for (const wchar_t* leaf : {L"b", L"a", L"B", L"a", L"b"}) {
        PostPath(std::wstring(kRoot) + L"\\" + leaf);
        lastPost = GetTickCount64();
        testsupport::PumpMessagesFor(300);
    }
    ASSERT_TRUE(testsupport::PumpUntil([] { return g_notifications.size() >= 3; }, 5000));
    testsupport::PumpMessagesFor(1500);
    ASSERT_EQ(3u, g_notifications.size());
    const wchar_t* expected[] = {L"B", L"a", L"b"};  // ordinal: upper case sorts first
    for (size_t i = 0; i < 3; ++i) {
        EXPECT_EQ(UpdateDir(std::wstring(kRoot) + L"\\" + expected[i]), g_notifications[i].call);
        EXPECT_GE(g_notifications[i].tick - lastPost, 900u);
        EXPECT_LE(g_notifications[i].tick - lastPost, 3000u);
    }
    const std::string path = testsupport::Narrow(kRoot) + "\\a";
    for (std::string line : {"<==CCalvexReceiversNotifyWindow::BufferEventPath [" + path + "]\r\n",
                              std::string("CCalvexReceiversNotifyWindow::BufferEventPath - set update timer\r\n")})
        EXPECT_TRUE(testsupport::TraceContains(line)) << line;
}

TEST_F(NotifyWindowTest, PathArrivingWhileSendingGoesOutASecondAfterwards) {
    PostPath(L"first");
    g_duringNotify = [] {
        // Delivered at once on the window's thread: the window is busy sending.
        SendMessageW(CCalvexReceiversNotifyWindow::GetNotifyWindow(), UpdateFolderMessage(), 0, PathBlock(L"second"));
    };
    ASSERT_TRUE(testsupport::PumpUntil([] { return g_notifications.size() >= 2; }, 6000));
    ASSERT_EQ(2u, g_notifications.size());
    EXPECT_EQ(UpdateDir(L"first"), g_notifications[0].call);
    EXPECT_EQ(UpdateDir(L"second"), g_notifications[1].call);
    EXPECT_GE(g_notifications[1].tick - g_notifications[0].tick, 900u);
    EXPECT_TRUE(testsupport::TraceContains("CCalvexReceiversNotifyWindow::SendUpdateEvents - set update timer\r\n"));
}

TEST_F(NotifyWindowTest, WindowLivesOnTheAskerAndUnloadDropsPendingPathsAndTheClass) {
    std::thread([] { EXPECT_TRUE(CCalvexReceiversNotifyWindow::GetNotifyWindow()); }).join();
    HWND window = CCalvexReceiversNotifyWindow::GetNotifyWindow();
    ASSERT_NE(nullptr, window) << "the window of an ended thread is made again";
    EXPECT_EQ(GetCurrentThreadId(), GetWindowThreadProcessId(window, nullptr));
    DestroyWindow(window);
    window = CCalvexReceiversNotifyWindow::GetNotifyWindow();
    EXPECT_TRUE(IsWindow(window)) << "a lost window is made again";
    PostPath(L"never sent");
    testsupport::PumpMessagesFor(200);
    CCalvexReceiversNotifyWindow::DestroyInstance();
    EXPECT_FALSE(IsWindow(window));
    WNDCLASSW info;
    EXPECT_FALSE(GetClassInfoW(GetModuleHandleW(nullptr), L"Calvex Receivers Shell Extension - Notify Window", &info));
    testsupport::PumpMessagesFor(1500);
    EXPECT_TRUE(g_notifications.empty());
}

// Folders tell each listed view once, five seconds on, unless it refreshed meanwhile or the folder is gone.
TEST_F(NotifyWindowTest, FolderTellsEachListedViewOnceUnlessRefreshedOrReleased) {
    ComPtr<IShellFolder> folders[] = {testsupport::OurFolder(false), testsupport::OurFolder(false, true),
                                      testsupport::OurFolder(false, true)};
    IReceiversShellFolderImpl *listed = Impl(folders[0]), *refreshed = Impl(folders[1]), *released = Impl(folders[2]);
    HWND a = View(), b = View(), removed = View(), never = View(), refreshedView = View(), releasedView = View();
    struct { bool add; HWND hwnd; size_t count; } steps[] = {
        {true, a, 1}, {true, a, 1}, {true, b, 2}, {true, removed, 3}, {false, removed, 2}, {false, never, 2},
    };
    for (const auto& step : steps) {
        step.add ? listed->AddViewWindow(step.hwnd) : listed->RemoveViewWindow(step.hwnd);
        EXPECT_EQ(step.count, listed->ViewWindowCount());
    }
    // The array grows past its first capacities and shrinks back.
    for (bool add : {true, false}) {
        for (UINT_PTR i = 1; i <= 100; ++i) add ? listed->AddViewWindow(HWND(i * 16)) : listed->RemoveViewWindow(HWND(i * 16));
        EXPECT_EQ(add ? 102u : 2u, listed->ViewWindowCount());
    }
    refreshed->AddViewWindow(refreshedView);
    released->AddViewWindow(releasedView);
    for (IReceiversShellFolderImpl* folder : {listed, refreshed, released}) EXPECT_EQ(S_OK, folder->DoUpdateList());
    testsupport::PumpMessagesFor(1000);
    EXPECT_EQ(S_OK, refreshed->EventReceived());
    folders[2].Reset();
    testsupport::PumpMessagesFor(6000);
    for (HWND hwnd : {a, b, removed, never, refreshedView, releasedView})
        EXPECT_EQ(hwnd == a || hwnd == b ? 1 : 0, testsupport::ViewMessages()[hwnd]);
    EXPECT_TRUE(testsupport::TraceContains("IReceiversShellFolderImpl2::EventReceived\r\n"));
    EXPECT_EQ(2u, g_notifications.size()) << "the shell heard once of each brand's root";

    ComObject<CCalvexReceiversShellFolder>* uninitialised = nullptr;  // no path
    ASSERT_EQ(S_OK, CreateComObject<CCalvexReceiversShellFolder>(&uninitialised));
    EXPECT_EQ(S_FALSE, uninitialised->DoUpdateList());
    uninitialised->Release();
    testsupport::PumpMessagesFor(1500);
    EXPECT_EQ(2u, g_notifications.size());
}
