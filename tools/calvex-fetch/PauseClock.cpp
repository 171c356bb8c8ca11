#include "PauseClock.h"

void PauseClock::PauseFor(ULONGLONG milliseconds) {
    m_paused = m_timed = true;
    m_until = m_clock() + milliseconds;
}

void PauseClock::PauseUntilResumed() {
    m_paused = true;
    m_timed = false;
}

void PauseClock::Resume() {
    m_ended = m_ended || m_paused;
    m_paused = m_timed = false;
}

void PauseClock::EndWhenDue() {
    if (m_paused && m_timed && m_clock() >= m_until) Resume();
}

bool PauseClock::IsPaused() {
    EndWhenDue();
    return m_paused;
}

ULONGLONG PauseClock::Left() {
    EndWhenDue();
    return m_paused && m_timed ? m_until - m_clock() : 0;
}

bool PauseClock::TakeEnded() {
    EndWhenDue();
    const bool ended = m_ended;
    m_ended = false;
    return ended;
}
