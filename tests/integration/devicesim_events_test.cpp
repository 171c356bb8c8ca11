// Changes of the receiver tree reach a client of the out-of-process simulator as events.
#include <windows.h>
#include <objbase.h>

#include <string>

#include <gtest/gtest.h>

#include "CalvexDeviceMgrLib.h"
#include "com/ComPtr.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {

// Events are due within a second; the wait is longer only so a slow machine does not fail.
const DWORD kEventWait = 2000;

class DeviceSimEventsTest : public ::testing::Test {
protected:
    void SetUp() override {
        tree.AddReceiver({L"base", 1, L"Base", L"100-1", L"Q7/RTK", 1, L"COM3", {}});
        tree.AddFile(L"base", L"LOG0001", 100);
        scope.reset(new DeviceSimScope(tree.Root()));
        manager = CreateDeviceManager();
        ASSERT_TRUE(manager);
        receivers = ReceiversOf(manager.Get());
        ASSERT_TRUE(receivers);
        files = FilesOf(ReceiverByKey(receivers.Get(), L"COM3-100-1").Get());
        ASSERT_TRUE(files);
        ASSERT_EQ(S_OK, receiverEvents->Advise(receivers.Get()));
        ASSERT_EQ(S_OK, fileEvents->Advise(files.Get()));
    }
    void TearDown() override {
        receiverEvents->Unadvise();
        fileEvents->Unadvise();
        files.Reset();
        receivers.Reset();
        manager.Reset();
        scope.reset();
    }

    // Milliseconds from now until the event arrives; -1 when it does not.
    long TimeToEvent(const SimEventRecorder& recorder, DISPID id) {
        const ULONGLONG start = GetTickCount64();
        if (!recorder.WaitFor(id, kEventWait)) return -1;
        return static_cast<long>(GetTickCount64() - start);
    }

    ReceiverTree tree;
    std::unique_ptr<DeviceSimScope> scope;
    ComPtr<IDeviceMgr> manager;
    ComPtr<IReceiversColl> receivers;
    ComPtr<IFilesColl> files;
    ComPtr<SimEventRecorder> receiverEvents = SimEventRecorder::Create(DIID__IReceiversCollEvents);
    ComPtr<SimEventRecorder> fileEvents = SimEventRecorder::Create(DIID__IFilesCollEvents);
};

}  // namespace

TEST_F(DeviceSimEventsTest, FileAppearingAndVanishingFiresAddedThenDeleted) {
    tree.AddFile(L"base", L"LOG0002", 50);
    long added = TimeToEvent(*fileEvents.Get(), 1);
    ASSERT_GE(added, 0) << "no OnFileAdded";
    EXPECT_LE(added, 1500);
    EXPECT_EQ(L"LOG0002", SubjectName(fileEvents->Events()[0].subject.Get()));
    LONG count = 0;
    ASSERT_EQ(S_OK, files->get_Count(&count));
    EXPECT_EQ(2, count);

    ASSERT_TRUE(tree.RemoveFile(L"base", L"LOG0001"));
    long deleted = TimeToEvent(*fileEvents.Get(), 2);
    ASSERT_GE(deleted, 0) << "no OnFileDeleted";
    EXPECT_LE(deleted, 1500);
    EXPECT_EQ(L"LOG0001", SubjectName(fileEvents->Events().back().subject.Get()));
    ASSERT_EQ(S_OK, files->get_Count(&count));
    EXPECT_EQ(1, count);
    EXPECT_EQ(0u, receiverEvents->Events().size());
}

TEST_F(DeviceSimEventsTest, ReceiverFolderComingAndGoingFiresOnlineThenOffline) {
    tree.AddReceiver({L"rover", 2, L"Rover", L"200-2", L"R2/Net", 2, L"", {}});
    tree.AddFile(L"rover", L"LOG0001", 10);
    long online = TimeToEvent(*receiverEvents.Get(), 1);
    ASSERT_GE(online, 0) << "no OnReceiverOnline";
    EXPECT_LE(online, 1500);
    EXPECT_EQ(L"200-2", SubjectName(receiverEvents->Events()[0].subject.Get()));
    ComPtr<IReceiver> rover = ReceiverByKey(receivers.Get(), L"USB-200-2");
    ASSERT_TRUE(rover);
    LONG count = 0;
    ASSERT_EQ(S_OK, FilesOf(rover.Get())->get_Count(&count));
    EXPECT_EQ(1, count);

    ASSERT_TRUE(tree.RemoveReceiver(L"rover"));
    long offline = TimeToEvent(*receiverEvents.Get(), 2);
    ASSERT_GE(offline, 0) << "no OnReceiverOffline";
    EXPECT_LE(offline, 1500);
    EXPECT_EQ(L"200-2", SubjectName(receiverEvents->Events().back().subject.Get()));
    HRESULT hr = S_OK;
    EXPECT_FALSE(ReceiverByKey(receivers.Get(), L"USB-200-2", &hr));
    EXPECT_EQ(E_INVALIDARG, hr);
    EXPECT_EQ(0u, fileEvents->Events().size());  // another receiver's files are not ours
}

TEST_F(DeviceSimEventsTest, RefreshSeesChangesAtOnceAndUnadvisedSinksHearNothing) {
    ASSERT_EQ(S_OK, fileEvents->Unadvise());
    tree.AddReceiver({L"third", 1, L"Third", L"300-3", L"Q9", 3, L"", {}});
    tree.AddFile(L"base", L"LOG0003", 5);
    ASSERT_EQ(S_OK, manager->Refresh());
    ComPtr<IReceiver> third = ReceiverByKey(receivers.Get(), L"Unknown-300-3");
    EXPECT_TRUE(third);
    PumpMessagesFor(1500);  // the watcher's own rescan finds nothing more to report
    EXPECT_EQ(1u, receiverEvents->Count(1));
    EXPECT_EQ(0u, fileEvents->Events().size());
}
