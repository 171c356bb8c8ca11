#include "folder/CCalvexFilesShellFolderEventHandler.h"

CCalvexFilesShellFolderEventHandler::CCalvexFilesShellFolderEventHandler(IReceiversShellFolderImpl* owner)
    : FolderEventSink(DIID__IFilesCollEvents, owner) {}

const CCalvexFilesShellFolderEventHandler::SinkEntry* CCalvexFilesShellFolderEventHandler::SinkMap() {
    static const SinkEntry map[] = {
        {1, &CCalvexFilesShellFolderEventHandler::OnFileAdded},
        {2, &CCalvexFilesShellFolderEventHandler::OnFileDeleted},
        {0, nullptr},
    };
    return map;
}

void CCalvexFilesShellFolderEventHandler::OnFileAdded(const VARIANT*, UINT) {
    OnCollectionEvent("CCalvexFilesShellFolderEventHandler::OnFileAdded\r\n");
}

void CCalvexFilesShellFolderEventHandler::OnFileDeleted(const VARIANT*, UINT) {
    OnCollectionEvent("CCalvexFilesShellFolderEventHandler::OnFileDeleted\r\n");
}
