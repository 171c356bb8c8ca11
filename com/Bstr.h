#pragma once
#include <windows.h>
#include <oleauto.h>
#include <string>

// Owned BSTR. Put() is for out-parameters of the device manager's properties.
class Bstr {
public:
    Bstr() = default;
    explicit Bstr(const wchar_t* text) : m_s(text ? SysAllocString(text) : nullptr) {}
    explicit Bstr(const std::wstring& text)
        : m_s(SysAllocStringLen(text.data(), static_cast<UINT>(text.size()))) {}
    Bstr(const Bstr&) = delete;
    Bstr& operator=(const Bstr&) = delete;
    Bstr(Bstr&& o) noexcept : m_s(o.m_s) { o.m_s = nullptr; }
    Bstr& operator=(Bstr&& o) noexcept { if (this != &o) { Reset(); m_s = o.m_s; o.m_s = nullptr; } return *this; }
    ~Bstr() { Reset(); }

    BSTR Get() const { return m_s; }
    BSTR* Put() { Reset(); return &m_s; }
    void Reset() { if (m_s) { SysFreeString(m_s); m_s = nullptr; } }
    UINT Length() const { return m_s ? SysStringLen(m_s) : 0; }
    // Null and empty are the same text to every reader.
    std::wstring Str() const { return m_s ? std::wstring(m_s, SysStringLen(m_s)) : std::wstring(); }

private:
    BSTR m_s = nullptr;
};

class Variant {
public:
    Variant() { VariantInit(&m_v); }
    ~Variant() { VariantClear(&m_v); }
    Variant(const Variant&) = delete;
    Variant& operator=(const Variant&) = delete;
    VARIANT* Get() { return &m_v; }
    const VARIANT& Ref() const { return m_v; }

private:
    VARIANT m_v;
};
