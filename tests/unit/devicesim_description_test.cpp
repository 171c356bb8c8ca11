// The simulator's description files: the INI reader, the receiver fields, times and faults.
#include <windows.h>
#include <oleauto.h>

#include <string>

#include <gtest/gtest.h>

#include "IniText.h"
#include "ReceiverDescription.h"
#include "SimFaults.h"
#include "support/TestSupport.h"

namespace {

bool ParseDescription(const std::string& text, ReceiverDescription* description, std::wstring* error) {
    IniText ini;
    return ini.Parse(text, error) && description->Parse(ini, error);
}

const char kMinimal[] = "[Receiver]\nBrand=2\nSerialNumber=S1\nModel=M/1\nPortType=1\n";

}  // namespace

TEST(DeviceSimDescriptionTest, ReadsEveryFieldInUtf8AndUtf16) {
    const std::string utf8 =
        "\xEF\xBB\xBF; a comment\r\n[receiver]\r\nBrand = 2\r\nLabel=Field kit #2! \xC3\xA9t\xC3\xA9\r\n"
        "SerialNumber=HV3-0042117\r\nModel=HVL3-GNSS\r\nPortType=-1\r\nPortName=COM3\r\nFirmware=2.3\r\n"
        "Battery=0x10\r\nFreeMemory=123\r\n";
    ReceiverDescription d;
    std::wstring error;
    ASSERT_TRUE(ParseDescription(utf8, &d, &error)) << testsupport::Narrow(error);
    EXPECT_EQ(2, d.brand);
    EXPECT_EQ(L"Field kit #2! \u00E9t\u00E9", d.label);
    EXPECT_EQ(L"HV3-0042117", d.serialNumber);
    EXPECT_EQ(L"HVL3-GNSS", d.model);
    EXPECT_EQ(-1, d.portType);
    EXPECT_EQ(L"COM3", d.portName);
    EXPECT_EQ(L"2.3", d.firmwareVersion);
    EXPECT_EQ(16, d.batteryLevel);
    EXPECT_EQ(123, d.freeMemory);

    const std::wstring wide = L"\uFEFF[Receiver]\r\nBrand=1\r\nLabel=\u6F22\u5B57\r\nSerialNumber=1\r\nModel=Z/5\r\nPortType=2\r\n";
    ReceiverDescription w;
    ASSERT_TRUE(ParseDescription(std::string(reinterpret_cast<const char*>(wide.data()), wide.size() * 2), &w, &error));
    EXPECT_EQ(L"\u6F22\u5B57", w.label);
    EXPECT_EQ(L"", w.portName);
}

TEST(DeviceSimDescriptionTest, RefusesMalformedFilesWithAReason) {
    const struct {
        const char* text;
        const wchar_t* reason;
    } cases[] = {
        {"", L"no [Receiver] section"},
        {"Brand=1\n", L"line 1: key outside a section"},
        {"[Receiver\nBrand=1\n", L"line 1: bad section header"},
        {"[Receiver]\nBrand\n", L"line 2: expected key=value"},
        {"[Receiver]\n=1\n", L"line 2: expected key=value"},
        {"[Receiver]\nBrand=1\nbrand=2\n", L"line 3: key given twice"},
        {"[Receiver]\nSerialNumber=1\nModel=M\nPortType=1\n", L"[Receiver] has no Brand"},
        {"[Receiver]\nBrand=1\nModel=M\nPortType=1\n", L"[Receiver] has no SerialNumber"},
        {"[Receiver]\nBrand=one\nSerialNumber=1\nModel=M\nPortType=1\n", L"line 2: Brand is not a number"},
        {"[Receiver]\nBrand=1\nColour=red\n", L"line 3: Colour is not a receiver key"},
        {"[Receivers]\nBrand=1\n", L"no [Receiver] section"},
        {"[Receiver]\nBrand=1\nSerialNumber=1\nModel=M\nPortType=1\n[Extras]\n", L"unknown section [Extras]"},
        {"[Receiver]\nBrand=1\nSerialNumber=1\nModel=M\nPortType=1\n[Transfer]\nSpeed=9600\n",
         L"line 7: unknown transfer key \"Speed\""},
        {"[Receiver]\nBrand=1\nSerialNumber=1\nModel=M\nPortType=1\n[Transfer]\nFailAtPercent=101\n",
         L"line 7: FailAtPercent out of range"},
        {"[Receiver]\nBrand=1\nSerialNumber=1\nModel=M\nPortType=1\n[Fail]\nIReceiver.get_Colour=1\n",
         L"line 7: unknown call \"IReceiver.get_Colour\""},
        {"[Receiver]\nBrand=1\nSerialNumber=1\nModel=M\nPortType=1\n[Fail]\nIReceiver.get_Label=fail\n",
         L"line 7: IReceiver.get_Label is not a result code"},
        {"[Receiver]\nBrand=1\nSerialNumber=1\nModel=M\nPortType=1\n[Times]\nLOG0001=2026-02-31 00:00:00\n",
         L"line 7: LOG0001 is not a time (YYYY-MM-DD HH:MM:SS)"},
    };
    for (const auto& c : cases) {
        ReceiverDescription d;
        std::wstring error;
        EXPECT_FALSE(ParseDescription(c.text, &d, &error)) << c.text;
        EXPECT_EQ(c.reason, error) << c.text;
    }
}

TEST(DeviceSimDescriptionTest, ReadsNumbersAsDecimalOrHexadecimal32Bits) {
    const struct {
        const wchar_t* text;
        bool ok;
        long value;
    } cases[] = {
        {L"0", true, 0},          {L"-17", true, -17},         {L"2147483647", true, 2147483647},
        {L"0x80004005", true, static_cast<long>(0x80004005)}, {L"0XFFFFFFFF", true, -1},
        {L"2147483648", false, 0}, {L"0x100000000", false, 0}, {L"12a", false, 0},
        {L"", false, 0},           {L"0x", false, 0},          {L"0x-1", false, 0},
    };
    for (const auto& c : cases) {
        long value = 0;
        EXPECT_EQ(c.ok, ParseInteger32(c.text, &value)) << c.text;
        if (c.ok) {
            EXPECT_EQ(c.value, value) << c.text;
        }
    }
}

TEST(DeviceSimDescriptionTest, TimesAreLocalTimesToTheSecond) {
    ReceiverDescription d;
    std::wstring error;
    ASSERT_TRUE(ParseDescription(std::string(kMinimal) + "[Times]\nLOG0001=2026-11-03 16:02:38\nlog0002=1999-12-31 23:59:59\n",
                                 &d, &error));
    const struct {
        const wchar_t* name;
        bool found;
        SYSTEMTIME time;
    } cases[] = {
        {L"LOG0001", true, {2026, 11, 0, 3, 16, 2, 38, 0}},
        {L"LOG0002", true, {1999, 12, 0, 31, 23, 59, 59, 0}},  // names compare without case
        {L"LOG0003", false, {}},
    };
    for (const auto& c : cases) {
        DATE time = 0;
        ASSERT_EQ(c.found, d.FindTime(c.name, &time));
        if (!c.found) continue;
        SYSTEMTIME st = {};
        ASSERT_TRUE(VariantTimeToSystemTime(time, &st));
        EXPECT_EQ(c.time.wYear, st.wYear);
        EXPECT_EQ(c.time.wDay, st.wDay);
        EXPECT_EQ(c.time.wHour, st.wHour);
        EXPECT_EQ(c.time.wSecond, st.wSecond);
    }
    DATE ignored = 0;
    for (const wchar_t* bad : {L"2026-11-03", L"2026-11-03 16:02", L"2026-13-01 00:00:00", L"2026-11-03 24:00:00",
                               L"2026-11-03 16:02:38 extra"})
        EXPECT_FALSE(ReceiverDescription::ParseLocalTime(bad, &ignored)) << bad;
}

TEST(DeviceSimDescriptionTest, FaultsPreferTheTargetedCallThenTheReceiverThenTheGlobalOnes) {
    ReceiverDescription d;
    std::wstring error;
    ASSERT_TRUE(ParseDescription(std::string(kMinimal) +
                                     "[Fail]\nIFilesColl.get_Item=0x80004005\nifilescoll.GET_ITEM:log0002=0x8000FFFF\n"
                                     "[Transfer]\nRate=11520\nFailAtPercent=40\n",
                                 &d, &error));
    SimFaults global;
    ASSERT_TRUE(global.SetCallFailure(L"IReceiver.get_Label", E_ACCESSDENIED, &error));
    ASSERT_TRUE(global.SetTransfer(L"FailAtPercent", 70, &error));
    ASSERT_TRUE(global.SetTransfer(L"FailResult", E_ABORT, &error));
    ASSERT_TRUE(global.SetTransfer(L"ExitAtPercent", 90, &error));
    const struct {
        const SimFaults* faults;
        const wchar_t* call;
        const wchar_t* target;
        bool found;
        HRESULT result;
    } cases[] = {
        {&d.faults, L"IFilesColl.get_Item", L"LOG0002", true, E_UNEXPECTED},
        {&d.faults, L"IFilesColl.get_Item", L"LOG0001", true, E_FAIL},
        {&d.faults, L"IFilesColl.get_Item", L"", true, E_FAIL},
        {&d.faults, L"IFilesColl.get_Count", L"", false, S_OK},
        {&global, L"IReceiver.get_Label", L"", true, E_ACCESSDENIED},
        {&global, L"IReceiver.get_Label", L"anything", true, E_ACCESSDENIED},
    };
    for (const auto& c : cases) {
        HRESULT result = S_OK;
        EXPECT_EQ(c.found, c.faults->FindCall(c.call, c.target, &result)) << c.call << L" " << c.target;
        EXPECT_EQ(c.result, result);
    }
    SimTransferPlan plan = SimFaults::Plan(d.faults, global);
    EXPECT_EQ(11520u, plan.rate);
    EXPECT_EQ(40, plan.failAtPercent);  // the receiver's own percent...
    EXPECT_EQ(E_ABORT, plan.failResult);  // ...with the global result, key by key
    EXPECT_EQ(90, plan.exitAtPercent);
    SimTransferPlan none = SimFaults::Plan(SimFaults(), SimFaults());
    EXPECT_EQ(0u, none.rate);
    EXPECT_EQ(-1, none.failAtPercent);
    EXPECT_EQ(-1, none.exitAtPercent);
}
