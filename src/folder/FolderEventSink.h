#pragma once
// What the folder's two collection sinks share: events of the device manager's type
// library, an owner that is not counted (the folder owns the sink), and one reaction to
// every event: trace it and let the folder update.
#include "CalvexDeviceMgrLib.h"
#include "com/DispEventSink.h"
#include "folder/IReceiversShellFolderImpl.h"
#include "trace/TraceLog.h"

template <class T>
class FolderEventSink : public DispEventSinkImpl<T> {
public:
    FolderEventSink(const IID& eventIid, IReceiversShellFolderImpl* owner)
        : DispEventSinkImpl<T>(eventIid, LIBID_CalvexDeviceMgrLib, 1, 0), m_owner(owner) {}
    // The folder lets go of its sink before it is destroyed.
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
