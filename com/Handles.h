#pragma once
// Owners for the plain Win32 handles the module uses.
#include <windows.h>
#include <utility>

template <class Traits>
class UniqueResource {
public:
    using Type = typename Traits::Type;
    UniqueResource() = default;
    explicit UniqueResource(Type value) : m_value(value) {}
    UniqueResource(const UniqueResource&) = delete;
    UniqueResource& operator=(const UniqueResource&) = delete;
    UniqueResource(UniqueResource&& o) noexcept : m_value(o.Release()) {}
    UniqueResource& operator=(UniqueResource&& o) noexcept { Reset(o.Release()); return *this; }
    ~UniqueResource() { Reset(); }

    Type Get() const { return m_value; }
    explicit operator bool() const { return Traits::IsValid(m_value); }
    Type* Put() { Reset(); return &m_value; }
    Type Release() { Type v = m_value; m_value = Traits::Invalid(); return v; }
    void Reset(Type value = Traits::Invalid()) {
        if (Traits::IsValid(m_value)) Traits::Close(m_value);
        m_value = value;
    }

private:
    Type m_value = Traits::Invalid();
};

struct HandleTraits {  // kernel objects whose "none" is null
    using Type = HANDLE;
    static Type Invalid() { return nullptr; }
    static bool IsValid(Type h) { return h != nullptr && h != INVALID_HANDLE_VALUE; }
    static void Close(Type h) { CloseHandle(h); }
};
struct FileHandleTraits : HandleTraits {  // CreateFile's "none" is INVALID_HANDLE_VALUE
    static Type Invalid() { return INVALID_HANDLE_VALUE; }
};
struct RegKeyTraits {
    using Type = HKEY;
    static Type Invalid() { return nullptr; }
    static bool IsValid(Type h) { return h != nullptr; }
    static void Close(Type h) { RegCloseKey(h); }
};
struct MenuTraits {
    using Type = HMENU;
    static Type Invalid() { return nullptr; }
    static bool IsValid(Type h) { return h != nullptr; }
    static void Close(Type h) { DestroyMenu(h); }
};
struct IconTraits {
    using Type = HICON;
    static Type Invalid() { return nullptr; }
    static bool IsValid(Type h) { return h != nullptr; }
    static void Close(Type h) { DestroyIcon(h); }
};
struct LibraryTraits {
    using Type = HMODULE;
    static Type Invalid() { return nullptr; }
    static bool IsValid(Type h) { return h != nullptr; }
    static void Close(Type h) { FreeLibrary(h); }
};
struct GlobalTraits {
    using Type = HGLOBAL;
    static Type Invalid() { return nullptr; }
    static bool IsValid(Type h) { return h != nullptr; }
    static void Close(Type h) { GlobalFree(h); }
};

using UniqueHandle = UniqueResource<HandleTraits>;
using UniqueFile = UniqueResource<FileHandleTraits>;
using UniqueRegKey = UniqueResource<RegKeyTraits>;
using UniqueMenu = UniqueResource<MenuTraits>;
using UniqueIcon = UniqueResource<IconTraits>;
using UniqueLibrary = UniqueResource<LibraryTraits>;
using UniqueGlobal = UniqueResource<GlobalTraits>;

// GlobalLock for a scope.
template <class T>
class GlobalLockGuard {
public:
    explicit GlobalLockGuard(HGLOBAL block) : m_block(block), m_data(static_cast<T*>(GlobalLock(block))) {}
    ~GlobalLockGuard() { if (m_data) GlobalUnlock(m_block); }
    GlobalLockGuard(const GlobalLockGuard&) = delete;
    GlobalLockGuard& operator=(const GlobalLockGuard&) = delete;
    T* Get() const { return m_data; }
    explicit operator bool() const { return m_data != nullptr; }

private:
    HGLOBAL m_block;
    T* m_data;
};
