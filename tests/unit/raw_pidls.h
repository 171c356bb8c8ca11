#pragma once
// Item identifier lists written byte by byte, as another program or a damaged file may hand
// them in, and placed so that the byte after their terminator cannot be read.
#include <windows.h>
#include <shlobj.h>

#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "pidl_test_malloc.h"

namespace rawpidl {

// One item as it stands in the bytes: its count need not fit what follows it.
struct RawItem {
    USHORT cb;
    DWORD type;
    std::wstring name;      // written as far as cb reaches
    bool terminated = true; // a zero unit after the name, if cb reaches it
    DWORD size = 0;
    double time = 0;
};

// What our own manager makes: cb = name bytes + 27.
inline RawItem Whole(DWORD type, const std::wstring& name, DWORD size = 0, double time = 0) {
    return RawItem{static_cast<USHORT>((name.size() + 1) * 2 + 27), type, name, true, size, time};
}

// The bytes of the items and a zero count after them. Only bytes below each item's count
// are its own; a count below 2 ends the list (its high byte starts the terminator).
inline std::vector<BYTE> Bytes(const std::vector<RawItem>& items) {
    std::vector<BYTE> bytes;
    for (const RawItem& item : items) {
        const size_t at = bytes.size();
        std::vector<BYTE> whole(18 + (item.name.size() + 1) * 2 + 9, 0x41);  // slack that is no terminator
        memcpy(&whole[0], &item.cb, 2);
        memcpy(&whole[2], &item.type, 4);
        memcpy(&whole[6], &item.size, 4);
        memcpy(&whole[10], &item.time, 8);
        memcpy(&whole[18], item.name.data(), item.name.size() * 2);
        const BYTE end = item.terminated ? 0 : 0x42;
        whole[18 + item.name.size() * 2] = whole[19 + item.name.size() * 2] = end;
        whole.resize(item.cb < 2 ? 2 : item.cb, 0x43);
        bytes.insert(bytes.end(), whole.begin(), whole.end());
        if (item.cb < 2) {
            bytes.resize(at + item.cb);
            break;
        }
    }
    bytes.resize(bytes.size() + 2, 0);
    return bytes;
}

// The bytes at the very end of a readable block: one byte more faults at once.
class Guarded {
public:
    explicit Guarded(const std::vector<BYTE>& bytes) : m_size(bytes.size()) {
        m_block = static_cast<BYTE*>(GuardedMalloc::GuardedBlock(bytes.size()));
        if (m_block) memcpy(m_block, bytes.data(), bytes.size());
    }
    ~Guarded() { GuardedMalloc::FreeGuardedBlock(m_block); }
    Guarded(const Guarded&) = delete;
    Guarded& operator=(const Guarded&) = delete;
    LPITEMIDLIST Get() const { return reinterpret_cast<LPITEMIDLIST>(m_block); }
    // The bytes in hexadecimal, for a failure's message (long lists are cut).
    std::string Hex() const {
        std::string text;
        char unit[4];
        for (size_t i = 0; i < m_size && i < 96; ++i) snprintf(unit, sizeof unit, "%02X ", m_block[i]), text += unit;
        return m_size > 96 ? text + "... (" + std::to_string(m_size) + " bytes)" : text;
    }

private:
    BYTE* m_block = nullptr;
    size_t m_size;
};

}  // namespace rawpidl
