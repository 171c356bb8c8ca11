#pragma once
// The folder's own view inside Explorer: a window of its own class holding the list of
// receivers (brand root) or files (receiver), the menus it merges into the browser, the
// searching dialog, and a re-fill on every change message from the folder or the shell.
#include <windows.h>
#include <commctrl.h>
#include <docobj.h>
#include <shlobj.h>

#include <memory>

#include "com/ComObject.h"
#include "com/ComPtr.h"
#include "folder/IReceiversShellFolderImpl.h"
#include "items/CReceiversPidlMgr.h"
#include "view/CShellViewListWindow.h"

// Lets a new view see that the previous one in the same browser was one of ours.
extern const IID IID_ICalvexBrennorReceiversShellView;  // {94A3DC85-341E-4ADF-8105-30D56222FA31}
struct ICalvexBrennorReceiversShellView : public IUnknown {};

class CCalvexReceiversShellView : public ComObjectRoot,
                                  public IShellView,
                                  public IOleCommandTarget,
                                  public ICalvexBrennorReceiversShellView {
public:
    BEGIN_INTERFACE_TABLE(CCalvexReceiversShellView)
        INTERFACE_ENTRY(IShellView)
        INTERFACE_ENTRY_IID(IID_IOleWindow, IShellView)
        INTERFACE_ENTRY(IOleCommandTarget)
        INTERFACE_ENTRY_IID(IID_ICalvexBrennorReceiversShellView, ICalvexBrennorReceiversShellView)
    END_INTERFACE_TABLE()

    static constexpr UINT kListId = 2000;
    static constexpr UINT kPathCapacity = MAX_PATH;

    CCalvexReceiversShellView();
    ~CCalvexReceiversShellView() override;
    HRESULT FinalConstruct();

    HRESULT Init(IReceiversShellFolderImpl* folder, LPCITEMIDLIST folderPidl);

    // IOleWindow
    STDMETHODIMP GetWindow(HWND* phwnd) override;
    STDMETHODIMP ContextSensitiveHelp(BOOL enterMode) override;
    // IShellView
    STDMETHODIMP TranslateAccelerator(MSG* msg) override;
    STDMETHODIMP EnableModeless(BOOL enable) override;
    STDMETHODIMP UIActivate(UINT state) override;
    STDMETHODIMP Refresh() override;
    STDMETHODIMP CreateViewWindow(IShellView* previous, LPCFOLDERSETTINGS settings, IShellBrowser* browser,
                                  RECT* rect, HWND* phwnd) override;
    STDMETHODIMP DestroyViewWindow() override;
    STDMETHODIMP GetCurrentInfo(LPFOLDERSETTINGS pfs) override;
    STDMETHODIMP AddPropertySheetPages(DWORD reserved, LPFNSVADDPROPSHEETPAGE add, LPARAM lParam) override;
    STDMETHODIMP SaveViewState() override;
    STDMETHODIMP SelectItem(PCUITEMID_CHILD pidl, SVSIF flags) override;
    STDMETHODIMP GetItemObject(UINT uItem, REFIID riid, void** ppv) override;
    // IOleCommandTarget
    STDMETHODIMP QueryStatus(const GUID* group, ULONG count, OLECMD* commands, OLECMDTEXT* text) override;
    STDMETHODIMP Exec(const GUID* group, DWORD id, DWORD option, VARIANT* in, VARIANT* out) override;

    // Commands of the menus, the right-click menu and Exec.
    void OnCommand(UINT id);
    // The right-click menu as it would be shown (the caller owns it); null when none.
    HMENU BuildContextMenu();
    HWND ListWindow() const { return m_listWindow; }
    UINT ActivationState() const { return m_activationState; }

private:
    // The view window (CCalvexReceiversShellView.cpp)
    static LRESULT CALLBACK WindowProc(HWND hwnd, UINT message, WPARAM wParam, LPARAM lParam);
    LRESULT HandleMessage(UINT message, WPARAM wParam, LPARAM lParam);
    static HRESULT RegisterViewClass();
    void TakeBrowser(IShellBrowser* browser);
    void TakePreviousMode(IShellView* previous);
    void RegisterForNotifications();
    void OnCreate();
    void OnActivate(UINT state);
    void OnDeactivate();
    void SetStatusText();
    DWORD FolderType() const;

    // The list (ShellViewList.cpp)
    bool CreateList();
    bool InitColumns();
    void ApplyClickSettings();
    void FillList();
    void OnEnumIdList(IEnumIDList* enumerator);
    void AppendItem(LPCITEMIDLIST item);
    void OnChangeNotify(WPARAM wParam, LPARAM lParam);
    LRESULT OnNotify(NMHDR* header);
    void OnGetDispInfo(NMLVDISPINFOW* info);
    void OnColumnClick(int column);
    void OnBeginDrag();
    void SwitchMode(UINT command);
    void SortList(LPARAM param);
    static int CALLBACK CompareItems(LPARAM item1, LPARAM item2, LPARAM self);

    // Commands and menus (ShellViewCommands.cpp, ShellViewMenus.cpp)
    void UpdateMenu();
    void AddOpenItems(HMENU menu, bool append);
    void AddCopyItems(HMENU menu, bool append);
    void AddViewItems(HMENU menu, bool append);
    void OnContextMenu(int x, int y);
    void OnOpen();
    void OnCopy();
    void OnDelete();
    void OnProperties();
    void ReadSelectedItems();
    bool HasSelection() const;
    int FirstSelected() const;
    LPCITEMIDLIST ItemAt(int index) const;
    HRESULT MakeDataObject(IDataObject** out);
    HRESULT RefreshFiles(IDeviceMgr* manager);

    // The searching dialog (ShellViewFind.cpp)
    void ShowFindAnimation();
    void HideFindAnimation();
    static INT_PTR CALLBACK FindDialogProc(HWND dialog, UINT message, WPARAM wParam, LPARAM lParam);

    UniquePidl m_folderPidl;
    UINT m_activationState = SVUIA_DEACTIVATE;
    FOLDERSETTINGS m_folderSettings = {FVM_DETAILS, 0};
    ComPtr<IShellBrowser> m_shellBrowser;
    ComPtr<ICommDlgBrowser> m_commDlgBrowser;
    HWND m_parentWindow = nullptr;
    HWND m_viewWindow = nullptr;
    HWND m_listWindow = nullptr;
    HWND m_findDialog = nullptr;
    HWND m_findAnimation = nullptr;
    HMENU m_menu = nullptr;
    ComPtr<IReceiversShellFolderImpl> m_folder;
    ComPtr<IMalloc> m_malloc;
    std::unique_ptr<CReceiversPidlMgr> m_pidlManager;
    HIMAGELIST m_dragImageList = nullptr;
    POINT m_dragImageOrigin = {0, 0};
    LCID m_threadLocale = 0;
    ULONG m_notifyRegistration = 0;
    CShellViewListWindow m_listControl;
};
