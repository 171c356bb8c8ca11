// Guards Explorer's calls against bad devices: a device manager killed mid-call, a receiver unplugged or answering garbage must never crash, hang past the product's own wait, or leave a partial file.
#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "MessageBoxAnswerer.h"
#include "VirtualFiles.h"
#include "com/ModuleLock.h"
#include "module/ModuleApp.h"
#include "support/DeviceSim.h"
#include "support/ViewHost.h"

using namespace testsupport;

namespace {
// What one operation through the product came to.
struct Outcome {
    HRESULT hr = E_PENDING;
    int items = -1;  // listed, or left in the view
    int written = 0;
    int failed = 0;
};

// Runs work on an apartment thread of its own, as an Explorer window would; meanwhile is
// asked on this thread until it reports that it has acted. False when work has not returned
// within limitMs: the thread is left behind and the test fails instead of hanging.
bool FinishesWithin(DWORD limitMs, std::function<void()> work, const std::function<bool()>& meanwhile = {}) {
    auto done = std::make_shared<std::atomic<bool>>(false);
    std::thread([work, done] {
        CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED);
        work();
        CoUninitialize();
        *done = true;
    }).detach();
    bool ranMeanwhile = !meanwhile;
    for (const DWORD started = GetTickCount(); !*done && GetTickCount() - started < limitMs; Sleep(50))
        if (!ranMeanwhile) ranMeanwhile = meanwhile();
    return *done;
}

// How far an Explorer window goes: the receivers, a receiver's files, pasting or deleting (through
// the view's Delete) the first of them.
enum class Step { Receivers, Files, Download, Delete };
enum class Unplug { Never, AfterListing, WhileDownloading };

Outcome Walk(Step step, const std::wstring& target, const std::function<void()>& afterListing) {
    Outcome out;
    if (step == Step::Receivers) {
        out.items = static_cast<int>(ListItems(OurFolder(false).Get(), SHCONTF_FOLDERS, &out.hr).size());
        return out;
    }
    ComPtr<IShellFolder> receiver = OurFolder(true, false, &out.hr);
    if (!receiver) return out;
    if (step == Step::Delete) {
        TestBrowser browser;
        HostedView host(receiver, browser);
        host.Select(0);
        host.Object()->OnCommand(1288);
        out.items = host.Count();
        return out;
    }
    std::vector<TaskPidl> files = ListItems(receiver.Get(), SHCONTF_NONFOLDERS, &out.hr);
    out.items = static_cast<int>(files.size());
    if (afterListing) afterListing();
    if (step != Step::Download || files.empty()) return out;
    LPCITEMIDLIST first = files[0].get();  // pasted as Explorer's paste does
    ComPtr<IDataObject> data;
    out.hr = receiver->GetUIObjectOf(nullptr, 1, &first, IID_IDataObject, nullptr, data.PutVoid());
    if (data) out.written = PasteVirtualFiles(data.Get(), target, [](const std::wstring&) {}, out.failed);
    return out;
}

class DeviceFaultsTest : public testing::Test {
protected:
    static void SetUpTestSuite() { ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized()); }
    volatile LONG boxes = 0;
    MessageBoxAnswerer answerer{[this](const std::wstring&, const std::wstring&) { ++boxes; }};
};
}  // namespace

TEST_F(DeviceFaultsTest, EveryFaultEndsInTimeWithTheRightOutcome) {
    const std::vector<std::wstring> slow = {L"[Transfer]", L"Rate=100"};  // ten seconds a file
    struct Row {
        const char* fault;
        std::vector<std::wstring> lines;  // of the receiver's description
        Step step;
        HRESULT hr;
        int items, written, failed, boxes;
        DWORD maxMs;
        Unplug unplug = Unplug::Never;
        std::wstring serial = L"1000-0001";
        int files = 4;
    } rows[] = {
        {"killed while listing receivers", {L"[Exit]", L"IReceiver.get_Label=1"}, Step::Receivers, S_OK, 0, 0, 0, 0, 10000},
        {"killed early in a long listing", {L"[Exit]", L"IFilesColl.get_Item:LOG0003=1"}, Step::Files, S_OK, 2, 0, 0, 0, 10000, Unplug::Never, L"1000-0001", 400},
        {"killed while downloading", {L"[Transfer]", L"Rate=5000", L"ExitAtPercent=30"}, Step::Download, S_OK, 4, 0, 1, 1, 30000},
        {"killed while deleting", {L"[Exit]", L"IReceiverFile.Delete=1"}, Step::Delete, S_OK, 0, 0, 0, 1, 20000},
        {"unplugged with its folder open", slow, Step::Download, S_OK, 4, 0, 1, 1, 20000, Unplug::AfterListing},
        {"unplugged while a file downloads", slow, Step::Download, S_OK, 4, 0, 1, 1, 20000, Unplug::WhileDownloading},
        {"negative size", {L"[Report]", L"Size=-5"}, Step::Download, S_OK, 4, 0, 1, 0, 20000},
        {"time that is no date", {L"[Report]", L"Time=nan"}, Step::Download, S_OK, 4, 1, 0, 0, 20000},
        {"found, but S_OK with no object", {L"[Report]", L"Found=nothing"}, Step::Files, E_INVALIDARG, -1, 0, 0, 0, 10000},
        // Too long for any target: refused by the name rules before a download is asked for.
        {"300-character file names", {L"[Report]", L"NameLength=300"}, Step::Download, S_OK, 4, 0, 1, 0, 20000},
        {"300-character serial number", {}, Step::Files, E_INVALIDARG, -1, 0, 0, 0, 10000, Unplug::Never,
         std::wstring(300, L'7')},
        {"empty key", {}, Step::Files, S_OK, 4, 0, 0, 0, 10000, Unplug::Never, L""},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.fault);
        ReceiverTree tree;
        TempDirectory target(L"calvex-faults-target");
        ReceiverSetup setup;
        setup.serialNumber = row.serial;
        setup.extraLines = row.lines;
        if (row.serial.empty()) {  // every field of the key empty
            setup.model.clear();
            setup.portType = 1;
        }
        setup.folder = L"Calvex A";
        tree.AddReceiver(setup);
        for (int i = 1; i <= row.files; ++i)  // LOG0001, LOG0002, ..., 1000 bytes each
            tree.AddFile(setup.folder, L"LOG" + std::to_wstring(10000 + i).substr(1), 1000);
        DeviceSimScope scope(tree.Root());  // ended before the tree and the next row's scope
        boxes = 0;
        Outcome out;
        const std::wstring dir = target.Path();
        auto unplug = [&] {
            EXPECT_TRUE(tree.RemoveReceiver(L"Calvex A"));
            PumpMessagesFor(1000);  // the offline event arrives
        };
        auto unplugOnceDownloading = [&] {
            HWND dialog = FindWindowW(L"#32770", L"File Download");
            if (!dialog || !IsWindowVisible(dialog)) return false;
            EXPECT_TRUE(tree.RemoveReceiver(L"Calvex A"));
            return true;
        };
        ASSERT_TRUE(FinishesWithin(
            row.maxMs,
            [&] { out = Walk(row.step, dir, row.unplug == Unplug::AfterListing ? unplug : std::function<void()>()); },
            row.unplug == Unplug::WhileDownloading ? unplugOnceDownloading : std::function<bool()>()))
            << "hung";
        EXPECT_EQ(row.hr, out.hr);
        EXPECT_EQ(row.items, out.items);
        EXPECT_EQ(row.written, out.written);
        EXPECT_EQ(row.failed, out.failed);
        EXPECT_EQ(row.boxes, boxes);
        // Only the whole file under its own name: no partial download is ever left.
        EXPECT_EQ(row.written ? 1000u : 0u, ReadFileBytes(dir + L"\\LOG0001.qpr").size());
        DeleteFileW((dir + L"\\LOG0001.qpr").c_str());
        EXPECT_TRUE(RemoveDirectoryW(dir.c_str())) << "something else was left";
        EXPECT_TRUE(row.step != Step::Delete || FileExists(tree.FolderPath(L"Calvex A") + L"\\LOG0001"));
        EXPECT_EQ(0, ModuleLock::Count()) << "an object of the row is still held, so Explorer cannot unload us";
    }
}
