// Guards the simulator's reading of receiver trees: a description file misread, a bad one served instead of skipped with its reason, files or times wrong, a missing root not told.
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

std::string Utf16(const std::wstring& text) {
    return std::string(reinterpret_cast<const char*>(text.data()), text.size() * sizeof(wchar_t));
}

const std::string kMinimal = "[Receiver]\nBrand=1\nSerialNumber=1\nModel=M\nPortType=1\n";

// One receiver folder per row: the description file as written (empty: no file at all), and
// what the scan makes of it: the served fields (brand|label|serial|model|port type|port
// name|key|firmware|battery) or the reason it was skipped.
struct Row {
    const char* folder;
    std::string text;
    const wchar_t* outcome;
};

const Row kRows[] = {
    {"a utf8", "\xEF\xBB\xBF; comment\r\n[receiver]\r\nBrand = 2\r\nLabel=Kit #2! \xC3\xA9t\xC3\xA9\r\nSerialNumber=HV3-1\r\n"
               "Model=HVL3-GNSS\r\nPortType=-1\r\nPortName=COM3\r\nFirmware=2.3\r\nBattery=0x10\r\n",
     L"2|Kit #2! \u00E9t\u00E9|HV3-1|HVL3-GNSS|-1|COM3|Unknown-HV3-1|2.3|16"},
    {"b utf16", Utf16(L"\uFEFF[Receiver]\r\nBrand=1\r\nLabel=\u6F22\u5B57\r\nSerialNumber=7\r\nModel=Z\r\nPortType=2\r\n"),
     L"1|\u6F22\u5B57|7|Z|2||USB-7|1.00|100"},
    {"c empty label", kMinimal + "Label=\nPortName=COM9\n", L"1||1|M|1|COM9|COM9-1|1.00|100"},
    {"d no file", "", L"no receiver.ini"},
    {"e empty", "\n", L"receiver.ini no [Receiver] section"},
    {"f outside", "Brand=1\n", L"receiver.ini line 1: key outside a section"},
    {"g header", "[Receiver\nBrand=1\n", L"receiver.ini line 1: bad section header"},
    {"h no value", "[Receiver]\nBrand\n", L"receiver.ini line 2: expected key=value"},
    {"j twice", "[Receiver]\nBrand=1\nbrand=2\n", L"receiver.ini line 3: key given twice"},
    {"k no brand", "[Receiver]\nSerialNumber=1\nModel=M\nPortType=1\n", L"receiver.ini [Receiver] has no Brand"},
    {"n not a number", "[Receiver]\nBrand=0x100000000\n", L"receiver.ini line 2: Brand is not a number"},
    {"o unknown key", "[Receiver]\nBrand=1\nColour=red\n", L"receiver.ini line 3: Colour is not a receiver key"},
    {"p section", kMinimal + "[Extras]\n", L"receiver.ini unknown section [Extras]"},
    {"q transfer key", kMinimal + "[Transfer]\nSpeed=9600\n", L"receiver.ini line 7: unknown transfer key \"Speed\""},
    {"r percent", kMinimal + "[Transfer]\nFailAtPercent=101\n", L"receiver.ini line 7: FailAtPercent out of range"},
    {"s call", kMinimal + "[Fail]\nIReceiver.get_Colour=1\n", L"receiver.ini line 7: unknown call \"IReceiver.get_Colour\""},
    {"t result", kMinimal + "[Fail]\nIReceiver.get_Label=fail\n", L"receiver.ini line 7: IReceiver.get_Label is not a result code"},
    {"u date", kMinimal + "[Times]\nLOG0001=2026-02-31 00:00:00\n",
     L"receiver.ini line 7: LOG0001 is not a time (YYYY-MM-DD HH:MM:SS)"},
    {"w garbage", std::string("\x00\x01\x02[", 4), L"receiver.ini line 1: expected key=value"},
    {"x exit call", kMinimal + "[Exit]\nIReceiver.Explode=1\n", L"receiver.ini line 7: unknown call \"IReceiver.Explode\""},
    {"y report key", kMinimal + "[Report]\nColour=1\n", L"receiver.ini line 7: Colour is not a report key"},
    {"z report time", kMinimal + "[Report]\nTime=1e5x\n", L"receiver.ini line 7: Time does not read"},
};

std::wstring Outcome(const SimTreeScan& scan, const std::wstring& folder) {
    for (const auto& skipped : scan.skipped)
        if (skipped.folder == folder) return skipped.reason;
    for (const auto& receiver : scan.receivers) {
        if (receiver->folderName != folder) continue;
        const ReceiverDescription& d = receiver->description;
        return std::to_wstring(d.brand) + L"|" + d.label + L"|" + d.serialNumber + L"|" + d.model + L"|" +
               std::to_wstring(d.portType) + L"|" + d.portName + L"|" + receiver->LookupKey() + L"|" +
               d.firmwareVersion + L"|" + std::to_wstring(d.batteryLevel);
    }
    return L"(neither served nor skipped)";
}

DATE Date(const SYSTEMTIME& time) {
    DATE date = 0;
    SystemTimeToVariantTime(const_cast<SYSTEMTIME*>(&time), &date);
    return date;
}

}  // namespace

TEST(DeviceSimDescriptionTest, EachFolderIsServedAsDescribedOrSkippedWithItsReason) {
    ReceiverTree tree;
    for (const Row& row : kRows) {
        const std::wstring folder = Wide(row.folder);
        CreateDirectoryW(tree.FolderPath(folder).c_str(), nullptr);
        if (!row.text.empty()) tree.WriteDescription(folder, row.text);
    }
    const SimTreeScan scan = ReceiverTreeLoader::Scan(tree.Root());
    ASSERT_TRUE(scan.rootFound);
    EXPECT_EQ(std::size(kRows), scan.folders.size()) << "skipped folders are watched too";
    std::vector<std::wstring> order;
    for (const auto& receiver : scan.receivers) order.push_back(receiver->folderName);
    EXPECT_EQ((std::vector<std::wstring>{L"a utf8", L"b utf16", L"c empty label"}), order);
    for (const Row& row : kRows) EXPECT_EQ(row.outcome, Outcome(scan, Wide(row.folder))) << row.folder;
    EXPECT_FALSE(ReceiverTreeLoader::Scan(tree.Root() + L"\\no such tree").rootFound);
}

TEST(DeviceSimDescriptionTest, FilesAreThePlainFilesWithDescribedOrWrittenTimes) {
    ReceiverTree tree;
    tree.AddReceiver({L"r", 1, L"R", L"1", L"Q7", 5, L"", {L"[Times]", L"log0001=2026-11-03 16:02:38"}});
    tree.AddFile(L"r", L"LOG0001", 1234);
    tree.AddFile(L"r", L"20261103A.T02", 0);
    tree.AddFile(L"r", L"Mesure \u00E9t\u00E9 #1!", 7);
    CreateDirectoryW((tree.FolderPath(L"r") + L"\\sub").c_str(), nullptr);
    tree.AddFile(L"r\\sub", L"hidden", 9);
    const SimTreeScan scan = ReceiverTreeLoader::Scan(tree.Root());
    ASSERT_EQ(1u, scan.receivers.size());
    const auto& files = scan.receivers[0]->files;
    std::wstring listed;
    for (const auto& file : files) listed += file->name + L":" + std::to_wstring(file->size) + L"|";
    ASSERT_EQ(L"20261103A.T02:0|LOG0001:1234|Mesure \u00E9t\u00E9 #1!:7|", listed);
    // The [Times] entry (names compare without case), else the file's last write in local time.
    EXPECT_EQ(Date({2026, 11, 0, 3, 16, 2, 38, 0}), files[1]->time);
    WIN32_FILE_ATTRIBUTE_DATA data;
    SYSTEMTIME universal, local;
    ASSERT_TRUE(GetFileAttributesExW(files[0]->path.c_str(), GetFileExInfoStandard, &data));
    FileTimeToSystemTime(&data.ftLastWriteTime, &universal);
    SystemTimeToTzSpecificLocalTime(nullptr, &universal, &local);
    EXPECT_NEAR(Date(local), files[0]->time, 1.0 / 86400);
}
