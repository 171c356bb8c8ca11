#pragma once
// A sink for one dispatch event interface of an out-of-process server. The sink carries no
// parameter tables of its own: Invoke reads the event's parameter types from the server's
// registered type library at run time, coerces the arguments to them and calls the handler
// that the derived class lists for the DISPID in its sink map.
//
// Sinks are not objects of the class table and hold no module lock: their owner does, and
// owns the sink through one reference.
#include <windows.h>
#include <ocidl.h>
#include <oleauto.h>

#include <vector>

#include "com/ComObject.h"

class DispEventSink : public RefCounted<DispEventSink, IDispatch> {
public:
    static constexpr DWORD NotAdvised = 0xFEFEFEFE;

    // The event interface and the type library (registered, by version) that describes it.
    DispEventSink(const IID& eventIid, const GUID& libid, WORD major, WORD minor);
    DispEventSink(const DispEventSink&) = delete;
    DispEventSink& operator=(const DispEventSink&) = delete;

    BEGIN_INTERFACE_TABLE(DispEventSink)
        INTERFACE_ENTRY(IDispatch)
    END_INTERFACE_TABLE()

    // The table's interfaces, and the event interface as IDispatch: its IID is known only here.
    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override;
    // IDispatch: only Invoke does anything.
    STDMETHODIMP GetTypeInfoCount(UINT* count) override;
    STDMETHODIMP GetTypeInfo(UINT index, LCID lcid, ITypeInfo** info) override;
    STDMETHODIMP GetIDsOfNames(REFIID riid, LPOLESTR* names, UINT count, LCID lcid, DISPID* ids) override;
    STDMETHODIMP Invoke(DISPID dispid, REFIID riid, LCID lcid, WORD flags, DISPPARAMS* params, VARIANT* result,
                        EXCEPINFO* excepInfo, UINT* argErr) override;

    // Connects to the source's connection point for the event interface. E_FAIL when the
    // sink is already advised somewhere.
    HRESULT Advise(IUnknown* source);
    // Disconnects with the cookie held; the cookie reads NotAdvised afterwards in any case.
    HRESULT Unadvise(IUnknown* source);
    DWORD Cookie() const { return m_cookie; }
    // Drops every reference that remote callers still hold (a server that died while advised).
    void Disconnect();

protected:
    ~DispEventSink() override = default;
    // The arguments in declaration order, already of their declared types. Unknown DISPIDs
    // are ignored.
    virtual void DispatchEvent(DISPID dispid, const VARIANT* args, UINT count) = 0;

private:
    HRESULT FindConnectionPoint(IUnknown* source, IConnectionPoint** point) const;
    HRESULT CoerceArguments(ITypeInfo* info, DISPID dispid, const DISPPARAMS* params, std::vector<VARIANT>& args,
                            UINT* argErr) const;

    DWORD m_cookie = NotAdvised;
    IID m_eventIid;
    GUID m_libid;
    WORD m_major;
    WORD m_minor;
};

// The sink map glue: T lists {DISPID, handler} pairs, ended by a null handler, in a static
// SinkMap().
template <class T>
class DispEventSinkImpl : public DispEventSink {
public:
    using DispEventSink::DispEventSink;

protected:
    using Handler = void (T::*)(const VARIANT* args, UINT count);
    struct SinkEntry {
        DISPID dispid;
        Handler handler;
    };

    void DispatchEvent(DISPID dispid, const VARIANT* args, UINT count) override {
        for (const SinkEntry* entry = T::SinkMap(); entry->handler; ++entry) {
            if (entry->dispid == dispid) {
                (static_cast<T*>(this)->*entry->handler)(args, count);
                return;
            }
        }
    }
};
