#include "SimConnectionPoint.h"

#include <olectl.h>

#include <algorithm>

namespace {

// The sink's process or apartment is gone: it will never answer again.
bool SinkIsGone(HRESULT hr) {
    return hr == RPC_E_DISCONNECTED || hr == RPC_E_SERVER_DIED || hr == RPC_E_SERVER_DIED_DNE ||
           hr == HRESULT_FROM_WIN32(RPC_S_SERVER_UNAVAILABLE) || hr == HRESULT_FROM_WIN32(RPC_S_CALL_FAILED) ||
           hr == CO_E_OBJNOTCONNECTED;
}

}  // namespace

SimConnectionPoint::SimConnectionPoint(IConnectionPointContainer* container, REFIID events)
    : OwnedPart(container), m_container(container), m_events(events) {}

STDMETHODIMP SimConnectionPoint::GetConnectionInterface(IID* iid) {
    if (!iid) return E_POINTER;
    *iid = m_events;
    return S_OK;
}

STDMETHODIMP SimConnectionPoint::GetConnectionPointContainer(IConnectionPointContainer** container) {
    if (!container) return E_POINTER;
    *container = m_container;
    m_container->AddRef();
    return S_OK;
}

STDMETHODIMP SimConnectionPoint::Advise(IUnknown* sink, DWORD* cookie) {
    if (!cookie) return E_POINTER;
    *cookie = 0;
    if (!sink) return E_POINTER;
    ComPtr<IDispatch> dispatch;
    if (FAILED(sink->QueryInterface(m_events, dispatch.PutVoid()))) return CONNECT_E_CANNOTCONNECT;
    *cookie = m_nextCookie++;
    m_sinks.push_back(Sink{*cookie, dispatch});
    return S_OK;
}

STDMETHODIMP SimConnectionPoint::Unadvise(DWORD cookie) {
    auto found = std::find_if(m_sinks.begin(), m_sinks.end(), [cookie](const Sink& s) { return s.cookie == cookie; });
    if (found == m_sinks.end()) return CONNECT_E_NOCONNECTION;
    ComPtr<IDispatch> released = std::move(found->dispatch);  // released after the list is consistent
    m_sinks.erase(found);
    return S_OK;
}

STDMETHODIMP SimConnectionPoint::EnumConnections(IEnumConnections** connections) {
    if (!connections) return E_POINTER;
    *connections = nullptr;
    return E_NOTIMPL;
}

bool SimConnectionPoint::IsAdvised(DWORD cookie) const {
    return std::any_of(m_sinks.begin(), m_sinks.end(), [cookie](const Sink& s) { return s.cookie == cookie; });
}

void SimConnectionPoint::Fire(DISPID id, IDispatch* subject, const VARIANT* second) {
    if (m_sinks.empty()) return;
    ComPtr<IConnectionPointContainer> keepAlive(m_container);  // a sink may drop the last client reference
    const std::vector<Sink> sinks = m_sinks;  // a sink may unadvise while it is being called
    VARIANT args[2];  // reversed, as DISPPARAMS wants them
    UINT count = 0;
    if (second) args[count++] = *second;
    VariantInit(&args[count]);
    args[count].vt = VT_DISPATCH;
    args[count++].pdispVal = subject;
    DISPPARAMS params = {args, nullptr, count, 0};
    for (const Sink& sink : sinks) {
        if (!IsAdvised(sink.cookie)) continue;
        VARIANT result;
        VariantInit(&result);
        HRESULT hr = sink.dispatch->Invoke(id, IID_NULL, LOCALE_USER_DEFAULT, DISPATCH_METHOD, &params, &result,
                                           nullptr, nullptr);
        VariantClear(&result);
        if (SinkIsGone(hr)) Unadvise(sink.cookie);
    }
}
