#pragma once
// What one pass over one receiver did, and who hears of it: the watch tells an observer where
// it stands (for the notification area) and what each receiver's pass came to.
#include <windows.h>

#include <string>
#include <vector>

#include "FetchOptions.h"
#include "LayoutPattern.h"

struct ReceiverPass {
    std::wstring receiver;  // its display name, "Q9 GNSS@USB"
    std::wstring target;    // the target folder as the user gave it, made absolute
    std::wstring folder;    // the receiver's folder in the target (above any date folders)
    int files = 0;          // the receiver's files that are now safe in the target
    int fetched = 0;        // of those, fetched in this pass
    int failed = 0;
    int deleted = 0;        // deleted from the receiver (--move)
    int kept = 0;           // copied, but left on the receiver: still changing, or the delete refused
    std::wstring firstFailure;  // "NAME: reason" of the first file that failed, or empty
    bool unplugged = false;     // the receiver went away during the pass
};

class WatchObserver {
public:
    virtual ~WatchObserver() = default;
    // Nothing to do until a receiver brings something.
    virtual void Idle() = 0;
    // Working on a receiver; `left` of its files still to look at in this pass.
    virtual void Working(const std::wstring& receiver, int left) = 0;
    // A receiver's pass is over: nothing of it is being read any more.
    virtual void PassEnded(const ReceiverPass& pass) = 0;
    // Paused: nothing downloaded or deleted; `left` milliseconds, 0 until resumed.
    virtual void Paused(ULONGLONG left) { (void)left; }
    // New settings taken, between files: options as they now stand, target made absolute.
    virtual void SettingsApplied(const FetchOptions& options, const std::wstring& target) { (void)options, (void)target; }
    // The receivers watched now, after each look at a brand folder.
    virtual void Connected(const std::vector<LayoutReceiver>& receivers) { (void)receivers; }
};
