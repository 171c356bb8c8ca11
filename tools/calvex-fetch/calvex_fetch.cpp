// calvex-fetch: every new file of every receiver into a project folder, through the same shell
// namespace that the user browses (see the README for the options and an example run, and
// FetchRun.h for the exit codes). Its console is all it shows.
#include <windows.h>

#include <string>
#include <vector>

#include "FetchRun.h"
#include "ReceiverWatch.h"

namespace {
class ConsoleFront : public FetchFront {
public:
    int Watch(ReceiverWatch& watch, TargetLock&) override { return watch.Run(); }
};
}  // namespace

int wmain(int argc, wchar_t** argv) {
    FetchConsole console;
    ConsoleFront front;
    return RunFetch(std::vector<std::wstring>(argv + 1, argv + argc), front, console);
}
