// CCalvexReceiversEnumIDList against an in-process fake of the device manager: what is
// listed, in which order, under which names; Next/Skip/Reset/Clone; the failure rules.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

#include "enum_id_list_fake.h"
#include "items/CCalvexReceiversEnumIDList.h"
#include "module/ModuleApp.h"
#include "pidl_test_malloc.h"
#include "support/TestSupport.h"

namespace {
using fake::FileSpec;
using fake::ReceiverSpec;

struct Item {
    DWORD type;
    std::wstring name;
    DWORD size;
    DATE time;
    bool operator==(const Item& o) const { return type == o.type && name == o.name; }
};
std::ostream& operator<<(std::ostream& out, const Item& item) {
    return out << item.type << ":" << testsupport::Narrow(item.name);
}

class EnumIDListTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() { CModuleApp::Instance().EnsureInitialized(); }
    void TearDown() override {
        ReleaseCollections();
        EXPECT_EQ(log.live, 0) << "a device object was not released";
        EXPECT_EQ(malloc.Outstanding(), 0u) << "an item list or node was leaked";
        EXPECT_EQ(malloc.HeldReferences(), baseRefs) << "an enumerator was not destroyed";
    }

    IUnknown* Receivers(std::vector<ReceiverSpec> specs) {
        held.push_back(new fake::ReceiversColl(std::move(specs), &log));
        return held.back();
    }
    IUnknown* Files(std::vector<FileSpec> specs) {
        held.push_back(new fake::FilesColl(std::move(specs), &log));
        return held.back();
    }
    void ReleaseCollections() {
        for (IUnknown* unknown : held) unknown->Release();
        held.clear();
    }

    // Init, then everything Next gives one at a time. Null on an Init failure.
    ComObject<CCalvexReceiversEnumIDList>* Make(const wchar_t* path, DWORD flags, IUnknown* coll, DWORD brand,
                                                HRESULT* hr) {
        ComObject<CCalvexReceiversEnumIDList>* enumerator = nullptr;
        EXPECT_EQ(CreateComObject<CCalvexReceiversEnumIDList>(&enumerator, &malloc), S_OK);
        enumerator->Init(path, flags, coll, brand, hr);
        return SUCCEEDED(*hr) ? enumerator : nullptr;
    }
    std::vector<Item> Drain(IEnumIDList* enumerator) {
        std::vector<Item> items;
        PITEMID_CHILD pidl = nullptr;
        ULONG fetched = 0;
        while (enumerator->Next(1, &pidl, &fetched) == S_OK) {
            EXPECT_EQ(fetched, 1u);
            EXPECT_EQ(mgr.GetItemCount(pidl), 1u);
            const ReceiverItemData* data = mgr.GetData(pidl);
            items.push_back({data->type, mgr.GetItemName(pidl), data->size, data->time});
            mgr.Delete(pidl);
        }
        return items;
    }
    std::vector<Item> Enumerate(const wchar_t* path, DWORD flags, IUnknown* coll, DWORD brand) {
        HRESULT hr = E_FAIL;
        ComObject<CCalvexReceiversEnumIDList>* enumerator = Make(path, flags, coll, brand, &hr);
        EXPECT_EQ(hr, S_OK);
        if (!enumerator) return {};
        std::vector<Item> items = Drain(enumerator);
        enumerator->Release();
        return items;
    }

    fake::Log log;
    GuardedMalloc malloc;
    CReceiversPidlMgr mgr{&malloc};
    const ULONG baseRefs = malloc.HeldReferences();  // the test's own manager
    std::vector<IUnknown*> held;
};

const wchar_t kRoot[] = L"Calvex Receivers";
const DWORD kFolders = SHCONTF_FOLDERS;
const DWORD kFiles = SHCONTF_NONFOLDERS;

ReceiverSpec Rx(const wchar_t* serial, long brand = 1) {
    ReceiverSpec spec;
    spec.serial = serial;
    spec.brand = brand;
    return spec;
}
template <class Spec, class Change>
Spec With(Spec spec, Change change) {
    change(spec);
    return spec;
}

TEST_F(EnumIDListTest, ReceiversOfTheFolderBrandWithALabel) {
    const std::vector<ReceiverSpec> mixed = {Rx(L"A"), Rx(L"B", 2), Rx(L"C")};
    const struct {
        const char* what;
        std::vector<ReceiverSpec> receivers;
        DWORD brand;
        std::vector<Item> expected;
    } cases[] = {
        {"brand 1 of three", mixed, 1, {{3, L"A!M1!COM3"}, {3, L"C!M1!COM3"}}},
        {"brand 2 of three", mixed, 2, {{4, L"B!M1!COM3"}}},
        {"brand S_FALSE", {With(Rx(L"A"), [](ReceiverSpec& s) { s.brandResult = S_FALSE; }), Rx(L"B")}, 1, {{3, L"B!M1!COM3"}}},
        {"label empty", {With(Rx(L"A"), [](ReceiverSpec& s) { s.label = L""; }), Rx(L"B")}, 1, {{3, L"B!M1!COM3"}}},
        {"label null", {With(Rx(L"A"), [](ReceiverSpec& s) { s.label = nullptr; }), Rx(L"B")}, 1, {{3, L"B!M1!COM3"}}},
        {"label S_FALSE", {With(Rx(L"A"), [](ReceiverSpec& s) { s.labelResult = S_FALSE; }), Rx(L"B")}, 1, {{3, L"B!M1!COM3"}}},
        {"get_Item fails", {With(Rx(L"A"), [](ReceiverSpec& s) { s.item.result = E_FAIL; }), Rx(L"B")}, 1, {{3, L"B!M1!COM3"}}},
        {"get_Item null", {With(Rx(L"A"), [](ReceiverSpec& s) { s.item.null = true; }), Rx(L"B")}, 1, {{3, L"B!M1!COM3"}}},
        {"no IReceiver", {With(Rx(L"A"), [](ReceiverSpec& s) { s.item.refuseInterface = true; }), Rx(L"B")}, 1, {{3, L"B!M1!COM3"}}},
        {"model with slashes", {With(Rx(L"A"), [](ReceiverSpec& s) { s.model = L"A/B/C"; })}, 1, {{3, L"A!A#B#C!COM3"}}},
        {"port USB", {With(Rx(L"A"), [](ReceiverSpec& s) { s.portType = 2; })}, 1, {{3, L"A!M1!USB"}}},
        {"port unknown", {With(Rx(L"A"), [](ReceiverSpec& s) { s.portType = 7; })}, 1, {{3, L"A!M1!Unknown"}}},
        {"brand 7 folder", mixed, 7, {}},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(Enumerate(kRoot, kFolders, Receivers(c.receivers), c.brand), c.expected) << c.what;
        ReleaseCollections();
    }
}

TEST_F(EnumIDListTest, PortNameIsReadForNamedPortsOnly) {
    for (long portType : {1L, 2L, 7L}) {
        log.calls.clear();
        Enumerate(kRoot, kFolders, Receivers({With(Rx(L"A"), [&](ReceiverSpec& s) { s.portType = portType; })}), 1);
        const bool read = std::count(log.calls.begin(), log.calls.end(), "get_PortName") > 0;
        EXPECT_EQ(read, portType == 1) << "port type " << portType;
        ReleaseCollections();
    }
}

TEST_F(EnumIDListTest, FilesGetQprForBrandOneAndTheHvl3FamilyOnly) {
    const struct {
        const wchar_t* path;
        DWORD brand;
        const wchar_t* name;
        const wchar_t* expected;
    } cases[] = {
        {L"Calvex Receivers\\1!M1!COM3", 1, L"LOG1", L"LOG1.qpr"},
        {L"Calvex Receivers\\1", 1, L"LOG1", L"LOG1.qpr"},
        {L"Calvex Receivers\\1!HVL3xxx!USB", 2, L"LOG1", L"LOG1.qpr"},
        {L"Calvex Receivers\\1!HVL3!USB", 2, L"LOG1", L"LOG1.qpr"},
        {L"Calvex Receivers\\1!HVL3#2!USB", 2, L"LOG1", L"LOG1.qpr"},
        {L"Calvex Receivers\\1!HVL!USB", 2, L"LOG1", L"LOG1"},
        {L"Calvex Receivers\\1!hvl3!USB", 2, L"LOG1", L"LOG1"},
        {L"Calvex Receivers\\1!M2!USB", 2, L"LOG1", L"LOG1"},
        {L"Calvex Receivers\\HVL3", 2, L"LOG1", L"LOG1"},
        {L"Calvex Receivers\\1!M1!COM3", 1, L"a/b", L"a\\b.qpr"},
    };
    for (const auto& c : cases) {
        FileSpec file;
        file.name = c.name;
        EXPECT_EQ(Enumerate(c.path, kFiles, Files({file}), c.brand), (std::vector<Item>{{6, c.expected}}))
            << testsupport::Narrow(c.path);
        ReleaseCollections();
    }
}

TEST_F(EnumIDListTest, FilesCarrySizeAndTimeInCollectionOrder) {
    std::vector<FileSpec> files(4);
    files[0].name = L"F0", files[0].size = -1, files[0].time = 45000.5;
    files[1].name = L"F1", files[1].item.result = E_FAIL;
    files[2].name = L"F2", files[2].size = 7, files[2].sizeResult = E_FAIL;
    files[3].name = L"F3", files[3].size = 1536, files[3].time = 1.25;
    std::vector<Item> items = Enumerate(L"Calvex Receivers\\1!M1!COM3", kFiles, Files(files), 1);
    ASSERT_EQ(items, (std::vector<Item>{{6, L"F0.qpr"}, {6, L"F2.qpr"}, {6, L"F3.qpr"}}));
    EXPECT_EQ(items[0].size, 0xFFFFFFFFu);
    EXPECT_EQ(items[0].time, 45000.5);
    EXPECT_EQ(items[1].size, 0u) << "a size that cannot be read stays 0";
    EXPECT_EQ(items[2].size, 1536u);
    EXPECT_EQ(items[2].time, 1.25);
}

TEST_F(EnumIDListTest, CollectionsAndFlagsThatListNothing) {
    const struct {
        const char* what;
        const wchar_t* path;
        DWORD flags;
        bool filesCollection;
        bool nullCollection;
    } cases[] = {
        {"no collection", kRoot, kFolders | kFiles, false, true},
        {"receivers wanted of a files collection", kRoot, kFolders, true, false},
        {"files wanted of a receivers collection", kRoot, kFiles, false, false},
        {"neither flag", kRoot, SHCONTF_INCLUDEHIDDEN, false, false},
        {"neither flag, path of separators", L"\\\\//", 0, false, false},
    };
    for (const auto& c : cases) {
        IUnknown* coll = c.nullCollection ? nullptr : c.filesCollection ? Files({FileSpec()}) : Receivers({Rx(L"A")});
        EXPECT_TRUE(Enumerate(c.path, c.flags, coll, 1).empty()) << c.what;
        ReleaseCollections();
    }
}

TEST_F(EnumIDListTest, ItemPathIsTheGivenPathNotTheDefault) {
    // An empty folder path passes the component check through the default root name, but
    // the items are made from the path as given: "\key" makes a root-kind item.
    EXPECT_EQ(Enumerate(L"", kFolders, Receivers({Rx(L"A")}), 1), (std::vector<Item>{{1, L"A!M1!COM3"}}));
    ReleaseCollections();
}

TEST_F(EnumIDListTest, FailuresDestroyTheEnumerator) {
    const struct {
        const char* what;
        const wchar_t* path;
        DWORD flags;
        int allocations;  // successful allocations before the allocator fails (-1: none fails)
        HRESULT expected;
    } cases[] = {
        {"separators only, receivers", L"\\//\\", kFolders, -1, E_OUTOFMEMORY},
        {"separators only, files", L"//", kFiles, -1, E_OUTOFMEMORY},
        {"node allocation", kRoot, kFolders, 1, E_OUTOFMEMORY},
        {"item allocation: skipped", kRoot, kFolders, 0, S_OK},
    };
    for (const auto& c : cases) {
        ComObject<CCalvexReceiversEnumIDList>* enumerator = nullptr;
        ASSERT_EQ(CreateComObject<CCalvexReceiversEnumIDList>(&enumerator, &malloc), S_OK);
        malloc.FailAfter(c.allocations);
        HRESULT hr = E_FAIL;
        enumerator->Init(c.path, c.flags, Receivers({Rx(L"A"), Rx(L"B")}), 1, &hr);
        malloc.FailAfter(-1);
        EXPECT_EQ(hr, c.expected) << c.what;
        if (SUCCEEDED(hr)) {
            EXPECT_TRUE(Drain(enumerator).empty()) << c.what;
            enumerator->Release();
        }
        EXPECT_EQ(malloc.HeldReferences(), baseRefs) << c.what << ": the enumerator must be gone";
        ReleaseCollections();
    }
}

TEST_F(EnumIDListTest, NextSkipResetClone) {
    HRESULT hr = E_FAIL;
    ComObject<CCalvexReceiversEnumIDList>* enumerator =
        Make(kRoot, kFolders, Receivers({Rx(L"A"), Rx(L"B")}), 1, &hr);
    ASSERT_TRUE(enumerator);
    IEnumIDList* e = enumerator;
    PITEMID_CHILD out[3] = {};
    ULONG fetched = 99;
    auto freeOut = [&] {
        for (PITEMID_CHILD& pidl : out) mgr.Delete(pidl), pidl = nullptr;
    };

    EXPECT_EQ(e->Next(3, out, &fetched), S_FALSE);
    EXPECT_EQ(fetched, 2u);
    EXPECT_EQ(mgr.GetItemName(out[0]), L"A!M1!COM3");
    EXPECT_EQ(mgr.GetItemName(out[1]), L"B!M1!COM3");
    freeOut();
    EXPECT_EQ(e->Next(3, out, &fetched), S_FALSE);
    EXPECT_EQ(fetched, 0u);

    EXPECT_EQ(e->Reset(), S_OK);
    EXPECT_EQ(e->Next(2, out, nullptr), E_INVALIDARG);
    EXPECT_EQ(e->Next(1, out, nullptr), S_OK);
    EXPECT_EQ(mgr.GetItemName(out[0]), L"A!M1!COM3") << "the refused call moved nothing";
    freeOut();
    EXPECT_EQ(e->Next(0, out, &fetched), S_OK);
    EXPECT_EQ(fetched, 0u);

    const struct {
        ULONG skip;
        HRESULT expected;
        ULONG left;
    } skips[] = {{0, S_OK, 2}, {1, S_OK, 1}, {2, S_OK, 0}, {3, S_FALSE, 0}};
    for (const auto& s : skips) {
        e->Reset();
        EXPECT_EQ(e->Skip(s.skip), s.expected) << "skip " << s.skip;
        EXPECT_EQ(Drain(e).size(), s.left) << "skip " << s.skip;
    }

    IEnumIDList* clone = reinterpret_cast<IEnumIDList*>(1);
    EXPECT_EQ(e->Clone(&clone), E_NOTIMPL);
    EXPECT_EQ(clone, nullptr);

    // A copy that cannot be made still counts: the slot is null and the cursor moves on.
    e->Reset();
    malloc.FailAfter(0);
    EXPECT_EQ(e->Next(2, out, &fetched), S_OK);
    malloc.FailAfter(-1);
    EXPECT_EQ(fetched, 2u);
    EXPECT_EQ(out[0], nullptr);
    EXPECT_EQ(out[1], nullptr);
    EXPECT_EQ(e->Next(1, out, &fetched), S_FALSE);

    enumerator->Release();
    ReleaseCollections();
}

TEST_F(EnumIDListTest, TraceLines) {
    IUnknown* receivers = Receivers({Rx(L"A"), Rx(L"B", 2), Rx(L"C")});
    HRESULT hr = E_FAIL;
    ComObject<CCalvexReceiversEnumIDList>* enumerator = Make(kRoot, kFolders | kFiles, receivers, 2, &hr);
    ASSERT_TRUE(enumerator);
    char expected[3][160];
    _snprintf(expected[0], 160, "CCalvexReceiversEnumIDList::CreateEnumList(Calvex Receivers, 96, 0x%08X, 2)\r\n",
              static_cast<unsigned>(reinterpret_cast<uintptr_t>(receivers)));
    _snprintf(expected[1], 160, "CCalvexReceiversEnumIDList::CreateEnumList - receivers:3 %p\r\n",
              static_cast<void*>(static_cast<CCalvexReceiversEnumIDList*>(enumerator)));
    enumerator->Release();

    IUnknown* files = Files({FileSpec(), FileSpec()});
    enumerator = Make(L"Calvex Receivers\\1!M!P", kFiles, files, 1, &hr);
    ASSERT_TRUE(enumerator);
    _snprintf(expected[2], 160, "CCalvexReceiversEnumIDList::CreateEnumList - files: 2 %p\r\n",
              static_cast<void*>(static_cast<CCalvexReceiversEnumIDList*>(enumerator)));
    enumerator->Release();
    ReleaseCollections();

    const std::vector<std::string> messages = testsupport::TraceMessages();
    auto at = [&](const std::string& line) {
        return std::find(messages.begin(), messages.end(), line) - messages.begin();
    };
    const size_t create = static_cast<size_t>(at(expected[0]));
    ASSERT_LT(create + 1, messages.size()) << expected[0];
    ASSERT_GT(create, 0u);
    EXPECT_EQ(messages[create - 1], "CCalvexReceiversEnumIDList::Init\r\n");
    EXPECT_EQ(messages[create + 1], expected[1]);
    EXPECT_TRUE(testsupport::TraceContains(expected[2])) << expected[2];
    EXPECT_FALSE(testsupport::TraceContains("files: 3")) << "a receivers collection lists no files";
}
}  // namespace
