// Downloads, cancel, delete and the configured faults of the out-of-process simulator, and a
// server that dies in the middle of a download.
#include <windows.h>
#include <objbase.h>

#include <functional>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "CalvexDeviceMgrLib.h"
#include "com/Bstr.h"
#include "com/ComPtr.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {

const DWORD kFinishWait = 15000;  // bounds every wait: a lost event must not hang the run

ComPtr<IReceiverFile> TreeFile(IDeviceMgr* manager, const wchar_t* key, const wchar_t* name) {
    ComPtr<IFilesColl> files = FilesOf(ReceiverByKey(ReceiversOf(manager).Get(), key).Get());
    return files ? FileByName(files.Get(), name) : nullptr;
}

}  // namespace

TEST(DeviceSimTransferTest, DownloadReportsRisingProgressAndRewindsTheStream) {
    DeviceSimScope scope;
    ComPtr<IDeviceMgr> manager = CreateDeviceManager();
    RecordedDownload download(TreeFile(manager.Get(), L"USB-HV3-0042117", L"20261103A.T02"));
    ASSERT_EQ(S_OK, download.Started());
    ASSERT_TRUE(download.WaitForFinish(kFinishWait));
    const auto& events = download.Events().Events();
    ASSERT_FALSE(events.empty());
    EXPECT_EQ(1, events.front().id);  // OnFileBegin first
    EXPECT_EQ(3, events.back().id);   // OnFileFinish last
    EXPECT_EQ(S_OK, download.FinishResult());
    std::vector<int> percents = download.Percents();
    ASSERT_FALSE(percents.empty());
    for (size_t i = 1; i < percents.size(); ++i) EXPECT_LT(percents[i - 1], percents[i]);
    EXPECT_EQ(100, percents.back());
    EXPECT_EQ(0u, StreamPosition(download.Stream()));
    EXPECT_EQ(ReadFileBytes(SampleReceiversDir() + L"\\Brennor HVL3 USB\\20261103A.T02"),
              StreamBytes(download.Stream()));
    VARIANT_BOOL running = VARIANT_TRUE;
    EXPECT_EQ(S_OK, download.File()->get_Downloading(&running));
    EXPECT_EQ(VARIANT_FALSE, running);
}

TEST(DeviceSimTransferTest, CancelEndsASlowDownloadWithTheCancelledResult) {
    ReceiverTree tree;
    tree.AddReceiver({L"serial", 1, L"Serial", L"700-1", L"Q7", 1, L"COM5", {L"[Transfer]", L"Rate=2000"}});
    tree.AddFile(L"serial", L"LOG0001", 20000);  // ten seconds at this rate
    DeviceSimScope scope(tree.Root());
    RecordedDownload download(TreeFile(CreateDeviceManager().Get(), L"COM5-700-1", L"LOG0001"));
    ASSERT_EQ(S_OK, download.Started());
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_BUSY), StartDownload(download.File(), NewMemoryStream().Get()));
    ASSERT_TRUE(download.Events().WaitFor(2, kFinishWait));
    EXPECT_EQ(S_OK, download.File()->Cancel());
    ASSERT_TRUE(download.WaitForFinish(kFinishWait));
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_CANCELLED), download.FinishResult());
    EXPECT_LT(download.Percents().back(), 100);
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_INVALID_STATE), download.File()->Cancel());
}

TEST(DeviceSimTransferTest, DeleteRemovesTheTreeFileAndTheWatcherReportsIt) {
    ReceiverTree tree;
    tree.AddReceiver({L"rover", 2, L"Rover", L"800-1", L"R2", 2, L"", {}});
    const std::wstring path = tree.AddFile(L"rover", L"LOG0001", 300);
    tree.AddFile(L"rover", L"LOG0002", 300);
    DeviceSimScope scope(tree.Root());
    ComPtr<IDeviceMgr> manager = CreateDeviceManager();
    ComPtr<IFilesColl> files = FilesOf(ReceiverByKey(ReceiversOf(manager.Get()).Get(), L"USB-800-1").Get());
    ASSERT_TRUE(files);
    ComPtr<SimEventRecorder> events = SimEventRecorder::Create(DIID__IFilesCollEvents);
    ASSERT_EQ(S_OK, events->Advise(files.Get()));
    ComPtr<IReceiverFile> file = FileByName(files.Get(), L"LOG0001");
    ASSERT_TRUE(file);
    ASSERT_EQ(S_OK, file->Delete());
    EXPECT_FALSE(FileExists(path));
    ASSERT_TRUE(events->WaitFor(2, 2000));
    EXPECT_EQ(L"LOG0001", SubjectName(events->Events().back().subject.Get()));
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND), file->Delete());
    LONG count = 0;
    ASSERT_EQ(S_OK, files->get_Count(&count));
    EXPECT_EQ(1, count);
    events->Unadvise();
}

TEST(DeviceSimTransferTest, ConfiguredCallFaultsGiveTheirResults) {
    ReceiverTree tree;
    tree.AddReceiver({L"faulty", 1, L"Faulty", L"900-1", L"Q9", 2, L"",
                      {L"[Fail]", L"IReceiver.get_Label=0x80004005", L"IReceiver.get_Brand=1",
                       L"IFilesColl.get_Item:LOG0002=0x8000FFFF", L"IReceiverFile.Delete=0x80070005"}});
    tree.AddFile(L"faulty", L"LOG0001", 10);
    tree.AddFile(L"faulty", L"LOG0002", 10);
    tree.AddReceiver({L"plain", 2, L"Plain", L"900-2", L"R2", 2, L"", {}});
    DeviceSimScope scope(tree.Root());
    SetDeviceSimCallFailure(L"IReceiver.get_Model", E_NOTIMPL);  // every receiver, from the registry
    ComPtr<IReceiversColl> receivers = ReceiversOf(CreateDeviceManager().Get());
    ComPtr<IReceiver> faulty = ReceiverByKey(receivers.Get(), L"USB-900-1");
    ComPtr<IReceiver> plain = ReceiverByKey(receivers.Get(), L"USB-900-2");
    ASSERT_TRUE(faulty && plain);
    ComPtr<IFilesColl> files = FilesOf(faulty.Get());
    ASSERT_TRUE(files);
    Bstr text;
    LONG number = 0;
    const CallCase cases[] = {
        {"faulty get_Label", [&] { return faulty->get_Label(text.Put()); }, E_FAIL},
        {"plain get_Label", [&] { return plain->get_Label(text.Put()); }, S_OK},
        {"faulty get_Brand (a success code)", [&] { return faulty->get_Brand(&number); }, S_FALSE},
        {"faulty get_Model (global)", [&] { return faulty->get_Model(text.Put()); }, E_NOTIMPL},
        {"plain get_Model (global)", [&] { return plain->get_Model(text.Put()); }, E_NOTIMPL},
        {"get_Item of LOG0001", [&] { HRESULT hr; FileAt(files.Get(), 0, &hr); return hr; }, S_OK},
        {"get_Item of LOG0002", [&] { HRESULT hr; FileAt(files.Get(), 1, &hr); return hr; }, E_UNEXPECTED},
        {"Delete", [&] { return FileByName(files.Get(), L"LOG0001")->Delete(); }, E_ACCESSDENIED},
    };
    for (const auto& c : cases) EXPECT_EQ(c.expected, c.make()) << c.call;
    ASSERT_EQ(S_FALSE, faulty->get_Brand(&number));
    EXPECT_EQ(1, number);  // a success code still hands the value out
    EXPECT_TRUE(FileExists(tree.FolderPath(L"faulty") + L"\\LOG0001"));
}

TEST(DeviceSimTransferTest, DownloadFailsAtTheConfiguredPercent) {
    ReceiverTree tree;
    tree.AddReceiver({L"own", 1, L"Own", L"950-1", L"Q7", 2, L"",
                      {L"[Transfer]", L"FailAtPercent=40", L"FailResult=0x8007001F"}});
    tree.AddFile(L"own", L"20261103A.T02", 300000);
    tree.AddReceiver({L"global", 1, L"Global", L"950-2", L"Q7", 2, L"", {}});
    tree.AddFile(L"global", L"20261103A.T02", 300000);
    DeviceSimScope scope(tree.Root());
    SetDeviceSimValue(L"FailAtPercent", 70);
    SetDeviceSimValue(L"FailResult", static_cast<DWORD>(E_ABORT));
    ComPtr<IDeviceMgr> manager = CreateDeviceManager();
    const struct {
        const wchar_t* key;
        int percent;
        HRESULT result;
    } cases[] = {{L"USB-950-1", 40, HRESULT_FROM_WIN32(ERROR_GEN_FAILURE)}, {L"USB-950-2", 70, E_ABORT}};
    for (const auto& c : cases) {
        SCOPED_TRACE(Narrow(c.key));
        RecordedDownload download(TreeFile(manager.Get(), c.key, L"20261103A.T02"));
        ASSERT_EQ(S_OK, download.Started());
        ASSERT_TRUE(download.WaitForFinish(kFinishWait));
        EXPECT_EQ(c.result, download.FinishResult());
        std::vector<int> percents = download.Percents();
        ASSERT_FALSE(percents.empty());
        EXPECT_LT(percents.back(), c.percent);
    }
}

TEST(DeviceSimTransferTest, ServerDyingMidDownloadTurnsIntoFailedCallsNotAHang) {
    ReceiverTree tree;
    tree.AddReceiver({L"doomed", 1, L"Doomed", L"990-1", L"Q7", 2, L"",
                      {L"[Transfer]", L"Rate=40000", L"ExitAtPercent=30"}});
    tree.AddFile(L"doomed", L"LOG0001", 80000);
    DeviceSimScope scope(tree.Root());
    ComPtr<IDeviceMgr> manager = CreateDeviceManager();
    ComPtr<IReceiversColl> receivers = ReceiversOf(manager.Get());
    RecordedDownload download(TreeFile(manager.Get(), L"USB-990-1", L"LOG0001"));
    ASSERT_EQ(S_OK, download.Started());
    HRESULT hr = S_OK;
    const bool gone = PumpUntil(
        [&] {
            VARIANT_BOOL running;
            hr = download.File()->get_Downloading(&running);
            return FAILED(hr);
        },
        kFinishWait);
    ASSERT_TRUE(gone) << "the server did not end";
    EXPECT_TRUE(IsServerGone(hr)) << std::hex << hr;
    EXPECT_EQ(0u, download.Events().Count(3));  // no finish: the server died first
    for (int percent : download.Percents()) EXPECT_LT(percent, 30);
    LONG count = 0;
    hr = receivers->get_Count(&count);
    EXPECT_TRUE(IsServerGone(hr)) << std::hex << hr;
    // The next client gets a new server.
    HRESULT created = E_FAIL;
    ComPtr<IDeviceMgr> fresh = CreateDeviceManager(&created);
    EXPECT_EQ(S_OK, created);
    ASSERT_TRUE(fresh);
    ASSERT_EQ(S_OK, ReceiversOf(fresh.Get())->get_Count(&count));
    EXPECT_EQ(1, count);
}
