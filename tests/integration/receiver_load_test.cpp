// Guards large receivers: a burst of file events that floods Explorer with notifications or view re-fills, and 2,000 files listed or sorted wrongly.
#include <gtest/gtest.h>

#include <algorithm>
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
// Sizes and minutes in orders of their own, so that each column sorts apart from the names.
int SizeOf(int i) { return i * 7919 % 5003; }
int MinuteOf(int i) { return i * 613 % kFiles; }  // distinct: 613 and 2000 share no factor

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

TEST_F(ReceiverLoadTest, TwoThousandFilesListAndSort) {
    ReceiverSetup setup;
    setup.folder = L"Calvex A";
    setup.extraLines.push_back(L"[Times]");
    for (int i = 0; i < kFiles; ++i) {
        wchar_t line[64];
        const int minutes = MinuteOf(i);
        swprintf(line, 64, L"%ls=2026-01-%02d %02d:%02d:00", FileName(i).c_str(), 1 + minutes / 1440,
                 minutes / 60 % 24, minutes % 60);
        setup.extraLines.push_back(line);
    }
    tree.AddReceiver(setup);
    for (int i = 0; i < kFiles; ++i) tree.AddFile(L"Calvex A", FileName(i), static_cast<size_t>(SizeOf(i)));
    scope.reset(new DeviceSimScope(tree.Root()));
    ComPtr<IShellFolder> receiver = OurFolder(true);
    ASSERT_TRUE(receiver);
    std::vector<TaskPidl> items = ListItems(receiver.Get(), SHCONTF_NONFOLDERS);
    ASSERT_EQ(static_cast<size_t>(kFiles), items.size());

    const struct {
        int column;
        int (*key)(int);  // by the file's index, from the tree's own data
    } columns[] = {{0, [](int i) { return i; }}, {2, SizeOf}, {3, MinuteOf}, {-2, [](int i) { return -SizeOf(i); }}};
    CReceiversPidlMgr mgr;
    auto indexOf = [&](LPCITEMIDLIST item) { return _wtoi(mgr.GetItemName(item).c_str() + 1); };
    std::vector<LPCITEMIDLIST> byIndex(kFiles);
    for (const TaskPidl& item : items) byIndex.at(indexOf(item.get())) = item.get();
    ASSERT_EQ(0, std::count(byIndex.begin(), byIndex.end(), nullptr)) << "each name listed once";
    for (const auto& c : columns) {
        SCOPED_TRACE(c.column);
        std::vector<LPCITEMIDLIST> order(byIndex.rbegin(), byIndex.rend());  // no column's order already
        // The view reads the sign of the raw value as the order.
        std::stable_sort(order.begin(), order.end(), [&](LPCITEMIDLIST a, LPCITEMIDLIST b) {
            return static_cast<int>(receiver->CompareIDs(c.column, a, b)) < 0;
        });
        int wrong = 0;
        for (size_t i = 1; i < order.size(); ++i) wrong += c.key(indexOf(order[i - 1])) > c.key(indexOf(order[i]));
        EXPECT_EQ(0, wrong);
    }
}
