// calvex_transfer_bench: one large file through "FileContents" (the folder's data object, the
// download dialog and all) against the floor of the same run: a raw download of the same
// bytes from the simulator into an HGLOBAL stream through the contract, without the dialog.
//
//   calvex_transfer_bench.exe [MIB]     (default 64)
#include <windows.h>
#include <psapi.h>
#include <shlobj.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "ContractDownload.h"
#include "SimServerProcess.h"
#include "module/ClassCreators.h"
#include "module/ModuleApp.h"

namespace {
double PeakMiB() {
    PROCESS_MEMORY_COUNTERS counters = {sizeof(counters)};
    GetProcessMemoryInfo(GetCurrentProcess(), &counters, sizeof(counters));
    return counters.PeakWorkingSetSize / 1048576.0;
}

ULONGLONG StreamSize(IStream* stream) {
    STATSTG stat = {};
    return stream && SUCCEEDED(stream->Stat(&stat, STATFLAG_NONAME)) ? stat.cbSize.QuadPart : 0;
}

void WriteWhole(const std::wstring& path, const std::string& text) {
    UniqueFile out(CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr));
    DWORD written = 0;
    WriteFile(out.Get(), text.data(), static_cast<DWORD>(text.size()), &written, nullptr);
}

// Written in 1 MiB pieces, so that the peak working set is the downloads' own.
std::wstring MakeTree(size_t bytes) {
    wchar_t temp[MAX_PATH];
    GetTempPathW(MAX_PATH, temp);
    const std::wstring root = std::wstring(temp) + L"calvex-transfer-bench";
    const std::wstring folder = root + L"\\Calvex A";
    CreateDirectoryW(root.c_str(), nullptr);
    CreateDirectoryW(folder.c_str(), nullptr);
    WriteWhole(folder + L"\\receiver.ini",
               "[Receiver]\r\nBrand=1\r\nLabel=Bench\r\nSerialNumber=9000-0001\r\nModel=Q9\r\nPortType=2\r\n");
    UniqueFile out(CreateFileW((folder + L"\\BIG").c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr));
    std::vector<char> piece(1 << 20);
    for (size_t done = 0; done < bytes; done += piece.size()) {
        for (size_t i = 0; i < piece.size(); ++i) piece[i] = static_cast<char>(((done + i) * 2654435761u) >> 13);
        DWORD written = 0;
        WriteFile(out.Get(), piece.data(), static_cast<DWORD>(piece.size()), &written, nullptr);
    }
    return root;
}

// The floor: the contract's calls, a memory stream, the finish event; no dialog, no folder.
ULONGLONG RawDownload() {
    ComPtr<IFilesColl> files;
    ComPtr<IDispatch> file;
    Bstr name(L"BIG");
    if (FAILED(OpenReceiverFiles(L"USB-9000-0001", files)) || FAILED(files->get_ItemByName(name.Get(), &file))) return 0;
    ComPtr<IStream> stream;
    CreateStreamOnHGlobal(nullptr, TRUE, stream.ReleaseAndGetAddressOf());
    return DownloadThroughContract(file.Get(), stream.Get()) == S_OK ? StreamSize(stream.Get()) : 0;
}

// The product: the receiver folder's data object asked for the file's contents.
ULONGLONG ProductDownload() {
    ComPtr<IShellFolder> root, receiver;
    CreateCalvexReceiversShellFolder(nullptr, IID_IShellFolder, root.PutVoid());
    ComPtr<IPersistFolder> persist;
    root.QueryTo(IID_IPersistFolder, persist.PutVoid());
    if (!persist || FAILED(persist->Initialize(nullptr))) return 0;
    ComPtr<IEnumIDList> items;
    LPITEMIDLIST item = nullptr;
    root->EnumObjects(nullptr, SHCONTF_FOLDERS, &items);
    if (!items || items->Next(1, &item, nullptr) != S_OK) return 0;
    root->BindToObject(item, nullptr, IID_IShellFolder, receiver.PutVoid());
    CoTaskMemFree(item);
    items.Reset();
    if (!receiver) return 0;
    receiver->EnumObjects(nullptr, SHCONTF_NONFOLDERS, &items);
    if (!items || items->Next(1, &item, nullptr) != S_OK) return 0;
    ComPtr<IDataObject> data;
    receiver->GetUIObjectOf(nullptr, 1, const_cast<LPCITEMIDLIST*>(&item), IID_IDataObject, nullptr, data.PutVoid());
    CoTaskMemFree(item);
    FORMATETC format = {static_cast<CLIPFORMAT>(RegisterClipboardFormatW(CFSTR_FILECONTENTS)), nullptr,
                        DVASPECT_CONTENT, 0, TYMED_ISTREAM};
    STGMEDIUM medium = {};
    if (!data || data->GetData(&format, &medium) != S_OK) return 0;
    const ULONGLONG size = StreamSize(medium.pstm);
    ReleaseStgMedium(&medium);
    return size;
}
}  // namespace

int main(int argc, char** argv) {
    const size_t mib = argc > 1 ? std::strtoul(argv[1], nullptr, 10) : 64;
    const size_t bytes = mib << 20;
    if (FAILED(OleInitialize(nullptr))) return 2;
    CModuleApp::Instance().EnsureInitialized();
    SimServerProcess server(MakeTree(bytes));
    if (!server.Ready()) {
        std::printf("the simulator did not start\n");
        return 2;
    }
    std::printf("peak working set before the downloads %.1f MiB\n", PeakMiB());
    struct Run {
        const char* name;
        ULONGLONG (*download)();
    } runs[] = {{"raw download (floor)", RawDownload}, {"FileContents (product)", ProductDownload}};
    double seconds[2] = {};
    for (int i = 0; i < 2; ++i) {
        LARGE_INTEGER start;
        QueryPerformanceCounter(&start);
        const ULONGLONG got = runs[i].download();
        seconds[i] = SecondsSince(start);
        std::printf("%-24s %8.2f s  %7.2f MiB/s  %s  peak working set %.1f MiB (file %zu MiB)\n", runs[i].name,
                    seconds[i], mib / seconds[i], got == bytes ? "complete" : "INCOMPLETE", PeakMiB(), mib);
        std::fflush(stdout);
    }
    std::printf("product / floor: %.3f\n", seconds[1] / seconds[0]);
    OleUninitialize();
    return 0;
}
