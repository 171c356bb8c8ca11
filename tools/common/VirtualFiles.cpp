#include "VirtualFiles.h"

#include <vector>

#include "DescriptorName.h"
#include "LongPath.h"

namespace {
constexpr ULONG ChunkBytes = 1 << 20;

std::vector<std::wstring> Components(const std::wstring& name) {
    std::vector<std::wstring> parts;
    std::wstring part;
    for (wchar_t c : name) {
        if (c == L'\\' || c == L'/') {
            parts.push_back(part);
            part.clear();
        } else {
            part += c;
        }
    }
    parts.push_back(part);
    return parts;
}

// Creates the folders between the target and the file; the name was checked to stay inside.
bool MakeParentFolders(const std::wstring& targetDir, const std::wstring& name) {
    std::vector<std::wstring> parts = Components(name);
    std::wstring path = targetDir;
    for (size_t i = 0; i + 1 < parts.size(); ++i) {
        if (parts[i].empty()) continue;
        path += L"\\" + parts[i];
        if (!CreateDirectoryW(LongPath(path).c_str(), nullptr) && GetLastError() != ERROR_ALREADY_EXISTS) return false;
    }
    return true;
}

std::wstring ErrorText(const wchar_t* what, DWORD code) {
    wchar_t text[160];
    wsprintfW(text, L"%s (0x%08X)", what, static_cast<unsigned>(code));
    return text;
}

bool IsDiskFull(DWORD code) { return code == ERROR_DISK_FULL || code == ERROR_HANDLE_DISK_FULL; }

// What went wrong writing to the disk, in words: a full disk is named as such.
std::wstring WriteErrorText(const wchar_t* what, DWORD code) {
    if (IsDiskFull(code)) return ErrorText(L"the disk is full", static_cast<DWORD>(HRESULT_FROM_WIN32(ERROR_DISK_FULL)));
    return ErrorText(what, code);
}

// A short write (what a nearly full disk gives) is no end: the rest of the chunk is written
// again until all of it is on the disk or the disk refuses.
bool WriteWhole(HANDLE file, const BYTE* bytes, DWORD count) {
    while (count) {
        DWORD out = 0;
        if (!WriteFile(file, bytes, count, &out, nullptr)) return false;
        if (out == 0) {
            SetLastError(ERROR_DISK_FULL);
            return false;
        }
        bytes += out;
        count -= out;
    }
    return true;
}

HRESULT CopyStream(IStream* stream, HANDLE file, ULONGLONG& written, std::wstring& error) {
    std::vector<BYTE> buffer(ChunkBytes);
    written = 0;
    for (;;) {
        ULONG read = 0;
        const HRESULT hr = stream->Read(buffer.data(), ChunkBytes, &read);
        if (FAILED(hr)) {
            error = ErrorText(L"reading the contents failed", static_cast<DWORD>(hr));
            return hr;
        }
        if (read == 0) return S_OK;
        if (!WriteWhole(file, buffer.data(), read)) {
            const DWORD code = GetLastError();
            error = WriteErrorText(L"cannot write the file", code);
            return HRESULT_FROM_WIN32(IsDiskFull(code) ? ERROR_DISK_FULL : code);
        }
        written += read;
    }
}

// A file's size and last-write time as the disk holds them.
struct OnDisk {
    ULONGLONG size = 0;
    FILETIME time = {};
};

bool ReadOnDisk(const std::wstring& path, OnDisk& found) {
    WIN32_FILE_ATTRIBUTE_DATA data = {};
    if (!GetFileAttributesExW(LongPath(path).c_str(), GetFileExInfoStandard, &data)) return false;
    found.size = (static_cast<ULONGLONG>(data.nFileSizeHigh) << 32) | data.nFileSizeLow;
    found.time = data.ftLastWriteTime;
    return !(data.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY);
}

// flushed: what the file holds once on the disk (a time the disk cannot hold, as 1601 on
// Wine's, is not the descriptor's).
HRESULT WriteTemporary(const std::wstring& path, const FILEDESCRIPTORW& descriptor, IStream* stream,
                       std::wstring& error, OnDisk& flushed) {
    HANDLE file = CreateFileW(LongPath(path).c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr);
    if (file == INVALID_HANDLE_VALUE) {
        error = ErrorText(L"cannot create the temporary file", GetLastError());
        return HRESULT_FROM_WIN32(GetLastError());
    }
    ULONGLONG written = 0;
    HRESULT hr = CopyStream(stream, file, written, error);
    const ULONGLONG expected = DescriptorSize(descriptor);
    const FILETIME time = DescriptorWriteTime(descriptor);
    if (FAILED(hr)) {
        // CopyStream said whether the stream or the disk failed
    } else if ((descriptor.dwFlags & FD_FILESIZE) && written != expected) {
        error = L"size differs from the descriptor: " + std::to_wstring(written) + L" of " + std::to_wstring(expected);
        hr = HRESULT_FROM_WIN32(ERROR_INVALID_DATA);
    } else if ((descriptor.dwFlags & FD_WRITESTIME) && !SetFileTime(file, nullptr, nullptr, &time)) {
        error = ErrorText(L"cannot set the write time", GetLastError());
        hr = HRESULT_FROM_WIN32(GetLastError());
    } else if (!FlushFileBuffers(file) || !GetFileTime(file, nullptr, nullptr, &flushed.time)) {
        // On the disk before it gets its final name: a power cut leaves no short file there.
        error = WriteErrorText(L"cannot flush the file to the disk", GetLastError());
        hr = HRESULT_FROM_WIN32(GetLastError());
    }
    flushed.size = written;
    CloseHandle(file);
    return hr;
}

// The last guard: whatever the name rules let through must still resolve below the target.
bool IsInside(const std::wstring& targetDir, const std::wstring& path) {
    std::wstring prefix = FullPlainPath(targetDir);
    const std::wstring fullPath = FullPlainPath(path);
    if (prefix.empty() || prefix.back() != L'\\') prefix += L'\\';
    return fullPath.size() > prefix.size() &&
           CompareStringOrdinal(fullPath.c_str(), static_cast<int>(prefix.size()), prefix.c_str(), static_cast<int>(prefix.size()),
                                TRUE) == CSTR_EQUAL;
}

}  // namespace

FILETIME DescriptorWriteTime(const FILEDESCRIPTORW& descriptor) {
    SYSTEMTIME local, universal;
    FILETIME moment = descriptor.ftLastWriteTime;
    if (FileTimeToSystemTime(&descriptor.ftLastWriteTime, &local) && TzSpecificLocalTimeToSystemTime(nullptr, &local, &universal))
        SystemTimeToFileTime(&universal, &moment);
    return moment;
}

ULONGLONG DescriptorSize(const FILEDESCRIPTORW& descriptor) {
    return (static_cast<ULONGLONG>(descriptor.nFileSizeHigh) << 32) | descriptor.nFileSizeLow;
}

bool IsOnDiskAsDescribed(const std::wstring& path, const FILEDESCRIPTORW& descriptor, TargetDisk& disk) {
    OnDisk found;
    if (!ReadOnDisk(path, found)) return false;
    const FILETIME time = DescriptorWriteTime(descriptor);
    if ((descriptor.dwFlags & FD_FILESIZE) && found.size != DescriptorSize(descriptor)) return false;
    return !(descriptor.dwFlags & FD_WRITESTIME) || SameTimeOnDisk(found.time, time, TimeKeeping::Seconds) ||
           SameTimeOnDisk(found.time, time, disk.Keeping());
}

HRESULT ReadFileDescriptors(IDataObject* data, std::vector<FILEDESCRIPTORW>& files) {
    FORMATETC format = {static_cast<CLIPFORMAT>(RegisterClipboardFormatW(CFSTR_FILEDESCRIPTORW)), nullptr,
                        DVASPECT_CONTENT, -1, TYMED_HGLOBAL};
    STGMEDIUM medium = {};
    HRESULT hr = data->GetData(&format, &medium);
    if (hr != S_OK) return FAILED(hr) ? hr : E_FAIL;
    if (medium.tymed != TYMED_HGLOBAL) {
        ReleaseStgMedium(&medium);
        return DV_E_TYMED;
    }
    const SIZE_T bytes = GlobalSize(medium.hGlobal);
    if (auto* group = static_cast<const FILEGROUPDESCRIPTORW*>(GlobalLock(medium.hGlobal))) {
        const SIZE_T room = bytes < sizeof(UINT) ? 0 : (bytes - sizeof(UINT)) / sizeof(FILEDESCRIPTORW);
        if (group->cItems <= room) files.assign(group->fgd, group->fgd + group->cItems);
        else hr = E_UNEXPECTED;
        GlobalUnlock(medium.hGlobal);
    }
    ReleaseStgMedium(&medium);
    return hr;
}

HRESULT ReadFileContents(IDataObject* data, LONG index, IStream** stream) {
    FORMATETC format = {static_cast<CLIPFORMAT>(RegisterClipboardFormatW(CFSTR_FILECONTENTS)), nullptr,
                        DVASPECT_CONTENT, index, TYMED_ISTREAM};
    STGMEDIUM medium = {};
    HRESULT hr = data->GetData(&format, &medium);
    if (hr != S_OK) return FAILED(hr) ? hr : S_FALSE;
    if (medium.tymed != TYMED_ISTREAM || !medium.pstm) {
        ReleaseStgMedium(&medium);
        return DV_E_TYMED;
    }
    *stream = medium.pstm;
    medium.pstm->AddRef();
    ReleaseStgMedium(&medium);
    return S_OK;
}
HRESULT WriteVirtualFile(const std::wstring& targetDir, const FILEDESCRIPTORW& descriptor, IStream* stream,
                         std::wstring& error, size_t pathLimit) {
    const SafeName safe = MakeSafeDescriptorName(descriptor.cFileName, targetDir.size(), pathLimit);
    if (safe.refused) {
        error = L"refused name: " + safe.reason;
        return E_ACCESSDENIED;
    }
    const std::wstring path = targetDir + L"\\" + safe.name;
    if (!IsInside(targetDir, path)) {
        error = L"refused name: outside the target folder";
        return E_ACCESSDENIED;
    }
    if (!MakeParentFolders(targetDir, safe.name)) {
        error = ErrorText(L"cannot create the folders", GetLastError());
        return HRESULT_FROM_WIN32(GetLastError());
    }
    const std::wstring temporary = path + kPartialSuffix;
    OnDisk flushed, placed;
    HRESULT hr = WriteTemporary(temporary, descriptor, stream, error, flushed);
    if (SUCCEEDED(hr) &&
        !MoveFileExW(LongPath(temporary).c_str(), LongPath(path).c_str(), MOVEFILE_REPLACE_EXISTING | MOVEFILE_WRITE_THROUGH)) {
        error = ErrorText(L"cannot rename the temporary file", GetLastError());
        hr = HRESULT_FROM_WIN32(GetLastError());
    }
    if (FAILED(hr)) {
        DeleteFileW(LongPath(temporary).c_str());
    } else if (!ReadOnDisk(path, placed) || placed.size != flushed.size || CompareFileTime(&placed.time, &flushed.time)) {
        // Read back under its final name: what is not the file flushed does not stay there.
        DeleteFileW(LongPath(path).c_str());
        error = L"the file on the disk is not the one written after the rename";
        hr = HRESULT_FROM_WIN32(ERROR_INVALID_DATA);
    }
    return hr;
}

int PasteVirtualFiles(IDataObject* data, const std::wstring& targetDir, const PasteReport& report, int& failed) {
    failed = 0;
    std::vector<FILEDESCRIPTORW> files;
    HRESULT hr = ReadFileDescriptors(data, files);
    if (FAILED(hr)) {
        report(ErrorText(L"no file descriptor", static_cast<DWORD>(hr)));
        failed = 1;
        return 0;
    }
    int written = 0;
    for (size_t i = 0; i < files.size(); ++i) {
        std::wstring error;
        IStream* stream = nullptr;
        const SafeName safe = MakeSafeDescriptorName(files[i].cFileName, targetDir.size());
        hr = safe.refused ? E_ACCESSDENIED : ReadFileContents(data, static_cast<LONG>(i), &stream);
        if (hr == S_OK) {
            hr = WriteVirtualFile(targetDir, files[i], stream, error);
            stream->Release();
        } else {
            error = hr == E_ACCESSDENIED ? L"refused name: " + safe.reason : ErrorText(L"no contents", static_cast<DWORD>(hr));
        }
        if (hr == S_OK) {
            ++written;
            report(L"copied " + std::wstring(files[i].cFileName) +
                   (safe.reason.empty() ? L"" : L" as " + safe.name + L" (" + safe.reason + L")"));
        } else {
            ++failed;
            report(L"failed " + std::wstring(files[i].cFileName) + L": " + error);
        }
    }
    return written;
}
