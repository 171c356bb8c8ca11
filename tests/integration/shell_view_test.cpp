// Guards the folder's view hosted in a browser of our own against the simulator: wrong cell texts, columns, status text, menus, command results, sort state, refresh paths and leaked windows.
#include <windows.h>
#include <commctrl.h>
#include <docobj.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <memory>
#include <thread>
#include <string>
#include <vector>

#include "com/ComPtr.h"
#include "com/ModuleLock.h"
#include "folder/IReceiversShellFolderImpl.h"
#include "module/ClassCreators.h"
#include "module/ModuleApp.h"
#include "module/ModuleState.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"
#include "support/ViewHost.h"
#include "view/CCalvexReceiversShellView.h"

using namespace testsupport;

namespace {
std::vector<std::pair<UINT, UINT>> MenuItems(HMENU menu) {  // id, state
    std::vector<std::pair<UINT, UINT>> items;
    for (int i = 0; i < GetMenuItemCount(menu); ++i) {
        MENUITEMINFOW item = {sizeof(item), MIIM_ID | MIIM_STATE | MIIM_FTYPE};
        GetMenuItemInfoW(menu, i, TRUE, &item);
        items.emplace_back((item.fType & MFT_SEPARATOR) ? 0u : item.wID, item.fState & (MFS_GRAYED | MFS_DEFAULT | MFS_CHECKED));
    }
    return items;
}

HMENU SubMenu(HMENU menu, UINT id) {
    MENUITEMINFOW item = {sizeof(item), MIIM_SUBMENU};
    GetMenuItemInfoW(menu, id, FALSE, &item);
    return item.hSubMenu;
}

size_t CountTrace(const std::string& line) {
    size_t count = 0;
    for (const std::string& message : TraceMessages()) count += message == line;
    return count;
}


// Runs action on this thread while another thread reads and closes every dialog titled
// title that it opens (a message box or the properties sheet); returns what was read.
std::vector<std::wstring> WithDialogsClosed(const wchar_t* title, const std::function<void()>& action,
                                            const std::function<std::wstring(HWND)>& read) {
    std::vector<std::wstring> seen;
    std::atomic<bool> done(false);
    std::thread closer([&] {
        HWND last = nullptr;
        while (!done) {
            HWND dialog = FindWindowW(L"#32770", title);
            if (dialog && dialog != last && IsWindowVisible(dialog)) {
                Sleep(200);  // let it finish initialising
                seen.push_back(read(dialog));
                last = dialog;
                PostMessageW(dialog, WM_COMMAND, IDCANCEL, 0);
                PostMessageW(dialog, WM_COMMAND, IDOK, 0);
            }
            Sleep(50);
        }
    });
    action();
    done = true;
    closer.join();
    return seen;
}

std::wstring ChildText(HWND parent, int id) {
    wchar_t text[260] = L"";
    GetWindowTextW(GetDlgItem(parent, id), text, 260);
    return text;
}

class ShellViewTest : public testing::Test {
protected:
    static void SetUpTestSuite() { ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized()); }
    void SetUp() override {
        ReceiverSetup setup;
        setup.folder = L"Calvex A";
        tree.AddReceiver(setup);
        setup.folder = L"Brennor A";
        setup.brand = 2;
        setup.serialNumber = L"2000-0001";
        tree.AddReceiver(setup);
        tree.AddFile(L"Calvex A", L"LOG0001", 100);
        tree.AddFile(L"Calvex A", L"LOG0002", 1536);
        tree.AddFile(L"Calvex A", L"LOG0003", 2048);
        scope.reset(new DeviceSimScope(tree.Root()));
        Display() = DisplayState();
    }
    void TearDown() override { scope.reset(); }
    ReceiverTree tree;
    std::unique_ptr<DeviceSimScope> scope;
};
}  // namespace

TEST_F(ShellViewTest, BothLevelsShowTheirColumnsItemsAndStatusText) {
    Display().NameColumnWidth = 120;
    Display().SecondColumnWidth = 170;
    ComPtr<IShellFolder> root = RootFolder();
    ComPtr<IShellFolder> receiver = FirstReceiver(root.Get());
    ASSERT_TRUE(receiver);
    TestBrowser browser(false);
    struct Case {
        const char* level;
        IShellFolder* folder;
        std::vector<std::pair<std::wstring, int>> columns;
        std::vector<std::wstring> firstRow;  // from column 1 on
        std::wstring status;
    } cases[] = {
        {"receivers", root.Get(), {{L"Name", 120}, {L"Serial number", 120}, {L"Model", 120}, {L"Port", 120}},
         {L"1000-0001", L"Q9 GNSS", L"USB"}, L"Calvex GNSS Receivers: Calvex Receivers"},
        {"files", receiver.Get(), {{L"Name", 120}, {L"Size", 120}, {L"Time", 170}}, {L"100 bytes"},
         L"Calvex GNSS Receivers: Calvex Receivers\\1000-0001!Q9 GNSS!USB"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.level);
        HostedView host(c.folder, browser);
        for (size_t i = 0; i < c.columns.size(); ++i) {
            int width = -1;
            EXPECT_EQ(c.columns[i].first, host.Header(static_cast<int>(i), &width));
            EXPECT_EQ(c.columns[i].second, width);
        }
        int unused = 0;
        EXPECT_EQ(L"<none>", host.Header(static_cast<int>(c.columns.size()), &unused));
        ASSERT_GE(host.Count(), 1);
        EXPECT_FALSE(host.Cell(0, 0).empty());
        for (size_t i = 0; i < c.firstRow.size(); ++i) EXPECT_EQ(c.firstRow[i], host.Cell(0, static_cast<int>(i + 1)));
        EXPECT_EQ(S_OK, host.view->UIActivate(SVUIA_ACTIVATE_NOFOCUS));
        EXPECT_EQ(c.status, browser.statusText);
    }
    HostedView files(receiver.Get(), browser);
    EXPECT_EQ(3, files.Count());
    EXPECT_EQ(L"1.5 KB", files.Cell(1, 1));
    EXPECT_EQ(L"2.0 KB", files.Cell(2, 1));
}

TEST_F(ShellViewTest, OnlyABrennorRootGetsTheBrennorStatusPrefix) {
    ComPtr<IShellFolder> root = RootFolder(true);
    ComPtr<IShellFolder> receiver = FirstReceiver(root.Get());
    ASSERT_TRUE(receiver);
    TestBrowser browser(false);
    const std::pair<IShellFolder*, const wchar_t*> cases[] = {
        {root.Get(), L"Brennor GNSS Receivers: Calvex Receivers"},  // both roots carry that name
        {receiver.Get(), L"Calvex GNSS Receivers: Calvex Receivers\\2000-0001!Q9 GNSS!USB"},
    };
    for (const auto& c : cases) {
        HostedView host(c.first, browser);
        host.view->UIActivate(SVUIA_ACTIVATE_FOCUS);
        EXPECT_EQ(c.second, browser.statusText);
    }
}

TEST_F(ShellViewTest, ModeComesFromOurPreviousViewElseFromTheStreamsFirstFourBytes) {
    ComPtr<IShellFolder> root = RootFolder();
    TestBrowser browser(false);
    HostedView first(root.Get(), browser, FVM_LIST);
    first.Object()->OnCommand(1284);  // small icons
    HostedView second(root.Get(), browser, FVM_DETAILS, first.view.Get());
    FOLDERSETTINGS settings = {};
    second.view->GetCurrentInfo(&settings);
    EXPECT_EQ(static_cast<UINT>(FVM_SMALLICON), settings.ViewMode);
    EXPECT_EQ(static_cast<DWORD>(LVS_SMALLICON), GetWindowLongW(second.list, GWL_STYLE) & LVS_TYPEMASK);

    // Another kind of previous view: the stream gives the mode, the flags stay ours.
    CreateStreamOnHGlobal(nullptr, TRUE, &browser.viewState);
    const DWORD saved[2] = {FVM_LIST, 0xFFFF};
    browser.viewState->Write(saved, sizeof(saved), nullptr);
    ComPtr<IShellView> foreign;
    ComPtr<IShellFolder> desktop;
    SHGetDesktopFolder(&desktop);
    desktop->CreateViewObject(browser.m_frame, IID_IShellView, foreign.PutVoid());
    ASSERT_TRUE(foreign);
    HostedView fourth(root.Get(), browser, FVM_DETAILS, foreign.Get());
    fourth.view->GetCurrentInfo(&settings);
    EXPECT_EQ(static_cast<UINT>(FVM_LIST), settings.ViewMode);
    EXPECT_EQ(0u, settings.fFlags);
    fourth.Object()->OnCommand(1283);
    EXPECT_EQ(S_OK, fourth.view->SaveViewState());
    DWORD stored[2] = {};
    LARGE_INTEGER zero = {};
    browser.viewState->Seek(zero, STREAM_SEEK_SET, nullptr);
    browser.viewState->Read(stored, sizeof(stored), nullptr);
    EXPECT_EQ(static_cast<DWORD>(FVM_ICON), stored[0]);
    EXPECT_EQ(0xFFFFu, stored[1]);
}

TEST_F(ShellViewTest, MenusAreMergedWithTheirPositionsAndStates) {
    ComPtr<IShellFolder> root = RootFolder();
    ComPtr<IShellFolder> receiver = FirstReceiver(root.Get());
    ASSERT_TRUE(receiver) << "the sample tree has a receiver";
    struct Case {
        const char* name;
        IShellFolder* folder;
        bool fileDialog;
        bool select;
        std::vector<std::pair<UINT, UINT>> file;
    } cases[] = {
        {"receivers", root.Get(), false, false, {{1289, MFS_DEFAULT | MFS_GRAYED}, {0, MFS_GRAYED}, {1287, MFS_GRAYED}}},
        {"receivers selected", root.Get(), false, true, {{1289, MFS_DEFAULT}, {0, MFS_GRAYED}, {1287, 0}}},
        {"files", receiver.Get(), false, false, {{1289, MFS_DEFAULT | MFS_GRAYED}, {1288, MFS_GRAYED}, {0, MFS_GRAYED}}},
        {"files in a file dialog", receiver.Get(), true, true, {{1289, MFS_DEFAULT}, {1288, 0}, {0, MFS_GRAYED}}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        TestBrowser browser(c.fileDialog);
        HostedView host(c.folder, browser);
        if (c.select) host.Select(0);
        host.view->UIActivate(SVUIA_ACTIVATE_FOCUS);
        ASSERT_TRUE(browser.lastMenu);
        HMENU file = SubMenu(browser.lastMenu, FCIDM_MENU_FILE);
        EXPECT_EQ(c.file, MenuItems(file));
        wchar_t text[64] = L"";
        GetMenuStringW(file, 1289, text, 64, MF_BYCOMMAND);
        EXPECT_STREQ(c.fileDialog ? L"Select" : L"Open", text);
        // Ours go before the browser's options separator, which stays last.
        std::vector<std::pair<UINT, UINT>> view = {{0, MFS_GRAYED}, {1283, 0}, {1284, 0}, {1285, 0}, {1286, MFS_CHECKED}};
        std::vector<std::pair<UINT, UINT>> merged = MenuItems(SubMenu(browser.lastMenu, FCIDM_MENU_VIEW));
        ASSERT_EQ(6u, merged.size());
        merged.pop_back();
        EXPECT_EQ(view, merged);
        const bool files = c.folder == receiver.Get();
        std::vector<std::pair<UINT, UINT>> edit;
        if (files) edit = {{0, MFS_GRAYED}, {1281, c.select ? 0u : MFS_GRAYED}};
        EXPECT_EQ(edit, MenuItems(SubMenu(browser.lastMenu, FCIDM_MENU_EDIT)));
    }
}

TEST_F(ShellViewTest, RightClickOnEmptySpaceAtFilesLevelHasCopyAndViewGroups) {
    ComPtr<IShellFolder> receiver = FirstReceiver(RootFolder().Get());
    TestBrowser browser(false);
    HostedView host(receiver.Get(), browser);
    UniqueMenu menu(host.Object()->BuildContextMenu());
    // No open group, and no separator ahead of "&Copy" in a menu that is still empty.
    std::vector<std::pair<UINT, UINT>> expected = {{1281, MFS_GRAYED}, {0, MFS_GRAYED}, {22, 0}, {1283, 0},
                                                   {1284, 0},          {1285, 0},       {1286, MFS_CHECKED}};
    EXPECT_EQ(expected, MenuItems(menu.Get()));
}

TEST_F(ShellViewTest, CommandTargetAnswersAcceptedGroupsAndExecutesEveryGroup) {
    ComPtr<IShellFolder> root = RootFolder();
    TestBrowser browser(false);
    HostedView host(root.Get(), browser);
    ComPtr<IOleCommandTarget> target;
    host.view.QueryTo(IID_IOleCommandTarget, target.PutVoid());
    const GUID unknown = {0x12345678, 0, 0, {0, 0, 0, 0, 0, 0, 0, 1}};
    const GUID calvex = {0xE102076F, 0x4057, 0x4E7F, {0x82, 0x09, 0x51, 0x12, 0x58, 0xF1, 0x2B, 0x62}};
    struct Case {
        const GUID* group;
        HRESULT expected;
    } cases[] = {{nullptr, S_OK}, {&calvex, S_OK}, {&CGID_Explorer, S_OK}, {&CGID_ShellDocView, S_OK},
                 {&unknown, OLECMDERR_E_UNKNOWNGROUP}};
    for (const Case& c : cases) {
        OLECMD commands[] = {{10, 7}, {12, 7}, {22, 7}, {11, 7}};
        EXPECT_EQ(c.expected, target->QueryStatus(c.group, 4, commands, nullptr));
        const DWORD on = c.expected == S_OK ? OLECMDF_SUPPORTED | OLECMDF_ENABLED : 7;
        EXPECT_EQ(on, commands[0].cmdf);
        EXPECT_EQ(on, commands[2].cmdf);
        EXPECT_EQ(c.expected == S_OK ? 0u : 7u, commands[3].cmdf);
    }
    EXPECT_EQ(E_POINTER, target->QueryStatus(nullptr, 1, nullptr, nullptr));
    const size_t before = CountTrace("CCalvexReceiversShellView::Refresh\r\n");
    EXPECT_EQ(S_OK, target->Exec(&unknown, 22, 0, nullptr, nullptr));
    EXPECT_EQ(before + 1, CountTrace("CCalvexReceiversShellView::Refresh\r\n"));
}

TEST_F(ShellViewTest, ColumnClicksShareOneSortStateAcrossViews) {
    ComPtr<IShellFolder> receiver = FirstReceiver(RootFolder().Get());
    TestBrowser browser(false);
    HostedView first(receiver.Get(), browser), second(receiver.Get(), browser);
    auto click = [](HostedView& host, int column) {
        NMLISTVIEW notify = {};
        notify.hdr.hwndFrom = host.list;
        notify.hdr.idFrom = 2000;
        notify.hdr.code = LVN_COLUMNCLICK;
        notify.iSubItem = column;
        SendMessageW(host.window, WM_NOTIFY, 2000, reinterpret_cast<LPARAM>(&notify));
        return host.Cell(0, 0);
    };
    EXPECT_EQ(L"LOG0003.qpr", click(first, 0));  // the first Name click sorts descending
    EXPECT_EQ(L"LOG0001.qpr", click(second, 0));  // the other view's click alternates
    EXPECT_EQ(1, Display().SortDirection);
    EXPECT_EQ(L"LOG0001.qpr", click(first, 1));  // a new column keeps the direction: smallest first
    EXPECT_EQ(L"LOG0003.qpr", click(first, 1));
}

TEST_F(ShellViewTest, EndTrackStoresFirstAndSecondColumnWidths) {
    ComPtr<IShellFolder> receiver = FirstReceiver(RootFolder().Get());
    TestBrowser browser(false);
    HostedView host(receiver.Get(), browser);
    SendMessageW(host.list, LVM_SETCOLUMNWIDTH, 0, 90);
    SendMessageW(host.list, LVM_SETCOLUMNWIDTH, 1, 140);
    SendMessageW(host.list, LVM_SETCOLUMNWIDTH, 2, 33);
    NMHEADERW notify = {};
    notify.hdr.code = HDN_ENDTRACKW;
    SendMessageW(host.window, WM_NOTIFY, 0, reinterpret_cast<LPARAM>(&notify));
    EXPECT_EQ(90, Display().NameColumnWidth);
    EXPECT_EQ(140, Display().SecondColumnWidth);  // "Size" gives "Time" its width
}

TEST_F(ShellViewTest, DeletingThreeFilesRefreshesThreeTimesAndOpenBrowsesRelative) {
    ComPtr<IShellFolder> root = RootFolder();
    TestBrowser browser(false);
    {
        HostedView receivers(root.Get(), browser);
        receivers.Select(0);
        receivers.Object()->OnCommand(1289);
        EXPECT_EQ(std::vector<UINT>{SBSP_RELATIVE}, browser.browseFlags);
    }
    ComPtr<IShellFolder> receiver = FirstReceiver(root.Get());
    HostedView host(receiver.Get(), browser);
    ASSERT_EQ(3, host.Count());
    host.Select(-1);
    const size_t before = CountTrace("CCalvexReceiversShellView::Refresh\r\n");
    host.Object()->OnCommand(1288);
    EXPECT_EQ(before + 3, CountTrace("CCalvexReceiversShellView::Refresh\r\n"));
    EXPECT_EQ(0, host.Count());
    EXPECT_FALSE(FileExists(tree.FolderPath(L"Calvex A") + L"\\LOG0002.qpr"));
}

TEST_F(ShellViewTest, FolderMessageRefillsTheListAfterTheTreeChanges) {
    ComPtr<IShellFolder> receiver = FirstReceiver(RootFolder().Get());
    TestBrowser browser(false);
    HostedView host(receiver.Get(), browser);
    ASSERT_EQ(3, host.Count());
    tree.AddFile(L"Calvex A", L"LOG0004", 10);
    EXPECT_TRUE(PumpUntil([&] { return host.Count() == 4; }, 8000));
    tree.RemoveFile(L"Calvex A", L"LOG0001");
    EXPECT_TRUE(PumpUntil([&] { return host.Count() == 3; }, 8000));
}

TEST_F(ShellViewTest, ManyViewsLeaveNoWindowGdiObjectOrLockBehind) {
    ComPtr<IShellFolder> root = RootFolder();
    TestBrowser browser(false);
    { HostedView warmUp(root.Get(), browser); }
    const DWORD gdi = GetGuiResources(GetCurrentProcess(), GR_GDIOBJECTS);
    const LONG locks = ModuleLock::Count();
    for (int i = 0; i < 200; ++i) {
        HostedView host(root.Get(), browser);
        host.view->UIActivate(SVUIA_ACTIVATE_FOCUS);
    }
    EXPECT_EQ(nullptr, FindWindowExW(browser.m_frame, nullptr, L"CalvexReceiversViewNSClass", nullptr));
    EXPECT_LE(GetGuiResources(GetCurrentProcess(), GR_GDIOBJECTS), gdi + 5);
    EXPECT_EQ(locks, ModuleLock::Count());
}

TEST_F(ShellViewTest, RefusedDeleteShowsOneBoxPerFileAndGoesOn) {
    SetDeviceSimCallFailure(L"IReceiverFile.Delete", E_ACCESSDENIED);
    ComPtr<IShellFolder> receiver = FirstReceiver(RootFolder().Get());
    TestBrowser browser(false);
    HostedView host(receiver.Get(), browser);
    ASSERT_EQ(3, host.Count());
    host.Select(0);
    host.Select(2);
    const size_t before = CountTrace("CCalvexReceiversShellView::Refresh\r\n");
    std::vector<std::wstring> boxes = WithDialogsClosed(
        L"Delete", [&] { host.Object()->OnCommand(1288); }, [](HWND box) { return ChildText(box, 0xFFFF); });
    ASSERT_EQ(2u, boxes.size());
    EXPECT_FALSE(boxes[0].empty());  // the system's text for the refusal
    EXPECT_EQ(before + 2, CountTrace("CCalvexReceiversShellView::Refresh\r\n"));
    EXPECT_EQ(3, host.Count());
}

TEST_F(ShellViewTest, PropertiesOpenOneSheetWithTheReceiversTexts) {
    ComPtr<IShellFolder> root = RootFolder();
    TestBrowser browser(false);
    HostedView host(root.Get(), browser);
    host.Select(0);
    std::vector<std::wstring> sheets = WithDialogsClosed(
        L"Properties", [&] { host.Object()->OnCommand(1287); },
        [](HWND sheet) {
            HWND tabs = reinterpret_cast<HWND>(SendMessageW(sheet, PSM_GETTABCONTROL, 0, 0));
            wchar_t tab[64] = L"";
            TCITEMW item = {TCIF_TEXT};
            item.pszText = tab;
            item.cchTextMax = 64;
            SendMessageW(tabs, TCM_GETITEMW, 0, reinterpret_cast<LPARAM>(&item));
            HWND page = reinterpret_cast<HWND>(SendMessageW(sheet, PSM_GETCURRENTPAGEHWND, 0, 0));
            std::wstring texts = tab;
            const int ids[] = {1015, 261, 1016, 262, 1017, 263, 1018, 264};
            for (int id : ids) texts += L"|" + ChildText(page, id);
            return texts;
        });
    ASSERT_EQ(1u, sheets.size());
    EXPECT_EQ(L"General|Name|Q9 GNSS@USB|Model|Q9 GNSS|Serial number|1000-0001|Port|USB", sheets[0]);
}

TEST_F(ShellViewTest, FailingDeviceManagerLeavesTheViewUsable) {
    struct Case {
        const wchar_t* call;
        bool filesLevel;
        const char* trace;
    } cases[] = {
        {L"IDeviceMgr.get_Receivers", false, "CCalvexReceiversShellView::OnEnumIdList - OK\r\n"},
        {L"IReceiver.get_Files", true, "CCalvexReceiversShellView::Refresh - get files is failed [0x80004005]\r\n"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(Narrow(c.call));
        DeviceSimScope faults(tree.Root());
        SetDeviceSimCallFailure(c.call, E_FAIL);
        ComPtr<IShellFolder> root = RootFolder();
        ComPtr<IShellFolder> folder = c.filesLevel ? FirstReceiver(root.Get()) : root;
        ASSERT_TRUE(folder);
        TestBrowser browser(false);
        HostedView host(folder.Get(), browser);
        const size_t before = CountTrace(c.trace);
        EXPECT_EQ(S_OK, host.view->Refresh());
        EXPECT_EQ(before + 1, CountTrace(c.trace));
        EXPECT_EQ(0, host.Count());
        host.Object()->OnCommand(1286);
        EXPECT_TRUE(IsWindow(host.list));
    }
}

TEST_F(ShellViewTest, SearchingDialogCentresItsTextAndGoesWithTheNextFill) {
    ComPtr<IShellFolder> root = RootFolder();
    TestBrowser browser(false);
    HostedView host(root.Get(), browser);
    host.Object()->OnCommand(100);
    HWND dialog = FindWindowExW(host.list, nullptr, L"#32770", nullptr);
    ASSERT_TRUE(dialog && IsWindowVisible(dialog));
    EXPECT_EQ(L"Detecting receivers...", ChildText(dialog, 251));
    EXPECT_EQ(L"Cancel", ChildText(dialog, IDCANCEL));
    SendMessageW(dialog, WM_SIZE, 0, MAKELPARAM(400, 300));
    RECT text;
    GetWindowRect(GetDlgItem(dialog, 251), &text);
    MapWindowPoints(nullptr, dialog, reinterpret_cast<POINT*>(&text), 2);
    EXPECT_NEAR(200, (text.left + text.right) / 2, 1);
    EXPECT_NEAR(150, (text.top + text.bottom) / 2, 1);
    SendMessageW(host.window, ViewNotificationMessage(), 0, 0);
    EXPECT_FALSE(IsWindow(dialog));
}

TEST_F(ShellViewTest, UnreachableDeviceManagerMakesRefreshAnswerFalse) {
    ComPtr<IShellFolder> root = RootFolder();
    TestBrowser browser(false);
    HostedView host(root.Get(), browser);
    const int items = host.Count();
    StopDeviceSimServers();
    // The class's server points nowhere for the length of the test.
    const wchar_t key[] = L"CLSID\\{0FADF314-B4FD-413C-9E26-6BC49B066080}\\LocalServer32";
    wchar_t saved[MAX_PATH] = L"";
    DWORD size = sizeof(saved);
    ASSERT_EQ(ERROR_SUCCESS, RegGetValueW(HKEY_CLASSES_ROOT, key, nullptr, RRF_RT_REG_SZ, nullptr, saved, &size));
    const wchar_t missing[] = L"C:\\missing\\CalvexDeviceSim.exe";
    RegSetKeyValueW(HKEY_CLASSES_ROOT, key, nullptr, REG_SZ, missing, sizeof(missing));
    const char line[] = "CCalvexReceiversShellView::Refresh - access to receiver manager is failed [0x";
    const size_t traced = ReadTraceLog().size();
    const HRESULT refreshed = host.view->Refresh();
    RegSetKeyValueW(HKEY_CLASSES_ROOT, key, nullptr, REG_SZ, saved, static_cast<DWORD>((wcslen(saved) + 1) * 2));
    EXPECT_EQ(S_FALSE, refreshed);
    EXPECT_NE(std::string::npos, ReadTraceLog().find(line, traced));
    EXPECT_EQ(items, host.Count());
}
