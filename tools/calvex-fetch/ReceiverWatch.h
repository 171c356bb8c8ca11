#pragma once
// calvex-fetch --watch: first every new file of every receiver, as a batch fetches them; then,
// until stopped, whatever a receiver brings when it is plugged in or logs a file. It learns of
// both from the shell's change notifications (with a slow rescan as a safety net), and does
// all its work on this one thread, outside the message handlers, one receiver at a time: a
// burst of notifications only marks receivers to look at, so no file is fetched twice.
#include <windows.h>
#include <shlobj.h>

#include <atomic>
#include <map>
#include <set>
#include <string>

#include "FetchConsole.h"
#include "FetchOptions.h"
#include "LayoutPattern.h"
#include "ReceiverFetcher.h"
#include "ReceiverList.h"
#include "ReceiverPass.h"
#include "ShellChangeListener.h"
#include "TargetLock.h"
#include "WatchControl.h"

// The pause before the attempt-th new try (from 0) while the device manager is away.
ULONGLONG ReconnectPauseSeconds(size_t attempt);

class ReceiverWatch {
public:
    // interrupted and stop are set by the console's Ctrl+C handler; layout is options.layout,
    // parsed before the watch starts (a bad pattern never gets this far). The watch keeps its
    // own copies: new settings may replace them while it runs (SetControl).
    ReceiverWatch(const FetchOptions& options, const LayoutPattern& layout, const std::wstring& target,
                  FetchConsole& console, const std::atomic<bool>& interrupted, HANDLE stop);

    // Who hears where the watch stands, on this thread; null: nobody.
    void SetObserver(WatchObserver* observer) { m_observer = observer; }
    const FetchOptions& Options() const { return m_options; }
    const std::wstring& Target() const { return m_target; }
    FetchConsole& Console() { return m_console; }
    // Commands from another thread (WatchControl.h), taken between files; lock holds the
    // target and follows it when new settings name another folder.
    void SetControl(WatchControl* control, TargetLock* lock) {
        m_control = control;
        m_lock = lock;
    }

    // 0 when stopped and nothing failed, 1 when something failed, 2 when it could not start
    // (the reason on stderr). A device manager that is not there yet, or goes away, is waited for.
    int Run();

private:
    struct Watched {
        Receiver receiver;
        ComPtr<IShellFolder> files;  // bound: the folder then follows the receiver's file events
        std::wstring folder;  // below the target, as the layout shows it; empty: left alone
        bool dirty = true;
        std::set<std::wstring> givenUp;  // failed while plugged in this time
        bool retried = false;  // tried again after a failure, and nothing fetched since
    };

    bool Start();
    HRESULT BindBrands();
    void Reconnect();
    void Pause(ULONGLONG milliseconds);
    void OnChange(PCIDLIST_ABSOLUTE item);
    bool AnyDirty() const;
    void ProcessDirty();
    void ScanBrand(int brand);
    void Add(Receiver receiver, int brand);
    void FetchNew(const std::wstring& id);
    bool IsListed(const Watched& watched, int brand);
    void Reopen(Watched& watched);
    bool DeviceManagerGone();
    void WaitForWork(DWORD milliseconds);
    void TellIdle();
    void TellPaused();
    void TellConnected();
    bool Held();
    void TakeCommands();
    void CompareAllAgain();
    void ApplySettings(const FetchOptions& wanted);
    bool MoveTarget(const std::wstring& target);
    bool PlaceFolder(Watched& watched, const std::wstring& title);
    bool TargetReached(HRESULT why);
    void AddToTotals(const FetchTotals& pass);
    void EndPass(const Watched& watched, const FetchTotals& pass, bool unplugged);
    std::wstring Summary() const;

    FetchOptions m_options;
    LayoutPattern m_layout;
    std::wstring m_target;
    FetchConsole& m_console;
    const std::atomic<bool>& m_interrupted;
    HANDLE m_stop;
    ShellChangeListener m_listener;
    ComPtr<IDispatch> m_manager;
    ComPtr<IShellFolder> m_brands[2];
    OwnedItem m_brandItems[2];
    bool m_brandDirty[2] = {};
    bool m_plugging = false;  // after the first scan, a new receiver has been plugged in
    bool m_gone = false;
    bool m_targetLost = false;  // said so; said again once it is back
    std::map<std::wstring, Watched> m_watched;  // by brand and key
    FetchTotals m_totals;
    WatchObserver* m_observer = nullptr;
    WatchControl* m_control = nullptr;
    TargetLock* m_lock = nullptr;
    ULONGLONG m_pausedUntil = 0;  // as told to the observer (a tick), 0 when not paused; 1 until resumed
    bool m_idle = false;  // Idle told, and no work since
    ULONGLONG m_started = 0;
};
