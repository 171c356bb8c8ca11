#include "TrayNotifier.h"

#include "WatchNotice.h"

namespace {
// Longer than the watch's full comparison takes to come round (a minute), with room for a
// long pass of another receiver.
constexpr ULONGLONG kAwayMs = 90 * 1000;
}

TrayNotifier::TrayNotifier(FetchConsole& console, const std::wstring& target, TrayIcon* icon, Clock clock)
    : m_console(console), m_target(target), m_icon(icon), m_clock(std::move(clock)) {}

void TrayNotifier::Idle() {
    if (m_icon) m_icon->SetTip(IdleTip(m_target));
}

void TrayNotifier::Working(const std::wstring& receiver, int left) {
    if (m_icon) m_icon->SetTip(WorkingTip(receiver, left));
}

void TrayNotifier::PassEnded(const ReceiverPass& pass) {
    const std::wstring notice = PassNotice(pass);
    if (!IsNews(pass, notice)) return;
    m_console.Line(notice);
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
