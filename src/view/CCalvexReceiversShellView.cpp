// The view object: its IShellView slots, the view window and its activation.
#include "view/CCalvexReceiversShellView.h"

#include <string>

#include "module/ClassCreators.h"
#include "module/ModuleState.h"
#include "resource.h"
#include "trace/TraceLog.h"

const IID IID_ICalvexBrennorReceiversShellView = {
    0x94A3DC85, 0x341E, 0x4ADF, {0x81, 0x05, 0x30, 0xD5, 0x62, 0x22, 0xFA, 0x31}};

namespace {
const wchar_t kViewClassName[] = L"CalvexReceiversViewNSClass";
}  // namespace

HRESULT CreateCalvexReceiversShellView(IUnknown* outer, REFIID riid, void** ppv) {
    return CreateComInstance<CCalvexReceiversShellView>(outer, riid, ppv);
}

CCalvexReceiversShellView::CCalvexReceiversShellView() {
    InitCommonControls();
    m_pidlManager.reset(new (std::nothrow) CReceiversPidlMgr());
    SHGetMalloc(&m_malloc);
    m_threadLocale = GetThreadLocale();
}

HRESULT CCalvexReceiversShellView::FinalConstruct() {
    return m_pidlManager && m_pidlManager->IsValid() && m_malloc ? S_OK : E_OUTOFMEMORY;
}

CCalvexReceiversShellView::~CCalvexReceiversShellView() {
    TraceA("CCalvexReceiversShellView::~CCalvexReceiversShellView %p\n", this);
    HideFindAnimation();
    m_folderPidl.Reset();
    if (m_viewWindow && IsWindow(m_viewWindow) &&
        GetWindowLongPtrW(m_viewWindow, GWLP_USERDATA) == reinterpret_cast<LONG_PTR>(this)) {
        // A browser that never called DestroyViewWindow must not leave a window pointing at us.
        SetWindowLongPtrW(m_viewWindow, GWLP_USERDATA, 0);
        DestroyWindow(m_viewWindow);
    }
    if (m_folder) m_folder->RemoveViewWindow(m_viewWindow);
    m_folder.Reset();
    m_malloc.Reset();
    m_listControl.Unsubclass();
    m_pidlManager.reset();
    m_commDlgBrowser.Reset();
    m_shellBrowser.Reset();
}

HRESULT CCalvexReceiversShellView::Init(IReceiversShellFolderImpl* folder, LPCITEMIDLIST folderPidl) {
    TraceA("CCalvexReceiversShellView::Init\n");
    m_folder = ComPtr<IReceiversShellFolderImpl>(folder);
    m_folderPidl = UniquePidl(*m_pidlManager, folderPidl ? m_pidlManager->Copy(folderPidl) : nullptr);
    m_activationState = SVUIA_DEACTIVATE;
    return folderPidl && !m_folderPidl ? E_OUTOFMEMORY : S_OK;
}

DWORD CCalvexReceiversShellView::FolderType() const {
    return m_folderPidl && m_pidlManager->GetLastItem(m_folderPidl.Get())
               ? m_pidlManager->GetLastItemType(m_folderPidl.Get())
               : 0;
}

// IOleWindow

STDMETHODIMP CCalvexReceiversShellView::GetWindow(HWND* phwnd) {
    TraceA("CCalvexReceiversShellView::GetWindow\n");
    if (!phwnd) return E_POINTER;
    *phwnd = m_viewWindow;
    return S_OK;
}

STDMETHODIMP CCalvexReceiversShellView::ContextSensitiveHelp(BOOL) {
    TraceA("CCalvexReceiversShellView::ContextSensitiveHelp\n");
    return E_NOTIMPL;
}

// IShellView

STDMETHODIMP CCalvexReceiversShellView::TranslateAccelerator(MSG*) {
    TraceA("CCalvexReceiversShellView::TranslateAccelerator\n");
    return S_FALSE;
}

STDMETHODIMP CCalvexReceiversShellView::EnableModeless(BOOL) {
    TraceA("CCalvexReceiversShellView::EnableModeless\n");
    return E_NOTIMPL;
}

STDMETHODIMP CCalvexReceiversShellView::UIActivate(UINT state) {
    TraceA("CCalvexReceiversShellView::UIActivate %u\n", state);
    if (state == m_activationState) return S_OK;
    OnActivate(state);
    if (state != SVUIA_DEACTIVATE) SetStatusText();
    return S_OK;
}

void CCalvexReceiversShellView::SetStatusText() {
    if (!m_shellBrowser) return;
    // Only a Brennor root gets its own prefix; a Brennor receiver shows the Calvex one.
    const UINT prefix = FolderType() == ItemTypeBrennorRoot ? IDS_BRENNOR_RECEIVERS : IDS_CALVEX_RECEIVERS;
    std::wstring text = LoadModuleString(prefix) + L": ";
    if (m_folder) text += m_folder->FolderPath(false);
    if (text.size() > kPathCapacity - 1) text.resize(kPathCapacity - 1);
    int parts[1] = {-1};
    LRESULT result = 0;
    m_shellBrowser->SendControlMsg(FCW_STATUS, SB_SETPARTS, 1, reinterpret_cast<LPARAM>(parts), &result);
    m_shellBrowser->SendControlMsg(FCW_STATUS, SB_SETTEXTW, 0, reinterpret_cast<LPARAM>(text.c_str()), &result);
}

void CCalvexReceiversShellView::OnActivate(UINT state) {
    TraceA("CCalvexReceiversShellView::OnActivate %u\n", state);
    if (state == m_activationState) return;
    OnDeactivate();
    m_activationState = state;
    if (state != SVUIA_DEACTIVATE) UpdateMenu();
}

void CCalvexReceiversShellView::OnDeactivate() {
    TraceA("CCalvexReceiversShellView::OnDeactivate\n");
    if (m_activationState != SVUIA_DEACTIVATE && m_menu) {
        if (m_shellBrowser) {
            m_shellBrowser->SetMenuSB(nullptr, nullptr, nullptr);
            m_shellBrowser->RemoveMenusSB(m_menu);
        }
        DestroyMenu(m_menu);
        m_menu = nullptr;
    }
    m_activationState = SVUIA_DEACTIVATE;
}

STDMETHODIMP CCalvexReceiversShellView::CreateViewWindow(IShellView* previous, LPCFOLDERSETTINGS settings,
                                                         IShellBrowser* browser, RECT* rect, HWND* phwnd) {
    TraceA("CCalvexReceiversShellView::CreateViewWindow\n");
    if (!phwnd) return E_POINTER;
    *phwnd = nullptr;
    if (!browser || !settings || !rect) return E_INVALIDARG;
    if (FAILED(RegisterViewClass())) return E_FAIL;
    TakeBrowser(browser);
    m_folderSettings = *settings;
    if (previous) TakePreviousMode(previous);
    browser->SetToolbarItems(nullptr, 0, FCT_MERGE);
    browser->GetWindow(&m_parentWindow);
    HWND window = CreateWindowExW(0, kViewClassName, nullptr, WS_CHILD | WS_VISIBLE | WS_CLIPSIBLINGS, rect->left,
                                  rect->top, rect->right - rect->left, rect->bottom - rect->top, m_parentWindow,
                                  nullptr, ModuleInstance(), static_cast<IShellView*>(this));
    if (!window) return E_FAIL;
    *phwnd = m_viewWindow;
    if (m_folder) {
        RegisterForNotifications();
    } else {
        TraceA("CCalvexReceiversShellView::CreateViewWindow - OK\r\n");
    }
    return S_OK;
}

HRESULT CCalvexReceiversShellView::RegisterViewClass() {
    WNDCLASSW windowClass = {};
    if (GetClassInfoW(ModuleInstance(), kViewClassName, &windowClass)) return S_OK;
    windowClass.style = CS_HREDRAW | CS_VREDRAW;
    windowClass.lpfnWndProc = WindowProc;
    windowClass.hInstance = ModuleInstance();
    windowClass.hCursor = LoadCursorW(nullptr, IDC_ARROW);
    windowClass.hbrBackground = reinterpret_cast<HBRUSH>(COLOR_WINDOW + 1);
    windowClass.lpszClassName = kViewClassName;
    return RegisterClassW(&windowClass) ? S_OK : E_FAIL;
}

void CCalvexReceiversShellView::TakeBrowser(IShellBrowser* browser) {
    m_shellBrowser = ComPtr<IShellBrowser>(browser);
    m_commDlgBrowser.Reset();
    browser->QueryInterface(IID_ICommDlgBrowser, m_commDlgBrowser.PutVoid());
}

void CCalvexReceiversShellView::TakePreviousMode(IShellView* previous) {
    ComPtr<IUnknown> ours;
    if (SUCCEEDED(previous->QueryInterface(IID_ICalvexBrennorReceiversShellView, ours.PutVoid())) && ours) {
        previous->GetCurrentInfo(&m_folderSettings);
        return;
    }
    ComPtr<IStream> stream;
    if (SUCCEEDED(m_shellBrowser->GetViewStateStream(STGM_READ, &stream)) && stream) {
        // Only the mode was saved; the flags stay those of the settings given.
        stream->Read(&m_folderSettings.ViewMode, sizeof(m_folderSettings.ViewMode), nullptr);
    }
}

void CCalvexReceiversShellView::RegisterForNotifications() {
    m_folder->AddViewWindow(m_viewWindow);
    UniquePidl full(m_malloc.Get(), m_folder->GetFullPidl());
    SHChangeNotifyEntry entry = {full.Get(), FALSE};
    m_notifyRegistration = SHChangeNotifyRegister(
        m_viewWindow, SHCNRF_InterruptLevel | SHCNRF_ShellLevel | SHCNRF_RecursiveInterrupt | SHCNRF_NewDelivery,
        SHCNE_CREATE | SHCNE_DELETE | SHCNE_UPDATEDIR | SHCNE_UPDATEITEM, ViewNotificationMessage(), 1, &entry);
    TraceA("CCalvexReceiversShellView::CreateViewWindow - window [0x%p] is registered for notifications [%u] [0x%p]\r\n",
           m_viewWindow, m_notifyRegistration, full.Get());
}

STDMETHODIMP CCalvexReceiversShellView::DestroyViewWindow() {
    TraceA("CCalvexReceiversShellView::DestroyViewWindow\n");
    UIActivate(SVUIA_DEACTIVATE);
    if (m_menu) {
        DestroyMenu(m_menu);
        m_menu = nullptr;
    }
    if (m_notifyRegistration) {
        SHChangeNotifyDeregister(m_notifyRegistration);
        m_notifyRegistration = 0;
    }
    HideFindAnimation();
    if (m_viewWindow) DestroyWindow(m_viewWindow);
    m_commDlgBrowser.Reset();
    m_shellBrowser.Reset();
    return S_OK;
}

STDMETHODIMP CCalvexReceiversShellView::GetCurrentInfo(LPFOLDERSETTINGS pfs) {
    TraceA("CCalvexReceiversShellView::GetCurrentInfo\n");
    if (!pfs) return E_POINTER;
    *pfs = m_folderSettings;
    return S_OK;
}

STDMETHODIMP CCalvexReceiversShellView::AddPropertySheetPages(DWORD, LPFNSVADDPROPSHEETPAGE, LPARAM) {
    TraceA("CCalvexReceiversShellView::AddPropertySheetPages\n");
    return E_NOTIMPL;
}

STDMETHODIMP CCalvexReceiversShellView::SaveViewState() {
    TraceA("CCalvexReceiversShellView::SaveViewState\n");
    if (!m_shellBrowser) return E_FAIL;
    ComPtr<IStream> stream;
    HRESULT hr = m_shellBrowser->GetViewStateStream(STGM_WRITE, &stream);
    if (FAILED(hr) || !stream) return FAILED(hr) ? hr : E_FAIL;
    return stream->Write(&m_folderSettings.ViewMode, sizeof(m_folderSettings.ViewMode), nullptr);
}

STDMETHODIMP CCalvexReceiversShellView::SelectItem(PCUITEMID_CHILD, SVSIF) {
    TraceA("CCalvexReceiversShellView::SelectItem\n");
    return E_NOTIMPL;
}

STDMETHODIMP CCalvexReceiversShellView::GetItemObject(UINT uItem, REFIID riid, void** ppv) {
    TraceA("CCalvexReceiversShellView::GetItemObject\n");
    if (!ppv) return E_POINTER;
    *ppv = nullptr;
    if (uItem != SVGIO_SELECTION || !IsEqualIID(riid, IID_IDataObject)) return E_NOINTERFACE;
    return MakeDataObject(reinterpret_cast<IDataObject**>(ppv));
}

// The view window

LRESULT CALLBACK CCalvexReceiversShellView::WindowProc(HWND hwnd, UINT message, WPARAM wParam, LPARAM lParam) {
    auto* view = reinterpret_cast<CCalvexReceiversShellView*>(GetWindowLongPtrW(hwnd, GWLP_USERDATA));
    if (message == WM_NCCREATE) {
        auto* create = reinterpret_cast<CREATESTRUCTW*>(lParam);
        view = static_cast<CCalvexReceiversShellView*>(static_cast<IShellView*>(create->lpCreateParams));
        SetWindowLongPtrW(hwnd, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(view));
        if (view) view->m_viewWindow = hwnd;
        return DefWindowProcW(hwnd, message, wParam, lParam);
    }
    if (!view) return DefWindowProcW(hwnd, message, wParam, lParam);
    if (message == WM_DESTROY) {
        view->m_listControl.Unsubclass();
        return DefWindowProcW(hwnd, message, wParam, lParam);
    }
    if (message == WM_NCDESTROY) {
        SetWindowLongPtrW(hwnd, GWLP_USERDATA, 0);  // the handle value alone stays, for the folder's list
        return DefWindowProcW(hwnd, message, wParam, lParam);
    }
    return view->HandleMessage(message, wParam, lParam);
}

LRESULT CCalvexReceiversShellView::HandleMessage(UINT message, WPARAM wParam, LPARAM lParam) {
    if (message != 0 && message == ViewNotificationMessage()) {
        OnChangeNotify(wParam, lParam);
        return 0;
    }
    switch (message) {
    case WM_CREATE:
        OnCreate();
        return 0;
    case WM_SIZE:
        if (m_listWindow) MoveWindow(m_listWindow, 0, 0, LOWORD(lParam), HIWORD(lParam), TRUE);
        return 0;
    case WM_ACTIVATE:
        OnActivate(SVUIA_ACTIVATE_FOCUS);
        return 0;
    case WM_SETFOCUS:
        if (m_shellBrowser) m_shellBrowser->OnViewWindowActive(this);
        OnActivate(SVUIA_ACTIVATE_FOCUS);
        return 0;
    case WM_KILLFOCUS:
        OnActivate(SVUIA_ACTIVATE_NOFOCUS);
        return 0;
    case WM_SETTINGCHANGE:
        ApplyClickSettings();
        return 0;
    case WM_NOTIFY:
        return OnNotify(reinterpret_cast<NMHDR*>(lParam));
    case WM_CONTEXTMENU:
        OnContextMenu(static_cast<short>(LOWORD(lParam)), static_cast<short>(HIWORD(lParam)));
        return 0;
    case WM_COMMAND:
        OnCommand(LOWORD(wParam));
        return 0;
    case WM_INITMENUPOPUP:
        UpdateMenu();
        return 0;
    default:
        return DefWindowProcW(m_viewWindow, message, wParam, lParam);
    }
}

void CCalvexReceiversShellView::OnCreate() {
    if (CreateList() && InitColumns()) FillList();
}
