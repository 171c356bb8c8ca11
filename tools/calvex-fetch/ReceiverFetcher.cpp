#include "ReceiverFetcher.h"

#include <vector>

#include "DescriptorName.h"
#include "DownloadDialogWatch.h"
#include "ReceiverList.h"
#include "ShellNamespace.h"
#include "VirtualFiles.h"
#include "com/ComPtr.h"

namespace {
ULONGLONG DescriptorSize(const FILEDESCRIPTORW& descriptor) {
    return (static_cast<ULONGLONG>(descriptor.nFileSizeHigh) << 32) | descriptor.nFileSizeLow;
}
}  // namespace

bool IsAlreadyFetched(const std::wstring& path, const FILEDESCRIPTORW& descriptor) {
    WIN32_FILE_ATTRIBUTE_DATA found = {};
    if (!GetFileAttributesExW(path.c_str(), GetFileExInfoStandard, &found)) return false;
    if (found.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY) return false;
    const ULONGLONG size = (static_cast<ULONGLONG>(found.nFileSizeHigh) << 32) | found.nFileSizeLow;
    const FILETIME time = DescriptorWriteTime(descriptor);
    return size == DescriptorSize(descriptor) && CompareFileTime(&found.ftLastWriteTime, &time) == 0;
}

void ReceiverFetcher::Run(IShellFolder* receiver, const std::wstring& targetDir) {
    HRESULT hr = S_OK;
    std::vector<OwnedItem> files = ShellChildren(receiver, SHCONTF_NONFOLDERS, &hr);
    if (FAILED(hr)) Fail(L"(file list)", L"the receiver's files cannot be listed (" + HexText(hr) + L")");
    const int failedBefore = m_totals.failed;
    for (const OwnedItem& file : files) {
        if (m_interrupted || (m_givenUp && m_totals.failed > failedBefore)) return;
        FetchItem(receiver, file.get(), targetDir);
    }
}

void ReceiverFetcher::FetchItem(IShellFolder* receiver, PCUITEMID_CHILD item, const std::wstring& targetDir) {
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
    if (m_givenUp && m_givenUp->count(name)) return;
    const SafeName safe = MakeSafeDescriptorName(name, targetDir.size());
    if (safe.refused) return Fail(name, L"refused name: " + safe.reason);
    const std::wstring shown = m_shownFolder + (safe.reason.empty() ? name : name + L" as " + safe.name + L" (" + safe.reason + L")");
    if (!m_options.all && IsAlreadyFetched(targetDir + L"\\" + safe.name, descriptor)) {
        ++m_totals.skipped;
        // A watch compares again at every event: only news is worth a line there.
        return m_options.watch ? void() : m_console.Line(L"  up to date  " + shown);
    }
    if (m_options.dryRun) {
        ++m_totals.fetched;
        m_totals.bytes += DescriptorSize(descriptor);
        return m_console.Line(L"  would fetch " + shown + L"  " + ByteText(DescriptorSize(descriptor)));
    }
    std::wstring error;
    if (!Download(data.Get(), descriptor, name, targetDir, error)) {
        // Stopped by the user: nothing failed, the file simply was not kept.
        if (m_interrupted) return m_console.Line(L"  discarded   " + m_shownFolder + name + L" (stopped)");
        return Fail(name, error);
    }
    ++m_totals.fetched;
    m_totals.bytes += DescriptorSize(descriptor);
    m_console.Line(L"  fetched     " + shown + L"  " + ByteText(DescriptorSize(descriptor)));
}

bool ReceiverFetcher::Download(IDataObject* data, const FILEDESCRIPTORW& descriptor, const std::wstring& shownName,
                               const std::wstring& targetDir, std::wstring& error) {
    if (!CreateDirectoryW(targetDir.c_str(), nullptr) && GetLastError() != ERROR_ALREADY_EXISTS) {
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
    return SUCCEEDED(WriteVirtualFile(targetDir, descriptor, stream.Get(), error));
}

void ReceiverFetcher::Fail(const std::wstring& name, const std::wstring& reason) {
    ++m_totals.failed;
    if (m_givenUp) m_givenUp->insert(name);
    m_console.Line(L"  FAILED      " + m_shownFolder + name + L": " + reason);
}
