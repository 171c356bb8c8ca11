// Guards how calvex-fetch --watch hears of receivers: the prefix test on item identifier bytes (whole items only), and that the path notification the folders send for a brand folder reaches a listener in the same process as that folder's identifier.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "ShellChangeListener.h"
#include "ShellNamespace.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
// An identifier list from items given as their data bytes.
std::vector<BYTE> List(const std::vector<std::string>& items) {
    std::vector<BYTE> bytes;
    for (const std::string& item : items) {
        const USHORT size = static_cast<USHORT>(item.size() + sizeof(USHORT));
        bytes.push_back(static_cast<BYTE>(size));
        bytes.push_back(static_cast<BYTE>(size >> 8));
        bytes.insert(bytes.end(), item.begin(), item.end());
    }
    bytes.insert(bytes.end(), {0, 0});
    return bytes;
}
PCIDLIST_ABSOLUTE Items(const std::vector<BYTE>& bytes) { return reinterpret_cast<PCIDLIST_ABSOLUTE>(bytes.data()); }
}  // namespace

TEST(ShellChangeListenerTest, PrefixTakesWholeItemsOnly) {
    const struct Row {
        const char* what;
        std::vector<std::string> item, prefix;
        bool below;
        size_t restBytes;  // of the rest, terminator included
    } rows[] = {
        {"the folder itself", {"computer", "brand"}, {"computer", "brand"}, true, 2},
        {"a receiver below it", {"computer", "brand", "receiver"}, {"computer", "brand"}, true, 12},
        {"a file two levels down", {"computer", "brand", "rx", "file"}, {"computer", "brand"}, true, 12},
        {"another brand", {"computer", "brandX"}, {"computer", "brand"}, false, 0},
        {"the prefix ends inside an item", {"computer", "brandreceiver"}, {"computer", "brand"}, false, 0},
        {"same bytes, other item sizes", {"computerbrand"}, {"computer", "brand"}, false, 0},
        {"above the folder", {"computer"}, {"computer", "brand"}, false, 0},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.what);
        const std::vector<BYTE> item = List(row.item), prefix = List(row.prefix);
        PCUIDLIST_RELATIVE rest = nullptr;
        EXPECT_EQ(row.below, PrefixRest(Items(item), Items(prefix), &rest));
        if (row.below) {
            EXPECT_EQ(row.restBytes, ILGetSize(rest));
        }
    }
    EXPECT_FALSE(PrefixRest(nullptr, Items(List({"computer"})), nullptr));
}

TEST(ShellChangeListenerTest, HearsTheFolderNotificationForABrandFolder) {
    ASSERT_TRUE(SUCCEEDED(OleInitialize(nullptr)));
    {
        OwnedItem brand;
        ASSERT_EQ(S_OK, ParseShellPath(kBrandFolderPaths[1], brand));
        std::vector<LONG> heard;
        ShellChangeListener listener([&](LONG event, PCIDLIST_ABSOLUTE item) {
            PCUIDLIST_RELATIVE rest = nullptr;
            if (PrefixRest(item, brand.get(), &rest) && ILIsEmpty(rest)) heard.push_back(event);
        });
        ASSERT_EQ(S_OK, listener.Start({brand.get()}));
        // As the folders send it: the brand folder's parsing path.
        SHChangeNotify(SHCNE_UPDATEDIR, SHCNF_PATHW | SHCNF_FLUSH, kBrandFolderPaths[1], nullptr);
        PumpMessagesFor(500);
        ASSERT_FALSE(heard.empty()) << "no notification for the brand folder";
        EXPECT_EQ(SHCNE_UPDATEDIR, heard[0]);
        // The other brand's folder is not this one.
        heard.clear();
        SHChangeNotify(SHCNE_UPDATEDIR, SHCNF_PATHW | SHCNF_FLUSH, kBrandFolderPaths[0], nullptr);
        PumpMessagesFor(500);
        EXPECT_TRUE(heard.empty());
    }
    OleUninitialize();
}
