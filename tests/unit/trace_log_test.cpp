// Guards the trace file: a wrong entry layout, narrow or wide text mangled.
#include <windows.h>

#include <regex>
#include <string>

#include <gtest/gtest.h>

#include "support/TestSupport.h"
#include "trace/TraceLog.h"

namespace {
const std::regex kPrefix(R"(^(\d\d):(\d\d):(\d\d)\.(\d{4})\t)");

class TraceLogTest : public testing::Test {
protected:
    void SetUp() override { OpenTraceLog(); }
    void TearDown() override { CloseTraceLog(); }
};
}  // namespace

// An entry is the local time ("hh:mm:ss.0mmm", a tab) and the message; no line end is ever added.
TEST_F(TraceLogTest, EntryIsLocalTimePrefixThenMessageAsGiven) {
    struct { const char* name; void (*write)(); const char* message; } cases[] = {
        {"plain", [] { TraceA("CModuleApp::InitInstance\r\n"); }, "CModuleApp::InitInstance\r\n"},
        {"empty format writes the prefix alone", [] { TraceA(""); }, ""},
        {"narrow values", [] { TraceA("X::Y [0x%08X] %i %s\n", 0x8000FFFFu, -3, "z"); }, "X::Y [0x8000FFFF] -3 z\n"},
        {"wide %s is a wide string", [] { TraceW(L"A::B %s [%u]\r\n", L"Calvex Receivers\\Z/5@COM3", 7u); },
         "A::B Calvex Receivers\\Z/5@COM3 [7]\r\n"},
        {"empty wide format", [] { TraceW(L""); }, ""},
        // In a double-byte code page the converted text is longer than the UTF-16 count; only
        // that many bytes are written, so the line end is lost on purpose.
        {"wide text cut to its count of units", [] {
             const LCID previous = GetThreadLocale();
             SetThreadLocale(MAKELCID(MAKELANGID(LANG_JAPANESE, SUBLANG_DEFAULT), SORT_DEFAULT));
             TraceW(L"\u3042\u3044\r\n");
             SetThreadLocale(previous);
         }, "\x82\xa0\x82\xa2"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        CloseTraceLog();
        OpenTraceLog();  // recreated empty each time
        SYSTEMTIME now;
        GetLocalTime(&now);
        c.write();
        const std::string log = testsupport::ReadTraceLog();
        std::smatch match;
        ASSERT_TRUE(std::regex_search(log, match, kPrefix)) << log;
        EXPECT_EQ(c.message, log.substr(match.length(0)));
        EXPECT_EQ(14, match.length(0));
        EXPECT_EQ(now.wHour, std::stoi(match[1]));
        EXPECT_LT(std::stoi(match[4]), 1000) << "milliseconds, zero-padded to four digits";
    }
}
