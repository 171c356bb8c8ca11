// Guards what the icon's menu asks of a running watch: a pause of an hour that ends by itself, a pause until
// resumed that does not, a full comparison once after any pause and after Download now, and new settings taken
// once; the watch held meanwhile. The clock is the test's.
#include <gtest/gtest.h>

#include "WatchControl.h"

namespace {
constexpr ULONGLONG kHour = 3600000;
enum class Ask { Nothing, Hour, UntilResumed, Resume, DownloadNow };
}  // namespace

TEST(WatchControlTest, PausesEndWhenDueOrResumedAndAskForAFullComparisonOnce) {
    ULONGLONG now = 5000;
    WatchControl control([&] { return now; });
    struct Step { Ask ask; ULONGLONG after; bool paused; ULONGLONG left; bool full; } steps[] = {
        {Ask::Nothing, 0, false, 0, false},
        {Ask::Hour, 0, true, kHour, false},
        {Ask::Nothing, kHour - 1, true, 1, false},
        {Ask::Nothing, 1, false, 0, true},             // over by itself
        {Ask::Nothing, kHour, false, 0, false},        // asked once only
        {Ask::UntilResumed, 0, true, 0, false},
        {Ask::Nothing, 10 * kHour, true, 0, false},    // no end of its own
        {Ask::Resume, 0, false, 0, true},
        {Ask::Resume, 0, false, 0, false},             // resuming what runs changes nothing
        {Ask::Hour, 30 * 60000, true, kHour - 30 * 60000, false},
        {Ask::UntilResumed, 2 * kHour, true, 0, false},  // chosen during the hour: past it
        {Ask::Hour, 0, true, kHour, false},              // and an hour again from now
        {Ask::Resume, 0, false, 0, true},
        {Ask::DownloadNow, 0, false, 0, true},
    };
    int index = 0;
    for (const Step& step : steps) {
        switch (step.ask) {
        case Ask::Hour: control.PauseFor(kHour); break;
        case Ask::UntilResumed: control.PauseUntilResumed(); break;
        case Ask::Resume: control.Resume(); break;
        case Ask::DownloadNow: control.DownloadNow(); break;
        case Ask::Nothing: break;
        }
        now += step.after;
        EXPECT_EQ(step.paused, control.IsPaused()) << index;
        EXPECT_EQ(step.paused, control.Holds()) << index;
        EXPECT_EQ(step.left, control.PauseLeft()) << index;
        EXPECT_EQ(step.full, control.TakeFullComparison()) << index;
        ++index;
    }
}

TEST(WatchControlTest, NewSettingsHoldTheWatchUntilTakenOnceAndWakeIt) {
    WatchControl control;
    FetchOptions taken;
    EXPECT_FALSE(control.TakeSettings(taken));
    FetchOptions first, second;
    first.target = L"D:\\Survey", second.target = L"E:\\Project", second.move = true, second.layout = L"{yyyy}";
    control.Apply(first);
    control.Apply(second);  // the last choice wins
    EXPECT_EQ(static_cast<DWORD>(WAIT_OBJECT_0), WaitForSingleObject(control.WakeEvent(), 0));
    EXPECT_TRUE(control.Holds());
    ASSERT_TRUE(control.TakeSettings(taken));
    EXPECT_EQ(L"E:\\Project", taken.target);
    EXPECT_TRUE(taken.move);
    EXPECT_EQ(L"{yyyy}", taken.layout);
    EXPECT_FALSE(control.Holds());
    EXPECT_FALSE(control.TakeSettings(taken));
}
