#pragma once
// The one folder implementation behind both brand folders: the brand root under the
// computer node and each receiver sub-folder. It answers the shell about items, hands out
// the enumerator, views and per-item UI objects, binds itself to the device manager's
// collections and follows their events (one notification thread per folder object).
#include <windows.h>
#include <shlobj.h>

#include <memory>
#include <string>

#include "CalvexDeviceMgrLib.h"
#include "com/ComPtr.h"
#include "folder/FolderNotificationThread.h"
#include "items/CReceiversPidlMgr.h"

class CCalvexReceiversShellFolderEventHandler;
class CCalvexFilesShellFolderEventHandler;

class IReceiversShellFolderImpl : public IPersistFolder, public IShellFolder2 {
public:
    static constexpr UINT PathCapacity = MAX_PATH;

    explicit IReceiversShellFolderImpl(DWORD brandKind);
    virtual ~IReceiversShellFolderImpl();
    IReceiversShellFolderImpl(const IReceiversShellFolderImpl&) = delete;
    IReceiversShellFolderImpl& operator=(const IReceiversShellFolderImpl&) = delete;

    // IPersist
    STDMETHODIMP GetClassID(CLSID* pClassID) override;
    // IPersistFolder
    STDMETHODIMP Initialize(PCIDLIST_ABSOLUTE pidl) override;

    // Supplied by the brand class.
    virtual void TouchReference() = 0;
    STDMETHOD_(ULONG, AddRef)() override = 0;
    STDMETHOD_(ULONG, Release)() override = 0;
    STDMETHOD(QueryInterface)(REFIID riid, void** ppv) override = 0;
    // A new, not yet counted folder of the same brand class.
    virtual IReceiversShellFolderImpl* CreateInstance() = 0;
    virtual HRESULT DoUpdateList();

    // IShellFolder
    STDMETHODIMP ParseDisplayName(HWND hwnd, IBindCtx* pbc, LPWSTR pszDisplayName, ULONG* pchEaten,
                                  PIDLIST_RELATIVE* ppidl, ULONG* pdwAttributes) override;
    STDMETHODIMP EnumObjects(HWND hwnd, SHCONTF grfFlags, IEnumIDList** ppenumIDList) override;
    STDMETHODIMP BindToObject(PCUIDLIST_RELATIVE pidl, IBindCtx* pbc, REFIID riid, void** ppv) override;
    STDMETHODIMP BindToStorage(PCUIDLIST_RELATIVE pidl, IBindCtx* pbc, REFIID riid, void** ppv) override;
    STDMETHODIMP CompareIDs(LPARAM lParam, PCUIDLIST_RELATIVE pidl1, PCUIDLIST_RELATIVE pidl2) override;
    STDMETHODIMP CreateViewObject(HWND hwndOwner, REFIID riid, void** ppv) override;
    STDMETHODIMP GetAttributesOf(UINT cidl, PCUITEMID_CHILD_ARRAY apidl, SFGAOF* rgfInOut) override;
    STDMETHODIMP GetUIObjectOf(HWND hwndOwner, UINT cidl, PCUITEMID_CHILD_ARRAY apidl, REFIID riid, UINT* rgfReserved,
                               void** ppv) override;
    STDMETHODIMP GetDisplayNameOf(PCUITEMID_CHILD pidl, SHGDNF uFlags, STRRET* pName) override;
    STDMETHODIMP SetNameOf(HWND hwnd, PCUITEMID_CHILD pidl, LPCWSTR pszName, SHGDNF uFlags,
                           PITEMID_CHILD* ppidlOut) override;
    // IShellFolder2
    STDMETHODIMP GetDefaultSearchGUID(GUID* pguid) override;
    STDMETHODIMP EnumSearches(IEnumExtraSearch** ppenum) override;
    STDMETHODIMP GetDefaultColumn(DWORD dwRes, ULONG* pSort, ULONG* pDisplay) override;
    STDMETHODIMP GetDefaultColumnState(UINT iColumn, SHCOLSTATEF* pcsFlags) override;
    STDMETHODIMP GetDetailsEx(PCUITEMID_CHILD pidl, const SHCOLUMNID* pscid, VARIANT* pv) override;
    STDMETHODIMP GetDetailsOf(PCUITEMID_CHILD pidl, UINT iColumn, SHELLDETAILS* psd) override;
    STDMETHODIMP MapColumnToSCID(UINT iColumn, SHCOLUMNID* pscid) override;

    // parent: null for a root folder; pidl: the own list relative to the parent, or null for
    // this brand's root item.
    HRESULT Init(IReceiversShellFolderImpl* parent, LPCITEMIDLIST pidl);
    // Binds the folder to its event source on first need (ShellFolderEvents.cpp).
    HRESULT InitCollections();
    // A view that refreshed itself cancels the pending view message.
    HRESULT EventReceived();
    void AddViewWindow(HWND hwnd);
    void RemoveViewWindow(HWND hwnd);
    // Runs once on the last release, before destruction: unadvises the sink.
    void FinalRelease();

    // The folder's path (see the .cpp); false and an empty buffer when it does not fit.
    bool GetFolderPath(wchar_t* buffer, UINT capacity, bool useRootParsingName) const;
    std::wstring FolderPath(bool useRootParsingName) const;
    // "::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\" + the path with the root parsing name.
    std::wstring GetFullPath() const;
    // The absolute list of this folder, parsed by the desktop; null on any failure.
    LPITEMIDLIST GetFullPidl() const;

    DWORD BrandKind() const { return m_brandKind; }
    LPCITEMIDLIST OwnPidl() const { return m_ownPidl.Get(); }
    // The receivers collection (root) or the receiver's files collection; null until bound.
    IDispatch* EventSourceCollection() const { return m_eventSource.Get(); }
    size_t ViewWindowCount();

private:
    // True when a list handed in can be read without leaving its bytes, whatever kinds it
    // holds; otherwise the reason goes to the trace under `method`.
    bool IsWhole(const char* method, LPCITEMIDLIST list) const;
    std::wstring KeyForm(LPCITEMIDLIST list) const;
    std::wstring DisplayForm(LPCITEMIDLIST list) const;
    HRESULT InitRootCollections();
    HRESULT InitReceiverCollections();
    HRESULT BindSubFolder(LPCITEMIDLIST pidl, REFIID riid, void** ppv);
    HRESULT CreateView(REFIID riid, void** ppv);
    HRESULT CreateItemObject(LPCITEMIDLIST item, REFIID riid, void** ppv);
    HRESULT DisplayName(LPCITEMIDLIST pidl, SHGDNF flags, std::wstring& name) const;
    static HRESULT PostPathToNotifyWindow(const std::wstring& path);
    void DeleteEventSinks();

    UniquePidl m_ownPidl;
    ComPtr<IReceiversShellFolderImpl> m_parent;
    ComPtr<IMalloc> m_malloc;
    std::unique_ptr<CReceiversPidlMgr> m_pidlMgr;
    DWORD m_brandKind;
    ComPtr<IDispatch> m_eventSource;
    ComPtr<IDispatch> m_deviceMgr;  // root: the device manager; receiver folder: the receiver
    std::wstring m_rootParsingName;  // empty unless the own last item is a root
    std::wstring m_ownName;
    ComPtr<CCalvexReceiversShellFolderEventHandler> m_receiversSink;
    ComPtr<CCalvexFilesShellFolderEventHandler> m_filesSink;
    ComPtr<IDeviceMgr> m_deviceMgrInterface;
    FolderNotificationThread m_notification;  // view windows, update timer, thread
};
