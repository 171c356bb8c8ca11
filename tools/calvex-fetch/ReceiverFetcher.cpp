#include "ReceiverFetcher.h"

#include <vector>

#include "DescriptorName.h"
#include "DownloadDialogWatch.h"
#include "LongPath.h"
#include "ShellNamespace.h"
#include "VirtualFiles.h"
#include "com/ComPtr.h"

namespace {
// The file's time as the receiver reports it, its own clock: what the layout's dates come from.
SYSTEMTIME ReceiverClock(const FILEDESCRIPTORW& descriptor) {
    SYSTEMTIME clock = {};
    FileTimeToSystemTime(&descriptor.ftLastWriteTime, &clock);
    return clock;
}

// Makes every folder of the relative path below target.
bool MakeFolders(const std::wstring& target, const std::wstring& relative) {
    std::wstring path = target;
    for (size_t at = 0; at <= relative.size();) {
        const size_t end = relative.find(L'\\', at);
        path += L"\\" + relative.substr(at, end - at);
        if (!CreateDirectoryW(LongPath(path).c_str(), nullptr) && GetLastError() != ERROR_ALREADY_EXISTS) return false;
        if (end == std::wstring::npos) break;
        at = end + 1;
    }
    return true;
}

bool ReadWriteTime(const std::wstring& path, FILETIME& time) {
    WIN32_FILE_ATTRIBUTE_DATA data = {};
    if (!GetFileAttributesExW(LongPath(path).c_str(), GetFileExInfoStandard, &data)) return false;
    time = data.ftLastWriteTime;
    return true;
}
}  // namespace

std::wstring TargetLostText(const std::wstring& target, HRESULT why) {
    return L"the target cannot be reached: " + target + L" (" + HexText(why) + L")";
}

bool IsAlreadyFetched(const std::wstring& path, const FILEDESCRIPTORW& descriptor, TargetDisk& disk) {
    const DWORD both = FD_FILESIZE | FD_WRITESTIME;
    return (descriptor.dwFlags & both) == both && IsOnDiskAsDescribed(path, descriptor, disk);
}

void ReceiverFetcher::Run(IShellFolder* files, const Receiver& receiver, const std::wstring& target) {
    m_receiver = &receiver;
    m_target = target;
    m_receiverShown = m_watching ? m_layout.Shown(receiver.Fields()) + L"\\" : L"";
    m_disk.reset(new TargetDisk(target));
    HRESULT hr = S_OK;
    std::vector<OwnedItem> items = ShellChildren(files, SHCONTF_NONFOLDERS, &hr);
    if (FAILED(hr)) Fail(L"(file list)", L"the receiver's files cannot be listed (" + HexText(hr) + L")");
    const int failedBefore = m_totals.failed;
    for (size_t i = 0; i < items.size(); ++i) {
        if (m_interrupted || FAILED(m_totals.targetLost) || (m_givenUp && m_totals.failed > failedBefore)) return;
        if (m_hold && m_hold()) {
            m_held = true;
            return;
        }
        if (m_tell) m_tell(static_cast<int>(items.size() - i));
        FetchItem(files, items[i].get());
    }
}

bool ReceiverFetcher::Place(const FILEDESCRIPTORW& descriptor, std::wstring& targetDir) {
    const SafeName folder = m_layout.Folder(m_receiver->Fields(), ReceiverClock(descriptor), m_target.size());
    if (folder.refused) {
        Fail(descriptor.cFileName, L"no folder name: " + folder.reason);
        return false;
    }
    targetDir = m_target + L"\\" + folder.name;
    // A batch names the receiver's folder in its line, unless the file's own date picks it.
    m_shownFolder = m_watching || m_layout.IsDated() ? folder.name + L"\\" : L"";
    return true;
}

void ReceiverFetcher::FetchItem(IShellFolder* receiver, PCUITEMID_CHILD item) {
    m_shownFolder = m_receiverShown;
    const std::wstring listed = ShellName(receiver, item, SHGDN_INFOLDER);
    ComPtr<IDataObject> data;
    HRESULT hr = receiver->GetUIObjectOf(nullptr, 1, &item, IID_IDataObject, nullptr, data.PutVoid());
    std::vector<FILEDESCRIPTORW> descriptors;
    if (SUCCEEDED(hr)) hr = ReadFileDescriptors(data.Get(), descriptors);
    if (FAILED(hr) || descriptors.size() != 1) {
        return Fail(listed, L"no file descriptor (" + HexText(FAILED(hr) ? hr : E_UNEXPECTED) + L")");
    }
    const FILEDESCRIPTORW& descriptor = descriptors[0];
    const std::wstring name = descriptor.cFileName;
    std::wstring targetDir;
    if ((m_givenUp && m_givenUp->count(name)) || !Place(descriptor, targetDir)) return;
    const SafeName safe = MakeSafeDescriptorName(name, targetDir.size(), kLongPathLimit);
    if (safe.refused) return Fail(name, L"refused name: " + safe.reason);
    const std::wstring shown = m_shownFolder + (safe.reason.empty() ? name : name + L" as " + safe.name + L" (" + safe.reason + L")");
    const std::wstring path = targetDir + L"\\" + safe.name;
    if (!m_options.all && IsAlreadyFetched(path, descriptor, *m_disk)) {
        ++m_totals.skipped;
        if (m_options.move) return Remove(descriptor, shown, false);
        // A watch compares again at every event: only news is worth a line there.
        return m_watching ? void() : m_console.Line(L"  up to date  " + shown);
    }
    if (!m_options.dryRun) return Fetch(data.Get(), descriptor, targetDir, path, shown);
    ++m_totals.fetched;
    m_totals.deleted += m_options.move ? 1 : 0;
    m_totals.bytes += DescriptorSize(descriptor);
    m_console.Line((m_options.move ? L"  would move  " : L"  would fetch ") + shown + L"  " +
                   ByteText(DescriptorSize(descriptor)));
}

void ReceiverFetcher::Fetch(IDataObject* data, const FILEDESCRIPTORW& descriptor, const std::wstring& targetDir,
                            const std::wstring& path, const std::wstring& shown) {
    const std::wstring name = descriptor.cFileName;
    std::wstring error;
    if (!Download(data, descriptor, name, targetDir, error)) {
        // Stopped by the user: nothing failed, the file simply was not kept.
        if (m_interrupted) return m_console.Line(L"  discarded   " + m_shownFolder + name + L" (stopped)");
        return TargetReached() ? Fail(name, error) : void();
    }
    ++m_totals.fetched;
    m_totals.bytes += DescriptorSize(descriptor);
    const std::wstring line = shown + L"  " + ByteText(DescriptorSize(descriptor));
    if (!m_options.move) return m_console.Line(L"  fetched     " + line);
    FILETIME kept;
    if (ReadWriteTime(path, kept)) m_disk->Learn(DescriptorWriteTime(descriptor), kept);
    // Within the rule is proof; a time off by more than the disk can explain never is.
    if (IsAlreadyFetched(path, descriptor, *m_disk)) return Remove(descriptor, shown, true);
    ++m_totals.kept;  // whole, but the disk cannot hold the receiver's time: no proof for a delete
    m_console.Line(L"  kept        " + line + L" (fetched; its time cannot be kept on this disk)");
}

bool ReceiverFetcher::TargetReached() {
    const HRESULT why = TargetDisk::Reach(m_target);
    if (FAILED(why)) m_totals.targetLost = why;
    return SUCCEEDED(why);
}

// As Explorer does before a copy: a file that cannot fit is not started (the disk may still
// fill up during the download, from elsewhere: then the write says so).
bool ReceiverFetcher::HasRoom(const FILEDESCRIPTORW& descriptor, std::wstring& error) const {
    ULONGLONG free = 0;
    const ULONGLONG size = DescriptorSize(descriptor);
    if (!m_disk->FreeBytes(free) || size <= free) return true;
    error = L"not enough space on " + m_disk->Root() + L" for " + descriptor.cFileName + L" (" + ByteText(size) +
            L" needed, " + ByteText(free) + L" free)";
    return false;
}

bool ReceiverFetcher::Download(IDataObject* data, const FILEDESCRIPTORW& descriptor, const std::wstring& shownName,
                               const std::wstring& targetDir, std::wstring& error) {
    if (!HasRoom(descriptor, error)) return false;
    if (!MakeFolders(m_target, targetDir.substr(m_target.size() + 1))) {
        error = L"cannot create " + targetDir;
        return false;
    }
    const ULONGLONG size = DescriptorSize(descriptor);
    const ULONGLONG started = GetTickCount64();
    ComPtr<IStream> stream;
    HRESULT hr;
    {
        DownloadDialogWatch watch([&](int percent) {
            m_console.Progress(shownName, size * percent / 100, size, (GetTickCount64() - started) / 1000.0);
        });
        hr = ReadFileContents(data, 0, &stream);
    }
    if (hr != S_OK || !stream) {
        // S_FALSE: the product's dialog ended without the file (failed or cancelled).
        error = hr == S_FALSE ? L"download failed or cancelled" : L"no contents (" + HexText(hr) + L")";
        return false;
    }
    // S_OK: flushed, renamed with write-through, and read back in place (VirtualFiles.h).
    return SUCCEEDED(WriteVirtualFile(targetDir, descriptor, stream.Get(), error, kLongPathLimit));
}

// Only a file whose copy is proven whole gets here: fetched now (WriteVirtualFile's S_OK) or
// already in the target with the receiver's size and time.
void ReceiverFetcher::Remove(const FILEDESCRIPTORW& descriptor, const std::wstring& shown, bool fetchedNow) {
    const std::wstring size = fetchedNow ? L"  " + ByteText(DescriptorSize(descriptor)) : L"";
    const std::wstring already = fetchedNow ? L"" : L" (already in the target)";
    if (m_options.dryRun) {
        ++m_totals.deleted;
        return m_console.Line(L"  would move  " + shown + already);
    }
    if (!m_deleter) m_deleter.reset(new ReceiverFileDeleter(*m_receiver));
    HRESULT why = S_OK;
    switch (m_deleter->Delete(descriptor, why)) {
    case ReceiverFileDeleter::Outcome::Deleted:
        ++m_totals.deleted;
        return m_console.Line((fetchedNow ? L"  moved       " : L"  deleted     ") + shown + size + already);
    case ReceiverFileDeleter::Outcome::Changed:
        ++m_totals.kept;
        return m_console.Line(L"  kept        " + shown + size + (fetchedNow ? L" (fetched; " : L" (already in the target; ") +
                              L"still changing on the receiver)");
    case ReceiverFileDeleter::Outcome::Refused:
        ++m_totals.kept;
        return Fail(descriptor.cFileName, L"the receiver refused the delete (" + HexText(why) + L"); the copy stays");
    }
}

void ReceiverFetcher::Fail(const std::wstring& name, const std::wstring& reason) {
    ++m_totals.failed;
    if (m_totals.firstFailure.empty()) m_totals.firstFailure = name + L": " + reason;
    if (m_givenUp) m_givenUp->insert(name);
    m_console.Line(L"  FAILED      " + m_shownFolder + name + L": " + reason);
}
