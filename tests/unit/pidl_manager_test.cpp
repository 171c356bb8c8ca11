// Guards item identifiers: wrong bytes or sizes of an item, wrong path rules, list operations or texts, leaked lists.
#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "items/CReceiversPidlMgr.h"
#include "items/ItemPath.h"
#include "pidl_test_malloc.h"
#include "support/TestSupport.h"

namespace {
struct ItemEntry {
    DWORD type;
    const wchar_t* name;
};

class PidlManagerTest : public ::testing::Test {
protected:
    void TearDown() override { EXPECT_EQ(malloc.Outstanding(), 0u) << "a list was leaked"; }

    UniquePidl Own(LPITEMIDLIST list) { return UniquePidl(&malloc, list); }
    UniquePidl Make(const std::vector<ItemEntry>& items) {
        UniquePidl list;
        for (const ItemEntry& entry : items) {
            UniquePidl item = Own(mgr.Create(entry.type, entry.name));
            list = Own(mgr.Concatenate(list.Get(), item.Get()));
        }
        return list;
    }
    std::vector<ItemEntry> Read(LPCITEMIDLIST list) {
        std::vector<ItemEntry> items;
        names.clear();
        for (LPCITEMIDLIST item = list; mgr.GetData(item); item = mgr.GetNextItem(item))
            names.push_back(mgr.GetItemName(item));
        size_t i = 0;
        for (LPCITEMIDLIST item = list; mgr.GetData(item); item = mgr.GetNextItem(item))
            items.push_back({mgr.GetData(item)->type, names[i++].c_str()});
        return items;
    }
    void ExpectItems(LPCITEMIDLIST list, const std::vector<ItemEntry>& expected) {
        std::vector<ItemEntry> actual = Read(list);
        ASSERT_EQ(actual.size(), expected.size());
        for (size_t i = 0; i < expected.size(); ++i) {
            EXPECT_EQ(actual[i].type, expected[i].type) << "item " << i;
            EXPECT_STREQ(actual[i].name, expected[i].name) << "item " << i;
        }
    }

    GuardedMalloc malloc;
    CReceiversPidlMgr mgr{&malloc};
    std::vector<std::wstring> names;
};

const wchar_t kRoot[] = L"Calvex Receivers";
const wchar_t kKey[] = L"123!Z#5!COM3";

TEST_F(PidlManagerTest, CreateWritesTheWireLayoutAndNothingElse) {
    const struct {
        const wchar_t* name;
        USHORT cb;
    } cases[] = {{L"", 29}, {L"0123456789", 49}, {L"FILE.qpr", 45}};
    for (const auto& c : cases) {
        UniquePidl item = Own(mgr.Create(ItemTypeFile, c.name));
        ASSERT_TRUE(item);
        EXPECT_EQ(malloc.LastSize(), c.cb + 2u) << "allocation is cb + 2";
        const BYTE* bytes = reinterpret_cast<const BYTE*>(item.Get());
        USHORT cb, terminator;
        DWORD type;
        memcpy(&cb, bytes, 2);
        memcpy(&type, bytes + 2, 4);
        memcpy(&terminator, bytes + cb, 2);
        EXPECT_EQ(cb, c.cb);
        EXPECT_EQ(type, 6u);
        EXPECT_EQ(terminator, 0);
        const size_t nameBytes = (wcslen(c.name) + 1) * 2;
        EXPECT_EQ(memcmp(bytes + 18, c.name, nameBytes), 0);
        // size, time and the 9 slack bytes are never written
        for (size_t i = 6; i < 18; ++i) EXPECT_EQ(bytes[i], GuardedMalloc::kFill) << "byte " << i;
        for (size_t i = 18 + nameBytes; i < cb; ++i) EXPECT_EQ(bytes[i], GuardedMalloc::kFill) << "byte " << i;
        EXPECT_EQ(cb - (18 + nameBytes), 9u);
    }
}

TEST_F(PidlManagerTest, NamesUpToTheSixteenBitLimitOnly) {
    std::wstring longest(32753, L'x');
    UniquePidl item = Own(mgr.Create(ItemTypeFile, longest.c_str()));
    ASSERT_TRUE(item);
    EXPECT_EQ(mgr.GetSize(item.Get()), 0xFFFFu + 2);
    EXPECT_EQ(mgr.GetItemName(item.Get()), longest);
    std::wstring wrapping(32754, L'x');
    EXPECT_EQ(mgr.Create(ItemTypeFile, wrapping.c_str()), nullptr);
}

TEST_F(PidlManagerTest, RootNameDoesNotDependOnTheBrand) {
    const struct {
        DWORD brand, type;
    } cases[] = {{1, 1}, {2, 2}, {0, 1}, {7, 1}};
    for (const auto& c : cases) {
        UniquePidl root = Own(mgr.CreateRoot(c.brand));
        ExpectItems(root.Get(), {{c.type, kRoot}});
    }
}

TEST_F(PidlManagerTest, PathsGiveRootReceiverAndFile) {
    const struct {
        const wchar_t* path;
        DWORD brand;
        std::vector<ItemEntry> items;
    } cases[] = {
        {L"\\\\Calvex Receivers//123!Z#5!COM3\\\\", 1, {{1, kRoot}, {3, kKey}}},
        {L"c0/c1/c2/c3/c4", 2, {{2, L"c0"}, {4, L"c1"}, {6, L"c2\\c3\\c4"}}},
        {L"r\\k\\LOG1.qpr", 1, {{1, L"r"}, {3, L"k"}, {6, L"LOG1.qpr"}}},
        {L"/only/", 2, {{2, L"only"}}},
        {L"a\\b", 5, {{1, L"a"}, {3, L"b"}}},
        {L"", 1, {}},
        {L"\\//\\", 1, {}},
        {nullptr, 1, {}},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.path ? testsupport::Narrow(c.path) : "null");
        UniquePidl full = Own(mgr.CreateFromPath(c.path, c.brand));
        UniquePidl last = Own(mgr.CreateLastFromPath(c.path, c.brand));
        if (c.items.empty()) {
            EXPECT_FALSE(full);
            EXPECT_FALSE(last);
            continue;
        }
        ExpectItems(full.Get(), c.items);
        ExpectItems(last.Get(), {c.items.back()});
    }
}

TEST_F(PidlManagerTest, ListOperationsOnEmptyNullAndShortLists) {
    const BYTE emptyBytes[2] = {0, 0};
    auto empty = reinterpret_cast<LPCITEMIDLIST>(emptyBytes);
    UniquePidl one = Make({{1, kRoot}});
    UniquePidl three = Make({{1, kRoot}, {3, kKey}, {6, L"FILE.qpr"}});

    EXPECT_EQ(mgr.GetSize(nullptr), 0u);
    EXPECT_EQ(mgr.GetSize(empty), 2u);
    EXPECT_EQ(mgr.GetItemCount(nullptr), 0u);
    EXPECT_EQ(mgr.GetItemCount(empty), 0u);
    EXPECT_EQ(mgr.GetLastItem(nullptr), nullptr);
    EXPECT_EQ(mgr.GetLastItem(empty), nullptr);
    EXPECT_EQ(mgr.GetNextItem(nullptr), nullptr);
    EXPECT_EQ(mgr.GetData(nullptr), nullptr);
    EXPECT_EQ(mgr.GetSize(three.Get()), 2u + 61 + 53 + 45);
    EXPECT_EQ(mgr.GetItemCount(three.Get()), 3u);
    EXPECT_EQ(mgr.GetLastItemType(three.Get()), 6u);

    EXPECT_EQ(mgr.CopyParent(one.Get()), nullptr);
    EXPECT_EQ(mgr.CopyParent(nullptr), nullptr);
    UniquePidl parent = Own(mgr.CopyParent(three.Get()));
    ExpectItems(parent.Get(), {{1, kRoot}, {3, kKey}});

    EXPECT_EQ(mgr.CopyFrom(three.Get(), 3), nullptr);
    EXPECT_EQ(mgr.CopyFrom(empty, 0), nullptr);
    EXPECT_EQ(mgr.CopyFrom(nullptr, 0), nullptr);
    UniquePidl tail = Own(mgr.CopyFrom(three.Get(), 1));
    ExpectItems(tail.Get(), {{3, kKey}, {6, L"FILE.qpr"}});
    UniquePidl whole = Own(mgr.CopyFrom(three.Get(), 0));
    ExpectItems(whole.Get(), {{1, kRoot}, {3, kKey}, {6, L"FILE.qpr"}});

    UniquePidl middle = Own(mgr.CopyItem(mgr.GetNextItem(three.Get())));
    ExpectItems(middle.Get(), {{3, kKey}});
    EXPECT_EQ(mgr.GetSize(middle.Get()), 53u + 2);

    EXPECT_EQ(mgr.Concatenate(nullptr, nullptr), nullptr);
    UniquePidl copyOfSecond = Own(mgr.Concatenate(nullptr, one.Get()));
    ExpectItems(copyOfSecond.Get(), {{1, kRoot}});
    EXPECT_NE(copyOfSecond.Get(), one.Get());
    UniquePidl joined = Own(mgr.Concatenate(parent.Get(), tail.Get()));
    ExpectItems(joined.Get(), {{1, kRoot}, {3, kKey}, {3, kKey}, {6, L"FILE.qpr"}});
    ExpectItems(parent.Get(), {{1, kRoot}, {3, kKey}});
}

TEST_F(PidlManagerTest, FileFieldsSurviveCopies) {
    UniquePidl list = Make({{1, kRoot}, {6, L"F"}});
    ReceiverItemData* file = mgr.GetData(mgr.GetLastItem(list.Get()));
    file->size = 0x89ABCDEF;
    file->time = 45000.25;
    UniquePidl copy = Own(mgr.CopyFrom(list.Get(), 1));
    EXPECT_EQ(mgr.GetData(copy.Get())->size, 0x89ABCDEFu);
    EXPECT_EQ(mgr.GetData(copy.Get())->time, 45000.25);
    // the second item starts at an odd offset: the fields are packed, not aligned
    const BYTE* bytes = reinterpret_cast<const BYTE*>(list.Get()) + 61;
    DWORD size;
    memcpy(&size, bytes + 6, 4);
    EXPECT_EQ(size, 0x89ABCDEFu);
}

TEST_F(PidlManagerTest, PathTexts) {
    const struct {
        std::vector<ItemEntry> items;
        bool keepKeys;
        const wchar_t* text;
        UINT result;
    } cases[] = {
        {{{1, kRoot}, {3, kKey}, {6, L"FILE.qpr"}}, false, L"Calvex Receivers\\Z/5@COM3\\FILE.qpr", 34},
        {{{1, kRoot}, {3, kKey}, {6, L"FILE.qpr"}}, true, L"Calvex Receivers\\123!Z#5!COM3\\FILE.qpr", 38},
        {{{2, kRoot}, {4, L"9!A#B#C!USB"}}, false, L"Calvex Receivers\\A/B/C@USB", 26},
        {{{4, L"9!M!P"}}, true, L"9!M!P", 5},
        {{{1, kRoot}, {3, L"123"}}, false, nullptr, 0},
        // a key without its third field counts only "@" and "\"
        {{{1, kRoot}, {3, L"123!Z"}}, false, L"Calvex Receivers\\Z@", 18},
    };
    for (const auto& c : cases) {
        UniquePidl list = Make(c.items);
        wchar_t buffer[MAX_PATH];
        EXPECT_EQ(mgr.GetPath(list.Get(), buffer, MAX_PATH, c.keepKeys), c.result);
        if (c.text) {
            EXPECT_STREQ(buffer, c.text);
            EXPECT_EQ(mgr.GetPath(list.Get(), nullptr, 0, c.keepKeys), c.result + 1) << "sizing call";
        }
    }
    const BYTE emptyBytes[2] = {0, 0};
    wchar_t buffer[8] = L"junk";
    EXPECT_EQ(mgr.GetPath(reinterpret_cast<LPCITEMIDLIST>(emptyBytes), buffer, 8, false), 0u);
    EXPECT_STREQ(buffer, L"");
}

TEST_F(PidlManagerTest, PathStopsAtTheCapacity) {
    UniquePidl list = Make({{1, kRoot}, {3, kKey}, {6, L"FILE.qpr"}});
    const std::wstring full = L"Calvex Receivers\\Z/5@COM3\\FILE.qpr";
    for (UINT capacity = 1; capacity <= full.size() + 1; ++capacity) {
        auto* buffer = static_cast<wchar_t*>(GuardedMalloc::GuardedBlock(capacity * sizeof(wchar_t)));
        mgr.GetPath(list.Get(), buffer, capacity, false);
        std::wstring text(buffer);
        EXPECT_LT(text.size(), capacity);
        EXPECT_EQ(full.compare(0, text.size(), text), 0) << "capacity " << capacity;
        GuardedMalloc::FreeGuardedBlock(buffer);
    }
}

TEST_F(PidlManagerTest, ColumnTexts) {
    UniquePidl receiver = Make({{3, kKey}});
    UniquePidl twoFields = Make({{4, L"123!Z#5"}});
    UniquePidl root = Make({{1, kRoot}});
    const struct {
        LPCITEMIDLIST item;
        int column;
        const wchar_t* text;
    } cases[] = {
        {receiver.Get(), 0, kKey},      {receiver.Get(), 1, L"123"}, {receiver.Get(), 2, L"Z/5"},
        {receiver.Get(), 3, L"COM3"},   {receiver.Get(), 4, L""},    {twoFields.Get(), 3, L""},
        {twoFields.Get(), 2, L"Z/5"},   {root.Get(), 0, kRoot},      {root.Get(), 1, L""},
        {nullptr, 0, L""},
    };
    for (const auto& c : cases) {
        wchar_t buffer[64] = L"junk";
        EXPECT_EQ(mgr.GetItemText(c.item, c.column, buffer, 64), wcslen(c.text));
        EXPECT_STREQ(buffer, c.text) << "column " << c.column;
    }
    wchar_t small[5];
    EXPECT_EQ(mgr.GetItemText(receiver.Get(), 0, small, 5), 4u);
    EXPECT_STREQ(small, L"123!");
}

TEST_F(PidlManagerTest, SizeTexts) {
    const struct {
        DWORD size;
        const wchar_t* text;
    } cases[] = {
        {0, L"0 bytes"},          {1023, L"1023 bytes"},      {1024, L"1.0 KB"},
        {1536, L"1.5 KB"},        {1048575, L"1024.0 KB"},    {1048576, L"1.0 MB"},
        {1073741824, L"1.0 GB"},  {2147483648u, L"2.0 GB"},   {4294967295u, L"4.0 GB"},
    };
    UniquePidl file = Make({{6, L"F"}});
    for (const auto& c : cases) {
        mgr.GetData(file.Get())->size = c.size;
        wchar_t buffer[64];
        mgr.GetItemText(file.Get(), 1, buffer, 64);
        EXPECT_STREQ(buffer, c.text) << c.size;
    }
}

TEST_F(PidlManagerTest, TimeTexts) {
    UniquePidl file = Make({{6, L"F"}});
    const struct {
        DATE time;
        bool valid;
    } cases[] = {{45000.5, true}, {1e10, false}, {-1e10, false}};
    for (const auto& c : cases) {
        mgr.GetData(file.Get())->time = c.time;
        wchar_t buffer[64];
        mgr.GetItemText(file.Get(), 2, buffer, 64);
        if (c.valid) {
            EXPECT_NE(std::wstring(buffer).find(L"2023"), std::wstring::npos) << "15 March 2023";
        } else {
            EXPECT_STREQ(buffer, L"Invalid DateTime");
        }
    }
}

TEST_F(PidlManagerTest, AllocationFailuresGiveNull) {
    UniquePidl three = Make({{1, kRoot}, {3, kKey}, {6, L"F"}});
    const struct {
        const char* what;
        std::function<LPITEMIDLIST()> call;
        int successes;
    } cases[] = {
        {"Create", [&] { return mgr.Create(1, L"x"); }, 0},
        {"CreateFromPath root", [&] { return mgr.CreateFromPath(L"a\\b\\c", 1); }, 0},
        {"CreateFromPath receiver", [&] { return mgr.CreateFromPath(L"a\\b\\c", 1); }, 1},
        {"CreateFromPath join", [&] { return mgr.CreateFromPath(L"a\\b\\c", 1); }, 2},
        {"CreateFromPath file", [&] { return mgr.CreateFromPath(L"a\\b\\c", 1); }, 3},
        {"CreateFromPath last join", [&] { return mgr.CreateFromPath(L"a\\b\\c", 1); }, 4},
        {"Copy", [&] { return mgr.Copy(three.Get()); }, 0},
        {"CopyParent", [&] { return mgr.CopyParent(three.Get()); }, 0},
        {"CopyItem", [&] { return mgr.CopyItem(three.Get()); }, 0},
        {"Concatenate", [&] { return mgr.Concatenate(three.Get(), three.Get()); }, 0},
    };
    for (const auto& c : cases) {
        malloc.FailAfter(c.successes);
        EXPECT_EQ(c.call(), nullptr) << c.what;
        malloc.FailAfter(-1);
    }
}

TEST(ItemPathTest, SplitsPathsAndKeys) {
    const struct {
        const wchar_t* text;
        bool key;
        std::vector<std::wstring> parts;
    } cases[] = {
        {L"\\\\a//b\\", false, {L"a", L"b"}},
        {L"a/b\\c", false, {L"a", L"b", L"c"}},
        {L"", false, {}},
        {L"1!M#X!COM3", true, {L"1", L"M#X", L"COM3"}},
        {L"!M!", true, {L"", L"M", L""}},
        {L"1", true, {L"1"}},
        {L"", true, {}},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(c.key ? SplitReceiverKey(c.text) : SplitItemPath(c.text), c.parts);
    }
    EXPECT_EQ(ReceiverLookupKey(L"123!Z#5!COM3"), L"COM3-123");
    EXPECT_EQ(ReceiverLookupKey(L"123!Z#5"), L"");
    EXPECT_EQ(MakeReceiverKey(L"1", L"A/B", L"USB"), L"1!A#B!USB");
}
}  // namespace
