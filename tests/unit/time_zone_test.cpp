// Guards that the suite runs where surveyors do: in a zone with an offset and daylight saving, the one that wine-run set (Wine takes it from TZ), so that every time the tests check would show a time read in the wrong zone or with the wrong bias.
#include <windows.h>

#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>

TEST(TimeZoneTest, IsTheZoneSetWithAnOffsetAndDaylightSaving) {
    const char* offsets = getenv("CALVEX_TEST_TZ_OFFSETS");
    ASSERT_NE(nullptr, offsets) << "run through wine-run, which sets the zone";
    TIME_ZONE_INFORMATION zone = {};
    ASSERT_NE(TIME_ZONE_ID_INVALID, GetTimeZoneInformation(&zone));
    EXPECT_NE(0, zone.Bias);
    EXPECT_NE(0, zone.DaylightDate.wMonth) << "a daylight saving rule";
    // `date +%z` of a summer and a winter noon on the Unix side ("-0400 -0500"): Wine's
    // conversion of the same local noons must agree.
    int hhmm[2] = {};
    ASSERT_EQ(2, sscanf(offsets, "%d %d", &hhmm[0], &hhmm[1])) << offsets;
    EXPECT_NE(hhmm[0], hhmm[1]) << "the offset changes within the year";
    for (int i = 0; i < 2; ++i) {
        const SYSTEMTIME noon = {2026, WORD(i ? 12 : 7), 0, 1, 12, 0, 0, 0};
        SYSTEMTIME utc;
        ASSERT_TRUE(TzSpecificLocalTimeToSystemTime(nullptr, &noon, &utc));
        const int minutes = hhmm[i] / 100 * 60 + hhmm[i] % 100;  // "-0430" reads as -430
        EXPECT_EQ(((12 * 60 - minutes) % 1440 + 1440) % 1440, utc.wHour * 60 + utc.wMinute) << hhmm[i];
    }
}
