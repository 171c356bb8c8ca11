#pragma once
// A receiver folder's sink on the receiver's files collection: files added and deleted.
#include "folder/FolderEventSink.h"

class CCalvexFilesShellFolderEventHandler : public FolderEventSink<CCalvexFilesShellFolderEventHandler> {
public:
    static constexpr UINT SinkId = 2;

    explicit CCalvexFilesShellFolderEventHandler(IReceiversShellFolderImpl* owner);
    static const SinkEntry* SinkMap();

    void OnFileAdded(const VARIANT* args, UINT count);
    void OnFileDeleted(const VARIANT* args, UINT count);
};
