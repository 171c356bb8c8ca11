// calvex_dead_server_baseline SIMULATOR [CYCLES] [CALLS]: what Wine's COM keeps of a local
// server that went away while its client held a proxy, with nothing of the extension
// involved. Each cycle makes the device manager's class, asks it once, lets SIMULATOR /Quit
// it, asks again CALLS times (1: the calls fail, as the watch's liveness question does) and
// releases the proxy. It prints the process's handle count after each cycle, then the handles
// left per restart. The soak (scripts/soak-watch.sh) sets the watch's growth at each restart
// beside these figures.
#include <windows.h>
#include <ole2.h>
#include <winternl.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "HandleTable.h"

namespace {
const CLSID kDeviceManagerClass = {0x0FADF314, 0xB4FD, 0x413C, {0x9E, 0x26, 0x6B, 0xC4, 0x9B, 0x06, 0x60, 0x80}};

HRESULT AskReceivers(IDispatch* manager) {
    DISPPARAMS none = {};
    VARIANT result;
    VariantInit(&result);
    const HRESULT hr = manager->Invoke(1, IID_NULL, LOCALE_USER_DEFAULT, DISPATCH_PROPERTYGET, &none, &result,
                                       nullptr, nullptr);
    VariantClear(&result);
    return hr;
}

void Run(const std::wstring& command) {
    STARTUPINFOW startup = {sizeof(startup)};
    PROCESS_INFORMATION process = {};
    std::wstring line = command;
    if (!CreateProcessW(nullptr, &line[0], nullptr, nullptr, FALSE, 0, nullptr, nullptr, &startup, &process)) return;
    WaitForSingleObject(process.hProcess, 30000);
    CloseHandle(process.hThread);
    CloseHandle(process.hProcess);
}
}  // namespace

int wmain(int argc, wchar_t** argv) {
    if (argc < 2) {
        std::fprintf(stderr, "usage: calvex_dead_server_baseline SIMULATOR [CYCLES] [CALLS]\n");
        return 2;
    }
    const int cycles = argc > 2 ? _wtoi(argv[2]) : 5;
    const int calls = argc > 3 ? _wtoi(argv[3]) : 1;
    CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED);
    const std::wstring quit = L"\"" + std::wstring(argv[1]) + L"\" /Quit";
    Run(quit);  // a fresh device manager for the first cycle
    long first = -1, last = -1;
    for (int cycle = 0; cycle <= cycles; ++cycle) {
        IDispatch* manager = nullptr;
        if (FAILED(CoCreateInstance(kDeviceManagerClass, nullptr, CLSCTX_LOCAL_SERVER, IID_IDispatch,
                                    reinterpret_cast<void**>(&manager)))) {
            std::fprintf(stderr, "no device manager\n");
            return 2;
        }
        AskReceivers(manager);
        Run(quit);
        Sleep(500);
        HRESULT gone = S_OK;
        for (int call = 0; call < calls; ++call) gone = AskReceivers(manager);
        manager->Release();
        last = HandleCount(GetCurrentProcessId());
        if (cycle == 0) first = last;  // the first cycle loads what every later one reuses
        std::printf("cycle %d: the call after the restart gave 0x%08lX; %ld handles\n", cycle,
                    static_cast<unsigned long>(gone), last);
    }
    std::printf("handles left per restart, with %d failed call(s): %.1f\n", calls,
                cycles ? static_cast<double>(last - first) / cycles : 0.0);
    CoUninitialize();
    return 0;
}
