#pragma once
// The IContextMenu that the folder hands to the shell for its items: a fixed one-item menu
// that knows nothing of the items. The view's own menus do the real work. Its texts are
// kept as they always were, sample wording included.
#include <windows.h>
#include <shlobj.h>

#include "com/ComObject.h"

class CCalvexReceiversContextMenu : public ComObjectRoot, public IContextMenu {
public:
    BEGIN_INTERFACE_TABLE(CCalvexReceiversContextMenu)
        INTERFACE_ENTRY(IContextMenu)
    END_INTERFACE_TABLE()

    // IContextMenu
    STDMETHODIMP QueryContextMenu(HMENU menu, UINT indexMenu, UINT idCmdFirst, UINT idCmdLast, UINT flags) override;
    STDMETHODIMP InvokeCommand(LPCMINVOKECOMMANDINFO info) override;
    STDMETHODIMP GetCommandString(UINT_PTR idCmd, UINT type, UINT* reserved, LPSTR name, UINT cchMax) override;
};
