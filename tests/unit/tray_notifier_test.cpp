// Guards which passes the watch speaks of, in its log: news of a receiver once, not the same words
// at every full comparison, and again once a receiver comes back, after an unplug or a long absence.
#include <gtest/gtest.h>

#include "TrayNotifier.h"
#include "WatchNotice.h"
#include "support/TestSupport.h"

using namespace testsupport;

TEST(TrayNotifierTest, SpeaksOfNewsOnly) {
    wchar_t folder[MAX_PATH];
    GetTempPathW(MAX_PATH, folder);
    const std::wstring log = std::wstring(folder) + L"tray_notifier_test.log";
    DeleteFileW(log.c_str());
    FetchConsole console;
    console.SetLog(log);
    ULONGLONG now = 1000000;
    TrayNotifier notifier(console, L"C:\\Survey", nullptr, [&] { return now; });
    struct Step { ULONGLONG after; const wchar_t* receiver; int files, fetched, deleted; bool unplugged, said; } steps[] = {
        {0, L"Q9 GNSS@USB", 12, 0, 0, false, true},       // plugged in, all there already
        {60000, L"Q9 GNSS@USB", 12, 0, 0, false, false},  // the full comparison a minute later
        {5000, L"R2/Net@COM4", 2, 2, 2, false, true},     // another receiver, moved
        {2000, L"R2/Net@COM4", 0, 0, 0, false, false},    // the look after its deletes: empty
        {5000, L"Q9 GNSS@USB", 13, 1, 0, false, true},    // a file logged
        {5000, L"Q9 GNSS@USB", 13, 1, 0, false, false},   // fetched again as it grows: the same words
        {60000, L"Q9 GNSS@USB", 13, 0, 0, false, false},
        {95000, L"Q9 GNSS@USB", 13, 0, 0, false, true},   // not seen for longer than a comparison: replugged
        {1000, L"Q9 GNSS@USB", 13, 0, 0, true, true},     // unplugged during a pass
        {20000, L"Q9 GNSS@USB", 13, 0, 0, false, true},   // back: the same words are news again
    };
    std::string expected;
    for (const Step& step : steps) {
        ReceiverPass pass;
        pass.receiver = step.receiver, pass.target = L"C:\\Survey", pass.files = step.files, pass.unplugged = step.unplugged;
        pass.fetched = step.fetched, pass.deleted = step.deleted;
        now += step.after;
        notifier.PassEnded(pass);
        if (step.said) expected += Narrow(PassNotice(pass)) + "\r\n";
    }
    std::string logged = ReadFileBytes(log);  // less the day's line and each line's time
    logged.erase(0, logged.find("\r\n") + 2);
    for (size_t line = 0; line < logged.size() && line != std::string::npos + 2; line = logged.find("\r\n", line) + 2)
        logged.erase(line, 9);
    EXPECT_EQ(expected, logged);
    DeleteFileW(log.c_str());
}

// What the icon's menu reads: a pause's end stays where it was as time goes by; Recent and the notice's folder
// follow the passes spoken of only.
TEST(TrayNotifierTest, MenuSeesThePauseEndAndThePassesSpokenOf) {
    FetchConsole console;
    ULONGLONG now = 1000000;
    TrayNotifier notifier(console, L"C:\\Survey", nullptr, [&] { return now; });
    notifier.Paused(3600000);
    struct Step { ULONGLONG after; ULONGLONG left; } steps[] = {{0, 3600000}, {20 * 60000, 40 * 60000}, {40 * 60000, 1}};
    for (const Step& step : steps) {
        now += step.after;
        EXPECT_TRUE(notifier.View().status.paused);
        EXPECT_EQ(step.left, notifier.View().status.pauseLeft) << step.after;
    }
    notifier.Idle();
    EXPECT_FALSE(notifier.View().status.paused);
    const wchar_t* folders[] = {L"C:\\Survey\\A@USB", L"C:\\Survey\\A@USB", L"C:\\Survey\\B@USB"};
    for (const wchar_t* folder : folders) {
        ReceiverPass pass;
        pass.receiver = std::wstring(folder).substr(10), pass.target = L"C:\\Survey", pass.folder = folder, pass.files = 1;
        notifier.PassEnded(pass);  // the second, of A with nothing new, is no news
    }
    const WatchView view = notifier.View();
    ASSERT_EQ(2u, view.recent.Newest().size());
    EXPECT_EQ(L"C:\\Survey\\B@USB", view.recent.Newest()[0].folder);
    EXPECT_EQ(L"B@USB: 1 file in C:\\Survey. Safe to unplug.", view.recent.Newest()[0].notice);
    EXPECT_EQ(L"C:\\Survey\\B@USB", view.noticeFolder);
}
