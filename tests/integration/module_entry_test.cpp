// Guards the DLL's exports: wrong class objects or lock counts, load and unload trace lines, column widths misread at load or not written at unload.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "com/ComPtr.h"
#include "module/ClassIds.h"
#include "module/Settings.h"
#include "support/LoadedModule.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
ComPtr<IClassFactory> Factory(LoadedModule& module, const CLSID& clsid) {
    ComPtr<IClassFactory> factory;
    EXPECT_EQ(S_OK, module.getClassObject(clsid, IID_IClassFactory, factory.PutVoid()));
    return factory;
}

const CLSID* const kTableClasses[] = {
    &CLSID_CalvexReceiversShellFolder, &CLSID_CalvexReceiversShellView, &CLSID_CalvexReceiversEnumIDList,
    &CLSID_CalvexReceiversExtractIcon, &CLSID_CalvexReceiversContextMenu, &CLSID_CalvexReceiversDataObject,
    &CLSID_CalvexReceiversQueryInfo, &CLSID_BrennorReceiversShellFolder};
}  // namespace

TEST(ModuleEntry, ClassObjectsAreCachedAndCreatePlainAndAggregatedObjects) {
    LoadedModule module;
    ASSERT_TRUE(module.Loaded());
    static const CLSID kForeign = {0x12345678, 0x1234, 0x1234, {1, 2, 3, 4, 5, 6, 7, 8}};
    const struct { const CLSID& clsid; REFIID iid; HRESULT expected; } refused[] = {
        {kForeign, IID_IClassFactory, CLASS_E_CLASSNOTAVAILABLE}, {CLSID_CalvexReceiversShellFolder, IID_IDataObject, E_NOINTERFACE}};
    for (const auto& r : refused) {
        void* object = reinterpret_cast<void*>(0x1);
        EXPECT_EQ(r.expected, module.getClassObject(r.clsid, r.iid, &object));
        EXPECT_EQ(nullptr, object);
    }
    for (const CLSID* clsid : kTableClasses) {
        SCOPED_TRACE(testing::Message() << "class " << (clsid - kTableClasses[0]));
        ComPtr<IClassFactory> factory = Factory(module, *clsid), again = Factory(module, *clsid);
        ASSERT_TRUE(factory);
        EXPECT_EQ(factory.Get(), again.Get()) << "the factory is made once and cached";
        ComPtr<IUnknown> plain;
        EXPECT_EQ(S_OK, factory->CreateInstance(nullptr, IID_IUnknown, plain.PutVoid()));
        ASSERT_TRUE(plain);
        // Any object of ours can stand in for an outer unknown.
        void* inner = reinterpret_cast<void*>(0x1);
        EXPECT_EQ(CLASS_E_NOAGGREGATION, factory->CreateInstance(plain.Get(), IID_IClassFactory, &inner));
        EXPECT_EQ(nullptr, inner);
        IUnknown* aggregated = nullptr;
        EXPECT_EQ(S_OK, factory->CreateInstance(plain.Get(), IID_IUnknown, reinterpret_cast<void**>(&aggregated)));
        EXPECT_EQ(0u, aggregated ? aggregated->Release() : 1u);
    }
}

TEST(ModuleEntry, CanUnloadOnlyWhenNothingIsAlive) {
    LoadedModule module;
    ASSERT_TRUE(module.Loaded());
    EXPECT_EQ(S_OK, module.canUnloadNow());
    ComPtr<IClassFactory> factory = Factory(module, CLSID_CalvexReceiversShellFolder);
    ASSERT_TRUE(factory);
    EXPECT_EQ(S_FALSE, module.canUnloadNow()) << "a factory reference is held";
    ASSERT_EQ(S_OK, factory->LockServer(TRUE));
    factory.Reset();
    EXPECT_EQ(S_FALSE, module.canUnloadNow()) << "the server is locked";
    ComPtr<IUnknown> object;
    factory = Factory(module, CLSID_CalvexReceiversShellFolder);
    ASSERT_EQ(S_OK, factory->CreateInstance(nullptr, IID_IUnknown, object.PutVoid()));
    ASSERT_EQ(S_OK, factory->LockServer(FALSE));
    factory.Reset();
    EXPECT_EQ(S_FALSE, module.canUnloadNow()) << "an object lives";
    object.Reset();
    // The factory stays cached in the class table, which alone does not pin the module.
    EXPECT_EQ(S_OK, module.canUnloadNow());
}

// Each load starts the trace file anew (hidden) with its identity; the unload ends it and stores
// as 12 little-endian bytes the column widths read at load: those of a stored value of 8 to 16
// bytes, else 100 each.
TEST(ModuleEntry, EachLoadRecreatesTheTraceAndUnloadSavesTheWidthsItRead) {
    const DWORD stored[5] = {0x141, 45, 7, 9, 11};
    const struct { DWORD size; BYTE name0, name1, second; } cases[] = {
        {0, 100, 0, 100}, {8, 0x41, 1, 45}, {12, 0x41, 1, 45}, {16, 0x41, 1, 45}, {20, 100, 0, 100}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.size);
        RegDeleteKeyW(HKEY_CURRENT_USER, kSettingsKey);
        if (c.size) { ASSERT_EQ(0, RegSetKeyValueW(HKEY_CURRENT_USER, kSettingsKey, kDisplaySettingsValue, REG_BINARY, stored, c.size)); }
        LoadedModule module;
        ASSERT_TRUE(module.Loaded());
        EXPECT_EQ(S_OK, module.canUnloadNow());  // does not load the module's state
        ASSERT_TRUE(Factory(module, c.size % 8 ? CLSID_BrennorReceiversShellFolder : CLSID_CalvexReceiversShellFolder));
        module.Unload();
        EXPECT_EQ(std::vector<std::string>({"CModuleApp::InitInstance\r\n", "Module is loaded [" + Narrow(ModuleDllPath()) +
                                            "] [1.0.0.1]\r\n", "CModuleApp::ExitInstance\r\n"}),
                  TraceMessages()) << "nothing left of the earlier load";
        BYTE value[32];
        DWORD size = sizeof value, type = 0;
        ASSERT_EQ(ERROR_SUCCESS,
                  RegGetValueW(HKEY_CURRENT_USER, kSettingsKey, kDisplaySettingsValue, RRF_RT_ANY, &type, value, &size));
        const BYTE widths[12] = {c.name0, c.name1, 0, 0, c.second, 0, 0, 0, 0, 0, 0, 0};
        EXPECT_EQ(std::make_pair(DWORD(REG_BINARY), std::string(reinterpret_cast<const char*>(widths), 12)),
                  std::make_pair(type, std::string(reinterpret_cast<const char*>(value), size)));
    }
    RegDeleteKeyW(HKEY_CURRENT_USER, kSettingsKey);  // other tests in this prefix start from the defaults
    const DWORD attributes = GetFileAttributesW(TraceLogPath().c_str());
    ASSERT_NE(INVALID_FILE_ATTRIBUTES, attributes);
    EXPECT_TRUE(attributes & FILE_ATTRIBUTE_HIDDEN);
}

TEST(ModuleEntry, SecondProcessLeavesTheHeldTraceFileAlone) {
    LoadedModule module;
    ASSERT_TRUE(Factory(module, CLSID_CalvexReceiversShellFolder));
    const std::string before = ReadTraceLog();
    ASSERT_FALSE(before.empty());
    // regsvr32 loads the module in a process of its own (inheriting our %TEMP%): it cannot
    // open the trace file that we hold, so it works on without tracing.
    EXPECT_EQ(0u, RunProcess(L"regsvr32.exe /s \"" + ModuleDllPath() + L"\""))
        << "registration works without a trace";
    EXPECT_EQ(before, ReadTraceLog());
}
