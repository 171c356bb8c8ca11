// calvex-fetchw: calvex-fetch without a console window, to be started at logon (FetchRun.h
// for the run and its exit codes, WindowlessFront.h for what it adds).
#include <windows.h>

#include <string>
#include <vector>

#include "FetchRun.h"
#include "WindowlessFront.h"

int wmain(int argc, wchar_t** argv) {
    FetchConsole console;
    WindowlessFront front;
    return RunFetch(std::vector<std::wstring>(argv + 1, argv + argc), front, console);
}
