// Guards item identifier code against reads or writes past any buffer on random, seeded paths, names, capacities and columns.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdio>
#include <limits>
#include <random>
#include <string>
#include <vector>

#include "items/CReceiversPidlMgr.h"
#include "pidl_test_malloc.h"

namespace {
// A fault past a buffer must end the program at once with a message: under Xvfb Wine's
// crash dialog would otherwise hold it until the test's time runs out.
LONG WINAPI ReportFault(EXCEPTION_POINTERS* exception) {
    fprintf(stderr, "fault 0x%08lX at %p\n", exception->ExceptionRecord->ExceptionCode,
            exception->ExceptionRecord->ExceptionAddress);
    fflush(stderr);
    TerminateProcess(GetCurrentProcess(), 3);
    return EXCEPTION_EXECUTE_HANDLER;
}
const LPTOP_LEVEL_EXCEPTION_FILTER kPreviousFilter = SetUnhandledExceptionFilter(ReportFault);

const int kRounds = 3000;
const wchar_t kCanary = 0xA5A5;
const size_t kCanaryUnits = 8;

// A wide buffer of `capacity` units that ends at a guard page, after a canary.
class GuardedBuffer {
public:
    explicit GuardedBuffer(size_t capacity)
        : m_block(static_cast<wchar_t*>(GuardedMalloc::GuardedBlock((capacity + kCanaryUnits) * sizeof(wchar_t)))),
          m_capacity(capacity) {
        wmemset(m_block, kCanary, capacity + kCanaryUnits);
    }
    ~GuardedBuffer() { GuardedMalloc::FreeGuardedBlock(m_block); }
    GuardedBuffer(const GuardedBuffer&) = delete;
    GuardedBuffer& operator=(const GuardedBuffer&) = delete;

    wchar_t* Get() { return m_block + kCanaryUnits; }
    // The canary is whole and the text ends inside the buffer (a buffer of 0 units holds nothing).
    bool Sound() const {
        for (size_t i = 0; i < kCanaryUnits; ++i)
            if (m_block[i] != kCanary) return false;
        return m_capacity == 0 || wmemchr(m_block + kCanaryUnits, L'\0', m_capacity);
    }

private:
    wchar_t* m_block;
    size_t m_capacity;
};

class Fuzzer {
public:
    explicit Fuzzer(unsigned seed) : m_random(seed) {}

    int Int(int low, int high) { return std::uniform_int_distribution<int>(low, high)(m_random); }

    // Separators, key characters, letters and a few units beyond ASCII; sometimes long.
    std::wstring Text() {
        static const wchar_t alphabet[] = L"\\/\\/!!##@ .abcXYZ019-\x00e9\x4e2d\xd83d\xde00";
        const int length = Int(0, 10) == 0 ? Int(200, 700) : Int(0, 40);
        std::wstring text;
        for (int i = 0; i < length; ++i) text += alphabet[Int(0, static_cast<int>(wcslen(alphabet)) - 1)];
        return text;
    }
    DATE Date() {
        switch (Int(0, 4)) {
        case 0: return std::numeric_limits<double>::quiet_NaN();
        case 1: return Int(0, 1) ? 1e300 : -1e300;
        default: return std::uniform_real_distribution<double>(-800000, 3000000)(m_random);
        }
    }

private:
    std::mt19937 m_random;
};

// Components the simple way, to check the manager's splitting against.
size_t ComponentCount(const std::wstring& path) {
    size_t count = 0;
    for (size_t i = 0; i < path.size(); ++i) count += !wcschr(L"\\/", path[i]) && (i == 0 || wcschr(L"\\/", path[i - 1]));
    return count;
}

void CheckTexts(const CReceiversPidlMgr& mgr, Fuzzer& fuzz, LPCITEMIDLIST list) {
    const bool keepKeys = fuzz.Int(0, 1) == 1;
    const UINT capacity = static_cast<UINT>(fuzz.Int(0, 300));
    GuardedBuffer path(capacity);
    const UINT length = mgr.GetPath(list, path.Get(), capacity, keepKeys);
    ASSERT_TRUE(path.Sound());
    const UINT sized = mgr.GetPath(list, nullptr, 0, keepKeys);
    // Every text fits here (names are shorter than 1000 units, lists at most 4 items).
    GuardedBuffer full(8192);
    const UINT fullLength = mgr.GetPath(list, full.Get(), 8192, keepKeys);
    if (fullLength > 0) { ASSERT_EQ(sized, fullLength + 1); }
    const std::wstring text = capacity ? path.Get() : L"";
    // A text that fits comes out exactly as from the large buffer, otherwise what fits is a prefix of it.
    ASSERT_EQ(std::wstring(full.Get()).compare(0, text.size(), text), 0);
    if (capacity > wcslen(full.Get())) { ASSERT_EQ(text + L"|" + std::to_wstring(length), full.Get() + (L"|" + std::to_wstring(fullLength))); }

    for (LPCITEMIDLIST item = list; mgr.GetData(item); item = mgr.GetNextItem(item)) {
        const UINT cap = static_cast<UINT>(fuzz.Int(0, 300));
        GuardedBuffer text(cap);
        const UINT written = mgr.GetItemText(item, fuzz.Int(-1, 5), text.Get(), cap);
        ASSERT_TRUE(text.Sound());
        ASSERT_TRUE(cap == 0 ? written == 0 : written == wcslen(text.Get()));
    }
}

TEST(PidlFuzzTest, RandomPathsCapacitiesAndColumns) {
    GuardedMalloc malloc;
    CReceiversPidlMgr mgr(&malloc);
    Fuzzer fuzz(20240611);
    for (int round = 0; round < kRounds; ++round) {
        SCOPED_TRACE(round);
        const std::wstring source = fuzz.Text();
        GuardedBuffer path(source.size() + 1);
        wcscpy(path.Get(), source.c_str());
        const DWORD brand = static_cast<DWORD>(fuzz.Int(0, 3));

        UniquePidl full(&malloc, mgr.CreateFromPath(path.Get(), brand));
        UniquePidl last(&malloc, mgr.CreateLastFromPath(path.Get(), brand));
        const size_t components = ComponentCount(source);
        ASSERT_EQ(mgr.GetItemCount(full.Get()), std::min<size_t>(components, 3));
        ASSERT_EQ(mgr.GetItemCount(last.Get()), components ? 1u : 0u);
        if (!full) continue;
        ReceiverItemData* data = mgr.GetData(mgr.GetLastItem(full.Get()));
        data->size = static_cast<DWORD>(fuzz.Int(0, 0x7FFFFFFF)) * (fuzz.Int(0, 1) + 1);
        data->time = fuzz.Date();
        ASSERT_EQ(mgr.GetItemName(mgr.GetLastItem(full.Get())), mgr.GetItemName(last.Get()));

        CheckTexts(mgr, fuzz, full.Get());
        const UINT index = static_cast<UINT>(fuzz.Int(0, 3));
        UniquePidl from(&malloc, mgr.CopyFrom(full.Get(), index));
        UniquePidl parent(&malloc, mgr.CopyParent(full.Get()));
        UniquePidl item(&malloc, mgr.CopyItem(mgr.GetLastItem(full.Get())));
        ASSERT_EQ(mgr.GetItemCount(from.Get()), index < components ? std::min<size_t>(components, 3) - index : 0);
        CheckTexts(mgr, fuzz, from.Get());
        CheckTexts(mgr, fuzz, parent.Get());
        CheckTexts(mgr, fuzz, item.Get());
    }
    EXPECT_EQ(malloc.Outstanding(), 0u);
}

TEST(PidlFuzzTest, RandomItemsOfEveryKind) {
    GuardedMalloc malloc;
    CReceiversPidlMgr mgr(&malloc);
    Fuzzer fuzz(7);
    for (int round = 0; round < kRounds; ++round) {
        SCOPED_TRACE(round);
        UniquePidl list;
        const int items = fuzz.Int(0, 4);
        for (int i = 0; i < items; ++i) {
            const std::wstring name = fuzz.Text();
            UniquePidl one(&malloc, mgr.Create(static_cast<DWORD>(fuzz.Int(0, 8)), name.c_str()));
            ASSERT_TRUE(one);
            mgr.GetData(one.Get())->size = static_cast<DWORD>(fuzz.Int(0, 0x7FFFFFFF));
            mgr.GetData(one.Get())->time = fuzz.Date();
            list = UniquePidl(&malloc, mgr.Concatenate(list.Get(), one.Get()));
        }
        ASSERT_EQ(mgr.GetItemCount(list.Get()), static_cast<UINT>(items));
        CheckTexts(mgr, fuzz, list.Get());
    }
    EXPECT_EQ(malloc.Outstanding(), 0u);
}
}  // namespace
