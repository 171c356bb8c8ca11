#pragma once
// A view of our folders hosted as Explorer hosts it: a browser of our own (frame window,
// File/Edit/View menus carrying the shell's ids, a record of what the view asks of it) and
// the view's window in it.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "com/ComPtr.h"
#include "module/ClassCreators.h"
#include "view/CCalvexReceiversShellView.h"

namespace testsupport {

// The browser that hosts the view: a frame window, File/Edit/View menus carrying the shell's
// ids, and a record of what the view asks of it.
class TestBrowser : public IShellBrowser, public ICommDlgBrowser {
public:
    explicit TestBrowser(bool fileDialog) : m_fileDialog(fileDialog) {
        m_frame = CreateWindowExW(0, L"STATIC", L"frame", WS_OVERLAPPEDWINDOW | WS_VISIBLE, 0, 0, 700, 500, nullptr,
                                  nullptr, nullptr, nullptr);
    }
    virtual ~TestBrowser() { DestroyWindow(m_frame); }
    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        *ppv = nullptr;
        if (IsEqualIID(riid, IID_IUnknown) || IsEqualIID(riid, IID_IShellBrowser) || IsEqualIID(riid, IID_IOleWindow))
            *ppv = static_cast<IShellBrowser*>(this);
        else if (m_fileDialog && IsEqualIID(riid, IID_ICommDlgBrowser))
            *ppv = static_cast<ICommDlgBrowser*>(this);
        if (!*ppv) return E_NOINTERFACE;
        AddRef();
        return S_OK;
    }
    STDMETHODIMP_(ULONG) AddRef() override { return ++m_refs; }
    STDMETHODIMP_(ULONG) Release() override { return --m_refs; }  // lives on the test's stack
    STDMETHODIMP GetWindow(HWND* hwnd) override { *hwnd = m_frame; return S_OK; }
    STDMETHODIMP ContextSensitiveHelp(BOOL) override { return E_NOTIMPL; }
    STDMETHODIMP InsertMenusSB(HMENU menu, LPOLEMENUGROUPWIDTHS) override {
        const UINT ids[] = {FCIDM_MENU_FILE, FCIDM_MENU_EDIT, FCIDM_MENU_VIEW};
        for (UINT id : ids) {
            HMENU sub = CreatePopupMenu();
            if (id == FCIDM_MENU_VIEW) AppendMenuW(sub, MF_SEPARATOR, FCIDM_MENU_VIEW_SEP_OPTIONS, nullptr);
            if (id == FCIDM_MENU_EDIT) AppendMenuW(sub, MF_STRING, 0x7001, L"Undo");
            MENUITEMINFOW item = {sizeof(item), MIIM_ID | MIIM_SUBMENU | MIIM_STRING};
            item.wID = id;
            item.hSubMenu = sub;
            item.dwTypeData = const_cast<wchar_t*>(L"x");
            InsertMenuItemW(menu, GetMenuItemCount(menu), TRUE, &item);
        }
        return S_OK;
    }
    STDMETHODIMP SetMenuSB(HMENU menu, HOLEMENU, HWND) override { lastMenu = menu; return S_OK; }
    STDMETHODIMP RemoveMenusSB(HMENU) override { return S_OK; }
    STDMETHODIMP SetStatusTextSB(LPCWSTR) override { return E_NOTIMPL; }
    STDMETHODIMP EnableModelessSB(BOOL) override { return E_NOTIMPL; }
    STDMETHODIMP TranslateAcceleratorSB(MSG*, WORD) override { return E_NOTIMPL; }
    STDMETHODIMP BrowseObject(PCUIDLIST_RELATIVE, UINT flags) override { browseFlags.push_back(flags); return S_OK; }
    STDMETHODIMP GetViewStateStream(DWORD, IStream** stream) override {
        *stream = nullptr;
        if (!viewState) return E_FAIL;
        LARGE_INTEGER zero = {};
        viewState->Seek(zero, STREAM_SEEK_SET, nullptr);
        viewState.CopyTo(stream);
        return S_OK;
    }
    STDMETHODIMP GetControlWindow(UINT, HWND*) override { return E_NOTIMPL; }
    STDMETHODIMP SendControlMsg(UINT control, UINT message, WPARAM, LPARAM lParam, LRESULT*) override {
        if (control == FCW_STATUS && message == SB_SETTEXTW) statusText = reinterpret_cast<const wchar_t*>(lParam);
        return S_OK;
    }
    STDMETHODIMP QueryActiveShellView(IShellView**) override { return E_NOTIMPL; }
    STDMETHODIMP OnViewWindowActive(IShellView*) override { return S_OK; }
    STDMETHODIMP SetToolbarItems(LPTBBUTTONSB, UINT, UINT) override { return S_OK; }
    // ICommDlgBrowser
    STDMETHODIMP OnDefaultCommand(IShellView*) override { return S_OK; }
    STDMETHODIMP OnStateChange(IShellView*, ULONG) override { return S_OK; }
    STDMETHODIMP IncludeObject(IShellView*, PCUITEMID_CHILD) override { return S_OK; }

    HWND m_frame;
    bool m_fileDialog;
    ULONG m_refs = 0;
    HMENU lastMenu = nullptr;
    std::wstring statusText;
    std::vector<UINT> browseFlags;
    ComPtr<IStream> viewState;
};

inline ComPtr<IShellFolder> RootFolder(bool brennor = false) {
    ComPtr<IShellFolder> root;
    (brennor ? CreateBrennorReceiversShellFolder : CreateCalvexReceiversShellFolder)(nullptr, IID_IShellFolder,
                                                                                     root.PutVoid());
    ComPtr<IPersistFolder> persist;
    root.QueryTo(IID_IPersistFolder, persist.PutVoid());
    persist->Initialize(nullptr);
    return root;
}

inline ComPtr<IShellFolder> FirstReceiver(IShellFolder* root) {
    ComPtr<IEnumIDList> enumerator;
    root->EnumObjects(nullptr, SHCONTF_FOLDERS, &enumerator);
    LPITEMIDLIST item = nullptr;
    ComPtr<IShellFolder> receiver;
    if (enumerator && enumerator->Next(1, &item, nullptr) == S_OK) {
        root->BindToObject(item, nullptr, IID_IShellFolder, receiver.PutVoid());
        CoTaskMemFree(item);
    }
    return receiver;
}

// One view of a folder in a browser, destroyed at the end of its scope.
struct HostedView {
    HostedView(IShellFolder* folder, TestBrowser& browser, UINT mode = FVM_DETAILS, IShellView* previous = nullptr) {
        EXPECT_EQ(S_OK, folder->CreateViewObject(nullptr, IID_IShellView, view.PutVoid()));
        FOLDERSETTINGS settings = {mode, 0};
        RECT rect = {0, 0, 600, 400};
        EXPECT_EQ(S_OK, view->CreateViewWindow(previous, &settings, &browser, &rect, &window));
        list = GetDlgItem(window, 2000);
    }
    ~HostedView() {
        if (view) view->DestroyViewWindow();
    }
    CCalvexReceiversShellView* Object() const {
        return static_cast<CCalvexReceiversShellView*>(view.Get());
    }
    int Count() const { return static_cast<int>(SendMessageW(list, LVM_GETITEMCOUNT, 0, 0)); }
    std::wstring Cell(int item, int column) const {
        wchar_t text[260] = L"";
        LVITEMW entry = {};
        entry.iSubItem = column;
        entry.pszText = text;
        entry.cchTextMax = 260;
        SendMessageW(list, LVM_GETITEMTEXTW, item, reinterpret_cast<LPARAM>(&entry));
        return text;
    }
    std::wstring Header(int column, int* width) const {
        wchar_t text[64] = L"";
        LVCOLUMNW entry = {LVCF_TEXT | LVCF_WIDTH};
        entry.pszText = text;
        entry.cchTextMax = 64;
        if (!SendMessageW(list, LVM_GETCOLUMNW, column, reinterpret_cast<LPARAM>(&entry))) return L"<none>";
        *width = entry.cx;
        return text;
    }
    void Select(int item) const {
        LVITEMW state = {};
        state.stateMask = LVIS_SELECTED;
        state.state = LVIS_SELECTED;
        SendMessageW(list, LVM_SETITEMSTATE, item, reinterpret_cast<LPARAM>(&state));
    }
    ComPtr<IShellView> view;
    HWND window = nullptr;
    HWND list = nullptr;
};

}  // namespace testsupport
