// Guards what the settings window decides: the common layouts and their patterns both ways, the
// folder refused in place (malformed, missing, a file, not writable), and the live example with
// the pattern's error in --layout's own words.
#include <windows.h>

#include <gtest/gtest.h>

#include <string>

#include "SettingsChoice.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
const SYSTEMTIME kDay = {2026, 11, 0, 25, 14, 2, 0, 0};  // day 329

TEST(SettingsChoiceTest, ALayoutChoiceAndItsPatternMapBothWays) {
    const struct { const wchar_t* pattern; int index; } rows[] = {
        {L"{receiver}", 0},
        {L"{receiver}\\{yyyy}\\{doy}", 1},
        {L"{yyyy}\\{doy}\\{receiver}", 2},
        {L"{receiver}/{yyyy}/{doy}", SettingsChoice::kOwnPattern},  // same folders, but typed so
        {L"{RECEIVER}", SettingsChoice::kOwnPattern},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(Narrow(row.pattern));
        const int index = SettingsChoice::LayoutIndex(row.pattern);
        EXPECT_EQ(row.index, index);
        EXPECT_EQ(row.pattern, SettingsChoice::LayoutOf(index, row.pattern));
    }
    EXPECT_EQ(L"{receiver}\\{yyyy}\\{doy}", SettingsChoice::LayoutOf(1, L"{serial}"));
}

TEST(SettingsChoiceTest, ATypedFolderIsRefusedInPlaceWithTheReason) {
    const std::wstring temp = BuildDir() + L"\\settings-choice-test";
    DeleteTree(temp);
    ASSERT_TRUE(CreateDirectoryW(temp.c_str(), nullptr));
    ASSERT_TRUE(WriteFileBytes(temp + L"\\a-file", "x"));
    const struct { std::wstring text; SettingsChoice::Target result; const wchar_t* problem; } rows[] = {
        {L"  " + temp + L"\\ ", SettingsChoice::Target::Fine, L""},
        {temp + L"\\not-yet\\deeper", SettingsChoice::Target::Missing, L"This folder does not exist yet."},
        {temp + L"\\a-file", SettingsChoice::Target::Unusable, L"This is a file, not a folder."},
        {L"Z:\\proc\\self", SettingsChoice::Target::Unusable, L"Files cannot be written in this folder."},
        {L"   ", SettingsChoice::Target::Unusable, L"Choose the folder for the files."},
        {L"Survey\\2026", SettingsChoice::Target::Unusable, L"Give the whole path of the folder, such as D:\\Survey."},
        {L"D:\\Survey\\a:b", SettingsChoice::Target::Unusable, L"A folder name cannot hold any of : < > \" | ? *"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(Narrow(row.text));
        std::wstring problem;
        EXPECT_EQ(row.result, SettingsChoice::CheckTarget(row.text, problem));
        EXPECT_EQ(row.problem, problem);
    }
    EXPECT_EQ(1u, ListFiles(temp).size()) << "the write probe was left behind";
    DeleteTree(temp);
}

TEST(SettingsChoiceTest, TheExampleShowsWhereAFileLandsOrThePatternsError) {
    const std::vector<LayoutReceiver> none;
    const std::vector<LayoutReceiver> connected = {{L"Q7/RTK@COM3", L"5211-40125", L"Q7/RTK", L"Calvex"},
                                                   {L"Q9 GNSS@USB", L"1", L"Q9 GNSS", L"Calvex"}};
    const std::vector<LayoutReceiver> nameless = {{L"..", L"", L"", L"Calvex"}};
    const struct { const wchar_t *target, *layout; const std::vector<LayoutReceiver>* receivers; bool fine;
                   const wchar_t* text; } rows[] = {
        {L"D:\\Survey", L"{receiver}", &none, true,
         L"A file that Q9 GNSS@USB logs on 2026-11-25 goes to D:\\Survey\\Q9 GNSS@USB"},
        {L"D:\\Survey\\", L"{receiver}\\{yyyy}\\{doy}", &connected, true,
         L"A file that Q7/RTK@COM3 logs on 2026-11-25 goes to D:\\Survey\\Q7_RTK@COM3\\2026\\329"},
        {L"E:\\", L"{yyyy}\\{doy}\\{receiver}", &connected, true,
         L"A file that Q7/RTK@COM3 logs on 2026-11-25 goes to E:\\2026\\329\\Q7_RTK@COM3"},
        {L"D:\\Survey", L"{receiver}\\{doy2}", &connected, false, L"unknown field {doy2}"},
        {L"D:\\Survey", L"{receiver}\\..", &none, false, L"\"..\" would leave the target"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(Narrow(row.layout));
        std::wstring text;
        EXPECT_EQ(row.fine, SettingsChoice::Example(row.target, row.layout, *row.receivers, kDay, text));
        EXPECT_EQ(row.text, text);
    }
    std::wstring text;  // a receiver whose fields make no folder name is refused as the watch would
    EXPECT_FALSE(SettingsChoice::Example(L"D:\\Survey", L"{receiver}", nameless, kDay, text));
    EXPECT_FALSE(text.empty());
}
}  // namespace
