#include "com/ModuleLock.h"

namespace {
volatile LONG g_lockCount = 0;
}

namespace ModuleLock {
LONG Add() { return InterlockedIncrement(&g_lockCount); }
LONG Release() { return InterlockedDecrement(&g_lockCount); }
LONG Count() { return InterlockedCompareExchange(&g_lockCount, 0, 0); }
}  // namespace ModuleLock
