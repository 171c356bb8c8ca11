#include "TrayIcon.h"

#include <windowsx.h>

#include "FetchResources.h"
#include "WatchNotice.h"

namespace {
const wchar_t kClassName[] = L"calvex-fetch notification icon";
constexpr UINT kIconId = 1;
constexpr UINT kBalloonMs = 10000;
constexpr UINT kCallback = WM_APP + 1;

UINT TaskbarCreated() {
    static const UINT message = RegisterWindowMessageW(L"TaskbarCreated");
    return message;
}

template <size_t N>
void Put(wchar_t (&field)[N], const std::wstring& text) {
    const std::wstring fitted = CutText(text, N - 1);
    fitted.copy(field, fitted.size());
    field[fitted.size()] = L'\0';
}

HICON LoadFetchIcon(HINSTANCE instance) {
    const HANDLE icon = LoadImageW(instance, MAKEINTRESOURCEW(IDI_FETCH), IMAGE_ICON, GetSystemMetrics(SM_CXSMICON),
                                   GetSystemMetrics(SM_CYSMICON), LR_SHARED);
    return icon ? static_cast<HICON>(icon) : LoadIconW(nullptr, IDI_APPLICATION);
}

// The icon with two bars over its lower right quarter, as media players show a pause. Drawn in
// a 32-bit bitmap: an icon with an alpha channel gets opaque bars, one without keeps its mask.
HICON MakePausedIcon(HICON icon) {
    const int cx = GetSystemMetrics(SM_CXSMICON), cy = GetSystemMetrics(SM_CYSMICON);
    BITMAPINFO format = {};
    format.bmiHeader = {sizeof(BITMAPINFOHEADER), cx, -cy, 1, 32, BI_RGB, 0, 0, 0, 0, 0};
    void* bits = nullptr;
    const HBITMAP color = CreateDIBSection(nullptr, &format, DIB_RGB_COLORS, &bits, nullptr, 0);
    const HBITMAP mask = CreateBitmap(cx, cy, 1, 1, nullptr);
    const HDC dc = CreateCompatibleDC(nullptr);
    if (!color || !mask || !dc) return nullptr;
    const HGDIOBJ old = SelectObject(dc, mask);
    DrawIconEx(dc, 0, 0, icon, cx, cy, 0, nullptr, DI_MASK);
    const RECT bars[] = {{cx / 2, cy / 2, cx / 2 + cx / 6, cy}, {cx - cx / 6, cy / 2, cx, cy}};
    for (const RECT& bar : bars) FillRect(dc, &bar, static_cast<HBRUSH>(GetStockObject(BLACK_BRUSH)));
    SelectObject(dc, color);
    DrawIconEx(dc, 0, 0, icon, cx, cy, 0, nullptr, DI_IMAGE);
    GdiFlush();
    auto* pixels = static_cast<DWORD*>(bits);
    bool alpha = false;
    for (int i = 0; i < cx * cy; ++i) alpha = alpha || (pixels[i] >> 24) != 0;
    for (const RECT& bar : bars)
        for (int y = bar.top; y < bar.bottom; ++y)
            for (int x = bar.left; x < bar.right; ++x) pixels[y * cx + x] = (alpha ? 0xFF000000u : 0u) | 0x2020A0u;
    SelectObject(dc, old);
    DeleteDC(dc);
    ICONINFO info = {TRUE, 0, 0, mask, color};
    const HICON paused = CreateIconIndirect(&info);
    DeleteObject(color);
    DeleteObject(mask);
    return paused;
}
}  // namespace

TrayIcon::TrayIcon(const std::wstring& tip, bool shown, Listener* listener)
    : m_listener(listener), m_tip(tip), m_shown(shown) {
    const HINSTANCE instance = GetModuleHandleW(nullptr);
    WNDCLASSW windowClass = {};
    windowClass.lpfnWndProc = WindowProc;
    windowClass.hInstance = instance;
    windowClass.lpszClassName = kClassName;
    RegisterClassW(&windowClass);
    TaskbarCreated();
    ShowSettingsMessage();
    // Top-level but never shown: a message-only window would not hear "TaskbarCreated".
    m_window = CreateWindowExW(WS_EX_TOOLWINDOW, kClassName, L"calvex-fetch", WS_POPUP, 0, 0, 0, 0, nullptr, nullptr,
                               instance, nullptr);
    if (!m_window) return;
    SetWindowLongPtrW(m_window, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(this));
    m_icon = LoadFetchIcon(instance);
    m_pausedIcon = MakePausedIcon(m_icon);
    std::lock_guard<std::mutex> hold(m_lock);
    if (m_shown) Add();
}

TrayIcon::~TrayIcon() {
    if (!m_window) return;
    NOTIFYICONDATAW data = Data(0);
    if (m_added) Shell_NotifyIconW(NIM_DELETE, &data);
    DestroyWindow(m_window);
    if (m_pausedIcon) DestroyIcon(m_pausedIcon);
}

HWND TrayIcon::FindRunningWatch() { return FindWindowW(kClassName, nullptr); }

UINT TrayIcon::ShowSettingsMessage() {
    static const UINT message = RegisterWindowMessageW(L"calvex-fetchw - Show Settings");
    return message;
}

NOTIFYICONDATAW TrayIcon::Data(UINT flags) const {
    NOTIFYICONDATAW data = {};
    data.cbSize = sizeof(data);
    data.hWnd = m_window;
    data.uID = kIconId;
    data.uFlags = flags;
    data.uCallbackMessage = kCallback;
    data.hIcon = m_paused && m_pausedIcon ? m_pausedIcon : m_icon;
    Put(data.szTip, m_tip);
    return data;
}

// Under m_lock.
void TrayIcon::Add() {
    NOTIFYICONDATAW data = Data(NIF_ICON | NIF_TIP | NIF_MESSAGE | NIF_SHOWTIP);
    m_added = Shell_NotifyIconW(NIM_ADD, &data) != FALSE;
    data.uVersion = NOTIFYICON_VERSION_4;
    if (m_added) Shell_NotifyIconW(NIM_SETVERSION, &data);
}

void TrayIcon::SetTip(const std::wstring& tip) {
    std::lock_guard<std::mutex> hold(m_lock);
    if (tip == m_tip || !m_window) return;
    m_tip = tip;
    NOTIFYICONDATAW data = Data(NIF_TIP | NIF_SHOWTIP);
    if (m_shown && (!m_added || !Shell_NotifyIconW(NIM_MODIFY, &data))) Add();
}

void TrayIcon::SetPaused(bool paused) {
    std::lock_guard<std::mutex> hold(m_lock);
    if (paused == m_paused || !m_window) return;
    m_paused = paused;
    NOTIFYICONDATAW data = Data(NIF_ICON);
    if (m_added) Shell_NotifyIconW(NIM_MODIFY, &data);
}

void TrayIcon::SetShown(bool shown) {
    std::lock_guard<std::mutex> hold(m_lock);
    if (shown == m_shown || !m_window) return;
    m_shown = shown;
    NOTIFYICONDATAW data = Data(0);
    if (shown) Add();
    else if (m_added) m_added = !Shell_NotifyIconW(NIM_DELETE, &data);
}

// Without a title: Wine's balloon, given one, cuts the text's last line in half.
void TrayIcon::Notify(const std::wstring& text, bool warning) {
    std::lock_guard<std::mutex> hold(m_lock);
    if (!m_window || !m_shown) return;
    if (!m_added) Add();
    NOTIFYICONDATAW data = Data(NIF_INFO);
    Put(data.szInfo, text);
    data.uTimeout = kBalloonMs;
    data.dwInfoFlags = (warning ? NIIF_WARNING : NIIF_INFO) | NIIF_RESPECT_QUIET_TIME;
    if (m_added) Shell_NotifyIconW(NIM_MODIFY, &data);
}

// NOTIFYICON_VERSION_4: the event in the low word of lParam, the anchor point in wParam.
void TrayIcon::OnCallback(WPARAM wParam, LPARAM lParam) {
    if (!m_listener) return;
    switch (LOWORD(lParam)) {
    case NIN_SELECT:
    case NIN_KEYSELECT:
        return m_listener->OnOpen();
    case NIN_BALLOONUSERCLICK:
        return m_listener->OnNoticeClicked();
    case WM_CONTEXTMENU:
        return m_listener->OnMenu(POINT{GET_X_LPARAM(wParam), GET_Y_LPARAM(wParam)});
    default:
        return;
    }
}

LRESULT CALLBACK TrayIcon::WindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
    auto* owner = reinterpret_cast<TrayIcon*>(GetWindowLongPtrW(window, GWLP_USERDATA));
    if (!owner) return DefWindowProcW(window, message, wParam, lParam);
    if (message == TaskbarCreated()) {
        std::lock_guard<std::mutex> hold(owner->m_lock);
        if (owner->m_shown) owner->Add();
        return 0;
    }
    if (message == kCallback) {
        owner->OnCallback(wParam, lParam);
        return 0;
    }
    if (message == ShowSettingsMessage() && owner->m_listener) {
        owner->m_listener->OnShowSettings();
        return 0;
    }
    return DefWindowProcW(window, message, wParam, lParam);
}
