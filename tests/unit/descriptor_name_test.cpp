// Guards the hostile-name rules of fetch and paste: which names are refused, what safe name the others get, and that WriteVirtualFile never writes outside its target nor leaves a file that looks complete.
#include <gtest/gtest.h>

#include <string>

#include "DescriptorName.h"
#include "VirtualFiles.h"
#include "com/ComPtr.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
constexpr size_t Target = 20;  // characters of a short target folder's path
const wchar_t Refused[] = L"(refused)";

struct NameCase {
    std::wstring given;
    std::wstring expected;  // Refused, or the safe name
    size_t target = Target;
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
        {L"LOG0001.qpr", L"LOG0001.qpr"},
        {L"sub\\LOG0001.qpr", L"sub\\LOG0001.qpr"},
        {L"Mesure été.log", L"Mesure été.log"},
        {L"", Refused},
        {L"\\evil.qpr", Refused},
        {L"/evil.qpr", Refused},
        {L"\\\\server\\share\\evil", Refused},
        {L"//server/share/evil", Refused},
        {L"\\\\?\\C:\\evil", Refused},
        {L"C:evil", Refused},
        {L"c:\\Windows\\evil", Refused},
        {L"..", Refused},
        {L"..\\evil", Refused},
        {L"a/../../evil", Refused},
        {L"a\\.\\b", Refused},
        {L"a\\\\b", Refused},
        {L"dir\\", Refused},
        {L"...", Refused},
        {L" . ", Refused},
        {L"CON", L"_CON"},
        {L"nul.txt", L"_nul.txt"},
        {L"Com1.log", L"_Com1.log"},
        {L"LPT9", L"_LPT9"},
        {L"AUX .txt", L"_AUX .txt"},
        {L"prn\\x", L"_prn\\x"},
        {L"COM0", L"COM0"},
        {L"CONSOLE.log", L"CONSOLE.log"},
        {std::wstring(L"a\x01" L"b"), L"a_b"},
        {L"tab\there\x7f", L"tab_here_"},
        {L"what?<>|*\".log", L"what______.log"},
        {L"LOG:stream", L"LOG_stream"},
        {L"name. . .", L"name"},
        {L"sub. \\file ", L"sub\\file"},
        {L"sub/file", L"sub\\file"},
        {std::wstring(43, L'n'), std::wstring(43, L'n'), 200},  // 200 + 1 + 43 + the temporary suffix = 259
        {std::wstring(44, L'n'), Refused, 200},
        {L"sub\\" + std::wstring(39, L'n'), L"sub\\" + std::wstring(39, L'n'), 200},
        {L"sub\\" + std::wstring(40, L'n'), Refused, 200},
        {std::wstring(255, L'n'), Refused},
    };
    for (const NameCase& row : rows) ExpectRule(row, MakeSafeDescriptorName(row.given, row.target));
}

TEST(DescriptorNameTest, FolderNamesFromDisplayNamesStayOneComponent) {
    const NameCase rows[] = {
        {L"HVL3-GNSS@USB", L"HVL3-GNSS@USB"},
        {L"Q7/RTK@COM3", L"Q7_RTK@COM3"},
        {L"Compact Ü/2@USB", L"Compact Ü_2@USB"},
        {L"..\\..\\Windows", L".._.._Windows"},
        {L"../", L".._"},
        {L"C:\\x", L"C__x"},
        {L"NUL", L"_NUL"},
        {L"", Refused},
        {L"..", Refused},
        {std::wstring(256, L'r'), Refused},
    };
    for (const NameCase& row : rows) ExpectRule(row, MakeSafeFolderName(row.given, row.target));
}

FILEDESCRIPTORW Descriptor(const std::wstring& name, DWORD size) {
    FILEDESCRIPTORW descriptor = {};
    descriptor.dwFlags = FD_FILESIZE | FD_WRITESTIME;
    descriptor.nFileSizeLow = size;
    const SYSTEMTIME time = {2026, 11, 0, 3, 7, 58, 12, 0};
    SystemTimeToFileTime(&time, &descriptor.ftLastWriteTime);
    lstrcpynW(descriptor.cFileName, name.c_str(), MAX_PATH);
    return descriptor;
}

ComPtr<IStream> StreamOf(const std::string& bytes) {
    ComPtr<IStream> stream;
    CreateStreamOnHGlobal(nullptr, TRUE, &stream);
    ULONG written = 0;
    stream->Write(bytes.data(), static_cast<ULONG>(bytes.size()), &written);
    const LARGE_INTEGER start = {};
    stream->Seek(start, STREAM_SEEK_SET, nullptr);
    return stream;
}

TEST(DescriptorNameTest, WriteVirtualFileWritesOnlyBelowTheTarget) {
    struct WriteCase {
        const wchar_t* name;
        DWORD size;               // as the descriptor claims; the stream holds 5 bytes
        HRESULT expected;
        const wchar_t* written;   // path below the target that must hold the bytes, or null
    };
    const WriteCase rows[] = {
        {L"LOG0001.qpr", 5, S_OK, L"inner\\LOG0001.qpr"},
        {L"CON", 5, S_OK, L"inner\\_CON"},
        {L"LOG:hidden", 5, S_OK, L"inner\\LOG_hidden"},
        {L"sub\\deep.qpr", 5, S_OK, L"inner\\sub\\deep.qpr"},
        {L"..\\escaped.qpr", 5, E_ACCESSDENIED, nullptr},
        {L"\\escaped.qpr", 5, E_ACCESSDENIED, nullptr},
        {L"short.qpr", 6, HRESULT_FROM_WIN32(ERROR_INVALID_DATA), nullptr},
    };
    for (const WriteCase& row : rows) {
        SCOPED_TRACE(Narrow(row.name));
        TempDirectory outer(L"calvex-names");
        const std::wstring target = outer.Path() + L"\\inner";
        ASSERT_TRUE(CreateDirectoryW(target.c_str(), nullptr));
        std::wstring error;
        ComPtr<IStream> stream = StreamOf("hello");
        EXPECT_EQ(row.expected, WriteVirtualFile(target, Descriptor(row.name, row.size), stream.Get(), error));
        EXPECT_EQ(row.expected == S_OK, error.empty()) << Narrow(error);
        if (row.written) EXPECT_EQ("hello", ReadFileBytes(outer.Path() + L"\\" + row.written));
        // Nothing else anywhere: no escaped file, no temporary left over.
        WIN32_FIND_DATAW found;
        int entries = 0;
        for (const wchar_t* dir : {L"", L"\\inner"}) {
            HANDLE find = FindFirstFileW((outer.Path() + dir + L"\\*").c_str(), &found);
            for (BOOL more = find != INVALID_HANDLE_VALUE; more; more = FindNextFileW(find, &found))
                if (found.cFileName[0] != L'.') ++entries;
            if (find != INVALID_HANDLE_VALUE) FindClose(find);
        }
        EXPECT_EQ(row.written ? 2 : 1, entries) << "the inner folder and at most the written file (or its folder)";
    }
}
}  // namespace
