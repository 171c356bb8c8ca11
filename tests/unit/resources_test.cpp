// Guards the module's resources: a missing or wrong text, icon, dialog control or image list; an item kind given the wrong icon index or picture, a location touched.
#include <windows.h>
#include <commctrl.h>

#include <climits>
#include <cstdlib>
#include <string>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

#include "com/ComPtr.h"
#include "com/Handles.h"
#include "items/CCalvexReceiversExtractIcon.h"
#include "module/ModuleApp.h"
#include "resources/resource.h"

namespace {
// The icon drawn on white into a 32-bit bitmap, so that icons from an image list and from
// resources compare alike; empty for no icon.
std::vector<BYTE> Pixels(HICON icon, int size) {
    if (!icon) return {};
    BITMAPINFO info = {};
    info.bmiHeader = {sizeof(BITMAPINFOHEADER), size, -size, 1, 32, BI_RGB};
    void* bits = nullptr;
    HDC dc = CreateCompatibleDC(nullptr);
    HBITMAP bitmap = CreateDIBSection(dc, &info, DIB_RGB_COLORS, &bits, nullptr, 0);
    SelectObject(dc, bitmap);
    PatBlt(dc, 0, 0, size, size, WHITENESS);
    DrawIconEx(dc, 0, 0, icon, size, size, 0, nullptr, DI_NORMAL);
    GdiFlush();
    std::vector<BYTE> pixels(static_cast<const BYTE*>(bits), static_cast<const BYTE*>(bits) + size * size * 4);
    DeleteDC(dc);  // first: a bitmap selected into a DC cannot be deleted
    DeleteObject(bitmap);
    return pixels;
}

// The icon resource whose picture is nearest to the icon. A tie goes to the earlier of this
// list, so two resources of one picture make some kind come out wrong.
int NearestResource(HICON icon, int size) {
    const std::vector<BYTE> pixels = Pixels(icon, size);
    int nearest = 0;
    long best = LONG_MAX;
    for (WORD id : {IDI_MODULE, IDI_FILE, IDI_NOITEM, IDI_BRENNOR, IDI_CALVEX}) {
        UniqueIcon loaded(static_cast<HICON>(LoadImageW(ModuleInstance(), MAKEINTRESOURCEW(id), IMAGE_ICON, size, size, LR_CREATEDIBSECTION)));
        const std::vector<BYTE> other = Pixels(loaded.Get(), size);
        if (other.size() != pixels.size()) continue;  // a resource missing at this size
        long distance = 0;
        for (size_t i = 0; i < pixels.size(); ++i) distance += std::abs(pixels[i] - other[i]);
        if (distance < best) best = distance, nearest = id;
    }
    return nearest;
}

}  // namespace

// The texts that no view, dialog or column test shows already.
TEST(Resources, StringTable) {
    struct { UINT id; const wchar_t* text; } strings[] = {
        {1032, L"&Copy"}, {1047, L"Large Icons"}, {1048, L"Small Icons"}, {1049, L"List"}, {1050, L"Details"},
        {1062, L"USB"}, {1063, L"Unknown"}, {1064, L"Waiting for cancel..."}, {1120, L"Refresh"},
        {55296, L""},  // absent on purpose: the time text falls back to its own default
    };
    for (const auto& s : strings) { EXPECT_EQ(s.text, LoadModuleString(s.id)) << s.id; }
}

TEST(Resources, DialogTemplatesHoldTheirControls) {
    struct { WORD dialog; int control; const wchar_t* text; } controls[] = {  // control 0: the caption
        {IDD_PROGRESS, 0, L"Progress..."}, {IDD_PROGRESS, IDCANCEL, L"Cancel"},
        {IDD_PROGRESS, IDC_PROGRESS_STATUS, L"Waiting for download..."}, {IDD_FIND, IDCANCEL, L"Stop"},
        {IDD_FIND, IDC_FIND_TEXT, L"Searching..."}, {IDD_FIND, IDC_FIND_STATIC, L""},
    };  // the progress bar and the properties page's controls: the paste and view tests read them
    HWND parent = CreateWindowExW(0, L"STATIC", L"", WS_OVERLAPPEDWINDOW, 0, 0, 400, 300, nullptr, nullptr, nullptr, nullptr);
    for (const auto& c : controls) {
        HWND dialog = CreateDialogParamW(ModuleInstance(), MAKEINTRESOURCEW(c.dialog), parent, nullptr, 0);
        ASSERT_NE(nullptr, dialog) << c.dialog;
        HWND control = c.control ? GetDlgItem(dialog, c.control) : dialog;
        wchar_t text[128] = L"";
        GetWindowTextW(control, text, 128);
        EXPECT_NE(nullptr, control) << c.dialog << "/" << c.control;
        EXPECT_STREQ(c.text, text) << c.dialog << "/" << c.control;
        DestroyWindow(dialog);
    }
    DestroyWindow(parent);
}

TEST(Resources, ImageListsHoldSixImagesAtSystemSizes) {
    ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized());
    struct { HIMAGELIST list; int cx, cy; } lists[] = {
        {LargeImageList(), GetSystemMetrics(SM_CXICON), GetSystemMetrics(SM_CYICON)},
        {SmallImageList(), GetSystemMetrics(SM_CXSMICON), GetSystemMetrics(SM_CYSMICON)},
    };
    for (const auto& l : lists) {
        int cx = 0, cy = 0;
        ImageList_GetIconSize(l.list, &cx, &cy);
        EXPECT_EQ(std::make_tuple(6, l.cx, l.cy), std::make_tuple(ImageList_GetImageCount(l.list), cx, cy));
    }
}

// The icon index is the last item's kind less one, and Extract draws that kind's picture at both sizes.
TEST(ExtractIcon, EachKindGetsItsIndexAndPicture) {
    ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized());
    const int large = GetSystemMetrics(SM_CXICON), small = GetSystemMetrics(SM_CXSMICON);
    CReceiversPidlMgr mgr;
    const struct { std::vector<std::pair<DWORD, const wchar_t*>> items; int index, picture; } cases[] = {
        {{{1, L"Calvex Receivers"}}, 0, IDI_CALVEX}, {{{2, L"Calvex Receivers"}}, 1, IDI_BRENNOR},
        {{{3, L"1!M!COM3"}}, 2, IDI_CALVEX},         {{{4, L"1!M!COM3"}}, 3, IDI_BRENNOR},
        {{{5, L"none"}}, 4, IDI_NOITEM},             {{{6, L"FILE.qpr"}}, 5, IDI_FILE},
        {{{2, L"Calvex Receivers"}, {4, L"1!M!COM3"}, {6, L"FILE.qpr"}}, 5, IDI_FILE},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.index);
        UniquePidl list;
        for (const auto& item : c.items)
            list = UniquePidl(mgr, mgr.Concatenate(list.Get(), UniquePidl(mgr, mgr.Create(item.first, item.second)).Get()));
        ComPtr<ComObject<CCalvexReceiversExtractIcon>> object;
        ASSERT_EQ(CreateComObject<CCalvexReceiversExtractIcon>(&object), S_OK);
        ASSERT_EQ(object->SetItem(list.Get()), S_OK);
        wchar_t location[16];
        wmemset(location, L'#', 16);
        int index = -7;
        UINT flags = 0;
        EXPECT_EQ(object->GetIconLocation(GIL_FORSHELL, location, 16, &index, &flags), S_OK);
        EXPECT_EQ(std::make_pair(index, flags), std::make_pair(c.index, UINT(GIL_NOTFILENAME)));
        EXPECT_EQ(std::wstring(location, 16), std::wstring(16, L'#')) << "the location buffer was written";
        HICON bigIcon = nullptr, smallIcon = nullptr;
        ASSERT_EQ(object->Extract(L"ignored", index, &bigIcon, &smallIcon, MAKELONG(large, small)), S_OK);
        ASSERT_TRUE(bigIcon && smallIcon);
        EXPECT_EQ(std::make_pair(NearestResource(bigIcon, large), NearestResource(smallIcon, small)),
                  std::make_pair(c.picture, c.picture));
        DestroyIcon(bigIcon), DestroyIcon(smallIcon);
    }
}
