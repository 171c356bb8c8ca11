// Guards the MSI: keys registration misses or leaves behind, files left after removal, a version that is not the DLL's, a repeated install or removal that breaks the first, a logon start of the automatic download that outlives the product, settings the properties do not seed, and a repair or upgrade that undoes what the user chose in the settings window.
#include <windows.h>
#include <msi.h>
#include <shlobj.h>

#include <cstdlib>
#include <string>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

#include "FetchSettings.h"
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

// The settings the logon start and the window share; target "" is the default folder.
const FetchSettings kByDate = {L"C:\\Survey data", true, L"{receiver}\\{yyyy}\\{doy}"};
const FetchSettings kChosen = {L"C:\\Chosen", false, L"{yyyy}\\{doy}\\{receiver}", false, false};

// In the Start menu of all users, or of the installing user where the install is per user.
bool HasStartMenuEntry() {
    for (int folder : {CSIDL_COMMON_PROGRAMS, CSIDL_PROGRAMS}) {
        wchar_t programs[MAX_PATH] = L"";
        SHGetFolderPathW(nullptr, folder, nullptr, SHGFP_TYPE_CURRENT, programs);
        if (FileExists(std::wstring(programs) + L"\\Calvex receivers download.lnk")) return true;
    }
    return false;
}

// With the automatic download (stored non-null): one logon value, the Start menu entry and the
// settings as the install, the user or a later install left them.
void ExpectAutoFetch(const FetchSettings* stored) {
    const std::wstring run = L"\"" + InstallDir() + L"\\calvex-fetchw.exe\" --logon";
    EXPECT_EQ(stored ? run : L"<none>", RegistryText(HKEY_CURRENT_USER, kRun, L"Calvex receivers watch"));
    EXPECT_EQ(stored != nullptr, HasStartMenuEntry());
    if (!stored) return;
    std::vector<std::wstring> damaged;
    const FetchSettings s = LoadFetchSettings([&](const std::wstring& line) { damaged.push_back(line); });
    EXPECT_TRUE(damaged.empty()) << Narrow(damaged.front());
    EXPECT_EQ(std::make_tuple(stored->target.empty() ? DefaultFetchTarget() : stored->target, stored->move, stored->layout,
                              stored->notify, stored->startAtLogon),
              std::make_tuple(s.target, s.move, s.layout, s.notify, s.startAtLogon));
}

void ExpectState(State state, const FetchSettings* stored) {
    ExpectAutoFetch(stored);
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
    RegDeleteTreeW(HKEY_CURRENT_USER, kFetchSettingsKey);
    // stored: the settings after the step, null without the automatic download; arguments null:
    // the user's choice saved as the settings window saves it.
    const FetchSettings movingOn = {L"C:\\Chosen", true, L"{yyyy}\\{doy}\\{receiver}", false, false};
    const FetchSettings plain = {L"C:\\Chosen", true, L"{receiver}", false, false}, fresh = {L""};
    struct Step { const char* what; const wchar_t* arguments; State after; const FetchSettings* stored; bool mayBeUnknown = false; } steps[] = {
        {"install everything", L"/i ADDLOCAL=ALL FETCHDIR=\"C:\\Survey data\" FETCHMOVE=1 FETCHLAYOUT=\"{receiver}\\{yyyy}\\{doy}\"",
         kExtensionAndSimulator, &kByDate},
        {"install again, the settings kept", L"/i ADDLOCAL=ALL", kExtensionAndSimulator, &kByDate},
        {"repair", L"/i REINSTALL=ALL REINSTALLMODE=omus", kExtensionAndSimulator, &kByDate},
        {"chosen in the settings window", nullptr, kExtensionAndSimulator, &kChosen},
        {"repair after the window's choice", L"/i REINSTALL=ALL REINSTALLMODE=omus", kExtensionAndSimulator, &kChosen},
        {"install again after the window's choice", L"/i ADDLOCAL=ALL", kExtensionAndSimulator, &kChosen},
        {"repair, moving on", L"/i REINSTALL=ALL REINSTALLMODE=omus FETCHMOVE=1", kExtensionAndSimulator, &movingOn},
        {"repair, the plain layout again", L"/i REINSTALL=ALL REINSTALLMODE=omus FETCHLAYOUT={receiver}",
         kExtensionAndSimulator, &plain},
        {"remove the automatic download", L"/i REMOVE=AutoFetch", kExtensionAndSimulator, nullptr},
        {"uninstall", L"/x", kNothing, nullptr},
        {"uninstall again", L"/x", kNothing, nullptr, true},  // Windows answers an unknown product
        {"install the default features", L"/i", kExtension, nullptr},
        {"uninstall", L"/x", kNothing, nullptr},
        {"install the automatic download alone", L"/i ADDLOCAL=AutoFetch", kExtension, &fresh},
        {"uninstall", L"/x", kNothing, nullptr},
    };
    for (const Step& step : steps) {
        SCOPED_TRACE(step.what);
        if (step.arguments == nullptr) {
            std::wstring error;
            ASSERT_TRUE(SaveFetchSettings(kChosen, error)) << Narrow(error);
        } else {
            const std::wstring arguments = step.arguments;  // the action, then properties after the package
            const std::wstring msi = L" \"" + BuildDir() + L"\\CalvexReceiversShellExt.msi\" /qn";
            const DWORD exitCode = RunProcess(L"msiexec.exe " + arguments.substr(0, 2) + msi + arguments.substr(2), 300000);
            EXPECT_TRUE(exitCode == 0 || (step.mayBeUnknown && exitCode == ERROR_UNKNOWN_PRODUCT)) << exitCode;
        }
        ExpectState(step.after, step.stored);
    }
}
