#pragma once
// A watch's pause: for a while or until resumed. A timed pause ends by itself once its time
// has come; any end of a pause asks for a full comparison, since receivers plugged in or files
// logged meanwhile were only noted.
#include <windows.h>

#include <functional>

class PauseClock {
public:
    using Clock = std::function<ULONGLONG()>;  // milliseconds, as GetTickCount64

    explicit PauseClock(Clock clock = GetTickCount64) : m_clock(std::move(clock)) {}

    void PauseFor(ULONGLONG milliseconds);
    void PauseUntilResumed();
    void Resume();
    bool IsPaused();
    // Milliseconds until a timed pause ends; 0 when not paused or paused until resumed.
    ULONGLONG Left();
    // True once after a pause ended (resumed, or its time came).
    bool TakeEnded();

private:
    void EndWhenDue();

    Clock m_clock;
    bool m_paused = false;
    bool m_timed = false;
    ULONGLONG m_until = 0;
    bool m_ended = false;
};
