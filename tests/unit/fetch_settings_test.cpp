// Guards the stored settings of the windowless watch: what the window saves comes back, a damaged
// value (wrong type, garbage, a bad pattern, an empty folder) gives its default and one line for
// the log while the others still count, and the logon start's command line wins over the store.
#include <windows.h>

#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <tuple>
#include <vector>

#include "FetchSettings.h"
#include "FetchStart.h"
#include "com/Handles.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
const wchar_t kScratch[] = L"Software\\Calvex\\Tests\\FetchSettings";
const DWORD kOne = 1;
const BYTE kGarbage[] = {0xff, 0xfe, 0x00, 0x41, 0x42};

struct Value { const wchar_t* name; DWORD type; const void* data; DWORD bytes; };  // bytes 0: a string's own

// The settings read back from a scratch key that `fill` wrote, and the lines said about them.
FetchSettings ReadBack(const std::function<void(HKEY)>& fill, std::vector<std::string>& lines) {
    RegDeleteTreeW(HKEY_CURRENT_USER, kScratch);
    UniqueRegKey key;
    RegCreateKeyExW(HKEY_CURRENT_USER, kScratch, 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, key.Put(), nullptr);
    fill(key.Get());
    const FetchSettings read = ReadFetchSettings(key.Get(), [&](const std::wstring& line) { lines.push_back(Narrow(line)); });
    RegDeleteTreeW(HKEY_CURRENT_USER, kScratch);
    return read;
}
FetchSettings ReadBack(const std::vector<Value>& values, std::vector<std::string>& lines) {
    return ReadBack([&](HKEY key) {
        for (const Value& v : values)
            RegSetValueExW(key, v.name, 0, v.type, static_cast<const BYTE*>(v.data),
                           v.bytes ? v.bytes : static_cast<DWORD>((wcslen(static_cast<const wchar_t*>(v.data)) + 1) * 2));
    }, lines);
}

auto Fields(const FetchSettings& s) { return std::make_tuple(s.target, s.move, s.layout, s.notify, s.startAtLogon); }

TEST(FetchSettingsTest, WhatTheWindowSavesComesBack) {
    const FetchSettings saved{L"D:\\Survey\\2026", true, L"{yyyy}\\{doy}\\{receiver}", false, false};
    std::vector<std::string> lines;
    const FetchSettings read = ReadBack([&](HKEY key) {
        std::wstring error;
        EXPECT_TRUE(WriteFetchSettings(key, saved, error)) << Narrow(error);
    }, lines);
    EXPECT_EQ(Fields(saved), Fields(read));
    EXPECT_TRUE(lines.empty());
}

TEST(FetchSettingsTest, ADamagedValueGetsItsDefaultAndOneLine) {
    const FetchSettings defaults{DefaultFetchTarget()};
    EXPECT_EQ("\\Survey", Narrow(defaults.target.substr(defaults.target.size() - 7)));
    // line "": nothing to say (the installer writes a property left out as empty)
    const struct { Value value; const char* line; } rows[] = {
        {{L"FetchMove", REG_SZ, L""}, ""},
        {{L"FetchLayout", REG_SZ, L""}, ""},
        {{L"FetchStartAtLogon", REG_SZ, L""}, ""},
        {{L"FetchMove", REG_DWORD, &kOne, 4}, "settings: FetchMove is damaged (not a string), off is used"},
        {{L"FetchMove", REG_SZ, L"yes"}, "settings: FetchMove is damaged (\"yes\" is neither 1 nor 0), off is used"},
        {{L"FetchNotify", REG_BINARY, kGarbage, 5}, "settings: FetchNotify is damaged (not a string), on is used"},
        {{L"FetchStartAtLogon", REG_SZ, L"10"}, "FetchStartAtLogon is damaged (\"10\" is neither 1 nor 0), on is used"},
        {{L"FetchLayout", REG_SZ, L"{receiver}\\{doy2}"}, "FetchLayout is damaged (unknown field {doy2}), {receiver} is used"},
        {{L"FetchLayout", REG_SZ, L"..\\{receiver}"}, "FetchLayout is damaged (\"..\" would leave the target), {receiver}"},
        {{L"FetchLayout", REG_MULTI_SZ, L"{serial}\0", 20}, "FetchLayout is damaged (not a string)"},
        {{L"FetchDir", REG_SZ, L""}, "FetchDir is damaged (Choose the folder for the files.), C:\\"},
        {{L"FetchDir", REG_SZ, L"Survey"}, "FetchDir is damaged (Give the whole path of the folder, such as D:\\Survey.)"},
        {{L"FetchDir", REG_SZ, L"D:\\Sur|vey"}, "FetchDir is damaged (A folder name cannot hold"},
        {{L"FetchDir", REG_DWORD, &kOne, 4}, "FetchDir is damaged (not a string)"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(Narrow(row.value.name) + " " + row.line);
        std::vector<std::string> lines;
        EXPECT_EQ(Fields(defaults), Fields(ReadBack({row.value}, lines)));
        ASSERT_EQ(*row.line ? 1u : 0u, lines.size());
        if (*row.line) {
            EXPECT_NE(std::string::npos, lines[0].find(row.line)) << lines[0];
        }
    }
}

TEST(FetchSettingsTest, OneDamagedValueCostsOnlyItself) {
    std::vector<std::string> lines;
    const FetchSettings read = ReadBack({{L"FetchDir", REG_SZ, L"E:\\Project\\"}, {L"FetchMove", REG_SZ, L"maybe"},
                                         {L"FetchLayout", REG_SZ, L"{brand}\\{receiver}"}, {L"FetchNotify", REG_SZ, L"0"}},
                                        lines);
    EXPECT_EQ(1u, lines.size());
    EXPECT_EQ(Fields(FetchSettings{L"E:\\Project", false, L"{brand}\\{receiver}", false, true}), Fields(read));
}

TEST(FetchStartTest, TheCommandLineWinsOverTheStore) {
    const FetchSettings stored{L"D:\\Survey", true, L"{receiver}\\{yyyy}", false};
    // arguments after --logon, then the target, layout and log they make
    const struct { std::vector<std::wstring> arguments; const wchar_t *target, *layout, *log; } rows[] = {
        {{}, L"D:\\Survey", L"{receiver}\\{yyyy}", L""},
        {{L"E:\\Other"}, L"E:\\Other", L"{receiver}\\{yyyy}", L""},
        {{L"--log", L"C:\\w.log", L"--layout", L"{doy}", L"F:\\X"}, L"F:\\X", L"{doy}", L"C:\\w.log"},
        {{L"--watch", L"--log", L"-odd.log"}, L"D:\\Survey", L"{receiver}\\{yyyy}", L"-odd.log"},
    };
    for (const auto& row : rows) {
        std::vector<std::wstring> arguments = row.arguments;
        arguments.insert(arguments.begin(), L"--logon");
        ASSERT_EQ(FetchStart::Logon, TakeFetchStart(arguments));
        FetchOptions options;
        std::wstring error;
        ASSERT_TRUE(OptionsOverSettings(stored, arguments, options, error)) << Narrow(error);
        EXPECT_EQ(std::make_tuple(row.target, row.layout, row.log), std::make_tuple(options.target, options.layout, options.log));
        EXPECT_TRUE(options.watch && options.move && !options.notify);
    }
}
}  // namespace
