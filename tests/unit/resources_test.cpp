// Guards the module's resources: a missing or wrong text, icon, dialog control or image list.
#include <windows.h>
#include <commctrl.h>

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "module/ModuleApp.h"
#include "resources/resource.h"

namespace {
std::vector<BYTE> IconPixels(WORD id, int size) {
    HICON icon = static_cast<HICON>(LoadImageW(ModuleInstance(), MAKEINTRESOURCEW(id), IMAGE_ICON, size, size, 0));
    if (!icon) return {};
    HDC screen = GetDC(nullptr);
    HDC dc = CreateCompatibleDC(screen);
    BITMAPINFO info = {};
    info.bmiHeader = {sizeof(BITMAPINFOHEADER), size, -size, 1, 32, BI_RGB};
    void* bits = nullptr;
    HBITMAP bitmap = CreateDIBSection(dc, &info, DIB_RGB_COLORS, &bits, nullptr, 0);
    HGDIOBJ old = SelectObject(dc, bitmap);
    DrawIconEx(dc, 0, 0, icon, size, size, 0, nullptr, DI_NORMAL);
    std::vector<BYTE> pixels(static_cast<const BYTE*>(bits), static_cast<const BYTE*>(bits) + size * size * 4);
    SelectObject(dc, old);
    DeleteObject(bitmap);
    DeleteDC(dc);
    ReleaseDC(nullptr, screen);
    DestroyIcon(icon);
    return pixels;
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
            pictures.push_back(IconPixels(id, size));
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
