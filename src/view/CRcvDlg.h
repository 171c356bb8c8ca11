#pragma once
// The modal receiver properties sheet ("Properties", one "General" page).
#include <windows.h>

#include "view/CRcvDlg_Prop.h"

class CRcvDlg {
public:
    CRcvDlg(HWND parent, LPCITEMIDLIST receiver) : m_parent(parent), m_page(receiver) {}
    CRcvDlg(const CRcvDlg&) = delete;
    CRcvDlg& operator=(const CRcvDlg&) = delete;

    // Runs the sheet's modal loop; the result is not used by the view.
    INT_PTR DoModal();

private:
    static int CALLBACK SheetCallback(HWND sheet, UINT message, LPARAM lParam);

    HWND m_parent;
    CRcvDlg_Prop m_page;
};
