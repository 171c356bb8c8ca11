#include "items/CReceiversPidlMgr.h"

#include <cstring>
#include <new>
#include <vector>

#include "items/ItemPath.h"
#include "items/ItemTexts.h"

namespace {
const size_t kNameOffset = offsetof(ReceiverItem, data) + offsetof(ReceiverItemData, name);
// Bytes after the name's terminator that cb counts and nobody writes: part of the format.
const size_t kItemOverhead = 27;
// Longest name whose cb still fits 16 bits; longer names are refused rather than wrapped.
const size_t kMaxNameLength = (0xFFFF - kItemOverhead) / 2 - 1;
const size_t kWorkBufferLength = 260;
// GetSize counts a list in 32 bits.
const ULONGLONG kMaxListSize = 0xFFFFFFFFull;

// Items after the first start at odd addresses: read and write them bytewise.
USHORT ReadCb(const void* item) {
    USHORT cb;
    memcpy(&cb, item, sizeof cb);
    return cb;
}
void WriteCb(void* at, USHORT cb) { memcpy(at, &cb, sizeof cb); }
DWORD ReadType(const void* item) {
    DWORD type;
    memcpy(&type, static_cast<const BYTE*>(item) + offsetof(ReceiverItem, data.type), sizeof type);
    return type;
}

// True when a zero unit ends the name before the item does.
bool HasTerminatedName(const BYTE* item, USHORT cb) {
    for (size_t at = kNameOffset; at + sizeof(WCHAR) <= cb; at += sizeof(WCHAR)) {
        if (item[at] == 0 && item[at + 1] == 0) return true;
    }
    return false;
}

DWORD RootType(DWORD brand) { return brand == BrandBrennor ? ItemTypeBrennorRoot : ItemTypeCalvexRoot; }
DWORD ReceiverType(DWORD brand) {
    return brand == BrandBrennor ? ItemTypeBrennorReceiver : ItemTypeCalvexReceiver;
}

// Appends into a caller's buffer of `capacity` units and never past it: at most
// capacity - 1 units and a terminator, none at all for a capacity of 0. It remembers the
// whole text's last unit and how much of it did not fit, so that dropping a trailing
// separator that never reached the buffer gives the same result as if it had.
class BoundedText {
public:
    BoundedText(wchar_t* buffer, UINT capacity) : m_buffer(buffer), m_capacity(buffer ? capacity : 0) {
        if (m_capacity) m_buffer[0] = L'\0';
    }
    void Append(const std::wstring& text) {
        for (wchar_t c : text) {
            m_last = c;
            if (m_length + 1 < m_capacity) {
                m_buffer[m_length++] = c;
            } else {
                ++m_unwritten;
            }
        }
        if (m_capacity) m_buffer[m_length] = L'\0';
    }
    bool EndsWith(wchar_t c) const { return (m_length > 0 || m_unwritten > 0) && m_last == c; }
    void DropLast() {
        if (m_unwritten > 0) {
            --m_unwritten;
        } else {
            m_buffer[--m_length] = L'\0';
        }
    }
    UINT Length() const { return m_length; }

private:
    wchar_t* m_buffer;
    UINT m_capacity;
    UINT m_length = 0;
    UINT m_unwritten = 0;
    wchar_t m_last = L'\0';
};
}  // namespace

CReceiversPidlMgr::CReceiversPidlMgr(IMalloc* malloc) : m_malloc(malloc) {
    if (!m_malloc && FAILED(SHGetMalloc(&m_malloc))) m_malloc.Reset();
}

LPITEMIDLIST CReceiversPidlMgr::Allocate(size_t bytes) const {
    return m_malloc ? static_cast<LPITEMIDLIST>(m_malloc->Alloc(bytes)) : nullptr;
}

LPITEMIDLIST CReceiversPidlMgr::Create(DWORD type, const wchar_t* name) const {
    if (!name) name = L"";
    const size_t length = wcslen(name);
    if (length > kMaxNameLength) return nullptr;
    const USHORT nameBytes = static_cast<USHORT>((length + 1) * sizeof(WCHAR));
    const USHORT cb = static_cast<USHORT>(nameBytes + kItemOverhead);
    LPITEMIDLIST list = Allocate(static_cast<size_t>(cb) + 2);
    if (!list) return nullptr;
    // Only cb, type, the name and the list terminator are written; size, time and the
    // slack keep whatever the allocator gave.
    BYTE* bytes = reinterpret_cast<BYTE*>(list);
    WriteCb(bytes, cb);
    memcpy(bytes + offsetof(ReceiverItem, data.type), &type, sizeof type);
    memcpy(bytes + kNameOffset, name, nameBytes);
    WriteCb(bytes + cb, 0);
    return list;
}

LPITEMIDLIST CReceiversPidlMgr::CreateRoot(DWORD brand) const {
    // Both brands' roots carry this name: the root's name does not depend on the brand.
    return Create(RootType(brand), L"Calvex Receivers");
}

LPITEMIDLIST CReceiversPidlMgr::CreateFromPath(const wchar_t* path, DWORD brand) const {
    try {
        const std::vector<std::wstring> parts = SplitItemPath(path);
        if (parts.empty()) return nullptr;
        UniquePidl root(*this, Create(RootType(brand), parts[0].c_str()));
        if (!root || parts.size() == 1) return root.Release();
        UniquePidl receiver(*this, Create(ReceiverType(brand), parts[1].c_str()));
        if (!receiver) return nullptr;
        UniquePidl upper(*this, Concatenate(root.Get(), receiver.Get()));
        if (!upper || parts.size() == 2) return upper.Release();
        UniquePidl file(*this, Create(ItemTypeFile, JoinItemPath(parts, 2).c_str()));
        return file ? Concatenate(upper.Get(), file.Get()) : nullptr;
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

LPITEMIDLIST CReceiversPidlMgr::CreateLastFromPath(const wchar_t* path, DWORD brand) const {
    try {
        const std::vector<std::wstring> parts = SplitItemPath(path);
        if (parts.empty()) return nullptr;
        if (parts.size() == 1) return Create(RootType(brand), parts[0].c_str());
        if (parts.size() == 2) return Create(ReceiverType(brand), parts[1].c_str());
        return Create(ItemTypeFile, JoinItemPath(parts, 2).c_str());
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

LPITEMIDLIST CReceiversPidlMgr::Concatenate(LPCITEMIDLIST first, LPCITEMIDLIST second) const {
    if (!first) return Copy(second);
    if (!second) return Copy(first);
    const UINT firstBytes = GetSize(first) - 2;
    const UINT secondBytes = GetSize(second);
    LPITEMIDLIST list = Allocate(static_cast<size_t>(firstBytes) + secondBytes);
    if (!list) return nullptr;
    memcpy(list, first, firstBytes);
    memcpy(reinterpret_cast<BYTE*>(list) + firstBytes, second, secondBytes);
    return list;
}

LPITEMIDLIST CReceiversPidlMgr::Copy(LPCITEMIDLIST list) const {
    if (!list) return nullptr;
    const UINT bytes = GetSize(list);
    LPITEMIDLIST copy = Allocate(bytes);
    if (copy) memcpy(copy, list, bytes);
    return copy;
}

LPITEMIDLIST CReceiversPidlMgr::CopyItem(LPCITEMIDLIST item) const {
    if (!item) return nullptr;
    const USHORT cb = ReadCb(item);
    LPITEMIDLIST copy = Allocate(static_cast<size_t>(cb) + 2);
    if (!copy) return nullptr;
    // The item and the two bytes after it, whose place then takes the terminator.
    memcpy(copy, item, static_cast<size_t>(cb) + 2);
    WriteCb(reinterpret_cast<BYTE*>(copy) + cb, 0);
    return copy;
}

LPITEMIDLIST CReceiversPidlMgr::CopyParent(LPCITEMIDLIST list) const {
    if (GetItemCount(list) < 2) return nullptr;
    const UINT parentBytes = GetSize(list) - 2 - ReadCb(GetLastItem(list));
    LPITEMIDLIST copy = Allocate(static_cast<size_t>(parentBytes) + 2);
    if (!copy) return nullptr;
    memcpy(copy, list, parentBytes);
    WriteCb(reinterpret_cast<BYTE*>(copy) + parentBytes, 0);
    return copy;
}

LPITEMIDLIST CReceiversPidlMgr::CopyFrom(LPCITEMIDLIST list, UINT index) const {
    if (index >= GetItemCount(list)) return nullptr;
    LPCITEMIDLIST item = list;
    for (UINT i = 0; i < index; ++i) item = GetNextItem(item);
    return Copy(item);
}

void CReceiversPidlMgr::Delete(LPITEMIDLIST list) const {
    if (list && m_malloc) m_malloc->Free(list);
}

LPITEMIDLIST CReceiversPidlMgr::GetNextItem(LPCITEMIDLIST item) const {
    if (!item) return nullptr;
    return reinterpret_cast<LPITEMIDLIST>(const_cast<BYTE*>(reinterpret_cast<const BYTE*>(item)) + ReadCb(item));
}

LPITEMIDLIST CReceiversPidlMgr::GetLastItem(LPCITEMIDLIST list) const {
    if (!list || ReadCb(list) == 0) return nullptr;
    LPCITEMIDLIST last = list;
    for (LPCITEMIDLIST next = GetNextItem(list); ReadCb(next) != 0; next = GetNextItem(next)) last = next;
    return const_cast<LPITEMIDLIST>(last);
}

UINT CReceiversPidlMgr::GetItemCount(LPCITEMIDLIST list) const {
    UINT count = 0;
    for (LPCITEMIDLIST item = list; item && ReadCb(item) != 0; item = GetNextItem(item)) ++count;
    return count;
}

UINT CReceiversPidlMgr::GetSize(LPCITEMIDLIST list) const {
    if (!list) return 0;
    UINT bytes = 2;
    for (LPCITEMIDLIST item = list; ReadCb(item) != 0; item = GetNextItem(item)) bytes += ReadCb(item);
    return bytes;
}

ReceiverItemData* CReceiversPidlMgr::GetData(LPCITEMIDLIST item) const {
    if (!item || ReadCb(item) == 0) return nullptr;
    auto* bytes = const_cast<BYTE*>(reinterpret_cast<const BYTE*>(item));
    return reinterpret_cast<ReceiverItemData*>(bytes + offsetof(ReceiverItem, data));
}

DWORD CReceiversPidlMgr::GetLastItemType(LPCITEMIDLIST list) const {
    LPCITEMIDLIST last = GetLastItem(list);
    return last ? ReadType(last) : 0;
}

PidlCheck CReceiversPidlMgr::Check(LPCITEMIDLIST list) const {
    PidlCheck check;
    // The walk ends at the terminator: every step is at least the fixed fields long and reads
    // only inside the item it steps over. It stops where the size would pass what GetSize's
    // 32 bits count, since Copy and Concatenate allocate by that count and copy the real bytes.
    const BYTE* item = reinterpret_cast<const BYTE*>(list);
    for (ULONGLONG size = sizeof(USHORT); item; ++check.item) {
        const USHORT cb = ReadCb(item);
        if (cb == 0) return check;
        if (cb < kNameOffset + sizeof(WCHAR)) return check.fault = PidlFault::ByteCount, check.value = cb, check;
        if (!HasTerminatedName(item, cb)) return check.fault = PidlFault::Name, check;
        size += cb;
        if (size > kMaxListSize) return check.fault = PidlFault::Length, check;
        item += cb;
    }
    return check;
}

std::wstring CReceiversPidlMgr::GetItemName(LPCITEMIDLIST item) const {
    std::wstring name;
    if (!item) return name;
    const USHORT cb = ReadCb(item);
    if (cb <= kNameOffset) return name;
    // The scan stays inside the item even if a terminator were missing.
    const BYTE* at = reinterpret_cast<const BYTE*>(item) + kNameOffset;
    const size_t maxUnits = (cb - kNameOffset) / sizeof(WCHAR);
    for (size_t i = 0; i < maxUnits; ++i, at += sizeof(WCHAR)) {
        WCHAR unit;
        memcpy(&unit, at, sizeof unit);
        if (unit == L'\0') break;
        name += unit;
    }
    return name;
}

UINT CReceiversPidlMgr::GetPath(LPCITEMIDLIST list, wchar_t* buffer, UINT capacity, bool keepKeys) const {
    const bool sizing = buffer == nullptr;
    // The written text is bounded by the capacity, where an unbounded walk would run past
    // the buffer. This is a bound, not a change: texts that fit come out the same, and the
    // returned count is the walk's own count either way.
    BoundedText text(buffer, capacity);
    UINT running = 0;
    try {
        for (LPCITEMIDLIST item = list; item && ReadCb(item) != 0; item = GetNextItem(item)) {
            if (!sizing && running >= capacity) break;
            const std::wstring name = GetItemName(item);
            if (keepKeys || !IsReceiverType(ReadType(item))) {
                text.Append(name);
                text.Append(L"\\");
                running += static_cast<UINT>(name.size()) + 1;
                continue;
            }
            const std::vector<std::wstring> fields = SplitReceiverKey(name.c_str());
            if (fields.size() < 2) return 0;
            const std::wstring model = ModelFromKeyField(fields[1]);
            const std::wstring port = fields.size() > 2 ? fields[2] : std::wstring();
            text.Append(model + L"@" + port + L"\\");
            // Only a key of exactly three fields counts its texts; kept as the walk always did.
            running += 2;
            if (fields.size() == 3) running += static_cast<UINT>(model.size() + port.size());
        }
    } catch (const std::bad_alloc&) {
        return 0;
    }
    // Every item ends in "\": the sizing count is the text without it, plus the terminator.
    if (sizing) return running == 0 ? 1 : running;
    if (running == 0) return 0;
    if (text.EndsWith(L'\\')) {
        text.DropLast();
        return running - 1;
    }
    return running;
}

std::wstring CReceiversPidlMgr::ColumnText(LPCITEMIDLIST item, int column) const {
    const ReceiverItemData* data = GetData(item);
    if (!data || column < 0) return std::wstring();
    if (column == 0) return GetItemName(item);
    const DWORD type = data->type;
    if (IsFileType(type)) {
        std::wstring text = column == 1 ? FormatFileSize(data->size)
                          : column == 2 ? FormatFileTime(data->time)
                                        : std::wstring();
        if (text.size() >= kWorkBufferLength) text.resize(kWorkBufferLength - 1);
        return text;
    }
    if (IsReceiverType(type) && column <= 3) {
        const std::wstring key = GetItemName(item);
        const std::vector<std::wstring> fields = SplitReceiverKey(key.c_str());
        if (static_cast<size_t>(column) > fields.size()) return std::wstring();
        return column == 2 ? ModelFromKeyField(fields[1]) : fields[column - 1];
    }
    return std::wstring();
}

UINT CReceiversPidlMgr::GetItemText(LPCITEMIDLIST item, int column, wchar_t* buffer, UINT capacity) const {
    BoundedText text(buffer, capacity);
    try {
        text.Append(ColumnText(item, column));
    } catch (const std::bad_alloc&) {
    }
    return text.Length();
}
