#include "folder/CCalvexReceiversShellFolder.h"

#include "items/CCalvexReceiversNotifyWindow.h"
#include "module/ClassCreators.h"

HRESULT CreateCalvexReceiversShellFolder(IUnknown* outer, REFIID riid, void** ppv) {
    return CreateComInstance<CCalvexReceiversShellFolder>(outer, riid, ppv);
}

void CalvexFolderStartStop(bool starting) {
    // The notify window that every folder posts to goes with the module.
    if (!starting) CCalvexReceiversNotifyWindow::DestroyInstance();
}
