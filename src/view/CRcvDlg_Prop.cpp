#include "view/CRcvDlg_Prop.h"

#include "items/CReceiversPidlMgr.h"
#include "module/ModuleState.h"
#include "resource.h"

namespace {
std::wstring ColumnText(const CReceiversPidlMgr& manager, LPCITEMIDLIST item, int column) {
    wchar_t text[MAX_PATH] = L"";
    manager.GetItemText(item, column, text, MAX_PATH);
    return text;
}
}  // namespace

CRcvDlg_Prop::CRcvDlg_Prop(LPCITEMIDLIST receiver) {
    CReceiversPidlMgr manager;
    if (!manager.IsValid() || !receiver) return;
    wchar_t name[MAX_PATH] = L"";
    manager.GetPath(receiver, name, MAX_PATH, false);
    m_receiverName = name;
    m_model = ColumnText(manager, receiver, 2);
    m_serialNumber = ColumnText(manager, receiver, 1);
    m_port = ColumnText(manager, receiver, 3);
}

PROPSHEETPAGEW CRcvDlg_Prop::Page() {
    PROPSHEETPAGEW page = {};
    page.dwSize = sizeof(page);
    page.hInstance = ResourceInstance();
    page.pszTemplate = MAKEINTRESOURCEW(IDD_RECEIVER_PROPERTIES);
    page.pfnDlgProc = DialogProc;
    page.lParam = reinterpret_cast<LPARAM>(this);
    return page;
}

INT_PTR CALLBACK CRcvDlg_Prop::DialogProc(HWND page, UINT message, WPARAM, LPARAM lParam) {
    if (message != WM_INITDIALOG) return FALSE;
    const auto* sheetPage = reinterpret_cast<const PROPSHEETPAGEW*>(lParam);
    reinterpret_cast<const CRcvDlg_Prop*>(sheetPage->lParam)->OnInitDialog(page);
    return TRUE;
}

void CRcvDlg_Prop::OnInitDialog(HWND page) const {
    // The resource labels carry colons; the labels shown at run time are the column titles.
    SetDlgItemTextW(page, IDC_PROP_LABEL_RECEIVER, LoadModuleString(IDS_COLUMN_NAME).c_str());
    SetDlgItemTextW(page, IDC_PROP_LABEL_MODEL, LoadModuleString(IDS_COLUMN_MODEL).c_str());
    SetDlgItemTextW(page, IDC_PROP_LABEL_SERIAL, LoadModuleString(IDS_COLUMN_SERIAL).c_str());
    SetDlgItemTextW(page, IDC_PROP_LABEL_PORT, LoadModuleString(IDS_COLUMN_PORT).c_str());
    SetDlgItemTextW(page, IDC_PROP_RECEIVER, m_receiverName.c_str());
    SetDlgItemTextW(page, IDC_PROP_MODEL, m_model.c_str());
    SetDlgItemTextW(page, IDC_PROP_SERIAL, m_serialNumber.c_str());
    SetDlgItemTextW(page, IDC_PROP_PORT, m_port.c_str());
}
