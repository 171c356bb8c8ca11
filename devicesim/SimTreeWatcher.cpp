#include "SimTreeWatcher.h"

#include <memory>

namespace {

struct ChangeTraits {
    using Type = HANDLE;
    static Type Invalid() { return INVALID_HANDLE_VALUE; }
    static bool IsValid(Type h) { return h != INVALID_HANDLE_VALUE && h != nullptr; }
    static void Close(Type h) { FindCloseChangeNotification(h); }
};
using UniqueChange = UniqueResource<ChangeTraits>;

const DWORD kFilter = FILE_NOTIFY_CHANGE_FILE_NAME | FILE_NOTIFY_CHANGE_DIR_NAME | FILE_NOTIFY_CHANGE_SIZE |
                      FILE_NOTIFY_CHANGE_LAST_WRITE;
const DWORD kPollMilliseconds = 1000;
const DWORD kSettleMilliseconds = 50;
const size_t kMaxWatched = MAXIMUM_WAIT_OBJECTS - 2;  // the stop and re-arm events come first

}  // namespace

SimTreeWatcher::SimTreeWatcher(HWND target, UINT message)
    : m_target(target),
      m_message(message),
      m_stop(CreateEventW(nullptr, TRUE, FALSE, nullptr)),
      m_rearm(CreateEventW(nullptr, FALSE, FALSE, nullptr)) {}

SimTreeWatcher::~SimTreeWatcher() {
    if (m_thread) {
        SetEvent(m_stop.Get());
        WaitForSingleObject(m_thread.Get(), INFINITE);
    }
}

bool SimTreeWatcher::Start() {
    if (!m_stop || !m_rearm) return false;
    ResetEvent(m_rearm.Get());  // the thread reads the folders as it starts
    m_thread.Reset(CreateThread(nullptr, 0, ThreadProc, this, 0, nullptr));
    return static_cast<bool>(m_thread);
}

void SimTreeWatcher::Watch(const std::vector<std::wstring>& folders) {
    {
        CriticalSectionLock lock(m_lock);
        if (folders == m_folders) return;
        m_folders = folders;
    }
    SetEvent(m_rearm.Get());
}

DWORD WINAPI SimTreeWatcher::ThreadProc(void* self) {
    static_cast<SimTreeWatcher*>(self)->Run();
    return 0;
}

void SimTreeWatcher::Run() {
    for (;;) {
        std::vector<std::wstring> folders;
        {
            CriticalSectionLock lock(m_lock);
            folders = m_folders;
        }
        if (!WaitForChanges(folders)) return;
    }
}

bool SimTreeWatcher::WaitForChanges(const std::vector<std::wstring>& folders) {
    std::vector<UniqueChange> changes;
    std::vector<HANDLE> waits = {m_stop.Get(), m_rearm.Get()};
    bool poll = folders.size() > kMaxWatched;
    for (size_t i = 0; i < folders.size() && i < kMaxWatched; ++i) {
        UniqueChange change(FindFirstChangeNotificationW(folders[i].c_str(), FALSE, kFilter));
        if (!change) {
            poll = true;  // missing or unreadable now; it may appear later
            continue;
        }
        waits.push_back(change.Get());
        changes.push_back(std::move(change));
    }
    // What changed since the last scan and before these handles were open would go unseen.
    PostMessageW(m_target, m_message, 0, 0);
    for (;;) {
        DWORD result = WaitForMultipleObjects(static_cast<DWORD>(waits.size()), waits.data(), FALSE,
                                              poll ? kPollMilliseconds : INFINITE);
        if (result == WAIT_OBJECT_0) return false;
        if (result == WAIT_TIMEOUT) {
            PostMessageW(m_target, m_message, 0, 0);
            continue;
        }
        // A change, or new folders to watch: open fresh handles (which posts). Re-arming with
        // FindNextChangeNotification lost changes that came in quick succession under Wine.
        if (result != WAIT_OBJECT_0 + 1) Sleep(kSettleMilliseconds);
        return true;
    }
}
