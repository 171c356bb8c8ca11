// Guards registration: a key Explorer needs missing or wrong, a key left behind at removal, attributes written after a failure.
#include <windows.h>

#include <string>

#include <gtest/gtest.h>

#include "module/ModuleRegistration.h"
#include "support/RegistrationExpectations.h"
#include "support/TestSupport.h"

namespace {
const std::wstring kCalvex = L"{E102076F-4057-4e7f-8209-511258F12B62}";
const std::wstring kBrennor = L"{E65CDE76-B4FC-447f-A9DD-A011176B14E7}";

HRESULT CallExport(const char* name) {
    HMODULE module = LoadLibraryW(testsupport::ModuleDllPath().c_str());
    if (!module) return HRESULT_FROM_WIN32(GetLastError());
    auto entry = reinterpret_cast<HRESULT(STDAPICALLTYPE*)()>(GetProcAddress(module, name));
    HRESULT hr = entry ? entry() : E_FAIL;
    FreeLibrary(module);
    return hr;
}

DWORD RunRegsvr32(const std::wstring& flags) {
    return testsupport::RunProcess(L"regsvr32.exe " + flags + L" \"" + testsupport::ModuleDllPath() + L"\"");
}

void ExpectRegistered() { testsupport::ExpectModuleRegistered(testsupport::ModuleDllPath()); }

class RegistrationTest : public testing::Test {
protected:
    void TearDown() override { EXPECT_EQ(S_OK, CallExport("DllRegisterServer")); }
};
}  // namespace

TEST_F(RegistrationTest, ExportsAndRegsvr32RegisterAndUnregister) {
    ASSERT_EQ(S_OK, CallExport("DllRegisterServer"));
    ExpectRegistered();
    for (int round = 0; round < 2; ++round) {  // unregistering twice still succeeds
        EXPECT_EQ(S_OK, CallExport("DllUnregisterServer"));
        testsupport::ExpectModuleUnregistered();
    }
    EXPECT_EQ(0u, RunRegsvr32(L"/s"));
    ExpectRegistered();
    EXPECT_EQ(0u, RunRegsvr32(L"/s /u"));
    testsupport::ExpectModuleUnregistered();
}

TEST_F(RegistrationTest, FailedModuleRegistrationWritesNoAttributes) {
    ASSERT_EQ(S_OK, CallExport("DllUnregisterServer"));
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_ACCESS_DENIED),
              RegisterServerWith([] { return HRESULT_FROM_WIN32(ERROR_ACCESS_DENIED); }));
    for (const std::wstring& clsid : {kCalvex, kBrennor}) {
        DWORD attributes = 0;
        EXPECT_FALSE(testsupport::FolderAttributes(clsid, &attributes));
    }
    EXPECT_EQ(S_OK, RegisterServerWith([] { return S_OK; }));
    DWORD attributes = 0;
    EXPECT_TRUE(testsupport::FolderAttributes(kBrennor, &attributes)) << "a successful step writes them";
}
