#pragma once
// The command line of calvex-fetch.
#include <string>
#include <vector>

struct FetchOptions {
    bool calvex = true;    // which brand folders are walked
    bool brennor = true;
    std::vector<std::wstring> receivers;  // keys or display names; empty: every receiver
    bool all = false;      // fetch again what is already there
    bool dryRun = false;
    bool watch = false;    // keep running and fetch what receivers bring, as it comes
    bool move = false;     // delete each file on the receiver once its copy is proven whole
    std::wstring layout = L"{receiver}";  // where each file goes below the target
    bool notify = true;    // the windowless watch's notification area icon and notices
    std::wstring log;      // the log file; empty: none (the windowless build has a default)
    std::wstring target;   // as given; made absolute by the caller
};

extern const wchar_t kFetchUsage[];

// --brand, --receiver, --log and --layout: the next argument is their value.
bool FetchOptionTakesValue(const std::wstring& argument);

// The arguments after the program's name. False with the reason on bad usage.
bool ParseFetchOptions(const std::vector<std::wstring>& arguments, FetchOptions& options, std::wstring& error);
