// The folder's event half: binding to the device manager's collections, the sinks on them,
// and what every event leads to (a path for the change-notification window and the update
// timer of the notification thread, which later tells the registered views).
#include <cstring>
#include <new>

#include "com/Bstr.h"
#include "com/Handles.h"
#include "folder/FolderEventHandlers.h"
#include "folder/IReceiversShellFolderImpl.h"
#include "items/CCalvexReceiversNotifyWindow.h"
#include "items/DeviceManagerClient.h"
#include "items/ItemPath.h"
#include "module/ModuleState.h"
#include "trace/TraceLog.h"

HRESULT IReceiversShellFolderImpl::InitCollections() {
    TraceA("IReceiversShellFolderImpl::InitCollections\r\n");
    if (m_eventSource || !m_ownPidl || !m_pidlMgr) return S_OK;
    const DWORD type = m_pidlMgr->GetLastItemType(m_ownPidl.Get());
    if (IsRootType(type)) return InitRootCollections();
    if (IsReceiverType(type)) return InitReceiverCollections();
    return S_OK;
}

HRESULT IReceiversShellFolderImpl::InitRootCollections() {
    ComPtr<IDeviceMgr> deviceMgr;
    // An unreachable device manager makes an empty folder, not an error.
    if (FAILED(CreateDeviceManager(deviceMgr))) return S_OK;
    deviceMgr->Refresh();
    ComPtr<IDispatch> receivers;
    ComPtr<IReceiversColl> collection;
    if (FAILED(GetReceivers(deviceMgr.Get(), receivers, collection))) return S_OK;
    m_eventSource = receivers;
    m_deviceMgrInterface = deviceMgr;
    m_deviceMgr = ComPtr<IDispatch>(deviceMgr.Get());
    m_receiversSink = ComPtr<CCalvexReceiversShellFolderEventHandler>(
        new (std::nothrow) CCalvexReceiversShellFolderEventHandler(this));
    if (m_receiversSink) m_receiversSink->Advise(m_eventSource.Get());
    TraceA("Advised for receivers, 0x%p\r\n", m_eventSource.Get());
    return S_OK;
}

HRESULT IReceiversShellFolderImpl::InitReceiverCollections() {
    ComPtr<IReceiversColl> receivers;
    if (!m_parent || FAILED(QueryReceiversColl(m_parent->m_eventSource.Get(), receivers))) return S_OK;
    // A key without exactly three fields looks up the empty key, which finds nothing.
    Bstr key(ReceiverLookupKey(m_ownName.c_str()));
    if (!key.Get()) return E_OUTOFMEMORY;
    ComPtr<IDispatch> item;
    if (FAILED(GetReceiverByKey(receivers.Get(), key.Get(), item))) return E_INVALIDARG;
    ComPtr<IReceiver> receiver;
    ComPtr<IDispatch> files;
    if (FAILED(GetReceiverFiles(item.Get(), receiver, files)) || !files) return S_OK;
    m_eventSource = files;
    m_deviceMgr = ComPtr<IDispatch>(receiver.Get());
    m_filesSink = ComPtr<CCalvexFilesShellFolderEventHandler>(new (std::nothrow) CCalvexFilesShellFolderEventHandler(this));
    if (m_filesSink) m_filesSink->Advise(m_eventSource.Get());
    TraceA("Advised for files, 0x%p\r\n", m_eventSource.Get());
    return S_OK;
}

HRESULT IReceiversShellFolderImpl::DoUpdateList() {
    m_notification.CancelUpdateTimer();
    TraceA("IReceiversShellFolderImpl::DoUpdateList\r\n");
    const std::wstring path = GetFullPath();
    if (path.empty()) return S_FALSE;
    PostPathToNotifyWindow(path);
    // One view message five seconds after the last of a burst.
    m_notification.ArmUpdateTimer();
    return S_OK;
}

HRESULT IReceiversShellFolderImpl::PostPathToNotifyWindow(const std::wstring& path) {
    const size_t bytes = (path.size() + 1) * sizeof(wchar_t);
    UniqueGlobal block(GlobalAlloc(GHND, bytes));
    if (!block) return E_OUTOFMEMORY;
    {
        GlobalLockGuard<wchar_t> text(block.Get());
        if (!text) return E_OUTOFMEMORY;
        memcpy(text.Get(), path.c_str(), bytes);
    }
    // The window frees the block once it has it.
    if (!PostMessageW(CCalvexReceiversNotifyWindow::GetNotifyWindow(), UpdateFolderMessage(), 0,
                      reinterpret_cast<LPARAM>(block.Get())))
        return E_FAIL;
    block.Release();
    return S_OK;
}

HRESULT IReceiversShellFolderImpl::EventReceived() {
    TraceA("IReceiversShellFolderImpl2::EventReceived\r\n");
    m_notification.CancelUpdateTimer();
    return S_OK;
}

void IReceiversShellFolderImpl::AddViewWindow(HWND hwnd) { m_notification.AddViewWindow(hwnd); }
void IReceiversShellFolderImpl::RemoveViewWindow(HWND hwnd) { m_notification.RemoveViewWindow(hwnd); }
size_t IReceiversShellFolderImpl::ViewWindowCount() { return m_notification.ViewWindowCount(); }

void IReceiversShellFolderImpl::FinalRelease() {
    TraceA("IReceiversShellFolderImpl::FinalRelease 0x%p\r\n", this);
    if (m_receiversSink) {
        m_receiversSink->Unadvise(m_eventSource.Get());
        TraceA("IReceiversShellFolderImpl::FinalRelease - unadvised from receivers collection\r\n");
    } else if (m_filesSink) {
        m_filesSink->Unadvise(m_eventSource.Get());
        TraceA("IReceiversShellFolderImpl::FinalRelease - unadvised from files collection\r\n");
    }
}

void IReceiversShellFolderImpl::DeleteEventSinks() {
    // Remote callers that still hold a sink (a server gone without unadvising) lose it here.
    if (m_filesSink) {
        m_filesSink->SetOwner(nullptr);
        m_filesSink->Disconnect();
        m_filesSink.Reset();
    }
    if (m_receiversSink) {
        m_receiversSink->SetOwner(nullptr);
        m_receiversSink->Disconnect();
        m_receiversSink.Reset();
    }
}
