// Guards the registrar: keywords, values, quoting or substitution misread, keys removed that are not ours, malformed scripts that write.
#include <windows.h>

#include <string>

#include <gtest/gtest.h>

#include "com/Handles.h"
#include "module/Registrar.h"
#include "support/RegistrationExpectations.h"

namespace {
const wchar_t kRoot[] = L"Software\\CalvexTests\\Registrar";

std::wstring Script(const std::wstring& body) {
    return L"HKCU\n{\n NoRemove Software\n {\n  NoRemove CalvexTests\n  {\n   NoRemove Registrar\n   {\n" + body +
           L"\n   }\n  }\n }\n}\n";
}

bool KeyExists(const std::wstring& sub, const wchar_t* root = kRoot) {
    return testsupport::RegistryKeyExists(HKEY_CURRENT_USER, std::wstring(root) + L"\\" + sub);
}
std::wstring Value(const std::wstring& sub, const wchar_t* name) {
    return testsupport::RegistryText(HKEY_CURRENT_USER, std::wstring(kRoot) + L"\\" + sub, name);
}

class RegistrarTest : public testing::Test {
protected:
    void SetUp() override {
        RegDeleteTreeW(HKEY_CURRENT_USER, kRoot);
        UniqueRegKey key;
        RegCreateKeyExW(HKEY_CURRENT_USER, kRoot, 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, key.Put(), nullptr);
    }
    void TearDown() override { RegDeleteTreeW(HKEY_CURRENT_USER, L"Software\\CalvexTests"); }
    Registrar registrar{L"C:\\dir\\It's.dll"};
};
}  // namespace

TEST_F(RegistrarTest, RegistersKeysValuesAndSubstitutions) {
    const std::wstring script = Script(
        L"ForceRemove {E102076F-4057-4e7f-8209-511258F12B62} = s 'Calvex GNSS Receivers'\n"
        L"{\n DefaultIcon = s '%MODULE%,0'\n InprocServer32 = s '%MODULE%'\n {\n  val ThreadingModel = s 'Apartment'\n }\n"
        L" ShellFolder\n val InfoTip = s 'It''s 100%% text'\n val Number = d '0xA0000000'\n"
        L" 'Key With Spaces' = s 'x'\n}");
    ASSERT_EQ(S_OK, registrar.RunScript(script, true));
    const std::wstring clsid = L"{E102076F-4057-4e7f-8209-511258F12B62}";
    struct { std::wstring key; const wchar_t* name; std::wstring value; } expected[] = {
        {clsid, nullptr, L"Calvex GNSS Receivers"}, {clsid + L"\\Key With Spaces", nullptr, L"x"},
        {clsid + L"\\DefaultIcon", nullptr, L"C:\\dir\\It's.dll,0"},
        {clsid + L"\\InprocServer32", nullptr, L"C:\\dir\\It's.dll"},
        {clsid + L"\\InprocServer32", L"ThreadingModel", L"Apartment"},
        {clsid, L"InfoTip", L"It's 100% text"},
        {clsid, L"Number", L"0xA0000000"},
    };
    for (const auto& e : expected) { EXPECT_EQ(e.value, Value(e.key, e.name)) << testing::PrintToString(e.key); }
    EXPECT_TRUE(KeyExists(clsid + L"\\ShellFolder"));
}

TEST_F(RegistrarTest, ForceRemoveKeysAreReplacedAndRemovedWholeNoRemoveAndForeignKeysStay) {
    ASSERT_EQ(S_OK, registrar.RunScript(Script(L"Owned { Stale = s 'old' }"), true));
    const std::wstring script = Script(L"ForceRemove Owned = s 'new'\n{\n Fresh = s 'f'\n}\n"
                                       L"NoRemove Shared\n{\n val Ours = s '1'\n Mine = s 'm'\n}\nPlain = s 'p'\n{\n Child = s 'c'\n}");
    ASSERT_EQ(S_OK, registrar.RunScript(script, true));
    EXPECT_TRUE(!KeyExists(L"Owned\\Stale") && KeyExists(L"Owned\\Fresh")) << "the old subtree is replaced";
    ASSERT_EQ(S_OK, registrar.RunScript(Script(L"Owned { Foreign = s 'f' }\nPlain { Foreign = s 'f' }"), true));
    ASSERT_EQ(S_OK, registrar.RunScript(script, false));
    // Someone else's key goes with a ForceRemove key and keeps a plain one; NoRemove stays, a plain key below it goes.
    struct { const wchar_t* key; bool exists; } after[] = {{L"Owned", false}, {L"Shared", true}, {L"Shared\\Mine", false},
                                                           {L"Plain", true}, {L"Plain\\Child", false}, {L"Plain\\Foreign", true}};
    for (const auto& a : after) { EXPECT_EQ(a.exists, KeyExists(a.key)) << testing::PrintToString(std::wstring(a.key)); }
    EXPECT_EQ(L"<none>", Value(L"Shared", L"Ours")) << "named values are removed";
    EXPECT_EQ(S_OK, registrar.RunScript(script, false)) << "removing twice is fine";
}

TEST_F(RegistrarTest, MalformedScriptsFailWithoutWriting) {
    const wchar_t* scripts[] = {
        L"HKCU\n{\n NoRemove Software\n {\n  Probe = s 'unterminated\n }\n}\n",
        L"HKCU\n{\n NoRemove Software\n {\n  Probe = x 'unknown type'\n }\n}\n",
        L"HKXX\n{\n Probe = s 'unknown root'\n}\n",
        L"HKCU\n{\n NoRemove Software\n {\n  val = s 'no name'\n",
    };
    for (const wchar_t* script : scripts) {
        EXPECT_TRUE(FAILED(registrar.RunScript(script, true))) << testing::PrintToString(std::wstring(script));
        EXPECT_FALSE(KeyExists(L"Probe", L"Software"));
    }
}
