// End to end copy out of receivers: files pasted by calvex-paste in its own process must arrive byte-identical with their times; slow, cancelled, failing and dying downloads must show progress, end with the right answer, show one error box, never hang and leave no file behind.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include "com/ComPtr.h"
#include "folder/IReceiversShellFolderImpl.h"
#include "module/ClassCreators.h"
#include "module/ModuleApp.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"
#include "transfer/CCalvexReceiversDataObject.h"

using namespace testsupport;

namespace {
struct ToolRun {
    DWORD exitCode = WAIT_TIMEOUT;
    std::string output;
    int Count(const std::string& text) const {
        int count = 0;
        for (size_t at = output.find(text); at != std::string::npos; at = output.find(text, at + 1)) ++count;
        return count;
    }
};

// Runs calvex-paste with its output in a file, pumping this thread's messages meanwhile: the
// tool's GetData calls come into this thread, and the download dialogs run here.
ToolRun RunPaste(const std::wstring& arguments, DWORD timeoutMs = 90000) {
    wchar_t dir[MAX_PATH];
    GetTempPathW(MAX_PATH, dir);
    const std::wstring outputPath = std::wstring(dir) + L"calvex-paste-output.txt";
    SECURITY_ATTRIBUTES inherit = {sizeof(inherit), nullptr, TRUE};
    HANDLE output = CreateFileW(outputPath.c_str(), GENERIC_WRITE, FILE_SHARE_READ, &inherit, CREATE_ALWAYS, 0, nullptr);
    STARTUPINFOW startup = {sizeof(startup)};
    startup.dwFlags = STARTF_USESTDHANDLES;
    startup.hStdOutput = startup.hStdError = output;
    PROCESS_INFORMATION process = {};
    std::wstring commandLine = L"\"" + BuildDir() + L"\\calvex-paste.exe\" " + arguments;
    ToolRun run;
    const BOOL started = CreateProcessW(nullptr, &commandLine[0], nullptr, nullptr, TRUE, 0, nullptr, nullptr, &startup,
                                        &process);
    CloseHandle(output);
    if (!started) return run;
    CloseHandle(process.hThread);
    if (PumpUntil([&] { return WaitForSingleObject(process.hProcess, 0) == WAIT_OBJECT_0; }, timeoutMs))
        GetExitCodeProcess(process.hProcess, &run.exitCode);
    else
        TerminateProcess(process.hProcess, 99);
    CloseHandle(process.hProcess);
    run.output = ReadFileBytes(outputPath);
    return run;
}

// What a timer of this thread sees of the download dialog while it runs.
struct DialogWatch {
    std::vector<int> positions;
    std::vector<std::wstring> texts;
    bool cancelOnProgress = false;
    bool pressedEnter = false;
    int cancels = 0;
} g_watch;

BOOL CALLBACK FindProgressDialog(HWND window, LPARAM found) {
    if (!GetDlgItem(window, 212) || !IsWindowVisible(window)) return TRUE;
    *reinterpret_cast<HWND*>(found) = window;
    return FALSE;
}

void CALLBACK WatchDialog(HWND, UINT, UINT_PTR, DWORD) {
    HWND dialog = nullptr;
    EnumThreadWindows(GetCurrentThreadId(), FindProgressDialog, reinterpret_cast<LPARAM>(&dialog));
    if (!dialog) return;
    const int position = static_cast<int>(SendDlgItemMessageW(dialog, 212, PBM_GETPOS, 0, 0));
    wchar_t text[256] = L"";
    GetDlgItemTextW(dialog, 211, text, 256);
    if (g_watch.positions.empty() || g_watch.positions.back() != position) {
        g_watch.positions.push_back(position);
        g_watch.texts.push_back(text);
    }
    if (!g_watch.pressedEnter) {
        g_watch.pressedEnter = true;
        PostMessageW(dialog, WM_COMMAND, IDOK, 0);  // Enter must not close it
    }
    if (g_watch.cancelOnProgress && position > 0 && g_watch.cancels == 0) {
        ++g_watch.cancels;
        PostMessageW(dialog, WM_COMMAND, IDCANCEL, 0);
    }
}

std::wstring ListedName(IShellFolder* folder, LPCITEMIDLIST item) {
    STRRET name = {};
    if (FAILED(folder->GetDisplayNameOf(item, SHGDN_INFOLDER | SHGDN_FORPARSING, &name)) || name.uType != STRRET_WSTR)
        return std::wstring();
    std::wstring text = name.pOleStr;
    CoTaskMemFree(name.pOleStr);
    return text;
}

std::vector<LPITEMIDLIST> Enumerate(IShellFolder* folder, SHCONTF flags) {
    std::vector<LPITEMIDLIST> items;
    ComPtr<IEnumIDList> enumerator;
    folder->EnumObjects(nullptr, flags, &enumerator);
    LPITEMIDLIST item = nullptr;
    while (enumerator && enumerator->Next(1, &item, nullptr) == S_OK) items.push_back(item);
    return items;
}

FILETIME DeviceTime(WORD year, WORD month, WORD day, WORD hour, WORD minute, WORD second) {
    SYSTEMTIME time = {year, month, 0, day, hour, minute, second, 0};
    FILETIME file = {};
    SystemTimeToFileTime(&time, &file);
    return file;
}

class TransferPasteTest : public testing::Test {
protected:
    static void SetUpTestSuite() {
        ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized());
        ASSERT_TRUE(SUCCEEDED(OleInitialize(nullptr)));  // the clipboard needs OLE on this thread
    }
    void SetUp() override {
        g_watch = DialogWatch();
        AddReceiver(L"Calvex A", L"1000-0001", {L"[Times]", L"LOG0001=2026-11-03 07:58:12", L"BIG=2025-01-31 23:59:59"});
        tree.AddFile(L"Calvex A", L"EMPTY", std::string());
        tree.AddFile(L"Calvex A", L"LOG0001", std::string("hello"));
        tree.AddFile(L"Calvex A", L"BIG", 6u << 20);
        AddReceiver(L"Calvex B", L"1000-0002", {L"[Transfer]", L"Rate=40000"});
        tree.AddFile(L"Calvex B", L"SLOW", 120000);
        AddReceiver(L"Calvex C", L"1000-0003", {L"[Transfer]", L"Rate=100000", L"FailAtPercent=50", L"FailResult=0x8007001F"});
        tree.AddFile(L"Calvex C", L"FAILS", 200000);
        AddReceiver(L"Calvex D", L"1000-0004", {L"[Transfer]", L"Rate=50000", L"ExitAtPercent=50"});
        tree.AddFile(L"Calvex D", L"DIES", 200000);
        AddReceiver(L"Calvex E", L"1000-0005", {L"[Fail]", L"IReceiverFile.Download=0x80070005"});
        tree.AddFile(L"Calvex E", L"REFUSED", 1000);
        AddReceiver(L"Calvex F", L"1000-0006", {L"[Transfer]", L"Rate=100000", L"FailAtPercent=50", L"FailResult=1"});
        tree.AddFile(L"Calvex F", L"ODD", 200000);
        scope.reset(new DeviceSimScope(tree.Root()));
        timer = SetTimer(nullptr, 0, 40, WatchDialog);
    }
    void TearDown() override {
        KillTimer(nullptr, timer);
        OleSetClipboard(nullptr);
        data.Reset();
        receiver.Reset();
        root.Reset();
        scope.reset();
    }
    void AddReceiver(const wchar_t* folder, const wchar_t* serial, std::vector<std::wstring> lines) {
        ReceiverSetup setup;
        setup.folder = folder;
        setup.serialNumber = serial;
        setup.extraLines = std::move(lines);
        tree.AddReceiver(setup);
    }

    // The folder's data object for the first name, with the other names added to it.
    void Select(const std::wstring& serial, const std::vector<std::wstring>& names) {
        ASSERT_EQ(S_OK, CreateCalvexReceiversShellFolder(nullptr, IID_IShellFolder, root.PutVoid()));
        ComPtr<IPersistFolder> persist;
        root.QueryTo(IID_IPersistFolder, persist.PutVoid());
        ASSERT_EQ(S_OK, persist->Initialize(nullptr));
        for (LPITEMIDLIST item : Enumerate(root.Get(), SHCONTF_FOLDERS)) {
            if (ListedName(root.Get(), item).rfind(serial + L"!", 0) == 0)
                root->BindToObject(item, nullptr, IID_IShellFolder, receiver.PutVoid());
            CoTaskMemFree(item);
        }
        ASSERT_TRUE(receiver) << "receiver " << Narrow(serial);
        std::vector<LPITEMIDLIST> files = Enumerate(receiver.Get(), SHCONTF_NONFOLDERS);
        CReceiversPidlMgr mgr;
        UniquePidl parent;
        for (const std::wstring& name : names) {
            for (LPITEMIDLIST item : files) {
                if (ListedName(receiver.Get(), item) != name) continue;
                if (!data) {
                    ASSERT_EQ(S_OK, receiver->GetUIObjectOf(nullptr, 1, const_cast<LPCITEMIDLIST*>(&item),
                                                            IID_IDataObject, nullptr, data.PutVoid()));
                    parent = FolderList(mgr);
                } else {
                    UniquePidl absolute(mgr, mgr.Concatenate(parent.Get(), item));
                    auto* impl = static_cast<IReceiversShellFolderImpl*>(static_cast<IShellFolder2*>(receiver.Get()));
                    static_cast<CCalvexReceiversDataObject*>(data.Get())->AddPidl(absolute.Get(), impl->EventSourceCollection());
                }
            }
        }
        for (LPITEMIDLIST item : files) CoTaskMemFree(item);
        ASSERT_TRUE(data);
        ASSERT_EQ(names.size(), static_cast<CCalvexReceiversDataObject*>(data.Get())->ItemCount());
    }
    // The parent list of the "Shell IDList Array": the folder's own absolute list.
    UniquePidl FolderList(CReceiversPidlMgr& mgr) {
        FORMATETC format = {static_cast<CLIPFORMAT>(RegisterClipboardFormatW(CFSTR_SHELLIDLIST)), nullptr,
                            DVASPECT_CONTENT, -1, TYMED_HGLOBAL};
        STGMEDIUM medium = {};
        EXPECT_EQ(S_OK, data->GetData(&format, &medium));
        auto* bytes = static_cast<BYTE*>(GlobalLock(medium.hGlobal));
        UniquePidl list(mgr, mgr.Copy(reinterpret_cast<LPCITEMIDLIST>(bytes + reinterpret_cast<CIDA*>(bytes)->aoffset[0])));
        GlobalUnlock(medium.hGlobal);
        ReleaseStgMedium(&medium);
        return list;
    }
    ToolRun PasteThroughClipboard() {
        EXPECT_EQ(S_OK, OleSetClipboard(data.Get()));
        return RunPaste(L"\"" + target.Path() + L"\"");
    }
    bool TargetIsEmpty() const {
        WIN32_FIND_DATAW found;
        HANDLE search = FindFirstFileW((target.Path() + L"\\*").c_str(), &found);
        bool empty = true;
        if (search == INVALID_HANDLE_VALUE) return true;
        do empty = empty && (found.cFileName[0] == L'.');
        while (FindNextFileW(search, &found));
        FindClose(search);
        return empty;
    }

    ReceiverTree tree;
    TempDirectory target{L"calvex-paste-target"};
    std::unique_ptr<DeviceSimScope> scope;
    ComPtr<IShellFolder> root, receiver;
    ComPtr<IDataObject> data;
    UINT_PTR timer = 0;
};

TEST_F(TransferPasteTest, CopyPasteDeliversFilesByteIdenticalWithTheirTimes) {
    Select(L"1000-0001", {L"EMPTY.qpr", L"LOG0001.qpr", L"BIG.qpr"});
    const ToolRun run = PasteThroughClipboard();
    EXPECT_EQ(0u, run.exitCode) << run.output;
    EXPECT_EQ(3, run.Count("copied ")) << run.output;
    EXPECT_EQ(0, run.Count("message box:")) << run.output;
    const struct {
        const wchar_t* name;
        const wchar_t* source;
        bool timed;
        FILETIME time;
    } files[] = {
        {L"EMPTY.qpr", L"EMPTY", false, {}},
        {L"LOG0001.qpr", L"LOG0001", true, DeviceTime(2026, 11, 3, 7, 58, 12)},
        {L"BIG.qpr", L"BIG", true, DeviceTime(2025, 1, 31, 23, 59, 59)},
    };
    for (const auto& f : files) {
        SCOPED_TRACE(Narrow(f.name));
        const std::wstring path = target.Path() + L"\\" + f.name;
        ASSERT_TRUE(FileExists(path));
        EXPECT_TRUE(ReadFileBytes(path) == ReadFileBytes(tree.FolderPath(L"Calvex A") + L"\\" + f.source));
        if (!f.timed) continue;
        WIN32_FILE_ATTRIBUTE_DATA attributes = {};
        GetFileAttributesExW(path.c_str(), GetFileExInfoStandard, &attributes);
        EXPECT_EQ(0, CompareFileTime(&f.time, &attributes.ftLastWriteTime));
    }
    EXPECT_FALSE(FileExists(target.Path() + L"\\BIG.qpr.calvex-partial"));
    EXPECT_EQ(6u << 20, ReadFileBytes(target.Path() + L"\\BIG.qpr").size());
}

// Three seconds at this rate: the dialog's liveness check runs and must leave a living server alone.
TEST_F(TransferPasteTest, SlowReceiverShowsRisingPercentagesAndEnterDoesNotClose) {
    Select(L"1000-0002", {L"SLOW.qpr"});
    const ToolRun run = PasteThroughClipboard();
    EXPECT_EQ(0u, run.exitCode) << run.output;
    ASSERT_TRUE(FileExists(target.Path() + L"\\SLOW.qpr"));
    EXPECT_TRUE(g_watch.pressedEnter);
    ASSERT_GE(g_watch.positions.size(), 3u) << "the dialog was seen moving";
    for (size_t i = 1; i < g_watch.positions.size(); ++i) EXPECT_GT(g_watch.positions[i], g_watch.positions[i - 1]);
    const size_t last = g_watch.texts.size() - 1;
    EXPECT_EQ(L"Downloading file SLOW.qpr, " + std::to_wstring(g_watch.positions[last]) + L"% completed",
              g_watch.texts[last]);
    EXPECT_TRUE(TraceContains("CProgressDialogMFC::OnInitial\r\n"));
}

TEST_F(TransferPasteTest, OutcomesThatLeaveNoFile) {
    const struct {
        const char* name;
        const wchar_t* serial;
        const wchar_t* file;
        bool cancel;
        int boxes;
        bool progress;
        const char* traceLine;
    } cases[] = {
        {"cancel", L"1000-0002", L"SLOW.qpr", true, 1, true, "CProgressDialogMFC::OnCancel\r\n"},
        {"fails at 50%", L"1000-0003", L"FAILS.qpr", false, 1, true, "CProgressDialogMFC::OnFileFinish\n"},
        {"start refused", L"1000-0005", L"REFUSED.qpr", false, 1, false, "CProgressDialogMFC::StartFileDownload\r\n"},
        {"finish with S_FALSE is silent", L"1000-0006", L"ODD.qpr", false, 0, true, "CProgressDialogMFC::OnFileFinish\n"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        g_watch = DialogWatch();
        g_watch.cancelOnProgress = c.cancel;
        data.Reset();
        Select(c.serial, {c.file});
        const DWORD started = GetTickCount();
        const ToolRun run = PasteThroughClipboard();
        EXPECT_EQ(1u, run.exitCode) << run.output;
        EXPECT_EQ(c.boxes, run.Count("message box:")) << run.output;
        EXPECT_EQ(c.progress, !g_watch.positions.empty() && g_watch.positions.back() > 0);
        EXPECT_EQ(1, run.Count("no contents (0x00000001)")) << "FileContents gave S_FALSE\n" << run.output;
        EXPECT_TRUE(TargetIsEmpty());
        EXPECT_TRUE(TraceContains(c.traceLine));
        if (c.cancel) {
            EXPECT_LT(GetTickCount() - started, 8000u) << "the cancel ended the download early";
        }
    }
}

// Last: the server ends itself mid-download.
TEST_F(TransferPasteTest, KilledServerEndsTheDialogWithAnError) {
    Select(L"1000-0004", {L"DIES.qpr"});
    const DWORD started = GetTickCount();
    const ToolRun run = PasteThroughClipboard();
    EXPECT_EQ(1u, run.exitCode) << run.output;
    EXPECT_EQ(1, run.Count("message box:")) << run.output;
    EXPECT_LT(GetTickCount() - started, 30000u) << "no hang";
    EXPECT_TRUE(TargetIsEmpty());
    EXPECT_TRUE(TraceContains("CProgressDialogMFC::OnLivenessTimer"));
}
}  // namespace
