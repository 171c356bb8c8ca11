#pragma once
// A view of our folders hosted as Explorer hosts it, in a browser of our own.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>

#include <algorithm>
#include <map>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "com/ComPtr.h"
#include "module/ClassCreators.h"
#include "support/TestSupport.h"
#include "view/CCalvexReceiversShellView.h"

namespace testsupport {

// The browser that hosts the view: a frame window, File/Edit/View menus carrying the shell's
// ids, and a record of what the view asks of it. It lives on the test's stack.
class TestBrowser : public IShellBrowser, public ICommDlgBrowser {
public:
    explicit TestBrowser(bool fileDialog = false) : fileDialog(fileDialog) {}
    virtual ~TestBrowser() { DestroyWindow(frame); }
    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        const bool dialog = fileDialog && IsEqualIID(riid, IID_ICommDlgBrowser);
        *ppv = dialog ? static_cast<ICommDlgBrowser*>(this) : nullptr;
        if (IsEqualIID(riid, IID_IUnknown) || IsEqualIID(riid, IID_IShellBrowser) || IsEqualIID(riid, IID_IOleWindow))
            *ppv = static_cast<IShellBrowser*>(this);
        if (*ppv) AddRef();
        return *ppv ? S_OK : E_NOINTERFACE;
    }
    STDMETHODIMP_(ULONG) AddRef() override { return ++refs; }
    STDMETHODIMP_(ULONG) Release() override { return --refs; }
    STDMETHODIMP GetWindow(HWND* hwnd) override { *hwnd = frame; return S_OK; }
    STDMETHODIMP InsertMenusSB(HMENU menu, LPOLEMENUGROUPWIDTHS) override {
        for (UINT id : {FCIDM_MENU_FILE, FCIDM_MENU_EDIT, FCIDM_MENU_VIEW}) {
            HMENU sub = CreatePopupMenu();
            if (id == FCIDM_MENU_VIEW) AppendMenuW(sub, MF_SEPARATOR, FCIDM_MENU_VIEW_SEP_OPTIONS, nullptr);
            if (id == FCIDM_MENU_EDIT) AppendMenuW(sub, MF_STRING, 0x7001, L"Undo");
            MENUITEMINFOW item = {sizeof(item), MIIM_ID | MIIM_SUBMENU | MIIM_STRING, 0, 0, id, sub};
            item.dwTypeData = const_cast<wchar_t*>(L"x");
            InsertMenuItemW(menu, GetMenuItemCount(menu), TRUE, &item);
        }
        return S_OK;
    }
    STDMETHODIMP SetMenuSB(HMENU menu, HOLEMENU, HWND) override { lastMenu = menu; return S_OK; }
    STDMETHODIMP BrowseObject(PCUIDLIST_RELATIVE, UINT) override { return S_OK; }
    STDMETHODIMP GetViewStateStream(DWORD, IStream** stream) override {
        viewState.CopyTo(stream);
        return viewState ? viewState->Seek(LARGE_INTEGER{}, STREAM_SEEK_SET, nullptr) : E_FAIL;
    }
    STDMETHODIMP SendControlMsg(UINT control, UINT message, WPARAM, LPARAM lParam, LRESULT*) override {
        if (control == FCW_STATUS && message == SB_SETTEXTW) statusText = reinterpret_cast<const wchar_t*>(lParam);
        return S_OK;
    }
    STDMETHODIMP ContextSensitiveHelp(BOOL) override { return E_NOTIMPL; }
    STDMETHODIMP SetStatusTextSB(LPCWSTR) override { return E_NOTIMPL; }
    STDMETHODIMP EnableModelessSB(BOOL) override { return E_NOTIMPL; }
    STDMETHODIMP TranslateAcceleratorSB(MSG*, WORD) override { return E_NOTIMPL; }
    STDMETHODIMP GetControlWindow(UINT, HWND*) override { return E_NOTIMPL; }
    STDMETHODIMP QueryActiveShellView(IShellView**) override { return E_NOTIMPL; }
    STDMETHODIMP RemoveMenusSB(HMENU) override { return S_OK; }
    STDMETHODIMP OnViewWindowActive(IShellView*) override { return S_OK; }
    STDMETHODIMP SetToolbarItems(LPTBBUTTONSB, UINT, UINT) override { return S_OK; }
    STDMETHODIMP OnDefaultCommand(IShellView*) override { return S_OK; }
    STDMETHODIMP OnStateChange(IShellView*, ULONG) override { return S_OK; }
    STDMETHODIMP IncludeObject(IShellView*, PCUITEMID_CHILD) override { return S_OK; }

    bool fileDialog;
    HWND frame = CreateWindowExW(0, L"STATIC", L"frame", WS_OVERLAPPEDWINDOW | WS_VISIBLE, 0, 0, 700, 500, nullptr,
                                 nullptr, nullptr, nullptr);
    ULONG refs = 0;
    HMENU lastMenu = nullptr;
    std::wstring statusText;
    ComPtr<IStream> viewState;
};

// Our root folder of either brand, or its first receiver's folder (S_FALSE or the binding's
// result in bound); null when there is none.
inline ComPtr<IShellFolder> OurFolder(bool files, bool brennor = false, HRESULT* bound = nullptr) {
    ComPtr<IShellFolder> root, receiver;
    (brennor ? CreateBrennorReceiversShellFolder : CreateCalvexReceiversShellFolder)(nullptr, IID_IShellFolder,
                                                                                     root.PutVoid());
    ComPtr<IPersistFolder> persist;
    root.QueryTo(IID_IPersistFolder, persist.PutVoid());
    persist->Initialize(nullptr);
    if (!files) return root;
    std::vector<TaskPidl> items = ListItems(root.Get(), SHCONTF_FOLDERS);
    const HRESULT hr =
        items.empty() ? S_FALSE : root->BindToObject(items[0].get(), nullptr, IID_IShellFolder, receiver.PutVoid());
    if (bound) *bound = hr;
    return receiver;
}

// The Calvex brand folder under My Computer, as the shell's change notifications name it.
inline const std::wstring kCalvexRootPath =
    L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\::{E102076F-4057-4e7f-8209-511258F12B62}";

// Stands in for a view's window: a message-only window that counts the view notification
// messages the folders post to it, in ViewMessages()[window].
inline std::map<HWND, int>& ViewMessages() {
    static std::map<HWND, int> counts;
    return counts;
}
inline HWND CountingViewWindow() {
    static const ATOM atom = [] {
        WNDCLASSW windowClass = {};
        windowClass.lpfnWndProc = [](HWND hwnd, UINT message, WPARAM wParam, LPARAM lParam) -> LRESULT {
            if (message != RegisterWindowMessageW(L"CCalvexReceiversShellView - Notification Message"))
                return DefWindowProcW(hwnd, message, wParam, lParam);
            return ++ViewMessages()[hwnd], 0;
        };
        windowClass.hInstance = GetModuleHandleW(nullptr);
        windowClass.lpszClassName = L"TestCountingViewWindow";
        return RegisterClassW(&windowClass);
    }();
    return CreateWindowExW(0, MAKEINTATOM(atom), L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr, nullptr, nullptr);
}

inline size_t CountTrace(const std::string& line) {
    const std::vector<std::string> messages = TraceMessages();
    return std::count(messages.begin(), messages.end(), line);
}

// One view of a folder in a browser, destroyed at the end of its scope; the folder is not
// kept here, so the view must hold it.
struct HostedView {
    HostedView(ComPtr<IShellFolder> folder, TestBrowser& browser, UINT mode = FVM_DETAILS, IShellView* previous = nullptr) {
        EXPECT_EQ(S_OK, folder->CreateViewObject(nullptr, IID_IShellView, view.PutVoid()));
        FOLDERSETTINGS settings = {mode, 0};
        RECT rect = {0, 0, 600, 400};
        EXPECT_EQ(S_OK, view->CreateViewWindow(previous, &settings, &browser, &rect, &window));
        list = GetDlgItem(window, 2000);
    }
    ~HostedView() { view->DestroyViewWindow(); }
    CCalvexReceiversShellView* Object() const { return static_cast<CCalvexReceiversShellView*>(view.Get()); }
    int Count() const { return ListView_GetItemCount(list); }
    void Select(int item) const { ListView_SetItemState(list, item, LVIS_SELECTED, LVIS_SELECTED); }
    ComPtr<IShellView> view;
    HWND window = nullptr, list = nullptr;
};

}  // namespace testsupport
