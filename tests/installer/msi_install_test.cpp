// Guards the MSI: keys registration misses or leaves behind, files left after removal, a version that is not the DLL's, a repeated install or removal that breaks the first.
#include <windows.h>
#include <msi.h>

#include <cstdlib>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "support/DeviceSim.h"
#include "support/RegistrationExpectations.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
const wchar_t kUpgradeCode[] = L"{3F4C8E0B-61D2-4B5A-9C3E-7A0D2E5B9C41}";
const wchar_t kDeviceMgr[] = L"CLSID\\{0FADF314-B4FD-413C-9E26-6BC49B066080}\\LocalServer32";
const wchar_t kSimSettings[] = L"Software\\Calvex\\DeviceSim";

std::wstring InstallDir() { return std::wstring(_wgetenv(L"ProgramFiles")) + L"\\Calvex\\Receivers Shell Extension"; }

// The installed products of this upgrade code with their versions.
std::vector<std::wstring> InstalledVersions() {
    std::vector<std::wstring> versions;
    wchar_t product[39];
    for (DWORD i = 0; MsiEnumRelatedProductsW(kUpgradeCode, 0, i, product) == ERROR_SUCCESS; ++i) {
        wchar_t version[64] = L"";
        DWORD size = 64;
        MsiGetProductInfoW(product, INSTALLPROPERTY_VERSIONSTRING, version, &size);
        versions.push_back(version);
    }
    return versions;
}

// Every sample file whose name the installer can carry (ASCII) is installed with its bytes.
void ExpectSamplesInstalled() {
    const std::wstring source = SourceDir() + L"\\sample-receivers\\", target = InstallDir() + L"\\sample-receivers\\";
    WIN32_FIND_DATAW found;
    int compared = 0;
    for (const wchar_t* receiver : {L"Calvex Q9 USB", L"Brennor R2 COM4", L"Calvex lab unknown port"}) {
        HANDLE files = FindFirstFileW((source + receiver + L"\\*").c_str(), &found);
        for (BOOL more = files != INVALID_HANDLE_VALUE; more; more = FindNextFileW(files, &found)) {
            if (found.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY) continue;
            const std::wstring name = std::wstring(receiver) + L"\\" + found.cFileName;
            EXPECT_EQ(ReadFileBytes(source + name), ReadFileBytes(target + name)) << Narrow(name);
            ++compared;
        }
        if (files != INVALID_HANDLE_VALUE) FindClose(files);
    }
    EXPECT_EQ(12, compared) << "files in the three sample receivers";
}

enum State { kNothing, kExtension, kExtensionAndSimulator };

void ExpectState(State state) {
    const std::wstring dll = InstallDir() + L"\\CalvexReceiversShellExt.dll";
    const std::wstring sim = InstallDir() + L"\\CalvexDeviceSim.exe";
    EXPECT_EQ(state != kNothing, FileExists(dll));
    EXPECT_EQ(state != kNothing, FileExists(InstallDir() + L"\\calvex-fetch.exe"));
    if (state == kNothing) ExpectModuleUnregistered();
    else ExpectModuleRegistered(dll);
    wchar_t version[64] = L"";
    DWORD size = 64;
    MsiGetFileVersionW(dll.c_str(), version, &size, nullptr, nullptr);  // fails and leaves "" without the DLL
    const std::vector<std::wstring> product = {version}, none;
    EXPECT_EQ(state == kNothing ? none : product, InstalledVersions()) << "one product, the DLL's version";
    const bool simulator = state == kExtensionAndSimulator;
    EXPECT_EQ(simulator ? L"\"" + sim + L"\"" : L"<none>", RegistryText(HKEY_CLASSES_ROOT, kDeviceMgr));
    EXPECT_EQ(simulator ? InstallDir() + L"\\sample-receivers\\" : L"<none>",
              RegistryText(HKEY_CURRENT_USER, kSimSettings, L"Root"));
    EXPECT_EQ(simulator, FileExists(sim));
    if (simulator) ExpectSamplesInstalled();
}
}  // namespace

TEST(MsiInstallTest, InstallsAndRemovesTheModuleAndTheOptionalSimulator) {
    ExpectState(kNothing);
    struct Step { const char* what; const wchar_t* arguments; State after; bool mayBeUnknown; } steps[] = {
        {"install with the simulator", L"/i ADDLOCAL=ALL", kExtensionAndSimulator, false},
        {"install again", L"/i ADDLOCAL=ALL", kExtensionAndSimulator, false},
        {"uninstall", L"/x", kNothing, false},
        {"uninstall again", L"/x", kNothing, true},  // Windows answers an unknown product
        {"install the default features", L"/i", kExtension, false},
        {"uninstall", L"/x", kNothing, false},
    };
    const std::wstring msi = L" \"" + BuildDir() + L"\\CalvexReceiversShellExt.msi\" /qn";
    for (const Step& step : steps) {
        SCOPED_TRACE(step.what);
        const std::wstring arguments = step.arguments;  // the action, then properties after the package
        const DWORD exitCode = RunProcess(L"msiexec.exe " + arguments.substr(0, 2) + msi + arguments.substr(2), 300000);
        EXPECT_TRUE(exitCode == 0 || (step.mayBeUnknown && exitCode == ERROR_UNKNOWN_PRODUCT)) << exitCode;
        ExpectState(step.after);
    }
}
