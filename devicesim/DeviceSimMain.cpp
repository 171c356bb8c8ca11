// CalvexDeviceSim.exe: the simulated device manager as a COM local server.
//   /RegServer, /UnregServer   write or remove its registration (running servers quit first)
//   /Quit                      make every running server quit, then exit
//   -Embedding                 started by COM
//   /Root <folder>             serve that tree instead of the configured one
#include <windows.h>
#include <objbase.h>
#include <shellapi.h>

#include <string>

#include "SimLog.h"
#include "SimRegistration.h"
#include "SimServer.h"

namespace {

struct Options {
    bool registerServer = false;
    bool unregisterServer = false;
    bool quit = false;
    std::wstring root;
};

bool Is(const wchar_t* arg, const wchar_t* name) {
    return (arg[0] == L'/' || arg[0] == L'-') && CompareStringOrdinal(arg + 1, -1, name, -1, TRUE) == CSTR_EQUAL;
}

Options ParseOptions() {
    Options options;
    int count = 0;
    LPWSTR* args = CommandLineToArgvW(GetCommandLineW(), &count);
    for (int i = 1; args && i < count; ++i) {
        if (Is(args[i], L"RegServer"))
            options.registerServer = true;
        else if (Is(args[i], L"UnregServer"))
            options.unregisterServer = true;
        else if (Is(args[i], L"Quit"))
            options.quit = true;
        else if (Is(args[i], L"Root") && i + 1 < count)
            options.root = args[++i];
    }
    LocalFree(args);
    return options;
}

}  // namespace

int WINAPI wWinMain(HINSTANCE, HINSTANCE, PWSTR, int) {
    const Options options = ParseOptions();
    if (FAILED(CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED))) return 1;
    int exitCode = 0;
    if (options.quit || options.registerServer || options.unregisterServer) {
        // A server left running would go on serving the build it was started from.
        SimServer::StopRunningServers();
    }
    if (options.registerServer || options.unregisterServer) {
        HRESULT hr = options.registerServer ? SimRegistration::Register(SimServer::ExePath())
                                            : SimRegistration::Unregister();
        SimLog::Write(std::wstring(options.registerServer ? L"/RegServer" : L"/UnregServer") +
                      (SUCCEEDED(hr) ? L" done" : L" failed"));
        exitCode = SUCCEEDED(hr) ? 0 : 1;
    } else if (!options.quit) {
        exitCode = SimServer(options.root).Run();
    }
    CoUninitialize();
    return exitCode;
}
