#include "SettingsDialog.h"

#include <shlobj.h>
#include <shobjidl.h>

#include <atomic>

#include "com/ComPtr.h"
#include "SettingsChoice.h"
#include "SettingsResources.h"

namespace {
std::atomic<HWND> g_open{nullptr};  // one settings window per process at a time

void SetText(HWND dialog, int id, const std::wstring& text) { SetDlgItemTextW(dialog, id, text.c_str()); }
}  // namespace

bool ShowSettingsDialog(HWND owner, FetchSettings& settings, const std::vector<LayoutReceiver>& connected) {
    if (BringSettingsDialogForward()) return false;
    return SettingsDialog(settings, connected).Run(owner);
}

bool BringSettingsDialogForward() {
    const HWND dialog = g_open.load();
    if (!dialog) return false;
    if (IsIconic(dialog)) ShowWindow(dialog, SW_RESTORE);
    SetForegroundWindow(dialog);
    return true;
}

bool SettingsDialog::Run(HWND owner) {
    const INT_PTR result = DialogBoxParamW(GetModuleHandleW(nullptr), MAKEINTRESOURCEW(IDD_SETTINGS), owner, DialogProc,
                                           reinterpret_cast<LPARAM>(this));
    g_open = nullptr;
    return result == IDOK;
}

INT_PTR CALLBACK SettingsDialog::DialogProc(HWND dialog, UINT message, WPARAM wParam, LPARAM lParam) {
    if (message == WM_INITDIALOG) {
        SetWindowLongPtrW(dialog, DWLP_USER, lParam);
        reinterpret_cast<SettingsDialog*>(lParam)->Init(dialog);
        return TRUE;
    }
    auto* self = reinterpret_cast<SettingsDialog*>(GetWindowLongPtrW(dialog, DWLP_USER));
    if (!self || message != WM_COMMAND) return FALSE;
    self->OnCommand(LOWORD(wParam), HIWORD(wParam));
    return TRUE;
}

void SettingsDialog::Init(HWND dialog) {
    m_dialog = dialog;
    g_open = dialog;
    m_filling = true;
    SetText(dialog, IDC_TARGET, m_settings.target);
    SetText(dialog, IDC_LAYOUT, m_settings.layout);
    const HWND choice = GetDlgItem(dialog, IDC_LAYOUT_CHOICE);
    for (int i = 0; i < SettingsChoice::kLayoutCount; ++i)
        SendMessageW(choice, CB_ADDSTRING, 0, reinterpret_cast<LPARAM>(SettingsChoice::kLayouts[i].name));
    const int index = SettingsChoice::LayoutIndex(m_settings.layout);
    SendMessageW(choice, CB_SETCURSEL, index, 0);
    SendDlgItemMessageW(dialog, IDC_LAYOUT, EM_SETREADONLY, index != SettingsChoice::kOwnPattern, 0);
    CheckDlgButton(dialog, IDC_MOVE, m_settings.move ? BST_CHECKED : BST_UNCHECKED);
    CheckDlgButton(dialog, IDC_NOTIFY, m_settings.notify ? BST_CHECKED : BST_UNCHECKED);
    CheckDlgButton(dialog, IDC_START_AT_LOGON, m_settings.startAtLogon ? BST_CHECKED : BST_UNCHECKED);
    m_filling = false;
    Update();
}

void SettingsDialog::OnCommand(WORD id, WORD code) {
    if ((id == IDC_TARGET || id == IDC_LAYOUT) && code == EN_CHANGE && !m_filling) Update();
    else if (id == IDC_LAYOUT_CHOICE && code == CBN_SELCHANGE) OnLayoutChoice();
    else if (id == IDC_BROWSE && code == BN_CLICKED) Browse();
    else if (id == IDC_MAKE_FOLDER && code == BN_CLICKED) MakeFolder();
    else if (id == IDOK && code == BN_CLICKED) Save();
    else if (id == IDCANCEL) EndDialog(m_dialog, IDCANCEL);
}

// A common layout shows its pattern, not to be typed over; "a pattern of my own" starts from it.
void SettingsDialog::OnLayoutChoice() {
    const int index = static_cast<int>(SendDlgItemMessageW(m_dialog, IDC_LAYOUT_CHOICE, CB_GETCURSEL, 0, 0));
    const bool own = index == SettingsChoice::kOwnPattern;
    SendDlgItemMessageW(m_dialog, IDC_LAYOUT, EM_SETREADONLY, !own, 0);
    if (!own) SetText(m_dialog, IDC_LAYOUT, SettingsChoice::LayoutOf(index, L""));
    Update();
}

void SettingsDialog::Browse() {
    ComPtr<IFileOpenDialog> picker;
    if (FAILED(CoCreateInstance(CLSID_FileOpenDialog, nullptr, CLSCTX_INPROC_SERVER, IID_IFileOpenDialog,
                                picker.PutVoid())))
        return;
    FILEOPENDIALOGOPTIONS options = 0;
    picker->GetOptions(&options);
    picker->SetOptions(options | FOS_PICKFOLDERS | FOS_FORCEFILESYSTEM | FOS_PATHMUSTEXIST);
    picker->SetTitle(L"Folder for the receivers' files");
    ComPtr<IShellItem> start;
    const std::wstring target = SettingsChoice::TrimmedTarget(Text(IDC_TARGET));
    if (!target.empty() && SUCCEEDED(SHCreateItemFromParsingName(target.c_str(), nullptr, IID_IShellItem, start.PutVoid())))
        picker->SetFolder(start.Get());
    ComPtr<IShellItem> chosen;
    if (FAILED(picker->Show(m_dialog)) || FAILED(picker->GetResult(&chosen))) return;
    PWSTR path = nullptr;
    if (FAILED(chosen->GetDisplayName(SIGDN_FILESYSPATH, &path))) return;
    SetText(m_dialog, IDC_TARGET, path);
    CoTaskMemFree(path);
}

void SettingsDialog::MakeFolder() {
    const std::wstring target = SettingsChoice::TrimmedTarget(Text(IDC_TARGET));
    const int result = SHCreateDirectoryExW(m_dialog, target.c_str(), nullptr);
    Update();
    if (result != ERROR_SUCCESS && result != ERROR_ALREADY_EXISTS)
        SetText(m_dialog, IDC_TARGET_PROBLEM, L"This folder cannot be made (error " + std::to_wstring(result) + L").");
}

void SettingsDialog::Save() {
    Update();
    if (!IsWindowEnabled(GetDlgItem(m_dialog, IDOK))) return;
    const FetchSettings choice = Choice();
    std::wstring error;
    if (!SaveFetchSettings(choice, error)) return SetText(m_dialog, IDC_TARGET_PROBLEM, error);
    m_settings = choice;
    EndDialog(m_dialog, IDOK);
}

void SettingsDialog::Update() {
    std::wstring problem, example;
    const SettingsChoice::Target target = SettingsChoice::CheckTarget(Text(IDC_TARGET), problem);
    SetText(m_dialog, IDC_TARGET_PROBLEM, problem);
    ShowWindow(GetDlgItem(m_dialog, IDC_MAKE_FOLDER), target == SettingsChoice::Target::Missing ? SW_SHOW : SW_HIDE);
    SYSTEMTIME today;
    GetLocalTime(&today);
    const bool layoutFine = SettingsChoice::Example(Text(IDC_TARGET), Choice().layout, m_connected, today, example);
    SetText(m_dialog, IDC_LAYOUT_EXAMPLE, layoutFine ? example : L"This pattern cannot be used: " + example);
    EnableWindow(GetDlgItem(m_dialog, IDOK), target == SettingsChoice::Target::Fine && layoutFine);
}

std::wstring SettingsDialog::Text(int id) const {
    const HWND control = GetDlgItem(m_dialog, id);
    std::wstring text(static_cast<size_t>(GetWindowTextLengthW(control)) + 1, L'\0');
    text.resize(static_cast<size_t>(GetWindowTextW(control, &text[0], static_cast<int>(text.size()))));
    return text;
}

FetchSettings SettingsDialog::Choice() const {
    FetchSettings choice;
    choice.target = SettingsChoice::TrimmedTarget(Text(IDC_TARGET));
    const int index = static_cast<int>(SendDlgItemMessageW(m_dialog, IDC_LAYOUT_CHOICE, CB_GETCURSEL, 0, 0));
    choice.layout = SettingsChoice::LayoutOf(index, Text(IDC_LAYOUT));
    choice.move = IsDlgButtonChecked(m_dialog, IDC_MOVE) == BST_CHECKED;
    choice.notify = IsDlgButtonChecked(m_dialog, IDC_NOTIFY) == BST_CHECKED;
    choice.startAtLogon = IsDlgButtonChecked(m_dialog, IDC_START_AT_LOGON) == BST_CHECKED;
    return choice;
}
