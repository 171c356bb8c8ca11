// Guards calvex-fetch end to end through the shell: what it fetches, skips and re-fetches, byte-identical files with the device's times, receiver and brand selection, dry runs that write nothing, its exit codes and messages, and failed downloads that leave no file behind.
#include <windows.h>

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <vector>

#include "support/DeviceSim.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
struct FetchRun {
    DWORD exitCode = WAIT_TIMEOUT;
    std::string out, err;
    int Count(const std::string& text) const {
        int count = 0;
        for (size_t at = out.find(text); at != std::string::npos; at = out.find(text, at + 1)) ++count;
        return count;
    }
};

FetchRun RunFetch(const std::wstring& arguments) {
    FetchRun run;
    run.exitCode = RunProcess(L"\"" + BuildDir() + L"\\calvex-fetch.exe\" " + arguments, 300000, &run.out, &run.err);
    return run;
}

std::wstring Quoted(const std::wstring& path) { return L"\"" + path + L"\""; }

// Every file below dir, as paths relative to it.
std::vector<std::wstring> ListFiles(const std::wstring& dir, const std::wstring& prefix = L"") {
    std::vector<std::wstring> files;
    WIN32_FIND_DATAW found;
    HANDLE find = FindFirstFileW((dir + L"\\*").c_str(), &found);
    for (BOOL more = find != INVALID_HANDLE_VALUE; more; more = FindNextFileW(find, &found)) {
        const std::wstring name = found.cFileName;
        if (name == L"." || name == L"..") continue;
        if (!(found.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY)) files.push_back(prefix + name);
        for (const std::wstring& file : ListFiles(dir + L"\\" + name, prefix + name + L"\\")) files.push_back(file);
    }
    if (find != INVALID_HANDLE_VALUE) FindClose(find);
    return files;
}

class FetchToolTest : public testing::Test {
protected:
    TempDirectory target{L"calvex-fetch-target"};
};

// The sample receivers, then again after one file appeared on a device: only that one is new.
TEST_F(FetchToolTest, FetchesWhatIsNewAndOnlyThat) {
    TempDirectory device(L"calvex-fetch-device");
    ASSERT_EQ(0u, RunProcess(L"xcopy /E /I /Q /Y " + Quoted(SourceDir() + L"\\sample-receivers") + L" " +
                             Quoted(device.Path())));
    DeviceSimScope scope(device.Path());

    const FetchRun first = RunFetch(Quoted(target.Path()));
    ASSERT_EQ(0u, first.exitCode) << first.out << first.err;
    EXPECT_EQ(1, first.Count("22 fetched, 0 skipped, 0 failed, 4.0 MB in ")) << first.out;
    struct Arrived {
        const wchar_t* fetched;
        const wchar_t* onDevice;
        SYSTEMTIME time;  // the device's local time, taken over without a zone shift
    };
    const Arrived arrived[] = {
        {L"Q9 GNSS@USB\\LOG0001.qpr", L"Calvex Q9 USB\\LOG0001", {2026, 11, 0, 3, 6, 30, 0, 0}},
        {L"Compact \u00DC_2@USB\\\u00C5\u00C4\u00D6-\u6F22\u5B57.T02", L"Brennor odd names\\\u00C5\u00C4\u00D6-\u6F22\u5B57.T02",
         {2026, 9, 0, 5, 7, 7, 7, 0}},
        {L"R2_Net@COM4\\LOG0002", L"Brennor R2 COM4\\LOG0002", {2026, 10, 0, 31, 8, 5, 30, 0}},
    };
    for (const Arrived& file : arrived) {
        SCOPED_TRACE(Narrow(file.fetched));
        const std::wstring path = target.Path() + L"\\" + file.fetched;
        EXPECT_EQ(ReadFileBytes(device.Path() + L"\\" + file.onDevice), ReadFileBytes(path));
        WIN32_FILE_ATTRIBUTE_DATA data = {};
        GetFileAttributesExW(path.c_str(), GetFileExInfoStandard, &data);
        FILETIME expected = {};
        SystemTimeToFileTime(&file.time, &expected);
        EXPECT_EQ(0, CompareFileTime(&expected, &data.ftLastWriteTime)) << "the device's time";
    }
    EXPECT_EQ(22u, ListFiles(target.Path()).size()) << "no temporary or stray file";

    ASSERT_TRUE(CopyFileW((device.Path() + L"\\Calvex Z5 COM12\\DATA0001").c_str(),
                          (device.Path() + L"\\Calvex Z5 COM12\\DATA0003").c_str(), FALSE));
    Sleep(1000);  // the simulator sees the new file within 0.2 s
    const FetchRun third = RunFetch(Quoted(target.Path()));
    EXPECT_EQ(0u, third.exitCode);
    EXPECT_EQ(1, third.Count("1 fetched, 22 skipped, 0 failed, 2.0 KB in ")) << third.out;
    EXPECT_EQ(1, third.Count("  fetched     DATA0003.qpr  2.0 KB")) << third.out;

    const FetchRun again = RunFetch(L"--all --receiver Z/5@COM12 " + Quoted(target.Path()));
    EXPECT_EQ(0u, again.exitCode) << again.err;
    EXPECT_EQ(1, again.Count("3 fetched, 0 skipped, 0 failed, 8.0 KB in ")) << again.out;
}
// Dry runs over the sample receivers: which receivers the options pick, and nothing written.
TEST_F(FetchToolTest, PicksReceiversByKeyDisplayNameAndBrand) {
    struct Pick {
        const wchar_t* options;
        int receivers;                 // header lines
        int files;                     // "would fetch" lines
        std::vector<const char*> headers;
    };
    const Pick picks[] = {
        {L"--receiver Q7/RTK@COM3", 1, 3, {"Calvex Q7/RTK@COM3 (5211-40125!Q7#RTK!COM3) -> "}},
        {L"--receiver 5211-40125!Q7#RTK!COM3", 1, 3, {"Calvex Q7/RTK@COM3 (5211-40125!Q7#RTK!COM3) -> "}},
        {L"--receiver r2/net@com4 --receiver Z/5@COM12", 2, 4, {"Calvex Z/5@COM12 (", "Brennor R2/Net@COM4 ("}},
        {L"--brand brennor", 3, 10, {"Brennor HVL3-GNSS@USB (", "Brennor R2/Net@COM4 ("}},
        {L"--brand calvex", 4, 12, {"Calvex Q7/L1-L2@Unknown (", "Calvex Q9 GNSS@USB ("}},
    };
    const std::wstring folder = target.Path() + L"\\not-yet";
    for (const Pick& pick : picks) {
        SCOPED_TRACE(Narrow(pick.options));
        const FetchRun run = RunFetch(std::wstring(L"--dry-run ") + pick.options + L" " + Quoted(folder));
        EXPECT_EQ(0u, run.exitCode) << run.err;
        EXPECT_EQ(pick.receivers, run.Count(" -> ")) << run.out;
        EXPECT_EQ(pick.files, run.Count("  would fetch ")) << run.out;
        for (const char* header : pick.headers) EXPECT_EQ(1, run.Count(header)) << run.out;
        EXPECT_EQ(1, run.Count("dry run: " + std::to_string(pick.files) + " to fetch, 0 skipped, 0 failed")) << run.out;
        EXPECT_EQ(INVALID_FILE_ATTRIBUTES, GetFileAttributesW(folder.c_str())) << "a dry run writes nothing";
    }
}

// Registered again however the test ends.
struct UnregisteredDeviceManager {
    UnregisteredDeviceManager() { RunProcess(Quoted(BuildDir() + L"\\CalvexDeviceSim.exe") + L" /UnregServer"); }
    ~UnregisteredDeviceManager() { RunProcess(Quoted(BuildDir() + L"\\CalvexDeviceSim.exe") + L" /RegServer"); }
};

TEST_F(FetchToolTest, NothingDoneExitsTwoWithTheReason) {
    const std::wstring file = target.Path() + L"\\a-file";
    ASSERT_TRUE(CloseHandle(CreateFileW(file.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_NEW, 0, nullptr)));
    struct Refusal {
        std::wstring arguments;
        const char* message;  // on stderr
        bool noDeviceManager = false;
    };
    const Refusal refusals[] = {
        {Quoted(file), "calvex-fetch: target not writable: "},
        {L"--receiver NOPE " + Quoted(target.Path()), "calvex-fetch: no such receiver: NOPE\r\n"},
        {L"--brand calvex --receiver R2/Net@COM4 " + Quoted(target.Path()), "calvex-fetch: no such receiver: R2/Net@COM4\r\n"},
        {L"--brand acme " + Quoted(target.Path()), "calvex-fetch: unknown brand \"acme\"\r\n"},
        {L"--all --new " + Quoted(target.Path()), "calvex-fetch: --all and --new exclude each other\r\n"},
        {L"--receiver", "calvex-fetch: --receiver needs a value\r\n"},
        {L"--dry-run", "calvex-fetch: no TARGET folder given\r\n"},
        {L"--watch --all " + Quoted(target.Path()), "calvex-fetch: --watch and --all exclude each other\r\n"},
        {L"--dry-run --watch " + Quoted(target.Path()), "calvex-fetch: --watch and --dry-run exclude each other\r\n"},
        {Quoted(target.Path()), "calvex-fetch: no device manager: it cannot be started (0x", true},
        {L"--watch " + Quoted(target.Path()), "calvex-fetch: no device manager: it cannot be started (0x", true},
    };
    for (const Refusal& refusal : refusals) {
        SCOPED_TRACE(Narrow(refusal.arguments));
        std::optional<UnregisteredDeviceManager> unregistered;
        if (refusal.noDeviceManager) unregistered.emplace();
        const FetchRun run = RunFetch(refusal.arguments);
        EXPECT_EQ(2u, run.exitCode);
        EXPECT_EQ(0u, run.err.find(refusal.message)) << run.err;
        EXPECT_EQ(0, run.Count(" fetched, ")) << run.out;
    }
    EXPECT_EQ(std::vector<std::wstring>{L"a-file"}, ListFiles(target.Path()));
}

TEST_F(FetchToolTest, FailedDownloadLeavesNoFileAndExitsOne) {
    ReceiverTree tree;
    tree.AddReceiver({L"Calvex fails", 1, L"Test receiver", L"1000-0001", L"FA", 2, L"",
                      {L"[Transfer]", L"Rate=100000", L"FailAtPercent=50", L"FailResult=0x8007001F"}});
    tree.AddFile(L"Calvex fails", L"FAILS", 200000);
    tree.AddReceiver({L"Calvex good", 1, L"Test receiver", L"1000-0002", L"GO"});
    tree.AddFile(L"Calvex good", L"GOOD", 3000);
    DeviceSimScope scope(tree.Root());

    const FetchRun run = RunFetch(Quoted(target.Path()));
    EXPECT_EQ(1u, run.exitCode) << run.out << run.err;
    EXPECT_EQ(1, run.Count("  FAILED      FAILS.qpr: download failed or cancelled\r\n")) << run.out;
    EXPECT_EQ(1, run.Count("  message box: ")) << "the product's error box, answered";
    EXPECT_EQ(1, run.Count("1 fetched, 0 skipped, 1 failed, 2.9 KB in ")) << run.out;
    EXPECT_EQ(std::vector<std::wstring>{L"GO@USB\\GOOD.qpr"}, ListFiles(target.Path()))
        << "nothing of the failed file, not even a partial";
}
}  // namespace
