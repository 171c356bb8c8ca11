#pragma once
// The object through which files leave a receiver: the IDataObject that the clipboard and
// drop targets read (virtual files: one descriptor, then one "FileContents" stream per file,
// each downloaded under the progress dialog when asked for), and the IDropSource of a drag
// out of the view. It answers nothing else, so drop targets extract synchronously.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>

#include <string>
#include <vector>

#include "com/ComObject.h"
#include "com/ComPtr.h"
#include "items/CReceiversPidlMgr.h"

class CCalvexReceiversDataObject : public ComObjectRoot, public IDataObject, public IDropSource {
public:
    BEGIN_INTERFACE_TABLE(CCalvexReceiversDataObject)
        INTERFACE_ENTRY(IDataObject)
        INTERFACE_ENTRY(IDropSource)
    END_INTERFACE_TABLE()

    CCalvexReceiversDataObject();
    ~CCalvexReceiversDataObject() override;
    HRESULT FinalConstruct() { return m_pidlMgr.IsValid() ? S_OK : E_OUTOFMEMORY; }

    // Appends a copy of the item's absolute list and one reference on the object that holds
    // it on the device (the receiver's files collection; may be null). Called for every
    // selected item, in selection order, before the object is handed out.
    HRESULT AddPidl(LPCITEMIDLIST pidl, IUnknown* device);
    // The drag image made by the view, the window it is shown over (the list) and what is
    // added to the cursor position to place it. The image list becomes ours to destroy.
    void SetDragImage(HIMAGELIST image, HWND window, POINT offset);
    size_t ItemCount() const { return m_items.size(); }

    // IDataObject
    STDMETHODIMP GetData(FORMATETC* format, STGMEDIUM* medium) override;
    STDMETHODIMP GetDataHere(FORMATETC* format, STGMEDIUM* medium) override;
    STDMETHODIMP QueryGetData(FORMATETC* format) override;
    STDMETHODIMP GetCanonicalFormatEtc(FORMATETC* in, FORMATETC* out) override;
    STDMETHODIMP SetData(FORMATETC* format, STGMEDIUM* medium, BOOL release) override;
    STDMETHODIMP EnumFormatEtc(DWORD direction, IEnumFORMATETC** enumerator) override;
    STDMETHODIMP DAdvise(FORMATETC* format, DWORD flags, IAdviseSink* sink, DWORD* connection) override;
    STDMETHODIMP DUnadvise(DWORD connection) override;
    STDMETHODIMP EnumDAdvise(IEnumSTATDATA** enumerator) override;

    // IDropSource
    STDMETHODIMP QueryContinueDrag(BOOL escapePressed, DWORD keyState) override;
    STDMETHODIMP GiveFeedback(DWORD effect) override;

private:
    struct Entry {
        UniquePidl pidl;
        ComPtr<IUnknown> device;
    };

    HRESULT GetPreferredDropEffect(STGMEDIUM* medium) const;
    HRESULT GetFileDescriptors(STGMEDIUM* medium) const;
    void FillDescriptor(LPCITEMIDLIST pidl, FILEDESCRIPTORW& descriptor) const;
    HRESULT GetFileContents(LONG index, STGMEDIUM* medium) const;
    HRESULT GetIdListArray(STGMEDIUM* medium) const;
    UINT LastItemSize(LPCITEMIDLIST pidl) const;
    std::wstring RawPath(LPCITEMIDLIST pidl) const;
    void MoveDragImage() const;

    CReceiversPidlMgr m_pidlMgr;
    std::vector<Entry> m_items;
    HIMAGELIST m_dragImage = nullptr;
    HWND m_dragWindow = nullptr;
    POINT m_dragOffset = {0, 0};
    bool m_dragImageShown = false;
};
