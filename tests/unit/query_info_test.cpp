// Guards the info tip: a text other than the item's stored one, or memory not from the allocator.
#include <gtest/gtest.h>

#include <string>

#include "module/ClassCreators.h"
#include "pidl_test_malloc.h"
#include "view/CCalvexReceiversQueryInfo.h"

namespace {
TEST(QueryInfoTest, TipIsTheRawStoredText) {
    GuardedMalloc malloc;
    CReceiversPidlMgr mgr(&malloc);
    UniquePidl root(mgr, mgr.CreateRoot(1));
    UniquePidl receiver(mgr, mgr.Create(ItemTypeBrennorReceiver, L"123-45678!Z#5!COM3"));
    UniquePidl file(mgr, mgr.Create(ItemTypeFile, L"dir\\FILE.qpr"));
    const struct {
        LPCITEMIDLIST item;
        const wchar_t* tip;
    } cases[] = {
        {receiver.Get(), L"123-45678!Z#5!COM3"},
        {file.Get(), L"dir\\FILE.qpr"},
        {root.Get(), L"Calvex Receivers"},
        {nullptr, L""},
    };
    for (const auto& c : cases) {
        ComObject<CCalvexReceiversQueryInfo>* info = nullptr;
        ASSERT_EQ(CreateComObject<CCalvexReceiversQueryInfo>(&info, &malloc), S_OK);
        ASSERT_EQ(info->SetItem(c.item), S_OK);
        PWSTR tip = nullptr;
        EXPECT_EQ(info->GetInfoTip(QITIPF_DEFAULT, &tip), S_OK);
        ASSERT_TRUE(tip);
        EXPECT_STREQ(tip, c.tip);
        EXPECT_EQ(malloc.GetSize(tip), (wcslen(c.tip) + 1) * sizeof(wchar_t)) << "exactly the text and its zero";
        malloc.Free(tip);
        info->Release();
    }
    root.Reset(), receiver.Reset(), file.Reset();
    EXPECT_EQ(malloc.Outstanding(), 0u);
}

TEST(QueryInfoTest, OutOfMemoryAndFlags) {
    GuardedMalloc malloc;
    ComObject<CCalvexReceiversQueryInfo>* info = nullptr;
    ASSERT_EQ(CreateComObject<CCalvexReceiversQueryInfo>(&info, &malloc), S_OK);
    malloc.FailAfter(0);
    PWSTR tip = reinterpret_cast<PWSTR>(1);
    EXPECT_EQ(info->GetInfoTip(0, &tip), E_OUTOFMEMORY);
    EXPECT_EQ(tip, nullptr);
    malloc.FailAfter(-1);
    DWORD flags = 5;
    EXPECT_EQ(info->GetInfoFlags(&flags), E_NOTIMPL);
    info->Release();
    EXPECT_EQ(malloc.HeldReferences(), 0u);
}

TEST(QueryInfoTest, ClassTableCreatorsGiveTheirInterfaces) {
    const struct {
        HRESULT (*create)(IUnknown*, REFIID, void**);
        const IID* iid;
    } cases[] = {
        {CreateCalvexReceiversQueryInfo, &IID_IQueryInfo},
        {CreateCalvexReceiversExtractIcon, &IID_IExtractIconW},
        {CreateCalvexReceiversEnumIDList, &IID_IEnumIDList},
    };
    for (const auto& c : cases) {
        IUnknown* object = nullptr;
        EXPECT_EQ(c.create(nullptr, *c.iid, reinterpret_cast<void**>(&object)), S_OK);
        ASSERT_TRUE(object);
        object->Release();
        EXPECT_EQ(c.create(nullptr, IID_IDataObject, reinterpret_cast<void**>(&object)), E_NOINTERFACE);
        EXPECT_EQ(object, nullptr);
    }
}
}  // namespace
