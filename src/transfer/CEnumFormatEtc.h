#pragma once
// A plain enumerator over its own copy of FORMATETC records. Its Next and Skip results are
// deliberately not the textbook ones (see the .cpp): drop targets written against it rely on them.
// It holds no module lock: the data object that hands it out does.
#include <windows.h>
#include <objidl.h>

#include <vector>

#include "com/ComObject.h"

class CEnumFormatEtc : public RefCounted<CEnumFormatEtc, IEnumFORMATETC> {
public:
    CEnumFormatEtc(UINT count, const FORMATETC* formats);

    BEGIN_INTERFACE_TABLE(CEnumFormatEtc)
        INTERFACE_ENTRY(IEnumFORMATETC)
    END_INTERFACE_TABLE()

    // IEnumFORMATETC
    STDMETHODIMP Next(ULONG count, FORMATETC* formats, ULONG* fetched) override;
    STDMETHODIMP Skip(ULONG count) override;
    STDMETHODIMP Reset() override;
    STDMETHODIMP Clone(IEnumFORMATETC** clone) override;

private:
    ~CEnumFormatEtc() override = default;

    ULONG m_cursor = 0;
    std::vector<FORMATETC> m_formats;  // copied whole; target devices are never deep-copied
};
