#pragma once
// What makes a brand folder out of the shared implementation: its brand kind, its COM
// identity (plain or aggregated) and the way it makes receiver sub-folders of its own class.
#include "com/ComObject.h"
#include "folder/IReceiversShellFolderImpl.h"

template <class T, DWORD Brand>
class CReceiversBrandFolder : public ComObjectRoot, public IReceiversShellFolderImpl {
public:
    CReceiversBrandFolder() : IReceiversShellFolderImpl(Brand) {}

    BEGIN_INTERFACE_TABLE(CReceiversBrandFolder)
        INTERFACE_ENTRY(IShellFolder)
        INTERFACE_ENTRY(IPersistFolder)
        INTERFACE_ENTRY(IPersist)
        INTERFACE_ENTRY(IShellFolder2)
    END_INTERFACE_TABLE()

    void FinalRelease() { IReceiversShellFolderImpl::FinalRelease(); }

    void TouchReference() override {
        InterlockedIncrement(&m_refCount);
        InterlockedDecrement(&m_refCount);
    }

    // Plain form, no reference yet, one module lock.
    IReceiversShellFolderImpl* CreateInstance() override { return ComObject<T>::CreateUncounted(); }
};
