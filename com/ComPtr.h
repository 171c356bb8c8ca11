#pragma once
#include <unknwn.h>
#include <utility>

// Owning interface pointer. Unlike WRL's ComPtr it needs no __uuidof: queries take the IID.
template <class T>
class ComPtr {
public:
    ComPtr() = default;
    ComPtr(std::nullptr_t) {}
    explicit ComPtr(T* p) : m_p(p) { if (m_p) m_p->AddRef(); }
    ComPtr(const ComPtr& o) : m_p(o.m_p) { if (m_p) m_p->AddRef(); }
    ComPtr(ComPtr&& o) noexcept : m_p(o.m_p) { o.m_p = nullptr; }
    ~ComPtr() { Reset(); }
    ComPtr& operator=(const ComPtr& o) { ComPtr(o).Swap(*this); return *this; }
    ComPtr& operator=(ComPtr&& o) noexcept { ComPtr(std::move(o)).Swap(*this); return *this; }

    T* Get() const { return m_p; }
    T* operator->() const { return m_p; }
    explicit operator bool() const { return m_p != nullptr; }
    // For out-parameters: releases what is held first.
    T** operator&() { Reset(); return &m_p; }
    T** ReleaseAndGetAddressOf() { Reset(); return &m_p; }
    void** PutVoid() { Reset(); return reinterpret_cast<void**>(&m_p); }

    void Reset() { if (T* p = m_p) { m_p = nullptr; p->Release(); } }
    void Attach(T* p) { Reset(); m_p = p; }
    T* Detach() { T* p = m_p; m_p = nullptr; return p; }
    void Swap(ComPtr& o) noexcept { std::swap(m_p, o.m_p); }

    // Hands out one more reference.
    template <class U>
    void CopyTo(U** pp) const { *pp = m_p; if (m_p) m_p->AddRef(); }

    HRESULT QueryTo(REFIID riid, void** ppv) const {
        if (!ppv) return E_POINTER;
        *ppv = nullptr;
        return m_p ? m_p->QueryInterface(riid, ppv) : E_NOINTERFACE;
    }
    template <class U>
    HRESULT As(REFIID riid, ComPtr<U>* out) const { return QueryTo(riid, out->PutVoid()); }

private:
    T* m_p = nullptr;
};
