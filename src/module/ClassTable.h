#pragma once
#include <windows.h>
#include "com/ClassFactory.h"

// One entry per class the module serves, in the order that registration follows.
struct ClassEntry {
    const CLSID* clsid;
    UINT registryScript;             // REGISTRY resource run by the registrar
    CreateInstanceFn createInstance; // plain, or aggregated when an outer unknown is given
    void (*startStop)(bool starting);  // called at load and unload; may be null
    IClassFactory* cachedFactory;    // made on first request, released at unload
};

ClassEntry* ClassTableBegin();
ClassEntry* ClassTableEnd();

// DllGetClassObject's lookup: the entry's factory, made once and cached.
HRESULT GetClassObjectFromTable(REFCLSID clsid, REFIID riid, void** ppv);
void CallClassStartHooks();
// Releases the cached factories and calls the stop hooks.
void TerminateClassTable();
