#include "SimEventSource.h"

#include <olectl.h>

STDMETHODIMP SimEventSource::EnumConnectionPoints(IEnumConnectionPoints** points) {
    if (!points) return E_POINTER;
    *points = nullptr;
    return E_NOTIMPL;
}

STDMETHODIMP SimEventSource::FindConnectionPoint(REFIID riid, IConnectionPoint** point) {
    if (!point) return E_POINTER;
    *point = nullptr;
    if (!IsEqualIID(riid, m_point.Events())) return CONNECT_E_NOCONNECTION;
    *point = &m_point;
    m_point.AddRef();
    return S_OK;
}
