#pragma once
// The settings window of the windowless watch.
#include <windows.h>

#include <vector>

#include "FetchSettings.h"
#include "LayoutPattern.h"

// Modal; true when OK was pressed, `settings` then holds the choice (already saved).
// `connected`: the receivers the watch sees now, for the live layout example.
bool ShowSettingsDialog(HWND owner, FetchSettings& settings, const std::vector<LayoutReceiver>& connected);
// Brings an open settings dialog of this process forward; false when none is open.
bool BringSettingsDialogForward();
