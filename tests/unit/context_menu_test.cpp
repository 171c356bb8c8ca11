// Guards the folder's context menu: a wrong item count, text, box or result, wide requests answered narrow.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <string>

#include "com/ComPtr.h"
#include "module/ClassCreators.h"
#include "support/TestSupport.h"

namespace {
ComPtr<IContextMenu> NewMenu() {
    ComPtr<IContextMenu> menu;
    EXPECT_EQ(S_OK, CreateCalvexReceiversContextMenu(nullptr, IID_IContextMenu, menu.PutVoid()));
    return menu;
}

struct Box {
    std::wstring caption;
    std::wstring text;
    bool owned = false;
};

// Watches for the information box, reads it and presses OK.
DWORD WINAPI CloseBox(void* param) {
    auto* box = static_cast<Box*>(param);
    for (int i = 0; i < 500; ++i) {
        HWND dialog = FindWindowW(L"#32770", L"Sample Explorer Bar");
        if (dialog) {
            box->caption = L"Sample Explorer Bar";
            wchar_t text[256] = L"";
            GetDlgItemTextW(dialog, 0xFFFF, text, 256);  // the message box's static text
            box->text = text;
            box->owned = GetWindow(dialog, GW_OWNER) != nullptr;
            PostMessageW(dialog, WM_COMMAND, IDOK, 0);
            return 0;
        }
        Sleep(20);
    }
    return 1;
}
}  // namespace

TEST(ContextMenu, OffersIContextMenuOnly) {
    ComPtr<IContextMenu> menu = NewMenu();
    ASSERT_TRUE(menu);
    const IID* refused[] = {&IID_IContextMenu2, &IID_IContextMenu3, &IID_IShellExtInit, &IID_IDispatch};
    for (const IID* iid : refused) {
        void* other = reinterpret_cast<void*>(1);
        EXPECT_EQ(E_NOINTERFACE, menu->QueryInterface(*iid, &other));
        EXPECT_EQ(nullptr, other);
    }
}

TEST(ContextMenu, QueryContextMenuAddsOneItemUnlessDefaultOnly) {
    struct { UINT flags; HRESULT result; int items; } cases[] = {
        {CMF_DEFAULTONLY, 0, 0},
        {CMF_DEFAULTONLY | CMF_EXPLORE, 0, 0},
        {CMF_NORMAL, 1, 1},
        {CMF_EXPLORE, 1, 1},
        {CMF_CANRENAME | CMF_VERBSONLY, 1, 1},
    };
    ComPtr<IContextMenu> menu = NewMenu();
    ASSERT_TRUE(menu);
    for (const auto& c : cases) {
        SCOPED_TRACE(c.flags);
        HMENU popup = CreatePopupMenu();
        AppendMenuW(popup, MF_STRING, 1, L"existing");
        EXPECT_EQ(c.result, menu->QueryContextMenu(popup, 0, 40, 41, c.flags));
        EXPECT_EQ(1 + c.items, GetMenuItemCount(popup));
        if (c.items) {
            wchar_t text[64] = L"";
            GetMenuStringW(popup, 0, text, 64, MF_BYPOSITION);
            EXPECT_STREQ(L"&Sample Explorer Bar Command", text);
            EXPECT_EQ(40u, GetMenuItemID(popup, 0)) << "inserted at the position, with the first id";
        }
        DestroyMenu(popup);
    }
}

TEST(ContextMenu, GetCommandStringWritesNarrowBytes) {
    struct {
        UINT type;
        UINT_PTR offset;
        HRESULT result;
        const char* text;  // null: buffer untouched
    } cases[] = {
        {GCS_VERBW, 0, S_OK, "command"},
        {GCS_HELPTEXTW, 0, S_OK, "Explorer Bar command help text"},
        {GCS_VERBW, 1, E_INVALIDARG, nullptr},
        {GCS_HELPTEXTW, 1, E_INVALIDARG, nullptr},
        {GCS_VALIDATEW, 0, S_OK, nullptr},
        {GCS_VALIDATEW, 7, S_OK, nullptr},
        {GCS_VERBA, 0, E_INVALIDARG, nullptr},
        {GCS_HELPTEXTA, 0, E_INVALIDARG, nullptr},
        {GCS_VALIDATEA, 0, E_INVALIDARG, nullptr},
    };
    ComPtr<IContextMenu> menu = NewMenu();
    ASSERT_TRUE(menu);
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message() << "type " << c.type << " offset " << c.offset);
        char buffer[128];
        memset(buffer, 0x5A, sizeof buffer);
        EXPECT_EQ(c.result, menu->GetCommandString(c.offset, c.type, nullptr, buffer, 64));
        if (c.text) {
            EXPECT_EQ(0, memcmp(c.text, buffer, strlen(c.text) + 1)) << "narrow text, not UTF-16";
        } else {
            EXPECT_EQ(0x5A, buffer[0]);
        }
    }
}

TEST(ContextMenu, CommandStringIsBoundedByTheSizeAsBytes) {
    ComPtr<IContextMenu> menu = NewMenu();
    ASSERT_TRUE(menu);
    char buffer[32];
    memset(buffer, 0x5A, sizeof buffer);
    EXPECT_EQ(S_OK, menu->GetCommandString(0, GCS_HELPTEXTW, nullptr, buffer, 5));
    EXPECT_EQ(0, memcmp("Expl", buffer, 5));
    EXPECT_EQ(0x5A, buffer[5]) << "nothing written past five bytes";
}

TEST(ContextMenu, InvokeCommandRefusesVerbsAndShowsTheBoxForOffsetZero) {
    ComPtr<IContextMenu> menu = NewMenu();
    ASSERT_TRUE(menu);
    HWND owner = CreateWindowExW(0, L"STATIC", L"owner", WS_OVERLAPPED, 0, 0, 100, 100, nullptr, nullptr, nullptr, nullptr);
    struct { LPCSTR verb; HRESULT result; } refused[] = {
        {"command", E_INVALIDARG},
        {MAKEINTRESOURCEA(1), E_INVALIDARG},
    };
    for (const auto& c : refused) {
        CMINVOKECOMMANDINFO info = {sizeof info};
        info.hwnd = owner;
        info.lpVerb = c.verb;
        EXPECT_EQ(c.result, menu->InvokeCommand(&info));
    }
    EXPECT_EQ(nullptr, FindWindowW(L"#32770", L"Sample Explorer Bar"));

    Box box;
    HANDLE closer = CreateThread(nullptr, 0, CloseBox, &box, 0, nullptr);
    CMINVOKECOMMANDINFO info = {sizeof info};
    info.hwnd = owner;
    info.lpVerb = MAKEINTRESOURCEA(0);
    EXPECT_EQ(S_OK, menu->InvokeCommand(&info));
    EXPECT_EQ(WAIT_OBJECT_0, WaitForSingleObject(closer, 15000));
    CloseHandle(closer);
    EXPECT_EQ(L"Sample Explorer Bar", box.caption);
    EXPECT_EQ(L"Explorer Bar Command selected.", box.text);
    EXPECT_TRUE(box.owned);
    DestroyWindow(owner);
}
