#pragma once
// Test support, nothing else: the kill-anywhere test of --move ends the process hard at a
// named point, as a power cut or a killed task would, and then checks that no file is lost.
//
// CALVEX_FETCH_KILL_AT=<point>:<n> makes the n-th pass of <point> write one line to stderr
// ("calvex-fetch: killed at <point> <n>: <what>") and end the process at once with
// TerminateProcess (exit code 9): no destructor, no flush, no rename or delete after it.
// Without the variable (always, outside that test) a pass does nothing.
//
// The points, in the order a moved file passes them:
//   partway   a chunk of the file is written to its temporary name and more is to come
//   written   the temporary file is whole, timed and flushed, not yet renamed
//   renamed   the file is under its final name, not yet read back
//   deleting  the copy is proven and the receiver asked again; the delete is next
//   deleted   the receiver has deleted the file; its line is not yet written
#include <string>

class KillPoint {
public:
    static void Pass(const char* point, const std::wstring& what);
};
