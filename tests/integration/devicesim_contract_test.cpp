// Guards the simulated device manager's contract as a client meets it out of process: wrong listings, lookups, results or configured faults, lost or late events, broken downloads, and hangs when the server dies.
#include <windows.h>
#include <objbase.h>
#include <oleauto.h>

#include <functional>
#include <iterator>
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

const DWORD kWait = 15000;     // bounds every wait: a lost event must not hang the run
const DWORD kEventDue = 1500;  // tree changes are due within about 0.2 s

std::wstring Text(HRESULT (STDMETHODCALLTYPE IReceiver::*get)(BSTR*), IReceiver* receiver) {
    Bstr text;
    EXPECT_EQ(S_OK, (receiver->*get)(text.Put()));
    return text.Str();
}

long Number(HRESULT (STDMETHODCALLTYPE IReceiver::*get)(LONG*), IReceiver* receiver) {
    LONG value = -12345;
    EXPECT_EQ(S_OK, (receiver->*get)(&value));
    return value;
}

LONG CountOf(IFilesColl* files) {
    LONG count = -1;
    EXPECT_EQ(S_OK, files->get_Count(&count));
    return count;
}

ComPtr<IReceiverFile> TreeFile(IDeviceMgr* manager, const wchar_t* key, const wchar_t* name) {
    ComPtr<IFilesColl> files = FilesOf(ReceiverByKey(ReceiversOf(manager).Get(), key).Get());
    return files ? FileByName(files.Get(), name) : nullptr;
}

// Milliseconds until the event arrives; -1 when it does not.
long TimeToEvent(const SimEventRecorder& recorder, DISPID id, size_t count = 1) {
    const ULONGLONG start = GetTickCount64();
    if (!recorder.WaitFor(id, 2000, count)) return -1;
    return static_cast<long>(GetTickCount64() - start);
}

}  // namespace

TEST(DeviceSimContractTest, ServesTheSampleTreeThroughTheContractSlots) {
    DeviceSimScope scope;
    HRESULT created = E_FAIL;
    ComPtr<IDeviceMgr> manager = CreateDeviceManager(&created);
    ASSERT_EQ(S_OK, created);
    ComPtr<IReceiversColl> receivers = ReceiversOf(manager.Get());
    ASSERT_TRUE(receivers);
    const wchar_t* const expected[] = {  // in folder name order: serial|model|port type|port name|brand|label|files
        L"HV3-0042117|HVL3-GNSS|2||2|North pillar|3",    L"BR-5500-0009|Compact \u00DC/2|2||2|Field kit #2!|5",
        L"R2-77810|R2/Net|1|COM4|2|Boat|2",               L"R2-77811|R2|2||2||1",
        L"5400-00003|Q7/L1-L2|3||1|Lab unit|0",           L"5211-40125|Q7/RTK|1|COM3|1|Survey base|3",
        L"5302-00871|Q9 GNSS|2||1|Rover 1|7",             L"123-45678|Z/5|1|COM12|1|Z5 spare|2",
    };
    LONG count = -1;
    ASSERT_EQ(S_OK, receivers->get_Count(&count));
    ASSERT_EQ(static_cast<LONG>(std::size(expected)), count);
    for (LONG i = 0; i < count; ++i) {
        ComPtr<IReceiver> receiver = ReceiverAt(receivers.Get(), i);
        ASSERT_TRUE(receiver);
        ComPtr<IFilesColl> files = FilesOf(receiver.Get());
        ASSERT_TRUE(files);
        const std::wstring bar = L"|";
        EXPECT_EQ(expected[i], Text(&IReceiver::get_SerialNumber, receiver.Get()) + bar +
                                   Text(&IReceiver::get_Model, receiver.Get()) + bar +
                                   std::to_wstring(Number(&IReceiver::get_PortType, receiver.Get())) + bar +
                                   Text(&IReceiver::get_PortName, receiver.Get()) + bar +
                                   std::to_wstring(Number(&IReceiver::get_Brand, receiver.Get())) + bar +
                                   Text(&IReceiver::get_Label, receiver.Get()) + bar + std::to_wstring(CountOf(files.Get())));
    }
    HRESULT past = S_OK;
    EXPECT_FALSE(ReceiverAt(receivers.Get(), count, &past));
    EXPECT_EQ(E_INVALIDARG, past);

    // A file's size is its tree file's; its time the description's (local time).
    ComPtr<IReceiverFile> file = TreeFile(manager.Get(), L"USB-5302-00871", L"20261103B.T02");
    ASSERT_TRUE(file);
    LONG size = -1;
    DATE time = 0;
    SYSTEMTIME st = {};
    ASSERT_EQ(S_OK, file->get_Size(&size));
    EXPECT_EQ(ReadFileBytes(SampleReceiversDir() + L"\\Calvex Q9 USB\\20261103B.T02").size(), static_cast<size_t>(size));
    ASSERT_EQ(S_OK, file->get_Time(&time));
    ASSERT_TRUE(VariantTimeToSystemTime(time, &st));
    EXPECT_EQ((std::vector<int>{2026, 11, 3, 17, 45, 10}),
              (std::vector<int>{st.wYear, st.wMonth, st.wDay, st.wHour, st.wMinute, st.wSecond}));
}

TEST(DeviceSimContractTest, FindsReceiversByKeyAndFilesByName) {
    DeviceSimScope scope;
    ComPtr<IReceiversColl> receivers = ReceiversOf(CreateDeviceManager().Get());
    ASSERT_TRUE(receivers);
    ComPtr<IFilesColl> odd = FilesOf(ReceiverByKey(receivers.Get(), L"USB-BR-5500-0009").Get());
    ASSERT_TRUE(odd);
    const struct {
        const wchar_t* key;   // a receiver key, or a file of the odd receiver when null
        const wchar_t* name;  // what the found object answers, or the file name looked up
        HRESULT result;
    } cases[] = {
        {L"COM3-5211-40125", L"5211-40125", S_OK},     {L"Unknown-5400-00003", L"5400-00003", S_OK},
        {L"COM12-123-45678", L"123-45678", S_OK},      {L"USB-HV3-0042117", L"HV3-0042117", S_OK},
        {L"COM4-5211-40125", nullptr, E_INVALIDARG},   {L"5211-40125", nullptr, E_INVALIDARG},
        {L"", nullptr, E_INVALIDARG},                  {nullptr, L"Mesure \u00E9t\u00E9.log", S_OK},
        {nullptr, L"point#3", S_OK},                   {nullptr, L"done!", S_OK},
        {nullptr, L"\u00C5\u00C4\u00D6-\u6F22\u5B57.T02", S_OK}, {nullptr, L"done!.qpr", E_INVALIDARG},
        {nullptr, L"receiver.ini", E_INVALIDARG},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(Narrow(c.key ? c.key : c.name));
        HRESULT hr = E_FAIL;
        std::wstring found;
        if (c.key) {
            ComPtr<IReceiver> receiver = ReceiverByKey(receivers.Get(), c.key, &hr);
            if (receiver) found = Text(&IReceiver::get_SerialNumber, receiver.Get());
        } else {
            ComPtr<IReceiverFile> file = FileByName(odd.Get(), c.name, &hr);
            if (file) found = FileName(file.Get());
        }
        EXPECT_EQ(c.result, hr);
        EXPECT_EQ(SUCCEEDED(c.result) ? c.name : L"", found);
    }
}

TEST(DeviceSimContractTest, TreeChangesArriveAsEventsAndRefreshFiresBeforeItReturns) {
    ReceiverTree tree;
    tree.AddReceiver({L"base", 1, L"Base", L"100-1", L"Q7/RTK", 1, L"COM3", {}});
    tree.AddFile(L"base", L"LOG0001", 100);
    DeviceSimScope scope(tree.Root());
    ComPtr<IDeviceMgr> manager = CreateDeviceManager();
    ComPtr<IReceiversColl> receivers = ReceiversOf(manager.Get());
    ASSERT_TRUE(receivers);
    ComPtr<IFilesColl> files = FilesOf(ReceiverByKey(receivers.Get(), L"COM3-100-1").Get());
    ASSERT_TRUE(files);
    ComPtr<SimEventRecorder> receiverEvents = SimEventRecorder::Create(DIID__IReceiversCollEvents);
    ComPtr<SimEventRecorder> fileEvents = SimEventRecorder::Create(DIID__IFilesCollEvents);
    ASSERT_EQ(S_OK, receiverEvents->Advise(receivers.Get()));
    ASSERT_EQ(S_OK, fileEvents->Advise(files.Get()));

    const struct {
        const char* change;
        std::function<bool()> make;
        SimEventRecorder* recorder;
        DISPID id;
        const wchar_t* subject;
    } steps[] = {
        {"file added", [&] { tree.AddFile(L"base", L"LOG0002", 50); return true; }, fileEvents.Get(), 1, L"LOG0002"},
        {"file removed", [&] { return tree.RemoveFile(L"base", L"LOG0001"); }, fileEvents.Get(), 2, L"LOG0001"},
        {"receiver added", [&] { tree.AddReceiver({L"rover", 2, L"Rover", L"200-2", L"R2", 2, L"", {}}); return true; },
         receiverEvents.Get(), 1, L"200-2"},
        {"receiver removed", [&] { return tree.RemoveReceiver(L"rover"); }, receiverEvents.Get(), 2, L"200-2"},
    };
    for (const auto& s : steps) {
        ASSERT_TRUE(s.make()) << s.change;
        const long due = TimeToEvent(*s.recorder, s.id);
        ASSERT_GE(due, 0) << s.change << ": no event";
        EXPECT_LE(due, static_cast<long>(kEventDue)) << s.change;
        EXPECT_EQ(s.subject, SubjectName(s.recorder->Events().back().subject.Get())) << s.change;
    }
    EXPECT_EQ(1, CountOf(files.Get()));
    EXPECT_EQ(2u, fileEvents->Events().size()) << "another receiver's changes reached these files";
    HRESULT gone = S_OK;
    EXPECT_FALSE(ReceiverByKey(receivers.Get(), L"USB-200-2", &gone));
    EXPECT_EQ(E_INVALIDARG, gone);

    ASSERT_EQ(S_OK, fileEvents->Unadvise());
    tree.AddReceiver({L"third", 1, L"Third", L"300-3", L"Q9", 3, L"", {}});
    tree.AddFile(L"base", L"LOG0003", 5);
    ASSERT_EQ(S_OK, manager->Refresh());
    EXPECT_EQ(2u, receiverEvents->Count(1));
    EXPECT_TRUE(ReceiverByKey(receivers.Get(), L"Unknown-300-3"));
    PumpMessagesFor(1000);  // the watcher's own rescan has nothing more to report
    EXPECT_EQ(2u, receiverEvents->Count(1));
    EXPECT_EQ(2u, fileEvents->Events().size()) << "an unadvised sink was called";
    receiverEvents->Unadvise();
}

TEST(DeviceSimContractTest, DownloadsProgressRewindCancelAndDelete) {
    ReceiverTree tree;
    tree.AddReceiver({L"fast", 1, L"Fast", L"700-1", L"Q7", 2, L"", {}});
    const std::wstring fastPath = tree.AddFile(L"fast", L"LOG0001", 300000);
    tree.AddReceiver({L"slow", 1, L"Slow", L"700-2", L"Q7", 1, L"COM5", {L"[Transfer]", L"Rate=2000"}});
    tree.AddFile(L"slow", L"LOG0001", 20000);  // ten seconds at this rate
    DeviceSimScope scope(tree.Root());
    ComPtr<IDeviceMgr> manager = CreateDeviceManager();

    RecordedDownload fast(TreeFile(manager.Get(), L"USB-700-1", L"LOG0001"));
    ASSERT_EQ(S_OK, fast.Started());
    ASSERT_TRUE(fast.WaitForFinish(kWait));
    EXPECT_EQ(1, fast.Events().Events().front().id);  // OnFileBegin first
    EXPECT_EQ(S_OK, fast.FinishResult());
    EXPECT_EQ((std::vector<int>{21, 43, 65, 87, 100}), fast.Percents());  // 64 KiB chunks
    EXPECT_EQ(0u, StreamPosition(fast.Stream()));
    EXPECT_EQ(ReadFileBytes(fastPath), StreamBytes(fast.Stream()));
    VARIANT_BOOL running = VARIANT_TRUE;
    EXPECT_EQ(S_OK, fast.File()->get_Downloading(&running));
    EXPECT_EQ(VARIANT_FALSE, running);

    RecordedDownload slow(TreeFile(manager.Get(), L"COM5-700-2", L"LOG0001"));
    ASSERT_EQ(S_OK, slow.Started());
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_BUSY), StartDownload(slow.File(), NewMemoryStream().Get()));
    ASSERT_TRUE(slow.Events().WaitFor(2, kWait));
    EXPECT_EQ(S_OK, slow.File()->Cancel());
    ASSERT_TRUE(slow.WaitForFinish(kWait));
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_CANCELLED), slow.FinishResult());
    EXPECT_LT(slow.Percents().back(), 100);
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_INVALID_STATE), slow.File()->Cancel());

    ASSERT_EQ(S_OK, fast.File()->Delete());
    EXPECT_FALSE(FileExists(fastPath));
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND), fast.File()->Delete());
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND), StartDownload(fast.File(), NewMemoryStream().Get()));
}

TEST(DeviceSimContractTest, ConfiguredFaultsGiveTheirResults) {
    ReceiverTree tree;
    tree.AddReceiver({L"faulty", 1, L"Faulty", L"900-1", L"Q9", 2, L"",
                      {L"[Fail]", L"IReceiver.get_Label=0x80004005", L"IReceiver.get_Brand=1",
                       L"IFilesColl.get_Item:LOG0002=0x8000FFFF", L"IReceiverFile.Delete=0x80070005",
                       L"[Transfer]", L"FailAtPercent=40", L"FailResult=0x8007001F"}});
    tree.AddFile(L"faulty", L"LOG0001", 300000);
    tree.AddFile(L"faulty", L"LOG0002", 10);
    tree.AddReceiver({L"plain", 2, L"Plain", L"900-2", L"R2", 2, L"", {}});
    tree.AddFile(L"plain", L"LOG0001", 300000);
    DeviceSimScope scope(tree.Root());
    SetDeviceSimCallFailure(L"IReceiver.get_Model", E_NOTIMPL);  // every receiver, from the registry
    SetDeviceSimValue(L"FailAtPercent", 70);
    SetDeviceSimValue(L"FailResult", static_cast<DWORD>(E_ABORT));
    ComPtr<IDeviceMgr> manager = CreateDeviceManager();
    ComPtr<IReceiversColl> receivers = ReceiversOf(manager.Get());
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
    EXPECT_EQ(1, number) << "a success code still hands the value out";
    EXPECT_TRUE(FileExists(tree.FolderPath(L"faulty") + L"\\LOG0001"));

    const struct {
        const wchar_t* key;
        int percent;
        HRESULT result;
    } downloads[] = {{L"USB-900-1", 40, HRESULT_FROM_WIN32(ERROR_GEN_FAILURE)}, {L"USB-900-2", 70, E_ABORT}};
    for (const auto& d : downloads) {
        SCOPED_TRACE(Narrow(d.key));
        RecordedDownload download(TreeFile(manager.Get(), d.key, L"LOG0001"));
        ASSERT_EQ(S_OK, download.Started());
        ASSERT_TRUE(download.WaitForFinish(kWait));
        EXPECT_EQ(d.result, download.FinishResult());
        ASSERT_FALSE(download.Percents().empty());
        EXPECT_LT(download.Percents().back(), d.percent);
    }
}

TEST(DeviceSimContractTest, ServerDyingMidDownloadTurnsIntoFailedCallsNotAHang) {
    ReceiverTree tree;
    tree.AddReceiver({L"doomed", 1, L"Doomed", L"990-1", L"Q7", 2, L"", {L"[Transfer]", L"Rate=40000", L"ExitAtPercent=30"}});
    tree.AddFile(L"doomed", L"LOG0001", 80000);
    DeviceSimScope scope(tree.Root());
    ComPtr<IDeviceMgr> manager = CreateDeviceManager();
    ComPtr<IReceiversColl> receivers = ReceiversOf(manager.Get());
    RecordedDownload download(TreeFile(manager.Get(), L"USB-990-1", L"LOG0001"));
    ASSERT_EQ(S_OK, download.Started());
    HRESULT hr = S_OK;
    ASSERT_TRUE(PumpUntil([&] {
        VARIANT_BOOL running;
        hr = download.File()->get_Downloading(&running);
        return FAILED(hr);
    }, kWait)) << "the server did not end";
    EXPECT_TRUE(IsServerGone(hr)) << std::hex << hr;
    EXPECT_EQ(0u, download.Events().Count(3));  // no finish: the server died first
    for (int percent : download.Percents()) EXPECT_LT(percent, 30);
    LONG count = 0;
    hr = receivers->get_Count(&count);
    EXPECT_TRUE(IsServerGone(hr)) << std::hex << hr;
    HRESULT created = E_FAIL;
    ComPtr<IDeviceMgr> fresh = CreateDeviceManager(&created);  // the next client gets a new server
    EXPECT_EQ(S_OK, created);
    ASSERT_TRUE(fresh);
    ASSERT_EQ(S_OK, ReceiversOf(fresh.Get())->get_Count(&count));
    EXPECT_EQ(1, count);
}
