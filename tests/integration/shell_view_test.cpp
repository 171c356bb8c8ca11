// Guards the folder's view hosted in a browser of our own against the simulator: wrong status texts, menus and their states, command HRESULTs, view-state bytes, sort state, delete and properties, refresh paths, device manager faults and leaks.
#include <gtest/gtest.h>

#include "com/ModuleLock.h"
#include "module/ModuleApp.h"
#include "module/ModuleState.h"
#include "support/DeviceSim.h"
#include "support/ViewHost.h"

using namespace testsupport;

namespace {
using MenuRows = std::vector<std::pair<UINT, UINT>>;  // id (0 for a separator), state
const char kRefreshed[] = "CCalvexReceiversShellView::Refresh\r\n";

MenuRows MenuItems(HMENU menu) {
    MenuRows items;
    for (int i = 0; i < GetMenuItemCount(menu); ++i) {
        MENUITEMINFOW item = {sizeof(item), MIIM_ID | MIIM_STATE | MIIM_FTYPE};
        GetMenuItemInfoW(menu, i, TRUE, &item);
        items.emplace_back((item.fType & MFT_SEPARATOR) ? 0u : item.wID, item.fState & (MFS_GRAYED | MFS_DEFAULT | MFS_CHECKED));
    }
    return items;
}

class ShellViewTest : public testing::Test {
protected:
    static void SetUpTestSuite() { ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized()); }
    void SetUp() override {
        tree.AddReceiver({L"Calvex A"});
        tree.AddReceiver({L"Brennor A", 2, L"Test receiver", L"2000-0001"});
        const size_t sizes[] = {100, 1536, 2048};
        for (int i = 0; i < 3; ++i) tree.AddFile(L"Calvex A", L"LOG000" + std::to_wstring(i + 1), sizes[i]);
        scope.reset(new DeviceSimScope(tree.Root()));
        Display() = DisplayState();
    }
    HostedView& Host(bool files, UINT mode = FVM_DETAILS, IShellView* previous = nullptr) {
        hosts.emplace_back(new HostedView(OurFolder(files), browser, mode, previous));
        return *hosts.back();
    }
    // Ended in reverse: the views first, the simulator before its tree.
    ReceiverTree tree;
    std::unique_ptr<DeviceSimScope> scope;
    TestBrowser browser;
    std::vector<std::unique_ptr<HostedView>> hosts;
};
}  // namespace

TEST_F(ShellViewTest, ViewsShowTheirLevelsStatusTextAndLeaveNoWindowGdiObjectLockOrReferenceBehind) {
    struct { bool files, brennor; const wchar_t* status; } cases[] = {
        {false, false, L"Calvex GNSS Receivers: Calvex Receivers"},
        {true, false, L"Calvex GNSS Receivers: Calvex Receivers\\1000-0001!Q9 GNSS!USB"},
        {false, true, L"Brennor GNSS Receivers: Calvex Receivers"},  // both roots carry that name
        {true, true, L"Calvex GNSS Receivers: Calvex Receivers\\2000-0001!Q9 GNSS!USB"},
    };
    auto hostEach = [&] {
        for (const auto& c : cases) {
            HostedView host(OurFolder(c.files, c.brennor), browser);
            EXPECT_EQ(S_OK, host.view->UIActivate(c.brennor ? SVUIA_ACTIVATE_FOCUS : SVUIA_ACTIVATE_NOFOCUS));
            EXPECT_EQ(c.status, browser.statusText);
        }
    };
    hostEach();  // what stays loaded once is no leak
    const DWORD gdi = GetGuiResources(GetCurrentProcess(), GR_GDIOBJECTS);
    const LONG locks = ModuleLock::Count();
    for (int i = 0; i < 5; ++i) hostEach();
    EXPECT_EQ(nullptr, FindWindowExW(browser.frame, nullptr, L"CalvexReceiversViewNSClass", nullptr));
    EXPECT_LE(GetGuiResources(GetCurrentProcess(), GR_GDIOBJECTS), gdi + 5);
    EXPECT_EQ(locks, ModuleLock::Count());
    EXPECT_EQ(0u, browser.refs);
}

TEST_F(ShellViewTest, ModeComesFromOurPreviousViewElseFromTheStreamsFirstFourBytes) {
    HostedView& first = Host(false, FVM_LIST);
    first.Object()->OnCommand(1284);  // small icons
    HostedView& second = Host(false, FVM_DETAILS, first.view.Get());
    FOLDERSETTINGS settings = {};
    second.view->GetCurrentInfo(&settings);
    EXPECT_EQ(static_cast<UINT>(FVM_SMALLICON), settings.ViewMode);
    EXPECT_EQ(static_cast<DWORD>(LVS_SMALLICON), GetWindowLongW(second.list, GWL_STYLE) & LVS_TYPEMASK);

    // Another kind of previous view: the stream gives the mode, the flags stay ours.
    CreateStreamOnHGlobal(nullptr, TRUE, &browser.viewState);
    DWORD stored[2] = {FVM_LIST, 0xFFFF};
    browser.viewState->Write(stored, sizeof(stored), nullptr);
    ComPtr<IShellView> foreign;
    ComPtr<IShellFolder> desktop;
    SHGetDesktopFolder(&desktop);
    desktop->CreateViewObject(browser.frame, IID_IShellView, foreign.PutVoid());
    ASSERT_TRUE(foreign);
    HostedView& third = Host(false, FVM_DETAILS, foreign.Get());
    third.view->GetCurrentInfo(&settings);
    EXPECT_EQ(static_cast<UINT>(FVM_LIST), settings.ViewMode);
    EXPECT_EQ(0u, settings.fFlags);
    third.Object()->OnCommand(1283);
    EXPECT_EQ(S_OK, third.view->SaveViewState());
    browser.viewState->Seek(LARGE_INTEGER{}, STREAM_SEEK_SET, nullptr);
    browser.viewState->Read(stored, sizeof(stored), nullptr);
    EXPECT_EQ(static_cast<DWORD>(FVM_ICON), stored[0]);
    EXPECT_EQ(0xFFFFu, stored[1]);
}

TEST_F(ShellViewTest, MenusAndTheRightClickMenuHaveTheirPositionsAndStates) {
    struct { const char* name; bool files, fileDialog, select; MenuRows file; } cases[] = {
        {"receivers", false, false, false, {{1289, MFS_DEFAULT | MFS_GRAYED}, {0, MFS_GRAYED}, {1287, MFS_GRAYED}}},
        {"receivers selected", false, false, true, {{1289, MFS_DEFAULT}, {0, MFS_GRAYED}, {1287, 0}}},
        {"files", true, false, false, {{1289, MFS_DEFAULT | MFS_GRAYED}, {1288, MFS_GRAYED}, {0, MFS_GRAYED}}},
        {"files in a file dialog", true, true, true, {{1289, MFS_DEFAULT}, {1288, 0}, {0, MFS_GRAYED}}},
    };
    // Ours go before the browser's options separator, which stays last.
    const MenuRows view = {{0, MFS_GRAYED}, {1283, 0}, {1284, 0}, {1285, 0}, {1286, MFS_CHECKED}, {0, MFS_GRAYED}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        TestBrowser browser(c.fileDialog);
        HostedView host(OurFolder(c.files), browser);
        if (c.select) host.Select(0);
        host.view->UIActivate(SVUIA_ACTIVATE_FOCUS);
        ASSERT_TRUE(browser.lastMenu);
        HMENU file = GetSubMenu(browser.lastMenu, 0);  // the browser's File, Edit and View, in that order
        EXPECT_EQ(c.file, MenuItems(file));
        wchar_t text[64] = L"";
        GetMenuStringW(file, 1289, text, 64, MF_BYCOMMAND);
        EXPECT_STREQ(c.fileDialog ? L"Select" : L"Open", text);
        EXPECT_EQ(view, MenuItems(GetSubMenu(browser.lastMenu, 2)));
        const MenuRows edit = c.files ? MenuRows{{0, MFS_GRAYED}, {1281, c.select ? 0u : MFS_GRAYED}} : MenuRows{};
        EXPECT_EQ(edit, MenuItems(GetSubMenu(browser.lastMenu, 1)));
    }
    // Right-click on the files' empty space: no open group, and no separator ahead of "&Copy".
    UniqueMenu context(Host(true).Object()->BuildContextMenu());
    EXPECT_EQ((MenuRows{{1281, MFS_GRAYED}, {0, MFS_GRAYED}, {22, 0}, {1283, 0}, {1284, 0}, {1285, 0}, {1286, MFS_CHECKED}}),
              MenuItems(context.Get()));
}

TEST_F(ShellViewTest, CommandTargetAnswersAcceptedGroupsAndExecutesEveryGroup) {
    ComPtr<IOleCommandTarget> target;
    Host(false).view.QueryTo(IID_IOleCommandTarget, target.PutVoid());
    const GUID unknown = {0x12345678, 0, 0, {0, 0, 0, 0, 0, 0, 0, 1}};
    const GUID calvex = {0xE102076F, 0x4057, 0x4E7F, {0x82, 0x09, 0x51, 0x12, 0x58, 0xF1, 0x2B, 0x62}};
    const std::pair<const GUID*, HRESULT> cases[] = {{nullptr, S_OK}, {&calvex, S_OK}, {&CGID_Explorer, S_OK},
                                                     {&CGID_ShellDocView, S_OK}, {&unknown, OLECMDERR_E_UNKNOWNGROUP}};
    for (const auto& c : cases) {
        OLECMD commands[] = {{10, 7}, {12, 7}, {22, 7}, {11, 7}};
        EXPECT_EQ(c.second, target->QueryStatus(c.first, 4, commands, nullptr));
        const DWORD on = c.second == S_OK ? OLECMDF_SUPPORTED | OLECMDF_ENABLED : 7;
        EXPECT_EQ(on, commands[0].cmdf);
        EXPECT_EQ(on, commands[2].cmdf);
        EXPECT_EQ(c.second == S_OK ? 0u : 7u, commands[3].cmdf);
    }
    EXPECT_EQ(E_POINTER, target->QueryStatus(nullptr, 1, nullptr, nullptr));
    const size_t before = CountTrace(kRefreshed);
    EXPECT_EQ(S_OK, target->Exec(&unknown, 22, 0, nullptr, nullptr));
    EXPECT_EQ(before + 1, CountTrace(kRefreshed));
}

TEST_F(ShellViewTest, ColumnClicksShareOneSortStateAcrossViews) {
    HostedView &first = Host(true), &second = Host(true);
    auto click = [](HostedView& host, int column) {
        NMLISTVIEW notify = {{host.list, 2000, LVN_COLUMNCLICK}, 0, column};
        SendMessageW(host.window, WM_NOTIFY, 2000, reinterpret_cast<LPARAM>(&notify));
        wchar_t text[64] = L"";
        ListView_GetItemText(host.list, 0, 0, text, 64);
        return std::wstring(text);
    };
    EXPECT_EQ(L"LOG0003.qpr", click(first, 0));  // the first Name click sorts descending
    EXPECT_EQ(L"LOG0001.qpr", click(second, 0));  // the other view's click alternates
    EXPECT_EQ(L"LOG0001.qpr", click(first, 1));  // a new column keeps the direction: smallest first
    EXPECT_EQ(L"LOG0003.qpr", click(first, 1));
}

TEST_F(ShellViewTest, DeleteGoesOnPastRefusalsWithOneBoxEach) {
    // Items selected (-1: all), message boxes, refreshes and items left after the delete.
    struct { HRESULT failure; std::vector<int> selected; size_t boxes, refreshes; int left; } cases[] = {
        {E_ACCESSDENIED, {0, 2}, 2, 2, 3}, {S_OK, {-1}, 0, 3, 0}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.failure);
        DeviceSimScope faults(tree.Root());
        if (FAILED(c.failure)) SetDeviceSimCallFailure(L"IReceiverFile.Delete", c.failure);
        HostedView host(OurFolder(true), browser);
        ASSERT_EQ(3, host.Count());
        for (int item : c.selected) host.Select(item);
        const size_t before = CountTrace(kRefreshed);
        std::vector<std::wstring> boxes = WithDialogsClosed(
            L"Delete", [&] { host.Object()->OnCommand(1288); }, [](HWND box) { return ChildText(box, 0xFFFF); });
        EXPECT_EQ(c.boxes, boxes.size());
        for (const std::wstring& text : boxes) EXPECT_FALSE(text.empty());  // the system's text for the refusal
        EXPECT_EQ(before + c.refreshes, CountTrace(kRefreshed));
        EXPECT_EQ(c.left, host.Count());
        EXPECT_EQ(c.left != 0, FileExists(tree.FolderPath(L"Calvex A") + L"\\LOG0001"));
    }
}

TEST_F(ShellViewTest, PropertiesOpenOneSheetWithTheReceiversTexts) {
    HostedView& host = Host(false);
    host.Select(0);
    std::vector<std::wstring> sheets = WithDialogsClosed(
        L"Properties", [&] { host.Object()->OnCommand(1287); },
        [](HWND sheet) {
            wchar_t tab[64] = L"";
            TCITEMW item = {TCIF_TEXT, 0, 0, tab, 64};
            TabCtrl_GetItem(PropSheet_GetTabControl(sheet), 0, &item);
            std::wstring texts = tab;
            for (int id : {1015, 261, 1016, 262, 1017, 263, 1018, 264})
                texts += L"|" + ChildText(PropSheet_GetCurrentPageHwnd(sheet), id);
            return texts;
        });
    EXPECT_EQ(std::vector<std::wstring>{L"General|Name|Q9 GNSS@USB|Model|Q9 GNSS|Serial number|1000-0001|Port|USB"},
              sheets);
}

TEST_F(ShellViewTest, FailingOrUnregisteredDeviceManagerLeavesTheViewUsable) {
    // A call failing from the start, or (none) the manager unregistered under the open view: its items stay.
    struct { const wchar_t* call; bool files; const char* trace; HRESULT refreshed; int left; } cases[] = {
        {L"IDeviceMgr.get_Receivers", false, "CCalvexReceiversShellView::OnEnumIdList - OK\r\n", S_OK, 0},
        {L"IReceiver.get_Files", true, "CCalvexReceiversShellView::Refresh - get files is failed [0x80004005]\r\n",
         S_OK, 0},
        {nullptr, false,
         "CCalvexReceiversShellView::Refresh - access to receiver manager is failed [0x80040154]\r\n", S_FALSE, 1},
    };
    const std::wstring simulator = L"\"" + BuildDir() + L"\\CalvexDeviceSim.exe\" ";
    for (const auto& c : cases) {
        SCOPED_TRACE(c.trace);
        DeviceSimScope faults(tree.Root());
        if (c.call) SetDeviceSimCallFailure(c.call, E_FAIL);
        HostedView host(OurFolder(c.files), browser);
        const size_t before = CountTrace(c.trace);
        if (!c.call) {
            StopDeviceSimServers();
            ASSERT_EQ(0u, RunProcess(simulator + L"/UnregServer"));
        }
        const HRESULT refreshed = host.view->Refresh();
        EXPECT_EQ(0u, c.call ? 0u : RunProcess(simulator + L"/RegServer"));
        EXPECT_EQ(c.refreshed, refreshed);
        EXPECT_EQ(before + 1, CountTrace(c.trace));
        EXPECT_EQ(c.left, host.Count());
        host.Object()->OnCommand(1286);
        EXPECT_TRUE(IsWindow(host.list));
    }
}

TEST_F(ShellViewTest, TreeChangesRefillTheListAndEndTheCentredSearchingDialog) {
    HostedView& host = Host(false);
    ASSERT_EQ(1, host.Count());
    host.Object()->OnCommand(100);
    HWND dialog = FindWindowExW(host.list, nullptr, L"#32770", nullptr);
    ASSERT_TRUE(dialog && IsWindowVisible(dialog));
    EXPECT_EQ(L"Detecting receivers...|Cancel", ChildText(dialog, 251) + L"|" + ChildText(dialog, IDCANCEL));
    SendMessageW(dialog, WM_SIZE, 0, MAKELPARAM(400, 300));
    RECT text;
    GetWindowRect(GetDlgItem(dialog, 251), &text);
    MapWindowPoints(nullptr, dialog, reinterpret_cast<POINT*>(&text), 2);
    EXPECT_NEAR(200, (text.left + text.right) / 2, 1);
    EXPECT_NEAR(150, (text.top + text.bottom) / 2, 1);
    tree.AddReceiver({L"Calvex B", 1, L"B", L"1000-0002"});
    EXPECT_TRUE(PumpUntil([&] { return host.Count() == 2; }, 12000));
    EXPECT_FALSE(IsWindow(dialog));
    tree.RemoveReceiver(L"Calvex B");
    EXPECT_TRUE(PumpUntil([&] { return host.Count() == 1; }, 12000));
}
