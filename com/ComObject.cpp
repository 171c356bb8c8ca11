#include "com/ComObject.h"

HRESULT TableQueryInterface(void* object, const InterfaceEntry* table, REFIID riid, void** ppv) {
    if (!ppv) return E_POINTER;
    *ppv = nullptr;
    for (const InterfaceEntry* entry = table; entry->iid; ++entry) {
        if (IsEqualIID(riid, *entry->iid) || (entry == table && IsEqualIID(riid, IID_IUnknown))) {
            auto* unknown = reinterpret_cast<IUnknown*>(static_cast<char*>(object) + entry->offset);
            unknown->AddRef();
            *ppv = unknown;
            return S_OK;
        }
    }
    return E_NOINTERFACE;
}
