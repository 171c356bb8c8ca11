#pragma once
// The _NewEnum of the simulator's collections: a snapshot of the items as VT_DISPATCH
// variants, so that script clients can walk a collection with "for each".
#include <windows.h>
#include <oaidl.h>

#include <vector>

#include "com/ComObject.h"
#include "com/ComPtr.h"

class SimVariantEnum : public ComObjectRoot, public IEnumVARIANT {
public:
    explicit SimVariantEnum(std::vector<ComPtr<IDispatch>> items, ULONG position = 0);
    static HRESULT Create(std::vector<ComPtr<IDispatch>> items, IUnknown** out);

    using Primary = IEnumVARIANT;  // the interface by which it is handed out

    BEGIN_INTERFACE_TABLE(SimVariantEnum)
        INTERFACE_ENTRY(IEnumVARIANT)
    END_INTERFACE_TABLE()

    // IEnumVARIANT
    STDMETHODIMP Next(ULONG count, VARIANT* items, ULONG* fetched) override;
    STDMETHODIMP Skip(ULONG count) override;
    STDMETHODIMP Reset() override;
    STDMETHODIMP Clone(IEnumVARIANT** copy) override;

private:
    std::vector<ComPtr<IDispatch>> m_items;
    ULONG m_position;
};
