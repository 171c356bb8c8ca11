#pragma once
// A brand root folder's sink on the receivers collection: receivers coming and going.
#include "folder/FolderEventSink.h"

class CCalvexReceiversShellFolderEventHandler : public FolderEventSink<CCalvexReceiversShellFolderEventHandler> {
public:
    static constexpr UINT SinkId = 1;

    explicit CCalvexReceiversShellFolderEventHandler(IReceiversShellFolderImpl* owner);
    static const SinkEntry* SinkMap();

    void OnReceiverOnline(const VARIANT* args, UINT count);
    void OnReceiverOffline(const VARIANT* args, UINT count);
};
