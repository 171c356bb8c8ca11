// Guards what the unattended fetch promises, without waiting or a second user: the pauses before the device
// manager is asked again, the log's date lines at each start and day, the log turned into NAME.1 (replacing an
// older one) at 1 MiB, and one fetch per folder however the folder is spelt and whichever user runs it.
#include <windows.h>

#include <gtest/gtest.h>

#include "FetchLog.h"
#include "ReceiverWatch.h"
#include "TargetLock.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
SYSTEMTIME At(WORD month, WORD day, WORD hour, WORD minute) { return {2026, month, 0, day, hour, minute, 0, 0}; }
}  // namespace

TEST(UnattendedFetchTest, DeviceManagerIsAskedAgainAfter2_4_8_16_30SecondsThenOnceAMinute) {
    const std::pair<size_t, ULONGLONG> pauses[] = {{0, 2}, {1, 4}, {2, 8}, {3, 16}, {4, 30}, {5, 60}, {6, 60}, {100000, 60}};
    for (const auto& pause : pauses) EXPECT_EQ(pause.second, ReconnectPauseSeconds(pause.first)) << pause.first;
}

TEST(UnattendedFetchTest, LogDatesEachStartAndDayAndBeginsAnewAtOneMebibyte) {
    TempDirectory folder(L"calvex-fetch-log");
    const std::wstring path = folder.Path() + L"\\calvex-fetch.log";
    ASSERT_TRUE(WriteFileBytes(path + L".1", "an older log"));
    FetchLog log, restarted;
    struct Step { FetchLog* log; SYSTEMTIME now; const wchar_t* line; const char* adds; } steps[] = {
        {&log, At(3, 7, 23, 59), L"a", "---- 2026-03-07 ----\r\na\r\n"},
        {&log, At(3, 8, 0, 0), L"b", "---- 2026-03-08 ----\r\nb\r\n"},  // past midnight
        {&log, At(3, 8, 12, 0), L"c", "c\r\n"},
        {&log, At(4, 8, 12, 0), L"d", "---- 2026-04-08 ----\r\nd\r\n"},  // the same day of the next month
        {&restarted, At(4, 8, 12, 1), L"e", "---- 2026-04-08 ----\r\ne\r\n"},  // started again
    };
    std::string expected;
    for (const Step& step : steps) {
        step.log->Open(path);
        step.log->Write(step.line, step.now);
        expected += step.adds;
        EXPECT_EQ(expected, ReadFileBytes(path)) << Narrow(step.line);
    }
    // One byte short of 1 MiB the next line still goes in; the one after begins a new file.
    ASSERT_TRUE(WriteFileBytes(path, std::string(1024 * 1024 - 1 - expected.size(), 'x'), true));
    restarted.Write(L"f", At(4, 8, 12, 2));
    const std::string full = ReadFileBytes(path);
    restarted.Write(L"g", At(4, 8, 12, 3));
    EXPECT_EQ(full, ReadFileBytes(path + L".1")) << "the full log replaces the older one";
    EXPECT_EQ("---- 2026-04-08 ----\r\ng\r\n", ReadFileBytes(path));
}

TEST(UnattendedFetchTest, OneLockPerFolderHoweverSpeltAndForEverySession) {
    const std::wstring name = TargetLockName(L"C:\\Survey data");
    EXPECT_EQ(0u, name.find(L"Global\\calvex-fetch-")) << Narrow(name);
    for (const wchar_t* spelt : {L"c:\\SURVEY DATA", L"C:\\Survey data\\", L"C:/Survey data/"}) EXPECT_EQ(name, TargetLockName(spelt)) << Narrow(spelt);
    EXPECT_NE(name, TargetLockName(L"C:\\Survey data2"));
}
