#pragma once
// How a property of the simulator answers: the out-pointer is cleared first; a configured
// failure returns with nothing handed out; a configured success code other than S_OK hands
// the value out and returns that code, as a careless device would.
#include <windows.h>
#include <oleauto.h>

#include <string>

template <class T>
HRESULT SimHandOut(HRESULT fault, T value, T* out) {
    if (!out) return E_POINTER;
    *out = T();
    if (FAILED(fault)) return fault;
    *out = value;
    return fault;
}

inline HRESULT SimHandOutText(HRESULT fault, const std::wstring& value, BSTR* out) {
    if (!out) return E_POINTER;
    *out = nullptr;
    if (FAILED(fault)) return fault;
    *out = SysAllocStringLen(value.data(), static_cast<UINT>(value.size()));
    return *out ? fault : E_OUTOFMEMORY;
}
