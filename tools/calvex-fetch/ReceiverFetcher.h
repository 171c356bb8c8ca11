#pragma once
// Fetches one receiver's files through the shell, the way Explorer copies them: per file the
// folder's data object, its "FileGroupDescriptorW", then its "FileContents" under the
// product's own progress dialog, written below the target through WriteVirtualFile.
#include <windows.h>
#include <shlobj.h>

#include <atomic>
#include <set>
#include <string>

#include "FetchConsole.h"
#include "FetchOptions.h"

struct FetchTotals {
    int fetched = 0;  // or, in a dry run, would be fetched
    int skipped = 0;
    int failed = 0;
    ULONGLONG bytes = 0;
};

class ReceiverFetcher {
public:
    ReceiverFetcher(const FetchOptions& options, FetchConsole& console, FetchTotals& totals,
                    const std::atomic<bool>& interrupted)
        : m_options(options), m_console(console), m_totals(totals), m_interrupted(interrupted) {}

    // Every file of the receiver's folder into targetDir (made when something is fetched).
    void Run(IShellFolder* receiver, const std::wstring& targetDir);
    // For a watch, whose lines mix receivers: each file is shown below folderName (the
    // receiver's folder in the target); the names in givenUp are left alone, every file that
    // fails joins them, and a run stops at its first failure (the receiver may be gone).
    void Watching(const std::wstring& folderName, std::set<std::wstring>* givenUp) {
        m_shownFolder = folderName + L"\\";
        m_givenUp = givenUp;
    }

private:
    void FetchItem(IShellFolder* receiver, PCUITEMID_CHILD item, const std::wstring& targetDir);
    // Downloads and writes one file; false with the reason.
    bool Download(IDataObject* data, const FILEDESCRIPTORW& descriptor, const std::wstring& shownName,
                  const std::wstring& targetDir, std::wstring& error);
    void Fail(const std::wstring& name, const std::wstring& reason);

    const FetchOptions& m_options;
    FetchConsole& m_console;
    FetchTotals& m_totals;
    const std::atomic<bool>& m_interrupted;
    std::wstring m_shownFolder;
    std::set<std::wstring>* m_givenUp = nullptr;
};

// True when path holds a file of the descriptor's size and last-write time.
bool IsAlreadyFetched(const std::wstring& path, const FILEDESCRIPTORW& descriptor);
