#pragma once
// Results by which a call learns that a COM server's process is gone; a living but slow
// server never gives these. The download dialog and calvex-fetch --watch both end their
// wait on the device manager by them.
#include <windows.h>

inline bool IsServerGone(HRESULT hr) {
    return hr == RPC_E_DISCONNECTED || hr == HRESULT_FROM_WIN32(RPC_S_SERVER_UNAVAILABLE) ||
           hr == CO_E_OBJNOTCONNECTED || hr == RPC_E_SERVER_DIED || hr == RPC_E_SERVER_DIED_DNE;
}
