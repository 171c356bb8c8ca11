// Resource identifiers of the settings window (calvex-fetchw); apart from the programs' icon (1).
#pragma once

#define IDD_SETTINGS 200
#define IDC_TARGET 201
#define IDC_BROWSE 202
#define IDC_TARGET_PROBLEM 203
#define IDC_MAKE_FOLDER 204
#define IDC_MOVE 205
#define IDC_LAYOUT_CHOICE 206
#define IDC_LAYOUT 207
#define IDC_LAYOUT_EXAMPLE 208
#define IDC_NOTIFY 209
#define IDC_START_AT_LOGON 210
