// Guards the walk through Wine's shell: brand folders missing under My Computer, or that do not parse, bind, enumerate, walk into receivers or reach the browser.
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

using namespace testsupport;

namespace {
const wchar_t kComputer[] = L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}";
const wchar_t kCalvex[] = L"::{E102076F-4057-4e7f-8209-511258F12B62}";
const wchar_t kBrennor[] = L"::{E65CDE76-B4FC-447f-A9DD-A011176B14E7}";

struct Listed {
    std::wstring inFolder;  // SHGDN_FORPARSING | SHGDN_INFOLDER: the raw name
    std::wstring normal;    // SHGDN_NORMAL: the display form
    SFGAOF attributes;
};

TaskPidl ParseFromDesktop(const std::wstring& path) {
    ComPtr<IShellFolder> desktop;
    EXPECT_EQ(S_OK, SHGetDesktopFolder(&desktop));
    std::wstring text = path;
    LPITEMIDLIST pidl = nullptr;
    EXPECT_EQ(S_OK, desktop->ParseDisplayName(nullptr, nullptr, &text[0], nullptr, &pidl, nullptr)) << Narrow(path);
    return TaskPidl(pidl);
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
std::vector<Listed> List(IShellFolder* folder, SHCONTF flags, std::vector<TaskPidl>* children = nullptr) {
    std::vector<Listed> listed;
    HRESULT hr = E_FAIL;
    for (TaskPidl& child : ListItems(folder, flags, &hr)) {
        SFGAOF attributes = 0xFFFFFFFF;
        LPCITEMIDLIST one[] = {child.get()};
        folder->GetAttributesOf(1, one, &attributes);
        listed.push_back({NameOf(folder, child.get(), SHGDN_FORPARSING | SHGDN_INFOLDER),
                          NameOf(folder, child.get(), SHGDN_NORMAL), attributes});
        if (children) children->push_back(std::move(child));
    }
    EXPECT_EQ(S_OK, hr);
    return listed;
}

struct Brand {
    const wchar_t* path;
    unsigned kind;
};
class ShellNamespaceTest : public testing::TestWithParam<Brand> {};
}  // namespace

TEST_P(ShellNamespaceTest, ParseBindEnumerateAndWalkIntoAReceiver) {
    const std::wstring root = std::wstring(kComputer) + L"\\" + GetParam().path;
    TaskPidl rootPidl = ParseFromDesktop(root);
    ASSERT_TRUE(rootPidl);
    ComPtr<IShellFolder> folder = BindFromDesktop(rootPidl.get());
    ASSERT_TRUE(folder);

    std::vector<TaskPidl> children;
    std::vector<Listed> receivers = List(folder.Get(), SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &children);
    ASSERT_FALSE(receivers.empty()) << "the sample tree has receivers of both brands";
    for (const Listed& receiver : receivers) {
        SCOPED_TRACE(Narrow(receiver.inFolder));
        EXPECT_EQ(2, std::count(receiver.inFolder.begin(), receiver.inFolder.end(), L'!')) << "serial!model!port";
        EXPECT_NE(std::wstring::npos, receiver.normal.find(L'@')) << "model@port";
        EXPECT_EQ(0x22000000u, receiver.attributes);
    }

    // Into the first receiver: a folder made by the parent's class, its files, and the same
    // receiver reached by parsing its path.
    ComPtr<IShellFolder2> receiverFolder;
    ASSERT_EQ(S_OK, folder->BindToObject(children[0].get(), nullptr, IID_IShellFolder2, receiverFolder.PutVoid()));
    std::vector<Listed> files = List(receiverFolder.Get(), SHCONTF_NONFOLDERS);
    auto* impl = static_cast<IReceiversShellFolderImpl*>(receiverFolder.Get());
    EXPECT_EQ(GetParam().kind == BrandBrennor, dynamic_cast<CBrennorReceiversShellFolder*>(impl) != nullptr);
    EXPECT_EQ(GetParam().kind, impl->BrandKind());
    EXPECT_TRUE(impl->EventSourceCollection()) << "bound to the receiver's files";
    for (const Listed& file : files) EXPECT_EQ(0x02000001u, file.attributes) << Narrow(file.inFolder);
    EXPECT_TRUE(List(receiverFolder.Get(), SHCONTF_FOLDERS).empty()) << "receivers hold no folders";

    TaskPidl receiverPidl = ParseFromDesktop(root + L"\\" + receivers[0].inFolder);
    ASSERT_TRUE(receiverPidl);
    ComPtr<IShellFolder> parsedFolder = BindFromDesktop(receiverPidl.get());
    ASSERT_TRUE(parsedFolder);
    EXPECT_EQ(files.size(), List(parsedFolder.Get(), SHCONTF_NONFOLDERS).size());

    const std::string rootText = Narrow(root);
    EXPECT_TRUE(TraceContains("IReceiversShellFolderImpl::Init " + rootText + "\r\n"));
    EXPECT_TRUE(TraceContains("IReceiversShellFolderImpl::EnumObjects Calvex Receivers\r\n"));
    EXPECT_TRUE(TraceContains("IReceiversShellFolderImpl::Init " + rootText + "\\" +
                                           Narrow(receivers[0].inFolder) + "\r\n"));
    EXPECT_TRUE(TraceContains("Advised for receivers, 0x"));
    EXPECT_TRUE(TraceContains("Advised for files, 0x"));
}

INSTANTIATE_TEST_SUITE_P(Brands, ShellNamespaceTest, testing::Values(Brand{kCalvex, BrandCalvex}, Brand{kBrennor, BrandBrennor}));

// Wine's shell lists what the registration put under My Computer, as folders.
TEST(ShellNamespace, MyComputerListsBothBrandFolders) {
    LPITEMIDLIST drives = nullptr;
    ASSERT_EQ(S_OK, SHGetSpecialFolderLocation(nullptr, CSIDL_DRIVES, &drives));
    TaskPidl owned(drives);
    ComPtr<IShellFolder> folder = BindFromDesktop(drives);
    ASSERT_TRUE(folder);
    const std::vector<Listed> items = List(folder.Get(), SHCONTF_FOLDERS | SHCONTF_NONFOLDERS);
    for (const wchar_t* brand : {L"Calvex GNSS Receivers", L"Brennor GNSS Receivers"}) {
        auto found = std::find_if(items.begin(), items.end(), [&](const Listed& item) { return item.normal == brand; });
        ASSERT_NE(items.end(), found) << Narrow(brand);
        EXPECT_TRUE(found->attributes & SFGAO_FOLDER) << Narrow(brand);
    }
}

// Wine's ExplorerBrowser walks into the receiver (our folder is made for it), asks it for
// its view and shows it: the view lists the receiver's files.
TEST(ShellNamespace, ExplorerBrowserWalksIntoAReceiverAndAsksForItsView) {
    const std::wstring root = std::wstring(kComputer) + L"\\" + kCalvex;
    TaskPidl rootPidl = ParseFromDesktop(root);
    ASSERT_TRUE(rootPidl);
    std::vector<Listed> receivers = List(BindFromDesktop(rootPidl.get()).Get(), SHCONTF_FOLDERS);
    ASSERT_FALSE(receivers.empty());
    const std::wstring receiverPath = root + L"\\" + receivers[0].inFolder;
    TaskPidl receiverPidl = ParseFromDesktop(receiverPath);
    ASSERT_TRUE(receiverPidl);

    HWND host = CreateWindowExW(0, L"STATIC", L"host", WS_OVERLAPPEDWINDOW, 0, 0, 640, 480, nullptr, nullptr, nullptr, nullptr);
    ASSERT_NE(nullptr, host);
    ComPtr<IExplorerBrowser> browser;
    ASSERT_EQ(S_OK, CoCreateInstance(CLSID_ExplorerBrowser, nullptr, CLSCTX_INPROC_SERVER, IID_IExplorerBrowser,
                                     browser.PutVoid()));
    RECT bounds = {0, 0, 640, 480};
    FOLDERSETTINGS settings = {FVM_DETAILS, 0};
    ASSERT_EQ(S_OK, browser->Initialize(host, &bounds, &settings));
    const size_t from = ReadTraceLog().size();
    const HRESULT hr = browser->BrowseToIDList(receiverPidl.get(), SBSP_ABSOLUTE);
    PumpMessagesFor(500);
    EXPECT_EQ(S_OK, hr);
    const std::string trace = ReadTraceLog().substr(from);
    EXPECT_NE(std::string::npos, trace.find("IReceiversShellFolderImpl::Init " + Narrow(receiverPath) + "\r\n"))
        << "the browser bound the receiver folder";
    EXPECT_NE(std::string::npos, trace.find("IReceiversShellFolderImpl::CreateViewObject from 0x"));
    EXPECT_NE(std::string::npos, trace.find("CCalvexReceiversShellView::OnEnumIdList - OK\r\n"));
    browser->Destroy();
    browser.Reset();
    DestroyWindow(host);
}
