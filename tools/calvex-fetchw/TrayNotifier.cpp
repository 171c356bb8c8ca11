#include "TrayNotifier.h"

#include "WatchNotice.h"

namespace {
// Longer than the watch's full comparison takes to come round (a minute), with room for a
// long pass of another receiver.
constexpr ULONGLONG kAwayMs = 90 * 1000;

SYSTEMTIME LocalNow() {
    SYSTEMTIME now = {};
    GetLocalTime(&now);
    return now;
}
}  // namespace

TrayNotifier::TrayNotifier(FetchConsole& console, const std::wstring& target, TrayIcon* icon, Clock clock)
    : m_console(console), m_icon(icon), m_clock(std::move(clock)) {
    m_view.status.target = target;
    m_view.logPath = console.LogPath();
}

void TrayNotifier::SetIcon(TrayIcon* icon) {
    std::lock_guard<std::mutex> hold(m_lock);
    m_icon = icon;
}

WatchView TrayNotifier::View() {
    std::lock_guard<std::mutex> hold(m_lock);
    WatchView view = m_view;
    // What is left of a timed pause now, not when it was told: its end stays where it was.
    if (view.status.paused && view.status.pauseLeft) {
        const ULONGLONG gone = m_clock() - m_pausedAt;
        view.status.pauseLeft = gone < view.status.pauseLeft ? view.status.pauseLeft - gone : 1;
    }
    return view;
}

void TrayNotifier::Idle() {
    std::lock_guard<std::mutex> hold(m_lock);
    m_view.status.receiver.clear();
    m_view.status.paused = false;
    if (!m_icon) return;
    m_icon->SetPaused(false);
    m_icon->SetTip(IdleTip(m_view.status.target));
}

void TrayNotifier::Working(const std::wstring& receiver, int left) {
    std::lock_guard<std::mutex> hold(m_lock);
    m_view.status.receiver = receiver;
    m_view.status.left = left;
    m_view.status.paused = false;
    if (!m_icon) return;
    m_icon->SetPaused(false);
    m_icon->SetTip(WorkingTip(receiver, left));
}

void TrayNotifier::Paused(ULONGLONG left) {
    std::lock_guard<std::mutex> hold(m_lock);
    m_view.status.receiver.clear();
    m_view.status.paused = true;
    m_view.status.pauseLeft = left;
    m_pausedAt = m_clock();
    if (!m_icon) return;
    m_icon->SetPaused(true);
    m_icon->SetTip(PausedTip(m_view.status, LocalNow()));
}

void TrayNotifier::SettingsApplied(const FetchOptions& options, const std::wstring& target) {
    std::lock_guard<std::mutex> hold(m_lock);
    m_view.status.target = target;
    m_view.logPath = m_console.LogPath();
    if (m_icon) m_icon->SetShown(options.notify);
}

void TrayNotifier::Connected(const std::vector<LayoutReceiver>& receivers) {
    std::lock_guard<std::mutex> hold(m_lock);
    m_view.connected = receivers;
}

void TrayNotifier::PassEnded(const ReceiverPass& pass) {
    const std::wstring notice = PassNotice(pass);
    if (!IsNews(pass, notice)) return;
    m_console.Line(notice);
    std::lock_guard<std::mutex> hold(m_lock);
    m_view.recent.Add({notice, LocalNow(), pass.folder});
    m_view.noticeFolder = pass.folder;
    if (m_icon) m_icon->Notify(PassBalloon(pass), pass.failed || pass.unplugged);
}

bool TrayNotifier::IsNews(const ReceiverPass& pass, const std::wstring& notice) {
    const ULONGLONG now = m_clock();
    auto found = m_said.find(pass.receiver);
    // A pass that did nothing tells nothing new of a receiver heard of lately: the full comparison
    // every minute, or the look that follows the deletes of a --move, which find it empty.
    const bool quiet = !pass.fetched && !pass.deleted && !pass.failed && !pass.kept && !pass.unplugged;
    const bool news = found == m_said.end() || now - found->second.at > kAwayMs || (!quiet && found->second.notice != notice);
    // Unplugged: whatever it brings when it is back is news.
    if (pass.unplugged) m_said.erase(pass.receiver);
    else m_said[pass.receiver] = {notice, now};
    return news;
}
