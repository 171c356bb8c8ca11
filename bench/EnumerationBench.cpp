// calvex_enum_bench [files...]: lists the files of one receiver of the simulated device
// manager (out of process) through CCalvexReceiversEnumIDList, for each count given
// (default 1000 2000 10000), and reports the time per item and the calls per item against a null
// call (get_Count) and a raw walk of the same files, all measured in the same run.
#include <windows.h>
#include <objbase.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "CalvexDeviceMgrLib.h"
#include "CountingFiles.h"
#include "SimServerProcess.h"
#include "com/Bstr.h"
#include "com/ComObject.h"
#include "com/Handles.h"
#include "items/CCalvexReceiversEnumIDList.h"
#include "module/ModuleApp.h"

namespace {
const wchar_t kReceiverFolder[] = L"Bench Q7 COM3";
const wchar_t kReceiverPath[] = L"Calvex Receivers\\5211-40125!Q7#RTK!COM3";
const char kDescription[] =
    "[Receiver]\r\nBrand=1\r\nLabel=Bench\r\nSerialNumber=5211-40125\r\nModel=Q7/RTK\r\n"
    "PortType=1\r\nPortName=COM3\r\n";
const int kNullCalls = 1000;

double Now() {
    static LARGE_INTEGER frequency = [] {
        LARGE_INTEGER f;
        QueryPerformanceFrequency(&f);
        return f;
    }();
    LARGE_INTEGER counter;
    QueryPerformanceCounter(&counter);
    return static_cast<double>(counter.QuadPart) / static_cast<double>(frequency.QuadPart);
}

bool WriteWholeFile(const std::wstring& path, const void* bytes, DWORD length) {
    UniqueFile file(CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr));
    DWORD written = 0;
    return file && WriteFile(file.Get(), bytes, length, &written, nullptr) && written == length;
}

// A tree of one receiver with `files` small files, removed again at the end.
class BenchTree {
public:
    explicit BenchTree(int files) {
        wchar_t temp[MAX_PATH];
        GetTempPathW(MAX_PATH, temp);
        m_root = std::wstring(temp) + L"calvex-bench-" + std::to_wstring(GetCurrentProcessId()) + L"-" +
                 std::to_wstring(files);
        m_folder = m_root + L"\\" + kReceiverFolder;
        CreateDirectoryW(m_root.c_str(), nullptr);
        CreateDirectoryW(m_folder.c_str(), nullptr);
        m_ok = WriteWholeFile(m_folder + L"\\receiver.ini", kDescription, sizeof kDescription - 1);
        for (int i = 0; m_ok && i < files; ++i) {
            wchar_t name[32];
            swprintf(name, 32, L"\\LOG%05d", i);
            m_ok = WriteWholeFile(m_folder + name, "0123456789abcdef", 16);
        }
    }
    ~BenchTree() {
        WIN32_FIND_DATAW data;
        HANDLE find = FindFirstFileW((m_folder + L"\\*").c_str(), &data);
        if (find != INVALID_HANDLE_VALUE) {
            do DeleteFileW((m_folder + L"\\" + data.cFileName).c_str());
            while (FindNextFileW(find, &data));
            FindClose(find);
        }
        RemoveDirectoryW(m_folder.c_str());
        RemoveDirectoryW(m_root.c_str());
    }
    bool Ok() const { return m_ok; }
    const std::wstring& Root() const { return m_root; }

private:
    std::wstring m_root, m_folder;
    bool m_ok = false;
};

// The files collection of the only receiver of a new device manager object.
HRESULT OpenFiles(ComPtr<IDeviceMgr>& manager, ComPtr<IFilesColl>& files) {
    HRESULT hr = CoCreateInstance(CLSID_DeviceMgr, nullptr, CLSCTX_LOCAL_SERVER, IID_IDeviceMgr, manager.PutVoid());
    if (FAILED(hr)) return hr;
    manager->Refresh();
    ComPtr<IDispatch> dispatch;
    ComPtr<IReceiversColl> receivers;
    ComPtr<IReceiver> receiver;
    if (FAILED(hr = manager->get_Receivers(&dispatch))) return hr;
    if (FAILED(hr = dispatch.QueryTo(IID_IReceiversColl, receivers.PutVoid()))) return hr;
    if (FAILED(hr = receivers->get_Item(0, &dispatch)) || !dispatch) return FAILED(hr) ? hr : E_FAIL;
    if (FAILED(hr = dispatch.QueryTo(IID_IReceiver, receiver.PutVoid()))) return hr;
    if (FAILED(hr = receiver->get_Files(&dispatch)) || !dispatch) return FAILED(hr) ? hr : E_FAIL;
    return dispatch.QueryTo(IID_IFilesColl, files.PutVoid());
}

double NullCallSeconds(IFilesColl* files) {
    const double start = Now();
    for (int i = 0; i < kNullCalls; ++i) {
        LONG count = 0;
        files->get_Count(&count);
    }
    return (Now() - start) / kNullCalls;
}

// The same calls as the enumerator makes per file, without building anything: the floor.
double RawWalkSeconds(IFilesColl* files, LONG count) {
    const double start = Now();
    for (LONG i = 0; i < count; ++i) {
        ComPtr<IDispatch> item;
        ComPtr<IReceiverFile> file;
        if (FAILED(files->get_Item(i, &item)) || FAILED(item.QueryTo(IID_IReceiverFile, file.PutVoid()))) continue;
        Bstr name;
        DATE time = 0;
        LONG size = 0;
        file->get_Name(name.Put());
        file->get_Time(&time);
        file->get_Size(&size);
    }
    return Now() - start;
}

struct EnumResult {
    double seconds = 0;
    ULONG items = 0;
    CallCounts counts;
};

EnumResult EnumerateThroughExtension(IFilesColl* files) {
    EnumResult result;
    auto* counting = new CountingFilesColl(files, &result.counts);
    const double start = Now();
    ComObject<CCalvexReceiversEnumIDList>* enumerator = nullptr;
    HRESULT hr = CreateComObject<CCalvexReceiversEnumIDList>(&enumerator);
    if (SUCCEEDED(hr)) enumerator->Init(kReceiverPath, SHCONTF_NONFOLDERS, counting, 1, &hr);
    if (SUCCEEDED(hr)) {
        PITEMID_CHILD pidl = nullptr;
        ULONG fetched = 0;
        while (enumerator->Next(1, &pidl, &fetched) == S_OK) {
            CoTaskMemFree(pidl);
            ++result.items;
        }
        enumerator->Release();
    }
    result.seconds = Now() - start;
    counting->Release();
    return result;
}

int RunOne(int fileCount) {
    BenchTree tree(fileCount);
    if (!tree.Ok()) return fprintf(stderr, "cannot write the tree for %d files\n", fileCount), 1;
    SimServerProcess server(tree.Root());
    if (!server.Ready()) return fprintf(stderr, "the simulator did not start\n"), 1;
    ComPtr<IDeviceMgr> manager;
    ComPtr<IFilesColl> files;
    HRESULT hr = OpenFiles(manager, files);
    LONG count = 0;
    if (SUCCEEDED(hr)) files->get_Count(&count);
    if (FAILED(hr) || count != fileCount)
        return fprintf(stderr, "simulator: 0x%08lX, %ld files of %d\n", hr, count, fileCount), 1;

    const double nullCall = NullCallSeconds(files.Get());
    const double raw = RawWalkSeconds(files.Get(), count);
    const EnumResult listed = EnumerateThroughExtension(files.Get());
    long calls = 0;
    for (const auto& entry : listed.counts) calls += entry.second;
    const double perItem = listed.seconds / fileCount, rawPerItem = raw / fileCount;
    const double callsPerItem = static_cast<double>(calls) / fileCount;
    printf("%6d files: listed %lu, null call %.3f ms, raw walk %.3f ms/item, enumerator %.3f ms/item\n",
           fileCount, listed.items, nullCall * 1e3, rawPerItem * 1e3, perItem * 1e3);
    printf("        calls/item %.2f; enumerator/null call %.1f; enumerator/(calls x null call) %.2f; "
           "enumerator/raw walk %.2f\n",
           callsPerItem, perItem / nullCall, perItem / (callsPerItem * nullCall), perItem / rawPerItem);
    printf("        calls:");
    for (const auto& entry : listed.counts) printf(" %s %ld", entry.first.c_str(), entry.second);
    printf("\n");
    fflush(stdout);
    return listed.items == static_cast<ULONG>(fileCount) ? 0 : 1;
}
}  // namespace

int main(int argc, char** argv) {
    std::vector<int> counts;
    for (int i = 1; i < argc; ++i) counts.push_back(atoi(argv[i]));
    if (counts.empty()) counts = {1000, 2000, 10000};
    if (FAILED(CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED))) return 2;
    CModuleApp::Instance().EnsureInitialized();  // the trace is on, as in Explorer
    int failures = 0;
    for (int count : counts) failures += RunOne(count);
    CoUninitialize();
    return failures;
}
