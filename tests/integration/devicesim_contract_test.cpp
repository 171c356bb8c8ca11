// Guards the simulated device manager's contract as a client meets it out of process: wrong listings, lookups, results or configured faults, lost or late events, broken downloads.
#include <functional>
#include <iterator>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "com/Bstr.h"
#include "support/DeviceSim.h"

using namespace testsupport;

namespace {

const DWORD kWait = 15000;     // bounds every wait: a lost event must not hang the run
const DWORD kEventDue = 1500;  // tree changes are due within about 0.2 s

LONG CountOf(IFilesColl* files) {
    LONG count = -1;
    EXPECT_EQ(S_OK, files->get_Count(&count));
    return count;
}

// serial|model|port type|port name|brand|label|files, each read through its own slot.
std::wstring Describe(IReceiver* receiver) {
    Bstr serial, model, port, label;
    LONG type = -1, brand = -1;
    for (HRESULT hr : {receiver->get_SerialNumber(serial.Put()), receiver->get_Model(model.Put()),
                       receiver->get_PortType(&type), receiver->get_PortName(port.Put()), receiver->get_Brand(&brand),
                       receiver->get_Label(label.Put())})
        EXPECT_EQ(S_OK, hr);
    const std::wstring bar = L"|";
    return serial.Str() + bar + model.Str() + bar + std::to_wstring(type) + bar + port.Str() + bar +
           std::to_wstring(brand) + bar + label.Str() + bar + std::to_wstring(CountOf(FilesOf(receiver).Get()));
}

// A download of a receiver's LOG0001 into memory, started at construction, its events recorded.
struct RecordedDownload {
    RecordedDownload(IDeviceMgr* manager, const wchar_t* key) {
        ComPtr<IFilesColl> files = FilesOf(ReceiverByKey(ReceiversOf(manager).Get(), key).Get());
        if (files) file = FileByName(files.Get(), L"LOG0001");
        if (file && SUCCEEDED(started = events->Advise(file.Get()))) started = StartDownload(file.Get(), stream.Get());
    }
    ~RecordedDownload() { events->Unadvise(file.Get()); }
    bool WaitForFinish() const { return events->WaitFor(3, kWait); }

    ComPtr<IReceiverFile> file;
    ComPtr<IStream> stream = NewMemoryStream();
    ComPtr<SimEventRecorder> events = SimEventRecorder::Create(DIID__IReceiverFileEvents);
    HRESULT started = E_FAIL;
};

}  // namespace

TEST(DeviceSimContractTest, ServesAndFindsTheSampleTreeThroughTheContractSlots) {
    DeviceSimScope scope;
    ComPtr<IReceiversColl> receivers = ReceiversOf(CreateDeviceManager().Get());
    ASSERT_TRUE(receivers);
    const wchar_t* const expected[] = {  // in folder name order
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
        EXPECT_EQ(expected[i], Describe(receiver.Get()));
    }
    HRESULT past = S_OK;
    EXPECT_FALSE(ReceiverAt(receivers.Get(), count, &past));
    EXPECT_EQ(E_INVALIDARG, past);

    ComPtr<IFilesColl> odd = FilesOf(ReceiverByKey(receivers.Get(), L"USB-BR-5500-0009").Get());
    ASSERT_TRUE(odd);
    const struct {
        const wchar_t* key;   // a receiver key, or a file of the odd receiver when null
        const wchar_t* name;  // what the found object answers, or the file name looked up
        HRESULT result;
    } cases[] = {
        {L"COM3-5211-40125", L"5211-40125", S_OK},     {L"Unknown-5400-00003", L"5400-00003", S_OK},
        {L"USB-HV3-0042117", L"HV3-0042117", S_OK},    {L"COM4-5211-40125", nullptr, E_INVALIDARG},
        {L"5211-40125", nullptr, E_INVALIDARG},        {L"", nullptr, E_INVALIDARG},
        {nullptr, L"Mesure \u00E9t\u00E9.log", S_OK}, {nullptr, L"done!", S_OK}, {nullptr, L"done!.qpr", E_INVALIDARG},
        {nullptr, L"\u00C5\u00C4\u00D6-\u6F22\u5B57.T02", S_OK}, {nullptr, L"receiver.ini", E_INVALIDARG},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(Narrow(c.key ? c.key : c.name));
        HRESULT hr = E_FAIL;
        const std::wstring found = c.key ? NameOf(ReceiverByKey(receivers.Get(), c.key, &hr).Get())
                                         : NameOf(FileByName(odd.Get(), c.name, &hr).Get());
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

    const struct { const char* change; std::function<bool()> make; SimEventRecorder* recorder; DISPID id;
                   const wchar_t* subject; } steps[] = {
        {"file added", [&] { tree.AddFile(L"base", L"LOG0002", 50); return true; }, fileEvents.Get(), 1, L"LOG0002"},
        {"file removed", [&] { return tree.RemoveFile(L"base", L"LOG0001"); }, fileEvents.Get(), 2, L"LOG0001"},
        {"receiver added", [&] { tree.AddReceiver({L"rover", 2, L"Rover", L"200-2", L"R2", 2, L"", {}}); return true; },
         receiverEvents.Get(), 1, L"200-2"},
        {"receiver removed", [&] { return DeleteTree(tree.FolderPath(L"rover")); }, receiverEvents.Get(), 2, L"200-2"},
    };
    for (const auto& s : steps) {
        ASSERT_TRUE(s.make()) << s.change;
        ASSERT_TRUE(s.recorder->WaitFor(s.id, kEventDue)) << s.change << ": no event in time";
        EXPECT_EQ(s.subject, NameOf(s.recorder->events.back().subject.Get())) << s.change;
    }
    EXPECT_EQ(1, CountOf(files.Get()));

    tree.AddReceiver({L"third", 1, L"Third", L"300-3", L"Q9", 3, L"", {}});
    ASSERT_EQ(S_OK, manager->Refresh());
    EXPECT_EQ(2u, receiverEvents->Count(1));
    EXPECT_TRUE(ReceiverByKey(receivers.Get(), L"Unknown-300-3"));
    PumpMessagesFor(1000);  // the watcher's own rescan has nothing more to report
    EXPECT_EQ(2u, receiverEvents->Count(1));
    tree.AddFile(L"base", L"LOG0002", 75);  // rewritten in place, its receiver plugged in throughout
    ASSERT_EQ(S_OK, manager->Refresh());
    long size = 0;
    EXPECT_EQ(S_OK, FileByName(files.Get(), L"LOG0002")->get_Size(&size));
    EXPECT_EQ(75, size) << "a download of the old size would be refused as garbled";
    fileEvents->Unadvise(files.Get());
    receiverEvents->Unadvise(receivers.Get());
}

TEST(DeviceSimContractTest, ConfiguredFaultsAndDownloadsGiveTheirResults) {
    ReceiverTree tree;
    tree.AddReceiver({L"fast", 1, L"Fast", L"700-1", L"Q7", 2, L"", {}});
    const std::wstring fastPath = tree.AddFile(L"fast", L"LOG0001", 300000);
    tree.AddReceiver({L"slow", 1, L"Slow", L"700-2", L"Q7", 1, L"COM5", {L"[Transfer]", L"Rate=2000"}});
    tree.AddFile(L"slow", L"LOG0001", 20000);  // ten seconds at this rate
    tree.AddReceiver({L"faulty", 1, L"Faulty", L"900-1", L"Q9", 2, L"",
                      {L"[Fail]", L"IReceiver.get_Label=0x80004005", L"IReceiver.get_Brand=1",
                       L"IFilesColl.get_Item:LOG0002=0x8000FFFF", L"IReceiverFile.Delete=0x80070005",
                       L"[Transfer]", L"FailAtPercent=40", L"FailResult=0x8007001F"}});
    tree.AddFile(L"faulty", L"LOG0001", 300000);
    tree.AddFile(L"faulty", L"LOG0002", 10);
    DeviceSimScope scope(tree.Root());
    SetDeviceSimCallFailure(L"IReceiver.get_Model", E_NOTIMPL);  // every receiver, from the registry
    ComPtr<IDeviceMgr> manager = CreateDeviceManager();
    ComPtr<IReceiversColl> receivers = ReceiversOf(manager.Get());
    ComPtr<IReceiver> faulty = ReceiverByKey(receivers.Get(), L"USB-900-1");
    ComPtr<IReceiver> plain = ReceiverByKey(receivers.Get(), L"USB-700-1");
    ASSERT_TRUE(faulty && plain);
    ComPtr<IFilesColl> files = FilesOf(faulty.Get());
    ASSERT_TRUE(files);
    Bstr text;
    LONG number = 0;
    HRESULT hr = E_FAIL;
    const struct { const char* call; std::function<HRESULT()> make; HRESULT expected; } cases[] = {
        {"faulty get_Label", [&] { return faulty->get_Label(text.Put()); }, E_FAIL},
        {"plain get_Label", [&] { return plain->get_Label(text.Put()); }, S_OK},
        {"faulty get_Brand (a success code)", [&] { return faulty->get_Brand(&number); }, S_FALSE},
        {"plain get_Model (global)", [&] { return plain->get_Model(text.Put()); }, E_NOTIMPL},
        {"get_Item of LOG0001", [&] { FileAt(files.Get(), 0, &hr); return hr; }, S_OK},
        {"get_Item of LOG0002", [&] { FileAt(files.Get(), 1, &hr); return hr; }, E_UNEXPECTED},
        {"get_Item past the last file", [&] { FileAt(files.Get(), 2, &hr); return hr; }, E_INVALIDARG},
        {"Delete", [&] { return FileByName(files.Get(), L"LOG0001")->Delete(); }, E_ACCESSDENIED},
    };
    for (const auto& c : cases) EXPECT_EQ(c.expected, c.make()) << c.call;
    EXPECT_EQ(1, number) << "a success code still hands the value out";
    EXPECT_TRUE(FileExists(tree.FolderPath(L"faulty") + L"\\LOG0001"));

    RecordedDownload fast(manager.Get(), L"USB-700-1");
    RecordedDownload failing(manager.Get(), L"USB-900-1");
    ASSERT_EQ(S_OK, fast.started);
    ASSERT_EQ(S_OK, failing.started);
    ASSERT_TRUE(fast.WaitForFinish() && failing.WaitForFinish());
    EXPECT_EQ(1, fast.events->events.front().id);  // OnFileBegin first
    EXPECT_EQ(std::vector<LONG>{S_OK}, fast.events->Values(3));
    EXPECT_EQ((std::vector<LONG>{21, 43, 65, 87, 100}), fast.events->Values(2));  // 64 KiB chunks
    EXPECT_EQ(ReadFileBytes(fastPath), StreamBytes(fast.stream.Get())) << "the whole file, and rewound";
    EXPECT_EQ(std::vector<LONG>{HRESULT_FROM_WIN32(ERROR_GEN_FAILURE)}, failing.events->Values(3));
    ASSERT_FALSE(failing.events->Values(2).empty());
    EXPECT_LT(failing.events->Values(2).back(), 40);

    RecordedDownload slow(manager.Get(), L"COM5-700-2");
    ASSERT_EQ(S_OK, slow.started);
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_BUSY), StartDownload(slow.file.Get(), NewMemoryStream().Get()));
    ASSERT_TRUE(slow.events->WaitFor(2, kWait));
    EXPECT_EQ(S_OK, slow.file->Cancel());
    ASSERT_TRUE(slow.WaitForFinish());
    EXPECT_EQ(std::vector<LONG>{HRESULT_FROM_WIN32(ERROR_CANCELLED)}, slow.events->Values(3));
    EXPECT_LT(slow.events->Values(2).back(), 100);
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_INVALID_STATE), slow.file->Cancel());
    RecordedDownload unplugged(manager.Get(), L"COM5-700-2");  // and the receiver goes mid-way
    ASSERT_TRUE(unplugged.events->WaitFor(2, kWait));
    ASSERT_TRUE(tree.RemoveReceiver(L"slow"));
    ASSERT_TRUE(unplugged.WaitForFinish());
    EXPECT_EQ(std::vector<LONG>{HRESULT_FROM_WIN32(ERROR_DEVICE_NOT_CONNECTED)}, unplugged.events->Values(3));

    ASSERT_EQ(S_OK, fast.file->Delete());
    EXPECT_FALSE(FileExists(fastPath));
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND), fast.file->Delete());
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND), StartDownload(fast.file.Get(), NewMemoryStream().Get()));
}
