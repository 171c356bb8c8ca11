#include "SimDownload.h"

#include <algorithm>
#include <cstdlib>
#include <utility>

namespace {
// Overridable for measuring (CALVEX_SIM_CHUNK, bytes); see bench/README.md for the choice.
size_t ChunkSize() {
    static const size_t chunk = [] {
        char text[32] = "";
        const DWORD length = GetEnvironmentVariableA("CALVEX_SIM_CHUNK", text, sizeof(text));
        const size_t value = length && length < sizeof(text) ? strtoul(text, nullptr, 10) : 0;
        return value ? value : size_t(64 * 1024);
    }();
    return chunk;
}
}

SimDownload::SimDownload(std::string bytes, ComPtr<IStream> stream, const SimTransferPlan& plan)
    : m_bytes(std::move(bytes)), m_stream(std::move(stream)), m_plan(plan) {}

BYTE SimDownload::Percent() const {
    if (m_bytes.empty()) return 100;
    return static_cast<BYTE>(static_cast<ULONGLONG>(m_written) * 100 / m_bytes.size());
}

bool SimDownload::End(HRESULT result, Event* event) {
    m_ended = true;
    m_stream.Reset();
    *event = Event{Step::Finish, static_cast<BYTE>(std::max(m_reported, 0)), result};
    return true;
}

bool SimDownload::Next(ULONGLONG now, Event* event) {
    if (m_ended) return false;
    if (!m_begun) {
        m_begun = true;
        m_start = now;
        *event = Event{Step::Begin, 0, S_OK};
        return true;
    }
    if (m_disconnected) return End(HRESULT_FROM_WIN32(ERROR_DEVICE_NOT_CONNECTED), event);
    if (m_cancelled) return End(HRESULT_FROM_WIN32(ERROR_CANCELLED), event);
    // The faults strike before the progress of their percent is reported.
    if (m_plan.exitAtPercent >= 0 && Percent() >= m_plan.exitAtPercent) {
        *event = Event{Step::Exit, Percent(), S_OK};
        return true;
    }
    if (m_plan.failAtPercent >= 0 && Percent() >= m_plan.failAtPercent) return End(m_plan.failResult, event);
    if (ChangeDue(m_plan.growAtPercent, Step::Grow, event) || ChangeDue(m_plan.retimeAtPercent, Step::Retime, event))
        return true;
    if ((m_written > 0 || m_bytes.empty()) && Percent() != m_reported) {
        m_reported = Percent();  // an empty file reports its 100 here
        *event = Event{Step::Progress, Percent(), S_OK};
        return true;
    }
    if (m_written == m_bytes.size()) {
        LARGE_INTEGER start = {};
        HRESULT hr = m_stream->Seek(start, STREAM_SEEK_SET, nullptr);
        return End(SUCCEEDED(hr) ? S_OK : hr, event);
    }
    return WriteDue(now, event);
}

bool SimDownload::ChangeDue(long& atPercent, Step step, Event* event) {
    if (atPercent < 0 || Percent() < atPercent) return false;
    atPercent = -1;  // once
    *event = Event{step, Percent(), S_OK};
    return true;
}

bool SimDownload::WriteDue(ULONGLONG now, Event* event) {
    const size_t size = m_bytes.size();
    const size_t due = m_plan.rate == 0 ? size
                                        : static_cast<size_t>(std::min<ULONGLONG>(
                                              size, (now - m_start) * m_plan.rate / 1000));
    if (m_written == 0 && due > 0) {
        // One allocation for the whole file: a memory stream grown by every chunk copies
        // itself on every chunk: without this a 64 MiB download took 25 times as long.
        ULARGE_INTEGER total;
        total.QuadPart = size;
        m_stream->SetSize(total);
    }
    while (m_written < due) {
        const size_t chunk = std::min(due - m_written, ChunkSize());
        ULONG done = 0;
        HRESULT hr = m_stream->Write(m_bytes.data() + m_written, static_cast<ULONG>(chunk), &done);
        if (FAILED(hr)) return End(hr, event);
        if (done != chunk) return End(STG_E_MEDIUMFULL, event);
        m_written += chunk;
        if (Percent() != m_reported) return Next(now, event);  // faults first, then the progress
    }
    return false;
}
