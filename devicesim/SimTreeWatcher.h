#pragma once
// Watches the receiver tree from a thread of its own and posts a message to the model's
// window when something in it may have changed. Each folder is watched on its own, without
// sub-tree watching: Wine does not report changes inside folders that existed before the
// watch began. Folders beyond what one wait can hold, and a root that does not exist yet,
// are polled once a second instead.
#include <windows.h>

#include <string>
#include <vector>

#include "com/CriticalSection.h"
#include "com/Handles.h"

class SimTreeWatcher {
public:
    SimTreeWatcher(HWND target, UINT message);
    ~SimTreeWatcher();  // stops and joins the thread
    SimTreeWatcher(const SimTreeWatcher&) = delete;
    SimTreeWatcher& operator=(const SimTreeWatcher&) = delete;

    bool Start();
    // The root first, then the receiver folders; replaces what was watched.
    void Watch(const std::vector<std::wstring>& folders);

private:
    static DWORD WINAPI ThreadProc(void* self);
    void Run();
    // False when the thread must stop.
    bool WaitForChanges(const std::vector<std::wstring>& folders);

    HWND m_target;
    UINT m_message;
    CriticalSection m_lock;
    std::vector<std::wstring> m_folders;
    UniqueHandle m_stop;
    UniqueHandle m_rearm;
    UniqueHandle m_thread;
};
