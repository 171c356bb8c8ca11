// Guards the module's resources: a missing or wrong text, icon, dialog control or image list; an item kind given the wrong icon index or picture, a location touched.
#include <windows.h>
#include <commctrl.h>

#include <cstdlib>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "items/CCalvexReceiversExtractIcon.h"
#include "module/ClassCreators.h"
#include "module/ModuleApp.h"
#include "resources/resource.h"

namespace {
HICON ModuleIcon(WORD id, int size) {
    return static_cast<HICON>(LoadImageW(ModuleInstance(), MAKEINTRESOURCEW(id), IMAGE_ICON, size, size, LR_CREATEDIBSECTION));
}

// The icon drawn on white into a 32-bit bitmap, so that icons from an image list and from
// resources compare alike; empty for no icon.
std::vector<BYTE> Pixels(HICON icon, int size) {
    if (!icon) return {};
    BITMAPINFO info = {};
    info.bmiHeader = {sizeof(BITMAPINFOHEADER), size, -size, 1, 32, BI_RGB};
    void* bits = nullptr;
    HDC dc = CreateCompatibleDC(nullptr);
    HBITMAP bitmap = CreateDIBSection(dc, &info, DIB_RGB_COLORS, &bits, nullptr, 0);
    HGDIOBJ old = SelectObject(dc, bitmap);
    PatBlt(dc, 0, 0, size, size, WHITENESS);
    DrawIconEx(dc, 0, 0, icon, size, size, 0, nullptr, DI_NORMAL);
    GdiFlush();
    std::vector<BYTE> pixels(static_cast<const BYTE*>(bits), static_cast<const BYTE*>(bits) + size * size * 4);
    SelectObject(dc, old);
    DeleteObject(bitmap);
    DeleteDC(dc);
    return pixels;
}

// The item icon resource whose picture is nearest to the icon.
int NearestResource(HICON icon, int size) {
    const std::vector<BYTE> pixels = Pixels(icon, size);
    int nearest = 0;
    long best = -1;
    for (WORD id : {IDI_CALVEX, IDI_BRENNOR, IDI_NOITEM, IDI_FILE}) {
        HICON loaded = ModuleIcon(id, size);
        const std::vector<BYTE> other = Pixels(loaded, size);
        DestroyIcon(loaded);
        long distance = 0;
        for (size_t i = 0; i < pixels.size(); ++i) distance += std::abs(pixels[i] - other[i]);
        if (best < 0 || distance < best) best = distance, nearest = id;
    }
    return nearest;
}

INT_PTR CALLBACK NoProc(HWND, UINT, WPARAM, LPARAM) { return FALSE; }
}  // namespace

TEST(Resources, StringTable) {
    struct { UINT id; const wchar_t* text; } strings[] = {
        {2, L"Cancel"}, {270, L"General"}, {271, L"%.1f KB"}, {272, L"%.1f MB"}, {273, L"%.1f GB"},
        {1001, L"Calvex GNSS Receivers"}, {1005, L"Name"}, {1006, L"Size"}, {1007, L"Serial number"},
        {1008, L"Model"}, {1009, L"Port"}, {1032, L"&Copy"}, {1034, L"Time"}, {1035, L"File Download"},
        {1036, L"%d bytes"}, {1045, L"Downloading file %s, %d%% completed"}, {1047, L"Large Icons"},
        {1048, L"Small Icons"}, {1049, L"List"}, {1050, L"Details"}, {1053, L"Properties"}, {1054, L"Delete"},
        {1060, L"Detecting receivers..."}, {1062, L"USB"}, {1063, L"Unknown"}, {1064, L"Waiting for cancel..."},
        {1065, L"Brennor GNSS Receivers"}, {1120, L"Refresh"}, {1121, L"Select"}, {1122, L"Open"},
        {55296, L""},  // absent on purpose: the time text falls back to its own default
    };
    for (const auto& s : strings) { EXPECT_EQ(s.text, LoadModuleString(s.id)) << s.id; }
}

TEST(Resources, IconsAtEachSizeAreDistinctPictures) {
    const WORD ids[] = {IDI_CALVEX, IDI_BRENNOR, IDI_NOITEM, IDI_FILE, IDI_MODULE};
    for (int size : {16, 32, 48}) {
        std::vector<std::vector<BYTE>> pictures;
        for (WORD id : ids) {
            HICON icon = ModuleIcon(id, size);
            pictures.push_back(Pixels(icon, size));
            DestroyIcon(icon);
            ASSERT_EQ(static_cast<size_t>(size * size * 4), pictures.back().size()) << id << " at " << size;
        }
        for (size_t a = 0; a < pictures.size(); ++a)
            for (size_t b = a + 1; b < pictures.size(); ++b)
                EXPECT_NE(pictures[a], pictures[b]) << ids[a] << " and " << ids[b] << " at " << size;
    }
}

TEST(Resources, DialogTemplatesHoldTheirControls) {
    struct { WORD dialog; int control; const wchar_t* text; } controls[] = {  // control 0: the caption
        {IDD_PROGRESS, 0, L"Progress..."},             {IDD_PROGRESS, IDCANCEL, L"Cancel"},
        {IDD_PROGRESS, IDC_PROGRESS_STATUS, L"Waiting for download..."},
        {IDD_PROGRESS, IDC_PROGRESS_BAR, L""},         {IDD_FIND, IDCANCEL, L"Stop"},
        {IDD_FIND, IDC_FIND_TEXT, L"Searching..."},    {IDD_FIND, IDC_FIND_STATIC, L""},
        {IDD_RECEIVER_PROPERTIES, IDC_PROP_LABEL_RECEIVER, L"Receiver:"},
        {IDD_RECEIVER_PROPERTIES, IDC_PROP_LABEL_MODEL, L"Model:"},
        {IDD_RECEIVER_PROPERTIES, IDC_PROP_LABEL_SERIAL, L"ID:"},
        {IDD_RECEIVER_PROPERTIES, IDC_PROP_LABEL_PORT, L"Port:"},
        {IDD_RECEIVER_PROPERTIES, IDC_PROP_RECEIVER, L""}, {IDD_RECEIVER_PROPERTIES, IDC_PROP_PORT, L""},
    };
    HWND parent = CreateWindowExW(0, L"STATIC", L"", WS_OVERLAPPEDWINDOW, 0, 0, 400, 300, nullptr, nullptr, nullptr, nullptr);
    for (const auto& c : controls) {
        HWND dialog = CreateDialogParamW(ModuleInstance(), MAKEINTRESOURCEW(c.dialog), parent, NoProc, 0);
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
        ASSERT_NE(nullptr, l.list);
        EXPECT_EQ(6, ImageList_GetImageCount(l.list));
        int cx = 0, cy = 0;
        ImageList_GetIconSize(l.list, &cx, &cy);
        EXPECT_EQ(l.cx, cx);
        EXPECT_EQ(l.cy, cy);
    }
}

TEST(ExtractIcon, IndexIsTheLastItemKindLessOne) {
    CReceiversPidlMgr mgr;
    auto List = [&](std::initializer_list<std::pair<DWORD, const wchar_t*>> items) {
        UniquePidl list;
        for (const auto& item : items) {
            UniquePidl one(mgr, mgr.Create(item.first, item.second));
            list = UniquePidl(mgr, mgr.Concatenate(list.Get(), one.Get()));
        }
        return list;
    };
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

TEST(ExtractIcon, ExtractGivesTheKindsPictureAtBothSizes) {
    ASSERT_EQ(S_OK, CModuleApp::Instance().EnsureInitialized());
    const int large = GetSystemMetrics(SM_CXICON), small = GetSystemMetrics(SM_CXSMICON);
    const int expected[] = {IDI_CALVEX, IDI_BRENNOR, IDI_CALVEX, IDI_BRENNOR, IDI_NOITEM, IDI_FILE};
    IExtractIconW* extract = nullptr;
    ASSERT_EQ(CreateCalvexReceiversExtractIcon(nullptr, IID_IExtractIconW, reinterpret_cast<void**>(&extract)), S_OK);
    for (UINT index = 0; index < 6; ++index) {
        HICON bigIcon = nullptr, smallIcon = nullptr;
        ASSERT_EQ(extract->Extract(L"ignored", index, &bigIcon, &smallIcon, MAKELONG(large, small)), S_OK);
        ASSERT_TRUE(bigIcon && smallIcon) << index;
        EXPECT_EQ(NearestResource(bigIcon, large), expected[index]) << "large " << index;
        EXPECT_EQ(NearestResource(smallIcon, small), expected[index]) << "small " << index;
        DestroyIcon(bigIcon);
        DestroyIcon(smallIcon);
    }
    HICON bigIcon = reinterpret_cast<HICON>(1), smallIcon = reinterpret_cast<HICON>(1);
    EXPECT_EQ(extract->Extract(nullptr, 9, &bigIcon, &smallIcon, 0), S_OK) << "no check of the index";
    EXPECT_EQ(bigIcon, nullptr);
    EXPECT_EQ(smallIcon, nullptr);
    extract->Release();
}
