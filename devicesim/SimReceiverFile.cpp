#include "SimReceiverFile.h"

#include <utility>

#include "ReceiverTreeLoader.h"
#include "SimCreate.h"
#include "SimLog.h"
#include "SimReceiver.h"
#include "SimResults.h"

namespace {

std::wstring HexResult(HRESULT hr) {
    wchar_t text[16];
    swprintf(text, 16, L"0x%08lX", static_cast<unsigned long>(hr));
    return text;
}

}  // namespace

SimReceiverFile::SimReceiverFile(std::shared_ptr<SimModel> model, std::shared_ptr<SimReceiverRecord> receiver,
                                 std::shared_ptr<SimFileRecord> file)
    : SimEventSource(DIID__IReceiverFileEvents),
      m_model(std::move(model)),
      m_receiver(std::move(receiver)),
      m_file(std::move(file)) {}

HRESULT SimReceiverFile::Create(const std::shared_ptr<SimModel>& model,
                                const std::shared_ptr<SimReceiverRecord>& receiver,
                                const std::shared_ptr<SimFileRecord>& file, IDispatch** out) {
    return CreateSimObject<SimReceiverFile>(out, model, receiver, file);
}

STDMETHODIMP SimReceiverFile::get_Name(BSTR* name) {
    return SimHandOutText(Fault(L"IReceiverFile.get_Name"), m_file->name, name);
}

STDMETHODIMP SimReceiverFile::get_Receiver(IDispatch** receiver) {
    if (!receiver) return E_POINTER;
    *receiver = nullptr;
    HRESULT hr = Fault(L"IReceiverFile.get_Receiver");
    if (FAILED(hr)) return hr;
    HRESULT created = SimReceiver::Create(m_model, m_receiver, receiver);
    return FAILED(created) ? created : hr;
}

STDMETHODIMP SimReceiverFile::get_Size(LONG* size) {
    return SimHandOut<LONG>(Fault(L"IReceiverFile.get_Size"), m_file->size, size);
}

STDMETHODIMP SimReceiverFile::get_Time(DATE* time) {
    return SimHandOut<DATE>(Fault(L"IReceiverFile.get_Time"), m_file->time, time);
}

STDMETHODIMP SimReceiverFile::Delete() {
    HRESULT hr = Fault(L"IReceiverFile.Delete");
    if (hr != S_OK) return hr;
    if (!m_receiver->online) return HRESULT_FROM_WIN32(ERROR_DEVICE_NOT_CONNECTED);
    if (!m_file->present) return HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND);
    if (!DeleteFileW(m_file->path.c_str())) return HRESULT_FROM_WIN32(GetLastError());
    SimLog::Write(L"deleted \"" + m_file->path + L"\"");
    m_model->RescanSoon();  // the deleted event comes from the rescan, as for any other change
    return S_OK;
}

STDMETHODIMP SimReceiverFile::Download(VARIANT destination) {
    HRESULT hr = Fault(L"IReceiverFile.Download");
    if (hr != S_OK) return hr;
    hr = StartDownload(destination);
    SimLog::Write(L"download of \"" + m_file->path + L"\" " +
                  (SUCCEEDED(hr) ? std::wstring(L"started") : L"refused " + HexResult(hr)));
    return hr;
}

HRESULT SimReceiverFile::StartDownload(const VARIANT& destination) {
    if (m_download) return HRESULT_FROM_WIN32(ERROR_BUSY);
    if (!m_receiver->online) return HRESULT_FROM_WIN32(ERROR_DEVICE_NOT_CONNECTED);
    if (!m_file->present) return HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND);
    IUnknown* target = destination.vt == VT_UNKNOWN    ? destination.punkVal
                       : destination.vt == VT_DISPATCH ? destination.pdispVal
                                                       : nullptr;
    if (!target) return E_INVALIDARG;
    ComPtr<IStream> stream;
    if (FAILED(target->QueryInterface(IID_IStream, stream.PutVoid()))) return E_NOINTERFACE;
    std::string bytes;
    DWORD error = ReceiverTreeLoader::ReadBytes(m_file->path, &bytes);
    if (error != ERROR_SUCCESS) return HRESULT_FROM_WIN32(error);
    m_download = std::make_unique<SimDownload>(std::move(bytes), stream, m_model->TransferPlan(*m_receiver));
    m_model->StartDownload(static_cast<IReceiverFile*>(this), this);
    return S_OK;
}

STDMETHODIMP SimReceiverFile::get_Downloading(VARIANT_BOOL* downloading) {
    return SimHandOut<VARIANT_BOOL>(Fault(L"IReceiverFile.get_Downloading"),
                                    m_download ? VARIANT_TRUE : VARIANT_FALSE, downloading);
}

STDMETHODIMP SimReceiverFile::Cancel() {
    HRESULT hr = Fault(L"IReceiverFile.Cancel");
    if (hr != S_OK) return hr;
    // Nothing running is a failure, so that a client waiting for the finish does not wait forever.
    if (!m_download) return HRESULT_FROM_WIN32(ERROR_INVALID_STATE);
    m_download->Cancel();  // the finish event follows from the timer
    return S_OK;
}

bool SimReceiverFile::Tick() {
    ComPtr<IReceiverFile> self(this);  // a handler may release the client's last reference
    SimDownload::Event event;
    if (m_download && !m_receiver->online) m_download->Disconnect();  // unplugged mid-download
    while (m_download && m_download->Next(GetTickCount64(), &event)) {
        if (event.step == SimDownload::Step::Exit) {
            if (!m_model->AbruptExit(L"download of \"" + m_file->path + L"\" at " + std::to_wstring(event.percent) + L"%"))
                m_download->SkipExit();
            continue;
        }
        if (event.step == SimDownload::Step::Grow || event.step == SimDownload::Step::Retime) {
            ChangeTreeFile(event.step == SimDownload::Step::Grow);
            continue;
        }
        if (event.step == SimDownload::Step::Finish) {
            m_download.reset();  // the handler may start the next download at once
            SimLog::Write(L"download of \"" + m_file->path + L"\" finished " + HexResult(event.result));
        }
        FireStep(event);
        if (event.step == SimDownload::Step::Finish) break;
    }
    return m_download != nullptr;
}

// The record follows at once, as the next rescan would make it (a time from [Times] comes
// back then).
void SimReceiverFile::ChangeTreeFile(bool grow) {
    HANDLE file = CreateFileW(m_file->path.c_str(), FILE_APPEND_DATA | FILE_READ_ATTRIBUTES | FILE_WRITE_ATTRIBUTES,
                              FILE_SHARE_READ | FILE_SHARE_WRITE, nullptr, OPEN_EXISTING, 0, nullptr);
    FILETIME written = {};
    DWORD done = 0;
    if (file == INVALID_HANDLE_VALUE || !GetFileTime(file, nullptr, nullptr, &written)) {
        SimLog::Write(L"cannot change \"" + m_file->path + L"\"");
    } else if (grow && WriteFile(file, "+", 1, &done, nullptr) && done == 1) {
        ++m_file->size;
        SimLog::Write(L"grown by a byte: \"" + m_file->path + L"\"");
    } else if (!grow) {
        ULARGE_INTEGER later = {{written.dwLowDateTime, written.dwHighDateTime}};
        later.QuadPart += 60ull * 10000000ull;
        written = {later.LowPart, later.HighPart};
        if (SetFileTime(file, nullptr, nullptr, &written)) m_file->time += 1.0 / (24 * 60);
        SimLog::Write(L"a minute newer: \"" + m_file->path + L"\"");
    }
    if (file != INVALID_HANDLE_VALUE) CloseHandle(file);
}

void SimReceiverFile::FireStep(const SimDownload::Event& event) {
    IDispatch* subject = static_cast<IReceiverFile*>(this);
    VARIANT second;
    VariantInit(&second);
    switch (event.step) {
    case SimDownload::Step::Begin:
        m_point.Fire(1, subject);
        break;
    case SimDownload::Step::Progress:
        second.vt = VT_UI1;
        second.bVal = event.percent;
        m_point.Fire(2, subject, &second);
        break;
    case SimDownload::Step::Finish:
        second.vt = VT_I4;
        second.lVal = event.result;
        m_point.Fire(3, subject, &second);
        break;
    case SimDownload::Step::Exit:
    case SimDownload::Step::Grow:
    case SimDownload::Step::Retime:
        break;
    }
}
