// Guards the watch's promises of time and size without waiting for them: the pauses before the
// device manager is asked again, a date line in the log at each start and each new day, and the
// log turned into NAME.1 (replacing an older one) once it holds 1 MiB.
#include <windows.h>

#include <gtest/gtest.h>

#include "FetchLog.h"
#include "ReceiverWatch.h"
#include "com/Handles.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
SYSTEMTIME At(WORD month, WORD day, WORD hour, WORD minute) {
    SYSTEMTIME time = {};
    time.wYear = 2026, time.wMonth = month, time.wDay = day, time.wHour = hour, time.wMinute = minute;
    return time;
}

void Append(const std::wstring& path, const std::string& bytes) {
    UniqueFile file(CreateFileW(path.c_str(), FILE_APPEND_DATA, 0, nullptr, OPEN_ALWAYS, 0, nullptr));
    DWORD written = 0;
    ASSERT_TRUE(WriteFile(file.Get(), bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr));
}
}  // namespace

TEST(WatchScheduleTest, DeviceManagerIsAskedAgainAfter2_4_8_16_30SecondsThenOnceAMinute) {
    const ULONGLONG pauses[] = {2, 4, 8, 16, 30, 60, 60, 60};
    for (size_t attempt = 0; attempt < 8; ++attempt) EXPECT_EQ(pauses[attempt], ReconnectPauseSeconds(attempt)) << attempt;
    EXPECT_EQ(60u, ReconnectPauseSeconds(100000));
}

TEST(WatchScheduleTest, LogDatesEachStartAndDayAndBeginsAnewAtOneMebibyte) {
    TempDirectory folder(L"calvex-fetch-log");
    const std::wstring path = folder.Path() + L"\\calvex-fetch.log";
    Append(path + L".1", "an older log");
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
    // One byte short of the limit the next line still goes in; the one after begins a new file.
    const size_t mebibyte = 1024 * 1024;
    Append(path, std::string(mebibyte - 1 - expected.size(), 'x'));
    restarted.Write(L"f", At(4, 8, 12, 2));
    const std::string full = ReadFileBytes(path);
    EXPECT_EQ(mebibyte + 2, full.size());
    restarted.Write(L"g", At(4, 8, 12, 3));
    EXPECT_EQ(full, ReadFileBytes(path + L".1")) << "the full log replaces the older one";
    EXPECT_EQ("---- 2026-04-08 ----\r\ng\r\n", ReadFileBytes(path));
}
