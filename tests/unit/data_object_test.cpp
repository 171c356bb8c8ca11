// Guards the clipboard bytes of the data object (descriptor records, CIDA offsets, drop effect), its format enumerator's deliberate results, the exact S_FALSE/E_INVALIDARG answers and the transfer names.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "module/ModuleApp.h"
#include "transfer/CCalvexReceiversDataObject.h"
#include "transfer/TransferNames.h"

namespace {
const SYSTEMTIME kFileTime = {2026, 11, 0, 3, 7, 58, 12, 0};

UINT Format(const wchar_t* name) { return RegisterClipboardFormatW(name); }
std::string Raw(const void* bytes, size_t size) { return std::string(static_cast<const char*>(bytes), size); }
FORMATETC Etc(const wchar_t* name, DWORD tymed, LONG index = -1) {
    return {static_cast<CLIPFORMAT>(Format(name)), nullptr, DVASPECT_CONTENT, index, tymed};
}

class DataObjectTest : public testing::Test {
protected:
    static void SetUpTestSuite() { ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized()); }
    void SetUp() override { ASSERT_EQ(S_OK, CreateComObject<CCalvexReceiversDataObject>(&object)); }

    // root\receiver\file with the file's size and time written into its record.
    UniquePidl File(const wchar_t* path, DWORD size) {
        UniquePidl list(mgr, mgr.CreateFromPath(path, BrandCalvex));
        ReceiverItemData* data = mgr.GetData(mgr.GetLastItem(list.Get()));
        DATE time = 0;
        SystemTimeToVariantTime(const_cast<SYSTEMTIME*>(&kFileTime), &time);
        memcpy(&data->size, &size, sizeof(size));
        memcpy(&data->time, &time, sizeof(time));
        return list;
    }
    std::string Block(const wchar_t* format) {
        FORMATETC etc = Etc(format, TYMED_HGLOBAL);
        STGMEDIUM medium = {};
        EXPECT_EQ(S_OK, object->GetData(&etc, &medium));
        EXPECT_EQ(nullptr, medium.pUnkForRelease);
        if (medium.tymed != TYMED_HGLOBAL) return "not an HGLOBAL";
        std::string bytes(static_cast<const char*>(GlobalLock(medium.hGlobal)), GlobalSize(medium.hGlobal));
        GlobalUnlock(medium.hGlobal);
        ReleaseStgMedium(&medium);
        return bytes;
    }

    CReceiversPidlMgr mgr;
    ComPtr<ComObject<CCalvexReceiversDataObject>> object;
};

TEST_F(DataObjectTest, DescriptorRecordsFollowTheItems) {
    UniquePidl file = File(L"Calvex Receivers\\1-2!Q9!USB\\LOG0001.qpr", 1234);
    UniquePidl nested = File(L"Calvex Receivers\\1-2!Q9!USB\\dir\\DATA.QPR", 7);
    UniquePidl receiver(mgr, mgr.CreateFromPath(L"Calvex Receivers\\1-2!Q9!USB", BrandCalvex));
    for (LPCITEMIDLIST item : {file.Get(), receiver.Get(), nested.Get()})
        ASSERT_EQ(S_OK, object->AddPidl(item, nullptr));
    const std::string block = Block(CFSTR_FILEDESCRIPTORW);
    ASSERT_EQ(4u + 592u * 3u, block.size());
    EXPECT_EQ(3u, reinterpret_cast<const FILEGROUPDESCRIPTORW*>(block.data())->cItems);
    FILETIME time = {};
    SystemTimeToFileTime(&kFileTime, &time);  // the device's time as it stands, no zone shift
    const struct { const wchar_t* name; DWORD flags, size; FILETIME time; } expected[] = {
        {L"LOG0001.qpr", 0x60, 1234, time}, {L"", 0, 0, {0, 0}}, {L"dir\\DATA.QPR", 0x60, 7, time}};
    for (UINT i = 0; i < 3; ++i) {
        // flags, clsid, sizel, pointl, attributes, three times, size high and low; the rest zero
        FILEDESCRIPTORW record = {expected[i].flags, {}, {}, {}, 0, {}, {}, expected[i].time, 0, expected[i].size};
        lstrcpynW(record.cFileName, expected[i].name, MAX_PATH);
        EXPECT_EQ(0, memcmp(&record, block.data() + 4 + i * sizeof(record), sizeof(record))) << i;
    }
}

TEST_F(DataObjectTest, IdListArrayHoldsTheParentThenEachLastItem) {
    UniquePidl first = File(L"Calvex Receivers\\1-2!Q9!USB\\A.qpr", 1);
    UniquePidl second = File(L"Calvex Receivers\\1-2!Q9!USB\\LONGER NAME.qpr", 2);
    object->AddPidl(first.Get(), nullptr);
    object->AddPidl(second.Get(), nullptr);
    LPCITEMIDLIST a = mgr.GetLastItem(first.Get()), b = mgr.GetLastItem(second.Get());
    const UINT sizeA = mgr.GetSize(a), parentSize = mgr.GetSize(first.Get()) - sizeA + 2;  // first, less its file
    const UINT header[] = {2, 16, 16 + parentSize, 16 + parentSize + sizeA};  // cidl, then the offsets
    const std::string parent = Raw(first.Get(), parentSize - 2) + Raw("\0", 2);
    EXPECT_EQ(Raw(header, 16) + parent + Raw(a, sizeA) + Raw(b, mgr.GetSize(b)), Block(CFSTR_SHELLIDLIST));
}

TEST_F(DataObjectTest, GetDataResultsWithoutADevice) {
    UniquePidl receiver(mgr, mgr.CreateFromPath(L"Calvex Receivers\\1-2!Q9!USB", BrandCalvex));
    const struct { const char* name; bool withItem; const wchar_t* format; DWORD tymed; LONG index; HRESULT expected; }
    cases[] = {
        {"empty descriptor", false, CFSTR_FILEDESCRIPTORW, TYMED_HGLOBAL, -1, S_FALSE},
        {"empty id list array", false, CFSTR_SHELLIDLIST, TYMED_HGLOBAL, -1, S_FALSE},
        {"contents of a receiver", true, CFSTR_FILECONTENTS, TYMED_ISTREAM | TYMED_HGLOBAL, 0, S_FALSE},
        {"contents index = count", true, CFSTR_FILECONTENTS, TYMED_ISTREAM, 1, S_FALSE},
        {"contents as hglobal", true, CFSTR_FILECONTENTS, TYMED_HGLOBAL, 0, E_INVALIDARG},
        {"descriptor with a mask", true, CFSTR_FILEDESCRIPTORW, TYMED_HGLOBAL | TYMED_ISTREAM, -1, E_INVALIDARG},
        {"narrow descriptor", true, CFSTR_FILEDESCRIPTORA, TYMED_HGLOBAL, -1, E_INVALIDARG},
        {"drop effect as stream", false, CFSTR_PREFERREDDROPEFFECT, TYMED_ISTREAM, -1, E_INVALIDARG},
    };
    for (const auto& c : cases) {
        ComPtr<ComObject<CCalvexReceiversDataObject>> fresh;
        ASSERT_EQ(S_OK, CreateComObject<CCalvexReceiversDataObject>(&fresh));
        if (c.withItem) fresh->AddPidl(receiver.Get(), nullptr);
        FORMATETC etc = Etc(c.format, c.tymed, c.index);
        STGMEDIUM medium = {};
        EXPECT_EQ(c.expected, fresh->GetData(&etc, &medium)) << c.name;
        EXPECT_EQ(static_cast<DWORD>(TYMED_NULL), medium.tymed) << c.name;
    }
}

TEST_F(DataObjectTest, QueryGetDataSetDataAndTheDropEffectOfAnEmptyObject) {
    const struct { const wchar_t* format; DWORD tymed; HRESULT expected; } cases[] = {
        {CFSTR_FILECONTENTS, TYMED_HGLOBAL | TYMED_ISTREAM, S_OK}, {CFSTR_FILECONTENTS, TYMED_HGLOBAL, S_FALSE},
        {CFSTR_FILEDESCRIPTORW, TYMED_HGLOBAL, S_OK}, {CFSTR_FILEDESCRIPTORW, TYMED_HGLOBAL | TYMED_ISTREAM, S_FALSE},
        {CFSTR_SHELLIDLIST, TYMED_HGLOBAL, S_OK}, {CFSTR_PREFERREDDROPEFFECT, TYMED_HGLOBAL, S_OK},
        {CFSTR_PERFORMEDDROPEFFECT, TYMED_HGLOBAL, S_FALSE}, {L"UniformResourceLocatorW", TYMED_HGLOBAL, S_FALSE},
    };
    for (const auto& c : cases) {
        FORMATETC etc = Etc(c.format, c.tymed);
        EXPECT_EQ(c.expected, object->QueryGetData(&etc)) << testing::PrintToString(std::wstring(c.format));
    }
    FORMATETC performed = Etc(CFSTR_PERFORMEDDROPEFFECT, TYMED_HGLOBAL);
    STGMEDIUM medium = {TYMED_HGLOBAL};
    medium.hGlobal = GlobalAlloc(GMEM_MOVEABLE, 4);
    EXPECT_EQ(S_OK, object->SetData(&performed, &medium, TRUE));
    EXPECT_EQ(S_FALSE, object->QueryGetData(&performed)) << "set data is forgotten";
    EXPECT_EQ(4u, GlobalSize(medium.hGlobal)) << "and not released";
    GlobalFree(medium.hGlobal);
    EXPECT_EQ(std::string("\x01\0\0\0", 4), Block(CFSTR_PREFERREDDROPEFFECT)) << "DROPEFFECT_COPY";
}

TEST_F(DataObjectTest, EnumeratorListsThreeFormatsWithItsOwnResults) {
    ComPtr<IEnumFORMATETC> formats;
    ASSERT_EQ(S_OK, object->EnumFormatEtc(DATADIR_SET, &formats));
    FORMATETC got[4] = {};
    ULONG fetched = 9;
    EXPECT_EQ(S_OK, formats->Next(4, got, &fetched)) << "a short batch is still S_OK";
    ASSERT_EQ(3u, fetched);
    const wchar_t* names[] = {CFSTR_FILECONTENTS, CFSTR_FILEDESCRIPTORW, CFSTR_SHELLIDLIST};
    const DWORD tymeds[] = {TYMED_ISTREAM, TYMED_HGLOBAL, TYMED_HGLOBAL};
    for (int i = 0; i < 3; ++i) {
        EXPECT_TRUE(got[i].cfFormat == Format(names[i]) && got[i].tymed == tymeds[i] && got[i].lindex == -1 &&
                    got[i].dwAspect == DVASPECT_CONTENT && !got[i].ptd) << i;
    }
    EXPECT_EQ(S_FALSE, formats->Next(1, got, &fetched));
    EXPECT_EQ(0u, fetched);
    formats->Reset();
    EXPECT_EQ(E_POINTER, formats->Next(2, got, nullptr));
    EXPECT_EQ(S_FALSE, formats->Skip(3)) << "skipping exactly to the end is refused";
    EXPECT_EQ(S_OK, formats->Skip(2));
    ComPtr<IEnumFORMATETC> clone;
    ASSERT_EQ(S_OK, formats->Clone(&clone));
    ASSERT_EQ(S_OK, clone->Next(1, got, nullptr)) << "the clone keeps the cursor";
    EXPECT_EQ(Format(CFSTR_SHELLIDLIST), got[0].cfFormat);
}

TEST_F(DataObjectTest, DropSourceAnswersAndInterfaces) {
    const struct { BOOL escape; DWORD keys; HRESULT expected; } cases[] = {
        {TRUE, 0, DRAGDROP_S_CANCEL}, {TRUE, MK_LBUTTON, DRAGDROP_S_CANCEL}, {FALSE, MK_LBUTTON, S_OK},
        {FALSE, 0, DRAGDROP_S_DROP},  {FALSE, MK_RBUTTON, DRAGDROP_S_DROP},
    };
    for (const auto& c : cases) EXPECT_EQ(c.expected, object->QueryContinueDrag(c.escape, c.keys)) << c.keys;
    EXPECT_EQ(DRAGDROP_S_USEDEFAULTCURSORS, object->GiveFeedback(DROPEFFECT_NONE));
    ComPtr<IUnknown> async;  // nothing asynchronous: drop targets then extract synchronously
    EXPECT_EQ(E_NOINTERFACE, object->QueryInterface(IID_IDataObjectAsyncCapability, async.PutVoid()));
}

TEST(TransferNamesTest, NamesFromTheItemPath) {
    const struct { const wchar_t* path, *transfer, *device, *shown; } cases[] = {
        {L"R\\1!M!USB\\DATA.QPR", L"DATA.QPR", L"DATA", L"DATA.QPR"},
        {L"R\\1!M!USB\\DATA.txt", L"DATA.txt", L"DATA.txt", L"DATA.txt"},
        {L"R\\1!M!USB\\DATA", L"DATA", L"DATA", L"DATA"},
        {L"R\\1!M!USB\\d.qpr/x", L"d.qpr\\x", L"d.qpr\\x", L"x"},
        {L"R\\1!M!USB", L"", L"", L"1!M!USB"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::PrintToString(std::wstring(c.path)));
        EXPECT_EQ(c.transfer, TransferFileName(c.path));
        EXPECT_EQ(c.device, DeviceFileName(c.path));
        EXPECT_EQ(c.shown, ShownFileName(c.path));
    }
}
}  // namespace
