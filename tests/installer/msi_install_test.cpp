// Guards the MSI: keys registration misses or leaves behind, files left after removal, a version that is not the DLL's, a repeated install or removal that breaks the first, a logon start of the automatic download that points elsewhere or outlives the product.
#include <windows.h>
#include <msi.h>
#include <shlobj.h>

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
const wchar_t kRun[] = L"Software\\Microsoft\\Windows\\CurrentVersion\\Run";

std::wstring InstallDir() { return std::wstring(_wgetenv(L"ProgramFiles")) + L"\\Calvex\\Receivers Shell Extension"; }

// The installed products of this upgrade code, each as the name Apps shows and its version.
std::vector<std::wstring> InstalledVersions() {
    std::vector<std::wstring> versions;
    wchar_t product[39];
    for (DWORD i = 0; MsiEnumRelatedProductsW(kUpgradeCode, 0, i, product) == ERROR_SUCCESS; ++i) {
        wchar_t version[64] = L"", name[128] = L"";
        DWORD size = 64, nameSize = 128;
        MsiGetProductInfoW(product, INSTALLPROPERTY_VERSIONSTRING, version, &size);
        MsiGetProductInfoW(product, INSTALLPROPERTY_INSTALLEDPRODUCTNAME, name, &nameSize);
        versions.push_back(std::wstring(name) + L" " + version);
    }
    return versions;
}

// Every sample file whose name the installer can carry (ASCII) is installed with its bytes.
void ExpectSamplesInstalled() {
    const std::wstring source = SourceDir() + L"\\sample-receivers\\", target = InstallDir() + L"\\sample-receivers\\";
    int compared = 0;
    for (const wchar_t* receiver : {L"Calvex Q9 USB", L"Brennor R2 COM4", L"Calvex lab unknown port"}) {
        for (const std::wstring& file : ListFiles(source + receiver)) {
            const std::wstring name = std::wstring(receiver) + L"\\" + file;
            EXPECT_EQ(ReadFileBytes(source + name), ReadFileBytes(target + name)) << Narrow(name);
            ++compared;
        }
    }
    EXPECT_EQ(12, compared) << "files in the three sample receivers";
}

enum State { kNothing, kExtension, kExtensionAndSimulator };

// What the logon start of the automatic download runs, for the folder and options the install was given.
std::wstring RunCommand(const wchar_t* fetchDir, const wchar_t* options) {
    if (!fetchDir) return L"<none>";
    wchar_t documents[MAX_PATH] = L"";
    SHGetFolderPathW(nullptr, CSIDL_PERSONAL, nullptr, SHGFP_TYPE_CURRENT, documents);
    const std::wstring folder = *fetchDir ? fetchDir : std::wstring(documents) + L"\\Survey";
    return L"\"" + InstallDir() + L"\\calvex-fetchw.exe\" --watch" + options + L" \"" + folder + L"\"";
}

void ExpectState(State state, const wchar_t* fetchDir, const wchar_t* options = L"") {
    EXPECT_EQ(RunCommand(fetchDir, options), RegistryText(HKEY_CURRENT_USER, kRun, L"Calvex receivers watch"));
    EXPECT_EQ(state != kNothing, FileExists(InstallDir() + L"\\calvex-fetchw.exe"));
    const std::wstring dll = InstallDir() + L"\\CalvexReceiversShellExt.dll";
    const std::wstring sim = InstallDir() + L"\\CalvexDeviceSim.exe";
    EXPECT_EQ(state != kNothing, FileExists(dll));
    EXPECT_EQ(state != kNothing, FileExists(InstallDir() + L"\\calvex-fetch.exe"));
    if (state == kNothing) ExpectModuleUnregistered();
    else ExpectModuleRegistered(dll);
    wchar_t version[64] = L"";
    DWORD size = 64;
    MsiGetFileVersionW(dll.c_str(), version, &size, nullptr, nullptr);  // fails and leaves "" without the DLL
    const std::vector<std::wstring> product = {L"Calvex GNSS Receivers Shell Extension " + std::wstring(version)}, none;
    EXPECT_EQ(state == kNothing ? none : product, InstalledVersions()) << "one product, the DLL's version";
    const bool simulator = state == kExtensionAndSimulator;
    EXPECT_EQ(simulator ? L"\"" + sim + L"\"" : L"<none>", RegistryText(HKEY_CLASSES_ROOT, kDeviceMgr));
    EXPECT_EQ(simulator ? InstallDir() + L"\\sample-receivers\\" : L"<none>",
              RegistryText(HKEY_CURRENT_USER, kSimSettings, L"Root"));
    EXPECT_EQ(simulator, FileExists(sim));
    if (simulator) ExpectSamplesInstalled();
}
}  // namespace

TEST(MsiInstallTest, InstallsAndRemovesTheModuleAndItsOptionalFeatures) {
    ExpectState(kNothing, nullptr);
    // fetchDir: the folder the logon start watches ("" the default), null when there is none;
    // options: moving and the layout, kept by a repair (every component written again).
    const wchar_t byDate[] = L" --move --layout \"{receiver}\\{yyyy}\\{doy}\"";
    struct Step { const char* what; const wchar_t* arguments; State after; const wchar_t* fetchDir; bool mayBeUnknown; const wchar_t* options = L""; } steps[] = {
        {"install everything", L"/i ADDLOCAL=ALL FETCHDIR=\"C:\\Survey data\" FETCHMOVE=1 FETCHLAYOUT=\"{receiver}\\{yyyy}\\{doy}\"",
         kExtensionAndSimulator, L"C:\\Survey data", false, byDate},
        {"install again, the folder remembered", L"/i ADDLOCAL=ALL", kExtensionAndSimulator, L"C:\\Survey data", false, byDate},
        {"repair", L"/i REINSTALL=ALL REINSTALLMODE=omus", kExtensionAndSimulator, L"C:\\Survey data", false, byDate},
        {"repair, moving off", L"/i REINSTALL=ALL REINSTALLMODE=omus FETCHMOVE=0", kExtensionAndSimulator, L"C:\\Survey data",
         false, byDate + 7},
        {"repair, the plain layout again", L"/i REINSTALL=ALL REINSTALLMODE=omus FETCHLAYOUT={receiver}", kExtensionAndSimulator,
         L"C:\\Survey data", false, L" --layout \"{receiver}\""},
        {"remove the automatic download", L"/i REMOVE=AutoFetch", kExtensionAndSimulator, nullptr, false},
        {"uninstall", L"/x", kNothing, nullptr, false},
        {"uninstall again", L"/x", kNothing, nullptr, true},  // Windows answers an unknown product
        {"install the default features", L"/i", kExtension, nullptr, false},
        {"uninstall", L"/x", kNothing, nullptr, false},
        {"install the automatic download alone", L"/i ADDLOCAL=AutoFetch", kExtension, L"", false},
        {"uninstall", L"/x", kNothing, nullptr, false},
    };
    const std::wstring msi = L" \"" + BuildDir() + L"\\CalvexReceiversShellExt.msi\" /qn";
    for (const Step& step : steps) {
        SCOPED_TRACE(step.what);
        const std::wstring arguments = step.arguments;  // the action, then properties after the package
        const DWORD exitCode = RunProcess(L"msiexec.exe " + arguments.substr(0, 2) + msi + arguments.substr(2), 300000);
        EXPECT_TRUE(exitCode == 0 || (step.mayBeUnknown && exitCode == ERROR_UNKNOWN_PRODUCT)) << exitCode;
        ExpectState(step.after, step.fetchDir, step.options);
    }
}
