#pragma once
// The item identifiers of the namespace and the one class that builds and reads them.
// The shell stores these bytes (shortcuts, history, "Shell IDList Array"), so the layout is a
// wire format: keep it byte for byte.
#include <windows.h>
#include <shlobj.h>
#include <cstddef>
#include <string>

#include "com/ComPtr.h"

// Item kinds, the `type` field.
enum ReceiverItemType : DWORD {
    ItemTypeCalvexRoot = 1,
    ItemTypeBrennorRoot = 2,
    ItemTypeCalvexReceiver = 3,
    ItemTypeBrennorReceiver = 4,
    ItemTypeNoItem = 5,  // never made; keeps "image index = kind - 1"
    ItemTypeFile = 6,
};
enum ReceiverBrand : DWORD { BrandCalvex = 1, BrandBrennor = 2 };

inline bool IsRootType(DWORD type) { return type == ItemTypeCalvexRoot || type == ItemTypeBrennorRoot; }
inline bool IsReceiverType(DWORD type) { return type == ItemTypeCalvexReceiver || type == ItemTypeBrennorReceiver; }
inline bool IsFileType(DWORD type) { return type == ItemTypeFile; }

// What is wrong with a list that came from outside, and where.
enum class PidlFault { None, ByteCount, Name, Length };
struct PidlCheck {
    PidlFault fault = PidlFault::None;
    UINT item = 0;    // 0-based index of the item at fault
    DWORD value = 0;  // its byte count (ByteCount)
    explicit operator bool() const { return fault == PidlFault::None; }
};

#pragma pack(push, 1)
// What follows the 16-bit cb of an item. Items after the first of a list start at odd
// addresses (cb is odd), so the record is packed and read field by field, never by a
// wchar_t* into `name`.
struct ReceiverItemData {
    DWORD type;
    DWORD size;  // files only
    DATE time;   // files only, OLE Automation date
    WCHAR name[1];
};
struct ReceiverItem {
    USHORT cb;
    ReceiverItemData data;
};
#pragma pack(pop)
static_assert(offsetof(ReceiverItem, data) + offsetof(ReceiverItemData, type) == 2, "type at 2");
static_assert(offsetof(ReceiverItem, data) + offsetof(ReceiverItemData, size) == 6, "size at 6");
static_assert(offsetof(ReceiverItem, data) + offsetof(ReceiverItemData, time) == 10, "time at 10");
static_assert(offsetof(ReceiverItem, data) + offsetof(ReceiverItemData, name) == 18, "name at 18");

class CReceiversPidlMgr {
public:
    // Lists come from the given allocator, or from the shell's task allocator (SHGetMalloc)
    // when none is given; tests pass their own.
    explicit CReceiversPidlMgr(IMalloc* malloc = nullptr);
    CReceiversPidlMgr(const CReceiversPidlMgr&) = delete;
    CReceiversPidlMgr& operator=(const CReceiversPidlMgr&) = delete;

    // False when no allocator could be had; owners then fail their construction.
    bool IsValid() const { return static_cast<bool>(m_malloc); }
    IMalloc* Malloc() const { return m_malloc.Get(); }

    LPITEMIDLIST Create(DWORD type, const wchar_t* name) const;
    LPITEMIDLIST CreateRoot(DWORD brand) const;
    LPITEMIDLIST CreateFromPath(const wchar_t* path, DWORD brand) const;
    LPITEMIDLIST CreateLastFromPath(const wchar_t* path, DWORD brand) const;
    LPITEMIDLIST Concatenate(LPCITEMIDLIST first, LPCITEMIDLIST second) const;
    LPITEMIDLIST Copy(LPCITEMIDLIST list) const;
    LPITEMIDLIST CopyItem(LPCITEMIDLIST item) const;
    LPITEMIDLIST CopyParent(LPCITEMIDLIST list) const;
    LPITEMIDLIST CopyFrom(LPCITEMIDLIST list, UINT index) const;
    void Delete(LPITEMIDLIST list) const;

    LPITEMIDLIST GetNextItem(LPCITEMIDLIST item) const;
    LPITEMIDLIST GetLastItem(LPCITEMIDLIST list) const;
    UINT GetItemCount(LPCITEMIDLIST list) const;
    UINT GetSize(LPCITEMIDLIST list) const;
    // Null for null, and for the terminator (an item without data).
    ReceiverItemData* GetData(LPCITEMIDLIST item) const;
    // 0 for a list without items (callers never ask for one).
    DWORD GetLastItemType(LPCITEMIDLIST list) const;
    // The item's name, read safely at any alignment; empty for null.
    std::wstring GetItemName(LPCITEMIDLIST item) const;

    // Lists handed in by the shell may come from disk (shortcuts, saved views) or from another
    // program, damaged or not ours. Nothing of such a list is read before it passes: every
    // item's count covers the fixed fields and its name ends inside it, and the whole list
    // adds up to a size GetSize can count. Only memory decides: an item of any kind that is
    // whole inside its bytes passes, and the folder answers for it as for any other. Only the
    // count of an item and the bytes inside it are read. Null and empty lists pass.
    PidlCheck Check(LPCITEMIDLIST list) const;

    // The item path of the list ("\"-joined; receivers as model@port unless keepKeys).
    // Null buffer: the size to allocate, terminator included.
    UINT GetPath(LPCITEMIDLIST list, wchar_t* buffer, UINT capacity, bool keepKeys) const;
    // One column's text of one item, cut to the capacity; returns the length written.
    UINT GetItemText(LPCITEMIDLIST item, int column, wchar_t* buffer, UINT capacity) const;

private:
    LPITEMIDLIST Allocate(size_t bytes) const;
    std::wstring ColumnText(LPCITEMIDLIST item, int column) const;

    ComPtr<IMalloc> m_malloc;
};

// Owns one item identifier list and frees it through the allocator it came from.
class UniquePidl {
public:
    UniquePidl() = default;
    UniquePidl(const CReceiversPidlMgr& manager, LPITEMIDLIST list) : m_malloc(manager.Malloc()), m_list(list) {}
    UniquePidl(IMalloc* malloc, LPITEMIDLIST list) : m_malloc(malloc), m_list(list) {}
    UniquePidl(const UniquePidl&) = delete;
    UniquePidl& operator=(const UniquePidl&) = delete;
    UniquePidl(UniquePidl&& o) noexcept : m_malloc(std::move(o.m_malloc)), m_list(o.Release()) {}
    UniquePidl& operator=(UniquePidl&& o) noexcept {
        if (this != &o) {
            Reset();
            m_malloc = std::move(o.m_malloc);
            m_list = o.Release();
        }
        return *this;
    }
    ~UniquePidl() { Reset(); }

    LPITEMIDLIST Get() const { return m_list; }
    explicit operator bool() const { return m_list != nullptr; }
    LPITEMIDLIST Release() { LPITEMIDLIST list = m_list; m_list = nullptr; return list; }
    void Reset(LPITEMIDLIST list = nullptr) {
        if (m_list && m_malloc) m_malloc->Free(m_list);
        m_list = list;
    }

private:
    ComPtr<IMalloc> m_malloc;
    LPITEMIDLIST m_list = nullptr;
};
