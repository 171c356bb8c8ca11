// Guards the DLL's exports: wrong class objects or lock counts, load and unload trace lines, settings not written at unload.
#include <windows.h>
#include <shlobj.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "module/ClassIds.h"
#include "module/Settings.h"
#include "support/LoadedModule.h"
#include "support/TestSupport.h"

namespace {
using testsupport::LoadedModule;

IClassFactory* Factory(LoadedModule& module, const CLSID& clsid) {
    IClassFactory* factory = nullptr;
    EXPECT_EQ(S_OK, module.getClassObject(clsid, IID_IClassFactory, reinterpret_cast<void**>(&factory)));
    return factory;
}

const CLSID* const kTableClasses[] = {
    &CLSID_CalvexReceiversShellFolder, &CLSID_CalvexReceiversShellView, &CLSID_CalvexReceiversEnumIDList,
    &CLSID_CalvexReceiversExtractIcon, &CLSID_CalvexReceiversContextMenu, &CLSID_CalvexReceiversDataObject,
    &CLSID_CalvexReceiversQueryInfo, &CLSID_BrennorReceiversShellFolder,
};
}  // namespace

TEST(ModuleEntry, ClassObjectLookup) {
    LoadedModule module;
    ASSERT_TRUE(module.Loaded());
    static const CLSID kForeign = {0x12345678, 0x1234, 0x1234, {1, 2, 3, 4, 5, 6, 7, 8}};
    void* object = reinterpret_cast<void*>(0x1);
    EXPECT_EQ(CLASS_E_CLASSNOTAVAILABLE, module.getClassObject(kForeign, IID_IClassFactory, &object));
    EXPECT_EQ(nullptr, object);
    object = reinterpret_cast<void*>(0x1);
    EXPECT_EQ(E_NOINTERFACE, module.getClassObject(CLSID_CalvexReceiversShellFolder, IID_IDataObject, &object));
    EXPECT_EQ(nullptr, object);

    for (const CLSID* clsid : kTableClasses) {
        SCOPED_TRACE(testing::Message() << "class " << (clsid - kTableClasses[0]));
        IClassFactory* first = Factory(module, *clsid);
        IClassFactory* second = Factory(module, *clsid);
        ASSERT_NE(nullptr, first);
        EXPECT_EQ(first, second) << "the factory is made once and cached";
        second->Release();
        first->Release();
    }
}

TEST(ModuleEntry, FactoryCreatesPlainAndAggregatedObjects) {
    LoadedModule module;
    ASSERT_TRUE(module.Loaded());
    for (const CLSID* clsid : kTableClasses) {
        IClassFactory* factory = Factory(module, *clsid);
        ASSERT_NE(nullptr, factory);
        IUnknown* plain = nullptr;
        EXPECT_EQ(S_OK, factory->CreateInstance(nullptr, IID_IUnknown, reinterpret_cast<void**>(&plain)));
        ASSERT_NE(nullptr, plain);

        // Any object of ours can stand in for an outer unknown.
        void* inner = reinterpret_cast<void*>(0x1);
        EXPECT_EQ(CLASS_E_NOAGGREGATION, factory->CreateInstance(plain, IID_IClassFactory, &inner));
        EXPECT_EQ(nullptr, inner);
        IUnknown* aggregated = nullptr;
        EXPECT_EQ(S_OK, factory->CreateInstance(plain, IID_IUnknown, reinterpret_cast<void**>(&aggregated)));
        ASSERT_NE(nullptr, aggregated);
        EXPECT_EQ(0u, aggregated->Release());
        plain->Release();
        factory->Release();
    }
}

TEST(ModuleEntry, CanUnloadOnlyWhenNothingIsAlive) {
    LoadedModule module;
    ASSERT_TRUE(module.Loaded());
    EXPECT_EQ(S_OK, module.canUnloadNow());

    IClassFactory* factory = Factory(module, CLSID_CalvexReceiversShellFolder);
    ASSERT_NE(nullptr, factory);
    EXPECT_EQ(S_FALSE, module.canUnloadNow()) << "a factory reference is held";
    ASSERT_EQ(S_OK, factory->LockServer(TRUE));
    factory->Release();
    EXPECT_EQ(S_FALSE, module.canUnloadNow()) << "the server is locked";

    IUnknown* object = nullptr;
    factory = Factory(module, CLSID_CalvexReceiversShellFolder);
    ASSERT_EQ(S_OK, factory->CreateInstance(nullptr, IID_IUnknown, reinterpret_cast<void**>(&object)));
    ASSERT_EQ(S_OK, factory->LockServer(FALSE));
    factory->Release();
    EXPECT_EQ(S_FALSE, module.canUnloadNow()) << "an object lives";
    object->Release();
    // The factory stays cached in the class table, which alone does not pin the module.
    EXPECT_EQ(S_OK, module.canUnloadNow());
}

TEST(ModuleEntry, LoadAndUnloadTraceAndSaveSettings) {
    RegDeleteKeyW(HKEY_CURRENT_USER, kSettingsKey);
    {
        LoadedModule module;
        ASSERT_TRUE(module.Loaded());
        IClassFactory* factory = Factory(module, CLSID_BrennorReceiversShellFolder);
        ASSERT_NE(nullptr, factory);
        factory->Release();
        std::vector<std::string> lines = testsupport::TraceMessages();
        ASSERT_GE(lines.size(), 2u);
        EXPECT_EQ("CModuleApp::InitInstance\r\n", lines[0]);
        EXPECT_EQ("Module is loaded [" + testsupport::Narrow(testsupport::ModuleDllPath()) + "] [1.0.0.1]\r\n",
                  lines[1]);
    }
    // Unloaded: the last line is the unload's, and the widths were stored as 12 bytes.
    std::vector<std::string> lines = testsupport::TraceMessages();
    ASSERT_FALSE(lines.empty());
    EXPECT_EQ("CModuleApp::ExitInstance\r\n", lines.back());
    BYTE value[32];
    DWORD size = sizeof value;
    DWORD type = 0;
    ASSERT_EQ(ERROR_SUCCESS, RegGetValueW(HKEY_CURRENT_USER, kSettingsKey, kDisplaySettingsValue,
                                          RRF_RT_ANY, &type, value, &size));
    EXPECT_EQ(static_cast<DWORD>(REG_BINARY), type);
    EXPECT_EQ(12u, size);
    const DWORD expected[3] = {100, 100, 0};
    EXPECT_EQ(0, memcmp(expected, value, sizeof expected));
}

TEST(ModuleEntry, EachLoadRecreatesTheTraceFile) {
    for (int load = 0; load < 2; ++load) {
        LoadedModule module;
        ASSERT_TRUE(module.Loaded());
        EXPECT_EQ(S_OK, module.canUnloadNow());  // does not load the module's state
        IClassFactory* factory = Factory(module, CLSID_CalvexReceiversShellFolder);
        ASSERT_NE(nullptr, factory);
        factory->Release();
        module.Unload();
        std::vector<std::string> lines = testsupport::TraceMessages();
        SCOPED_TRACE(load);
        ASSERT_EQ(3u, lines.size()) << "init, identity, exit; nothing left of the earlier load";
        EXPECT_EQ("CModuleApp::InitInstance\r\n", lines[0]);
        EXPECT_EQ("CModuleApp::ExitInstance\r\n", lines[2]);
    }
    DWORD attributes = GetFileAttributesW(testsupport::TraceLogPath().c_str());
    ASSERT_NE(INVALID_FILE_ATTRIBUTES, attributes);
    EXPECT_TRUE(attributes & FILE_ATTRIBUTE_HIDDEN);
}

TEST(ModuleEntry, SecondProcessLeavesTheHeldTraceFileAlone) {
    LoadedModule module;
    ASSERT_TRUE(module.Loaded());
    IClassFactory* factory = Factory(module, CLSID_CalvexReceiversShellFolder);
    ASSERT_NE(nullptr, factory);
    factory->Release();
    const std::string before = testsupport::ReadTraceLog();
    ASSERT_FALSE(before.empty());

    // regsvr32 loads the module in a process of its own (inheriting our %TEMP%): it cannot
    // open the trace file that we hold, so it works on without tracing.
    EXPECT_EQ(0u, testsupport::RunProcess(L"regsvr32.exe /s \"" + testsupport::ModuleDllPath() + L"\""))
        << "registration works without a trace";
    EXPECT_EQ(before, testsupport::ReadTraceLog());
}
