// End to end copy out of receivers: files pasted by calvex-paste in its own process must arrive byte-identical; the view's Copy of part of its rows must carry exactly those rows (descriptors, "Shell IDList Array", pasted files) with the device's times; slow, cancelled and failing downloads must show rising progress, end with the right answer, show one error box, never hang and leave no file behind.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <string>
#include <vector>

#include "module/ModuleApp.h"
#include "support/DeviceSim.h"
#include "support/ViewHost.h"
#include "com/Bstr.h"
#include "items/CReceiversPidlMgr.h"
#include "view/ViewCommands.h"
#include "VirtualFiles.h"

using namespace testsupport;

namespace {
using Texts = std::vector<std::wstring>;

// Receivers by serial number (also their folder's name), their description lines and files.
const struct { const wchar_t* serial; Texts lines; std::vector<std::pair<const wchar_t*, size_t>> files; } kDevices[] = {
    {L"1000-0002", {L"[Transfer]", L"Rate=40000"}, {{L"SLOW", 120000}}},
    {L"1000-0003", {L"[Transfer]", L"Rate=100000", L"FailAtPercent=50", L"FailResult=0x8007001F"},
     {{L"FAILS", 200000}}},
    {L"1000-0005", {L"[Fail]", L"IReceiverFile.Download=0x80070005"}, {{L"REFUSED", 1000}}},
    {L"1000-0006", {L"[Transfer]", L"Rate=100000", L"FailAtPercent=50", L"FailResult=1"}, {{L"ODD", 200000}}},
};

// What a timer of this thread sees of the download dialog while it runs.
struct DialogWatch {
    std::vector<int> positions;
    std::wstring lastText;
    bool cancelOnProgress = false, pressedEnter = false;
} g_watch;

void CALLBACK WatchDialog(HWND, UINT, UINT_PTR, DWORD) {
    const HWND dialog = GetActiveWindow();  // the modal dialog, not its error box
    if (!dialog || !GetDlgItem(dialog, 212)) return;
    const int position = static_cast<int>(SendDlgItemMessageW(dialog, 212, PBM_GETPOS, 0, 0));
    if (g_watch.positions.empty() || g_watch.positions.back() != position) {
        wchar_t text[256] = L"";
        GetDlgItemTextW(dialog, 211, text, 256);
        g_watch.positions.push_back(position);
        g_watch.lastText = text;
    }
    if (!g_watch.pressedEnter) {
        g_watch.pressedEnter = true;
        PostMessageW(dialog, WM_COMMAND, IDOK, 0);  // Enter must not close it
    }
    if (g_watch.cancelOnProgress && position > 0) {
        g_watch.cancelOnProgress = false;  // once
        PostMessageW(dialog, WM_COMMAND, IDCANCEL, 0);
    }
}

class TransferPasteTest : public testing::Test {
protected:
    void SetUp() override {
        ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized());
        ASSERT_TRUE(SUCCEEDED(OleInitialize(nullptr)));  // the clipboard needs OLE on this thread
        for (const auto& device : kDevices) {
            ReceiverSetup setup;
            setup.folder = setup.serialNumber = device.serial;
            setup.extraLines = device.lines;
            tree.AddReceiver(setup);
            for (const auto& file : device.files) tree.AddFile(device.serial, file.first, file.second);
        }
        timer = SetTimer(nullptr, 0, 40, WatchDialog);
    }
    void TearDown() override {
        KillTimer(nullptr, timer);
        OleSetClipboard(nullptr);
    }

    // The receiver folder's data object for one of its files, as Explorer asks for it.
    void Select(const std::wstring& serial, const std::wstring& name) {
        root = OurFolder(false);
        CReceiversPidlMgr mgr;
        for (const TaskPidl& item : ListItems(root.Get(), SHCONTF_FOLDERS))
            if (std::wstring(mgr.GetData(item.get())->name).rfind(serial + L"!", 0) == 0)
                root->BindToObject(item.get(), nullptr, IID_IShellFolder, receiver.PutVoid());
        ASSERT_TRUE(receiver) << "receiver " << Narrow(serial);
        for (const TaskPidl& item : ListItems(receiver.Get(), SHCONTF_NONFOLDERS)) {
            LPCITEMIDLIST child = item.get();
            if (mgr.GetData(child)->name == name) {
                ASSERT_EQ(S_OK, receiver->GetUIObjectOf(nullptr, 1, &child, IID_IDataObject, nullptr, data.PutVoid()));
            }
        }
        ASSERT_TRUE(data) << Narrow(name);
    }

    ReceiverTree tree;
    DeviceSimScope scope{tree.Root()};  // the tree is filled before the first client starts the server
    ComPtr<IShellFolder> root, receiver;
    ComPtr<IDataObject> data;
    UINT_PTR timer = 0;
};

TEST_F(TransferPasteTest, OneFileOutcomes) {
    const struct { const char* name; const wchar_t *serial, *file; bool cancel, progress, arrives; int boxes;
                   DWORD withinMs; const char* dialogTrace; } cases[] = {
        // Three seconds at this rate: the dialog's liveness check runs and leaves a living server alone.
        {"slow", L"1000-0002", L"SLOW.qpr", false, true, true, 0, 30000, "OnInitial\r\n"},
        {"cancel", L"1000-0002", L"SLOW.qpr", true, true, false, 1, 8000, "OnCancel\r\n"},
        {"fails at 50%", L"1000-0003", L"FAILS.qpr", false, true, false, 1, 30000, "OnFileFinish\n"},
        {"start refused", L"1000-0005", L"REFUSED.qpr", false, false, false, 1, 30000, "StartFileDownload\r\n"},
        {"finish with S_FALSE is silent", L"1000-0006", L"ODD.qpr", false, true, false, 0, 30000, "OnFileFinish\n"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        g_watch = DialogWatch();
        g_watch.cancelOnProgress = c.cancel;
        Select(c.serial, c.file);
        TempDirectory target(L"calvex-paste-target");
        ASSERT_EQ(S_OK, OleSetClipboard(data.Get()));
        // calvex-paste's GetData calls come into this thread, and the download dialogs run here.
        const DWORD started = GetTickCount();
        std::string output;
        const DWORD exitCode =
            RunProcess(L"\"" + BuildDir() + L"\\calvex-paste.exe\" \"" + target.Path() + L"\"", 90000, &output, &output);
        EXPECT_EQ(c.arrives ? 0u : 1u, exitCode) << output;
        EXPECT_LT(GetTickCount() - started, c.withinMs) << "no hang; a cancel ends the download early";
        EXPECT_EQ(c.boxes, CountOf(output, "message box:")) << output;
        EXPECT_EQ(c.arrives ? 0 : 1, CountOf(output, "no contents (0x00000001)")) << "FileContents: S_FALSE\n" << output;
        EXPECT_EQ(c.arrives ? Texts{c.file} : Texts{}, ListFiles(target.Path())) << "nothing partial left";
        EXPECT_TRUE(TraceContains(std::string("CProgressDialogMFC::") + c.dialogTrace));
        const std::vector<int>& seen = g_watch.positions;
        EXPECT_EQ(c.progress, !seen.empty() && seen.back() > 0);
        for (size_t i = 1; i < seen.size(); ++i) EXPECT_GT(seen[i], seen[i - 1]) << "rising";
        if (!c.arrives) continue;
        EXPECT_TRUE(g_watch.pressedEnter);
        EXPECT_GE(seen.size(), 3u) << "the dialog was seen moving";
        EXPECT_EQ(L"Downloading file " + std::wstring(c.file) + L", " + std::to_wstring(seen.back()) + L"% completed",
                  g_watch.lastText);
    }
}

// Copy of some rows of many (two, the last, rows apart): the descriptors, the "Shell IDList
// Array" and the files calvex-paste writes are exactly those rows in order, with the device's
// times (also in the Time column) on both sides of the zone's daylight saving change.
TEST_F(TransferPasteTest, CopyOfSomeRowsCarriesExactlyThoseRows) {
    ReceiverSetup setup;
    setup.folder = setup.serialNumber = L"1000-0001";  // listed first
    const std::wstring device = tree.AddReceiver(setup) + L"\\";
    std::map<std::wstring, SYSTEMTIME> local;  // by listed name: the time as the device reports it
    for (int i = 0; i < 12; ++i) {
        const std::wstring name = L"LOG" + std::to_wstring(10 + i);
        const SYSTEMTIME utc = {2026, WORD(10 + i % 2), 0, WORD(i % 2 ? 2 + i / 2 : 25 + i / 2), 15, 0, 0, 0};
        SetWriteTime(tree.AddFile(setup.folder, name, 100 + 37 * i), utc);
        SystemTimeToTzSpecificLocalTime(nullptr, &utc, &local[name + L".qpr"]);
    }
    TestBrowser browser;
    HostedView host(OurFolder(true), browser);
    ASSERT_EQ(12, host.Count());
    for (const std::vector<int>& rows : {std::vector<int>{3, 4}, {11}, {0, 5, 9}, {1, 2, 7, 10}}) {
        SCOPED_TRACE(testing::PrintToString(rows));
        ListView_SetItemState(host.list, -1, 0, LVIS_SELECTED);
        for (int row : rows) host.Select(row);
        host.Object()->OnCommand(ViewCommandCopy);
        ASSERT_EQ(S_OK, OleGetClipboard(&data));
        std::vector<FILEDESCRIPTORW> files;
        ASSERT_EQ(S_OK, ReadFileDescriptors(data.Get(), files));
        FORMATETC format = {static_cast<CLIPFORMAT>(RegisterClipboardFormatW(CFSTR_SHELLIDLIST)), nullptr, 1, -1, TYMED_HGLOBAL};
        STGMEDIUM medium = {};
        ASSERT_EQ(S_OK, data->GetData(&format, &medium));
        const auto* cida = static_cast<const CIDA*>(GlobalLock(medium.hGlobal));
        ASSERT_EQ(std::make_pair(rows.size(), rows.size()), std::make_pair(files.size(), size_t(cida->cidl)));
        Texts chosen;
        for (size_t i = 0; i < rows.size(); ++i) {
            wchar_t name[64] = L"", shown[64] = L"";
            ListView_GetItemText(host.list, rows[i], 0, name, 64);
            ListView_GetItemText(host.list, rows[i], 2, shown, 64);
            chosen.push_back(name);
            const auto child = reinterpret_cast<LPCITEMIDLIST>(reinterpret_cast<const BYTE*>(cida) + cida->aoffset[i + 1]);
            EXPECT_EQ(chosen.back(), CReceiversPidlMgr().GetData(child)->name);
            EXPECT_EQ(chosen.back(), files[i].cFileName);
            EXPECT_EQ(ReadFileBytes(device + chosen.back().substr(0, 5)).size(), files[i].nFileSizeLow);
            // The descriptor carries the device's clock as it stands.
            EXPECT_EQ(Ticks(local[name]), Ticks(files[i].ftLastWriteTime));
            DATE date = 0;
            Bstr text;
            SystemTimeToVariantTime(&local[name], &date);
            VarBstrFromDate(date, LOCALE_USER_DEFAULT, 0, text.Put());
            EXPECT_STREQ(text.Get(), shown) << "the Time column shows the device's time";
        }
        GlobalUnlock(medium.hGlobal);
        ReleaseStgMedium(&medium);
        data.Reset();
        TempDirectory target(L"calvex-paste-rows");
        EXPECT_EQ(0u, RunProcess(L"\"" + BuildDir() + L"\\calvex-paste.exe\" \"" + target.Path() + L"\""));
        const Texts pasted = ListFiles(target.Path());
        for (const std::wstring& name : pasted) {
            EXPECT_EQ(WriteTime(device + name.substr(0, 5)), WriteTime(target.Path() + L"\\" + name)) << "the device's time";
            EXPECT_EQ(ReadFileBytes(device + name.substr(0, 5)), ReadFileBytes(target.Path() + L"\\" + name));
        }
        std::sort(chosen.begin(), chosen.end());
        EXPECT_EQ(chosen, pasted) << "exactly the chosen rows";
    }
}
}  // namespace
