// Guards which passes the watch speaks of, in its log: news of a receiver once, not the same words
// at every full comparison, and again once a receiver comes back, after an unplug or a long absence.
#include <windows.h>

#include <gtest/gtest.h>

#include <sstream>
#include <string>
#include <vector>

#include "TrayNotifier.h"
#include "WatchNotice.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
ReceiverPass Pass(const wchar_t* receiver, int files, bool unplugged = false) {
    ReceiverPass pass;
    pass.receiver = receiver;
    pass.target = L"C:\\Survey";
    pass.files = pass.fetched = files;
    pass.unplugged = unplugged;
    return pass;
}

// The log's lines without their time ("15:05:11 ") and without the line of the day's date.
std::vector<std::string> LoggedLines(const std::wstring& path) {
    std::istringstream log(ReadFileBytes(path));
    std::vector<std::string> lines;
    for (std::string line; std::getline(log, line);) {
        if (!line.empty() && line.back() == '\r') line.pop_back();
        if (line.size() > 9 && line.compare(0, 4, "----") != 0) lines.push_back(line.substr(9));
    }
    return lines;
}
}  // namespace

TEST(TrayNotifierTest, SpeaksOfNewsOnly) {
    wchar_t folder[MAX_PATH];
    GetTempPathW(MAX_PATH, folder);
    const std::wstring log = std::wstring(folder) + L"tray_notifier_test.log";
    DeleteFileW(log.c_str());
    FetchConsole console;
    console.SetLog(log);
    ULONGLONG now = 1000000;
    TrayNotifier notifier(console, L"C:\\Survey", nullptr, [&] { return now; });
    notifier.Idle();
    notifier.Working(L"Q9 GNSS@USB", 3);  // without an icon: nothing to say
    struct Step { ULONGLONG after; ReceiverPass pass; bool said; } steps[] = {
        {0, Pass(L"Q9 GNSS@USB", 12), true},           // plugged in
        {60000, Pass(L"Q9 GNSS@USB", 12), false},      // the full comparison a minute later
        {5000, Pass(L"R2/Net@COM4", 2), true},         // another receiver
        {5000, Pass(L"Q9 GNSS@USB", 13), true},        // a file logged
        {60000, Pass(L"Q9 GNSS@USB", 13), false},
        {95000, Pass(L"Q9 GNSS@USB", 13), true},       // not seen for longer than a comparison: replugged
        {1000, Pass(L"Q9 GNSS@USB", 13, true), true},  // unplugged during a pass
        {20000, Pass(L"Q9 GNSS@USB", 13), true},       // back: the same words are news again
    };
    std::vector<std::string> expected;
    for (const Step& step : steps) {
        now += step.after;
        notifier.PassEnded(step.pass);
        if (step.said) expected.push_back(Narrow(PassNotice(step.pass)));
    }
    EXPECT_EQ(expected, LoggedLines(log));
    DeleteFileW(log.c_str());
}
