// Guards the folder's context menu: a wrong item count, text, box or result, wide requests answered narrow.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "com/ComPtr.h"
#include "module/ClassCreators.h"
#include "support/TestSupport.h"

namespace {
class ContextMenuTest : public testing::Test {
protected:
    void SetUp() override { ASSERT_EQ(S_OK, CreateCalvexReceiversContextMenu(nullptr, IID_IContextMenu, menu.PutVoid())); }
    ComPtr<IContextMenu> menu;
};
}  // namespace

TEST_F(ContextMenuTest, QueryContextMenuAddsOneItemUnlessDefaultOnly) {
    struct { UINT flags; int items; } cases[] = {  // the result is the count of ids used
        {CMF_DEFAULTONLY, 0}, {CMF_DEFAULTONLY | CMF_EXPLORE, 0}, {CMF_NORMAL, 1}, {CMF_EXPLORE, 1}, {CMF_CANRENAME | CMF_VERBSONLY, 1}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.flags);
        HMENU popup = CreatePopupMenu();
        AppendMenuW(popup, MF_STRING, 1, L"existing");
        EXPECT_EQ(MAKE_HRESULT(0, 0, c.items), menu->QueryContextMenu(popup, 0, 40, 41, c.flags));
        wchar_t text[64] = L"";
        GetMenuStringW(popup, 0, text, 64, MF_BYPOSITION);
        EXPECT_EQ(c.items ? L"&Sample Explorer Bar Command|40|2" : L"existing|1|1",  // inserted at the position, with the first id
                  std::wstring(text) + L"|" + std::to_wstring(GetMenuItemID(popup, 0)) + L"|" + std::to_wstring(GetMenuItemCount(popup)));
        DestroyMenu(popup);
    }
}

TEST_F(ContextMenuTest, GetCommandStringWritesNarrowBytesWithinTheSize) {
    struct { UINT type; UINT_PTR offset; UINT size; HRESULT result; const char* text; } cases[] = {  // text null: untouched
        {GCS_VERBW, 0, 64, S_OK, "command"},
        {GCS_HELPTEXTW, 0, 64, S_OK, "Explorer Bar command help text"},
        {GCS_HELPTEXTW, 0, 5, S_OK, "Expl"},  // the size counts bytes
        {GCS_VERBW, 1, 64, E_INVALIDARG, nullptr},      {GCS_HELPTEXTW, 1, 64, E_INVALIDARG, nullptr},
        {GCS_VALIDATEW, 0, 64, S_OK, nullptr},          {GCS_VALIDATEW, 7, 64, S_OK, nullptr},
        {GCS_VERBA, 0, 64, E_INVALIDARG, nullptr},      {GCS_HELPTEXTA, 0, 64, E_INVALIDARG, nullptr},
        {GCS_VALIDATEA, 0, 64, E_INVALIDARG, nullptr},
    };
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

TEST_F(ContextMenuTest, InvokeCommandRefusesVerbsAndShowsTheBoxForOffsetZero) {
    HWND owner = CreateWindowExW(0, L"STATIC", L"owner", WS_OVERLAPPED, 0, 0, 100, 100, nullptr, nullptr, nullptr, nullptr);
    for (LPCSTR verb : {static_cast<LPCSTR>("command"), static_cast<LPCSTR>(MAKEINTRESOURCEA(1))}) {
        CMINVOKECOMMANDINFO info = {sizeof info, 0, owner, verb};
        EXPECT_EQ(E_INVALIDARG, menu->InvokeCommand(&info));
    }
    EXPECT_EQ(nullptr, FindWindowW(L"#32770", L"Sample Explorer Bar"));

    CMINVOKECOMMANDINFO info = {sizeof info, 0, owner, MAKEINTRESOURCEA(0)};
    const std::vector<std::wstring> boxes = testsupport::WithDialogsClosed(
        L"Sample Explorer Bar", [&] { EXPECT_EQ(S_OK, menu->InvokeCommand(&info)); },
        [](HWND box) { return testsupport::ChildText(box, 0xFFFF) + (GetWindow(box, GW_OWNER) ? L"|owned" : L"|no owner"); });
    EXPECT_EQ(std::vector<std::wstring>{L"Explorer Bar Command selected.|owned"}, boxes);
    DestroyWindow(owner);
}
