#pragma once
// A test allocator for item identifier code: each block ends at a no-access page (a byte past
// it faults at once), is filled with kFill, can be made to fail, and is counted until freed.
#include <windows.h>
#include <objidl.h>

#include <cstring>
#include <map>

class GuardedMalloc : public IMalloc {
public:
    static constexpr BYTE kFill = 0xCD;
    static constexpr size_t kPage = 4096;

    static void* GuardedBlock(size_t bytes) {
        const size_t dataPages = (bytes + kPage - 1) / kPage;
        auto* base = static_cast<BYTE*>(VirtualAlloc(nullptr, (dataPages + 1) * kPage, MEM_RESERVE | MEM_COMMIT, PAGE_READWRITE));
        DWORD old = 0;
        if (!base || !VirtualProtect(base + dataPages * kPage, kPage, PAGE_NOACCESS, &old)) return nullptr;
        return memset(base + dataPages * kPage - bytes, kFill, bytes);
    }
    static void FreeGuardedBlock(void* block) {
        MEMORY_BASIC_INFORMATION info;
        if (block && VirtualQuery(block, &info, sizeof info)) VirtualFree(info.AllocationBase, 0, MEM_RELEASE);
    }

    void FailAfter(int successes) { m_failAfter = successes; }  // -1: never
    size_t Outstanding() const { return m_blocks.size(); }
    size_t LastSize() const { return m_lastSize; }
    ULONG HeldReferences() const { return m_refs - 1; }  // the test's own one not counted

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        *ppv = IsEqualIID(riid, IID_IUnknown) || IsEqualIID(riid, IID_IMalloc) ? static_cast<IMalloc*>(this) : nullptr;
        return *ppv ? (AddRef(), S_OK) : E_NOINTERFACE;
    }
    // Lives on the test's stack: the count is only looked at.
    STDMETHODIMP_(ULONG) AddRef() override { return ++m_refs; }
    STDMETHODIMP_(ULONG) Release() override { return --m_refs; }
    STDMETHODIMP_(void*) Alloc(SIZE_T bytes) override {
        if (m_failAfter == 0) return nullptr;
        if (m_failAfter > 0) --m_failAfter;
        void* block = GuardedBlock(bytes);
        if (block) m_blocks[block] = m_lastSize = bytes;
        return block;
    }
    STDMETHODIMP_(void*) Realloc(void*, SIZE_T) override { return nullptr; }  // item code never grows a block
    STDMETHODIMP_(void) Free(void* block) override {
        if (block && m_blocks.erase(block)) FreeGuardedBlock(block);
    }
    STDMETHODIMP_(SIZE_T) GetSize(void* block) override { return DidAlloc(block) ? m_blocks[block] : static_cast<SIZE_T>(-1); }
    STDMETHODIMP_(int) DidAlloc(void* block) override { return m_blocks.count(block) ? 1 : 0; }
    STDMETHODIMP_(void) HeapMinimize() override {}

private:
    ULONG m_refs = 1;
    int m_failAfter = -1;
    size_t m_lastSize = 0;
    std::map<void*, size_t> m_blocks;
};
