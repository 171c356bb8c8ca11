// Guards what the unattended fetch promises, without waiting or a second user: the pauses before the device
// manager is asked again, the log's date lines at each start and day, the log turned into NAME.1 (replacing an
// older one) at 1 MiB, one fetch per folder however the folder is spelt and whichever user runs it, the one
// rule by which a copy's time is the receiver's on each kind of disk.
#include <windows.h>

#include <gtest/gtest.h>

#include "FetchLog.h"
#include "ReceiverFetcher.h"
#include "ReceiverWatch.h"
#include "TargetLock.h"
#include "com/Handles.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
SYSTEMTIME At(WORD month, WORD day, WORD hour, WORD minute) { return {2026, month, 0, day, hour, minute, 0, 0}; }

FILETIME Utc(const SYSTEMTIME& utc, LONGLONG plusMilliseconds = 0) {
    FILETIME time;
    SystemTimeToFileTime(&utc, &time);
    ULARGE_INTEGER ticks = {{time.dwLowDateTime, time.dwHighDateTime}};
    ticks.QuadPart += plusMilliseconds * 10000;
    return {ticks.LowPart, ticks.HighPart};
}

constexpr TimeKeeping kNtfs = TimeKeeping::Seconds, kFat = TimeKeeping::TwoSeconds;
}  // namespace

// The zone's changes in 2026: 8 March 07:00 and 1 November 06:00 UTC (the suite runs in New York).
TEST(UnattendedFetchTest, CopysTimeCountsAsTheReceiversAsExactlyAsItsDiskKeepsTimes) {
    const SYSTEMTIME odd = {2026, 6, 0, 3, 7, 58, 13, 0}, beforeSpring = {2026, 3, 0, 8, 6, 59, 59, 0},
                     afterSpring = {2026, 3, 0, 8, 7, 0, 1, 0}, beforeFall = {2026, 11, 0, 1, 5, 59, 59, 0},
                     afterFall = {2026, 11, 0, 1, 6, 0, 1, 0};
    const struct {
        SYSTEMTIME wanted;
        LONGLONG diskOffMs;
        TimeKeeping keeping;
        bool same;
    } rows[] = {
        {odd, 0, kNtfs, true},         {odd, 400, kNtfs, true},       {odd, 1000, kNtfs, false},
        {odd, -1000, kNtfs, false},    {odd, 3600000, kNtfs, false},  {odd, 1000, kFat, true},
        {odd, -1000, kFat, true},      {odd, 1999, kFat, true},       {odd, 2000, kFat, false},
        {odd, -2000, kFat, false},     {odd, 7200000, kFat, false},   {odd, 3600000 + 2000, kFat, false},
        {beforeSpring, 3600000, kFat, true},  {afterSpring, -3600000, kFat, true}, {afterSpring, 3601000, kFat, true},
        {beforeFall, -3600000, kFat, true},   {afterFall, 3600000, kFat, true},    {afterFall, -3599000, kFat, true},
        {beforeFall, 3600000, kNtfs, false},  {afterSpring, -3600000, kNtfs, false},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(testing::Message() << row.wanted.wMonth << "/" << row.wanted.wDay << " " << row.wanted.wHour << ":"
                                        << row.wanted.wMinute << " off by " << row.diskOffMs << " ms on "
                                        << (row.keeping == kFat ? "FAT" : "NTFS"));
        EXPECT_EQ(row.same, SameTimeOnDisk(Utc(row.wanted, row.diskOffMs), Utc(row.wanted), row.keeping));
    }
}

// Through a file, as --new and --move ask: the size must match whatever the time's window.
TEST(UnattendedFetchTest, CopyInTheTimeWindowIsFetchedOnlyWithTheReceiversSize) {
    TempDirectory folder(L"calvex-fetch-fat");
    const SYSTEMTIME logged = {2026, 6, 0, 3, 7, 58, 13, 0};  // local, as the receiver reports it
    SYSTEMTIME utc;
    ASSERT_TRUE(TzSpecificLocalTimeToSystemTime(nullptr, &logged, &utc));
    const struct { LONGLONG diskOffMs; int sizeOff; TimeKeeping keeping; bool fetched; } rows[] = {
        {1000, 0, kFat, true}, {1000, 1, kFat, false}, {-3600000, 0, kFat, true}, {-3600000, -1, kFat, false},
        {1000, 0, kNtfs, false}, {0, 1, kNtfs, false}, {0, 0, kNtfs, true},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(testing::Message() << row.diskOffMs << " ms, " << row.sizeOff << " bytes off");
        const std::wstring path = folder.Path() + L"\\LOG0001.qpr";
        ASSERT_TRUE(WriteFileBytes(path, std::string(100, 'x')));
        UniqueFile file(CreateFileW(path.c_str(), FILE_WRITE_ATTRIBUTES, 0, nullptr, OPEN_EXISTING, 0, nullptr));
        const FILETIME onDisk = Utc(utc, row.diskOffMs);
        ASSERT_TRUE(SetFileTime(file.Get(), nullptr, nullptr, &onDisk));
        file.Reset();
        FILEDESCRIPTORW descriptor = {};
        descriptor.dwFlags = FD_FILESIZE | FD_WRITESTIME;
        descriptor.nFileSizeLow = 100 + row.sizeOff;
        SystemTimeToFileTime(&logged, &descriptor.ftLastWriteTime);
        SetEnvironmentVariableW(L"CALVEX_FETCH_FILE_SYSTEM", row.keeping == kFat ? L"FAT32" : L"NTFS");
        TargetDisk disk(folder.Path());
        EXPECT_EQ(row.fetched, IsAlreadyFetched(path, descriptor, disk));
    }
    SetEnvironmentVariableW(L"CALVEX_FETCH_FILE_SYSTEM", nullptr);
}

// FAT by its volume's name (or the tests' stand-in for it), or by a time the disk gave back
// within its two seconds; a time it cannot keep at all says nothing of the kind.
TEST(UnattendedFetchTest, DiskKeepsTwoSecondTimesByItsNameOrByWhatItGaveBack) {
    const SYSTEMTIME odd = {2026, 6, 0, 3, 7, 58, 13, 0};
    const FILETIME none = {};  // 1601: a disk that keeps no time at all
    const struct { const wchar_t* fileSystem; FILETIME readBack; TimeKeeping keeping; } rows[] = {
        {L"FAT", Utc(odd), kFat},           {L"FAT12", Utc(odd), kFat},       {L"fat16", Utc(odd), kFat},
        {L"FAT32", Utc(odd), kFat},         {L"exFAT", Utc(odd), kNtfs},      {L"NTFS", Utc(odd), kNtfs},
        {L"NTFS", Utc(odd, 3000), kNtfs},   {L"NTFS", Utc(odd, 1000), kFat},  {L"NTFS", Utc(odd, -1000), kFat},
        {L"NTFS", none, kNtfs}};
    for (const auto& row : rows) {
        SetEnvironmentVariableW(L"CALVEX_FETCH_FILE_SYSTEM", row.fileSystem);
        TargetDisk disk(L"C:\\Survey");
        disk.Learn(Utc(odd), row.readBack);
        EXPECT_EQ(row.keeping, disk.Keeping()) << Narrow(row.fileSystem);
    }
    SetEnvironmentVariableW(L"CALVEX_FETCH_FILE_SYSTEM", nullptr);
}

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
    const std::wstring deep = L"C:\\" + std::wstring(150, L'p') + L"\\" + std::wstring(150, L'q');
    EXPECT_EQ(TargetLockName(deep), TargetLockName(deep + L"\\")) << "past MAX_PATH too";
    EXPECT_NE(TargetLockName(deep), TargetLockName(deep + L"q"));
}
