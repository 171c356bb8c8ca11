#include "module/ClassTable.h"

#include <iterator>

#include "com/CriticalSection.h"
#include "module/ClassIds.h"
#include "module/ClassCreators.h"
#include "resources/resource.h"

namespace {
ClassEntry g_classTable[] = {
    {&CLSID_CalvexReceiversShellFolder, IDR_CALVEX_FOLDER, CreateCalvexReceiversShellFolder, CalvexFolderStartStop, nullptr},
    {&CLSID_CalvexReceiversShellView, IDR_SHELLVIEW, CreateCalvexReceiversShellView, nullptr, nullptr},
    {&CLSID_CalvexReceiversEnumIDList, IDR_ENUMIDLIST, CreateCalvexReceiversEnumIDList, nullptr, nullptr},
    {&CLSID_CalvexReceiversExtractIcon, IDR_EXTRACTICON, CreateCalvexReceiversExtractIcon, nullptr, nullptr},
    {&CLSID_CalvexReceiversContextMenu, IDR_CONTEXTMENU, CreateCalvexReceiversContextMenu, nullptr, nullptr},
    {&CLSID_CalvexReceiversDataObject, IDR_DATAOBJECT, CreateCalvexReceiversDataObject, nullptr, nullptr},
    {&CLSID_CalvexReceiversQueryInfo, IDR_QUERYINFO, CreateCalvexReceiversQueryInfo, nullptr, nullptr},
    {&CLSID_BrennorReceiversShellFolder, IDR_BRENNOR_FOLDER, CreateBrennorReceiversShellFolder, nullptr, nullptr},
};

CriticalSection& FactoryLock() {
    static CriticalSection lock;
    return lock;
}

}  // namespace

ClassEntry* ClassTableBegin() { return std::begin(g_classTable); }
ClassEntry* ClassTableEnd() { return std::end(g_classTable); }

HRESULT GetClassObjectFromTable(REFCLSID clsid, REFIID riid, void** ppv) {
    for (ClassEntry* entry = ClassTableBegin(); entry != ClassTableEnd(); ++entry) {
        if (!IsEqualCLSID(clsid, *entry->clsid)) continue;
        if (!entry->cachedFactory) {
            CriticalSectionLock lock(FactoryLock());
            if (!entry->cachedFactory) entry->cachedFactory = ClassFactory::CreateCached(entry->createInstance);
        }
        if (!entry->cachedFactory) return E_OUTOFMEMORY;
        return entry->cachedFactory->QueryInterface(riid, ppv);
    }
    return CLASS_E_CLASSNOTAVAILABLE;
}

void CallClassStartHooks() {
    for (ClassEntry* entry = ClassTableBegin(); entry != ClassTableEnd(); ++entry)
        if (entry->startStop) entry->startStop(true);
}

void TerminateClassTable() {
    for (ClassEntry* entry = ClassTableBegin(); entry != ClassTableEnd(); ++entry) {
        if (IClassFactory* factory = entry->cachedFactory) {
            entry->cachedFactory = nullptr;
            factory->Release();
        }
        if (entry->startStop) entry->startStop(false);
    }
}
