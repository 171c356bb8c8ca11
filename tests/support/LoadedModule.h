#pragma once
// The built DLL loaded as Explorer loads it, with the exports the tests call.
#include <windows.h>

#include "support/TestSupport.h"

namespace testsupport {

class LoadedModule {
public:
    using GetClassObjectFn = HRESULT(STDAPICALLTYPE*)(REFCLSID, REFIID, void**);
    using CanUnloadNowFn = HRESULT(STDAPICALLTYPE*)();

    LoadedModule() : m_module(LoadLibraryW(ModuleDllPath().c_str())) {
        if (m_module) {
            getClassObject = reinterpret_cast<GetClassObjectFn>(GetProcAddress(m_module, "DllGetClassObject"));
            canUnloadNow = reinterpret_cast<CanUnloadNowFn>(GetProcAddress(m_module, "DllCanUnloadNow"));
        }
    }
    ~LoadedModule() { Unload(); }
    LoadedModule(const LoadedModule&) = delete;
    LoadedModule& operator=(const LoadedModule&) = delete;

    void Unload() {
        if (m_module) FreeLibrary(m_module);
        m_module = nullptr;
    }
    bool Loaded() const { return m_module && getClassObject && canUnloadNow; }
    HMODULE Handle() const { return m_module; }

    GetClassObjectFn getClassObject = nullptr;
    CanUnloadNowFn canUnloadNow = nullptr;

private:
    HMODULE m_module;
};

}  // namespace testsupport
