#pragma once
// Command ids of the view: menu item ids and what OnCommand and Exec take.
#include <windows.h>

enum ViewCommand : UINT {
    ViewCommandRefresh = 22,
    ViewCommandFind = 100,
    ViewCommandCopy = 1281,
    ViewCommandLargeIcons = 1283,
    ViewCommandSmallIcons = 1284,
    ViewCommandList = 1285,
    ViewCommandDetails = 1286,
    ViewCommandProperties = 1287,
    ViewCommandDelete = 1288,
    ViewCommandOpen = 1289,
    ViewCommandFirstItemWalk = 4096,  // and above: walks the selected items only
};
