#pragma once
// IConnectionPointContainer of an object with one outgoing event interface.
#include <windows.h>
#include <ocidl.h>

#include "SimConnectionPoint.h"

class SimEventSource : public IConnectionPointContainer {
public:
    explicit SimEventSource(REFIID events) : m_point(this, events) {}

    STDMETHODIMP EnumConnectionPoints(IEnumConnectionPoints** points) override;
    STDMETHODIMP FindConnectionPoint(REFIID riid, IConnectionPoint** point) override;

protected:
    SimConnectionPoint m_point;
};
