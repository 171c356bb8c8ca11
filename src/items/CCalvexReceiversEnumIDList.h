#pragma once
// The enumerator that the folder's EnumObjects hands out: it reads the receivers (brand
// level) or the files (receiver level) of the folder's collection once, in Init, keeps their
// item identifiers in a private list and hands out copies.
//
// How the folder uses it:
//     ComObject<CCalvexReceiversEnumIDList>* enumerator = nullptr;
//     HRESULT hr = CreateComObject<CCalvexReceiversEnumIDList>(&enumerator);  // one reference
//     if (FAILED(hr)) return hr;
//     enumerator->Init(path, flags, collection, brand, &hr);
//     if (FAILED(hr)) return hr;        // Init released that reference: the object is gone
//     hr = enumerator->QueryInterface(IID_IEnumIDList, (void**)ppEnum);
//     enumerator->Release();
// Init does not keep the collection; everything it needs is read before it returns.
#include <windows.h>
#include <shlobj.h>

#include <string>

#include "com/ComObject.h"
#include "com/ComPtr.h"
#include "items/CReceiversPidlMgr.h"

class CCalvexReceiversEnumIDList : public ComObjectRoot, public IEnumIDList {
public:
    BEGIN_INTERFACE_TABLE(CCalvexReceiversEnumIDList)
        INTERFACE_ENTRY(IEnumIDList)
    END_INTERFACE_TABLE()

    // Lists and nodes come from the shell's task allocator unless a test gives another.
    explicit CCalvexReceiversEnumIDList(IMalloc* malloc = nullptr);
    ~CCalvexReceiversEnumIDList() override;
    HRESULT FinalConstruct();

    // path: the folder's path of raw item names ("root" or "root\receiver key");
    // flags: SHCONTF; collection: the receivers collection at brand level, the files
    // collection at receiver level, or null; brand: 1 Calvex, 2 Brennor.
    // *result is S_OK, or E_OUTOFMEMORY after which the object has destroyed itself.
    void Init(const wchar_t* path, DWORD flags, IUnknown* collection, DWORD brand, HRESULT* result);
    // TRUE on success; FALSE for a path without components or a node that cannot be had.
    BOOL CreateEnumList(const wchar_t* path, DWORD flags, IUnknown* collection, DWORD brand);

    // IEnumIDList
    STDMETHODIMP Next(ULONG celt, PITEMID_CHILD* rgelt, ULONG* pceltFetched) override;
    STDMETHODIMP Skip(ULONG celt) override;
    STDMETHODIMP Reset() override;
    STDMETHODIMP Clone(IEnumIDList** ppenum) override;

private:
    struct EnumNode {
        EnumNode* next;
        LPITEMIDLIST pidl;
    };

    bool ListReceivers(const std::wstring& path, IUnknown* collection, DWORD brand);
    bool ListFiles(const std::wstring& path, bool withExtension, IUnknown* collection, DWORD brand);
    // Takes the list on success; on failure (no node) the caller still owns it.
    bool AddToEnumList(UniquePidl& pidl);
    void DeleteList();

    CReceiversPidlMgr m_pidlMgr;
    ComPtr<IMalloc> m_malloc;
    EnumNode* m_first = nullptr;
    EnumNode* m_last = nullptr;
    EnumNode* m_current = nullptr;
};
