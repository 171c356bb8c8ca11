#include "items/CCalvexReceiversNotifyWindow.h"

#include <shlobj.h>

#include <atomic>
#include <new>

#include "com/Handles.h"
#include "module/ModuleState.h"
#include "trace/TraceLog.h"

namespace {
const wchar_t kClassName[] = L"Calvex Receivers Shell Extension - Notify Window";

CriticalSection& InstanceLock() {
    static CriticalSection lock;
    return lock;
}
CCalvexReceiversNotifyWindow* g_instance = nullptr;
std::atomic<CCalvexReceiversNotifyWindow::ChangeNotifyFn> g_changeNotify{&SHChangeNotify};
}  // namespace

HWND CCalvexReceiversNotifyWindow::GetNotifyWindow() {
    CriticalSectionLock lock(InstanceLock());
    if (!g_instance) g_instance = new (std::nothrow) CCalvexReceiversNotifyWindow();
    if (!g_instance) return nullptr;
    if (!g_instance->m_hwnd || !IsWindow(g_instance->m_hwnd)) g_instance->CreateNotifyWindow();
    return g_instance->m_hwnd;
}

void CCalvexReceiversNotifyWindow::DestroyInstance() {
    CriticalSectionLock lock(InstanceLock());
    delete g_instance;
    g_instance = nullptr;
    // A DLL's window classes outlive it unless unregistered; the next load would find a
    // class whose procedure points into the unloaded image.
    UnregisterClassW(kClassName, ModuleInstance());
}

CCalvexReceiversNotifyWindow::ChangeNotifyFn CCalvexReceiversNotifyWindow::SetChangeNotify(ChangeNotifyFn notify) {
    return g_changeNotify.exchange(notify ? notify : &SHChangeNotify);
}

CCalvexReceiversNotifyWindow::~CCalvexReceiversNotifyWindow() { DestroyNotifyWindow(); }

HRESULT CCalvexReceiversNotifyWindow::CreateNotifyWindow() {
    m_hwnd = nullptr;
    WNDCLASSW existing = {};
    bool registered = GetClassInfoW(ModuleInstance(), kClassName, &existing) != FALSE;
    if (registered && existing.lpfnWndProc != WindowProc) {
        // Left behind by an earlier load of this module at another address.
        if (!UnregisterClassW(kClassName, ModuleInstance())) return E_FAIL;
        registered = false;
    }
    if (!registered) {
        WNDCLASSW windowClass = {};
        windowClass.style = CS_HREDRAW | CS_VREDRAW;
        windowClass.lpfnWndProc = WindowProc;
        windowClass.hInstance = ModuleInstance();
        windowClass.hCursor = LoadCursorW(nullptr, IDC_ARROW);
        windowClass.hbrBackground = reinterpret_cast<HBRUSH>(COLOR_WINDOW + 1);
        windowClass.lpszClassName = kClassName;
        if (!RegisterClassW(&windowClass)) return E_FAIL;
    }
    HWND hwnd = CreateWindowExW(0, kClassName, nullptr, 0, 0, 0, 0, 0, nullptr, nullptr, ModuleInstance(), this);
    if (!hwnd) return E_FAIL;
    SetWindowLongPtrW(hwnd, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(this));
    m_hwnd = hwnd;
    return S_OK;
}

void CCalvexReceiversNotifyWindow::DestroyNotifyWindow() {
    if (!m_hwnd || !IsWindow(m_hwnd)) return;
    SetWindowLongPtrW(m_hwnd, GWLP_USERDATA, 0);
    if (GetWindowThreadProcessId(m_hwnd, nullptr) != GetCurrentThreadId()) {
        // Only the owning thread may destroy it: leave it harmless and let that thread close it.
        SetWindowLongPtrW(m_hwnd, GWLP_WNDPROC, reinterpret_cast<LONG_PTR>(&DefWindowProcW));
        PostMessageW(m_hwnd, WM_CLOSE, 0, 0);
    } else {
        DestroyWindow(m_hwnd);
    }
    m_hwnd = nullptr;
}

HRESULT CCalvexReceiversNotifyWindow::BufferEventPath(const wchar_t* path) {
    TraceW(L"<==CCalvexReceiversNotifyWindow::BufferEventPath [%s]\r\n", path);
    if (!path) return E_INVALIDARG;
    KillTimer(m_hwnd, UpdateTimerId);  // each new path restarts the quiet period
    {
        CriticalSectionLock lock(m_lock);
        m_pendingPaths.insert(path);
    }
    if (m_busy) return S_OK;  // SendUpdateEvents re-arms the timer when it is done
    ArmTimer("CCalvexReceiversNotifyWindow::BufferEventPath - set update timer\r\n");
    return S_OK;
}

HRESULT CCalvexReceiversNotifyWindow::SendUpdateEvents() {
    m_busy = true;
    KillTimer(m_hwnd, UpdateTimerId);
    std::set<std::wstring> paths;
    {
        CriticalSectionLock lock(m_lock);
        paths = m_pendingPaths;
    }
    // Emptied outside the lock on purpose: a path buffered by another thread in between is
    // lost, and the next event of that folder brings it back.
    m_pendingPaths.clear();
    for (const std::wstring& path : paths) {
        TraceW(L"==>CCalvexReceiversNotifyWindow::SendUpdateEvents %s\r\n", path.c_str());
        g_changeNotify.load()(SHCNE_UPDATEDIR, SHCNF_PATHW | SHCNF_FLUSH, path.c_str(), nullptr);
    }
    {
        CriticalSectionLock lock(m_lock);
        if (!m_pendingPaths.empty()) ArmTimer("CCalvexReceiversNotifyWindow::SendUpdateEvents - set update timer\r\n");
    }
    m_busy = false;
    return S_OK;
}

void CCalvexReceiversNotifyWindow::ArmTimer(const char* traceLine) {
    TraceA(traceLine);
    SetTimer(m_hwnd, UpdateTimerId, UpdateTimerPeriod, nullptr);
}

void CCalvexReceiversNotifyWindow::OnUpdateMessage(CCalvexReceiversNotifyWindow* self, HGLOBAL block) {
    UniqueGlobal owned(block);  // the sender handed the block over
    GlobalLockGuard<const wchar_t> text(block);
    if (text && self) self->BufferEventPath(text.Get());
}

LRESULT CALLBACK CCalvexReceiversNotifyWindow::WindowProc(HWND hwnd, UINT message, WPARAM wParam, LPARAM lParam) {
    auto* self = reinterpret_cast<CCalvexReceiversNotifyWindow*>(GetWindowLongPtrW(hwnd, GWLP_USERDATA));
    if (message != 0 && message == UpdateFolderMessage()) {
        OnUpdateMessage(self, reinterpret_cast<HGLOBAL>(lParam));
        return 0;
    }
    if (message == WM_TIMER) {
        if (wParam == UpdateTimerId && self) self->SendUpdateEvents();
        return 0;
    }
    return DefWindowProcW(hwnd, message, wParam, lParam);
}
