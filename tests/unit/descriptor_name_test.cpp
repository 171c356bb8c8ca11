// Guards the hostile-name rules of fetch and paste: which names are refused, what safe name the others get, and that WriteVirtualFile never writes outside its target nor leaves a file that looks complete.
#include <windows.h>
#include <shlwapi.h>

#include <gtest/gtest.h>

#include <string>

#include "DescriptorName.h"
#include "VirtualFiles.h"
#include "com/ComPtr.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
const wchar_t Refused[] = L"(refused)";

struct NameCase {
    std::wstring given;
    std::wstring expected;  // Refused, or the safe name
    size_t target = 20;  // characters of the target folder's path
};

void ExpectRule(const NameCase& row, const SafeName& safe) {
    SCOPED_TRACE(Narrow(row.given));
    if (row.expected == Refused) {
        EXPECT_TRUE(safe.refused) << Narrow(safe.name);
        EXPECT_TRUE(safe.name.empty());
        EXPECT_FALSE(safe.reason.empty());
        return;
    }
    EXPECT_FALSE(safe.refused) << Narrow(safe.reason);
    EXPECT_EQ(row.expected, safe.name);
    std::wstring sameOnWindows = row.given;  // "/" is a separator there too: no change
    for (wchar_t& c : sameOnWindows) if (c == L'/') c = L'\\';
    EXPECT_EQ(sameOnWindows != row.expected, !safe.reason.empty()) << "a change must say why, no change says nothing";
}

TEST(DescriptorNameTest, RefusesOrMakesSafeEveryHostileForm) {
    const NameCase rows[] = {
        {L"LOG0001.qpr", L"LOG0001.qpr"}, {L"Mesure été.log", L"Mesure été.log"},
        // Refused: empty, absolute, drive, UNC or device prefixes, empty, "." or ".." components.
        {L"", Refused}, {L"\\evil.qpr", Refused}, {L"\\\\server\\share\\evil", Refused}, {L"//server/share/evil", Refused},
        {L"\\\\?\\C:\\evil", Refused}, {L"C:evil", Refused}, {L"c:\\Windows\\evil", Refused}, {L"..", Refused},
        {L"a/../../evil", Refused}, {L"a\\.\\b", Refused}, {L"a\\\\b", Refused}, {L"dir\\", Refused}, {L" . ", Refused},
        // Reserved device names in every form Windows refuses; the names around them stay.
        {L"CON", L"_CON"}, {L"con", L"_con"}, {L"Con.txt", L"_Con.txt"}, {L"nul.tar.gz", L"_nul.tar.gz"},
        {L"CON.", L"_CON"}, {L"AUX .txt", L"_AUX .txt"}, {L"NUL  ", L"_NUL"}, {L"prn. .", L"_prn"},
        {L"COM\u00B9", L"_COM\u00B9"}, {L"com\u00B2.log", L"_com\u00B2.log"}, {L"LPT\u00B3", L"_LPT\u00B3"},
        {L"CONIN$", L"_CONIN$"}, {L"conout$.txt", L"_conout$.txt"}, {L"con.txt:ads", L"_con.txt_ads"},
        {L"prn\\x", L"_prn\\x"}, {L"dir/lpt1/Aux.d/x", L"dir\\_lpt1\\_Aux.d\\x"}, {L"CON. \\x", L"_CON\\x"},
        {L"COM0", L"COM0"}, {L"LPT0.log", L"LPT0.log"}, {L"COM10", L"COM10"}, {L"COM\u2074", L"COM\u2074"},
        {L"CONSOLE.log", L"CONSOLE.log"}, {L"NULL.txt", L"NULL.txt"}, {L"xCON", L"xCON"}, {L"CLOCK$", L"CLOCK$"},
        {std::wstring(L"a\x01" L"b"), L"a_b"}, {L"tab\there\x7f", L"tab_here_"}, {L"what?<>|*\".log", L"what______.log"},
        {L"LOG:stream", L"LOG_stream"}, {L"name. . .", L"name"}, {L"sub. \\file ", L"sub\\file"}, {L"sub/file", L"sub\\file"},
        // Lengths: 200 + 1 + 43 + the temporary suffix = 259.
        {std::wstring(43, L'n'), std::wstring(43, L'n'), 200}, {std::wstring(44, L'n'), Refused, 200},
        {L"sub\\" + std::wstring(39, L'n'), L"sub\\" + std::wstring(39, L'n'), 200}, {L"sub\\" + std::wstring(40, L'n'), Refused, 200},
        {std::wstring(255, L'n'), Refused},
    };
    for (const NameCase& row : rows) ExpectRule(row, MakeSafeDescriptorName(row.given, row.target));
    // Through extended paths (calvex-fetch): past 260 in all, no name over 255 with the suffix.
    const NameCase deep[] = {
        {std::wstring(240, L'n'), std::wstring(240, L'n'), 200}, {std::wstring(241, L'n'), Refused, 200},
        {L"s\\" + std::wstring(240, L'n'), L"s\\" + std::wstring(240, L'n'), 300}, {std::wstring(256, L's') + L"\\n", Refused},
        {L"n", Refused, kLongPathLimit - 16}};
    for (const NameCase& row : deep) ExpectRule(row, MakeSafeDescriptorName(row.given, row.target, kLongPathLimit));
    for (const std::wstring device : {L"COM", L"lpt"}) {
        for (wchar_t digit = L'1'; digit <= L'9'; ++digit) {
            const std::wstring name = device + digit + L".qpr";
            ExpectRule({name, L"_" + name}, MakeSafeDescriptorName(name, 20));
        }
    }
}

TEST(DescriptorNameTest, FolderNamesFromDisplayNamesStayOneComponent) {
    const NameCase rows[] = {
        {L"HVL3-GNSS@USB", L"HVL3-GNSS@USB"}, {L"Q7/RTK@COM3", L"Q7_RTK@COM3"}, {L"..\\..\\Windows", L".._.._Windows"},
        {L"C:\\x", L"C__x"}, {L"NUL", L"_NUL"}, {L"", Refused}, {L"..", Refused},
        {std::wstring(256, L'r'), Refused},
    };
    for (const NameCase& row : rows) ExpectRule(row, MakeSafeFolderName(row.given, row.target));
}

TEST(DescriptorNameTest, WriteVirtualFileWritesOnlyBelowTheTarget) {
    EXPECT_STREQ(L".calvex-partial", kPartialSuffix) << "the name a file has while it is written";
    struct WriteCase {
        const wchar_t* name;
        DWORD size;               // as the descriptor claims; the stream holds 5 bytes
        HRESULT expected;
        const wchar_t* written;   // path below the target that must hold the bytes, or null
    };
    const WriteCase rows[] = {
        {L"CON", 5, S_OK, L"inner\\_CON"},
        {L"sub\\deep.qpr", 5, S_OK, L"inner\\sub\\deep.qpr"},
        {L"..\\escaped.qpr", 5, E_ACCESSDENIED, nullptr},
        {L"short.qpr", 6, HRESULT_FROM_WIN32(ERROR_INVALID_DATA), nullptr},
    };
    for (const WriteCase& row : rows) {
        SCOPED_TRACE(Narrow(row.name));
        TempDirectory outer(L"calvex-names");
        const std::wstring target = outer.Path() + L"\\inner";
        ASSERT_TRUE(CreateDirectoryW(target.c_str(), nullptr));
        FILEDESCRIPTORW descriptor = {FD_FILESIZE};
        descriptor.nFileSizeLow = row.size;
        lstrcpynW(descriptor.cFileName, row.name, MAX_PATH);
        std::wstring error;
        ComPtr<IStream> stream;
        stream.Attach(SHCreateMemStream(reinterpret_cast<const BYTE*>("hello"), 5));
        EXPECT_EQ(row.expected, WriteVirtualFile(target, descriptor, stream.Get(), error));
        EXPECT_EQ(row.expected == S_OK, error.empty()) << Narrow(error);
        if (row.written) {
            EXPECT_EQ("hello", ReadFileBytes(outer.Path() + L"\\" + row.written));
            DeleteFileW((outer.Path() + L"\\" + row.written).c_str());  // then every folder must be empty to go
        }
        RemoveDirectoryW((target + L"\\sub").c_str());
        EXPECT_TRUE(RemoveDirectoryW(target.c_str())) << "no temporary left over";
        EXPECT_TRUE(RemoveDirectoryW(outer.Path().c_str())) << "no escaped file";
    }
}
}  // namespace
