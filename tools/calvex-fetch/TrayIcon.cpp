#include "TrayIcon.h"

#include "FetchResources.h"
#include "WatchNotice.h"

namespace {
const wchar_t kClassName[] = L"calvex-fetch notification icon";
constexpr UINT kIconId = 1;
constexpr UINT kBalloonMs = 10000;

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
}  // namespace

TrayIcon::TrayIcon(const std::wstring& tip) : m_tip(tip) {
    const HINSTANCE instance = GetModuleHandleW(nullptr);
    WNDCLASSW windowClass = {};
    windowClass.lpfnWndProc = WindowProc;
    windowClass.hInstance = instance;
    windowClass.lpszClassName = kClassName;
    RegisterClassW(&windowClass);
    TaskbarCreated();
    // Top-level but never shown: a message-only window would not hear "TaskbarCreated".
    m_window = CreateWindowExW(WS_EX_TOOLWINDOW, kClassName, L"calvex-fetch", WS_POPUP, 0, 0, 0, 0, nullptr, nullptr,
                               instance, nullptr);
    if (!m_window) return;
    SetWindowLongPtrW(m_window, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(this));
    m_icon = LoadFetchIcon(instance);
    Add();
}

TrayIcon::~TrayIcon() {
    if (!m_window) return;
    NOTIFYICONDATAW data = Data(0);
    if (m_added) Shell_NotifyIconW(NIM_DELETE, &data);
    DestroyWindow(m_window);
}

NOTIFYICONDATAW TrayIcon::Data(UINT flags) const {
    NOTIFYICONDATAW data = {};
    data.cbSize = sizeof(data);
    data.hWnd = m_window;
    data.uID = kIconId;
    data.uFlags = flags;
    data.hIcon = m_icon;
    Put(data.szTip, m_tip);
    return data;
}

void TrayIcon::Add() {
    NOTIFYICONDATAW data = Data(NIF_ICON | NIF_TIP);
    m_added = Shell_NotifyIconW(NIM_ADD, &data) != FALSE;
}

void TrayIcon::SetTip(const std::wstring& tip) {
    if (tip == m_tip || !m_window) return;
    m_tip = tip;
    NOTIFYICONDATAW data = Data(NIF_TIP);
    if (!m_added || !Shell_NotifyIconW(NIM_MODIFY, &data)) Add();
}

// Without a title: Wine's balloon, given one, cuts the text's last line in half.
void TrayIcon::Notify(const std::wstring& text, bool warning) {
    if (!m_window) return;
    if (!m_added) Add();
    NOTIFYICONDATAW data = Data(NIF_INFO);
    Put(data.szInfo, text);
    data.uTimeout = kBalloonMs;
    data.dwInfoFlags = (warning ? NIIF_WARNING : NIIF_INFO) | NIIF_RESPECT_QUIET_TIME;
    if (m_added) Shell_NotifyIconW(NIM_MODIFY, &data);
}

LRESULT CALLBACK TrayIcon::WindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
    auto* owner = reinterpret_cast<TrayIcon*>(GetWindowLongPtrW(window, GWLP_USERDATA));
    if (message == TaskbarCreated() && owner) {
        owner->Add();
        return 0;
    }
    return DefWindowProcW(window, message, wParam, lParam);
}
