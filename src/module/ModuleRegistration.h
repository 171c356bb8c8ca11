#pragma once
#include <windows.h>

// DllRegisterServer and DllUnregisterServer, apart from the exports themselves.
HRESULT RegisterServer();
HRESULT UnregisterServer();

// Registration with the module step given from outside, so that a failing step can be
// shown to leave no folder attributes behind.
HRESULT RegisterServerWith(HRESULT (*registerModule)());

// Every class's script in class-table order, then the type library from the resources.
HRESULT RegisterModule();
