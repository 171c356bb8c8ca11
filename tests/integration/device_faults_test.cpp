// Guards Explorer's calls against bad devices: a device manager killed mid-call, missing, unplugged or answering garbage must never crash, hang past the product's own wait, or leave a partial file.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "MessageBoxAnswerer.h"
#include "VirtualFiles.h"
#include "module/ModuleApp.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"
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

struct WorkerCall {
    std::function<void()> work;
};

DWORD WINAPI RunWorker(void* parameter) {
    std::unique_ptr<WorkerCall> call(static_cast<WorkerCall*>(parameter));
    CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED);
    call->work();
    CoUninitialize();
    return 0;
}

// Runs work on an apartment thread of its own, as an Explorer window would; meanwhile is
// asked on this thread until it reports that it has acted. False when work has not returned
// within limitMs: the thread is left behind and the test fails instead of hanging.
bool FinishesWithin(DWORD limitMs, std::function<void()> work, const std::function<bool()>& meanwhile = {}) {
    HANDLE thread = CreateThread(nullptr, 0, RunWorker, new WorkerCall{std::move(work)}, 0, nullptr);
    if (!thread) return false;
    const DWORD started = GetTickCount();
    bool ranMeanwhile = !meanwhile;
    DWORD wait = WAIT_TIMEOUT;
    while (wait == WAIT_TIMEOUT && GetTickCount() - started < limitMs) {
        wait = WaitForSingleObject(thread, 50);
        if (!ranMeanwhile) ranMeanwhile = meanwhile();
    }
    CloseHandle(thread);
    return wait == WAIT_OBJECT_0;
}

ComPtr<IShellFolder> ReceiverFolder(HRESULT* hr) {
    ComPtr<IShellFolder> root = OurFolder(false);
    std::vector<TaskPidl> receivers = ListItems(root.Get(), SHCONTF_FOLDERS);
    ComPtr<IShellFolder> receiver;
    *hr = receivers.empty() ? S_FALSE
                            : root->BindToObject(receivers[0].get(), nullptr, IID_IShellFolder, receiver.PutVoid());
    return receiver;
}

Outcome ListReceivers(const std::wstring&) {
    Outcome out;
    out.items = static_cast<int>(ListItems(OurFolder(false).Get(), SHCONTF_FOLDERS, &out.hr).size());
    return out;
}

Outcome ListFiles(const std::wstring&) {
    Outcome out;
    ComPtr<IShellFolder> receiver = ReceiverFolder(&out.hr);
    if (receiver) out.items = static_cast<int>(ListItems(receiver.Get(), SHCONTF_NONFOLDERS, &out.hr).size());
    return out;
}

// Pastes the first of files into target as Explorer's paste does.
void PasteFirst(IShellFolder* receiver, const std::vector<TaskPidl>& files, const std::wstring& target, Outcome& out) {
    if (files.empty()) return;
    LPCITEMIDLIST first = files[0].get();
    ComPtr<IDataObject> data;
    out.hr = receiver->GetUIObjectOf(nullptr, 1, &first, IID_IDataObject, nullptr, data.PutVoid());
    if (data) out.written = PasteVirtualFiles(data.Get(), target, [](const std::wstring&) {}, out.failed);
}

Outcome DownloadFirst(const std::wstring& target) {
    Outcome out;
    ComPtr<IShellFolder> receiver = ReceiverFolder(&out.hr);
    if (!receiver) return out;
    std::vector<TaskPidl> files = ListItems(receiver.Get(), SHCONTF_NONFOLDERS);
    out.items = static_cast<int>(files.size());
    PasteFirst(receiver.Get(), files, target, out);
    return out;
}

// Deletes the first file through the view's Delete command.
Outcome DeleteFirst(const std::wstring&) {
    Outcome out;
    ComPtr<IShellFolder> receiver = ReceiverFolder(&out.hr);
    if (!receiver) return out;
    TestBrowser browser(false);
    HostedView host(receiver, browser);
    host.Select(0);
    host.Object()->OnCommand(1288);
    out.items = host.Count();
    return out;
}

std::vector<std::wstring> FilesIn(const std::wstring& dir) {
    std::vector<std::wstring> names;
    WIN32_FIND_DATAW found;
    HANDLE search = FindFirstFileW((dir + L"\\*").c_str(), &found);
    if (search == INVALID_HANDLE_VALUE) return names;
    do
        if (found.cFileName[0] != L'.') names.push_back(found.cFileName);
    while (FindNextFileW(search, &found));
    FindClose(search);
    return names;
}

const std::wstring kLongSerial(300, L'7');

class DeviceFaultsTest : public testing::Test {
protected:
    static void SetUpTestSuite() { ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized()); }
    void SetUp() override {
        answerer.reset(new MessageBoxAnswerer([this](const std::wstring&, const std::wstring&) { ++boxes; }));
    }
    void TearDown() override {
        answerer.reset();
        scope.reset();
    }
    // Receiver "Calvex A" (1000-0001 on USB) with LOG0001, LOG0002, ..., 1000 bytes each.
    void MakeReceiver(ReceiverTree& tree, ReceiverSetup setup, int files = 4) {
        setup.folder = L"Calvex A";
        tree.AddReceiver(setup);
        for (int i = 1; i <= files; ++i) {
            wchar_t name[16];
            swprintf(name, 16, L"LOG%04d", i);
            tree.AddFile(L"Calvex A", name, 1000);
        }
        scope.reset();  // the old scope's end restores the defaults: before the new one begins
        scope.reset(new DeviceSimScope(tree.Root()));
    }
    std::unique_ptr<DeviceSimScope> scope;
    std::unique_ptr<MessageBoxAnswerer> answerer;
    volatile LONG boxes = 0;
};
}  // namespace

TEST_F(DeviceFaultsTest, EveryFaultEndsInTimeWithTheRightOutcome) {
    struct Row {
        const char* fault;
        std::vector<std::wstring> lines;  // of the receiver's description
        Outcome (*call)(const std::wstring& target);
        HRESULT hr;
        int items, written, failed, boxes;
        DWORD maxMs;
        std::wstring serial = L"1000-0001";
        int files = 4;
    } rows[] = {
        {"killed while listing receivers", {L"[Exit]", L"IReceiver.get_Label=1"}, ListReceivers, S_OK, 0, 0, 0, 0, 10000},
        {"killed while listing files", {L"[Exit]", L"IFilesColl.get_Item:LOG0003=1"}, ListFiles, S_OK, 2, 0, 0, 0, 10000},
        {"killed early in a long listing", {L"[Exit]", L"IFilesColl.get_Item:LOG0002=1"}, ListFiles, S_OK, 1, 0, 0, 0, 10000, L"1000-0001", 400},
        {"killed while downloading", {L"[Transfer]", L"Rate=5000", L"ExitAtPercent=30"}, DownloadFirst, S_OK, 4, 0, 1, 1, 30000},
        {"killed while deleting", {L"[Exit]", L"IReceiverFile.Delete=1"}, DeleteFirst, S_OK, 0, 0, 0, 1, 20000},
        {"negative size", {L"[Report]", L"Size=-5"}, DownloadFirst, S_OK, 4, 0, 1, 0, 20000},
        {"time that is no date", {L"[Report]", L"Time=nan"}, DownloadFirst, S_OK, 4, 1, 0, 0, 20000},
        // Too long for any target: refused by the name rules before a download is asked for.
        {"300-character file names", {L"[Report]", L"NameLength=300"}, DownloadFirst, S_OK, 4, 0, 1, 0, 20000},
        {"300-character serial number", {}, ListFiles, E_INVALIDARG, -1, 0, 0, 0, 10000, kLongSerial},
        {"empty key", {}, ListFiles, S_OK, 4, 0, 0, 0, 10000, L""},
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
        MakeReceiver(tree, setup, row.files);
        boxes = 0;
        Outcome out;
        const std::wstring dir = target.Path();
        ASSERT_TRUE(FinishesWithin(row.maxMs, [&] { out = row.call(dir); })) << "hung";
        EXPECT_EQ(row.hr, out.hr);
        EXPECT_EQ(row.items, out.items);
        EXPECT_EQ(row.written, out.written);
        EXPECT_EQ(row.failed, out.failed);
        EXPECT_EQ(row.boxes, boxes);
        // Only whole files, under their own names: no partial download is ever left.
        EXPECT_EQ(static_cast<size_t>(row.written), FilesIn(dir).size());
        for (const std::wstring& name : FilesIn(dir)) EXPECT_EQ(1000u, ReadFileBytes(dir + L"\\" + name).size());
        if (row.call == DeleteFirst) EXPECT_TRUE(FileExists(tree.FolderPath(L"Calvex A") + L"\\LOG0001"));
    }
}

TEST_F(DeviceFaultsTest, UnregisteredManagerGivesAnEmptyQuietNamespace) {
    ReceiverTree tree;
    MakeReceiver(tree, ReceiverSetup());
    const std::wstring sim = L"\"" + BuildDir() + L"\\CalvexDeviceSim.exe\" ";
    ASSERT_EQ(0u, RunProcess(sim + L"/UnregServer"));
    Outcome out;
    const bool returned = FinishesWithin(10000, [&] { out = ListReceivers(L""); });
    EXPECT_EQ(0u, RunProcess(sim + L"/RegServer"));
    ASSERT_TRUE(returned) << "hung";
    EXPECT_EQ(S_OK, out.hr);
    EXPECT_EQ(0, out.items);
    EXPECT_EQ(0, boxes);
}

TEST_F(DeviceFaultsTest, UnpluggedReceiverFailsItsDownloadsWithoutAPartialFile) {
    const struct {
        const char* when;
        bool whileDownloading;
    } cases[] = {{"while its folder is open", false}, {"while a file downloads", true}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.when);
        ReceiverTree tree;
        TempDirectory target(L"calvex-faults-target");
        ReceiverSetup setup;
        setup.extraLines = {L"[Transfer]", L"Rate=100"};  // ten seconds a file
        MakeReceiver(tree, setup);
        boxes = 0;
        Outcome out;
        const std::wstring dir = target.Path();
        auto unplug = [&] { EXPECT_TRUE(tree.RemoveReceiver(L"Calvex A")); };
        auto unplugOnceDownloading = [&] {
            HWND dialog = FindWindowW(L"#32770", L"File Download");
            if (!dialog || !IsWindowVisible(dialog)) return false;
            unplug();
            return true;
        };
        auto openThenUnplug = [&] {
            ComPtr<IShellFolder> receiver = ReceiverFolder(&out.hr);
            if (!receiver) return;
            std::vector<TaskPidl> files = ListItems(receiver.Get(), SHCONTF_NONFOLDERS);
            unplug();
            PumpMessagesFor(1000);  // the offline event arrives
            out.items = static_cast<int>(ListItems(receiver.Get(), SHCONTF_NONFOLDERS).size());
            PasteFirst(receiver.Get(), files, dir, out);
        };
        if (c.whileDownloading)
            ASSERT_TRUE(FinishesWithin(20000, [&] { out = DownloadFirst(dir); }, unplugOnceDownloading)) << "hung";
        else
            ASSERT_TRUE(FinishesWithin(20000, openThenUnplug)) << "hung";
        EXPECT_EQ(S_OK, out.hr);
        EXPECT_EQ(0, out.written);
        EXPECT_EQ(1, out.failed);
        EXPECT_EQ(1, boxes) << "the download's error";
        EXPECT_TRUE(FilesIn(dir).empty());
    }
}
