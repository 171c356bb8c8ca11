#pragma once
// The local server: one process serves every client (REGCLS_MULTIPLEUSE); it runs a message
// loop on its one apartment thread, on which events, rescans and downloads happen, and ends a
// short time after its last object and lock are gone, or at once when its quit event is set.
#include <windows.h>

#include <string>

class SimServer {
public:
    // Set by whoever wants the running server gone (tests that point it elsewhere).
    static const wchar_t kQuitEventName[];

    // Asks every other running server to quit, waits for them (killing those that do not
    // answer) and returns how many there were.
    static int StopRunningServers();

    // rootOverride: the folder of "/Root <folder>", or empty.
    explicit SimServer(std::wstring rootOverride);
    int Run();

    // The tree served now: the command line, else the registry value, else the sample tree.
    std::wstring Root() const;
    static std::wstring DefaultRoot();
    static std::wstring ExePath();

private:
    void MessageLoop(HANDLE quit);
    void ExitAbruptly();

    std::wstring m_rootOverride;
    DWORD m_classCookie = 0;
};
