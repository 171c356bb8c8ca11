// Guards calvex-fetch end to end through the shell: what it fetches, skips and re-fetches (a file changed on the device included), byte-identical files with the device's times in a zone with daylight saving, what lands for each choice of brand and receiver in a batch and in a watch, its exit codes and messages, and failed downloads that leave no file behind.
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
    int Count(const std::string& text) const { return CountOf(out, text); }
};

// A watch runs until a timeout ends it (exit code WAIT_TIMEOUT), once it had time to fetch.
FetchRun RunFetch(const std::wstring& arguments) {
    FetchRun run;
    const DWORD timeout = arguments.find(L"--watch ") != std::wstring::npos ? 25000 : 300000;
    run.exitCode = RunProcess(L"\"" + BuildDir() + L"\\calvex-fetch.exe\" " + arguments, timeout, &run.out, &run.err);
    return run;
}

std::wstring Quoted(const std::wstring& path) { return L"\"" + path + L"\""; }

class FetchToolTest : public testing::Test {
protected:
    TempDirectory target{L"calvex-fetch-target"};
};

// The sample receivers, odd names included: every file, whole, and nothing else.
TEST_F(FetchToolTest, FetchesEverySampleFileWhole) {
    TempDirectory device(L"calvex-fetch-device");
    ASSERT_EQ(0u, RunProcess(L"xcopy /E /I /Q /Y " + Quoted(SourceDir() + L"\\sample-receivers") + L" " +
                             Quoted(device.Path())));
    DeviceSimScope scope(device.Path());

    const FetchRun first = RunFetch(Quoted(target.Path()));
    ASSERT_EQ(0u, first.exitCode) << first.out << first.err;
    EXPECT_EQ(1, first.Count("22 fetched, 0 skipped, 0 failed, 4.0 MB in ")) << first.out;
    const std::pair<const wchar_t*, const wchar_t*> arrived[] = {  // fetched, on the device
        {L"Q9 GNSS@USB\\LOG0001.qpr", L"Calvex Q9 USB\\LOG0001"}, {L"R2_Net@COM4\\LOG0002", L"Brennor R2 COM4\\LOG0002"},
        {L"Compact \u00DC_2@USB\\\u00C5\u00C4\u00D6-\u6F22\u5B57.T02", L"Brennor odd names\\\u00C5\u00C4\u00D6-\u6F22\u5B57.T02"},
    };
    for (const auto& file : arrived) {
        EXPECT_EQ(ReadFileBytes(device.Path() + L"\\" + file.second), ReadFileBytes(target.Path() + L"\\" + file.first))
            << Narrow(file.first);
    }
    EXPECT_EQ(22u, ListFiles(target.Path()).size()) << "no temporary or stray file";
}

// Receivers of both brands: what lands for each choice of brand and receiver (key or display
// name, any case), in a batch and in a watch.
TEST_F(FetchToolTest, EachChoiceOfBrandAndReceiverLandsExactlyItsFiles) {
    ReceiverTree tree;
    const std::pair<ReceiverSetup, const wchar_t*> receivers[] = {  // and the one file each holds
        {{L"Calvex 1", 1, L"Test receiver", L"1000-0001", L"C1/X", 1, L"COM3"}, L"CA"},
        {{L"Calvex 2", 1, L"Test receiver", L"1000-0002", L"C2"}, L"CB"},
        {{L"Brennor 1", 2, L"Test receiver", L"2000-0001", L"B1"}, L"BA"}};
    for (const auto& receiver : receivers) tree.AddReceiver(receiver.first), tree.AddFile(receiver.first.folder, receiver.second, 1000);
    DeviceSimScope scope(tree.Root());
    const std::wstring ca = L"C1_X@COM3\\CA.qpr", cb = L"C2@USB\\CB.qpr", ba = L"B1@USB\\BA";
    const struct { const wchar_t* options; std::vector<std::wstring> landed; } picks[] = {
        {L"", {ba, ca, cb}},
        {L"--brand all", {ba, ca, cb}},
        {L"--brand calvex", {ca, cb}},
        {L"--brand brennor", {ba}},
        {L"--receiver c1/x@com3", {ca}},
        {L"--receiver 2000-0001!b1!usb", {ba}},
        {L"--brand calvex --receiver C2@USB --receiver 1000-0001!C1#X!COM3", {ca, cb}},
        {L"--dry-run --brand brennor", {}},
        {L"--watch --brand brennor", {ba}},
        {L"--watch --brand all --receiver c2@usb", {cb}},
        {L"--watch --receiver 1000-0001!c1#x!com3 --receiver B1@USB", {ba, ca}},
    };
    for (const auto& pick : picks) {
        SCOPED_TRACE(Narrow(pick.options));
        const std::wstring into = target.Path() + L"\\into";
        const FetchRun run = RunFetch(std::wstring(pick.options) + L" " + Quoted(into));
        EXPECT_EQ(wcsstr(pick.options, L"--watch") ? WAIT_TIMEOUT : 0u, run.exitCode) << run.out << run.err;
        EXPECT_EQ(pick.landed, ListFiles(into)) << run.out;
        EXPECT_EQ(!pick.landed.empty(), FileExists(into)) << "a dry run writes nothing";
        DeleteTree(into);
    }
}

// A device file whose time or size changed comes again, in a batch and in a watch, as does a
// new one; one with neither changed does not, unless --all. Every file keeps the device's time,
// on both sides of the zone's daylight saving change.
TEST_F(FetchToolTest, FetchesAgainWhatChangedOnTheDevice) {
    ReceiverTree tree;
    const std::wstring device = tree.AddReceiver({L"Calvex 1"}) + L"\\", fetched = target.Path() + L"\\Q9 GNSS@USB\\";
    const SYSTEMTIME october = {2026, 10, 0, 20, 15, 0, 0, 0}, november = {2026, 11, 0, 20, 15, 0, 0, 0};
    std::vector<std::wstring> names = {L"SAME", L"RETIMED", L"RESIZED"};
    for (const std::wstring& name : names) SetWriteTime(tree.AddFile(L"Calvex 1", name, 1000), october);
    DeviceSimScope scope(tree.Root());
    EXPECT_EQ(1, RunFetch(Quoted(target.Path())).Count("3 fetched, 0 skipped, 0 failed"));
    const struct { const wchar_t* options; SYSTEMTIME retimed; size_t resized; int same; } changes[] = {
        {L"--new", november, 1200, 0}, {L"--watch", october, 900, 0}, {L"--all", november, 900, 1}};
    for (const auto& change : changes) {
        SCOPED_TRACE(Narrow(change.options));
        SetWriteTime(device + L"RETIMED", change.retimed);
        SetWriteTime(tree.AddFile(L"Calvex 1", L"RESIZED", std::string(change.resized, 'r')), october);
        names.push_back(L"NEW" + std::to_wstring(names.size()));
        SetWriteTime(tree.AddFile(L"Calvex 1", names.back(), 500), november);  // a device keeps whole seconds
        const FetchRun run = RunFetch(change.options + (L" " + Quoted(target.Path())));
        for (const std::wstring& name : {std::wstring(L"RETIMED"), std::wstring(L"RESIZED"), names.back()})
            EXPECT_EQ(1, run.Count(Narrow(name) + ".qpr  ")) << run.out;
        EXPECT_EQ(change.same, run.Count("SAME.qpr  ")) << run.out;
        for (const std::wstring& name : names) {
            EXPECT_EQ(ReadFileBytes(device + name), ReadFileBytes(fetched + name + L".qpr")) << Narrow(name);
            EXPECT_EQ(WriteTime(device + name), WriteTime(fetched + name + L".qpr")) << Narrow(name) << ": the device's time";
        }
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
