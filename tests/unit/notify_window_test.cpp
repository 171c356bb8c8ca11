// Guards the notify window and a folder's update path: a path lost or told twice, a burst not held for a second, an order not ordinal; views refreshed after a refresh of their own, after release, twice or not at all.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <map>
#include <string>
#include <thread>
#include <vector>

#include "folder/CBrennorReceiversShellFolder.h"
#include "folder/CCalvexReceiversShellFolder.h"
#include "items/CCalvexReceiversNotifyWindow.h"
#include "module/ModuleApp.h"
#include "support/TestSupport.h"

namespace {
struct Notification {
    LONG eventId;
    UINT flags;
    std::wstring path;
    bool secondItemNull;
    ULONGLONG tick;
};
std::vector<Notification> g_notifications;
void (*g_duringNotify)() = nullptr;

void WINAPI RecordNotify(LONG eventId, UINT flags, LPCVOID item1, LPCVOID item2) {
    g_notifications.push_back({eventId, flags, static_cast<const wchar_t*>(item1), item2 == nullptr, GetTickCount64()});
    if (auto during = g_duringNotify) {
        g_duringNotify = nullptr;
        during();
    }
}

LPARAM PathBlock(const std::wstring& path) {
    const size_t bytes = (path.size() + 1) * sizeof(wchar_t);
    HGLOBAL block = GlobalAlloc(GHND, bytes);
    memcpy(GlobalLock(block), path.c_str(), bytes);
    GlobalUnlock(block);
    return reinterpret_cast<LPARAM>(block);
}

void PostPath(const std::wstring& path) {
    ASSERT_TRUE(PostMessageW(CCalvexReceiversNotifyWindow::GetNotifyWindow(), UpdateFolderMessage(), 0, PathBlock(path)));
}

std::map<HWND, std::vector<ULONGLONG>> g_viewMessages;

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

const wchar_t kRoot[] = L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\::{E102076F-4057-4e7f-8209-511258F12B62}";

class NotifyWindowTest : public testing::Test {
protected:
    void SetUp() override {
        ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized());
        g_notifications.clear();
        g_viewMessages.clear();
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

TEST_F(NotifyWindowTest, BurstOfOnePathGivesOneNotificationASecondAfterTheLast) {
    const std::wstring path = std::wstring(kRoot) + L"\\123!Z#5!COM3";
    ULONGLONG lastPost = 0;
    for (int i = 0; i < 3; ++i) {
        PostPath(path);
        lastPost = GetTickCount64();
        testsupport::PumpMessagesFor(400);
    }
    ASSERT_TRUE(testsupport::PumpUntil([] { return !g_notifications.empty(); }, 5000));
    testsupport::PumpMessagesFor(1500);
    ASSERT_EQ(1u, g_notifications.size());
    const Notification& sent = g_notifications[0];
    EXPECT_EQ(SHCNE_UPDATEDIR, sent.eventId);
    EXPECT_EQ(0x1005u, sent.flags);
    EXPECT_EQ(path, sent.path);
    EXPECT_TRUE(sent.secondItemNull);
    EXPECT_GE(sent.tick - lastPost, 900u);
    EXPECT_LE(sent.tick - lastPost, 3000u);
    const std::string narrow = testsupport::Narrow(path);
    for (std::string line : {"<==CCalvexReceiversNotifyWindow::BufferEventPath [" + narrow + "]\r\n",
                              std::string("CCalvexReceiversNotifyWindow::BufferEventPath - set update timer\r\n"),
                              "==>CCalvexReceiversNotifyWindow::SendUpdateEvents " + narrow + "\r\n"})
        EXPECT_TRUE(testsupport::TraceContains(line)) << line;
}

TEST_F(NotifyWindowTest, DistinctPathsGoOutOnceEachInOrdinalOrder) {
    const std::wstring posted[] = {L"b", L"a", L"B", L"a", L"b"};
    for (const std::wstring& leaf : posted) PostPath(std::wstring(kRoot) + L"\\" + leaf);
    ASSERT_TRUE(testsupport::PumpUntil([] { return g_notifications.size() >= 3; }, 5000));
    testsupport::PumpMessagesFor(1500);
    const std::wstring expected[] = {L"B", L"a", L"b"};  // ordinal: upper case sorts first
    ASSERT_EQ(3u, g_notifications.size());
    for (size_t i = 0; i < 3; ++i) { EXPECT_EQ(std::wstring(kRoot) + L"\\" + expected[i], g_notifications[i].path); }
}

TEST_F(NotifyWindowTest, PathArrivingWhileSendingGoesOutASecondAfterwards) {
    PostPath(L"first");
    g_duringNotify = [] {
        // Delivered at once on the window's thread: the window is busy sending.
        SendMessageW(CCalvexReceiversNotifyWindow::GetNotifyWindow(), UpdateFolderMessage(), 0, PathBlock(L"second"));
    };
    ASSERT_TRUE(testsupport::PumpUntil([] { return g_notifications.size() >= 2; }, 6000));
    ASSERT_EQ(2u, g_notifications.size());
    EXPECT_EQ(L"first", g_notifications[0].path);
    EXPECT_EQ(L"second", g_notifications[1].path);
    EXPECT_GE(g_notifications[1].tick - g_notifications[0].tick, 900u);
    EXPECT_TRUE(testsupport::TraceContains("CCalvexReceiversNotifyWindow::SendUpdateEvents - set update timer\r\n"));
}

TEST_F(NotifyWindowTest, OnlyTheUpdateTimerSends) {
    HWND window = CCalvexReceiversNotifyWindow::GetNotifyWindow();
    ASSERT_NE(nullptr, window);
    SendMessageW(window, UpdateFolderMessage(), 0, PathBlock(L"pending"));
    struct { UINT_PTR timerId; size_t expectedCount; } cases[] = {{999, 0}, {1, 0}, {1000, 1}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.timerId);
        EXPECT_EQ(0, SendMessageW(window, WM_TIMER, c.timerId, 0));
        EXPECT_EQ(c.expectedCount, g_notifications.size());
    }
    testsupport::PumpMessagesFor(1500);
    EXPECT_EQ(1u, g_notifications.size()) << "the set was emptied and the timer killed";
}

TEST_F(NotifyWindowTest, WindowOfAnEndedThreadIsMadeAgainOnTheAsker) {
    std::thread([] { EXPECT_TRUE(CCalvexReceiversNotifyWindow::GetNotifyWindow()); }).join();
    HWND window = CCalvexReceiversNotifyWindow::GetNotifyWindow();
    ASSERT_NE(nullptr, window);
    EXPECT_EQ(GetCurrentThreadId(), GetWindowThreadProcessId(window, nullptr));
    DestroyWindow(window);
    EXPECT_TRUE(IsWindow(CCalvexReceiversNotifyWindow::GetNotifyWindow())) << "a lost window is made again";
}

TEST_F(NotifyWindowTest, UnloadDropsPendingPathsAndUnregistersTheClass) {
    PostPath(L"never sent");
    testsupport::PumpMessagesFor(200);
    HWND window = CCalvexReceiversNotifyWindow::GetNotifyWindow();
    CCalvexReceiversNotifyWindow::DestroyInstance();
    EXPECT_FALSE(IsWindow(window));
    WNDCLASSW info;
    EXPECT_FALSE(GetClassInfoW(GetModuleHandleW(nullptr), L"Calvex Receivers Shell Extension - Notify Window", &info));
    testsupport::PumpMessagesFor(1500);
    EXPECT_TRUE(g_notifications.empty());
}

TEST_F(NotifyWindowTest, FolderWhoseViewRefreshedOrThatIsReleasedSendsNoMessage) {
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

TEST_F(NotifyWindowTest, FolderListsEachViewWindowOnce) {
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
    EXPECT_EQ(1u, g_notifications.size()) << "the shell heard once of the folder";

    ASSERT_EQ(S_OK, CreateComObject<CCalvexReceiversShellFolder>(&folder));  // never initialised: no path
    EXPECT_EQ(S_FALSE, folder->DoUpdateList());
    testsupport::PumpMessagesFor(1500);
    EXPECT_EQ(1u, g_notifications.size());
    folder->Release();
}
