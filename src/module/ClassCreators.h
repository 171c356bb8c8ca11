#pragma once
#include <windows.h>
#include <unknwn.h>

// Instance creators of the class table, each defined beside its class.
HRESULT CreateCalvexReceiversShellFolder(IUnknown* outer, REFIID riid, void** ppv);
HRESULT CreateCalvexReceiversShellView(IUnknown* outer, REFIID riid, void** ppv);
HRESULT CreateCalvexReceiversEnumIDList(IUnknown* outer, REFIID riid, void** ppv);
HRESULT CreateCalvexReceiversExtractIcon(IUnknown* outer, REFIID riid, void** ppv);
HRESULT CreateCalvexReceiversContextMenu(IUnknown* outer, REFIID riid, void** ppv);
HRESULT CreateCalvexReceiversDataObject(IUnknown* outer, REFIID riid, void** ppv);
HRESULT CreateCalvexReceiversQueryInfo(IUnknown* outer, REFIID riid, void** ppv);
HRESULT CreateBrennorReceiversShellFolder(IUnknown* outer, REFIID riid, void** ppv);

// Load and unload hook of the Calvex folder's entry: the process-wide notify window that
// the folders post to is torn down with the module.
void CalvexFolderStartStop(bool starting);
