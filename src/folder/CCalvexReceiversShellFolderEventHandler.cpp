#include "folder/CCalvexReceiversShellFolderEventHandler.h"

CCalvexReceiversShellFolderEventHandler::CCalvexReceiversShellFolderEventHandler(IReceiversShellFolderImpl* owner)
    : FolderEventSink(DIID__IReceiversCollEvents, owner) {}

const CCalvexReceiversShellFolderEventHandler::SinkEntry* CCalvexReceiversShellFolderEventHandler::SinkMap() {
    static const SinkEntry map[] = {
        {1, &CCalvexReceiversShellFolderEventHandler::OnReceiverOnline},
        {2, &CCalvexReceiversShellFolderEventHandler::OnReceiverOffline},
        {0, nullptr},
    };
    return map;
}

void CCalvexReceiversShellFolderEventHandler::OnReceiverOnline(const VARIANT*, UINT) {
    OnCollectionEvent("CCalvexReceiversShellFolderEventHandler::OnReceiverOnline\r\n");
}

void CCalvexReceiversShellFolderEventHandler::OnReceiverOffline(const VARIANT*, UINT) {
    OnCollectionEvent("CCalvexReceiversShellFolderEventHandler::OnReceiverOffline\r\n");
}
