#pragma once
#include <windows.h>
#include <commctrl.h>
#include "module/ModuleState.h"

// The module object: load and unload of the extension in a process.
class CModuleApp {
public:
    static CModuleApp& Instance();

    // Runs InitInstance once per load, on the first call of an exported entry point.
    // Returns the result of loading; E_UNEXPECTED means it failed.
    HRESULT EnsureInitialized();
    bool IsInitialized() const { return m_initialized; }

    HRESULT InitInstance();
    // processTerminating: the process is exiting rather than unloading the module, so other
    // threads are gone and only what cannot wait for process teardown is done.
    void ExitInstance(bool processTerminating);

    void RebuildImageLists();

    DisplayState display;
    HIMAGELIST largeImages = nullptr;
    HIMAGELIST smallImages = nullptr;
    UINT updateFolderMessage = 0;
    UINT viewNotificationMessage = 0;
    HINSTANCE resourceInstance = nullptr;
    GUID typeLibrary = GUID_NULL;

private:
    void TraceModuleIdentity();
    void DestroyImageLists();

    INIT_ONCE m_once = INIT_ONCE_STATIC_INIT;
    HRESULT m_initResult = E_UNEXPECTED;
    bool m_initialized = false;
};
