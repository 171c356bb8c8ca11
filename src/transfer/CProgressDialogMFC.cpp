#include "transfer/CProgressDialogMFC.h"

#include <commctrl.h>

#include <new>
#include <vector>

#include "com/DispEventSink.h"
#include "com/Handles.h"
#include "com/ServerGone.h"
#include "items/CReceiversPidlMgr.h"
#include "items/DeviceManagerClient.h"
#include "module/ModuleState.h"
#include "module/SystemErrorText.h"
#include "resource.h"
#include "trace/TraceLog.h"
#include "transfer/TransferNames.h"

namespace {
constexpr UINT StartCommand = 101;
constexpr UINT_PTR LivenessTimer = 1;
constexpr UINT LivenessPeriodMs = 2000;
constexpr UINT PathCapacity = 260;
}  // namespace

// The dialog's side of the download events, typed by the device manager's type library.
class CProgressDialogMFC::EventSink : public DispEventSinkImpl<EventSink> {
public:
    explicit EventSink(CProgressDialogMFC* owner)
        : DispEventSinkImpl<EventSink>(DIID__IReceiverFileEvents, LIBID_CalvexDeviceMgrLib, 1, 0), m_owner(owner) {}
    // Calls that arrive after the dialog let go are dropped.
    void SetOwner(CProgressDialogMFC* owner) { m_owner = owner; }

    static const SinkEntry* SinkMap() {
        static const SinkEntry map[] = {
            {1, &EventSink::OnFileBegin}, {2, &EventSink::OnFileProgress}, {3, &EventSink::OnFileFinish}, {0, nullptr}};
        return map;
    }

private:
    void OnFileBegin(const VARIANT*, UINT) {
        if (m_owner) m_owner->OnFileBegin();
    }
    void OnFileProgress(const VARIANT* args, UINT count) {
        if (m_owner && count >= 2) m_owner->OnFileProgress(args[1].bVal);
    }
    void OnFileFinish(const VARIANT* args, UINT count) {
        if (m_owner && count >= 2) m_owner->OnFileFinish(args[1].lVal);
    }

    CProgressDialogMFC* m_owner;
};

CProgressDialogMFC::CProgressDialogMFC(HWND parent, LPCITEMIDLIST item, IUnknown* receiver)
    : m_parent(parent), m_receiver(receiver) {
    CReceiversPidlMgr pidlMgr;
    if (!item || !pidlMgr.IsValid() || !IsFileType(pidlMgr.GetLastItemType(item))) return;
    wchar_t path[PathCapacity] = L"";
    pidlMgr.GetPath(item, path, PathCapacity, true);
    m_itemPath = path;
}

// Released in this order on purpose: the file interface, the receiver, the file, the stream.
CProgressDialogMFC::~CProgressDialogMFC() {
    if (m_sink) m_sink->SetOwner(nullptr);
    m_fileInterface.Reset();
    m_receiver.Reset();
    m_file.Reset();
    m_stream.Reset();
}

INT_PTR CProgressDialogMFC::DoModal() {
    INITCOMMONCONTROLSEX controls = {sizeof(controls), ICC_PROGRESS_CLASS};
    InitCommonControlsEx(&controls);
    return DialogBoxParamW(ResourceInstance(), MAKEINTRESOURCEW(IDD_PROGRESS), m_parent, DialogProc,
                           reinterpret_cast<LPARAM>(this));
}

INT_PTR CALLBACK CProgressDialogMFC::DialogProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
    if (message == WM_INITDIALOG) {
        auto* dialog = reinterpret_cast<CProgressDialogMFC*>(lParam);
        SetWindowLongPtrW(window, DWLP_USER, lParam);
        dialog->m_window = window;
        return dialog->OnInitDialog();
    }
    auto* dialog = reinterpret_cast<CProgressDialogMFC*>(GetWindowLongPtrW(window, DWLP_USER));
    return dialog ? dialog->HandleMessage(message, wParam, lParam) : FALSE;
}

INT_PTR CProgressDialogMFC::HandleMessage(UINT message, WPARAM wParam, LPARAM) {
    switch (message) {
    case WM_COMMAND:
        switch (LOWORD(wParam)) {
        case StartCommand: OnInitial(); return TRUE;
        case IDCANCEL: OnCancel(); return TRUE;
        case IDOK: return TRUE;  // Enter never closes the dialog
        }
        return FALSE;
    case WM_TIMER:
        if (wParam == LivenessTimer) OnLivenessTimer();
        return TRUE;
    case WM_NCDESTROY:
        PostNcDestroy();
        return FALSE;
    }
    return FALSE;
}

BOOL CProgressDialogMFC::OnInitDialog() {
    TraceA("CProgressDialogMFC::OnInitDialog\r\n");
    m_smallIcon.Reset(static_cast<HICON>(LoadImageW(ResourceInstance(), MAKEINTRESOURCEW(IDI_FILE), IMAGE_ICON,
                                                    GetSystemMetrics(SM_CXSMICON), GetSystemMetrics(SM_CYSMICON), 0)));
    UniqueIcon replaced(reinterpret_cast<HICON>(
        SendMessageW(m_window, WM_SETICON, ICON_SMALL, reinterpret_cast<LPARAM>(m_smallIcon.Get()))));
    PostMessageW(m_window, WM_COMMAND, StartCommand, 0);
    SendDlgItemMessageW(m_window, IDC_PROGRESS_BAR, PBM_SETRANGE32, 0, 100);
    SetWindowTextW(m_window, LoadModuleString(IDS_FILE_DOWNLOAD).c_str());
    SetDlgItemTextW(m_window, IDCANCEL, LoadModuleString(IDS_CANCEL).c_str());
    return TRUE;
}

void CProgressDialogMFC::OnInitial() {
    TraceA("CProgressDialogMFC::OnInitial\r\n");
    SetWindowPos(m_window, HWND_TOPMOST, 0, 0, 0, 0, SWP_NOMOVE | SWP_NOSIZE | SWP_SHOWWINDOW);
    const HRESULT hr = StartFileDownload();
    if (FAILED(hr)) {
        ShowError(hr);
        End(IDCANCEL);
        return;
    }
    if (m_fileInterface) SetTimer(m_window, LivenessTimer, LivenessPeriodMs, nullptr);
}

HRESULT CProgressDialogMFC::StartFileDownload() {
    TraceA("CProgressDialogMFC::StartFileDownload\r\n");
    ComPtr<IFilesColl> files;
    if (FAILED(QueryFilesColl(m_receiver.Get(), files))) return E_NOINTERFACE;
    ComPtr<IDispatch> file;
    HRESULT hr = GetFileByName(files.Get(), DeviceFileName(m_itemPath), file);
    if (hr != S_OK || !file) return hr;
    DisconnectEvents();
    if (SUCCEEDED(ConnectEvents(file.Get()))) m_file = file;
    ComPtr<IReceiverFile> fileInterface;
    if (FAILED(QueryReceiverFile(file.Get(), fileInterface))) return E_NOINTERFACE;
    IStream* stream = nullptr;
    hr = CreateStreamOnHGlobal(nullptr, TRUE, &stream);
    if (FAILED(hr)) return hr;
    m_stream.Attach(stream);
    hr = StartDownload(fileInterface.Get(), m_stream.Get());
    m_fileInterface = fileInterface;
    return hr;
}

HRESULT CProgressDialogMFC::ConnectEvents(IDispatch* file) {
    if (!m_sink) m_sink = ComPtr<EventSink>(new (std::nothrow) EventSink(this));
    return m_sink ? m_sink->Advise(file) : E_OUTOFMEMORY;
}

void CProgressDialogMFC::DisconnectEvents() {
    if (!m_file) return;
    if (m_sink && FAILED(m_sink->Unadvise(m_file.Get()))) m_sink->Disconnect();
    m_file.Reset();
}

void CProgressDialogMFC::OnFileBegin() { TraceA("CProgressDialogMFC::OnFileBegin\n"); }

void CProgressDialogMFC::OnFileProgress(int percent) {
    TraceA("CProgressDialogMFC::OnFileProgress %d\n", percent);
    if (m_ended) return;
    SendDlgItemMessageW(m_window, IDC_PROGRESS_BAR, PBM_SETPOS, percent, 0);
    std::vector<wchar_t> text(1024);
    _snwprintf(text.data(), text.size() - 1, LoadModuleString(IDS_DOWNLOADING).c_str(),
               ShownFileName(m_itemPath).c_str(), percent);
    SetStatus(text.data());
    // Events arrive in a tight sequence: repaint now, not when the queue is empty.
    InvalidateRect(m_window, nullptr, TRUE);
    UpdateWindow(m_window);
}

void CProgressDialogMFC::OnFileFinish(HRESULT result) {
    TraceA("CProgressDialogMFC::OnFileFinish\n");
    if (m_ended) return;
    KillTimer(m_window, LivenessTimer);
    if (FAILED(result)) ShowError(result);
    // Any code but S_OK ends as a failure; a cancel wins over a late S_OK.
    End(result != S_OK || m_cancelled ? IDCANCEL : IDOK);
}

void CProgressDialogMFC::OnCancel() {
    TraceA("CProgressDialogMFC::OnCancel\r\n");
    if (m_ended) return;
    m_cancelled = true;
    const HRESULT hr = m_fileInterface ? m_fileInterface->Cancel() : E_FAIL;
    SetStatus(LoadModuleString(IDS_WAITING_FOR_CANCEL));
    if (SUCCEEDED(hr) && m_file) return;  // the finish event ends the dialog
    End(IDCANCEL);
}

// Not a timeout: one cheap call that only a dead server fails, so a download from a server
// that was killed ends instead of waiting for a finish event that cannot come.
void CProgressDialogMFC::OnLivenessTimer() {
    if (m_ended || !m_fileInterface) return;
    VARIANT_BOOL downloading = VARIANT_FALSE;
    const HRESULT hr = m_fileInterface->get_Downloading(&downloading);
    if (IsServerGone(hr)) {
        TraceA("CProgressDialogMFC::OnLivenessTimer [0x%08X]\r\n", static_cast<unsigned>(hr));
        OnFileFinish(hr);
    }
}

void CProgressDialogMFC::PostNcDestroy() {
    DisconnectEvents();
    m_fileInterface.Reset();
}

void CProgressDialogMFC::ShowError(HRESULT result) const {
    MessageBoxW(m_window, SystemErrorTextWithCode(result).c_str(), LoadModuleString(IDS_FILE_DOWNLOAD).c_str(),
                MB_OK | MB_ICONERROR);
}

void CProgressDialogMFC::End(INT_PTR result) {
    if (m_ended) return;
    m_ended = true;
    KillTimer(m_window, LivenessTimer);
    EndDialog(m_window, result);
}

void CProgressDialogMFC::SetStatus(const std::wstring& text) const {
    SetDlgItemTextW(m_window, IDC_PROGRESS_STATUS, text.c_str());
}
