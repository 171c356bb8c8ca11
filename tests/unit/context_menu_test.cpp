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

TEST(ContextMenu, QueryContextMenuAddsOneItemUnlessDefaultOnly) {
    struct { UINT flags; HRESULT result; int items; } cases[] = {
        {CMF_DEFAULTONLY, 0, 0}, {CMF_DEFAULTONLY | CMF_EXPLORE, 0, 0}, {CMF_NORMAL, 1, 1}, {CMF_EXPLORE, 1, 1},
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

TEST(ContextMenu, GetCommandStringWritesNarrowBytesWithinTheSize) {
    struct { UINT type; UINT_PTR offset; UINT size; HRESULT result; const char* text; } cases[] = {  // text null: untouched
        {GCS_VERBW, 0, 64, S_OK, "command"},
        {GCS_HELPTEXTW, 0, 64, S_OK, "Explorer Bar command help text"},
        {GCS_HELPTEXTW, 0, 5, S_OK, "Expl"},  // the size counts bytes
        {GCS_VERBW, 1, 64, E_INVALIDARG, nullptr},      {GCS_HELPTEXTW, 1, 64, E_INVALIDARG, nullptr},
        {GCS_VALIDATEW, 0, 64, S_OK, nullptr},          {GCS_VALIDATEW, 7, 64, S_OK, nullptr},
        {GCS_VERBA, 0, 64, E_INVALIDARG, nullptr},      {GCS_HELPTEXTA, 0, 64, E_INVALIDARG, nullptr},
        {GCS_VALIDATEA, 0, 64, E_INVALIDARG, nullptr},
    };
    ComPtr<IContextMenu> menu = NewMenu();
    ASSERT_TRUE(menu);
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message() << "type " << c.type << " offset " << c.offset << " size " << c.size);
        char buffer[128];
        memset(buffer, 0x5A, sizeof buffer);
        EXPECT_EQ(c.result, menu->GetCommandString(c.offset, c.type, nullptr, buffer, c.size));
        const size_t written = c.text ? strlen(c.text) + 1 : 0;
        if (c.text) { EXPECT_EQ(0, memcmp(c.text, buffer, written)) << "narrow text, not UTF-16"; }
        EXPECT_EQ(0x5A, buffer[written]) << "nothing written past the text";
    }
}

TEST(ContextMenu, InvokeCommandRefusesVerbsAndShowsTheBoxForOffsetZero) {
    ComPtr<IContextMenu> menu = NewMenu();
    ASSERT_TRUE(menu);
    HWND owner = CreateWindowExW(0, L"STATIC", L"owner", WS_OVERLAPPED, 0, 0, 100, 100, nullptr, nullptr, nullptr, nullptr);
    for (LPCSTR verb : {static_cast<LPCSTR>("command"), static_cast<LPCSTR>(MAKEINTRESOURCEA(1))}) {
        CMINVOKECOMMANDINFO info = {sizeof info, 0, owner, verb};
        EXPECT_EQ(E_INVALIDARG, menu->InvokeCommand(&info));
    }
    EXPECT_EQ(nullptr, FindWindowW(L"#32770", L"Sample Explorer Bar"));

    Box box;
    HANDLE closer = CreateThread(nullptr, 0, CloseBox, &box, 0, nullptr);
    CMINVOKECOMMANDINFO info = {sizeof info, 0, owner, MAKEINTRESOURCEA(0)};
    EXPECT_EQ(S_OK, menu->InvokeCommand(&info));
    EXPECT_EQ(WAIT_OBJECT_0, WaitForSingleObject(closer, 15000));
    CloseHandle(closer);
    EXPECT_EQ(L"Sample Explorer Bar", box.caption);
    EXPECT_EQ(L"Explorer Bar Command selected.", box.text);
    EXPECT_TRUE(box.owned);
    DestroyWindow(owner);
}
