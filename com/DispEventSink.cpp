#include "com/DispEventSink.h"

#include <utility>

#include "com/ComPtr.h"
#include "com/CriticalSection.h"

namespace {
// Type libraries are loaded once per process and never from two threads at once (Wine does
// not bear loading and releasing one library concurrently); they stay loaded for good.
CriticalSection& TypeLibLock() {
    static CriticalSection lock;
    return lock;
}
struct LoadedTypeLib {
    GUID libid;
    WORD major;
    WORD minor;
    ITypeLib* library;
};
std::vector<LoadedTypeLib>& LoadedTypeLibs() {
    static std::vector<LoadedTypeLib>* libraries = new std::vector<LoadedTypeLib>();  // outlives static teardown
    return *libraries;
}

HRESULT GetEventTypeInfo(const GUID& libid, WORD major, WORD minor, const IID& iid, ITypeInfo** info) {
    CriticalSectionLock lock(TypeLibLock());
    ITypeLib* library = nullptr;
    for (const LoadedTypeLib& loaded : LoadedTypeLibs())
        if (IsEqualGUID(loaded.libid, libid) && loaded.major == major && loaded.minor == minor) library = loaded.library;
    if (!library) {
        HRESULT hr = LoadRegTypeLib(libid, major, minor, LOCALE_NEUTRAL, &library);
        if (FAILED(hr)) return hr;
        LoadedTypeLibs().push_back({libid, major, minor, library});
    }
    return library->GetTypeInfoOfGuid(iid, info);
}

// The declared type of one parameter, as VariantChangeType takes it; VT_EMPTY: pass as is.
VARTYPE CoercionType(const TYPEDESC& type) {
    switch (type.vt) {
    case VT_PTR: case VT_SAFEARRAY: case VT_CARRAY: case VT_USERDEFINED: case VT_VARIANT:
        return VT_EMPTY;
    default:
        return type.vt;
    }
}

struct VariantVector {
    std::vector<VARIANT>& items;
    ~VariantVector() {
        for (VARIANT& item : items) VariantClear(&item);
    }
};
}  // namespace

DispEventSink::DispEventSink(const IID& eventIid, const GUID& libid, WORD major, WORD minor)
    : m_eventIid(eventIid), m_libid(libid), m_major(major), m_minor(minor) {}

STDMETHODIMP DispEventSink::QueryInterface(REFIID riid, void** ppv) {
    return RefCounted::QueryInterface(IsEqualIID(riid, m_eventIid) ? IID_IDispatch : riid, ppv);
}

STDMETHODIMP DispEventSink::GetTypeInfoCount(UINT* count) {
    if (!count) return E_POINTER;
    *count = 0;
    return S_OK;
}

STDMETHODIMP DispEventSink::GetTypeInfo(UINT, LCID, ITypeInfo** info) {
    if (info) *info = nullptr;
    return E_NOTIMPL;
}

STDMETHODIMP DispEventSink::GetIDsOfNames(REFIID, LPOLESTR*, UINT, LCID, DISPID*) { return E_NOTIMPL; }

STDMETHODIMP DispEventSink::Invoke(DISPID dispid, REFIID, LCID, WORD, DISPPARAMS* params, VARIANT* result,
                                   EXCEPINFO*, UINT* argErr) {
    if (result) VariantInit(result);
    if (!params) return E_INVALIDARG;
    ComPtr<ITypeInfo> info;
    HRESULT hr = GetEventTypeInfo(m_libid, m_major, m_minor, m_eventIid, &info);
    if (FAILED(hr)) return hr;
    std::vector<VARIANT> args;
    VariantVector clearer{args};
    hr = CoerceArguments(info.Get(), dispid, params, args, argErr);
    if (hr == DISP_E_MEMBERNOTFOUND) return S_OK;  // an event the sink map does not care for
    if (FAILED(hr)) return hr;
    DispatchEvent(dispid, args.data(), static_cast<UINT>(args.size()));
    return S_OK;
}

HRESULT DispEventSink::CoerceArguments(ITypeInfo* info, DISPID dispid, const DISPPARAMS* params,
                                       std::vector<VARIANT>& args, UINT* argErr) const {
    ComPtr<ITypeInfo2> info2;
    HRESULT hr = info->QueryInterface(IID_ITypeInfo2, info2.PutVoid());
    if (FAILED(hr)) return hr;
    UINT index = 0;
    hr = info2->GetFuncIndexOfMemId(dispid, INVOKE_FUNC, &index);
    if (FAILED(hr)) return DISP_E_MEMBERNOTFOUND;
    FUNCDESC* func = nullptr;
    hr = info->GetFuncDesc(index, &func);
    if (FAILED(hr)) return hr;
    const UINT count = static_cast<UINT>(func->cParams);
    hr = params->cArgs == count ? S_OK : DISP_E_BADPARAMCOUNT;
    args.resize(SUCCEEDED(hr) ? count : 0);
    for (VARIANT& arg : args) VariantInit(&arg);
    for (UINT i = 0; SUCCEEDED(hr) && i < count; ++i) {
        VARIANT* source = &params->rgvarg[count - 1 - i];  // rgvarg holds the last argument first
        const VARTYPE type = CoercionType(func->lprgelemdescParam[i].tdesc);
        hr = type == VT_EMPTY ? VariantCopy(&args[i], source) : VariantChangeType(&args[i], source, 0, type);
        if (FAILED(hr) && argErr) *argErr = count - 1 - i;
    }
    info->ReleaseFuncDesc(func);
    return hr;
}

HRESULT DispEventSink::FindConnectionPoint(IUnknown* source, IConnectionPoint** point) const {
    *point = nullptr;
    if (!source) return E_POINTER;
    ComPtr<IConnectionPointContainer> container;
    HRESULT hr = source->QueryInterface(IID_IConnectionPointContainer, container.PutVoid());
    if (FAILED(hr)) return hr;
    return container->FindConnectionPoint(m_eventIid, point);
}

HRESULT DispEventSink::Advise(IUnknown* source) {
    if (m_cookie != NotAdvised) return E_FAIL;
    ComPtr<IConnectionPoint> point;
    HRESULT hr = FindConnectionPoint(source, &point);
    if (FAILED(hr)) return hr;
    DWORD cookie = NotAdvised;
    hr = point->Advise(static_cast<IDispatch*>(this), &cookie);
    if (SUCCEEDED(hr)) m_cookie = cookie;
    return hr;
}

HRESULT DispEventSink::Unadvise(IUnknown* source) {
    ComPtr<IConnectionPoint> point;
    HRESULT hr = FindConnectionPoint(source, &point);
    if (SUCCEEDED(hr)) hr = point->Unadvise(m_cookie);
    m_cookie = NotAdvised;
    return hr;
}

void DispEventSink::Disconnect() { CoDisconnectObject(static_cast<IDispatch*>(this), 0); }
