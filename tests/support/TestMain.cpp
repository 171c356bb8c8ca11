// main() of every test program: an apartment thread with COM and the common controls, as
// in Explorer, and a temporary directory of its own, so that the trace file of this
// program ("%TEMP%\CalvexReceiversShellExt.log") is not shared with tests running beside it.
#include <windows.h>
#include <commctrl.h>
#include <objbase.h>

#include <cstdio>
#include <string>

#include <gtest/gtest.h>

static void UsePrivateTempDirectory() {
    wchar_t base[MAX_PATH] = L"";
    GetTempPathW(MAX_PATH, base);
    const std::wstring dir = std::wstring(base) + L"calvex-test-" + std::to_wstring(GetCurrentProcessId());
    CreateDirectoryW(dir.c_str(), nullptr);
    for (const wchar_t* name : {L"TMP", L"TEMP"}) SetEnvironmentVariableW(name, dir.c_str());
}

// A fault in a test program is reported and ends it at once, instead of waiting for a
// debugger or a crash dialog until the test's time runs out.
static LONG WINAPI ReportFault(EXCEPTION_POINTERS* info) {
    fprintf(stderr, "FATAL: exception 0x%08lX at %p\n", info->ExceptionRecord->ExceptionCode,
            info->ExceptionRecord->ExceptionAddress);
    fflush(stderr);
    TerminateProcess(GetCurrentProcess(), 3);
    return EXCEPTION_EXECUTE_HANDLER;
}

int main(int argc, char** argv) {
    SetUnhandledExceptionFilter(ReportFault);
    SetErrorMode(SEM_FAILCRITICALERRORS | SEM_NOGPFAULTERRORBOX);
    ::testing::InitGoogleTest(&argc, argv);
    UsePrivateTempDirectory();
    CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED);
    INITCOMMONCONTROLSEX controls = {sizeof controls, ICC_WIN95_CLASSES | ICC_ANIMATE_CLASS};
    InitCommonControlsEx(&controls);
    int result = RUN_ALL_TESTS();
    CoUninitialize();
    return result;
}
