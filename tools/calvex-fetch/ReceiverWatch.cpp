#include "ReceiverWatch.h"

#include <cstdio>
#include <vector>

#include "DescriptorName.h"
#include "FetchRun.h"

namespace {
// How often the device manager is asked whether it is still there (the product's download
// dialog asks as often), and how often everything is compared in case a notification was lost.
constexpr ULONGLONG kLivenessMs = 2000;
constexpr ULONGLONG kRescanMs = 60000;

std::wstring WatchId(int brand, const std::wstring& key) { return std::to_wstring(brand) + L"|" + key; }
int BrandOf(const std::wstring& id) { return id[0] - L'0'; }

std::wstring Duration(ULONGLONG milliseconds) {
    wchar_t text[32];
    if (milliseconds < 60000) swprintf(text, 32, L"%.1f s", milliseconds / 1000.0);
    else if (milliseconds < 3600000) swprintf(text, 32, L"%.1f min", milliseconds / 60000.0);
    else swprintf(text, 32, L"%.1f h", milliseconds / 3600000.0);
    return text;
}
// The part of a receiver's folder above its first date folder, "\\Q7_RTK@COM3", or empty.
std::wstring UndatedFolder(const std::wstring& shown) {
    const size_t date = shown.find(L'{');
    if (date == std::wstring::npos) return L"\\" + shown;
    const size_t cut = shown.rfind(L'\\', date);
    return cut == std::wstring::npos ? std::wstring() : L"\\" + shown.substr(0, cut);
}

// Whether the pause told to the observer (an end tick, 1 until resumed) is another one now.
bool IsOtherPause(ULONGLONG told, ULONGLONG until) {
    if (!told || (told == 1) != (until == 1)) return true;
    return until != 1 && (until > told + 1000 || until + 1000 < told);
}
}  // namespace

// Soon after a restart, then once a minute for as long as it takes.
ULONGLONG ReconnectPauseSeconds(size_t attempt) {
    constexpr ULONGLONG kPauses[] = {2, 4, 8, 16, 30, 60};
    constexpr size_t kSteps = sizeof(kPauses) / sizeof(kPauses[0]);
    return kPauses[attempt < kSteps ? attempt : kSteps - 1];
}

ReceiverWatch::ReceiverWatch(const FetchOptions& options, const LayoutPattern& layout, const std::wstring& target,
                             FetchConsole& console, const std::atomic<bool>& interrupted, HANDLE stop)
    : m_options(options), m_layout(layout), m_target(target), m_console(console), m_interrupted(interrupted),
      m_stop(stop), m_listener([this](LONG, PCIDLIST_ABSOLUTE item) { OnChange(item); }) {}

int ReceiverWatch::Run() {
    if (!Start()) return 2;
    m_started = GetTickCount64();
    ULONGLONG nextProbe = m_started + kLivenessMs, nextRescan = m_started + kRescanMs;
    while (!m_interrupted) {
        TakeCommands();
        if (m_control && m_control->IsPaused()) {
            TellPaused();
            const ULONGLONG left = m_control->PauseLeft();
            WaitForWork(static_cast<DWORD>(left && left < kLivenessMs ? left : kLivenessMs));
            continue;
        }
        m_pausedUntil = 0;
        if (m_gone) {
            TellIdle();
            Reconnect();
            nextRescan = GetTickCount64() + kRescanMs;
            continue;
        }
        while (AnyDirty() && !m_interrupted && !m_gone && !Held()) ProcessDirty();
        if (Held()) continue;
        m_plugging = true;
        const ULONGLONG now = GetTickCount64();
        if (now >= nextProbe) {
            DeviceManagerGone();
            nextProbe = now + kLivenessMs;
        }
        if (now >= nextRescan) {
            CompareAllAgain();
            nextRescan = now + kRescanMs;
        }
        if (!AnyDirty() && !m_gone) TellIdle();
        if (!AnyDirty() && !m_gone) WaitForWork(static_cast<DWORD>((nextProbe < nextRescan ? nextProbe : nextRescan) - now));
    }
    m_console.Line(Summary());
    return m_totals.failed ? 1 : 0;
}

void ReceiverWatch::CompareAllAgain() {
    for (int brand = 0; brand < 2; ++brand) m_brandDirty[brand] = static_cast<bool>(m_brands[brand]);
    // Files given up are tried again too: a receiver unplugged and plugged back between
    // two looks is not seen to go, and its failed files would wait for the next start.
    for (auto& entry : m_watched) {
        entry.second.dirty = true;
        entry.second.givenUp.clear();
    }
}

bool ReceiverWatch::Held() { return m_control && m_control->Holds(); }

void ReceiverWatch::TakeCommands() {
    if (!m_control) return;
    FetchOptions wanted;
    if (m_control->TakeSettings(wanted)) ApplySettings(wanted);
    if (!m_control->TakeFullComparison()) return;
    m_console.Line(L"every receiver is compared in full");
    CompareAllAgain();
}

// Between files: what is being fetched now lands where it was going; every receiver is then
// compared in full against the new settings.
void ReceiverWatch::ApplySettings(const FetchOptions& wanted) {
    std::wstring error;
    LayoutPattern layout;
    if (!layout.Parse(wanted.layout, error)) return m_console.Line(L"settings not applied: --layout: " + error);
    const std::wstring target = FullPath(wanted.target);
    if (lstrcmpiW(target.c_str(), m_target.c_str()) != 0 && !MoveTarget(target)) return;
    m_options.target = wanted.target;
    m_options.move = wanted.move;
    m_options.layout = wanted.layout;
    m_options.notify = wanted.notify;
    m_layout = layout;
    m_console.Line(L"settings applied: new files into " + m_target + L"\\" + m_options.layout +
                   (m_options.move ? L", each receiver emptied once its files are safe" : L""));
    for (auto& entry : m_watched) {
        Watched& watched = entry.second;
        watched.givenUp.clear();
        watched.dirty = PlaceFolder(watched, watched.receiver.Title());
    }
    if (m_observer) m_observer->SettingsApplied(m_options, m_target);
}

// The lock and a log kept in the target go with it; the old folder is free for another watch.
bool ReceiverWatch::MoveTarget(const std::wstring& target) {
    if (!IsWritableFolder(target)) {
        m_console.Line(L"settings not applied: target not writable: " + target);
        return false;
    }
    TargetLock lock;
    if (!lock.Acquire(target)) {
        m_console.Line(L"settings not applied: another calvex-fetch is fetching into " + target + L" already");
        return false;
    }
    if (m_lock) *m_lock = std::move(lock);
    m_targetLost = false;  // the new folder was just written to
    const std::wstring log = m_target + L"\\calvex-fetch.log";
    if (lstrcmpiW(m_console.LogPath().c_str(), log.c_str()) == 0) {
        m_console.Line(L"the log goes on in " + target + L"\\calvex-fetch.log");
        m_console.SetLog(target + L"\\calvex-fetch.log");
    }
    m_target = target;
    return true;
}

void ReceiverWatch::TellPaused() {
    const ULONGLONG left = m_control->PauseLeft();
    const ULONGLONG until = left ? GetTickCount64() + left : 1;
    if (!IsOtherPause(m_pausedUntil, until)) return;  // told already
    if (!m_pausedUntil)
        m_console.Line(left ? L"paused for " + std::to_wstring((left + 30000) / 60000) + L" min" : L"paused until resumed");
    m_pausedUntil = until;
    m_idle = false;
    if (m_observer) m_observer->Paused(left);
}

void ReceiverWatch::TellConnected() {
    if (!m_observer) return;
    std::vector<LayoutReceiver> receivers;
    for (const auto& entry : m_watched) receivers.push_back(entry.second.receiver.Fields());
    m_observer->Connected(receivers);
}

bool ReceiverWatch::Start() {
    // Started at logon, the watch may come before the device manager's service (or before it
    // is installed): it waits for it, as for one that goes away later.
    HRESULT hr = ConnectDeviceManager(m_manager);
    if (FAILED(hr)) {
        m_console.Line(NoDeviceManagerText(hr) + L": waiting for it");
        m_gone = true;
    }
    std::vector<PCIDLIST_ABSOLUTE> folders;
    std::wstring names;
    hr = BindBrands();
    for (int brand = 0; brand < 2 && SUCCEEDED(hr); ++brand) {
        if (!m_brands[brand]) continue;
        hr = ParseShellPath(kBrandFolderPaths[brand], m_brandItems[brand]);
        folders.push_back(m_brandItems[brand].get());
        names += (names.empty() ? L"" : L" and ") + std::wstring(kBrandNames[brand]);
    }
    if (FAILED(hr)) {
        m_console.Error(L"the receivers folders cannot be opened: is the extension registered?");
        return false;
    }
    hr = m_listener.Start(folders);
    if (FAILED(hr)) {
        m_console.Error(L"the shell's change notifications cannot be registered (" + HexText(hr) + L")");
        return false;
    }
    std::wstring only;
    for (const std::wstring& wanted : m_options.receivers) only += (only.empty() ? L" (only " : L", ") + wanted;
    if (!only.empty()) only += L")";
    m_console.Line(L"watching the " + names + L" receivers" + only + L", new files into " + m_target +
                   L" (Ctrl+C stops)");
    return true;
}

// A brand folder binds the device manager's collection once, on its first listing: after a
// restart of the device manager only new folder objects see the new one.
HRESULT ReceiverWatch::BindBrands() {
    const bool wanted[2] = {m_options.calvex, m_options.brennor};
    for (int brand = 0; brand < 2; ++brand) {
        m_brands[brand].Reset();
        if (!wanted[brand]) continue;
        const HRESULT hr = BindShellPath(kBrandFolderPaths[brand], m_brands[brand]);
        if (FAILED(hr)) return hr;
        m_brandDirty[brand] = true;
    }
    return S_OK;
}

// Every receiver and folder of the old device manager is dropped; the new one is asked with a
// growing pause, and once it answers every receiver is compared in full, as after a replug.
void ReceiverWatch::Reconnect() {
    m_watched.clear();
    TellConnected();
    for (ComPtr<IShellFolder>& brand : m_brands) brand.Reset();
    m_manager.Reset();
    for (size_t attempt = 0; !m_interrupted; ++attempt) {
        const ULONGLONG pause = ReconnectPauseSeconds(attempt);
        m_console.Line(L"trying the device manager again in " + std::to_wstring(pause) + L" s");
        Pause(pause * 1000);
        if (m_interrupted) return;
        HRESULT hr = ConnectDeviceManager(m_manager);
        if (SUCCEEDED(hr)) hr = AskDeviceManager(m_manager.Get());
        if (SUCCEEDED(hr)) hr = BindBrands();
        if (SUCCEEDED(hr)) break;
        m_manager.Reset();
        m_console.Line(L"no device manager yet (" + HexText(hr) + L")");
    }
    if (m_interrupted) return;
    m_gone = false;
    m_plugging = false;
    m_console.Line(L"the device manager is back: every receiver is compared in full");
}

void ReceiverWatch::Pause(ULONGLONG milliseconds) {
    const ULONGLONG until = GetTickCount64() + milliseconds;
    for (ULONGLONG now = GetTickCount64(); !m_interrupted && now < until; now = GetTickCount64())
        WaitForWork(static_cast<DWORD>(until - now));
}

// From a message handler, possibly inside a download's modal loop: only marks what to look at.
void ReceiverWatch::OnChange(PCIDLIST_ABSOLUTE item) {
    for (int brand = 0; brand < 2; ++brand) {
        PCUIDLIST_RELATIVE rest = nullptr;
        if (!m_brands[brand] || !PrefixRest(item, m_brandItems[brand].get(), &rest)) continue;
        if (ILIsEmpty(rest)) {
            m_brandDirty[brand] = true;
            return;
        }
        OwnedItem child(ILCloneFirst(rest));
        const std::wstring key = child ? ShellName(m_brands[brand].Get(), child.get(), SHGDN_INFOLDER | SHGDN_FORPARSING) : L"";
        auto found = m_watched.find(WatchId(brand, key));
        if (found != m_watched.end()) found->second.dirty = true;
        else m_brandDirty[brand] = true;  // a receiver not watched yet: plugged in
        return;
    }
}

bool ReceiverWatch::AnyDirty() const {
    if (m_brandDirty[0] || m_brandDirty[1]) return true;
    for (const auto& entry : m_watched)
        if (entry.second.dirty) return true;
    return false;
}

void ReceiverWatch::ProcessDirty() {
    for (int brand = 0; brand < 2 && !m_interrupted && !m_gone; ++brand) {
        if (!m_brandDirty[brand]) continue;
        m_brandDirty[brand] = false;
        ScanBrand(brand);
    }
    std::vector<std::wstring> ids;
    for (auto& entry : m_watched)
        if (entry.second.dirty) ids.push_back(entry.first);
    for (const std::wstring& id : ids) {
        if (m_interrupted || m_gone) return;
        FetchNew(id);
    }
}

void ReceiverWatch::ScanBrand(int brand) {
    // A device manager that is gone lists nothing: that must not read as every receiver unplugged.
    if (DeviceManagerGone()) return;
    HRESULT hr = S_OK;
    std::vector<Receiver> listed = BrandReceivers(m_brands[brand].Get(), brand, &hr);
    if (FAILED(hr)) return;  // nothing learnt; the next event or rescan asks again
    std::set<std::wstring> present;
    for (Receiver& receiver : listed) {
        if (!IsWanted(m_options, receiver)) continue;
        const std::wstring id = WatchId(brand, receiver.key);
        present.insert(id);
        if (!m_watched.count(id)) Add(std::move(receiver), brand);
    }
    for (auto entry = m_watched.begin(); entry != m_watched.end();) {
        if (BrandOf(entry->first) != brand || present.count(entry->first)) {
            ++entry;
            continue;
        }
        m_console.Line(entry->second.receiver.Title() + L" unplugged");
        entry = m_watched.erase(entry);
    }
    TellConnected();
}

void ReceiverWatch::Add(Receiver receiver, int brand) {
    const std::wstring title = receiver.Title() + (m_plugging ? L" plugged in" : L"");
    Watched watched;
    const std::wstring id = WatchId(brand, receiver.key);
    watched.receiver = std::move(receiver);
    const Receiver& added = watched.receiver;
    if (FAILED(added.parent->BindToObject(added.item.get(), nullptr, IID_IShellFolder, watched.files.PutVoid()))) {
        // Opened even when its fields make no folder name, since new settings may give it one;
        // when both fail, the missing name is what is said.
        if (!m_layout.Check(added.Fields(), m_target.size()).refused) {
            ++m_totals.failed;
            m_console.Line(title + L": FAILED, the receiver cannot be opened");
            watched.dirty = false;
            m_watched.emplace(id, std::move(watched));
            return;
        }
    }
    watched.dirty = PlaceFolder(watched, title);
    m_watched.emplace(id, std::move(watched));
}

// Its folder below the target by the layout, and its line; false when the fields make no
// name: left alone until plugged in again (or new settings).
bool ReceiverWatch::PlaceFolder(Watched& watched, const std::wstring& title) {
    const SafeName folder = m_layout.Check(watched.receiver.Fields(), m_target.size());
    watched.folder.clear();
    if (folder.refused) {
        ++m_totals.failed;
        m_console.Line(title + L": FAILED, no folder name: " + folder.reason);
        return false;
    }
    watched.folder = m_layout.Shown(watched.receiver.Fields());
    m_console.Line(title + L" -> " + m_target + L"\\" + watched.folder);
    return true;
}

void ReceiverWatch::FetchNew(const std::wstring& id) {
    auto found = m_watched.find(id);
    if (found == m_watched.end()) return;
    Watched& watched = found->second;
    watched.dirty = false;
    // No folder name or not opened when it came: left alone until plugged in again (its files
    // must never land in the target itself).
    if (watched.folder.empty() || !TargetReached(TargetDisk::Reach(m_target))) return;
    Reopen(watched);
    FetchTotals pass;
    const std::set<std::wstring> givenUpBefore = watched.givenUp;
    ReceiverFetcher fetcher(m_options, m_layout, m_console, pass, m_interrupted);
    fetcher.Watching(&watched.givenUp);
    m_idle = false;
    if (m_observer) {
        WatchObserver* observer = m_observer;
        const std::wstring display = watched.receiver.display;
        fetcher.OnEachFile([observer, display](int left) { observer->Working(display, left); });
    }
    fetcher.HoldBetweenFiles([this] { return Held(); });
    fetcher.Run(watched.files.Get(), watched.receiver, m_target);
    if (fetcher.Held()) {
        // Paused or new settings: the pass goes on from the start once they are taken, and
        // what failed in it is tried again then.
        watched.dirty = true;
        watched.givenUp = givenUpBefore;
        pass.failed = 0;
        return AddToTotals(pass);
    }
    if (pass.fetched) watched.retried = false;
    if (FAILED(pass.targetLost)) {
        // Nothing of the receiver failed: all it has comes once the target is back.
        TargetReached(pass.targetLost);
    } else if (pass.failed && (m_gone || !IsListed(watched, BrandOf(id)))) {
        // Cut by the unplug or by the device manager going away: what is missing is fetched
        // when the receiver is back (all receivers are dropped while the device manager is away).
        pass.failed = 0;
        if (!m_gone) {
            m_console.Line(watched.receiver.Title() + L" unplugged; what it had not sent comes when it is back");
            EndPass(watched, pass, true);
            m_watched.erase(found);
        }
    } else if (pass.failed && !watched.retried) {
        // Perhaps unplugged and plugged back during the pass: once more before giving files up.
        m_console.Line(watched.receiver.Title() + L": trying once more");
        watched.givenUp = givenUpBefore;
        watched.retried = watched.dirty = true;
        pass.failed = 0;
    } else {
        // After a failure the run stopped there: on with the other files.
        watched.dirty = watched.dirty || pass.failed;
        EndPass(watched, pass, false);
    }
    AddToTotals(pass);
}

void ReceiverWatch::AddToTotals(const FetchTotals& pass) {
    m_totals.fetched += pass.fetched;
    m_totals.failed += pass.failed;
    m_totals.deleted += pass.deleted;
    m_totals.bytes += pass.bytes;
}

// One line when the target goes (a stick pulled, a share gone, the folder deleted) and one when
// it is back; meanwhile receivers are left alone, and the next full comparison looks again.
bool ReceiverWatch::TargetReached(HRESULT why) {
    if (SUCCEEDED(why) && m_targetLost) m_console.Line(L"the target is back: " + m_target);
    else if (FAILED(why) && !m_targetLost)
        m_console.Line(TargetLostText(m_target, why) + L": waiting for it, looked for at each full comparison");
    m_targetLost = FAILED(why);
    return SUCCEEDED(why);
}

void ReceiverWatch::EndPass(const Watched& watched, const FetchTotals& pass, bool unplugged) {
    if (!m_observer) return;
    ReceiverPass ended;
    ended.receiver = watched.receiver.display;
    ended.target = m_target;
    ended.folder = m_target + UndatedFolder(watched.folder);
    ended.files = pass.fetched + pass.skipped;
    ended.fetched = pass.fetched;
    ended.failed = pass.failed;
    ended.deleted = pass.deleted;
    ended.kept = pass.kept;
    ended.firstFailure = pass.firstFailure;
    ended.unplugged = unplugged;
    m_observer->PassEnded(ended);
}

void ReceiverWatch::TellIdle() {
    if (m_idle) return;
    m_idle = true;
    if (m_observer) m_observer->Idle();
}

// A receiver unplugged and plugged back between two looks is a new object of the device
// manager: a folder bound before would still hold the old one, whose downloads all fail. So
// every pass binds anew (a few calls); the folder then follows the receiver's file events.
void ReceiverWatch::Reopen(Watched& watched) {
    ComPtr<IShellFolder> files;
    if (SUCCEEDED(watched.receiver.parent->BindToObject(watched.receiver.item.get(), nullptr, IID_IShellFolder,
                                                        files.PutVoid())))
        watched.files = std::move(files);
}

bool ReceiverWatch::IsListed(const Watched& watched, int brand) {
    if (DeviceManagerGone()) return false;
    for (const Receiver& receiver : BrandReceivers(m_brands[brand].Get(), brand))
        if (receiver.key == watched.receiver.key) return true;
    return false;
}

bool ReceiverWatch::DeviceManagerGone() {
    if (m_gone) return true;
    const HRESULT hr = AskDeviceManager(m_manager.Get());
    if (!IsServerGone(hr)) return false;
    m_gone = true;
    m_console.Line(L"the device manager is gone (" + HexText(hr) + L"): waiting for it to come back");
    return true;
}

void ReceiverWatch::WaitForWork(DWORD milliseconds) {
    const HANDLE wake[] = {m_stop, m_control ? m_control->WakeEvent() : m_stop};
    MsgWaitForMultipleObjects(2, wake, FALSE, milliseconds, QS_ALLINPUT);
    MSG message;
    while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) {
        TranslateMessage(&message);
        DispatchMessageW(&message);
    }
}

std::wstring ReceiverWatch::Summary() const {
    return L"watch ended: " + std::to_wstring(m_totals.fetched) + L" fetched, " + std::to_wstring(m_totals.failed) +
           L" failed, " + (m_options.move ? std::to_wstring(m_totals.deleted) + L" deleted, " : L"") + ByteText(m_totals.bytes) + L" in " + Duration(GetTickCount64() - m_started) +
           (m_interrupted ? L" (stopped)" : L"");
}
