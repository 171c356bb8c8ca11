// Reading the receiver tree: which folders are receivers, which are skipped and why, and what
// each file of a receiver's memory looks like.
#include <windows.h>
#include <oleauto.h>

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ReceiverTreeLoader.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {

std::vector<std::wstring> FolderNames(const SimTreeScan& scan) {
    std::vector<std::wstring> names;
    for (const auto& receiver : scan.receivers) names.push_back(receiver->folderName);
    return names;
}

std::wstring SkipReason(const SimTreeScan& scan, const std::wstring& folder) {
    for (const auto& skipped : scan.skipped)
        if (skipped.folder == folder) return skipped.reason;
    return L"(not skipped)";
}

}  // namespace

TEST(DeviceSimTreeLoaderTest, ServesGoodFoldersInNameOrderAndSkipsTheRestWithAReason) {
    ReceiverTree tree;
    tree.AddReceiver({L"b rover", 2, L"Rover", L"2", L"R2", 2, L"", {}});
    tree.AddReceiver({L"A base", 1, L"Base", L"1", L"Q7/RTK", 1, L"COM3", {}});
    tree.AddReceiver({L"c unlabelled", 1, L"", L"3", L"Q9", 2, L"", {}});
    CreateDirectoryW(tree.FolderPath(L"d empty folder").c_str(), nullptr);
    tree.WriteDescription(L"e broken", "[Receiver]\nBrand=1\nSerialNumber=5\n");
    tree.WriteDescription(L"f garbage", std::string("\x00\x01\x02[", 4));
    const SimTreeScan scan = ReceiverTreeLoader::Scan(tree.Root());
    EXPECT_TRUE(scan.rootFound);
    EXPECT_EQ((std::vector<std::wstring>{L"A base", L"b rover", L"c unlabelled"}), FolderNames(scan));
    EXPECT_EQ(L"no receiver.ini", SkipReason(scan, L"d empty folder"));
    EXPECT_EQ(L"receiver.ini [Receiver] has no Model", SkipReason(scan, L"e broken"));
    EXPECT_EQ(L"receiver.ini line 1: expected key=value", SkipReason(scan, L"f garbage"));
    EXPECT_EQ(6u, scan.folders.size());  // skipped folders are watched too: their files may come
    EXPECT_EQ(L"", scan.receivers[2]->description.label);  // served as it is
    EXPECT_EQ(L"COM3-1", scan.receivers[0]->LookupKey());
    EXPECT_EQ(L"USB-2", scan.receivers[1]->LookupKey());
}

TEST(DeviceSimTreeLoaderTest, FilesAreEveryPlainFileButTheDescription) {
    ReceiverTree tree;
    tree.AddReceiver({L"r", 1, L"R", L"1", L"Q7", 5, L"", {L"[Times]", L"LOG0001=2026-11-03 16:02:38"}});
    tree.AddFile(L"r", L"LOG0001", 1234);
    tree.AddFile(L"r", L"20261103A.T02", 0);
    tree.AddFile(L"r", L"Mesure \u00E9t\u00E9 #1!", 7);
    CreateDirectoryW((tree.FolderPath(L"r") + L"\\sub").c_str(), nullptr);
    tree.AddFile(L"r\\sub", L"hidden", 9);
    const SimTreeScan scan = ReceiverTreeLoader::Scan(tree.Root());
    ASSERT_EQ(1u, scan.receivers.size());
    const auto& receiver = *scan.receivers[0];
    EXPECT_EQ(L"Unknown-1", receiver.LookupKey());
    const struct {
        const wchar_t* name;
        long size;
    } expected[] = {{L"20261103A.T02", 0}, {L"LOG0001", 1234}, {L"Mesure \u00E9t\u00E9 #1!", 7}};
    ASSERT_EQ(std::size(expected), receiver.files.size());
    for (size_t i = 0; i < receiver.files.size(); ++i) {
        EXPECT_EQ(expected[i].name, receiver.files[i]->name);
        EXPECT_EQ(expected[i].size, receiver.files[i]->size);
        EXPECT_EQ(tree.FolderPath(L"r") + L"\\" + expected[i].name, receiver.files[i]->path);
    }
    SYSTEMTIME described = {};
    ASSERT_TRUE(VariantTimeToSystemTime(receiver.FindFile(L"LOG0001")->time, &described));
    EXPECT_EQ(16, described.wHour);
    EXPECT_EQ(38, described.wSecond);
    // Without a [Times] entry the file's own last-write time, in local time, counts.
    WIN32_FILE_ATTRIBUTE_DATA data;
    ASSERT_TRUE(GetFileAttributesExW(receiver.FindFile(L"20261103A.T02")->path.c_str(), GetFileExInfoStandard, &data));
    SYSTEMTIME universal, local, served;
    FileTimeToSystemTime(&data.ftLastWriteTime, &universal);
    SystemTimeToTzSpecificLocalTime(nullptr, &universal, &local);
    ASSERT_TRUE(VariantTimeToSystemTime(receiver.FindFile(L"20261103A.T02")->time, &served));
    EXPECT_EQ(local.wHour, served.wHour);
    EXPECT_EQ(local.wMinute, served.wMinute);
    EXPECT_EQ(local.wDay, served.wDay);
    EXPECT_EQ(nullptr, receiver.FindFile(L"receiver.ini"));
    EXPECT_NE(nullptr, receiver.FindFile(L"log0001"));
}

TEST(DeviceSimTreeLoaderTest, AMissingRootServesNothing) {
    const SimTreeScan scan = ReceiverTreeLoader::Scan(L"C:\\no\\such\\receiver\\tree");
    EXPECT_FALSE(scan.rootFound);
    EXPECT_TRUE(scan.receivers.empty());
    EXPECT_TRUE(scan.folders.empty());
}

TEST(DeviceSimTreeLoaderTest, TheSampleTreeLoadsWithoutSkips) {
    const SimTreeScan scan = ReceiverTreeLoader::Scan(SampleReceiversDir());
    EXPECT_EQ(8u, scan.receivers.size());
    for (const auto& skipped : scan.skipped) ADD_FAILURE() << Narrow(skipped.folder + L": " + skipped.reason);
}
