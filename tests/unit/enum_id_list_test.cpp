// Guards the enumerator over the in-process simulator: wrong items, names, order or ".qpr" rule, device faults not skipped, wrong Next/Skip results, trace lines, leaked items and device objects.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

#include "SimDeviceManager.h"
#include "com/ModuleLock.h"
#include "items/CCalvexReceiversEnumIDList.h"
#include "module/ModuleApp.h"
#include "pidl_test_malloc.h"
#include "support/DeviceSim.h"

namespace {
using namespace testsupport;

struct Item {
    DWORD type;
    std::wstring name;
    DWORD size;
    DATE time;
    bool operator==(const Item& o) const { return type == o.type && name == o.name; }
};
std::ostream& operator<<(std::ostream& out, const Item& item) { return out << item.type << ":" << Narrow(item.name); }

const wchar_t kRoot[] = L"Calvex Receivers";
const DWORD kFolders = SHCONTF_FOLDERS;
const DWORD kFiles = SHCONTF_NONFOLDERS;

// A receiver "<serial>!M1!COM3" of brand 1 unless told otherwise; faults as [Fail] lines.
ReceiverSetup Rx(const wchar_t* serial, long brand = 1, std::vector<std::wstring> lines = {},
                 const wchar_t* model = L"M1", long portType = 1) {
    return {serial, brand, L"Base", serial, model, portType, L"COM3", std::move(lines)};
}

class EnumIDListTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() { CModuleApp::Instance().EnsureInitialized(); }
    void TearDown() override {
        m_managers.clear();
        EXPECT_EQ(ModuleLock::Count(), m_baseLocks) << "a device object or enumerator was not released";
        EXPECT_EQ(malloc.Outstanding(), 0u) << "an item list or node was leaked";
        EXPECT_EQ(malloc.HeldReferences(), baseRefs) << "an enumerator was not destroyed";
    }

    // The receivers collection of a fresh simulator over a tree of its own; files (name, size)
    // go to the first receiver before the simulator reads the tree.
    ComPtr<IReceiversColl> Receivers(const std::vector<ReceiverSetup>& receivers,
                                     const std::vector<std::pair<const wchar_t*, size_t>>& files = {}) {
        m_trees.emplace_back(new ReceiverTree);
        for (const ReceiverSetup& setup : receivers) m_trees.back()->AddReceiver(setup);
        for (const auto& file : files) m_trees.back()->AddFile(receivers[0].folder, file.first, file.second);
        ComPtr<IDeviceMgr> manager;
        EXPECT_EQ(S_OK, CreateSimDeviceManager(m_trees.back()->Root().c_str(), IID_IDeviceMgr, manager.PutVoid()));
        m_managers.push_back(manager);
        return ReceiversOf(manager.Get());
    }
    // The files collection of one receiver holding these files, with these [Times] and [Fail] lines.
    ComPtr<IFilesColl> Files(const std::vector<std::pair<const wchar_t*, size_t>>& files,
                             std::vector<std::wstring> lines = {}) {
        return FilesOf(ReceiverAt(Receivers({Rx(L"R", 1, std::move(lines))}, files).Get(), 0).Get());
    }

    // Made and initialised; null (and gone) when Init fails. `failAfter` allocations succeed first.
    ComObject<CCalvexReceiversEnumIDList>* Make(const wchar_t* path, DWORD flags, IUnknown* coll, DWORD brand,
                                                HRESULT* hr, int failAfter = -1) {
        ComObject<CCalvexReceiversEnumIDList>* enumerator = nullptr;
        EXPECT_EQ(CreateComObject<CCalvexReceiversEnumIDList>(&enumerator, &malloc), S_OK);
        malloc.FailAfter(failAfter);
        enumerator->Init(path, flags, coll, brand, hr);
        malloc.FailAfter(-1);
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
    // The items of a new enumerator, drained; Init must give `expected` (a failure destroys it).
    std::vector<Item> Enumerate(const std::wstring& path, DWORD flags, IUnknown* coll, DWORD brand,
                                HRESULT expected = S_OK, int failAfter = -1) {
        HRESULT hr = E_FAIL;
        std::vector<Item> items;
        if (auto* enumerator = Make(path.c_str(), flags, coll, brand, &hr, failAfter)) {
            items = Drain(enumerator);
            enumerator->Release();
        }
        EXPECT_EQ(hr, expected);
        return items;
    }

    GuardedMalloc malloc;
    CReceiversPidlMgr mgr{&malloc};
    const ULONG baseRefs = malloc.HeldReferences();  // the test's own manager
    const LONG m_baseLocks = ModuleLock::Count();
    std::vector<std::unique_ptr<ReceiverTree>> m_trees;
    std::vector<ComPtr<IDeviceMgr>> m_managers;
};

TEST_F(EnumIDListTest, ReceiversOfTheFolderBrandWithALabel) {
    const std::vector<ReceiverSetup> mixed = {Rx(L"A"), Rx(L"B", 2), Rx(L"C")};
    auto Faulty = [](const wchar_t* fault) { return Rx(L"A", 1, {L"[Fail]", fault}); };
    ReceiverSetup unlabelled = Rx(L"A");
    unlabelled.label.clear();
    const struct { const char* what; std::vector<ReceiverSetup> receivers; DWORD brand; std::vector<Item> expected; } cases[] = {
        {"brand 1 of three", mixed, 1, {{3, L"A!M1!COM3"}, {3, L"C!M1!COM3"}}},
        {"brand 2 of three", mixed, 2, {{4, L"B!M1!COM3"}}},
        {"brand S_FALSE", {Faulty(L"IReceiver.get_Brand=1"), Rx(L"B")}, 1, {{3, L"B!M1!COM3"}}},
        {"label empty", {unlabelled, Rx(L"B")}, 1, {{3, L"B!M1!COM3"}}},
        {"label S_FALSE", {Faulty(L"IReceiver.get_Label=1"), Rx(L"B")}, 1, {{3, L"B!M1!COM3"}}},
        {"get_Item fails", {Faulty(L"IReceiversColl.get_Item=0x80004005"), Rx(L"B")}, 1, {{3, L"B!M1!COM3"}}},
        {"model with slashes", {Rx(L"A", 1, {}, L"A/B/C")}, 1, {{3, L"A!A#B#C!COM3"}}},
        {"port USB", {Rx(L"A", 1, {}, L"M1", 2)}, 1, {{3, L"A!M1!USB"}}},
        {"port unknown", {Rx(L"A", 1, {}, L"M1", 7)}, 1, {{3, L"A!M1!Unknown"}}},
        {"brand 7 folder", mixed, 7, {}},
    };
    for (const auto& c : cases) { EXPECT_EQ(Enumerate(kRoot, kFolders, Receivers(c.receivers).Get(), c.brand), c.expected) << c.what; }
}

TEST_F(EnumIDListTest, FilesGetQprForBrandOneAndTheHvl3FamilyOnly) {
    ComPtr<IFilesColl> files = Files({{L"LOG1", 10}});
    const struct { const wchar_t* path; DWORD brand; const wchar_t* expected; } cases[] = {
        {L"Calvex Receivers\\1!M1!COM3", 1, L"LOG1.qpr"},    {L"Calvex Receivers\\1", 1, L"LOG1.qpr"},
        {L"Calvex Receivers\\1!HVL3xxx!USB", 2, L"LOG1.qpr"}, {L"Calvex Receivers\\1!HVL3!USB", 2, L"LOG1.qpr"},
        {L"Calvex Receivers\\1!HVL3#2!USB", 2, L"LOG1.qpr"},  {L"Calvex Receivers\\1!HVL!USB", 2, L"LOG1"},
        {L"Calvex Receivers\\1!hvl3!USB", 2, L"LOG1"},        {L"Calvex Receivers\\1!M2!USB", 2, L"LOG1"},
        {L"Calvex Receivers\\HVL3", 2, L"LOG1"},
    };
    for (const auto& c : cases)
        EXPECT_EQ(Enumerate(c.path, kFiles, files.Get(), c.brand), (std::vector<Item>{{6, c.expected}})) << Narrow(c.path);
}

TEST_F(EnumIDListTest, FilesCarrySizeAndTimeInCollectionOrder) {
    ComPtr<IFilesColl> files = Files({{L"F0", 0}, {L"F1", 5}, {L"F2", 7}, {L"F3", 1536}},
                                     {L"[Times]", L"F0=2023-03-15 12:00:00", L"F3=1900-01-01 06:00:00", L"[Fail]",
                                      L"IFilesColl.get_Item:F1=0x80004005", L"IReceiverFile.get_Size:F2=0x80004005"});
    std::vector<Item> items = Enumerate(L"Calvex Receivers\\1!M1!COM3", kFiles, files.Get(), 1);
    ASSERT_EQ(items, (std::vector<Item>{{6, L"F0.qpr"}, {6, L"F2.qpr"}, {6, L"F3.qpr"}}));
    EXPECT_EQ(items[0].time, 45000.5);
    EXPECT_EQ(items[1].size, 0u) << "a size that cannot be read stays 0";
    EXPECT_EQ(items[2].size, 1536u);
    EXPECT_EQ(items[2].time, 2.25);
}

TEST_F(EnumIDListTest, InitResultsAndWhatIsListed) {
    ComPtr<IReceiversColl> receivers = Receivers({Rx(L"A")});
    ComPtr<IFilesColl> files = Files({{L"LOG1", 1}});
    const struct {
        const char* what;
        const wchar_t* path;
        DWORD flags;
        IUnknown* coll;
        int allocations;  // successful allocations before the allocator fails (-1: none fails)
        HRESULT expected;
        std::vector<Item> items;
    } cases[] = {
        {"no collection", kRoot, kFolders | kFiles, nullptr, -1, S_OK, {}},
        {"receivers wanted of a files collection", kRoot, kFolders, files.Get(), -1, S_OK, {}},
        {"files wanted of a receivers collection", kRoot, kFiles, receivers.Get(), -1, S_OK, {}},
        {"neither flag, path of separators", L"\\\\//", 0, receivers.Get(), -1, S_OK, {}},
        // The default root name passes the component check, but items are made from the path
        // as given: "\key" makes a root-kind item.
        {"empty path", L"", kFolders, receivers.Get(), -1, S_OK, {{1, L"A!M1!COM3"}}},
        {"separators only, receivers", L"\\//\\", kFolders, receivers.Get(), -1, E_OUTOFMEMORY, {}},
        {"separators only, files", L"//", kFiles, receivers.Get(), -1, E_OUTOFMEMORY, {}},
        {"node allocation", kRoot, kFolders, receivers.Get(), 1, E_OUTOFMEMORY, {}},
        {"item allocation: skipped", kRoot, kFolders, receivers.Get(), 0, S_OK, {}},
    };
    for (const auto& c : cases) EXPECT_EQ(Enumerate(c.path, c.flags, c.coll, 1, c.expected, c.allocations), c.items) << c.what;
}

TEST_F(EnumIDListTest, NextSkipResetClone) {
    HRESULT hr = E_FAIL;
    ComPtr<IReceiversColl> receivers = Receivers({Rx(L"A"), Rx(L"B")});
    ComObject<CCalvexReceiversEnumIDList>* enumerator = Make(kRoot, kFolders, receivers.Get(), 1, &hr);
    ASSERT_TRUE(enumerator);
    IEnumIDList* e = enumerator;
    PITEMID_CHILD out[3] = {};
    ULONG fetched = 99;
    // Each step: Reset first?, the count asked, whether fetched is passed, the answer, and the names got.
    const struct { bool reset; ULONG count; bool withFetched; HRESULT expected; std::wstring names; } steps[] = {
        {false, 3, true, S_FALSE, L"A!M1!COM3|B!M1!COM3|"}, {false, 3, true, S_FALSE, L""},
        {true, 2, false, E_INVALIDARG, L""},  {false, 1, false, S_OK, L"A!M1!COM3|"},  // the refusal moved nothing
        {false, 0, true, S_OK, L""},
    };
    for (const auto& step : steps) {
        if (step.reset) { EXPECT_EQ(e->Reset(), S_OK); }
        fetched = 99;
        EXPECT_EQ(e->Next(step.count, out, step.withFetched ? &fetched : nullptr), step.expected);
        std::wstring names;
        for (PITEMID_CHILD& pidl : out) names += pidl ? mgr.GetItemName(pidl) + L"|" : L"", mgr.Delete(pidl), pidl = nullptr;
        EXPECT_EQ(names, step.names);
        if (step.withFetched) { EXPECT_EQ(fetched, static_cast<ULONG>(std::count(names.begin(), names.end(), L'|'))); }
    }

    const struct { ULONG skip; HRESULT expected; ULONG left; } skips[] = {{0, S_OK, 2}, {2, S_OK, 0}, {3, S_FALSE, 0}};
    for (const auto& s : skips) {
        e->Reset();
        EXPECT_EQ(e->Skip(s.skip), s.expected) << "skip " << s.skip;
        EXPECT_EQ(Drain(e).size(), s.left) << "skip " << s.skip;
    }

    IEnumIDList* clone = reinterpret_cast<IEnumIDList*>(1);
    EXPECT_EQ(e->Clone(&clone), E_NOTIMPL);
    EXPECT_FALSE(clone);

    // A copy that cannot be made still counts: the slot is null and the cursor moves on.
    e->Reset();
    malloc.FailAfter(0);
    EXPECT_EQ(e->Next(2, out, &fetched), S_OK);
    malloc.FailAfter(-1);
    EXPECT_EQ(fetched, 2u);
    EXPECT_TRUE(!out[0] && !out[1]);
    EXPECT_EQ(e->Next(1, out, &fetched), S_FALSE);
    enumerator->Release();
}

TEST_F(EnumIDListTest, TraceLines) {
    ComPtr<IReceiversColl> receivers = Receivers({Rx(L"A"), Rx(L"B", 2), Rx(L"C")});
    ComPtr<IFilesColl> files = Files({{L"F1", 1}, {L"F2", 1}});
    HRESULT hr = E_FAIL;
    auto* folders = Make(kRoot, kFolders | kFiles, receivers.Get(), 2, &hr);
    auto* filesEnum = Make(L"Calvex Receivers\\1!M!P", kFiles, files.Get(), 1, &hr);
    ASSERT_TRUE(folders && filesEnum);
    char expected[3][160];
    _snprintf(expected[0], 160, "CCalvexReceiversEnumIDList::CreateEnumList(Calvex Receivers, 96, 0x%08X, 2)\r\n",
              static_cast<unsigned>(reinterpret_cast<uintptr_t>(static_cast<IUnknown*>(receivers.Get()))));
    _snprintf(expected[1], 160, "CCalvexReceiversEnumIDList::CreateEnumList - receivers:3 %p\r\n",
              static_cast<void*>(static_cast<CCalvexReceiversEnumIDList*>(folders)));
    _snprintf(expected[2], 160, "CCalvexReceiversEnumIDList::CreateEnumList - files: 2 %p\r\n",
              static_cast<void*>(static_cast<CCalvexReceiversEnumIDList*>(filesEnum)));
    folders->Release();
    filesEnum->Release();
    const std::vector<std::string> messages = TraceMessages();
    const auto create = std::find(messages.begin(), messages.end(), expected[0]);
    ASSERT_TRUE(create != messages.begin() && create != messages.end() && create + 1 != messages.end()) << expected[0];
    EXPECT_EQ(create[-1], "CCalvexReceiversEnumIDList::Init\r\n");
    EXPECT_EQ(create[1], expected[1]);
    EXPECT_TRUE(TraceContains(expected[2])) << expected[2];
    EXPECT_FALSE(TraceContains("files: 3")) << "a receivers collection lists no files";
}
}  // namespace
