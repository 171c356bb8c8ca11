#pragma once
// The state of the simulated device manager for one receiver tree: the receivers and files
// read from it, the watcher that follows it, the message-only window on whose thread rescans
// and downloads run, and the live objects that want to hear about changes. Every COM object
// of the simulator holds the model; the model holds none of them except running downloads.
#include <windows.h>

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "SimFaults.h"
#include "ReceiverTreeLoader.h"
#include "SimRecords.h"
#include "com/ComPtr.h"

class SimTreeWatcher;

struct SimTreeEvent {
    enum Kind { ReceiverOnline, ReceiverOffline, FileAdded, FileDeleted };
    Kind kind;
    std::shared_ptr<SimReceiverRecord> receiver;
    std::shared_ptr<SimFileRecord> file;  // file events only
};

class SimTreeListener {
public:
    virtual void OnTreeEvent(const SimTreeEvent& event) = 0;

protected:
    ~SimTreeListener() = default;
};

class SimDownloadTicker {
public:
    // Runs what is due of the download; false once it has ended.
    virtual bool Tick() = 0;

protected:
    ~SimDownloadTicker() = default;
};

class SimModel : public std::enable_shared_from_this<SimModel> {
public:
    // One model per tree and thread, shared by every object made for that tree.
    static std::shared_ptr<SimModel> Acquire(const std::wstring& root);
    // How the server ends itself abruptly; without one (a test process) the end is only logged.
    static void SetAbruptExit(std::function<void()> exit);
    ~SimModel();
    SimModel(const SimModel&) = delete;
    SimModel& operator=(const SimModel&) = delete;

    const std::vector<std::shared_ptr<SimReceiverRecord>>& Receivers() const { return m_receivers; }

    // Reads the tree again and fires the events of what changed.
    void Rescan();
    void RescanSoon();
    void ReloadSettings();

    // The failure configured for a call (S_OK: none). receiver is null for calls that belong
    // to no receiver; target names the file of file-level calls.
    HRESULT CallFault(const wchar_t* call, const SimReceiverRecord* receiver, const std::wstring& target = {}) const;
    SimTransferPlan TransferPlan(const SimReceiverRecord& receiver) const;
    // How often a call ("IReceiver.get_PortName") was made on this model's objects.
    long CallCount(const std::wstring& call) const;
    // Ends the process when allowed (never returns then); false otherwise.
    bool AbruptExit(const std::wstring& what) const;

    void AddListener(SimTreeListener* listener);
    void RemoveListener(SimTreeListener* listener);
    // keepAlive holds the downloading object until its ticker reports the end.
    void StartDownload(IUnknown* keepAlive, SimDownloadTicker* ticker);

private:
    struct Download {
        ComPtr<IUnknown> keepAlive;
        SimDownloadTicker* ticker;
    };

    explicit SimModel(const std::wstring& root);
    bool Open();
    static LRESULT CALLBACK WindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam);
    void OnMessage(UINT message, WPARAM wParam);
    void TickDownloads();
    std::vector<SimTreeEvent> Merge(std::vector<std::shared_ptr<SimReceiverRecord>> scanned);
    static void MergeFiles(SimReceiverRecord& current, const SimReceiverRecord& scanned,
                           std::vector<SimTreeEvent>* events, const std::shared_ptr<SimReceiverRecord>& owner);
    void LogSkipped(const std::vector<SimTreeScan::Skipped>& skipped);
    void Fire(const std::vector<SimTreeEvent>& events);
    bool IsListening(SimTreeListener* listener) const;

    std::wstring m_root;
    std::vector<std::shared_ptr<SimReceiverRecord>> m_receivers;
    std::vector<SimTreeScan::Skipped> m_skipped;  // logged when they first appear
    SimFaults m_globalFaults;
    mutable std::map<std::wstring, long> m_callCounts;  // every call is counted where its fault is looked up
    std::vector<SimTreeListener*> m_listeners;
    std::vector<Download> m_downloads;
    HWND m_window = nullptr;
    std::unique_ptr<SimTreeWatcher> m_watcher;
    bool m_firing = false;        // events go out; a rescan asked for meanwhile waits
    bool m_rescanPending = false;
    bool m_ticking = false;
    bool m_rescanArmed = false;
};
