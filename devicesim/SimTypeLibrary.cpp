#include "SimTypeLibrary.h"

#include <oleauto.h>

#include "CalvexDeviceMgrLib.h"
#include "com/ComPtr.h"
#include "com/CriticalSection.h"

namespace {

CriticalSection g_lock;
std::wstring g_file;
// Loaded once and kept to the end of the process on purpose: loading and releasing one type
// library again and again (or from several threads) is what Wine handles worst.
ITypeLib* g_library = nullptr;

}  // namespace

void SimTypeLibrary::UseFile(const std::wstring& path) {
    CriticalSectionLock lock(g_lock);
    g_file = path;
}

HRESULT SimTypeLibrary::Load(ITypeLib** library) {
    *library = nullptr;
    CriticalSectionLock lock(g_lock);
    if (!g_library) {
        HRESULT hr = g_file.empty() ? LoadRegTypeLib(LIBID_CalvexDeviceMgrLib, 1, 0, LOCALE_NEUTRAL, &g_library)
                                    : LoadTypeLibEx(g_file.c_str(), REGKIND_NONE, &g_library);
        if (FAILED(hr)) return hr;
    }
    g_library->AddRef();
    *library = g_library;
    return S_OK;
}

HRESULT SimTypeLibrary::GetTypeInfo(REFIID iid, UINT index, ITypeInfo** info) {
    if (!info) return E_POINTER;
    *info = nullptr;
    if (index != 0) return DISP_E_BADINDEX;
    ComPtr<ITypeLib> library;
    HRESULT hr = Load(&library);
    return SUCCEEDED(hr) ? library->GetTypeInfoOfGuid(iid, info) : hr;
}

HRESULT SimTypeLibrary::InterfaceInfo(REFIID iid, ITypeInfo** info) {
    ComPtr<ITypeInfo> dispatch;
    HRESULT hr = GetTypeInfo(iid, 0, &dispatch);
    if (FAILED(hr)) return hr;
    HREFTYPE ref = 0;
    // A dual interface's dispatch part names its vtable part as implemented type -1.
    if (FAILED(dispatch->GetRefTypeOfImplType(static_cast<UINT>(-1), &ref))) {
        *info = dispatch.Detach();
        return S_OK;
    }
    return dispatch->GetRefTypeInfo(ref, info);
}

HRESULT SimTypeLibrary::GetIDsOfNames(REFIID iid, LPOLESTR* names, UINT count, DISPID* ids) {
    ComPtr<ITypeInfo> info;
    HRESULT hr = InterfaceInfo(iid, &info);
    return SUCCEEDED(hr) ? DispGetIDsOfNames(info.Get(), names, count, ids) : hr;
}

HRESULT SimTypeLibrary::Invoke(REFIID iid, void* object, DISPID id, WORD flags, DISPPARAMS* params,
                               VARIANT* result, EXCEPINFO* exception, UINT* argumentError) {
    ComPtr<ITypeInfo> info;
    HRESULT hr = InterfaceInfo(iid, &info);
    return SUCCEEDED(hr) ? DispInvoke(object, info.Get(), id, flags, params, result, exception, argumentError) : hr;
}
