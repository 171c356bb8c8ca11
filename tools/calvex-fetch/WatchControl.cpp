#include "WatchControl.h"

WatchControl::WatchControl(PauseClock::Clock clock)
    : m_pause(std::move(clock)), m_wake(CreateEventW(nullptr, FALSE, FALSE, nullptr)) {}

void WatchControl::PauseFor(ULONGLONG milliseconds) {
    std::lock_guard<std::mutex> hold(m_lock);
    m_pause.PauseFor(milliseconds);
    Wake();
}

void WatchControl::PauseUntilResumed() {
    std::lock_guard<std::mutex> hold(m_lock);
    m_pause.PauseUntilResumed();
    Wake();
}

void WatchControl::Resume() {
    std::lock_guard<std::mutex> hold(m_lock);
    m_pause.Resume();
    Wake();
}

void WatchControl::DownloadNow() {
    std::lock_guard<std::mutex> hold(m_lock);
    m_downloadNow = true;
    Wake();
}

void WatchControl::Apply(const FetchOptions& options) {
    std::lock_guard<std::mutex> hold(m_lock);
    m_settings = options;
    m_hasSettings = true;
    Wake();
}

bool WatchControl::IsPaused() {
    std::lock_guard<std::mutex> hold(m_lock);
    return m_pause.IsPaused();
}

ULONGLONG WatchControl::PauseLeft() {
    std::lock_guard<std::mutex> hold(m_lock);
    return m_pause.Left();
}

bool WatchControl::Holds() {
    std::lock_guard<std::mutex> hold(m_lock);
    return m_hasSettings || m_pause.IsPaused();
}

bool WatchControl::TakeFullComparison() {
    std::lock_guard<std::mutex> hold(m_lock);
    const bool full = m_pause.TakeEnded() || m_downloadNow;
    m_downloadNow = false;
    return full;
}

bool WatchControl::TakeSettings(FetchOptions& options) {
    std::lock_guard<std::mutex> hold(m_lock);
    if (!m_hasSettings) return false;
    m_hasSettings = false;
    options = m_settings;
    return true;
}
