#include "SimModel.h"

#include <algorithm>
#include <utility>

#include "SimLog.h"
#include "SimSettings.h"
#include "SimTreeWatcher.h"

namespace {

const wchar_t kWindowClass[] = L"CalvexDeviceSimModel";
const UINT kTreeChanged = WM_APP + 1;
const UINT kRescanNow = WM_APP + 2;
const UINT_PTR kRescanTimer = 1;
const UINT_PTR kTickTimer = 2;
const UINT kRescanDelay = 100;  // lets a burst of changes (a folder and its files) settle
const UINT kTickPeriod = 50;

std::function<void()>& AbruptExitHandler() {
    static std::function<void()> handler;
    return handler;
}

struct ModelEntry {
    std::wstring root;
    DWORD thread;
    std::weak_ptr<SimModel> model;
};
std::vector<ModelEntry>& Models() {
    static std::vector<ModelEntry> models;
    return models;
}

std::shared_ptr<SimReceiverRecord> FindFolder(const std::vector<std::shared_ptr<SimReceiverRecord>>& receivers,
                                              const std::wstring& folderName) {
    for (const auto& receiver : receivers)
        if (SameTextNoCase(receiver->folderName, folderName)) return receiver;
    return nullptr;
}

std::shared_ptr<SimFileRecord> FindName(const std::vector<std::shared_ptr<SimFileRecord>>& files,
                                        const std::wstring& name) {
    for (const auto& file : files)
        if (file->name == name) return file;
    return nullptr;
}

}  // namespace

std::shared_ptr<SimModel> SimModel::Acquire(const std::wstring& root) {
    auto& models = Models();
    models.erase(std::remove_if(models.begin(), models.end(), [](const ModelEntry& e) { return e.model.expired(); }),
                 models.end());
    for (const ModelEntry& entry : models) {
        if (entry.thread != GetCurrentThreadId() || !SameTextNoCase(entry.root, root)) continue;
        if (auto model = entry.model.lock()) {
            model->ReloadSettings();
            return model;
        }
    }
    std::shared_ptr<SimModel> model(new SimModel(root));
    if (!model->Open()) return nullptr;
    models.push_back(ModelEntry{root, GetCurrentThreadId(), model});
    return model;
}

void SimModel::SetAbruptExit(std::function<void()> exit) { AbruptExitHandler() = std::move(exit); }

SimModel::SimModel(const std::wstring& root) : m_root(root) {}

SimModel::~SimModel() {
    m_watcher.reset();  // joined before the window it posts to goes
    if (m_window) {
        SetWindowLongPtrW(m_window, GWLP_USERDATA, 0);
        DestroyWindow(m_window);
    }
}

bool SimModel::Open() {
    WNDCLASSW windowClass = {};
    windowClass.lpfnWndProc = WindowProc;
    windowClass.hInstance = GetModuleHandleW(nullptr);
    windowClass.lpszClassName = kWindowClass;
    if (!RegisterClassW(&windowClass) && GetLastError() != ERROR_CLASS_ALREADY_EXISTS) return false;
    m_window = CreateWindowExW(0, kWindowClass, L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr, windowClass.hInstance,
                               nullptr);
    if (!m_window) return false;
    SetWindowLongPtrW(m_window, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(this));
    ReloadSettings();
    SimTreeScan scan = ReceiverTreeLoader::Scan(m_root);
    SimLog::Write(L"serving \"" + m_root + L"\": " + std::to_wstring(scan.receivers.size()) + L" receivers" +
                  (scan.rootFound ? L"" : L" (the folder is missing)"));
    LogSkipped(scan.skipped);
    m_receivers = std::move(scan.receivers);
    m_watcher = std::make_unique<SimTreeWatcher>(m_window, kTreeChanged);
    std::vector<std::wstring> watched = {m_root};
    watched.insert(watched.end(), scan.folders.begin(), scan.folders.end());
    m_watcher->Watch(watched);
    return m_watcher->Start();
}

LRESULT CALLBACK SimModel::WindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
    auto* model = reinterpret_cast<SimModel*>(GetWindowLongPtrW(window, GWLP_USERDATA));
    if (model && (message == kTreeChanged || message == kRescanNow || message == WM_TIMER)) {
        // The last object may go while we work (a download ends): keep the model to the end.
        std::shared_ptr<SimModel> self = model->shared_from_this();
        self->OnMessage(message, wParam);
        return 0;
    }
    return DefWindowProcW(window, message, wParam, lParam);
}

void SimModel::OnMessage(UINT message, WPARAM wParam) {
    if (message == kTreeChanged) {
        // Armed once, not pushed back by every change: a file being written keeps signalling.
        if (!m_rescanArmed) m_rescanArmed = SetTimer(m_window, kRescanTimer, kRescanDelay, nullptr) != 0;
    } else if (message == kRescanNow) {
        Rescan();
    } else if (wParam == kRescanTimer) {
        KillTimer(m_window, kRescanTimer);
        m_rescanArmed = false;
        Rescan();
    } else if (wParam == kTickTimer) {
        TickDownloads();
    }
}

void SimModel::RescanSoon() { PostMessageW(m_window, kRescanNow, 0, 0); }

void SimModel::ReloadSettings() { m_globalFaults = SimSettings::GlobalFaults(); }

void SimModel::Rescan() {
    if (m_firing) {
        m_rescanPending = true;
        return;
    }
    SimTreeScan scan = ReceiverTreeLoader::Scan(m_root);
    LogSkipped(scan.skipped);
    std::vector<SimTreeEvent> events = Merge(std::move(scan.receivers));
    std::vector<std::wstring> watched = {m_root};
    watched.insert(watched.end(), scan.folders.begin(), scan.folders.end());
    m_watcher->Watch(watched);
    Fire(events);
}

std::vector<SimTreeEvent> SimModel::Merge(std::vector<std::shared_ptr<SimReceiverRecord>> scanned) {
    std::vector<SimTreeEvent> offline, changed, online;
    for (const auto& current : m_receivers) {
        if (FindFolder(scanned, current->folderName)) continue;
        current->online = false;
        offline.push_back({SimTreeEvent::ReceiverOffline, current, nullptr});
    }
    std::vector<std::shared_ptr<SimReceiverRecord>> merged;
    for (auto& fresh : scanned) {
        if (auto current = FindFolder(m_receivers, fresh->folderName)) {
            current->description = fresh->description;
            MergeFiles(*current, *fresh, &changed, current);
            merged.push_back(current);
        } else {
            online.push_back({SimTreeEvent::ReceiverOnline, fresh, nullptr});
            merged.push_back(fresh);
        }
    }
    m_receivers = std::move(merged);
    offline.insert(offline.end(), changed.begin(), changed.end());
    offline.insert(offline.end(), online.begin(), online.end());
    return offline;
}

void SimModel::MergeFiles(SimReceiverRecord& current, const SimReceiverRecord& scanned,
                          std::vector<SimTreeEvent>* events, const std::shared_ptr<SimReceiverRecord>& owner) {
    for (const auto& file : current.files) {
        if (FindName(scanned.files, file->name)) continue;
        file->present = false;
        events->push_back({SimTreeEvent::FileDeleted, owner, file});
    }
    std::vector<std::shared_ptr<SimFileRecord>> merged;
    for (const auto& fresh : scanned.files) {
        if (auto file = FindName(current.files, fresh->name)) {
            file->size = fresh->size;  // the same file, perhaps rewritten
            file->time = fresh->time;
            merged.push_back(file);
        } else {
            events->push_back({SimTreeEvent::FileAdded, owner, fresh});
            merged.push_back(fresh);
        }
    }
    current.files = std::move(merged);
}

void SimModel::LogSkipped(const std::vector<SimTreeScan::Skipped>& skipped) {
    for (const auto& entry : skipped) {
        bool known = std::any_of(m_skipped.begin(), m_skipped.end(), [&](const SimTreeScan::Skipped& old) {
            return old.folder == entry.folder && old.reason == entry.reason;
        });
        if (!known) SimLog::Write(L"skipped receiver folder \"" + entry.folder + L"\": " + entry.reason);
    }
    m_skipped = skipped;
}

void SimModel::Fire(const std::vector<SimTreeEvent>& events) {
    m_firing = true;
    for (const SimTreeEvent& event : events) {
        const std::vector<SimTreeListener*> listeners = m_listeners;
        for (SimTreeListener* listener : listeners)
            if (IsListening(listener)) listener->OnTreeEvent(event);  // may pump messages: check again each time
    }
    m_firing = false;
    if (m_rescanPending) {
        m_rescanPending = false;
        RescanSoon();
    }
}

bool SimModel::IsListening(SimTreeListener* listener) const {
    return std::find(m_listeners.begin(), m_listeners.end(), listener) != m_listeners.end();
}

void SimModel::AddListener(SimTreeListener* listener) {
    if (!IsListening(listener)) m_listeners.push_back(listener);
}

void SimModel::RemoveListener(SimTreeListener* listener) {
    m_listeners.erase(std::remove(m_listeners.begin(), m_listeners.end(), listener), m_listeners.end());
}

HRESULT SimModel::CallFault(const wchar_t* call, const SimReceiverRecord* receiver, const std::wstring& target) const {
    ++m_callCounts[call];
    if (receiver && receiver->description.faults.ExitsOn(call, target))
        AbruptExit(std::wstring(call) + (target.empty() ? L"" : L" on \"" + target + L"\""));
    HRESULT result = S_OK;
    if (!(receiver && receiver->description.faults.FindCall(call, target, &result)) &&
        !m_globalFaults.FindCall(call, target, &result))
        return S_OK;
    wchar_t code[16];
    swprintf(code, 16, L"0x%08lX", static_cast<unsigned long>(result));
    SimLog::Write(std::wstring(L"fault: ") + call + (target.empty() ? L"" : L" on \"" + target + L"\"") +
                  L" returns " + code);
    return result;
}

long SimModel::CallCount(const std::wstring& call) const {
    auto found = m_callCounts.find(call);
    return found == m_callCounts.end() ? 0 : found->second;
}

SimTransferPlan SimModel::TransferPlan(const SimReceiverRecord& receiver) const {
    return SimFaults::Plan(receiver.description.faults, m_globalFaults);
}

bool SimModel::AbruptExit(const std::wstring& what) const {
    if (!AbruptExitHandler()) {
        SimLog::Write(L"abrupt exit not acted out in this process: " + what);
        return false;
    }
    SimLog::Write(L"exiting abruptly: " + what);
    AbruptExitHandler()();
    return true;
}

void SimModel::StartDownload(IUnknown* keepAlive, SimDownloadTicker* ticker) {
    for (const Download& download : m_downloads)
        if (download.ticker == ticker) return;
    m_downloads.push_back(Download{ComPtr<IUnknown>(keepAlive), ticker});
    SetTimer(m_window, kTickTimer, kTickPeriod, nullptr);
}

void SimModel::TickDownloads() {
    if (m_ticking) return;  // an event call pumped our own timer message
    m_ticking = true;
    const std::vector<Download> downloads = m_downloads;  // holds every object to the end of the tick
    for (const Download& download : downloads) {
        auto running = [&] {
            return std::find_if(m_downloads.begin(), m_downloads.end(),
                                [&](const Download& d) { return d.ticker == download.ticker; });
        };
        if (running() == m_downloads.end()) continue;
        if (!download.ticker->Tick()) {
            auto ended = running();
            if (ended != m_downloads.end()) m_downloads.erase(ended);
        }
    }
    m_ticking = false;
    if (m_downloads.empty()) KillTimer(m_window, kTickTimer);
}
