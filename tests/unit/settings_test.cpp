// Guards "Display Settings": a stored value of any length misread at load, or the wrong bytes written at unload.
#include <windows.h>

#include <gtest/gtest.h>

#include "com/Handles.h"
#include "module/Settings.h"

namespace {
// The current user's hive is redirected to a private key, so that modules loaded and
// unloaded by tests running beside this one cannot touch what we read.
class SettingsTest : public testing::Test {
protected:
    void SetUp() override {
        RegDeleteTreeW(HKEY_CURRENT_USER, kSandbox);
        ASSERT_EQ(ERROR_SUCCESS, RegCreateKeyExW(HKEY_CURRENT_USER, kSandbox, 0, nullptr, 0, KEY_ALL_ACCESS,
                                                 nullptr, m_sandbox.Put(), nullptr));
        ASSERT_EQ(ERROR_SUCCESS, RegOverridePredefKey(HKEY_CURRENT_USER, m_sandbox.Get()));
    }
    void TearDown() override {
        RegOverridePredefKey(HKEY_CURRENT_USER, nullptr);
        m_sandbox.Reset();
        RegDeleteTreeW(HKEY_CURRENT_USER, kSandbox);
    }
    void Store(const void* bytes, DWORD size) {
        ASSERT_EQ(0, RegSetKeyValueW(HKEY_CURRENT_USER, kSettingsKey, kDisplaySettingsValue, REG_BINARY, bytes, size));
    }

    static constexpr const wchar_t* kSandbox = L"Software\\CalvexTests\\SettingsSandbox";
    UniqueRegKey m_sandbox;
};
}  // namespace

TEST_F(SettingsTest, StoredValueLengths) {
    const DWORD words[5] = {210, 95, 0, 0, 0};
    struct { DWORD size; bool accepted; LONG name, second; } cases[] = {
        {0, false, 100, 100},  // no value: defaults
        {8, true, 210, 95},    // two widths only
        {12, true, 210, 95},   // as the module writes it
        {16, true, 210, 95},   // the largest the reader takes
        {20, false, 100, 100}, // too long: refused, defaults
    };
    for (const auto& c : cases) {
        if (c.size) Store(words, c.size);
        DisplayState state;
        state.NameColumnWidth = state.SecondColumnWidth = 7;
        EXPECT_EQ(c.accepted, ReadDisplaySettings(state)) << c.size;
        EXPECT_EQ(c.name, state.NameColumnWidth) << c.size;
        EXPECT_EQ(c.second, state.SecondColumnWidth) << c.size;
    }
}

TEST_F(SettingsTest, WriteStoresTwelveBytesThatReadBack) {
    DisplayState written;
    written.NameColumnWidth = 321;
    written.SecondColumnWidth = 45;
    ASSERT_TRUE(WriteDisplaySettings(written));
    BYTE bytes[32];
    DWORD size = sizeof bytes, type = 0;
    ASSERT_EQ(ERROR_SUCCESS, RegGetValueW(HKEY_CURRENT_USER, kSettingsKey, kDisplaySettingsValue, RRF_RT_ANY,
                                          &type, bytes, &size));
    EXPECT_EQ(static_cast<DWORD>(REG_BINARY), type);
    ASSERT_EQ(12u, size);
    const BYTE expected[12] = {0x41, 0x01, 0, 0, 45, 0, 0, 0, 0, 0, 0, 0};  // little-endian
    EXPECT_EQ(0, memcmp(expected, bytes, 12));
    DisplayState read;
    EXPECT_TRUE(ReadDisplaySettings(read));
    EXPECT_EQ(321, read.NameColumnWidth);
    EXPECT_EQ(45, read.SecondColumnWidth);
}
