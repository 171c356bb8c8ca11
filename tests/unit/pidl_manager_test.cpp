// Guards item identifiers: wrong bytes or sizes of an item, wrong path rules, list operations or texts, leaked lists.
#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <string>
#include <tuple>
#include <vector>

#include "items/CReceiversPidlMgr.h"
#include "pidl_test_malloc.h"
#include "support/TestSupport.h"

namespace {
const wchar_t kRoot[] = L"Calvex Receivers";
const wchar_t kKey[] = L"123!Z#5!COM3";
const BYTE kEmptyBytes[2] = {0, 0};
const LPCITEMIDLIST kEmpty = reinterpret_cast<LPCITEMIDLIST>(kEmptyBytes);

class PidlManagerTest : public ::testing::Test {
protected:
    void TearDown() override { EXPECT_EQ(malloc.Outstanding(), 0u) << "a list was leaked"; }

    UniquePidl Own(LPITEMIDLIST list) { return UniquePidl(&malloc, list); }
    // Items written "type:name", joined with "|".
    UniquePidl Make(const std::vector<std::pair<DWORD, std::wstring>>& items) {
        UniquePidl list;
        for (const auto& entry : items) list = Own(mgr.Concatenate(list.Get(), Own(mgr.Create(entry.first, entry.second.c_str())).Get()));
        return list;
    }
    std::wstring Describe(LPCITEMIDLIST list) {
        std::wstring text;
        for (LPCITEMIDLIST item = list; mgr.GetData(item); item = mgr.GetNextItem(item))
            text += (text.empty() ? L"" : L"|") + std::to_wstring(mgr.GetData(item)->type) + L":" + mgr.GetItemName(item);
        return text;
    }

    GuardedMalloc malloc;
    CReceiversPidlMgr mgr{&malloc};
};

TEST_F(PidlManagerTest, CreateWritesTheWireLayoutAndNothingElse) {
    const struct { const wchar_t* name; USHORT cb; } cases[] = {{L"", 29}, {L"0123456789", 49}, {L"FILE.qpr", 45}};
    for (const auto& c : cases) {
        UniquePidl item = Own(mgr.Create(ItemTypeFile, c.name));
        ASSERT_TRUE(item);
        EXPECT_EQ(malloc.LastSize(), c.cb + 2u) << "allocation is cb + 2";
        const BYTE* bytes = reinterpret_cast<const BYTE*>(item.Get());
        USHORT cb, terminator;
        DWORD type;
        memcpy(&cb, bytes, 2), memcpy(&type, bytes + 2, 4), memcpy(&terminator, bytes + cb, 2);
        EXPECT_EQ(std::make_tuple(cb, type, terminator), std::make_tuple(c.cb, 6ul, USHORT(0)));
        const size_t nameEnd = 18 + (wcslen(c.name) + 1) * 2;
        EXPECT_EQ(memcmp(bytes + 18, c.name, nameEnd - 18), 0);
        EXPECT_EQ(cb - nameEnd, 9u) << "9 slack bytes";
        // size, time and the slack are never written
        for (size_t i = 6; i < cb; i = i == 17 ? nameEnd : i + 1) { EXPECT_EQ(bytes[i], GuardedMalloc::kFill) << i; }
    }
    std::wstring longest(32753, L'x'), wrapping(32754, L'x');
    UniquePidl item = Own(mgr.Create(ItemTypeFile, longest.c_str()));
    EXPECT_EQ(mgr.GetSize(item.Get()), 0xFFFFu + 2);
    EXPECT_EQ(mgr.GetItemName(item.Get()), longest);
    EXPECT_EQ(mgr.Create(ItemTypeFile, wrapping.c_str()), nullptr) << "cb would wrap past 16 bits";
}

TEST_F(PidlManagerTest, PathsGiveRootReceiverAndFile) {
    const struct { const wchar_t* path; DWORD brand; std::wstring items, last; } cases[] = {
        {L"\\\\Calvex Receivers//123!Z#5!COM3\\\\", 1, L"1:Calvex Receivers|3:123!Z#5!COM3", L"3:123!Z#5!COM3"},
        {L"c0/c1/c2/c3/c4", 2, L"2:c0|4:c1|6:c2\\c3\\c4", L"6:c2\\c3\\c4"},
        {L"r\\k\\LOG1.qpr", 1, L"1:r|3:k|6:LOG1.qpr", L"6:LOG1.qpr"},
        {L"/only/", 2, L"2:only", L"2:only"}, {L"a\\b", 5, L"1:a|3:b", L"3:b"},
        {L"", 1, L"", L""}, {L"\\//\\", 1, L"", L""}, {nullptr, 1, L"", L""}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.path ? testsupport::Narrow(c.path) : "null");
        UniquePidl full = Own(mgr.CreateFromPath(c.path, c.brand)), last = Own(mgr.CreateLastFromPath(c.path, c.brand));
        EXPECT_EQ(Describe(full.Get()), c.items);
        EXPECT_EQ(Describe(last.Get()), c.last);
        EXPECT_EQ(!full, c.items.empty()) << "no list at all for no component";
    }
    for (DWORD brand : {0u, 1u, 2u, 7u}) {
        UniquePidl root = Own(mgr.CreateRoot(brand));
        EXPECT_EQ(Describe(root.Get()), std::wstring(brand == 2 ? L"2:" : L"1:") + kRoot) << "brand " << brand;
    }
}

TEST_F(PidlManagerTest, ListOperationsOnEmptyNullAndShortLists) {
    UniquePidl one = Make({{1, kRoot}}), three = Make({{1, kRoot}, {3, kKey}, {6, L"FILE.qpr"}});
    EXPECT_EQ(std::make_tuple(mgr.GetSize(nullptr), mgr.GetSize(kEmpty), mgr.GetSize(three.Get())),
              std::make_tuple(0u, 2u, 2u + 61 + 53 + 45));
    EXPECT_EQ(std::make_tuple(mgr.GetItemCount(nullptr), mgr.GetItemCount(kEmpty), mgr.GetItemCount(three.Get())),
              std::make_tuple(0u, 0u, 3u));
    EXPECT_EQ(mgr.GetLastItemType(three.Get()), 6u);
    const void* nulls[] = {mgr.GetLastItem(nullptr), mgr.GetLastItem(kEmpty), mgr.CopyFrom(nullptr, 0), mgr.CopyFrom(kEmpty, 0),
                           mgr.GetNextItem(nullptr), mgr.GetData(nullptr), mgr.CopyParent(one.Get()), mgr.CopyParent(nullptr),
                           mgr.CopyFrom(three.Get(), 3), mgr.Concatenate(nullptr, nullptr)};
    for (size_t i = 0; i < sizeof nulls / sizeof nulls[0]; ++i) { EXPECT_EQ(nulls[i], nullptr) << i; }

    UniquePidl parent = Own(mgr.CopyParent(three.Get())), tail = Own(mgr.CopyFrom(three.Get(), 1));
    UniquePidl whole = Own(mgr.CopyFrom(three.Get(), 0)), middle = Own(mgr.CopyItem(mgr.GetNextItem(three.Get())));
    UniquePidl copyOfSecond = Own(mgr.Concatenate(nullptr, one.Get())), joined = Own(mgr.Concatenate(parent.Get(), tail.Get()));
    const std::wstring root = L"1:Calvex Receivers", key = L"|3:123!Z#5!COM3", file = L"|6:FILE.qpr";
    const struct { const UniquePidl& list; std::wstring items; } copies[] = {
        {parent, root + key},  // and Concatenate left it alone
        {tail, key.substr(1) + file}, {whole, root + key + file}, {middle, key.substr(1)},
        {copyOfSecond, root}, {joined, root + key + key + file}};
    for (const auto& c : copies) { EXPECT_EQ(Describe(c.list.Get()), c.items); }
    EXPECT_EQ(mgr.GetSize(middle.Get()), 53u + 2);
    EXPECT_NE(copyOfSecond.Get(), one.Get());
    mgr.GetData(mgr.GetNextItem(three.Get()))->size = 0x89ABCDEF;
    DWORD size;  // the second item starts at an odd offset: the fields are packed
    memcpy(&size, reinterpret_cast<const BYTE*>(three.Get()) + 61 + 6, 4);
    EXPECT_EQ(size, 0x89ABCDEFu);
}

TEST_F(PidlManagerTest, PathTexts) {
    const struct { std::vector<std::pair<DWORD, std::wstring>> items; bool keepKeys; const wchar_t* text; UINT result; } cases[] = {
        {{{1, kRoot}, {3, kKey}, {6, L"FILE.qpr"}}, false, L"Calvex Receivers\\Z/5@COM3\\FILE.qpr", 34},
        {{{1, kRoot}, {3, kKey}, {6, L"FILE.qpr"}}, true, L"Calvex Receivers\\123!Z#5!COM3\\FILE.qpr", 38},
        {{{2, kRoot}, {4, L"9!A#B#C!USB"}}, false, L"Calvex Receivers\\A/B/C@USB", 26},
        {{{4, L"9!M!P"}}, true, L"9!M!P", 5},
        {{{1, kRoot}, {3, L"123"}}, false, nullptr, 0},  // a key of one field: no text
        {{{1, kRoot}, {3, L"123!Z"}}, false, L"Calvex Receivers\\Z@", 18},  // counts only "@" and "\"
        {{}, false, L"", 0},
    };
    for (const auto& c : cases) {
        UniquePidl list = Make(c.items);
        LPCITEMIDLIST item = list ? list.Get() : kEmpty;
        wchar_t buffer[MAX_PATH] = L"junk";
        EXPECT_EQ(mgr.GetPath(item, buffer, MAX_PATH, c.keepKeys), c.result);
        if (c.text) { EXPECT_STREQ(buffer, c.text); }
        if (c.result) { EXPECT_EQ(mgr.GetPath(item, nullptr, 0, c.keepKeys), c.result + 1) << "sizing call"; }
    }
}

TEST_F(PidlManagerTest, ColumnTexts) {
    UniquePidl receiver = Make({{3, kKey}}), twoFields = Make({{4, L"123!Z#5"}}), root = Make({{1, kRoot}}), file = Make({{6, L"F"}});
    ReceiverItemData* data = mgr.GetData(file.Get());
    const struct { LPCITEMIDLIST item; int column; const wchar_t* text; DWORD size; DATE time; } cases[] = {
        {receiver.Get(), 0, kKey},      {receiver.Get(), 1, L"123"},  {receiver.Get(), 2, L"Z/5"},
        {receiver.Get(), 3, L"COM3"},   {receiver.Get(), 4, L""},     {twoFields.Get(), 3, L""},
        {twoFields.Get(), 2, L"Z/5"},   {root.Get(), 0, kRoot},       {root.Get(), 1, L""},
        {nullptr, 0, L""},
        {file.Get(), 1, L"0 bytes", 0},               {file.Get(), 1, L"1023 bytes", 1023},
        {file.Get(), 1, L"1.0 KB", 1024},             {file.Get(), 1, L"1.5 KB", 1536},
        {file.Get(), 1, L"1024.0 KB", 1048575},       {file.Get(), 1, L"1.0 MB", 1048576},
        {file.Get(), 1, L"1.0 GB", 1073741824},       {file.Get(), 1, L"4.0 GB", 4294967295u},
        {file.Get(), 2, L"Invalid DateTime", 0, 1e10},
    };
    for (const auto& c : cases) {
        data->size = c.size;
        data->time = c.time;
        wchar_t buffer[64] = L"junk";
        EXPECT_EQ(mgr.GetItemText(c.item, c.column, buffer, 64), wcslen(c.text));
        EXPECT_STREQ(buffer, c.text) << "column " << c.column;
    }
    wchar_t small[5];
    EXPECT_EQ(mgr.GetItemText(receiver.Get(), 0, small, 5), 4u);
    EXPECT_STREQ(small, L"123!");
}

TEST_F(PidlManagerTest, AllocationFailuresGiveNull) {
    UniquePidl three = Make({{1, kRoot}, {3, kKey}, {6, L"F"}});
    const std::function<LPITEMIDLIST()> calls[] = {
        [&] { return mgr.Create(1, L"x"); }, [&] { return mgr.Copy(three.Get()); },
        [&] { return mgr.CopyParent(three.Get()); }, [&] { return mgr.CopyItem(three.Get()); },
        [&] { return mgr.Concatenate(three.Get(), three.Get()); }};
    for (const auto& call : calls) {
        malloc.FailAfter(0);
        EXPECT_EQ(call(), nullptr) << &call - calls;
    }
    for (int successes = 0; successes < 5; ++successes) {  // root, receiver, join, file, last join
        malloc.FailAfter(successes);
        EXPECT_EQ(mgr.CreateFromPath(L"a\\b\\c", 1), nullptr) << successes;
    }
    malloc.FailAfter(-1);
}
}  // namespace
