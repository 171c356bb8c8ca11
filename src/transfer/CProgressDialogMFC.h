#pragma once
// The modal dialog under which one receiver file is downloaded into a memory stream. It is the
// download's whole controller: it starts the download once it is on screen, follows the
// file's events, ends on the finish event, and asks the device to cancel when the user does.
#include <windows.h>
#include <shlobj.h>

#include <string>

#include "CalvexDeviceMgrLib.h"
#include "com/ComPtr.h"
#include "com/Handles.h"

class CProgressDialogMFC {
public:
    CProgressDialogMFC(HWND parent, LPCITEMIDLIST item, IUnknown* receiver);
    ~CProgressDialogMFC();
    CProgressDialogMFC(const CProgressDialogMFC&) = delete;
    CProgressDialogMFC& operator=(const CProgressDialogMFC&) = delete;

    // IDOK for a finished download, IDCANCEL for a failed or cancelled one.
    INT_PTR DoModal();
    // The stream the device filled; null before a download started.
    IStream* DownloadStream() const { return m_stream.Get(); }

    // Event handlers, called by the sink on the dialog's thread.
    void OnFileBegin();
    void OnFileProgress(int percent);
    void OnFileFinish(HRESULT result);

private:
    class EventSink;

    static INT_PTR CALLBACK DialogProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam);
    INT_PTR HandleMessage(UINT message, WPARAM wParam, LPARAM lParam);
    BOOL OnInitDialog();
    void OnInitial();
    void OnCancel();
    void OnLivenessTimer();
    void PostNcDestroy();
    HRESULT StartFileDownload();
    HRESULT ConnectEvents(IDispatch* file);
    void DisconnectEvents();
    void ShowError(HRESULT result) const;
    void End(INT_PTR result);
    void SetStatus(const std::wstring& text) const;

    HWND m_parent;
    HWND m_window = nullptr;
    UniqueIcon m_smallIcon;  // outlives the window that shows it
    std::wstring m_itemPath;
    ComPtr<IStream> m_stream;
    ComPtr<IDispatch> m_file;
    ComPtr<IUnknown> m_receiver;
    ComPtr<IReceiverFile> m_fileInterface;
    ComPtr<EventSink> m_sink;
    bool m_cancelled = false;
    bool m_ended = false;
};
