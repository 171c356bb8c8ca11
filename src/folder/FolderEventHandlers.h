#pragma once
// The folder's two sinks on the device manager's collections. Both do one thing with every
// event: trace it and let the owning folder update. The owner is not counted: the folder
// owns its sink and lets go of it before it is destroyed.
#include "CalvexDeviceMgrLib.h"
#include "com/DispEventSink.h"
#include "folder/IReceiversShellFolderImpl.h"
#include "trace/TraceLog.h"

template <class T, const IID& EventIid>
class FolderEventSink : public DispEventSinkImpl<T> {
public:
    explicit FolderEventSink(IReceiversShellFolderImpl* owner)
        : DispEventSinkImpl<T>(EventIid, LIBID_CalvexDeviceMgrLib, 1, 0), m_owner(owner) {}
    void SetOwner(IReceiversShellFolderImpl* owner) { m_owner = owner; }

protected:
    // The event's argument is not looked at.
    void OnCollectionEvent(const char* traceLine) {
        TraceA(traceLine);
        if (m_owner) m_owner->DoUpdateList();
    }

private:
    IReceiversShellFolderImpl* m_owner;
};

// A brand root folder's sink on the receivers collection: receivers coming and going.
class CCalvexReceiversShellFolderEventHandler
    : public FolderEventSink<CCalvexReceiversShellFolderEventHandler, DIID__IReceiversCollEvents> {
public:
    static constexpr UINT SinkId = 1;
    using FolderEventSink::FolderEventSink;

    static const SinkEntry* SinkMap() {
        static const SinkEntry map[] = {{1, &CCalvexReceiversShellFolderEventHandler::OnReceiverOnline},
                                        {2, &CCalvexReceiversShellFolderEventHandler::OnReceiverOffline},
                                        {0, nullptr}};
        return map;
    }
    void OnReceiverOnline(const VARIANT*, UINT) {
        OnCollectionEvent("CCalvexReceiversShellFolderEventHandler::OnReceiverOnline\r\n");
    }
    void OnReceiverOffline(const VARIANT*, UINT) {
        OnCollectionEvent("CCalvexReceiversShellFolderEventHandler::OnReceiverOffline\r\n");
    }
};

// A receiver folder's sink on the receiver's files collection: files added and deleted.
class CCalvexFilesShellFolderEventHandler
    : public FolderEventSink<CCalvexFilesShellFolderEventHandler, DIID__IFilesCollEvents> {
public:
    static constexpr UINT SinkId = 2;
    using FolderEventSink::FolderEventSink;

    static const SinkEntry* SinkMap() {
        static const SinkEntry map[] = {{1, &CCalvexFilesShellFolderEventHandler::OnFileAdded},
                                        {2, &CCalvexFilesShellFolderEventHandler::OnFileDeleted},
                                        {0, nullptr}};
        return map;
    }
    void OnFileAdded(const VARIANT*, UINT) { OnCollectionEvent("CCalvexFilesShellFolderEventHandler::OnFileAdded\r\n"); }
    void OnFileDeleted(const VARIANT*, UINT) {
        OnCollectionEvent("CCalvexFilesShellFolderEventHandler::OnFileDeleted\r\n");
    }
};
