#pragma once
// The built DLL loaded as Explorer loads it, with the exports the tests call.
#include <windows.h>

#include "com/Handles.h"
#include "support/TestSupport.h"

namespace testsupport {

class LoadedModule {
public:
    using GetClassObjectFn = HRESULT(STDAPICALLTYPE*)(REFCLSID, REFIID, void**);
    using CanUnloadNowFn = HRESULT(STDAPICALLTYPE*)();

    LoadedModule() : m_module(LoadLibraryW(ModuleDllPath().c_str())) {
        getClassObject = reinterpret_cast<GetClassObjectFn>(GetProcAddress(m_module.Get(), "DllGetClassObject"));
        canUnloadNow = reinterpret_cast<CanUnloadNowFn>(GetProcAddress(m_module.Get(), "DllCanUnloadNow"));
    }
    void Unload() { m_module.Reset(); }
    bool Loaded() const { return m_module && getClassObject && canUnloadNow; }
    HMODULE Handle() const { return m_module.Get(); }

    GetClassObjectFn getClassObject = nullptr;
    CanUnloadNowFn canUnloadNow = nullptr;

private:
    UniqueLibrary m_module;
};

}  // namespace testsupport
