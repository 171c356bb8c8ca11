#pragma once
// IDispatch of a dual interface of the device manager, answered from its type library.
#include <windows.h>
#include <oaidl.h>

#include "SimTypeLibrary.h"

template <class Interface, const IID* Iid>
class SimDispatch : public Interface {
public:
    STDMETHODIMP GetTypeInfoCount(UINT* count) override {
        if (!count) return E_POINTER;
        *count = 1;
        return S_OK;
    }
    STDMETHODIMP GetTypeInfo(UINT index, LCID, ITypeInfo** info) override {
        return SimTypeLibrary::GetTypeInfo(*Iid, index, info);
    }
    STDMETHODIMP GetIDsOfNames(REFIID, LPOLESTR* names, UINT count, LCID, DISPID* ids) override {
        return SimTypeLibrary::GetIDsOfNames(*Iid, names, count, ids);
    }
    STDMETHODIMP Invoke(DISPID id, REFIID, LCID, WORD flags, DISPPARAMS* params, VARIANT* result,
                        EXCEPINFO* exception, UINT* argumentError) override {
        return SimTypeLibrary::Invoke(*Iid, static_cast<Interface*>(this), id, flags, params, result, exception,
                                      argumentError);
    }
};
