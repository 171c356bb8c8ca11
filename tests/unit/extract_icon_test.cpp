// Guards icon extraction: a wrong index for an item kind, a location touched, icons not the module's own.
#include <gtest/gtest.h>

#include <windows.h>
#include <commctrl.h>

#include <cstdlib>
#include <cstring>
#include <vector>

#include "items/CCalvexReceiversExtractIcon.h"
#include "module/ClassCreators.h"
#include "module/ModuleApp.h"
#include "resources/resource.h"

namespace {
// The icon drawn on white into a 32-bit bitmap of cx by cy, so that icons from an image list
// and icons loaded from resources compare the same way.
std::vector<DWORD> Pixels(HICON icon, int cx, int cy) {
    BITMAPINFO info = {};
    info.bmiHeader = {sizeof(BITMAPINFOHEADER), cx, -cy, 1, 32, BI_RGB};
    void* bits = nullptr;
    HDC dc = CreateCompatibleDC(nullptr);
    HBITMAP bitmap = CreateDIBSection(dc, &info, DIB_RGB_COLORS, &bits, nullptr, 0);
    HGDIOBJ old = SelectObject(dc, bitmap);
    PatBlt(dc, 0, 0, cx, cy, WHITENESS);
    DrawIconEx(dc, 0, 0, icon, cx, cy, 0, nullptr, DI_NORMAL);
    GdiFlush();
    std::vector<DWORD> pixels(static_cast<const DWORD*>(bits), static_cast<const DWORD*>(bits) + cx * cy);
    SelectObject(dc, old);
    DeleteObject(bitmap);
    DeleteDC(dc);
    return pixels;
}

// The icon resource among 101..104 whose picture is nearest to the icon.
int NearestResource(HICON icon, int cx, int cy) {
    const std::vector<DWORD> pixels = Pixels(icon, cx, cy);
    int nearest = 0;
    long best = -1;
    for (int id : {IDI_CALVEX, IDI_BRENNOR, IDI_NOITEM, IDI_FILE}) {
        HICON loaded = static_cast<HICON>(
            LoadImageW(GetModuleHandleW(nullptr), MAKEINTRESOURCEW(id), IMAGE_ICON, cx, cy, LR_CREATEDIBSECTION));
        const std::vector<DWORD> other = Pixels(loaded, cx, cy);
        DestroyIcon(loaded);
        long distance = 0;  // summed over the colour channels
        for (size_t i = 0; i < pixels.size() * 4; ++i)
            distance += std::abs(reinterpret_cast<const BYTE*>(pixels.data())[i] - reinterpret_cast<const BYTE*>(other.data())[i]);
        if (best < 0 || distance < best) best = distance, nearest = id;
    }
    return nearest;
}

class ExtractIconTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() { ASSERT_EQ(CModuleApp::Instance().EnsureInitialized(), S_OK); }

    UniquePidl List(std::initializer_list<std::pair<DWORD, const wchar_t*>> items) {
        UniquePidl list;
        for (const auto& item : items) {
            UniquePidl one(mgr, mgr.Create(item.first, item.second));
            list = UniquePidl(mgr, mgr.Concatenate(list.Get(), one.Get()));
        }
        return list;
    }

    CReceiversPidlMgr mgr;
};

TEST_F(ExtractIconTest, IndexIsTheLastItemKindLessOne) {
    const struct { UniquePidl list; int index; } cases[] = {
        {List({{1, L"Calvex Receivers"}}), 0}, {List({{2, L"Calvex Receivers"}}), 1}, {List({{3, L"1!M!COM3"}}), 2},
        {List({{4, L"1!M!COM3"}}), 3},         {List({{6, L"FILE.qpr"}}), 5},
        {List({{2, L"Calvex Receivers"}, {4, L"1!M!COM3"}, {6, L"FILE.qpr"}}), 5},
    };
    for (const auto& c : cases) {
        ComObject<CCalvexReceiversExtractIcon>* object = nullptr;
        ASSERT_EQ(CreateComObject<CCalvexReceiversExtractIcon>(&object), S_OK);
        ASSERT_EQ(object->SetItem(c.list.Get()), S_OK);
        wchar_t location[16], before[16];
        wmemset(location, L'#', 16), wmemset(before, L'#', 16);
        int index = -7;
        UINT flags = 0;
        EXPECT_EQ(object->GetIconLocation(GIL_FORSHELL, location, 16, &index, &flags), S_OK);
        EXPECT_EQ(index, c.index);
        EXPECT_EQ(flags, static_cast<UINT>(GIL_NOTFILENAME));
        EXPECT_EQ(wmemcmp(location, before, 16), 0) << "the location buffer was written";
        object->Release();
    }
}

TEST_F(ExtractIconTest, ExtractGivesTheKindsPictureAtBothSizes) {
    const int large = GetSystemMetrics(SM_CXICON), small = GetSystemMetrics(SM_CXSMICON);
    const int expected[] = {IDI_CALVEX, IDI_BRENNOR, IDI_CALVEX, IDI_BRENNOR, IDI_NOITEM, IDI_FILE};
    IExtractIconW* extract = nullptr;
    ASSERT_EQ(CreateCalvexReceiversExtractIcon(nullptr, IID_IExtractIconW, reinterpret_cast<void**>(&extract)), S_OK);
    for (UINT index = 0; index < 6; ++index) {
        HICON bigIcon = nullptr, smallIcon = nullptr;
        ASSERT_EQ(extract->Extract(L"ignored", index, &bigIcon, &smallIcon, MAKELONG(large, small)), S_OK);
        ASSERT_TRUE(bigIcon && smallIcon) << index;
        EXPECT_EQ(NearestResource(bigIcon, large, large), expected[index]) << "large " << index;
        EXPECT_EQ(NearestResource(smallIcon, small, small), expected[index]) << "small " << index;
        DestroyIcon(bigIcon);
        DestroyIcon(smallIcon);
    }
    HICON bigIcon = reinterpret_cast<HICON>(1), smallIcon = reinterpret_cast<HICON>(1);
    EXPECT_EQ(extract->Extract(nullptr, 9, &bigIcon, &smallIcon, 0), S_OK) << "no check of the index";
    EXPECT_EQ(bigIcon, nullptr);
    EXPECT_EQ(smallIcon, nullptr);
    extract->Release();
}
}  // namespace
