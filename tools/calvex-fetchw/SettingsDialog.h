#pragma once
// The settings window of the windowless watch: the target folder, emptying, where files go
// (with a live example), notifications and the logon start. The deciding is SettingsChoice's;
// this class only moves it between the controls.
#include <windows.h>

#include <vector>

#include "FetchSettings.h"
#include "LayoutPattern.h"

// Modal; true when OK was pressed, `settings` then holds the choice (already saved).
// `connected`: the receivers the watch sees now, for the live layout example.
bool ShowSettingsDialog(HWND owner, FetchSettings& settings, const std::vector<LayoutReceiver>& connected);
// Brings an open settings dialog of this process forward; false when none is open.
bool BringSettingsDialogForward();

class SettingsDialog {
public:
    SettingsDialog(FetchSettings& settings, const std::vector<LayoutReceiver>& connected)
        : m_settings(settings), m_connected(connected) {}
    bool Run(HWND owner);

private:
    static INT_PTR CALLBACK DialogProc(HWND dialog, UINT message, WPARAM wParam, LPARAM lParam);
    void Init(HWND dialog);
    void OnCommand(WORD id, WORD code);
    void OnLayoutChoice();
    void Browse();
    void MakeFolder();
    void Save();
    // Every check again: the problem and the example in place, OK only when both are fine.
    void Update();
    std::wstring Text(int id) const;
    FetchSettings Choice() const;

    FetchSettings& m_settings;
    const std::vector<LayoutReceiver>& m_connected;
    HWND m_dialog = nullptr;
    bool m_filling = false;  // controls set by the window itself, not typed
};
