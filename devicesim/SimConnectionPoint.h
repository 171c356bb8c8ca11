#pragma once
// The one connection point of an event source object of the simulator. It lives inside its
// container and shares the container's reference count, as connection points usually do;
// sinks are held as the dispatch interface of the events and called through Invoke.
#include <windows.h>
#include <ocidl.h>

#include <vector>

#include "com/ComPtr.h"
#include "com/UncountedObject.h"

class SimConnectionPoint final : public OwnedPart<SimConnectionPoint, IConnectionPoint> {
public:
    SimConnectionPoint(IConnectionPointContainer* container, REFIID events);

    BEGIN_INTERFACE_TABLE(SimConnectionPoint)
        INTERFACE_ENTRY(IConnectionPoint)
    END_INTERFACE_TABLE()

    // IConnectionPoint
    STDMETHODIMP GetConnectionInterface(IID* iid) override;
    STDMETHODIMP GetConnectionPointContainer(IConnectionPointContainer** container) override;
    STDMETHODIMP Advise(IUnknown* sink, DWORD* cookie) override;
    STDMETHODIMP Unadvise(DWORD cookie) override;
    STDMETHODIMP EnumConnections(IEnumConnections** connections) override;

    REFIID Events() const { return m_events; }
    // Calls DISPID id on every sink with (subject[, second]). A sink whose process has gone
    // is dropped; other failures of a sink are its own business.
    void Fire(DISPID id, IDispatch* subject, const VARIANT* second = nullptr);

private:
    struct Sink {
        DWORD cookie;
        ComPtr<IDispatch> dispatch;
    };
    bool IsAdvised(DWORD cookie) const;

    IConnectionPointContainer* m_container;  // not counted: we live inside it
    IID m_events;
    std::vector<Sink> m_sinks;
    DWORD m_nextCookie = 1;
};
