#include "transfer/CEnumFormatEtc.h"

#include <new>

CEnumFormatEtc::CEnumFormatEtc(UINT count, const FORMATETC* formats) {
    if (formats) m_formats.assign(formats, formats + count);
}

// A short batch still answers S_OK: callers loop on the fetched count, not on the result.
STDMETHODIMP CEnumFormatEtc::Next(ULONG count, FORMATETC* formats, ULONG* fetched) {
    if (m_formats.empty()) return S_FALSE;
    if (!fetched && count != 1) return E_POINTER;
    if (fetched) *fetched = 0;
    if (!formats || m_cursor >= m_formats.size()) return S_FALSE;
    ULONG copied = 0;
    while (copied < count && m_cursor < m_formats.size()) formats[copied++] = m_formats[m_cursor++];
    if (fetched) *fetched = copied;
    return S_OK;
}

// Skipping exactly to the end is refused as well, and leaves the cursor where it was.
STDMETHODIMP CEnumFormatEtc::Skip(ULONG count) {
    if (m_formats.empty() || static_cast<ULONGLONG>(m_cursor) + count >= m_formats.size()) return S_FALSE;
    m_cursor += count;
    return S_OK;
}

STDMETHODIMP CEnumFormatEtc::Reset() {
    m_cursor = 0;
    return S_OK;
}

STDMETHODIMP CEnumFormatEtc::Clone(IEnumFORMATETC** clone) {
    if (!clone) return E_POINTER;
    *clone = nullptr;
    auto* copy = new (std::nothrow) CEnumFormatEtc(static_cast<UINT>(m_formats.size()), m_formats.data());
    if (!copy) return E_OUTOFMEMORY;
    copy->m_cursor = m_cursor;
    copy->AddRef();
    *clone = copy;
    return S_OK;
}
