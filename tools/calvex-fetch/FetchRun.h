#pragma once
// The run of calvex-fetch and calvex-fetchw: the arguments checked, the target made and locked,
// then a batch over every receiver or a watch (ReceiverWatch.h). Both programs are this run in
// a different front (FetchFront.h).
//
// Exit code: 0 all good, 1 some files failed, 2 nothing could be done (no device manager, no
// such receiver, target not writable, another calvex-fetch fetching into the target, bad
// arguments). With --watch it runs until stopped, also through a restart of the device
// manager: 0 or 1 as above.
#include <string>
#include <vector>

#include "FetchConsole.h"
#include "FetchFront.h"

// The arguments after the program's name.
int RunFetch(const std::vector<std::wstring>& arguments, FetchFront& front, FetchConsole& console);

// Stops the run as Ctrl+C does: the download in progress is cancelled through its dialog, no
// file that looks complete is left, and the summary is still written. windUp: waits (briefly)
// until the run has wound up, for callers after whose return the process ends.
void StopFetch(bool windUp);

// The folder as a full path without a trailing "\".
std::wstring FullPath(const std::wstring& path);
// The target exists (made if need be) and takes a new file.
bool IsWritableFolder(const std::wstring& target);
