// Guards what the icon's menu says: its first line while watching, working and paused (an hour ending in the
// next hour or the next day), and Recent: the last ten passes spoken of, newest first, each with its notice and
// time, a "&" shown as itself.
#include <gtest/gtest.h>

#include "RecentPasses.h"
#include "TrayMenu.h"
#include "TrayStatus.h"

namespace {
SYSTEMTIME At(WORD day, WORD hour, WORD minute) { return {2026, 11, 0, day, hour, minute, 0, 0}; }
constexpr ULONGLONG kHour = 3600000;
}  // namespace

TEST(TrayStatusTest, FirstLineOfTheMenuAndThePausedTip) {
    struct Case { const wchar_t* receiver; int left; bool paused; ULONGLONG pauseLeft; SYSTEMTIME now; const wchar_t* line; } cases[] = {
        {L"", 0, false, 0, At(25, 9, 0), L"Watching D:\\Survey"},
        {L"Q9 GNSS@USB", 5, false, 0, At(25, 9, 0), L"Q9 GNSS@USB: 5 files left"},
        {L"Q9 GNSS@USB", 1, false, 0, At(25, 9, 0), L"Q9 GNSS@USB: 1 file left"},
        {L"Q9 GNSS@USB", 0, false, 0, At(25, 9, 0), L"Looking at Q9 GNSS@USB"},
        {L"", 0, true, kHour, At(25, 14, 30), L"Paused until 15:30"},
        {L"", 0, true, kHour, At(25, 14, 45), L"Paused until 15:45"},
        {L"", 0, true, kHour - 60000, At(25, 14, 45), L"Paused until 15:44"},
        {L"", 0, true, kHour, At(25, 23, 30), L"Paused until 2026-11-26 00:30"},
        {L"Q9 GNSS@USB", 5, true, 0, At(25, 9, 0), L"Paused until you resume"},
    };
    for (const Case& c : cases) {
        WatchStatus status;
        status.target = L"D:\\Survey", status.receiver = c.receiver, status.left = c.left;
        status.paused = c.paused, status.pauseLeft = c.pauseLeft;
        EXPECT_EQ(c.line, StatusLine(status, c.now)) << c.line;
        if (c.paused) EXPECT_EQ(L"calvex-fetch: p" + std::wstring(c.line).substr(1), PausedTip(status, c.now));
    }
}

TEST(TrayStatusTest, RecentKeepsTheLastTenNewestFirstWithNoticeAndTime) {
    RecentPasses recent;
    for (int i = 0; i < 12; ++i)
        recent.Add({L"R" + std::to_wstring(i) + L": 1 file in D:\\A&B. Safe to unplug.", At(25, 8, static_cast<WORD>(i)),
                    L"D:\\A&B\\R" + std::to_wstring(i)});
    ASSERT_EQ(RecentPasses::kKept, recent.Newest().size());
    EXPECT_EQ(L"D:\\A&B\\R11", recent.Newest().front().folder);
    EXPECT_EQ(L"D:\\A&B\\R2", recent.Newest().back().folder);
    struct Case { size_t index; SYSTEMTIME today; const wchar_t* text; } cases[] = {
        {0, At(25, 9, 0), L"R11: 1 file in D:\\A&&B. Safe to unplug.\t08:11"},
        {9, At(25, 9, 0), L"R2: 1 file in D:\\A&&B. Safe to unplug.\t08:02"},
        {9, At(26, 9, 0), L"R2: 1 file in D:\\A&&B. Safe to unplug.\t2026-11-25 08:02"},
    };
    for (const Case& c : cases) EXPECT_EQ(c.text, RecentMenuText(recent.Newest()[c.index], c.today)) << c.index;
    EXPECT_EQ(L"Open D:\\A&&B", L"Open " + MenuEscaped(L"D:\\A&B"));
}
