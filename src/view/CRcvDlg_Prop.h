#pragma once
// The one page of the receiver properties sheet: name, model, serial number and port, all
// read from the receiver's item identifier when the page is made.
#include <windows.h>
#include <prsht.h>
#include <shlobj.h>

#include <string>

class CRcvDlg_Prop {
public:
    explicit CRcvDlg_Prop(LPCITEMIDLIST receiver);
    CRcvDlg_Prop(const CRcvDlg_Prop&) = delete;
    CRcvDlg_Prop& operator=(const CRcvDlg_Prop&) = delete;

    // The page description for PropertySheetW; this object must outlive the sheet.
    PROPSHEETPAGEW Page();

    const std::wstring& ReceiverName() const { return m_receiverName; }
    const std::wstring& Model() const { return m_model; }
    const std::wstring& SerialNumber() const { return m_serialNumber; }
    const std::wstring& Port() const { return m_port; }

private:
    static INT_PTR CALLBACK DialogProc(HWND page, UINT message, WPARAM wParam, LPARAM lParam);
    void OnInitDialog(HWND page) const;

    std::wstring m_receiverName;
    std::wstring m_model;
    std::wstring m_serialNumber;
    std::wstring m_port;
};
