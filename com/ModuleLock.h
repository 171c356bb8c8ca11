#pragma once
#include <windows.h>

// The module's lock count: every live COM object of the module and every
// IClassFactory::LockServer(TRUE) holds one. DllCanUnloadNow answers from it.
namespace ModuleLock {
LONG Add();
LONG Release();
LONG Count();
}  // namespace ModuleLock

// Holds one module lock for its own lifetime. Objects carry one as their first base so that
// the lock is taken before and given back after everything else of the object.
class ModuleLockHolder {
public:
    ModuleLockHolder() { ModuleLock::Add(); }
    ModuleLockHolder(const ModuleLockHolder&) { ModuleLock::Add(); }
    ModuleLockHolder& operator=(const ModuleLockHolder&) = default;
    ~ModuleLockHolder() { ModuleLock::Release(); }
};
