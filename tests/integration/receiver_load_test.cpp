// Guards large receivers: a burst of file events that floods Explorer with notifications or view re-fills, and 2,000 files not each listed once.
#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "items/CCalvexReceiversNotifyWindow.h"
#include "items/CReceiversPidlMgr.h"
#include "module/ModuleApp.h"
#include "support/DeviceSim.h"
#include "support/ViewHost.h"

using namespace testsupport;

namespace {
std::map<std::wstring, int> g_notified;  // SHChangeNotify calls per path

void WINAPI CountNotify(LONG, UINT, LPCVOID item1, LPCVOID) { ++g_notified[static_cast<const wchar_t*>(item1)]; }

const int kFiles = 2000;
std::wstring FileName(int i) { return L"F" + std::to_wstring(10000 + i).substr(1); }  // F0000 to F1999

class ReceiverLoadTest : public testing::Test {
protected:
    static void SetUpTestSuite() { ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized()); }
    void SetUp() override {
        g_notified.clear();
        CCalvexReceiversNotifyWindow::SetChangeNotify(CountNotify);
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

TEST_F(ReceiverLoadTest, BurstOfAThousandFileEventsGivesOneNotificationAndFewRefills) {
    tree.AddReceiver({L"Calvex A"});
    tree.AddFile(L"Calvex A", L"LOG0001", 10);
    scope.reset(new DeviceSimScope(tree.Root()));
    ComPtr<IShellFolder> receiver = OurFolder(true);
    ASSERT_TRUE(receiver);
    TestBrowser browser(false);
    HostedView view(receiver, browser);
    ASSERT_EQ(1, view.Count());
    const std::string fill = "CCalvexReceiversShellView::FillList\n";
    const size_t fillsBefore = CountTrace(fill);

    // Written beside the tree first, then moved in: moves are quick enough for a burst.
    TempDirectory staging(L"calvex-burst");
    for (int i = 0; i < 1000; ++i)  // a failed creation fails its move below
        CloseHandle(CreateFileW((staging.Path() + L"\\" + FileName(i)).c_str(), GENERIC_WRITE, 0, nullptr,
                                CREATE_ALWAYS, 0, nullptr));
    const DWORD started = GetTickCount();
    for (int i = 0; i < 1000; ++i)
        ASSERT_TRUE(MoveFileW((staging.Path() + L"\\" + FileName(i)).c_str(), (tree.FolderPath(L"Calvex A") + L"\\" + FileName(i)).c_str()));
    // Under a second when idle; a busy machine only makes coalescing harder.
    ASSERT_LT(GetTickCount() - started, 3000u) << "no burst";
    // The events, the one-second quiet period, the five-second view timer, and some slack.
    ASSERT_TRUE(PumpUntil([&] { return view.Count() == 1001; }, 60000)) << view.Count();
    PumpMessagesFor(8000);

    const std::wstring path = kCalvexRootPath + L"\\1000-0001!Q9 GNSS!USB";
    EXPECT_GE(CountTrace("CCalvexFilesShellFolderEventHandler::OnFileAdded\r\n"), 1000u) << "every event arrived";
    EXPECT_EQ((std::map<std::wstring, int>{{path, 1}}), g_notified);
    const size_t fills = CountTrace(fill) - fillsBefore;
    EXPECT_GE(fills, 1u);
    EXPECT_LE(fills, 2u);
}

// Sorting rules are the folder test's; here only the scale: every one of 2,000 files listed once.
TEST_F(ReceiverLoadTest, TwoThousandFilesAreEachListedOnce) {
    tree.AddReceiver({L"Calvex A"});
    for (int i = 0; i < kFiles; ++i) tree.AddFile(L"Calvex A", FileName(i), static_cast<size_t>(i % 7));
    scope.reset(new DeviceSimScope(tree.Root()));
    ComPtr<IShellFolder> receiver = OurFolder(true);
    ASSERT_TRUE(receiver);
    std::vector<TaskPidl> items = ListItems(receiver.Get(), SHCONTF_NONFOLDERS);
    ASSERT_EQ(static_cast<size_t>(kFiles), items.size());
    CReceiversPidlMgr mgr;
    std::vector<int> seen(kFiles);
    for (const TaskPidl& item : items) ++seen.at(_wtoi(mgr.GetItemName(item.get()).c_str() + 1));
    EXPECT_EQ(std::vector<int>(kFiles, 1), seen) << "each name listed once";
}
