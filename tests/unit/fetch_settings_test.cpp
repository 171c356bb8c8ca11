// Guards the stored settings of the windowless watch: what the window saves comes back, a damaged
// value (wrong type, garbage, a bad pattern, an empty folder) gives its default and one line for
// the log, and the logon start's command line wins over what is stored.
#include <windows.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "FetchSettings.h"
#include "FetchStart.h"
#include "com/Handles.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
const wchar_t kScratch[] = L"Software\\Calvex\\Tests\\FetchSettings";

class FetchSettingsTest : public ::testing::Test {
protected:
    void SetUp() override {
        RegDeleteTreeW(HKEY_CURRENT_USER, kScratch);
        ASSERT_EQ(ERROR_SUCCESS, RegCreateKeyExW(HKEY_CURRENT_USER, kScratch, 0, nullptr, 0, KEY_ALL_ACCESS, nullptr,
                                                 m_key.Put(), nullptr));
    }
    void TearDown() override {
        m_key.Reset();
        RegDeleteTreeW(HKEY_CURRENT_USER, kScratch);
    }
    void Set(const wchar_t* name, DWORD type, const void* data, DWORD bytes) {
        ASSERT_EQ(ERROR_SUCCESS, RegSetValueExW(m_key.Get(), name, 0, type, static_cast<const BYTE*>(data), bytes));
    }
    void SetText(const wchar_t* name, const std::wstring& text) {
        Set(name, REG_SZ, text.c_str(), static_cast<DWORD>((text.size() + 1) * sizeof(wchar_t)));
    }
    FetchSettings Read(std::vector<std::wstring>& lines) {
        return ReadFetchSettings(m_key.Get(), [&](const std::wstring& line) { lines.push_back(line); });
    }
    UniqueRegKey m_key;
};

TEST_F(FetchSettingsTest, WhatTheWindowSavesComesBack) {
    FetchSettings saved;
    saved.target = L"D:\\Survey\\2026";
    saved.move = true;
    saved.layout = L"{yyyy}\\{doy}\\{receiver}";
    saved.notify = false;
    saved.startAtLogon = false;
    std::wstring error;
    ASSERT_TRUE(WriteFetchSettings(m_key.Get(), saved, error)) << Narrow(error);
    std::vector<std::wstring> lines;
    const FetchSettings read = Read(lines);
    EXPECT_TRUE(lines.empty());
    EXPECT_EQ(saved.target, read.target);
    EXPECT_EQ(saved.layout, read.layout);
    EXPECT_EQ(std::make_tuple(true, false, false), std::make_tuple(read.move, read.notify, read.startAtLogon));
}

TEST_F(FetchSettingsTest, NothingStoredGivesTheDefaultsSilently) {
    std::vector<std::wstring> lines;
    const FetchSettings read = Read(lines);
    EXPECT_TRUE(lines.empty());
    EXPECT_EQ(DefaultFetchTarget(), read.target);
    EXPECT_EQ(L"\\Survey", DefaultFetchTarget().substr(DefaultFetchTarget().size() - 7));
    EXPECT_EQ(L"{receiver}", read.layout);
    EXPECT_EQ(std::make_tuple(false, true, true), std::make_tuple(read.move, read.notify, read.startAtLogon));
}

// What the installer writes for a property left out: empty, which is no damage.
TEST_F(FetchSettingsTest, EmptySwitchesAndLayoutAreNotGiven) {
    for (const wchar_t* name : {L"FetchMove", L"FetchLayout", L"FetchNotify", L"FetchStartAtLogon"}) SetText(name, L"");
    std::vector<std::wstring> lines;
    const FetchSettings read = Read(lines);
    EXPECT_TRUE(lines.empty()) << Narrow(lines.front());
    EXPECT_EQ(L"{receiver}", read.layout);
    EXPECT_EQ(std::make_tuple(false, true, true), std::make_tuple(read.move, read.notify, read.startAtLogon));
}

TEST_F(FetchSettingsTest, ADamagedValueGetsItsDefaultAndOneLine) {
    const DWORD one = 1;
    const BYTE garbage[] = {0xff, 0xfe, 0x00, 0x41, 0x42};
    const struct {
        const wchar_t* name;
        DWORD type;
        const void* data;
        DWORD bytes;
        const char* line;
    } rows[] = {
        {L"FetchMove", REG_DWORD, &one, 4, "settings: FetchMove is damaged (not a string), off is used"},
        {L"FetchMove", REG_SZ, L"yes", 8, "settings: FetchMove is damaged (\"yes\" is neither 1 nor 0), off is used"},
        {L"FetchNotify", REG_BINARY, garbage, 5, "settings: FetchNotify is damaged (not a string), on is used"},
        {L"FetchStartAtLogon", REG_SZ, L"10", 6, "FetchStartAtLogon is damaged (\"10\" is neither 1 nor 0), on is used"},
        {L"FetchLayout", REG_SZ, L"{receiver}\\{doy2}", 36, "FetchLayout is damaged (unknown field {doy2}), {receiver} is used"},
        {L"FetchLayout", REG_SZ, L"..\\{receiver}", 28, "FetchLayout is damaged (\"..\" would leave the target), {receiver}"},
        {L"FetchLayout", REG_MULTI_SZ, L"{serial}\0", 20, "FetchLayout is damaged (not a string)"},
        {L"FetchDir", REG_SZ, L"", 2, "FetchDir is damaged (Choose the folder for the files.), C:\\"},
        {L"FetchDir", REG_SZ, L"Survey", 14, "FetchDir is damaged (Give the whole path of the folder, such as D:\\Survey.)"},
        {L"FetchDir", REG_SZ, L"D:\\Sur|vey", 22, "FetchDir is damaged (A folder name cannot hold"},
        {L"FetchDir", REG_DWORD, &one, 4, "FetchDir is damaged (not a string)"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(Narrow(row.name) + " " + row.line);
        SetUp();
        Set(row.name, row.type, row.data, row.bytes);
        std::vector<std::wstring> lines;
        const FetchSettings read = Read(lines);
        ASSERT_EQ(1u, lines.size());
        EXPECT_NE(std::string::npos, Narrow(lines[0]).find(row.line)) << Narrow(lines[0]);
        EXPECT_EQ(DefaultFetchTarget(), read.target);
        EXPECT_EQ(L"{receiver}", read.layout);
        EXPECT_EQ(std::make_tuple(false, true, true), std::make_tuple(read.move, read.notify, read.startAtLogon));
    }
}

// One damaged value costs only itself.
TEST_F(FetchSettingsTest, TheOtherValuesStillCount) {
    SetText(L"FetchDir", L"E:\\Project\\");
    SetText(L"FetchMove", L"maybe");
    SetText(L"FetchLayout", L"{brand}\\{receiver}");
    std::vector<std::wstring> lines;
    const FetchSettings read = Read(lines);
    EXPECT_EQ(1u, lines.size());
    EXPECT_EQ(L"E:\\Project", read.target);
    EXPECT_EQ(L"{brand}\\{receiver}", read.layout);
    EXPECT_FALSE(read.move);
}

TEST(FetchStartTest, TheCommandLineWinsOverTheStore) {
    FetchSettings stored;
    stored.target = L"D:\\Survey";
    stored.move = true;
    stored.layout = L"{receiver}\\{yyyy}";
    stored.notify = false;
    const struct {
        std::vector<std::wstring> arguments;
        const wchar_t* target;
        const wchar_t* layout;
        const wchar_t* log;
    } rows[] = {
        {{}, L"D:\\Survey", L"{receiver}\\{yyyy}", L""},
        {{L"E:\\Other"}, L"E:\\Other", L"{receiver}\\{yyyy}", L""},
        {{L"--layout", L"{serial}"}, L"D:\\Survey", L"{serial}", L""},
        {{L"--log", L"C:\\w.log", L"--layout", L"{doy}", L"F:\\X"}, L"F:\\X", L"{doy}", L"C:\\w.log"},
        {{L"--watch", L"--log", L"-odd.log"}, L"D:\\Survey", L"{receiver}\\{yyyy}", L"-odd.log"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.arguments.size());
        FetchOptions options;
        std::wstring error;
        ASSERT_TRUE(OptionsOverSettings(stored, row.arguments, options, error)) << Narrow(error);
        EXPECT_EQ(row.target, options.target);
        EXPECT_EQ(row.layout, options.layout);
        EXPECT_EQ(row.log, options.log);
        EXPECT_TRUE(options.watch && options.move && !options.notify);
    }
    FetchOptions options;
    std::wstring error;
    EXPECT_FALSE(OptionsOverSettings(stored, {L"--dry-run"}, options, error));
    EXPECT_EQ(L"--watch and --dry-run exclude each other", error);
}

TEST(FetchStartTest, TellsHowTheProgramWasStarted) {
    const struct {
        std::vector<std::wstring> arguments;
        FetchStart start;
        size_t left;
    } rows[] = {
        {{}, FetchStart::Plain, 0},
        {{L"--logon"}, FetchStart::Logon, 0},
        {{L"--logon", L"--no-notify"}, FetchStart::Logon, 1},
        {{L"--settings"}, FetchStart::Settings, 0},
        {{L"--watch", L"D:\\Survey"}, FetchStart::CommandLine, 2},
    };
    for (auto row : rows) {
        EXPECT_EQ(row.start, TakeFetchStart(row.arguments));
        EXPECT_EQ(row.left, row.arguments.size());
    }
}
}  // namespace
