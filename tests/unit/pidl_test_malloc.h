#pragma once
// A test allocator for item identifier code: every block ends exactly at a no-access page,
// so reading or writing one byte past it faults at once; new blocks are filled with a
// pattern (to see which bytes were written); allocations can be made to fail; and the
// blocks still held are counted.
#include <windows.h>
#include <objidl.h>

#include <algorithm>
#include <cstring>
#include <map>

class GuardedMalloc : public IMalloc {
public:
    static constexpr BYTE kFill = 0xCD;

    // A block of `bytes` that ends right before a PAGE_NOACCESS page.
    static void* GuardedBlock(size_t bytes) {
        SYSTEM_INFO info;
        GetSystemInfo(&info);
        const size_t page = info.dwPageSize;
        const size_t dataPages = (bytes + page - 1) / page;
        BYTE* base = static_cast<BYTE*>(
            VirtualAlloc(nullptr, (dataPages + 1) * page, MEM_RESERVE | MEM_COMMIT, PAGE_READWRITE));
        if (!base) return nullptr;
        DWORD old = 0;
        VirtualProtect(base + dataPages * page, page, PAGE_NOACCESS, &old);
        BYTE* block = base + dataPages * page - bytes;
        memset(block, kFill, bytes);
        return block;
    }
    static void FreeGuardedBlock(void* block) {
        MEMORY_BASIC_INFORMATION info;
        if (block && VirtualQuery(block, &info, sizeof info)) VirtualFree(info.AllocationBase, 0, MEM_RELEASE);
    }

    // Fails the allocation after `successes` more successful ones (-1: never).
    void FailAfter(int successes) { m_failAfter = successes; }
    size_t Outstanding() const { return m_blocks.size(); }
    size_t LastSize() const { return m_lastSize; }
    size_t Allocations() const { return m_allocations; }
    // References held by others (the test's own one not counted).
    ULONG HeldReferences() const { return m_refs - 1; }

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        if (IsEqualIID(riid, IID_IUnknown) || IsEqualIID(riid, IID_IMalloc)) {
            *ppv = static_cast<IMalloc*>(this);
            AddRef();
            return S_OK;
        }
        *ppv = nullptr;
        return E_NOINTERFACE;
    }
    // Lives on the test's stack: the count is only looked at, never acted on.
    STDMETHODIMP_(ULONG) AddRef() override { return ++m_refs; }
    STDMETHODIMP_(ULONG) Release() override { return --m_refs; }

    STDMETHODIMP_(void*) Alloc(SIZE_T bytes) override {
        if (m_failAfter == 0) return nullptr;
        if (m_failAfter > 0) --m_failAfter;
        void* block = GuardedBlock(bytes);
        if (block) {
            m_blocks[block] = bytes;
            m_lastSize = bytes;
            ++m_allocations;
        }
        return block;
    }
    STDMETHODIMP_(void*) Realloc(void* old, SIZE_T bytes) override {
        void* block = Alloc(bytes);
        if (block && old) {
            memcpy(block, old, std::min<size_t>(bytes, m_blocks[old]));
            Free(old);
        }
        return block;
    }
    STDMETHODIMP_(void) Free(void* block) override {
        if (!block) return;
        m_blocks.erase(block);
        FreeGuardedBlock(block);
    }
    STDMETHODIMP_(SIZE_T) GetSize(void* block) override {
        auto found = m_blocks.find(block);
        return found == m_blocks.end() ? static_cast<SIZE_T>(-1) : found->second;
    }
    STDMETHODIMP_(int) DidAlloc(void* block) override { return m_blocks.count(block) ? 1 : 0; }
    STDMETHODIMP_(void) HeapMinimize() override {}

private:
    ULONG m_refs = 1;
    int m_failAfter = -1;
    size_t m_lastSize = 0;
    size_t m_allocations = 0;
    std::map<void*, size_t> m_blocks;
};
