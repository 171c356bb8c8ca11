// Guards item identifier code against reads or writes past any buffer, or leaks, on random seeded paths, items, capacities and columns.
#include <gtest/gtest.h>

#include <limits>
#include <random>
#include <string>

#include "items/CReceiversPidlMgr.h"
#include "pidl_test_malloc.h"

namespace {
// `units` wide characters that end at a no-access page: a write past them faults at once.
struct GuardedBuffer {
    explicit GuardedBuffer(size_t units)
        : units(units), text(static_cast<wchar_t*>(GuardedMalloc::GuardedBlock(units * 2))) {}
    ~GuardedBuffer() { GuardedMalloc::FreeGuardedBlock(text); }
    GuardedBuffer(const GuardedBuffer&) = delete;
    wchar_t* Get() { return text; }
    bool Terminated() const { return units == 0 || wmemchr(text, L'\0', units); }  // a buffer of 0 units holds nothing
    size_t units;
    wchar_t* text;
};

// Random input for the manager, seeded: paths, names, capacities, columns and file fields.
class PidlFuzzTest : public testing::Test {
protected:
    void TearDown() override { EXPECT_EQ(malloc.Outstanding(), 0u) << "a list was leaked"; }
    UniquePidl Own(LPITEMIDLIST list) { return UniquePidl(&malloc, list); }
    int Int(int low, int high) { return std::uniform_int_distribution<int>(low, high)(random); }
    // Separators, key characters, letters and a few units beyond ASCII; sometimes long.
    std::wstring Text() {
        static const wchar_t alphabet[] = L"\\/\\/!!##@ .abcXYZ019-\x00e9\x4e2d\xd83d\xde00";
        std::wstring text(Int(0, 10) == 0 ? Int(200, 700) : Int(0, 40), L' ');
        for (wchar_t& unit : text) unit = alphabet[Int(0, static_cast<int>(wcslen(alphabet)) - 1)];
        return text;
    }
    void RandomFields(LPCITEMIDLIST item) {
        const double dates[] = {std::numeric_limits<double>::quiet_NaN(), 1e300, -1e300,
                                std::uniform_real_distribution<double>(-800000, 3000000)(random)};
        mgr.GetData(item)->size = static_cast<DWORD>(Int(0, 0x7FFFFFFF)) * (Int(0, 1) + 1);
        mgr.GetData(item)->time = dates[Int(0, 5) % 4];
    }
    UniquePidl FromPath();
    UniquePidl FromItems();
    void CheckTexts(LPCITEMIDLIST list);
    GuardedMalloc malloc;
    CReceiversPidlMgr mgr{&malloc};
    std::mt19937 random{20240611};
};

UniquePidl PidlFuzzTest::FromPath() {
    const std::wstring source = Text();
    GuardedBuffer path(source.size() + 1);
    wcscpy(path.Get(), source.c_str());
    const DWORD brand = static_cast<DWORD>(Int(0, 3));
    UniquePidl full = Own(mgr.CreateFromPath(path.Get(), brand)), last = Own(mgr.CreateLastFromPath(path.Get(), brand));
    return full;
}

UniquePidl PidlFuzzTest::FromItems() {  // up to four items of any kind, valid or not
    UniquePidl list;
    const int items = Int(0, 4);
    for (int i = 0; i < items; ++i) {
        UniquePidl one = Own(mgr.Create(static_cast<DWORD>(Int(0, 8)), Text().c_str()));
        if (!one) return ADD_FAILURE() << "Create", UniquePidl();
        RandomFields(one.Get());
        list = Own(mgr.Concatenate(list.Get(), one.Get()));
    }
    return list;
}

void PidlFuzzTest::CheckTexts(LPCITEMIDLIST list) {
    const bool keepKeys = Int(0, 1) == 1;
    const UINT capacity = static_cast<UINT>(Int(0, 300));
    GuardedBuffer path(capacity), full(8192);  // every text fits in the second (names < 1000 units, <= 4 items)
    const UINT length = mgr.GetPath(list, path.Get(), capacity, keepKeys);
    ASSERT_TRUE(path.Terminated());
    const UINT fullLength = mgr.GetPath(list, full.Get(), 8192, keepKeys);
    const std::wstring text = capacity ? path.Get() : L"";
    // A text that fits comes out exactly as from the large buffer, otherwise what fits is a prefix of it.
    ASSERT_EQ(std::wstring(full.Get()).compare(0, text.size(), text), 0);
    if (capacity > wcslen(full.Get())) { ASSERT_EQ(text + L"|" + std::to_wstring(length), full.Get() + (L"|" + std::to_wstring(fullLength))); }

    for (LPCITEMIDLIST item = list; mgr.GetData(item); item = mgr.GetNextItem(item)) {
        const UINT cap = static_cast<UINT>(Int(0, 300));
        GuardedBuffer column(cap);
        const UINT written = mgr.GetItemText(item, Int(-1, 5), column.Get(), cap);
        ASSERT_TRUE(column.Terminated());
        ASSERT_EQ(written, cap ? wcslen(column.Get()) : 0);
    }
}

TEST_F(PidlFuzzTest, RandomPathsItemsCapacitiesAndColumns) {
    for (int round = 0; round < 6000 && !HasFailure(); ++round) {
        SCOPED_TRACE(round);
        UniquePidl list = round % 2 ? FromItems() : FromPath();
        if (!list) continue;
        RandomFields(mgr.GetLastItem(list.Get()));
        UniquePidl from = Own(mgr.CopyFrom(list.Get(), static_cast<UINT>(Int(0, 3))));
        UniquePidl parent = Own(mgr.CopyParent(list.Get())), item = Own(mgr.CopyItem(mgr.GetLastItem(list.Get())));
        for (const UniquePidl* each : {&list, &from, &parent, &item}) CheckTexts(each->Get());
    }
}
}  // namespace
