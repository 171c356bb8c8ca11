#include "KillPoint.h"

#include <windows.h>

#include <cstdlib>
#include <cstring>

#include "ConsoleText.h"

namespace {
struct Target {
    std::string point;
    long count = 0;  // 0: no kill asked for
};

// Read once: the test sets the variable for the whole run.
const Target& Asked() {
    static const Target asked = [] {
        Target target;
        char value[64] = "";
        const DWORD length = GetEnvironmentVariableA("CALVEX_FETCH_KILL_AT", value, sizeof value);
        const char* colon = length && length < sizeof value ? std::strrchr(value, ':') : nullptr;
        if (colon) {
            target.point.assign(value, static_cast<size_t>(colon - value));
            target.count = std::strtol(colon + 1, nullptr, 10);
        }
        return target;
    }();
    return asked;
}
}  // namespace

void KillPoint::Pass(const char* point, const std::wstring& what) {
    static long passes = 0;
    const Target& asked = Asked();
    if (asked.count <= 0 || asked.point != point || ++passes != asked.count) return;
    const std::string line = "calvex-fetch: killed at " + asked.point + " " + std::to_string(passes) + ": " + Utf8(what) + "\n";
    DWORD written = 0;
    WriteFile(GetStdHandle(STD_ERROR_HANDLE), line.data(), static_cast<DWORD>(line.size()), &written, nullptr);
    TerminateProcess(GetCurrentProcess(), 9);
}
