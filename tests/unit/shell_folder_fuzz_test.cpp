// Guards the folder's entry points against identifiers from outside: lists of the right
// overall shape but wrong inside (counts below the fixed fields, names without terminator,
// counts wrapped by long names), whole lists of any kind at any level, deep or long, and
// random bytes, each against a no-access page so that a read of one byte past it faults at
// once. Damaged lists are refused; whole ones get the answer their kinds give. A failure or a fault prints the case's seed: CALVEX_FUZZ_SEED=<seed>
// CALVEX_FUZZ_CASES=1 runs that case alone.
#include <shlobj.h>
#include <shlwapi.h>

#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <random>
#include <string>
#include <vector>

#include "com/ComPtr.h"
#include "folder/CBrennorReceiversShellFolder.h"
#include "folder/CCalvexReceiversShellFolder.h"
#include "module/ModuleApp.h"
#include "raw_pidls.h"

namespace {
using rawpidl::RawItem;

std::string g_case;  // the case running now, printed if it faults
LPTOP_LEVEL_EXCEPTION_FILTER g_previousFilter = nullptr;
LONG WINAPI ReportCase(EXCEPTION_POINTERS* info) {
    fprintf(stderr, "fault while running %s\n", g_case.c_str());
    fflush(stderr);
    return g_previousFilter ? g_previousFilter(info) : EXCEPTION_CONTINUE_SEARCH;
}

unsigned EnvNumber(const char* name, unsigned fallback) {
    const char* value = getenv(name);
    return value && *value ? static_cast<unsigned>(strtoul(value, nullptr, 10)) : fallback;
}

enum Shape { Whole, ShortCount, Unterminated, Wrapped, AnyKind, Deep, Long, RandomBytes, ShapeCount };
const char* const kShapes[] = {"whole", "short count", "unterminated name", "wrapped count", "any kind at any level", "deep", "long", "random bytes"};
bool IsDamaged(Shape shape) { return shape == ShortCount || shape == Unterminated || shape == Wrapped; }

// What a whole selection's kinds give, worked out apart from the folder's own code.
SFGAOF AttributesOf(DWORD lastKind) {
    if (lastKind == 6) return SFGAO_REMOVABLE | SFGAO_CANCOPY;
    if (lastKind == 3 || lastKind == 4) return SFGAO_FOLDER | SFGAO_REMOVABLE;
    return SFGAO_HASSUBFOLDER | SFGAO_FOLDER | SFGAO_REMOVABLE;
}
enum Entry { Attributes, Compare, DisplayName, UIObject, Bind, EntryCount };
const char* const kEntries[] = {"GetAttributesOf", "CompareIDs", "GetDisplayNameOf", "GetUIObjectOf", "BindToObject"};

// The lists of one case, drawn from its seed, for a folder of receivers or of files.
class ListMaker {
public:
    ListMaker(std::mt19937& random, bool filesLevel) : m_random(random), m_filesLevel(filesLevel) {}
    int Int(int low, int high) { return std::uniform_int_distribution<int>(low, high)(m_random); }
    std::vector<RawItem> Items(Shape shape);

private:
    std::wstring Name(size_t length) {
        static const wchar_t alphabet[] = L"!#@/\\.-_ aZ09\x00e9\x4e2d\xd83d\xde00";
        std::wstring name(length, L'x');
        for (wchar_t& unit : name) unit = alphabet[Int(0, static_cast<int>(wcslen(alphabet)) - 1)];
        return name;
    }
    RawItem Item(DWORD type) { return rawpidl::Whole(type, Name(Int(0, 40)), Int(0, 1 << 20), Int(0, 50000) + Int(0, 999) / 1000.0); }
    // What the folder holds: a file at the files level; a receiver, or one and a file below it.
    std::vector<RawItem> Held() {
        if (m_filesLevel) return {Item(ItemTypeFile)};
        std::vector<RawItem> items = {Item(static_cast<DWORD>(Int(3, 4)))};
        if (Int(0, 1)) items.push_back(Item(ItemTypeFile));
        return items;
    }
    std::mt19937& m_random;
    bool m_filesLevel;
};

std::vector<RawItem> ListMaker::Items(Shape shape) {
    std::vector<RawItem> items = Held();
    RawItem& last = items.back();
    if (shape == ShortCount) last.cb = static_cast<USHORT>(Int(1, 19));
    if (shape == Unterminated) {  // no zero unit anywhere inside the count
        last.terminated = false;
        last.cb = static_cast<USHORT>(Int(20, static_cast<int>(18 + (last.name.size() + 1) * 2 + 9)));
    }
    if (shape == Wrapped) {  // built as if the count were not checked: (n + 1) * 2 + 27 past 65535
        last.name = Name(Int(32754, 32780));
        last.cb = static_cast<USHORT>((last.name.size() + 1) * 2 + 27);
    }
    if (shape == AnyKind) {
        const DWORD kinds[] = {0, 1, 2, 3, 4, 5, 6, 7, 0xFFFFFFFF};
        for (RawItem& item : items) item.type = kinds[Int(0, 8)];
    }
    if (shape == Deep || shape == Long) {  // items go on past the file
        if (!m_filesLevel && items.size() == 1) items.push_back(Item(ItemTypeFile));
        for (int extra = shape == Deep ? Int(1, 40) : Int(200, 2000); extra > 0; --extra) items.push_back(Item(Int(0, 7)));
    }
    if (shape == RandomBytes) {
        items.clear();
        for (int count = Int(1, 4); count > 0; --count) {
            RawItem item{static_cast<USHORT>(Int(count == 1 ? 1 : 2, 80)), static_cast<DWORD>(Int(0, 8)), Name(Int(0, 30))};
            item.terminated = Int(0, 1);
            for (wchar_t& unit : item.name) unit = Int(0, 9) ? unit : L'\0';
            items.push_back(item);
        }
    }
    return items;
}

class ShellFolderFuzzTest : public testing::Test {
protected:
    static void SetUpTestSuite() {
        ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized());
        g_previousFilter = SetUnhandledExceptionFilter(ReportCase);
    }
    static void TearDownTestSuite() { SetUnhandledExceptionFilter(g_previousFilter); }

    // A root as Explorer makes it, or a receiver folder below one as BindToObject makes it.
    template <class T>
    ComPtr<ComObject<T>> MakeFolder(IReceiversShellFolderImpl* parent = nullptr, LPCITEMIDLIST pidl = nullptr) {
        ComPtr<ComObject<T>> folder;
        EXPECT_EQ(S_OK, CreateComObject<T>(&folder));
        if (folder) { EXPECT_EQ(S_OK, parent ? folder->Init(parent, pidl) : folder->Initialize(nullptr)); }
        return folder;
    }
    void Run(unsigned seed);
    void Call(ListMaker& random, Entry entry, IShellFolder* folder, LPCITEMIDLIST list, LPCITEMIDLIST whole, bool damaged);
    void CallWhole(ListMaker& random, Entry entry, IShellFolder* folder, LPCITEMIDLIST list, LPCITEMIDLIST whole);
    void Expect(bool ok, const char* what) {
        if (!ok && ++failures <= 20) ADD_FAILURE() << what << " in " << g_case;
    }

    CReceiversPidlMgr mgr;
    ComPtr<ComObject<CCalvexReceiversShellFolder>> calvex = MakeFolder<CCalvexReceiversShellFolder>();
    ComPtr<ComObject<CBrennorReceiversShellFolder>> brennor = MakeFolder<CBrennorReceiversShellFolder>();
    UniquePidl receiverItem{mgr, mgr.Create(ItemTypeCalvexReceiver, L"123!Z#5!COM3")};
    ComPtr<ComObject<CCalvexReceiversShellFolder>> receiver = MakeFolder<CCalvexReceiversShellFolder>(calvex.Get(), receiverItem.Get());
    int failures = 0;
};

void ShellFolderFuzzTest::Run(unsigned seed) {
    std::mt19937 generator(seed);
    const int folderIndex = std::uniform_int_distribution<int>(0, 2)(generator);
    ListMaker random(generator, folderIndex == 2);
    const Shape shape = static_cast<Shape>(random.Int(0, ShapeCount - 1));
    const Entry entry = static_cast<Entry>(random.Int(0, EntryCount - 1));
    rawpidl::Guarded list(rawpidl::Bytes(random.Items(shape)));
    rawpidl::Guarded whole(rawpidl::Bytes({rawpidl::Whole(folderIndex == 2 ? ItemTypeFile : ItemTypeCalvexReceiver, L"W", 7, 40000)}));
    IShellFolder* folders[] = {calvex.Get(), brennor.Get(), receiver.Get()};
    const char* folderNames[] = {"Calvex root", "Brennor root", "receiver"};
    g_case = "seed " + std::to_string(seed) + ": " + kShapes[shape] + " list to " + kEntries[entry] + " of the " +
             folderNames[folderIndex] + " folder: " + list.Hex();
    // Whole lists of any kinds get what their kinds give, damaged ones are refused; random
    // bytes may be either, but are never read past.
    if (shape == RandomBytes || IsDamaged(shape)) Call(random, entry, folders[folderIndex], list.Get(), whole.Get(), shape != RandomBytes);
    else CallWhole(random, entry, folders[folderIndex], list.Get(), whole.Get());
}

void ShellFolderFuzzTest::Call(ListMaker& random, Entry entry, IShellFolder* folder, LPCITEMIDLIST list,
                               LPCITEMIDLIST whole, bool damaged) {
    LPCITEMIDLIST lists[] = {whole, list};
    void* object = nullptr;
    HRESULT hr = S_OK;
    if (entry == Attributes) {
        SFGAOF attributes = 0;
        const UINT count = static_cast<UINT>(random.Int(1, 2));  // alone, or after a whole item
        hr = folder->GetAttributesOf(count, &lists[2 - count], &attributes);
        if (damaged) Expect(hr == E_INVALIDARG && attributes == 0, "attributes");
    } else if (entry == Compare) {
        const LPARAM column = random.Int(-3, 3);
        const HRESULT forth = folder->CompareIDs(column, list, whole), back = folder->CompareIDs(column, whole, list);
        const HRESULT self = folder->CompareIDs(column, list, list);
        if (damaged) Expect(forth == 1 && back == -1 && self == 0, "a damaged item sorts last");
    } else if (entry == DisplayName) {
        const SHGDNF flags[] = {SHGDN_NORMAL, SHGDN_INFOLDER, SHGDN_FORPARSING, SHGDN_FORPARSING | SHGDN_INFOLDER};
        STRRET name = {};
        wchar_t small[8];
        hr = folder->GetDisplayNameOf(list, flags[random.Int(0, 3)], &name);
        if (hr == S_OK) StrRetToBufW(&name, list, small, random.Int(1, 8));
        if (damaged) Expect(hr == E_INVALIDARG, "display name");
    } else {
        const IID* iids[] = {&IID_IExtractIconW, &IID_IQueryInfo, &IID_IContextMenu, &IID_IDataObject};
        hr = entry == Bind ? folder->BindToObject(list, nullptr, IID_IShellFolder, &object)
                           : folder->GetUIObjectOf(nullptr, 1, &lists[1], *iids[random.Int(0, 3)], nullptr, &object);
        if (object) static_cast<IUnknown*>(object)->Release();
        if (damaged) Expect(hr == E_INVALIDARG && !object, "item object or bind");
    }
}

void ShellFolderFuzzTest::CallWhole(ListMaker& random, Entry entry, IShellFolder* folder, LPCITEMIDLIST list,
                                    LPCITEMIDLIST whole) {
    const DWORD last = mgr.GetLastItemType(list);
    void* object = nullptr;
    if (entry == Attributes) {
        LPCITEMIDLIST lists[] = {whole, list};
        SFGAOF attributes = SFGAO_CANDELETE;
        const UINT count = static_cast<UINT>(random.Int(1, 2));  // alone, or after a whole item
        const SFGAOF expected = AttributesOf(last) & (count == 2 ? AttributesOf(mgr.GetLastItemType(whole)) : ~0u);
        Expect(folder->GetAttributesOf(count, &lists[2 - count], &attributes) == S_OK && attributes == expected, "attributes of the kinds");
    } else if (entry == Compare) {
        const LPARAM column = random.Int(-3, 3);
        const HRESULT forth = folder->CompareIDs(column, list, whole), back = folder->CompareIDs(column, whole, list);
        if (mgr.GetData(list)->type != mgr.GetData(whole)->type) Expect(forth == 0 && back == 0, "kinds differ: equal");
        else if (column == 0 || column == 1 || column == -1) Expect((forth > 0) == (back < 0), "names compare both ways alike");
    } else if (entry == DisplayName) {
        STRRET name = {};
        const HRESULT hr = folder->GetDisplayNameOf(list, random.Int(0, 1) ? SHGDN_FORPARSING : SHGDN_NORMAL, &name);
        if (hr == S_OK && name.uType == STRRET_WSTR) CoTaskMemFree(name.pOleStr);
        // Only a receiver whose key has fewer than two fields names nothing; that is still S_OK.
        Expect(hr == S_OK, "display name");
    } else if (entry == UIObject) {
        LPCITEMIDLIST lists[] = {list};
        const IID* iids[] = {&IID_IExtractIconW, &IID_IQueryInfo, &IID_IContextMenu};
        Expect(folder->GetUIObjectOf(nullptr, 1, lists, *iids[random.Int(0, 2)], nullptr, &object) == S_OK && object, "item object");
    } else {
        const HRESULT hr = folder->BindToObject(list, nullptr, IID_IShellFolder, &object);
        if (last == 6) Expect(hr == E_INVALIDARG && !object, "a file is no folder");
    }
    if (object) static_cast<IUnknown*>(object)->Release();
}
}  // namespace

TEST_F(ShellFolderFuzzTest, NoEntryPointReadsPastAnIdentifierFromOutside) {
    const unsigned seed = EnvNumber("CALVEX_FUZZ_SEED", 20261125), cases = EnvNumber("CALVEX_FUZZ_CASES", 3000);
    for (unsigned i = 0; i < cases && failures <= 20; ++i) Run(seed + i);
    EXPECT_EQ(0, failures);
}
