// The four exports of the module.
//
// Loader lock: DllMain does nothing but note the unload. Loading the module's state
// (trace file, version resource through version.dll, settings from the registry, image
// lists through comctl32, registered window messages) calls into other DLLs, which is not
// safe under the loader lock, so CModuleApp::InitInstance runs on the first call of an
// exported entry point, in the order the module has always used. ExitInstance runs at
// DLL_PROCESS_DETACH, where only kernel, registry and already-loaded libraries are touched.
#include <windows.h>

#include "module/ClassTable.h"
#include "module/ModuleApp.h"
#include "module/ModuleRegistration.h"

extern "C" BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID reserved) {
    if (reason == DLL_PROCESS_ATTACH) {
        DisableThreadLibraryCalls(instance);
    } else if (reason == DLL_PROCESS_DETACH) {
        CModuleApp::Instance().ExitInstance(reserved != nullptr);
    }
    return TRUE;
}

STDAPI DllGetClassObject(REFCLSID clsid, REFIID riid, LPVOID* ppv) {
    if (!ppv) return E_POINTER;
    *ppv = nullptr;
    if (FAILED(CModuleApp::Instance().EnsureInitialized())) return E_UNEXPECTED;
    return GetClassObjectFromTable(clsid, riid, ppv);
}

STDAPI DllCanUnloadNow() { return ModuleLock::Count() == 0 ? S_OK : S_FALSE; }

STDAPI DllRegisterServer() {
    CModuleApp::Instance().EnsureInitialized();
    return RegisterServer();
}

STDAPI DllUnregisterServer() {
    CModuleApp::Instance().EnsureInitialized();
    return UnregisterServer();
}
