#include "view/CRcvDlg.h"

#include <commctrl.h>
#include <prsht.h>

#include <string>

#include "module/ModuleState.h"
#include "resource.h"

INT_PTR CRcvDlg::DoModal() {
    const std::wstring caption = LoadModuleString(IDS_PROPERTIES);
    PROPSHEETPAGEW page = m_page.Page();
    PROPSHEETHEADERW header = {};
    header.dwSize = sizeof(header);
    header.dwFlags = PSH_PROPSHEETPAGE | PSH_NOAPPLYNOW | PSH_USECALLBACK;
    header.hwndParent = m_parent;
    header.hInstance = ResourceInstance();
    header.pszCaption = caption.c_str();
    header.nPages = 1;
    header.ppsp = &page;
    header.pfnCallback = SheetCallback;
    return PropertySheetW(&header);
}

int CALLBACK CRcvDlg::SheetCallback(HWND sheet, UINT message, LPARAM) {
    if (message != PSCB_INITIALIZED || !sheet) return 0;
    SetWindowTextW(sheet, LoadModuleString(IDS_PROPERTIES).c_str());
    HWND tabs = reinterpret_cast<HWND>(SendMessageW(sheet, PSM_GETTABCONTROL, 0, 0));
    std::wstring general = LoadModuleString(IDS_GENERAL);
    if (general.size() > 255) general.resize(255);
    TCITEMW tab = {};
    tab.mask = TCIF_TEXT;
    tab.pszText = &general[0];
    if (tabs) SendMessageW(tabs, TCM_SETITEMW, 0, reinterpret_cast<LPARAM>(&tab));
    return 0;
}
