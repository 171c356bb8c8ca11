// Guards what the end-to-end walks through Wine's shell do not reach: a receiver's full parsing path that does not parse and bind from the desktop, or binds to a folder of the wrong brand class or kind, unbound from its files, or listing folders.
#include <windows.h>
#include <shlobj.h>
#include <shobjidl.h>

#include <gtest/gtest.h>

#include <string>

#include "com/ComPtr.h"
#include "folder/CBrennorReceiversShellFolder.h"
#include "folder/CCalvexReceiversShellFolder.h"
#include "module/ClassIds.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
// The folder a full parsing path names, parsed and bound from the desktop as Explorer's
// location box does.
ComPtr<IShellFolder2> BindFromDesktop(const std::wstring& path) {
    ComPtr<IShellFolder> desktop;
    ComPtr<IShellFolder2> folder;
    EXPECT_EQ(S_OK, SHGetDesktopFolder(&desktop));
    std::wstring text = path;
    LPITEMIDLIST pidl = nullptr;
    EXPECT_EQ(S_OK, desktop->ParseDisplayName(nullptr, nullptr, &text[0], nullptr, &pidl, nullptr));
    TaskPidl owned(pidl);
    if (pidl) { EXPECT_EQ(S_OK, desktop->BindToObject(pidl, nullptr, IID_IShellFolder2, folder.PutVoid())); }
    return folder;
}
}  // namespace

TEST(ShellNamespace, ReceiverPathsBindFromTheDesktopToAFolderOfTheirBrand) {
    const struct { const wchar_t* path; unsigned kind; size_t files; } cases[] = {  // receivers of the sample tree
        {L"::{E102076F-4057-4e7f-8209-511258F12B62}\\5302-00871!Q9 GNSS!USB", BrandCalvex, 7},
        {L"::{E65CDE76-B4FC-447f-A9DD-A011176B14E7}\\HV3-0042117!HVL3-GNSS!USB", BrandBrennor, 3},
    };
    for (const auto& c : cases) {
        const std::wstring path = std::wstring(L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\") + c.path;
        SCOPED_TRACE(Narrow(path));
        ComPtr<IShellFolder2> folder = BindFromDesktop(path);
        ASSERT_TRUE(folder);
        auto* impl = static_cast<IReceiversShellFolderImpl*>(folder.Get());
        EXPECT_EQ(c.kind == BrandBrennor, dynamic_cast<CBrennorReceiversShellFolder*>(impl) != nullptr);
        EXPECT_EQ(c.kind, impl->BrandKind());
        HRESULT listed = E_FAIL;
        EXPECT_EQ(c.files, ListItems(folder.Get(), SHCONTF_NONFOLDERS, &listed).size());
        EXPECT_EQ(S_OK, listed);
        EXPECT_TRUE(impl->EventSourceCollection()) << "bound to the receiver's files";
        EXPECT_TRUE(ListItems(folder.Get(), SHCONTF_FOLDERS).empty()) << "receivers hold no folders";
        EXPECT_TRUE(TraceContains("IReceiversShellFolderImpl::Init " + Narrow(path) + "\r\n"));
    }
}
