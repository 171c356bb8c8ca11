// Guards calvex-fetch end to end through the shell: what it fetches, skips and re-fetches (a file changed on the device included), byte-identical files with the device's times in a zone with daylight saving, what lands for each choice of brand and receiver in a batch and in a watch, its exit codes and messages, failed downloads that leave no file behind, --move deleting exactly the files whose copies are proven, and --layout placing files by the receiver's own date.
#include <windows.h>

#include <gtest/gtest.h>

#include <map>
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

    TempDirectory logs(L"calvex-fetch-log");
    const FetchRun first = RunFetch(L"--log " + Quoted(logs.Path() + L"\\fetch.log") + L" " + Quoted(target.Path()));
    ASSERT_EQ(0u, first.exitCode) << first.out << first.err;
    EXPECT_EQ(1, first.Count("22 fetched, 0 skipped, 0 failed, 4.0 MB in ")) << first.out;
    EXPECT_EQ(1, first.Count(Narrow(L"  fetched     \u00C5\u00C4\u00D6-\u6F22\u5B57.T02  8.8 KB"))) << "UTF-8 through a pipe";
    EXPECT_EQ(22, CountOf(ReadFileBytes(logs.Path() + L"\\fetch.log"), "  fetched     ")) << "--log of the console tool";
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
    const FetchRun quiet = RunFetch(Quoted(target.Path()));
    EXPECT_EQ(0u, quiet.exitCode) << "nothing new is all good";
    EXPECT_EQ(static_cast<int>(names.size()), quiet.Count("  up to date  ")) << quiet.out;
}

// Registered again however the test ends.
struct UnregisteredDeviceManager {
    UnregisteredDeviceManager() { RunProcess(Quoted(BuildDir() + L"\\CalvexDeviceSim.exe") + L" /UnregServer"); }
    ~UnregisteredDeviceManager() { RunProcess(Quoted(BuildDir() + L"\\CalvexDeviceSim.exe") + L" /RegServer"); }
};

TEST_F(FetchToolTest, NothingDoneExitsTwoWithTheReason) {
    const std::wstring file = target.Path() + L"\\a-file", fresh = target.Path() + L"\\fresh";
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
        {L"--layout {receiver}\\{doy2} " + Quoted(fresh), "calvex-fetch: --layout: unknown field {doy2}\r\n"},
        {L"--move --layout ..\\{receiver} " + Quoted(fresh), "calvex-fetch: --layout: \"..\" would leave the target\r\n"},
        {L"--layout C:\\Survey " + Quoted(fresh), "calvex-fetch: --layout: drive \"C:\"\r\n"},
        {L"--watch --layout \\{yyyy} " + Quoted(fresh), "calvex-fetch: --layout: absolute path \"\\{yyyy}\"\r\n"},
        {L"--layout {yyyy}\\\\{doy} " + Quoted(fresh), "calvex-fetch: --layout: empty folder name in \"{yyyy}\\\\{doy}\"\r\n"},
        {L"--layout {mm}:{dd} " + Quoted(fresh), "calvex-fetch: --layout: \"{mm}:{dd}\" cannot name a folder ("},
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
    EXPECT_EQ(0u, RunFetch(L"--dry-run " + Quoted(fresh)).exitCode);
    EXPECT_EQ(0u, RunFetch(L"--bogus").out.find("usage: calvex-fetch [--brand calvex|brennor|all] "));
    EXPECT_FALSE(FileExists(fresh)) << "a bad layout or a dry run touches nothing, not even the target";
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

// --move deletes a file on the receiver only once its copy is proven and the receiver still
// reports it unchanged: a differing copy is fetched anew first (and stays when that fails),
// files that change during their download and refused deletes stay, and a dry run touches nothing.
TEST_F(FetchToolTest, MoveDeletesExactlyTheFilesWhoseCopiesAreProven) {
    ReceiverTree tree;
    const std::pair<const wchar_t*, const wchar_t*> receivers[] = {  // model, transfer fault
        {L"M1", L""}, {L"MF", L"FailAtPercent=50"}, {L"MG", L"GrowAtPercent=50"}, {L"MR", L""}, {L"MT", L"RetimeAtPercent=50"}};
    for (const auto& r : receivers)
        tree.AddReceiver({r.first, 1, L"Test receiver", r.first, r.first, 2, L"", {L"[Transfer]", L"Rate=40000", r.second,
                          L"[Fail]", wcscmp(r.first, L"MR") ? L"" : L"IReceiverFile.Delete=0x80070005",
                          // still being logged: it grows, its time stays the one the logging began at
                          L"[Times]", wcscmp(r.first, L"MG") ? L"" : L"GROWS=2026-10-20 15:00:00"}});
    for (const wchar_t* file : {L"M1\\SAME", L"M1\\DIFFERS2", L"MF\\DIFFERS", L"MG\\GROWS", L"MR\\REFUSED", L"MT\\RETIMED"})
        tree.AddFile(std::wstring(file, 2), file + 3, 30000);
    DeviceSimScope scope(tree.Root());
    const std::wstring into = Quoted(target.Path()) + L" ", copies = target.Path() + L"\\";
    ASSERT_EQ(0u, RunFetch(L"--receiver M1@USB " + into).exitCode);
    tree.AddFile(L"M1", L"NEW1", 5000);
    CreateDirectoryW((copies + L"MF@USB").c_str(), nullptr);
    for (const wchar_t* stale : {L"M1@USB\\DIFFERS2.qpr", L"MF@USB\\DIFFERS.qpr"})  // copies that differ
        ASSERT_TRUE(WriteFileBytes(copies + stale, "0123456789"));
    const std::vector<std::wstring> before = ListFiles(tree.Root()), copied = ListFiles(target.Path());
    std::map<std::wstring, std::string> bytes;
    for (const std::wstring& file : before) bytes[file] = ReadFileBytes(tree.Root() + L"\\" + file);

    const FetchRun dry = RunFetch(L"--dry-run --move " + into);
    EXPECT_EQ(0u, dry.exitCode) << dry.out;
    EXPECT_EQ(7, dry.Count("  would move  ")) << dry.out;
    EXPECT_EQ(1, dry.Count("  would move  SAME.qpr (already in the target)\r\n")) << dry.out;
    EXPECT_EQ(1, dry.Count("dry run: 6 to fetch, 1 skipped, 0 failed, 7 to delete, ")) << dry.out;
    EXPECT_EQ(before, ListFiles(tree.Root()));
    EXPECT_EQ(copied, ListFiles(target.Path()));

    const FetchRun run = RunFetch(L"--move " + into);
    EXPECT_EQ(1u, run.exitCode) << run.out;
    for (const char* line : {"  moved       DIFFERS2.qpr  29.3 KB\r\n", "  moved       NEW1.qpr  4.9 KB\r\n",
                             "  deleted     SAME.qpr (already in the target)\r\n", "  FAILED      DIFFERS.qpr: download failed",
                             "  kept        GROWS.qpr  29.3 KB (fetched; still changing on the receiver)\r\n",
                             "  FAILED      REFUSED.qpr: the receiver refused the delete (0x80070005); the copy stays\r\n",
                             "  kept        RETIMED.qpr  29.3 KB (fetched; still changing on the receiver)\r\n",
                             "5 fetched, 1 skipped, 2 failed, 3 deleted, "})
        EXPECT_EQ(1, run.Count(line)) << line << run.out;
    const std::vector<std::wstring> left = {L"M1\\receiver.ini", L"MF\\DIFFERS", L"MF\\receiver.ini", L"MG\\GROWS", L"MG\\receiver.ini",
                                            L"MR\\REFUSED", L"MR\\receiver.ini", L"MT\\RETIMED", L"MT\\receiver.ini"};
    EXPECT_EQ(left, ListFiles(tree.Root()));
    for (const wchar_t* file : {L"M1\\SAME", L"M1\\DIFFERS2", L"M1\\NEW1", L"MG\\GROWS", L"MR\\REFUSED", L"MT\\RETIMED"})
        EXPECT_EQ(bytes[file], ReadFileBytes(copies + std::wstring(file, 2) + L"@USB" + (file + 2) + L".qpr")) << Narrow(file);
    EXPECT_EQ(10u, ReadFileBytes(copies + L"MF@USB\\DIFFERS.qpr").size()) << "a failed download keeps the old copy";
}

// Files go where the layout says, by the date the receiver gives them, a year end at 23:58 and
// the night the zone leaves daylight saving included; --new and --move compare them there.
TEST_F(FetchToolTest, LayoutPlacesFilesByTheReceiversOwnDate) {
    ReceiverTree tree;
    tree.AddReceiver({L"Calvex 1", 1, L"Test receiver", L"1000-0001", L"Q9/X", 2, L"",
                      {L"[Times]", L"YEAREND=2026-12-31 23:58:00", L"FALLBACK=2026-11-01 01:30:00", L"NEWYEAR=2027-01-01 00:00:05"}});
    for (const wchar_t* name : {L"YEAREND", L"FALLBACK", L"NEWYEAR"}) tree.AddFile(L"Calvex 1", name, 700);
    DeviceSimScope scope(tree.Root());
    const std::wstring into = L" " + Quoted(target.Path());
    const FetchRun first = RunFetch(L"--layout {receiver}\\{yyyy}\\{doy}" + into);
    EXPECT_EQ(1, first.Count(" -> " + Narrow(target.Path()) + "\\Q9_X@USB\\{yyyy}\\{doy}\r\n")) << first.out;
    EXPECT_EQ(1, first.Count("  fetched     Q9_X@USB\\2026\\365\\YEAREND.qpr  700 bytes")) << first.out;
    const std::vector<std::wstring> filed = {L"Q9_X@USB\\2026\\305\\FALLBACK.qpr", L"Q9_X@USB\\2026\\365\\YEAREND.qpr",
                                             L"Q9_X@USB\\2027\\001\\NEWYEAR.qpr"};
    EXPECT_EQ(filed, ListFiles(target.Path()));
    const FetchRun dated = RunFetch(L"--dry-run --layout {yyyy}-{mm}-{dd}\\{serial}" + into);
    EXPECT_EQ(1, dated.Count("  would fetch 2026-12-31\\1000-0001\\YEAREND.qpr  ")) << dated.out;
    const FetchRun moved = RunFetch(L"--move --layout {receiver}/{yyyy}/{doy}" + into);
    EXPECT_EQ(1, moved.Count("0 fetched, 3 skipped, 0 failed, 3 deleted, ")) << moved.out;
    EXPECT_EQ(std::vector<std::wstring>{L"Calvex 1\\receiver.ini"}, ListFiles(tree.Root()));
    EXPECT_EQ(filed, ListFiles(target.Path()));
}
}  // namespace
