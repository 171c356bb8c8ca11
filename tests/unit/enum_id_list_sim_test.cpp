// CCalvexReceiversEnumIDList over the simulated device manager (made in this process) and the
// repository's sample receivers: the folder's brand, labels, port texts, odd names and the
// ".qpr" rule as a whole listing.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "SimDeviceManager.h"
#include "com/Bstr.h"
#include "items/CCalvexReceiversEnumIDList.h"
#include "items/ItemPath.h"
#include "module/ModuleApp.h"
#include "support/DeviceSim.h"

namespace {
const wchar_t kRoot[] = L"Calvex Receivers";

class EnumIDListSimTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() { CModuleApp::Instance().EnsureInitialized(); }
    void SetUp() override {
        ComPtr<IDeviceMgr> manager;
        ASSERT_EQ(CreateSimDeviceManager(testsupport::SampleReceiversDir().c_str(), IID_IDeviceMgr,
                                         manager.PutVoid()),
                  S_OK);
        ComPtr<IDispatch> receivers;
        ASSERT_EQ(manager->get_Receivers(&receivers), S_OK);
        ASSERT_EQ(receivers.QueryTo(IID_IReceiversColl, m_receivers.PutVoid()), S_OK);
    }

    // The files collection of the receiver with that key, found as the folder finds it.
    ComPtr<IDispatch> FilesOf(const std::wstring& key) {
        ComPtr<IDispatch> receiver, files;
        Bstr lookup(ReceiverLookupKey(key.c_str()));
        ComPtr<IReceiver> found;
        if (SUCCEEDED(m_receivers->get_ItemByKey(lookup.Get(), &receiver)) && receiver &&
            SUCCEEDED(receiver.QueryTo(IID_IReceiver, found.PutVoid())))
            found->get_Files(&files);
        return files;
    }

    // The names listed, sorted: the order is the collection's, which is the service's own.
    std::vector<std::wstring> Names(const std::wstring& path, DWORD flags, IUnknown* collection, DWORD brand,
                                    DWORD expectedType) {
        ComObject<CCalvexReceiversEnumIDList>* enumerator = nullptr;
        EXPECT_EQ(CreateComObject<CCalvexReceiversEnumIDList>(&enumerator), S_OK);
        HRESULT hr = E_FAIL;
        enumerator->Init(path.c_str(), flags, collection, brand, &hr);
        EXPECT_EQ(hr, S_OK);
        std::vector<std::wstring> names;
        if (FAILED(hr)) return names;
        CReceiversPidlMgr mgr;
        PITEMID_CHILD pidl = nullptr;
        while (enumerator->Next(1, &pidl, nullptr) == S_OK) {
            EXPECT_EQ(mgr.GetLastItemType(pidl), expectedType);
            names.push_back(mgr.GetItemName(pidl));
            mgr.Delete(pidl);
        }
        enumerator->Release();
        std::sort(names.begin(), names.end());
        return names;
    }

    ComPtr<IReceiversColl> m_receivers;
};

TEST_F(EnumIDListSimTest, ReceiversOfEachBrand) {
    const struct {
        DWORD brand, type;
        std::vector<std::wstring> keys;
    } cases[] = {
        {1, 3, {L"123-45678!Z#5!COM12", L"5211-40125!Q7#RTK!COM3", L"5302-00871!Q9 GNSS!USB",
                L"5400-00003!Q7#L1-L2!Unknown"}},
        // "R2 no label" has an empty label and is not listed.
        {2, 4, {L"BR-5500-0009!Compact \x00dc#2!USB", L"HV3-0042117!HVL3-GNSS!USB", L"R2-77810!R2#Net!COM4"}},
    };
    for (const auto& c : cases)
        EXPECT_EQ(Names(kRoot, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, m_receivers.Get(), c.brand, c.type), c.keys);
}

TEST_F(EnumIDListSimTest, FilesOfAReceiver) {
    const struct {
        DWORD brand;
        const wchar_t* key;
        std::vector<std::wstring> files;
    } cases[] = {
        {1, L"5211-40125!Q7#RTK!COM3", {L"20261103A.T02.qpr", L"LOG0001.qpr", L"LOG0002.qpr"}},
        {2, L"HV3-0042117!HVL3-GNSS!USB", {L"20261102A.T02.qpr", L"20261103A.T02.qpr", L"LOG0001.qpr"}},
        {2, L"R2-77810!R2#Net!COM4", {L"LOG0001", L"LOG0002"}},
        // names as the service gives them, "!" and "#" included
        {2, L"BR-5500-0009!Compact \x00dc#2!USB",
         {L"Mesure \x00e9t\x00e9.log", L"done!", L"point#3", L"site survey 1.dat", L"\x00c5\x00c4\x00d6-\x6f22\x5b57.T02"}},
    };
    for (const auto& c : cases) {
        ComPtr<IDispatch> files = FilesOf(c.key);
        ASSERT_TRUE(files) << testsupport::Narrow(c.key);
        EXPECT_EQ(Names(std::wstring(kRoot) + L"\\" + c.key, SHCONTF_NONFOLDERS, files.Get(), c.brand, 6), c.files);
    }
}
}  // namespace
