#pragma once
// A plain enumerator over its own copy of FORMATETC records. Its Next and Skip results are
// deliberately not the textbook ones (see the .cpp): drop targets written against it rely on them.
#include <windows.h>
#include <objidl.h>

#include <vector>

class CEnumFormatEtc : public IEnumFORMATETC {
public:
    CEnumFormatEtc(UINT count, const FORMATETC* formats);
    CEnumFormatEtc(const CEnumFormatEtc&) = delete;
    CEnumFormatEtc& operator=(const CEnumFormatEtc&) = delete;

    // IUnknown
    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override;
    STDMETHODIMP_(ULONG) AddRef() override;
    STDMETHODIMP_(ULONG) Release() override;
    // IEnumFORMATETC
    STDMETHODIMP Next(ULONG count, FORMATETC* formats, ULONG* fetched) override;
    STDMETHODIMP Skip(ULONG count) override;
    STDMETHODIMP Reset() override;
    STDMETHODIMP Clone(IEnumFORMATETC** clone) override;

private:
    virtual ~CEnumFormatEtc() = default;

    ULONG m_cursor = 0;
    std::vector<FORMATETC> m_formats;  // copied whole; target devices are never deep-copied
    volatile LONG m_refCount = 0;
};
