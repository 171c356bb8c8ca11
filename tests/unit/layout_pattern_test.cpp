// Guards --layout: every field on dates at a year end, in leap and common years, receiver fields made safe, and each bad pattern refused with its bad part named.
#include <windows.h>

#include <gtest/gtest.h>

#include <string>

#include "LayoutPattern.h"
#include "ReceiverList.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
const LayoutReceiver kQ7 = {L"Q7/RTK@COM3", L"5211-40125", L"Q7/RTK", L"Calvex"};

SYSTEMTIME Day(WORD year, WORD month, WORD day, WORD hour = 23, WORD minute = 58) {
    return SYSTEMTIME{year, month, 0, day, hour, minute, 0, 0};
}

TEST(LayoutPatternTest, ExpandsEveryFieldFromTheReceiversOwnDate) {
    const struct {
        const wchar_t* pattern;
        SYSTEMTIME logged;
        const wchar_t* folder;
    } rows[] = {
        {L"{receiver}", Day(2026, 11, 25), L"Q7_RTK@COM3"},
        {L"{receiver}\\{yyyy}\\{doy}", Day(2026, 12, 31), L"Q7_RTK@COM3\\2026\\365"},
        {L"{receiver}\\{yyyy}\\{doy}", Day(2027, 1, 1, 0, 0), L"Q7_RTK@COM3\\2027\\001"},
        {L"{receiver}/{yyyy}/{doy}", Day(2028, 12, 31), L"Q7_RTK@COM3\\2028\\366"},
        {L"{doy}", Day(2028, 2, 28), L"059"}, {L"{doy}", Day(2028, 2, 29), L"060"}, {L"{doy}", Day(2028, 3, 1), L"061"},
        {L"{doy}", Day(2027, 2, 28), L"059"}, {L"{doy}", Day(2027, 3, 1), L"060"}, {L"{doy}", Day(2028, 1, 31), L"031"}, {L"{doy}", Day(2100, 3, 1), L"060"}, {L"{doy}", Day(2000, 3, 1), L"061"},
        {L"{doy}", Day(2026, 11, 1, 1, 30), L"305"},  // the zone's daylight saving change changes nothing
        {L"{yyyy}-{mm}-{dd}\\{serial}", Day(2026, 3, 9), L"2026-03-09\\5211-40125"},
        {L"{brand}\\{model} {yy}", Day(2009, 7, 4), L"Calvex\\Q7_RTK 09"},
        {L"GNSS\\{receiver}-{serial}", Day(2026, 1, 1), L"GNSS\\Q7_RTK@COM3-5211-40125"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(Narrow(row.pattern));
        LayoutPattern layout;
        std::wstring error;
        ASSERT_TRUE(layout.Parse(row.pattern, error)) << Narrow(error);
        const SafeName folder = layout.Folder(kQ7, row.logged, 20);
        EXPECT_FALSE(folder.refused) << Narrow(folder.reason);
        EXPECT_EQ(row.folder, folder.name);
    }
}

TEST(LayoutPatternTest, RefusesEveryBadPatternNamingTheBadPart) {
    const struct {
        const wchar_t* pattern;
        const wchar_t* error;
    } rows[] = {
        {L"", L"empty pattern"},
        {L"{receiver}\\{doy2}", L"unknown field {doy2}"},
        {L"{YYYY}", L"unknown field {YYYY}"},
        {L"{}", L"unknown field {}"},
        {L"\\Survey\\{receiver}", L"absolute path \"\\Survey\\{receiver}\""},
        {L"//server/share", L"absolute path \"//server/share\""},
        {L"D:\\Survey", L"drive \"D:\""},
        {L"d:{receiver}", L"drive \"d:\""},
        {L"..\\{receiver}", L"\"..\" would leave the target"},
        {L"{receiver}\\.", L"\".\" would leave the target"},
        {L"{receiver}\\\\{yyyy}", L"empty folder name in \"{receiver}\\\\{yyyy}\""},
        {L"{receiver}\\", L"empty folder name in \"{receiver}\\\""},
        {L"{receiver", L"unclosed field {receiver"},
        {L"{yyyy}}", L"\"}\" without \"{\" in \"{yyyy}}\""},
        {L"a|b", L"\"a|b\" cannot name a folder (characters not allowed in names replaced)"},
        {L"{yyyy}:{mm}", L"\"{yyyy}:{mm}\" cannot name a folder (characters not allowed in names replaced)"},
        {L"{receiver}\\NUL", L"\"NUL\" cannot name a folder (reserved device name prefixed)"},
        {L"{doy}.", L"\"{doy}.\" cannot name a folder (trailing dots and spaces removed)"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(Narrow(row.pattern));
        LayoutPattern layout;
        std::wstring error;
        EXPECT_FALSE(layout.Parse(row.pattern, error));
        EXPECT_EQ(row.error, error);
    }
}

// What the receiver's line shows, and the receivers whose fields make no folder name.
TEST(LayoutPatternTest, ShowsTheReceiversPlaceAndRefusesFieldsThatMakeNoName) {
    LayoutPattern layout;
    std::wstring error;
    ASSERT_TRUE(layout.Parse(L"{receiver}\\{yyyy}\\{doy}", error));
    EXPECT_TRUE(layout.IsDated());
    EXPECT_EQ(L"Q7_RTK@COM3\\{yyyy}\\{doy}", layout.Shown(kQ7));
    EXPECT_TRUE(layout.Check({L"..", L"1", L"M", L"Calvex"}, 20).refused);
    EXPECT_FALSE(layout.Check(kQ7, MAX_PATH - 30).refused) << "a deep target, written through extended paths";
    EXPECT_TRUE(layout.Check(kQ7, 32750).refused) << "too long even for an extended path";
    ASSERT_TRUE(layout.Parse(L"{serial}", error));
    EXPECT_FALSE(layout.IsDated());
    EXPECT_TRUE(layout.Check({L"Q9@USB", L"", L"Q9", L"Calvex"}, 20).refused) << "an empty serial";

    Receiver receiver;  // serial and model as the receiver's key holds them
    receiver.key = L"HV3-0042117!HVL3#GNSS!USB";
    EXPECT_EQ(L"HV3-0042117", receiver.Fields().serial);
    EXPECT_EQ(L"HVL3/GNSS", receiver.Fields().model);
}
}  // namespace
