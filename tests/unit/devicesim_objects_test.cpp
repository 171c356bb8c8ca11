// The simulator's COM objects made in this process: argument checks, connection points,
// events from the tree and from Refresh, objects that outlive their file or receiver, and
// that nothing is left alive once the client lets go.
#include <windows.h>
#include <objbase.h>
#include <olectl.h>

#include <functional>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "SimDeviceManager.h"
#include "SimLog.h"
#include "com/Bstr.h"
#include "com/ModuleLock.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {

class DeviceSimObjectsTest : public ::testing::Test {
protected:
    void SetUp() override {
        tree.AddReceiver({L"base", 1, L"Base", L"1", L"Q7/RTK", 1, L"COM3", {}});
        tree.AddFile(L"base", L"LOG0001", 1000);
        tree.AddFile(L"base", L"LOG0002", 2000);
        tree.AddReceiver({L"rover", 2, L"Rover", L"2", L"R2", 2, L"", {L"[Transfer]", L"ExitAtPercent=50"}});
        tree.AddFile(L"rover", L"LOG0001", 70000);
        manager = Create();
        ASSERT_TRUE(manager);
        receivers = ReceiversOf(manager.Get());
        ASSERT_TRUE(receivers);
        base = ReceiverByKey(receivers.Get(), L"COM3-1");
        files = FilesOf(base.Get());
        ASSERT_TRUE(files);
    }

    ComPtr<IDeviceMgr> Create() {
        ComPtr<IDeviceMgr> made;
        EXPECT_EQ(S_OK, CreateSimDeviceManager(tree.Root().c_str(), IID_IDeviceMgr, made.PutVoid()));
        return made;
    }

    ReceiverTree tree;
    ComPtr<IDeviceMgr> manager;
    ComPtr<IReceiversColl> receivers;
    ComPtr<IReceiver> base;
    ComPtr<IFilesColl> files;
};

VARIANT UnknownVariant(IUnknown* unknown) {
    VARIANT v;
    VariantInit(&v);
    v.vt = VT_UNKNOWN;
    v.punkVal = unknown;
    return v;
}

}  // namespace

TEST_F(DeviceSimObjectsTest, OutPointersAndIndexesAreChecked) {
    ComPtr<IReceiverFile> file = FileAt(files.Get(), 0);
    ASSERT_TRUE(file);
    ComPtr<IDispatch> object;
    LONG number = 0;
    const CallCase cases[] = {
        {"CreateSimDeviceManager null out", [&] { return CreateSimDeviceManager(L"C:\\", IID_IDeviceMgr, nullptr); },
         E_POINTER},
        {"get_Receivers null", [&] { return manager->get_Receivers(nullptr); }, E_POINTER},
        {"get_Count null", [&] { return receivers->get_Count(nullptr); }, E_POINTER},
        {"receiver get_Item -1", [&] { return receivers->get_Item(-1, &object); }, E_INVALIDARG},
        {"receiver get_Item 2", [&] { return receivers->get_Item(2, &object); }, E_INVALIDARG},
        {"get_ItemByKey null key", [&] { return receivers->get_ItemByKey(nullptr, &object); }, E_INVALIDARG},
        {"get_ItemBySerialNumber unknown", [&] { Bstr s(L"9"); return receivers->get_ItemBySerialNumber(s.Get(), &object); },
         E_INVALIDARG},
        {"get_Label null", [&] { return base->get_Label(nullptr); }, E_POINTER},
        {"get_Brand null", [&] { return base->get_Brand(nullptr); }, E_POINTER},
        {"file get_Item 2", [&] { return files->get_Item(2, &object); }, E_INVALIDARG},
        {"get_ItemByName null name", [&] { return files->get_ItemByName(nullptr, &object); }, E_INVALIDARG},
        {"get_Size null", [&] { return file->get_Size(nullptr); }, E_POINTER},
        {"Download of nothing", [&] { VARIANT v; VariantInit(&v); return file->Download(v); }, E_INVALIDARG},
        {"Download into null", [&] { return file->Download(UnknownVariant(nullptr)); }, E_INVALIDARG},
        {"Download into a non-stream", [&] { return file->Download(UnknownVariant(manager.Get())); }, E_NOINTERFACE},
        {"Cancel with nothing running", [&] { return file->Cancel(); }, HRESULT_FROM_WIN32(ERROR_INVALID_STATE)},
        {"get_Count", [&] { return files->get_Count(&number); }, S_OK},
    };
    for (const auto& c : cases) {
        object.Reset();
        EXPECT_EQ(c.expected, c.make()) << c.call;
        EXPECT_FALSE(object) << c.call;
    }
    EXPECT_EQ(2, number);
    Bstr serial(L"2");
    ASSERT_EQ(S_OK, receivers->get_ItemBySerialNumber(serial.Get(), &object));
    EXPECT_EQ(L"2", SubjectName(object.Get()));
}

TEST_F(DeviceSimObjectsTest, ConnectionPointsFollowTheirContract) {
    ComPtr<IConnectionPointContainer> container;
    ASSERT_EQ(S_OK, files->QueryInterface(IID_IConnectionPointContainer, container.PutVoid()));
    ComPtr<IConnectionPoint> point;
    EXPECT_EQ(CONNECT_E_NOCONNECTION, container->FindConnectionPoint(DIID__IReceiversCollEvents, &point));
    EXPECT_FALSE(point);
    ASSERT_EQ(S_OK, container->FindConnectionPoint(DIID__IFilesCollEvents, &point));
    IID iid = IID_NULL;
    EXPECT_EQ(S_OK, point->GetConnectionInterface(&iid));
    EXPECT_TRUE(IsEqualIID(DIID__IFilesCollEvents, iid));
    ComPtr<IConnectionPointContainer> back;
    ASSERT_EQ(S_OK, point->GetConnectionPointContainer(&back));
    ComPtr<IUnknown> identity1, identity2;
    files->QueryInterface(IID_IUnknown, identity1.PutVoid());
    back->QueryInterface(IID_IUnknown, identity2.PutVoid());
    EXPECT_EQ(identity1.Get(), identity2.Get());
    DWORD cookie = 77;
    EXPECT_EQ(E_POINTER, point->Advise(nullptr, &cookie));
    EXPECT_EQ(CONNECT_E_CANNOTCONNECT, point->Advise(manager.Get(), &cookie));  // no _IFilesCollEvents
    EXPECT_EQ(0u, cookie);
    EXPECT_EQ(CONNECT_E_NOCONNECTION, point->Unadvise(12345));
    ComPtr<SimEventRecorder> sink = SimEventRecorder::Create(DIID__IFilesCollEvents);
    ASSERT_EQ(S_OK, point->Advise(static_cast<IDispatch*>(sink.Get()), &cookie));
    EXPECT_EQ(S_OK, point->Unadvise(cookie));
    EXPECT_EQ(CONNECT_E_NOCONNECTION, point->Unadvise(cookie));
}

TEST_F(DeviceSimObjectsTest, TreeChangesAndRefreshReachEveryManagerOfTheTree) {
    ComPtr<IReceiversColl> other = ReceiversOf(Create().Get());  // the same tree: the same receivers
    ComPtr<SimEventRecorder> receiverEvents = SimEventRecorder::Create(DIID__IReceiversCollEvents);
    ComPtr<SimEventRecorder> fileEvents = SimEventRecorder::Create(DIID__IFilesCollEvents);
    ASSERT_EQ(S_OK, receiverEvents->Advise(other.Get()));
    ASSERT_EQ(S_OK, fileEvents->Advise(files.Get()));

    tree.AddFile(L"base", L"LOG0003", 10);
    ASSERT_TRUE(fileEvents->WaitFor(1, 2000));  // the watcher's rescan, from this thread's messages
    EXPECT_EQ(L"LOG0003", SubjectName(fileEvents->Events()[0].subject.Get()));

    tree.AddReceiver({L"third", 1, L"Third", L"3", L"Q9", 7, L"", {}});
    ASSERT_EQ(S_OK, manager->Refresh());  // fires before it returns
    ASSERT_EQ(1u, receiverEvents->Count(1));
    EXPECT_EQ(L"3", SubjectName(receiverEvents->Events()[0].subject.Get()));
    LONG count = 0;
    ASSERT_EQ(S_OK, other->get_Count(&count));
    EXPECT_EQ(3, count);
    receiverEvents->Unadvise();
    fileEvents->Unadvise();
}

TEST_F(DeviceSimObjectsTest, ObjectsOutliveTheirFileAndReceiver) {
    ComPtr<IReceiverFile> file = FileByName(files.Get(), L"LOG0002");
    ASSERT_TRUE(file);
    ASSERT_TRUE(tree.RemoveFile(L"base", L"LOG0002"));
    ASSERT_EQ(S_OK, manager->Refresh());
    EXPECT_EQ(L"LOG0002", FileName(file.Get()));  // still answers from memory
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND), StartDownload(file.Get(), NewMemoryStream().Get()));
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND), file->Delete());

    ComPtr<IReceiverFile> other = FileByName(files.Get(), L"LOG0001");
    ASSERT_TRUE(tree.RemoveReceiver(L"base"));
    ASSERT_EQ(S_OK, manager->Refresh());
    VARIANT_BOOL connected = VARIANT_TRUE;
    EXPECT_EQ(S_OK, base->get_Connected(&connected));
    EXPECT_EQ(VARIANT_FALSE, connected);
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_DEVICE_NOT_CONNECTED), StartDownload(other.Get(), NewMemoryStream().Get()));
    LONG count = 0;
    ASSERT_EQ(S_OK, receivers->get_Count(&count));
    EXPECT_EQ(1, count);
}

TEST_F(DeviceSimObjectsTest, AnAbruptExitIsOnlyLoggedInATestProcess) {
    ComPtr<IReceiverFile> file = FileByName(FilesOf(ReceiverByKey(receivers.Get(), L"USB-2").Get()).Get(), L"LOG0001");
    ASSERT_TRUE(file);
    RecordedDownload download(file);
    ASSERT_EQ(S_OK, download.Started());
    ASSERT_TRUE(download.WaitForFinish(5000));
    EXPECT_EQ(S_OK, download.FinishResult());
    EXPECT_EQ(ReadFileBytes(tree.FolderPath(L"rover") + L"\\LOG0001"), StreamBytes(download.Stream()));
    EXPECT_NE(std::string::npos, ReadFileBytes(SimLog::Path()).find("abrupt exit not acted out in this process"));
}

TEST_F(DeviceSimObjectsTest, NewEnumWalksTheReceivers) {
    ComPtr<IUnknown> unknown;
    ASSERT_EQ(S_OK, receivers->get__NewEnum(&unknown));
    ComPtr<IEnumVARIANT> items;
    ASSERT_EQ(S_OK, unknown->QueryInterface(IID_IEnumVARIANT, items.PutVoid()));
    VARIANT got[3];
    ULONG fetched = 0;
    EXPECT_EQ(S_FALSE, items->Next(3, got, &fetched));
    ASSERT_EQ(2u, fetched);
    EXPECT_EQ(VT_DISPATCH, got[0].vt);
    EXPECT_EQ(L"1", SubjectName(got[0].pdispVal));
    EXPECT_EQ(L"2", SubjectName(got[1].pdispVal));
    VariantClear(&got[0]);
    VariantClear(&got[1]);
    ComPtr<IEnumVARIANT> copy;
    ASSERT_EQ(S_OK, items->Clone(&copy));
    EXPECT_EQ(S_OK, items->Reset());
    EXPECT_EQ(S_FALSE, items->Skip(5));
    EXPECT_EQ(S_FALSE, copy->Next(1, got, &fetched));  // the clone kept its place at the end
    EXPECT_EQ(0u, fetched);
}

TEST_F(DeviceSimObjectsTest, NothingStaysAliveOnceTheClientLetsGo) {
    files.Reset();
    base.Reset();
    receivers.Reset();
    manager.Reset();
    const LONG before = ModuleLock::Count();
    {
        ComPtr<IDeviceMgr> made = Create();
        ComPtr<IReceiverFile> file = FileAt(FilesOf(ReceiverAt(ReceiversOf(made.Get()).Get(), 0).Get()).Get(), 0);
        ASSERT_TRUE(file);
        RecordedDownload download(file);
        ASSERT_EQ(S_OK, download.Started());
        ASSERT_TRUE(download.WaitForFinish(5000));
    }
    EXPECT_EQ(before, ModuleLock::Count());
}
