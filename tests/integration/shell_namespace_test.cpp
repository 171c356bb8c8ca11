// Guards the walk through Wine's shell: brand folders that do not parse, bind, enumerate, walk into receivers or reach the browser.
#include <windows.h>
#include <shlobj.h>
#include <shlwapi.h>
#include <shobjidl.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "com/ComPtr.h"
#include "folder/CBrennorReceiversShellFolder.h"
#include "folder/CCalvexReceiversShellFolder.h"
#include "module/ClassIds.h"
#include "support/TestSupport.h"

namespace {
const wchar_t kComputer[] = L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}";
const wchar_t kCalvex[] = L"::{E102076F-4057-4e7f-8209-511258F12B62}";
const wchar_t kBrennor[] = L"::{E65CDE76-B4FC-447f-A9DD-A011176B14E7}";

struct Listed {
    std::wstring inFolder;  // SHGDN_FORPARSING | SHGDN_INFOLDER: the raw name
    std::wstring normal;    // SHGDN_NORMAL: the display form
    SFGAOF attributes;
};

LPITEMIDLIST ParseFromDesktop(const std::wstring& path) {
    ComPtr<IShellFolder> desktop;
    EXPECT_EQ(S_OK, SHGetDesktopFolder(&desktop));
    std::wstring text = path;
    LPITEMIDLIST pidl = nullptr;
    EXPECT_EQ(S_OK, desktop->ParseDisplayName(nullptr, nullptr, &text[0], nullptr, &pidl, nullptr)) << testsupport::Narrow(path);
    return pidl;
}

ComPtr<IShellFolder> BindFromDesktop(LPCITEMIDLIST pidl) {
    ComPtr<IShellFolder> desktop, folder;
    SHGetDesktopFolder(&desktop);
    EXPECT_EQ(S_OK, desktop->BindToObject(pidl, nullptr, IID_IShellFolder, folder.PutVoid()));
    return folder;
}

std::wstring NameOf(IShellFolder* folder, LPCITEMIDLIST child, SHGDNF flags) {
    STRRET name = {};
    if (FAILED(folder->GetDisplayNameOf(child, flags, &name))) return L"<failed>";
    LPWSTR text = nullptr;
    StrRetToStrW(&name, child, &text);
    std::wstring result = text ? text : L"";
    CoTaskMemFree(text);
    return result;
}

// Every item of the folder, with the children's lists when asked for.
std::vector<Listed> List(IShellFolder* folder, SHCONTF flags, std::vector<LPITEMIDLIST>* children = nullptr) {
    std::vector<Listed> listed;
    ComPtr<IEnumIDList> items;
    EXPECT_EQ(S_OK, folder->EnumObjects(nullptr, flags, &items));
    if (!items) return listed;
    LPITEMIDLIST child = nullptr;
    while (items->Next(1, &child, nullptr) == S_OK) {
        SFGAOF attributes = 0xFFFFFFFF;
        LPCITEMIDLIST one[] = {child};
        folder->GetAttributesOf(1, one, &attributes);
        listed.push_back({NameOf(folder, child, SHGDN_FORPARSING | SHGDN_INFOLDER), NameOf(folder, child, SHGDN_NORMAL),
                          attributes});
        if (children) children->push_back(child); else CoTaskMemFree(child);
    }
    return listed;
}

class ShellNamespaceTest : public testing::TestWithParam<const wchar_t*> {};
}  // namespace

TEST_P(ShellNamespaceTest, ParseBindEnumerateAndWalkIntoAReceiver) {
    const std::wstring root = std::wstring(kComputer) + L"\\" + GetParam();
    LPITEMIDLIST rootPidl = ParseFromDesktop(root);
    ASSERT_NE(nullptr, rootPidl);
    ComPtr<IShellFolder> folder = BindFromDesktop(rootPidl);
    ASSERT_TRUE(folder);

    std::vector<LPITEMIDLIST> children;
    std::vector<Listed> receivers = List(folder.Get(), SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &children);
    ASSERT_FALSE(receivers.empty()) << "the sample tree has receivers of both brands";
    for (const Listed& receiver : receivers) {
        SCOPED_TRACE(testsupport::Narrow(receiver.inFolder));
        EXPECT_EQ(2, std::count(receiver.inFolder.begin(), receiver.inFolder.end(), L'!')) << "serial!model!port";
        EXPECT_NE(std::wstring::npos, receiver.normal.find(L'@')) << "model@port";
        EXPECT_EQ(0x22000000u, receiver.attributes);
    }

    // Into the first receiver: the files, and the same receiver reached by parsing its path.
    ComPtr<IShellFolder> receiverFolder;
    ASSERT_EQ(S_OK, folder->BindToObject(children[0], nullptr, IID_IShellFolder, receiverFolder.PutVoid()));
    std::vector<Listed> files = List(receiverFolder.Get(), SHCONTF_NONFOLDERS);
    for (const Listed& file : files) EXPECT_EQ(0x02000001u, file.attributes) << testsupport::Narrow(file.inFolder);
    EXPECT_TRUE(List(receiverFolder.Get(), SHCONTF_FOLDERS).empty()) << "receivers hold no folders";

    LPITEMIDLIST receiverPidl = ParseFromDesktop(root + L"\\" + receivers[0].inFolder);
    ASSERT_NE(nullptr, receiverPidl);
    ComPtr<IShellFolder> parsedFolder = BindFromDesktop(receiverPidl);
    ASSERT_TRUE(parsedFolder);
    EXPECT_EQ(files.size(), List(parsedFolder.Get(), SHCONTF_NONFOLDERS).size());

    for (LPITEMIDLIST child : children) CoTaskMemFree(child);
    CoTaskMemFree(receiverPidl);
    CoTaskMemFree(rootPidl);

    const std::string rootText = testsupport::Narrow(root);
    EXPECT_TRUE(testsupport::TraceContains("IReceiversShellFolderImpl::Init " + rootText + "\r\n"));
    EXPECT_TRUE(testsupport::TraceContains("IReceiversShellFolderImpl::EnumObjects Calvex Receivers\r\n"));
    EXPECT_TRUE(testsupport::TraceContains("IReceiversShellFolderImpl::Init " + rootText + "\\" +
                                           testsupport::Narrow(receivers[0].inFolder) + "\r\n"));
    EXPECT_TRUE(testsupport::TraceContains("Advised for receivers, 0x"));
    EXPECT_TRUE(testsupport::TraceContains("Advised for files, 0x"));
}

INSTANTIATE_TEST_SUITE_P(Brands, ShellNamespaceTest, testing::Values(kCalvex, kBrennor));

// Wine's ExplorerBrowser walks into the receiver (our folder is made for it), asks it for
// its view and shows it: the view lists the receiver's files.
TEST(ShellNamespace, ExplorerBrowserWalksIntoAReceiverAndAsksForItsView) {
    const std::wstring root = std::wstring(kComputer) + L"\\" + kCalvex;
    LPITEMIDLIST rootPidl = ParseFromDesktop(root);
    ASSERT_NE(nullptr, rootPidl);
    std::vector<Listed> receivers = List(BindFromDesktop(rootPidl).Get(), SHCONTF_FOLDERS);
    CoTaskMemFree(rootPidl);
    ASSERT_FALSE(receivers.empty());
    const std::wstring receiverPath = root + L"\\" + receivers[0].inFolder;
    LPITEMIDLIST receiverPidl = ParseFromDesktop(receiverPath);
    ASSERT_NE(nullptr, receiverPidl);

    HWND host = CreateWindowExW(0, L"STATIC", L"host", WS_OVERLAPPEDWINDOW, 0, 0, 640, 480, nullptr, nullptr, nullptr, nullptr);
    ASSERT_NE(nullptr, host);
    ComPtr<IExplorerBrowser> browser;
    ASSERT_EQ(S_OK, CoCreateInstance(CLSID_ExplorerBrowser, nullptr, CLSCTX_INPROC_SERVER, IID_IExplorerBrowser,
                                     browser.PutVoid()));
    RECT bounds = {0, 0, 640, 480};
    FOLDERSETTINGS settings = {FVM_DETAILS, 0};
    ASSERT_EQ(S_OK, browser->Initialize(host, &bounds, &settings));
    const size_t from = testsupport::ReadTraceLog().size();
    const HRESULT hr = browser->BrowseToIDList(receiverPidl, SBSP_ABSOLUTE);
    testsupport::PumpMessagesFor(500);
    EXPECT_EQ(S_OK, hr);
    const std::string trace = testsupport::ReadTraceLog().substr(from);
    EXPECT_NE(std::string::npos, trace.find("IReceiversShellFolderImpl::Init " + testsupport::Narrow(receiverPath) + "\r\n"))
        << "the browser bound the receiver folder";
    EXPECT_NE(std::string::npos, trace.find("IReceiversShellFolderImpl::CreateViewObject from 0x"));
    EXPECT_NE(std::string::npos, trace.find("CCalvexReceiversShellView::OnEnumIdList - OK\r\n"));
    CoTaskMemFree(receiverPidl);
    browser->Destroy();
    browser.Reset();
    DestroyWindow(host);
}

// A receiver sub-folder is made by its parent's class: a Brennor root hands out Brennor
// receiver folders, which still report the Calvex class.
TEST(ShellNamespace, ReceiverFoldersKeepTheirParentsBrand) {
    ComObject<CBrennorReceiversShellFolder>* root = nullptr;
    ASSERT_EQ(S_OK, CreateComObject<CBrennorReceiversShellFolder>(&root));
    ComPtr<IShellFolder> rootFolder(static_cast<IShellFolder2*>(root));
    root->Release();
    ASSERT_EQ(S_OK, root->Initialize(nullptr));
    std::vector<LPITEMIDLIST> children;
    List(rootFolder.Get(), SHCONTF_FOLDERS, &children);
    ASSERT_FALSE(children.empty());
    ComPtr<IShellFolder2> receiver;
    ASSERT_EQ(S_OK, rootFolder->BindToObject(children[0], nullptr, IID_IShellFolder2, receiver.PutVoid()));
    auto* impl = static_cast<IReceiversShellFolderImpl*>(receiver.Get());
    EXPECT_NE(nullptr, dynamic_cast<CBrennorReceiversShellFolder*>(impl));
    EXPECT_EQ(2u, impl->BrandKind());
    EXPECT_TRUE(impl->EventSourceCollection()) << "bound to the receiver's files";
    CLSID clsid = GUID_NULL;
    EXPECT_EQ(S_OK, impl->GetClassID(&clsid));
    EXPECT_TRUE(IsEqualCLSID(CLSID_CalvexReceiversShellFolder, clsid));
    for (LPITEMIDLIST child : children) CoTaskMemFree(child);
}
