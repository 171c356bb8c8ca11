#pragma once
// Fetches one receiver's files through the shell, the way Explorer copies them: per file the
// folder's data object, its "FileGroupDescriptorW", then its "FileContents" under the
// product's own progress dialog, written below the target through WriteVirtualFile, in the
// folder that the layout names for it. With --move, each file proven whole in the target is
// then deleted from the receiver (ReceiverFileDeleter).
#include <windows.h>
#include <shlobj.h>

#include <atomic>
#include <functional>
#include <memory>
#include <set>
#include <string>

#include "FetchConsole.h"
#include "FetchOptions.h"
#include "LayoutPattern.h"
#include "ReceiverFileDeleter.h"
#include "ReceiverList.h"
#include "TargetDisk.h"

struct FetchTotals {
    int fetched = 0;  // or, in a dry run, would be fetched
    int skipped = 0;
    int failed = 0;
    int deleted = 0;  // from the receiver (--move); or, in a dry run, would be
    int kept = 0;     // safe in the target but left on the receiver: still changing, or the delete refused
    ULONGLONG bytes = 0;
    std::wstring firstFailure;  // "NAME: reason"
    HRESULT targetLost = S_OK;  // why the target could not be reached: the run stopped there, no file counted failed
};

// The one line for a target that cannot be reached (a stick pulled, a share gone, a folder deleted).
std::wstring TargetLostText(const std::wstring& target, HRESULT why);

class ReceiverFetcher {
public:
    ReceiverFetcher(const FetchOptions& options, const LayoutPattern& layout, FetchConsole& console,
                    FetchTotals& totals, const std::atomic<bool>& interrupted)
        : m_options(options), m_layout(layout), m_console(console), m_totals(totals), m_interrupted(interrupted) {}

    // Every file of the receiver's folder `files` into its place below target (folders made
    // when something is fetched).
    void Run(IShellFolder* files, const Receiver& receiver, const std::wstring& target);
    // For a watch, whose lines mix receivers: each file is shown with its folder below the
    // target; the names in givenUp are left alone, every file that fails joins them, and a run
    // stops at its first failure (the receiver may be gone).
    void Watching(std::set<std::wstring>* givenUp) {
        m_watching = true;
        m_givenUp = givenUp;
    }
    // Told before each file how many of the receiver's files are left, this one included.
    void OnEachFile(std::function<void(int left)> tell) { m_tell = std::move(tell); }
    // Asked before each file: true stops the run there (a pause, new settings); Held() says so.
    void HoldBetweenFiles(std::function<bool()> hold) { m_hold = std::move(hold); }
    bool Held() const { return m_held; }

private:
    void FetchItem(IShellFolder* receiver, PCUITEMID_CHILD item);
    // The file's folder below the target, by the layout; false when it makes no name.
    bool Place(const FILEDESCRIPTORW& descriptor, std::wstring& targetDir);
    void Fetch(IDataObject* data, const FILEDESCRIPTORW& descriptor, const std::wstring& targetDir,
               const std::wstring& path, const std::wstring& shown);
    // False when the target is gone (totals.targetLost set): a failure there is no file's.
    bool TargetReached();
    // Room on the target's disk for the file, asked before its download; false with the reason.
    bool HasRoom(const FILEDESCRIPTORW& descriptor, std::wstring& error) const;
    // Downloads and writes one file; false with the reason.
    bool Download(IDataObject* data, const FILEDESCRIPTORW& descriptor, const std::wstring& shownName,
                  const std::wstring& targetDir, std::wstring& error);
    // --move: the receiver's file, whose copy is proven whole, is deleted if it did not change.
    void Remove(const FILEDESCRIPTORW& descriptor, const std::wstring& shown, bool fetchedNow);
    void Fail(const std::wstring& name, const std::wstring& reason);

    const FetchOptions& m_options;
    const LayoutPattern& m_layout;
    FetchConsole& m_console;
    FetchTotals& m_totals;
    const std::atomic<bool>& m_interrupted;
    const Receiver* m_receiver = nullptr;
    std::wstring m_target;
    std::unique_ptr<ReceiverFileDeleter> m_deleter;
    std::unique_ptr<TargetDisk> m_disk;  // the target's volume, looked at when the run starts
    std::wstring m_receiverShown;  // what the lines show before a name until the file's folder is known
    std::wstring m_shownFolder;    // what the lines show before a file's name
    bool m_watching = false;
    std::set<std::wstring>* m_givenUp = nullptr;
    std::function<void(int)> m_tell;
    std::function<bool()> m_hold;
    bool m_held = false;
};

// True when path holds a file of the descriptor's size and last-write time, as exactly as its
// disk keeps times (a descriptor that does not give both never matches). --new, the watch and
// --move's proof for a delete all ask this.
bool IsAlreadyFetched(const std::wstring& path, const FILEDESCRIPTORW& descriptor, TargetDisk& disk);
