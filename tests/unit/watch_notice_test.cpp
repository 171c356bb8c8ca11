// Guards the words of the watch's notices and tooltip: each outcome of a pass says what it proved
// and no more ("Safe to unplug." never beside a failure or an unplug), and a cut text fits the
// shell's fields without splitting a character.
#include <gtest/gtest.h>

#include "WatchNotice.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
ReceiverPass Pass(int files, int deleted = 0, int kept = 0, int failed = 0, const wchar_t* first = L"", bool unplugged = false) {
    ReceiverPass pass;
    pass.receiver = L"Q9 GNSS@USB", pass.target = L"D:\\Survey", pass.files = pass.fetched = files;
    pass.deleted = deleted, pass.kept = kept, pass.failed = failed, pass.firstFailure = first, pass.unplugged = unplugged;
    return pass;
}
}  // namespace

TEST(WatchNoticeTest, SaysWhatEachPassProved) {
    const wchar_t timeout[] = L"LOG0003.qpr: the receiver did not answer (0x80004005)";
    struct Row { const char* what; ReceiverPass pass; const wchar_t* notice; } rows[] = {
        {"moved", Pass(12, 12), L"Q9 GNSS@USB: 12 files in D:\\Survey, 12 deleted from the receiver. Safe to unplug."},
        {"copied", Pass(12), L"Q9 GNSS@USB: 12 files in D:\\Survey. Safe to unplug."},
        {"one file", Pass(1, 1), L"Q9 GNSS@USB: 1 file in D:\\Survey, 1 deleted from the receiver. Safe to unplug."},
        {"empty receiver", Pass(0), L"Q9 GNSS@USB: no files on the receiver. Safe to unplug."},
        {"one failed", Pass(11, 0, 0, 1, timeout),
         L"Q9 GNSS@USB: 11 files in D:\\Survey, 1 failed (LOG0003.qpr: the receiver did not answer (0x80004005)). "
         L"Unplug only after it is fetched."},
        {"three failed", Pass(9, 9, 0, 3, timeout),
         L"Q9 GNSS@USB: 9 files in D:\\Survey, 9 deleted from the receiver, 3 failed (LOG0003.qpr: the receiver did not "
         L"answer (0x80004005), and 2 others). Unplug only after they are fetched."},
        {"one kept", Pass(12, 11, 1),
         L"Q9 GNSS@USB: 12 files in D:\\Survey, 11 deleted from the receiver, 1 left on the receiver. Safe to unplug."},
        {"unplugged", Pass(5, 5, 0, 0, L"", true),
         L"Q9 GNSS@USB: 5 files in D:\\Survey, 5 deleted from the receiver. Unplugged before the end: the rest comes when it "
         L"is plugged in again."},
        {"unplugged at once", Pass(0, 0, 0, 2, L"", true),
         L"Q9 GNSS@USB: no files in D:\\Survey, 2 failed. Unplugged before the end: the rest comes when it is plugged in again."},
    };
    for (const Row& row : rows) EXPECT_EQ(row.notice, PassNotice(row.pass)) << row.what;
    EXPECT_EQ(L"Q9 GNSS@USB: 11 files in D:\\Survey, 1 failed. \nUnplug only after it is fetched. ",
              PassBalloon(Pass(11, 0, 0, 1)));
}

TEST(WatchNoticeTest, TooltipsSayWhatTheWatchDoesAndFitTheirField) {
    EXPECT_EQ(L"calvex-fetch: watching D:\\Survey", IdleTip(L"D:\\Survey"));
    EXPECT_EQ(L"calvex-fetch: Q9 GNSS@USB, 5 files left", WorkingTip(L"Q9 GNSS@USB", 5));
    EXPECT_EQ(L"calvex-fetch: Q9 GNSS@USB, 1 file left", WorkingTip(L"Q9 GNSS@USB", 1));
    EXPECT_EQ(L"calvex-fetch: looking at Q9 GNSS@USB", WorkingTip(L"Q9 GNSS@USB", 0));
    const std::wstring a(123, L'a'), pair = L"\xD834\xDD1E";  // one character outside the BMP
    struct Row { std::wstring text, cut; } rows[] = {
        {a + L"bbbb", a + L"bbbb"},
        {a + L"bbbbb", a + L"b..."},
        {a + pair + L"bbb", a + L"..."},             // the pair goes whole or not at all
        {a.substr(1) + pair + L"bbbb", a.substr(1) + pair + L"..."},
    };
    for (const Row& row : rows) EXPECT_EQ(row.cut, CutText(row.text, kTipLimit)) << Narrow(row.text);
}
