#pragma once
// Module-wide state shared by every object of the extension in this process: it lives from
// load to unload and belongs to CModuleApp.
#include <windows.h>
#include <commctrl.h>
#include <string>

// Column widths (persisted, see Settings.h) and the column-click sort state of the views.
struct DisplayState {
    LONG NameColumnWidth = 100;    // every column but "Time"
    LONG SecondColumnWidth = 100;  // the "Time" column
    LONG SortColumn = 1;           // 1-based
    LONG SortDirection = 1;        // +1 or -1
};

// This module's instance, whether it is the DLL or a test program linking the classes.
HINSTANCE ModuleInstance();
// Where strings, dialogs and icons are loaded from.
HINSTANCE ResourceInstance();
DisplayState& Display();
HIMAGELIST LargeImageList();
HIMAGELIST SmallImageList();
// "CalvexReceiversShellExt - Update Folder"
UINT UpdateFolderMessage();
// "CCalvexReceiversShellView - Notification Message"
UINT ViewNotificationMessage();

std::wstring LoadModuleString(UINT id);
