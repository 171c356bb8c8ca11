// Guards registration: a key Explorer needs missing or wrong, a key left behind at removal, attributes written after a failure.
#include <windows.h>

#include <gtest/gtest.h>

#include "module/ModuleRegistration.h"
#include "support/LoadedModule.h"
#include "support/RegistrationExpectations.h"

using namespace testsupport;

namespace {
// Through the exports, as regsvr32 and the tests' prefix preparation call them.
HRESULT CallExport(const char* name) {
    LoadedModule module;
    auto entry = reinterpret_cast<HRESULT(STDAPICALLTYPE*)()>(GetProcAddress(module.Handle(), name));
    return entry ? entry() : E_FAIL;
}

class RegistrationTest : public testing::Test {
protected:
    void TearDown() override { EXPECT_EQ(S_OK, CallExport("DllRegisterServer")); }
};
}  // namespace

// Both exports, and a registration whose module step fails: no CLSID key, so no ShellFolder
// attributes either; TearDown registers again through the export.
TEST_F(RegistrationTest, ExportsRegisterAndUnregisterAndAFailedStepWritesNoAttributes) {
    ASSERT_EQ(S_OK, CallExport("DllRegisterServer"));
    ExpectModuleRegistered(ModuleDllPath());
    for (int round = 0; round < 2; ++round) {  // unregistering twice still succeeds
        EXPECT_EQ(S_OK, CallExport("DllUnregisterServer"));
        ExpectModuleUnregistered();
    }
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_ACCESS_DENIED),
              RegisterServerWith([] { return HRESULT_FROM_WIN32(ERROR_ACCESS_DENIED); }));
    ExpectModuleUnregistered();
    EXPECT_EQ(S_OK, RegisterServerWith([] { return S_OK; }));
    EXPECT_TRUE(RegistryKeyExists(HKEY_CLASSES_ROOT, L"CLSID\\{E65CDE76-B4FC-447f-A9DD-A011176B14E7}\\ShellFolder"))
        << "a successful step writes them";
}
