#pragma once
// One download acted out: the file's bytes go into the client's stream in chunks paced by the
// transfer rate, and each step tells the caller which event to fire. The caller fires each
// event before asking for the next, so a Cancel that arrives during an event takes effect at once.
#include <windows.h>
#include <objidl.h>

#include <string>

#include "SimFaults.h"
#include "com/ComPtr.h"

class SimDownload {
public:
    // Grow and Retime: the tree's file is to change now (the bytes sent stay those read at the start).
    enum class Step { Begin, Progress, Finish, Exit, Grow, Retime };
    struct Event {
        Step step = Step::Begin;
        BYTE percent = 0;
        HRESULT result = S_OK;  // Finish
    };

    SimDownload(std::string bytes, ComPtr<IStream> stream, const SimTransferPlan& plan);

    // The next event due at time now (milliseconds); false when none is due yet or the
    // download has ended. Finish is the last event; Exit asks to end the process here.
    bool Next(ULONGLONG now, Event* event);
    void Cancel() { m_cancelled = true; }
    // The receiver went away: the download ends with ERROR_DEVICE_NOT_CONNECTED at the next step.
    void Disconnect() { m_disconnected = true; }
    // Goes on after an Exit that was not acted out.
    void SkipExit() { m_plan.exitAtPercent = -1; }
    bool Ended() const { return m_ended; }

private:
    BYTE Percent() const;
    bool End(HRESULT result, Event* event);
    bool WriteDue(ULONGLONG now, Event* event);
    bool ChangeDue(long& atPercent, Step step, Event* event);

    std::string m_bytes;
    ComPtr<IStream> m_stream;
    SimTransferPlan m_plan;
    size_t m_written = 0;
    int m_reported = -1;  // the percent of the last progress event
    ULONGLONG m_start = 0;
    bool m_begun = false;
    bool m_cancelled = false;
    bool m_disconnected = false;
    bool m_ended = false;
};
