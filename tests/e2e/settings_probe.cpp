// Guards against a settings window that looks right but says nothing in place: reads its controls from outside.
// Prints the open settings window of calvex-fetchw, one "name=value" a line: each text,
// each check box, whether "Make it" shows and whether OK can be pressed; exit 1 when none is open.
#include <windows.h>

#include <cstdio>

#include "SettingsResources.h"

int wmain() {
    const HWND dialog = FindWindowW(L"#32770", L"Calvex receivers download settings");
    if (!dialog) return 1;
    const struct { const char* name; int id; } texts[] = {{"target", IDC_TARGET}, {"problem", IDC_TARGET_PROBLEM}, {"layout", IDC_LAYOUT_CHOICE},
                 {"pattern", IDC_LAYOUT}, {"example", IDC_LAYOUT_EXAMPLE}},
      checks[] = {{"move", IDC_MOVE}, {"notify", IDC_NOTIFY}, {"logon", IDC_START_AT_LOGON}};
    wchar_t text[1024];
    for (const auto& t : texts) printf("%s=%ls\n", t.name, GetDlgItemTextW(dialog, t.id, text, 1024) ? text : L"");
    for (const auto& check : checks) printf("%s=%d\n", check.name, IsDlgButtonChecked(dialog, check.id) == BST_CHECKED);
    printf("make=%d\n", IsWindowVisible(GetDlgItem(dialog, IDC_MAKE_FOLDER)) ? 1 : 0);
    printf("ok=%d\n", IsWindowEnabled(GetDlgItem(dialog, IDOK)) ? 1 : 0);
    return 0;
}
