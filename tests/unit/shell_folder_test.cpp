// Guards the folder's answers without a device manager: wrong parse, compare, name, attribute, path or identity results, wrong item objects, operations not refused.
#include <shlobj.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "com/ComPtr.h"
#include "folder/CBrennorReceiversShellFolder.h"
#include "folder/CCalvexReceiversShellFolder.h"
#include "module/ClassIds.h"
#include "module/ModuleApp.h"
#include "raw_pidls.h"
#include "transfer/CCalvexReceiversDataObject.h"
#include "support/TestSupport.h"

namespace {
const wchar_t kKey[] = L"123!Z#5!COM3";
const wchar_t kCalvexRoot[] = L"::{E102076F-4057-4e7f-8209-511258F12B62}";

// A folder as Explorer gets it (made, then Initialize), or a receiver folder below a root
// as BindToObject makes it, but without binding to the device manager.
template <class T>
ComPtr<ComObject<T>> MakeFolder(IReceiversShellFolderImpl* parent = nullptr, LPCITEMIDLIST pidl = nullptr) {
    ComPtr<ComObject<T>> folder;
    EXPECT_EQ(S_OK, CreateComObject<T>(&folder));
    EXPECT_EQ(S_OK, parent ? folder->Init(parent, pidl) : folder->Initialize(nullptr));
    return folder;
}

class ShellFolderTest : public testing::Test {
protected:
    static void SetUpTestSuite() { ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized()); }  // the trace file
    UniquePidl Item(DWORD type, const wchar_t* name, DWORD size = 0, DATE time = 0) {
        UniquePidl item(mgr, mgr.Create(type, name));
        if (ReceiverItemData* data = mgr.GetData(item.Get())) {
            data->size = size;
            data->time = time;
        }
        return item;
    }
    CReceiversPidlMgr mgr;
    UniquePidl receiverItem = Item(3, kKey), file = Item(6, L"FILE.qpr");
    ComPtr<ComObject<CCalvexReceiversShellFolder>> root = MakeFolder<CCalvexReceiversShellFolder>();
    ComPtr<ComObject<CBrennorReceiversShellFolder>> brennor = MakeFolder<CBrennorReceiversShellFolder>();
    ComPtr<ComObject<CCalvexReceiversShellFolder>> receiver =
        MakeFolder<CCalvexReceiversShellFolder>(root.Get(), receiverItem.Get());
};
}  // namespace

// Every whole item gets what its kind gives, at either level: the folder does not judge which
// kinds belong where (a saved selection may mix them).
TEST_F(ShellFolderTest, GetAttributesOfReplacesTheMaskWithWhatAllItemsShare) {
    UniquePidl brennorItem = Item(4, kKey), rootItem = Item(1, L"Calvex Receivers"), noItem = Item(5, kKey);
    UniquePidl unknown = Item(0x77, kKey), receiverFile(mgr, mgr.Concatenate(receiverItem.Get(), file.Get()));
    struct { std::vector<LPCITEMIDLIST> items; SFGAOF expected; } cases[] = {
        {{}, 0xFFFFFFFF},
        {{file.Get()}, 0x02000001},
        {{receiverItem.Get()}, 0x22000000},
        {{brennorItem.Get(), receiverItem.Get()}, 0x22000000},
        {{rootItem.Get()}, 0xA2000000},
        {{noItem.Get()}, 0xA2000000},
        {{unknown.Get()}, 0xA2000000},
        {{receiverItem.Get(), file.Get()}, 0x02000000},
        {{receiverItem.Get(), receiverFile.Get()}, 0x02000000},  // a receiver and a file below one
    };
    for (IShellFolder* folder : {static_cast<IShellFolder*>(root.Get()), static_cast<IShellFolder*>(receiver.Get())}) {
        for (const auto& c : cases) {
            SCOPED_TRACE(testing::Message() << (folder == root.Get() ? "brand folder, row " : "receiver folder, row ") << &c - cases);
            SFGAOF attributes = SFGAO_CANDELETE | SFGAO_CANMOVE;  // asked for, and ignored
            EXPECT_EQ(S_OK, folder->GetAttributesOf(static_cast<UINT>(c.items.size()),
                                                    const_cast<LPCITEMIDLIST*>(c.items.data()), &attributes));
            EXPECT_EQ(c.expected, attributes);
            EXPECT_TRUE(testsupport::TraceContains("IReceiversShellFolderImpl::GetAttributesOf - attributes is collected [" +
                                                   std::to_string(c.expected) + "]\r\n"));
        }
    }
    LPCITEMIDLIST one[] = {file.Get()};
    EXPECT_EQ(S_FALSE, receiver->GetAttributesOf(1, one, nullptr));
}

TEST_F(ShellFolderTest, CompareIDsReturnsTheProductWithTheSignedColumn) {
    UniquePidl big = Item(6, L"B.qpr", 10, 40000.5), small = Item(6, L"A.qpr", 3, 40000.5);
    UniquePidl later = Item(6, L"C.qpr", 3, 40001.0), huge = Item(6, L"H.qpr", 0x80000000u, 0);
    UniquePidl one = Item(6, L"O.qpr", 1, 0), receiverA = Item(3, L"ABC!m!p"), receiverB = Item(3, L"abd!m!p");
    UniquePidl receiverA2 = Item(3, L"abc!M!P"), brennorA = Item(4, L"ABC!m!p");
    UniquePidl hundred = Item(6, L"D.qpr", 100, 40000), fifty = Item(6, L"E.qpr", 50, 40000);
    struct { LPARAM lParam; LPCITEMIDLIST first, second; HRESULT expected; } cases[] = {
        {2, big.Get(), small.Get(), 14},                 // 7 * 2
        {-2, big.Get(), small.Get(), -14},               // descending: a larger first size is negative
        {2, hundred.Get(), fifty.Get(), 100},
        {-2, hundred.Get(), fifty.Get(), -100},
        {2, huge.Get(), one.Get(), -2},  // 0x7FFFFFFF (32-bit difference) * 2, low 32 bits
        {3, big.Get(), small.Get(), 3},                  // equal times are +1 ...
        {3, small.Get(), big.Get(), 3},                  // ... in both orders
        {3, big.Get(), later.Get(), -3},
        {3, later.Get(), big.Get(), 3},
        {2, receiverA.Get(), receiverB.Get(), 0},   // size and time only for files
        {0, receiverA.Get(), brennorA.Get(), 0},    // different kinds
        {1, big.Get(), receiverA.Get(), 0},
        {0, receiverA.Get(), receiverA2.Get(), 0},  // names ignore case
    };
    // The same at the brand folder and in a receiver: kinds decide, not the level.
    for (IShellFolder* folder : {static_cast<IShellFolder*>(root.Get()), static_cast<IShellFolder*>(receiver.Get())}) {
        for (const auto& c : cases) {
            SCOPED_TRACE(testing::Message() << "lParam " << c.lParam << " expected " << c.expected);
            EXPECT_EQ(c.expected, folder->CompareIDs(c.lParam, c.first, c.second));
        }
        // Names: the sign of _wcsicmp, multiplied out.
        EXPECT_GT(folder->CompareIDs(1, big.Get(), small.Get()), 0);
        EXPECT_LT(folder->CompareIDs(1, small.Get(), big.Get()), 0);
        const HRESULT ascending = folder->CompareIDs(0, receiverA.Get(), receiverB.Get());
        EXPECT_LT(ascending, 0);
        EXPECT_EQ(-ascending, folder->CompareIDs(-1, receiverA.Get(), receiverB.Get()));
        EXPECT_EQ(ascending * 4, folder->CompareIDs(4, receiverA.Get(), receiverB.Get()));
    }
    EXPECT_TRUE(testsupport::TraceContains("IReceiversShellFolderImpl::CompareIDs ID1=ABC!m!p, ID2=abd!m!p\r\n"));
    EXPECT_TRUE(testsupport::TraceContains("IReceiversShellFolderImpl::CompareIDs ID1=B.qpr, ID2=A.qpr\r\n"));
}

// An item's icon is its kind less one, whichever folder it is handed to.
TEST_F(ShellFolderTest, EveryKindGetsItsIconAtBothLevels) {
    for (IShellFolder* folder : {static_cast<IShellFolder*>(root.Get()), static_cast<IShellFolder*>(receiver.Get())}) {
        for (DWORD kind : {1u, 2u, 3u, 4u, 5u, 6u, 9u}) {
            UniquePidl item = Item(kind, kKey);
            LPCITEMIDLIST items[] = {item.Get()};
            ComPtr<IExtractIconW> icon;
            ASSERT_EQ(S_OK, folder->GetUIObjectOf(nullptr, 1, items, IID_IExtractIconW, nullptr, icon.PutVoid())) << kind;
            int index = -99;
            UINT flags = 0;
            EXPECT_EQ(S_OK, icon->GetIconLocation(0, nullptr, 0, &index, &flags));
            EXPECT_EQ(static_cast<int>(kind) - 1, index) << kind;
        }
    }
}

TEST_F(ShellFolderTest, ParseDisplayNameGivesTheItemsTheNameNames) {
    struct { IShellFolder* folder; const wchar_t* name; HRESULT result; UINT count; DWORD type; const wchar_t* itemName; } cases[] = {
        {root.Get(), kKey, S_OK, 1, 3, kKey},
        {root.Get(), L"//123!Z#5!COM3\\", S_OK, 1, 3, kKey},
        {brennor.Get(), kKey, S_OK, 1, 4, kKey},
        {receiver.Get(), L"FILE.qpr", S_OK, 1, 6, L"FILE.qpr"},
        {root.Get(), L"a\\b\\c", E_INVALIDARG, 0, 0, nullptr},  // the file part b\c is one item
        {root.Get(), L"\\", S_OK, 0, 0, nullptr},  // no part: success without a list
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message() << testsupport::Narrow(c.name));
        LPITEMIDLIST pidl = reinterpret_cast<LPITEMIDLIST>(1);
        ULONG eaten = 77, attributes = 88;
        std::wstring name = c.name;
        EXPECT_EQ(c.result, c.folder->ParseDisplayName(nullptr, nullptr, &name[0], &eaten, &pidl, &attributes));
        EXPECT_EQ(77u, eaten);
        EXPECT_EQ(88u, attributes);
        UniquePidl owned(mgr, pidl);
        ASSERT_EQ(c.count, mgr.GetItemCount(pidl));
        if (c.count) { EXPECT_EQ(std::to_wstring(c.type) + c.itemName, std::to_wstring(mgr.GetLastItemType(pidl)) + mgr.GetItemName(pidl)); }
    }
    EXPECT_TRUE(testsupport::TraceContains("IReceiversShellFolderImpl::ParseDisplayName - nParts [3] >= nItems [3]\r\n"));
}

TEST_F(ShellFolderTest, GetDisplayNameOfFollowsTheFlags) {
    const std::wstring calvexParsing = std::wstring(kCalvexRoot) + L"\\" + kKey;
    struct { IShellFolder* folder; LPCITEMIDLIST item; SHGDNF flags; HRESULT result; std::wstring name; } cases[] = {
        {root.Get(), receiverItem.Get(), SHGDN_NORMAL, S_OK, L"Z/5@COM3"},
        {root.Get(), receiverItem.Get(), SHGDN_FORADDRESSBAR | SHGDN_INFOLDER, S_OK, L"Z/5@COM3"},
        {root.Get(), receiverItem.Get(), SHGDN_FORPARSING, S_OK, calvexParsing},
        {root.Get(), receiverItem.Get(), SHGDN_FORPARSING | SHGDN_INFOLDER, S_OK, kKey},
        {root.Get(), receiverItem.Get(), SHGDN_FORPARSING | 2, S_OK, L""},
        {root.Get(), receiverItem.Get(), SHGDN_FORPARSING | SHGDN_FORADDRESSBAR, E_INVALIDARG, L""},
        {root.Get(), receiverItem.Get(), SHGDN_FOREDITING, E_INVALIDARG, L""},
        {root.Get(), receiverItem.Get(), 2, E_INVALIDARG, L""},
        {brennor.Get(), receiverItem.Get(), SHGDN_FORPARSING,
         S_OK, std::wstring(L"::{E65CDE76-B4FC-447f-A9DD-A011176B14E7}\\") + kKey},
        {receiver.Get(), file.Get(), SHGDN_FORPARSING, S_OK, calvexParsing + L"\\FILE.qpr"},
        {receiver.Get(), file.Get(), SHGDN_NORMAL, S_OK, L"FILE.qpr"},
        {root.Get(), file.Get(), SHGDN_FORPARSING, S_OK, std::wstring(kCalvexRoot) + L"\\FILE.qpr"},  // any kind, any level
        {receiver.Get(), receiverItem.Get(), SHGDN_NORMAL, S_OK, L"Z/5@COM3"},
    };
    for (auto& c : cases) {
        SCOPED_TRACE(testing::Message() << "flags 0x" << std::hex << c.flags);
        STRRET name = {};
        EXPECT_EQ(c.result, c.folder->GetDisplayNameOf(c.item, c.flags, &name));
        if (c.result != S_OK) continue;
        ASSERT_EQ(UINT(STRRET_WSTR), name.uType);
        EXPECT_EQ(c.name, name.pOleStr);
        CoTaskMemFree(name.pOleStr);
    }
}

TEST_F(ShellFolderTest, BothBrandsReportTheCalvexClass) {
    for (IPersistFolder* folder : {static_cast<IPersistFolder*>(root.Get()), static_cast<IPersistFolder*>(brennor.Get())}) {
        CLSID clsid = GUID_NULL;
        EXPECT_EQ(S_OK, folder->GetClassID(&clsid));
        EXPECT_TRUE(IsEqualCLSID(CLSID_CalvexReceiversShellFolder, clsid));
        ComPtr<IUnknown> other;
        EXPECT_EQ(E_NOINTERFACE, folder->QueryInterface(IID_IPersistFolder2, other.PutVoid()));
    }
}

TEST_F(ShellFolderTest, RefusedOperations) {
    CCalvexReceiversShellFolder* folder = receiver.Get();
    LPCITEMIDLIST items[] = {file.Get(), file.Get()};
    void* object = reinterpret_cast<void*>(1);
    struct { HRESULT result; HRESULT expected; const char* trace; } cases[] = {
        {folder->BindToObject(file.Get(), nullptr, IID_IShellFolder, &object), E_INVALIDARG, nullptr},
        {folder->BindToStorage(file.Get(), nullptr, IID_IStream, &object), E_NOTIMPL, "IReceiversShellFolderImpl::BindToStorage\r\n"},
        {folder->SetNameOf(nullptr, file.Get(), L"x", 0, nullptr), E_NOTIMPL, "IReceiversShellFolderImpl::SetNameOf - NOTIMPL\r\n"},
        {folder->GetUIObjectOf(nullptr, 2, items, IID_IContextMenu, nullptr, &object), E_FAIL, nullptr},
        {folder->GetUIObjectOf(nullptr, 1, items, IID_IShellFolder, nullptr, &object), E_NOINTERFACE, nullptr},
        {folder->CreateViewObject(nullptr, IID_IDropTarget, &object), E_NOINTERFACE, nullptr},
        {folder->GetDefaultSearchGUID(nullptr), E_NOTIMPL, "IReceiversShellFolderImpl2::GetDefaultSearchGUID - NOTIMPL\r\n"},
        {folder->EnumSearches(nullptr), E_NOTIMPL, "IReceiversShellFolderImpl2::EnumSearches - NOTIMPL\r\n"},
        {folder->GetDefaultColumn(0, nullptr, nullptr), E_NOTIMPL, "IReceiversShellFolderImpl2::GetDefaultColumn - NOTIMPL\r\n"},
        {folder->GetDefaultColumnState(0, nullptr), E_NOTIMPL, "IReceiversShellFolderImpl2::GetDefaultColumnState - NOTIMPL\r\n"},
        {folder->GetDetailsEx(nullptr, nullptr, nullptr), E_NOTIMPL, "IReceiversShellFolderImpl2::GetDetailsEx - NOTIMPL\r\n"},
        {folder->GetDetailsOf(nullptr, 0, nullptr), E_NOTIMPL, "IReceiversShellFolderImpl2::GetDetailsOf - NOTMIPL\r\n"},
        {folder->MapColumnToSCID(0, nullptr), E_NOTIMPL, "IReceiversShellFolderImpl2::MapColumnToSCID - NOTIMPL\r\n"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message() << "row " << &c - cases);
        EXPECT_EQ(c.expected, c.result);
        if (c.trace) { EXPECT_TRUE(testsupport::TraceContains(c.trace)); }
    }
    EXPECT_EQ(nullptr, object);
}

TEST_F(ShellFolderTest, ItemObjectsAndPathsDescribeTheAbsoluteItem) {
    UniquePidl brennorItem = Item(4, kKey);
    auto brennorReceiver = MakeFolder<CBrennorReceiversShellFolder>(brennor.Get(), brennorItem.Get());
    wchar_t small[20];
    EXPECT_FALSE(brennorReceiver->GetFolderPath(small, 20, false)) << "16 + 1 + 12 characters do not fit in 20";
    EXPECT_STREQ(L"", small);

    LPCITEMIDLIST items[] = {file.Get()};
    ComPtr<IQueryInfo> info;
    ASSERT_EQ(S_OK, brennorReceiver->GetUIObjectOf(nullptr, 1, items, IID_IQueryInfo, nullptr, info.PutVoid()));
    LPWSTR tip = nullptr;
    ASSERT_EQ(S_OK, info->GetInfoTip(0, &tip));
    EXPECT_STREQ(L"Calvex Receivers\\123!Z#5!COM3\\FILE.qpr", tip) << "the raw stored texts of root, receiver and file";
    ComPtr<IMalloc> task;
    ASSERT_EQ(S_OK, CoGetMalloc(1, &task));
    EXPECT_EQ(task->GetSize(tip), (wcslen(tip) + 1) * sizeof(wchar_t)) << "the task allocator's, text and zero exactly";
    CoTaskMemFree(tip);
    DWORD infoFlags = 0;
    EXPECT_EQ(E_NOTIMPL, info->GetInfoFlags(&infoFlags));
}

// Identifiers from shortcuts, saved views or the clipboard may be damaged: each is refused
// with its reason in the trace, and nothing past its end is read (the byte after it faults).
TEST_F(ShellFolderTest, DamagedIdentifiersAreRefusedBeforeTheyAreRead) {
    using rawpidl::Whole;
    const std::wstring wrapped(32754, L'w');  // (n + 1) * 2 + 27 is 65537: the count says 1
    enum Call { Attributes, Compare, Name, Data, Icon, Bind };
    const char* methods[] = {"GetAttributesOf", "CompareIDs", "GetDisplayNameOf", "GetUIObjectOf", "GetUIObjectOf", "BindToObject"};
    IShellFolder *files = receiver.Get(), *top = root.Get();
    struct { IShellFolder* folder; std::vector<rawpidl::RawItem> items; Call call; const char* reason; } rows[] = {
        {files, {{17, 6, L"F"}}, Attributes, "item [0] counts [17] bytes, fewer than its fixed fields"},
        {top, {Whole(3, kKey), {1, 6, L""}}, Name, "item [1] counts [1] bytes, fewer than its fixed fields"},
        {files, {{19, 6, L""}}, Compare, "item [0] counts [19] bytes, fewer than its fixed fields"},
        {files, {{40, 6, L"ABCDEFGHIJK", false}}, Compare, "item [0] has no name terminator inside it"},
        {files, {{1, 6, wrapped}}, Data, "item [0] counts [1] bytes, fewer than its fixed fields"},
        {files, {{21, 6, wrapped}}, Compare, "item [0] has no name terminator inside it"},  // 32,764 units
        // Damage after whole items of any kind is still found where it is.
        {top, {Whole(6, L"F.qpr"), Whole(9, kKey), {12, 3, L""}}, Bind, "item [2] counts [12] bytes, fewer than its fixed fields"},
        {files, {Whole(1, L"R"), {44, 5, L"ABCDEFGHIJKLMN", false}}, Attributes, "item [1] has no name terminator inside it"},
    };
    UniquePidl whole = Item(6, L"W.qpr", 5, 40000);
    for (const auto& row : rows) {
        rawpidl::Guarded damaged(rawpidl::Bytes(row.items));
        SCOPED_TRACE(testing::Message() << row.reason << ": " << damaged.Hex());
        LPCITEMIDLIST list[] = {damaged.Get()};
        void* object = reinterpret_cast<void*>(1);
        SFGAOF attributes = SFGAO_CANCOPY;
        STRRET name = {};
        switch (row.call) {
        case Attributes:
            EXPECT_EQ(E_INVALIDARG, row.folder->GetAttributesOf(1, list, &attributes));
            EXPECT_EQ(0u, attributes);
            break;
        case Compare:  // after every whole item in every column, equal to another damaged one
            for (LPARAM column : {0, 2, 3, -2, -3}) {
                EXPECT_EQ(1, row.folder->CompareIDs(column, damaged.Get(), whole.Get())) << column;
                EXPECT_EQ(-1, row.folder->CompareIDs(column, whole.Get(), damaged.Get())) << column;
                EXPECT_EQ(0, row.folder->CompareIDs(column, damaged.Get(), damaged.Get())) << column;
            }
            break;
        case Name: EXPECT_EQ(E_INVALIDARG, row.folder->GetDisplayNameOf(damaged.Get(), SHGDN_FORPARSING, &name)); break;
        case Data: EXPECT_EQ(E_INVALIDARG, row.folder->GetUIObjectOf(nullptr, 1, list, IID_IDataObject, nullptr, &object)); break;
        case Icon: EXPECT_EQ(E_INVALIDARG, row.folder->GetUIObjectOf(nullptr, 1, list, IID_IExtractIconW, nullptr, &object)); break;
        case Bind: EXPECT_EQ(E_INVALIDARG, row.folder->BindToObject(damaged.Get(), nullptr, IID_IShellFolder, &object)); break;
        }
        if (row.call == Data || row.call == Icon || row.call == Bind) { EXPECT_EQ(nullptr, object); }
        EXPECT_TRUE(testsupport::TraceContains(std::string("IReceiversShellFolderImpl::") + methods[row.call] +
                                               " - malformed item identifier: " + row.reason + "\r\n"));
    }
}

// Explorer reads the children of a "Shell IDList Array" back into the folder; one damaged on
// the way is refused there, and Initialize never reads the absolute list it is handed.
TEST_F(ShellFolderTest, DamagedIdentifiersReadBackFromTheClipboardOrGivenToInitialize) {
    UniquePidl absolute(mgr, mgr.CreateFromPath((std::wstring(L"Calvex Receivers\\") + kKey + L"\\F.qpr").c_str(), 1));
    ComPtr<ComObject<CCalvexReceiversDataObject>> data;
    ASSERT_EQ(S_OK, CreateComObject<CCalvexReceiversDataObject>(&data));
    ASSERT_EQ(S_OK, data->AddPidl(absolute.Get(), nullptr));
    FORMATETC format = {static_cast<CLIPFORMAT>(RegisterClipboardFormatW(CFSTR_SHELLIDLIST)), nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL};
    STGMEDIUM medium = {};
    ASSERT_EQ(S_OK, data->GetData(&format, &medium));
    const auto* cida = static_cast<const CIDA*>(GlobalLock(medium.hGlobal));
    const BYTE* child = reinterpret_cast<const BYTE*>(cida) + cida->aoffset[1];
    std::vector<BYTE> bytes(child, child + mgr.GetSize(reinterpret_cast<LPCITEMIDLIST>(child)));
    GlobalUnlock(medium.hGlobal);
    ReleaseStgMedium(&medium);
    LPCITEMIDLIST readBack[] = {nullptr};
    SFGAOF attributes = 0;
    for (USHORT cb : {USHORT(bytes[0]), USHORT(9)}) {  // as written, then with its count damaged
        bytes[0] = static_cast<BYTE>(cb);
        rawpidl::Guarded guarded(bytes);
        readBack[0] = guarded.Get();
        EXPECT_EQ(cb == 9 ? E_INVALIDARG : S_OK, receiver->GetAttributesOf(1, readBack, &attributes)) << cb;
        EXPECT_EQ(cb == 9 ? 0u : 0x02000001u, attributes);
    }
    rawpidl::Guarded damaged(rawpidl::Bytes({{5, 1, L""}}));
    auto fresh = MakeFolder<CCalvexReceiversShellFolder>();
    EXPECT_EQ(S_OK, fresh->Initialize(damaged.Get()));
    EXPECT_EQ(fresh->GetFullPath(), std::wstring(L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\") + kCalvexRoot);
}
