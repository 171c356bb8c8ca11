#include "MessageBoxAnswerer.h"

#include <iterator>

#include "resources/resource.h"

namespace {
constexpr DWORD PollMs = 100;
constexpr int MessageTextId = 0xFFFF;  // the static text of a message box

bool IsDialog(HWND window) {
    wchar_t className[16] = L"";
    GetClassNameW(window, className, 16);
    return lstrcmpW(className, L"#32770") == 0;
}

std::wstring TextOf(HWND window) {
    wchar_t text[1024] = L"";
    GetWindowTextW(window, text, 1024);
    return text;
}
}  // namespace

MessageBoxAnswerer::MessageBoxAnswerer(Report report)
    : m_report(std::move(report)), m_stop(CreateEventW(nullptr, TRUE, FALSE, nullptr)),
      m_thread(CreateThread(nullptr, 0, Run, this, 0, nullptr)) {}

MessageBoxAnswerer::~MessageBoxAnswerer() {
    SetEvent(m_stop);
    if (m_thread) {
        WaitForSingleObject(m_thread, INFINITE);
        CloseHandle(m_thread);
    }
    CloseHandle(m_stop);
}

DWORD WINAPI MessageBoxAnswerer::Run(void* self) {
    auto* answerer = static_cast<MessageBoxAnswerer*>(self);
    while (WaitForSingleObject(answerer->m_stop, PollMs) == WAIT_TIMEOUT) {
        // A handle may come back for a later box once its window is gone.
        for (auto it = answerer->m_answered.begin(); it != answerer->m_answered.end();)
            it = IsWindow(*it) ? std::next(it) : answerer->m_answered.erase(it);
        EnumWindows(Visit, reinterpret_cast<LPARAM>(answerer));
    }
    return 0;
}

BOOL CALLBACK MessageBoxAnswerer::Visit(HWND window, LPARAM self) {
    auto* answerer = reinterpret_cast<MessageBoxAnswerer*>(self);
    if (IsWindowVisible(window) && IsDialog(window) && GetDlgItem(window, MessageTextId) && answerer->IsOurs(window))
        answerer->Answer(window);
    return TRUE;
}

bool MessageBoxAnswerer::IsOurs(HWND box) const {
    DWORD process = 0;
    GetWindowThreadProcessId(box, &process);
    if (process == GetCurrentProcessId()) return true;
    const HWND owner = GetWindow(box, GW_OWNER);
    return owner && GetDlgItem(owner, IDC_PROGRESS_BAR) && GetDlgItem(owner, IDC_PROGRESS_STATUS);
}

void MessageBoxAnswerer::Answer(HWND box) {
    if (!m_answered.insert(box).second) return;
    m_report(TextOf(box), TextOf(GetDlgItem(box, MessageTextId)));
    // A box with OK alone takes IDOK; one with Cancel takes IDCANCEL as well.
    PostMessageW(box, WM_COMMAND, GetDlgItem(box, IDCANCEL) ? IDCANCEL : IDOK, 0);
}
