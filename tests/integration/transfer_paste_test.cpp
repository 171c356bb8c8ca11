// End to end copy out of receivers: files pasted by calvex-paste in its own process must arrive byte-identical; slow, cancelled, failing and dying downloads must show rising progress, end with the right answer, show one error box, never hang and leave no file behind.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "module/ModuleApp.h"
#include "support/DeviceSim.h"
#include "support/ViewHost.h"
#include "items/CReceiversPidlMgr.h"

using namespace testsupport;

namespace {
using Texts = std::vector<std::wstring>;

// Receivers by serial number (also their folder's name), their description lines and files.
const struct { const wchar_t* serial; Texts lines; std::vector<std::pair<const wchar_t*, size_t>> files; } kDevices[] = {
    {L"1000-0002", {L"[Transfer]", L"Rate=40000"}, {{L"SLOW", 120000}}},
    {L"1000-0003", {L"[Transfer]", L"Rate=100000", L"FailAtPercent=50", L"FailResult=0x8007001F"},
     {{L"FAILS", 200000}}},
    {L"1000-0004", {L"[Transfer]", L"Rate=50000", L"ExitAtPercent=50"}, {{L"DIES", 200000}}},
    {L"1000-0005", {L"[Fail]", L"IReceiverFile.Download=0x80070005"}, {{L"REFUSED", 1000}}},
    {L"1000-0006", {L"[Transfer]", L"Rate=100000", L"FailAtPercent=50", L"FailResult=1"}, {{L"ODD", 200000}}},
};

int Count(const std::string& text, const std::string& part) {
    int count = 0;
    for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) ++count;
    return count;
}

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
        // Last: the server ends itself mid-download.
        {"killed server", L"1000-0004", L"DIES.qpr", false, true, false, 1, 30000, "OnLivenessTimer"},
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
        EXPECT_EQ(c.boxes, Count(output, "message box:")) << output;
        EXPECT_EQ(c.arrives ? 0 : 1, Count(output, "no contents (0x00000001)")) << "FileContents: S_FALSE\n" << output;
        Texts left;
        for (const auto& entry : std::filesystem::directory_iterator(target.Path()))
            left.push_back(entry.path().filename());
        EXPECT_EQ(c.arrives ? Texts{c.file} : Texts{}, left) << "nothing partial left";
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
}  // namespace
