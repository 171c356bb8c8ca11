#include "ShellChangeListener.h"

#include <cstring>

namespace {
const wchar_t kClassName[] = L"calvex-fetch change listener";
constexpr UINT kNotifyMessage = WM_APP + 17;
constexpr LONG kEvents = SHCNE_UPDATEDIR | SHCNE_UPDATEITEM | SHCNE_CREATE | SHCNE_DELETE | SHCNE_MKDIR | SHCNE_RMDIR;
}  // namespace

bool PrefixRest(PCIDLIST_ABSOLUTE item, PCIDLIST_ABSOLUTE prefix, PCUIDLIST_RELATIVE* rest) {
    if (!item || !prefix) return false;
    const size_t wanted = ILGetSize(prefix) - sizeof(USHORT);  // without the terminator
    // Walk whole items, so that a prefix ending inside one of them does not count.
    auto* at = reinterpret_cast<const BYTE*>(item);
    size_t walked = 0;
    while (walked < wanted && reinterpret_cast<const SHITEMID*>(at + walked)->cb)
        walked += reinterpret_cast<const SHITEMID*>(at + walked)->cb;
    if (walked != wanted || std::memcmp(item, prefix, wanted) != 0) return false;
    if (rest) *rest = reinterpret_cast<PCUIDLIST_RELATIVE>(at + wanted);
    return true;
}

ShellChangeListener::~ShellChangeListener() {
    if (m_registration) SHChangeNotifyDeregister(m_registration);
    if (m_window) DestroyWindow(m_window);
}

HRESULT ShellChangeListener::Start(const std::vector<PCIDLIST_ABSOLUTE>& folders) {
    WNDCLASSW windowClass = {};
    windowClass.lpfnWndProc = WindowProc;
    windowClass.hInstance = GetModuleHandleW(nullptr);
    windowClass.lpszClassName = kClassName;
    RegisterClassW(&windowClass);  // fails harmlessly when a second listener registers it again
    m_window = CreateWindowExW(0, kClassName, nullptr, 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr, windowClass.hInstance, this);
    if (!m_window) return HRESULT_FROM_WIN32(GetLastError());
    SetWindowLongPtrW(m_window, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(this));
    PIDLIST_ABSOLUTE computer = nullptr;
    if (FAILED(SHGetSpecialFolderLocation(nullptr, CSIDL_DRIVES, &computer))) return E_FAIL;
    std::vector<SHChangeNotifyEntry> entries = {{computer, TRUE}};
    for (PCIDLIST_ABSOLUTE folder : folders) entries.push_back({folder, TRUE});
    m_registration = SHChangeNotifyRegister(m_window, SHCNRF_InterruptLevel | SHCNRF_ShellLevel |
                                                          SHCNRF_RecursiveInterrupt | SHCNRF_NewDelivery,
                                            kEvents, kNotifyMessage, static_cast<int>(entries.size()), entries.data());
    CoTaskMemFree(computer);
    return m_registration ? S_OK : E_FAIL;
}

LRESULT CALLBACK ShellChangeListener::WindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
    auto* self = reinterpret_cast<ShellChangeListener*>(GetWindowLongPtrW(window, GWLP_USERDATA));
    if (message != kNotifyMessage || !self) return DefWindowProcW(window, message, wParam, lParam);
    PIDLIST_ABSOLUTE* items = nullptr;
    LONG event = 0;
    HANDLE lock = SHChangeNotification_Lock(reinterpret_cast<HANDLE>(wParam), static_cast<DWORD>(lParam), &items, &event);
    if (!lock) return 0;
    if (items && items[0]) self->m_handler(event, items[0]);
    SHChangeNotification_Unlock(lock);
    return 0;
}
