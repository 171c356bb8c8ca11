// Guards folder lifetimes: threads, locks or handles left behind, hangs or crashes when the device manager dies or is missing.
#include <windows.h>
#include <shlobj.h>
#include <tlhelp32.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "com/ComPtr.h"
#include "com/Handles.h"
#include "module/ClassIds.h"
#include "support/DeviceSim.h"
#include "support/LoadedModule.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {

// Threads of this process; with a module, only those whose start routine lies in it (the
// folders' own threads).
size_t Threads(HMODULE module = nullptr) {
    using QueryThreadFn = LONG(WINAPI*)(HANDLE, int, void*, ULONG, ULONG*);
    auto query = reinterpret_cast<QueryThreadFn>(GetProcAddress(GetModuleHandleW(L"ntdll.dll"), "NtQueryInformationThread"));
    const auto* image = reinterpret_cast<const BYTE*>(module);
    const BYTE* imageEnd = image;
    if (module)
        imageEnd += reinterpret_cast<const IMAGE_NT_HEADERS*>(image + reinterpret_cast<const IMAGE_DOS_HEADER*>(image)->e_lfanew)
                        ->OptionalHeader.SizeOfImage;
    size_t count = 0;
    UniqueHandle snapshot(CreateToolhelp32Snapshot(TH32CS_SNAPTHREAD, 0));
    THREADENTRY32 entry = {sizeof entry};
    for (BOOL more = Thread32First(snapshot.Get(), &entry); more; more = Thread32Next(snapshot.Get(), &entry)) {
        if (entry.th32OwnerProcessID != GetCurrentProcessId()) continue;
        UniqueHandle thread(OpenThread(THREAD_QUERY_INFORMATION, FALSE, entry.th32ThreadID));
        const BYTE* start = nullptr;
        const int kThreadQuerySetWin32StartAddress = 9;
        count += !module || (thread && query(thread.Get(), kThreadQuerySetWin32StartAddress, &start, sizeof start, nullptr) == 0 &&
                             start >= image && start < imageEnd);
    }
    return count;
}

// Open handles of this process, found by probing (Wine's GetProcessHandleCount gives 0).
DWORD HandleCount() {
    DWORD count = 0, flags = 0;
    for (UINT_PTR value = 4; value < 0x20000; value += 4)
        if (GetHandleInformation(reinterpret_cast<HANDLE>(value), &flags)) ++count;
    return count;
}

std::vector<DWORD> SimulatorProcesses() {
    std::vector<DWORD> ids;
    UniqueHandle snapshot(CreateToolhelp32Snapshot(TH32CS_SNAPPROCESS, 0));
    PROCESSENTRY32W entry = {sizeof entry};
    for (BOOL more = Process32FirstW(snapshot.Get(), &entry); more; more = Process32NextW(snapshot.Get(), &entry))
        if (_wcsicmp(entry.szExeFile, L"CalvexDeviceSim.exe") == 0) ids.push_back(entry.th32ProcessID);
    return ids;
}

// Runs the simulator with one switch (/RegServer, /UnregServer) and waits for it.
DWORD RunSimulator(const wchar_t* option) {
    return RunProcess(L"\"" + BuildDir() + L"\\CalvexDeviceSim.exe\" " + option);
}

ComPtr<IShellFolder> NewRootFolder(LoadedModule& module, const CLSID& clsid) {
    ComPtr<IClassFactory> factory;
    ComPtr<IShellFolder> folder;
    if (FAILED(module.getClassObject(clsid, IID_IClassFactory, factory.PutVoid()))) return folder;
    if (FAILED(factory->CreateInstance(nullptr, IID_IShellFolder, folder.PutVoid()))) return folder;
    ComPtr<IPersistFolder> persist;
    folder.QueryTo(IID_IPersistFolder, persist.PutVoid());
    if (persist) persist->Initialize(nullptr);
    return folder;
}

// One folder bound and released; listed and walked into a receiver, as a user opening a
// receiver does, when asked (no flags: bound, nothing read).
void BindAndRelease(LoadedModule& module, const CLSID& clsid, bool intoReceiver) {
    ComPtr<IShellFolder> root = NewRootFolder(module, clsid);
    ASSERT_TRUE(root);
    HRESULT listed = E_FAIL;
    std::vector<TaskPidl> receivers = ListItems(root.Get(), intoReceiver ? SHCONTF_FOLDERS : 0, &listed);
    ASSERT_EQ(S_OK, listed);
    if (!intoReceiver || receivers.empty()) return;
    ComPtr<IShellFolder> receiver;
    ASSERT_EQ(S_OK, root->BindToObject(receivers[0].get(), nullptr, IID_IShellFolder, receiver.PutVoid()));
    ListItems(receiver.Get(), SHCONTF_NONFOLDERS);
}
}  // namespace

TEST(ShellFolderLifetime, BoundFoldersLeaveNothingBehind) {
    DeviceSimScope scope;  // the sample tree
    LoadedModule module;
    ASSERT_TRUE(module.getClassObject && module.canUnloadNow);
    // Warm up: the type library, COM's own threads and the server.
    for (int i = 0; i < 5; ++i) BindAndRelease(module, CLSID_CalvexReceiversShellFolder, true);
    {
        ComPtr<IShellFolder> alive = NewRootFolder(module, CLSID_BrennorReceiversShellFolder);
        ASSERT_EQ(1u, Threads(module.Handle())) << "a live folder has its thread";
    }
    PumpMessagesFor(500);
    const size_t threads = Threads();
    const DWORD handles = HandleCount();
    ASSERT_GT(handles, 0u);

    // 200 rounds: a handle lost per bind of either brand overruns the slack many times over.
    for (int i = 0; i < 200; ++i) {
        BindAndRelease(module, i % 2 ? CLSID_BrennorReceiversShellFolder : CLSID_CalvexReceiversShellFolder, i % 20 == 0);
        if (i % 20 == 0) PumpMessagesFor(10);
    }
    EXPECT_EQ(0u, Threads(module.Handle())) << "every folder's notification thread has ended";
    EXPECT_EQ(S_OK, module.canUnloadNow()) << "no object or lock is left";
    // COM may keep a worker thread of its own a little longer.
    EXPECT_TRUE(PumpUntil([&] { return Threads() <= threads; }, 10000)) << Threads() << " > " << threads;
    EXPECT_LE(HandleCount(), handles + 8) << "timers, events and threads are closed";
}

TEST(ShellFolderLifetime, KilledDeviceManagerMakesFoldersFailOrListNothing) {
    DeviceSimScope scope;
    LoadedModule module;
    ComPtr<IShellFolder> root = NewRootFolder(module, CLSID_CalvexReceiversShellFolder);
    ASSERT_TRUE(root);
    std::vector<TaskPidl> receivers = ListItems(root.Get(), SHCONTF_FOLDERS);
    ASSERT_FALSE(receivers.empty());
    ComPtr<IShellFolder> receiver;
    ASSERT_EQ(S_OK, root->BindToObject(receivers[0].get(), nullptr, IID_IShellFolder, receiver.PutVoid()));

    std::vector<DWORD> servers = SimulatorProcesses();
    ASSERT_FALSE(servers.empty());
    for (DWORD id : servers) {
        UniqueHandle process(OpenProcess(PROCESS_TERMINATE | SYNCHRONIZE, FALSE, id));
        TerminateProcess(process.Get(), 3);
        WaitForSingleObject(process.Get(), 10000);
    }

    const ULONGLONG start = GetTickCount64();
    for (IShellFolder* folder : {root.Get(), receiver.Get()}) {
        HRESULT listed = S_OK;
        const size_t count = ListItems(folder, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &listed).size();
        EXPECT_TRUE(FAILED(listed) || count == 0);
    }
    ComPtr<IShellFolder> again;
    const HRESULT bind = root->BindToObject(receivers[0].get(), nullptr, IID_IShellFolder, again.PutVoid());
    EXPECT_TRUE(FAILED(bind)) << "the receiver cannot be found any more";
    receiver.Reset();
    root.Reset();
    EXPECT_LT(GetTickCount64() - start, 60000u) << "no call waited for the dead server";
    EXPECT_EQ(S_OK, module.canUnloadNow());
}

TEST(ShellFolderLifetime, UnregisteredDeviceManagerGivesAnEmptyFolderAndOnlySuccesses) {
    DeviceSimScope scope;
    struct Reregister {
        ~Reregister() { EXPECT_EQ(0u, RunSimulator(L"/RegServer")); }
    } reregister;
    ASSERT_EQ(0u, RunSimulator(L"/UnregServer"));
    {
        LoadedModule module;
        const CLSID* classes[] = {&CLSID_CalvexReceiversShellFolder, &CLSID_BrennorReceiversShellFolder};
        for (const CLSID* clsid : classes) {
            ComPtr<IShellFolder> root = NewRootFolder(module, *clsid);
            ASSERT_TRUE(root);
            HRESULT listed = E_FAIL;
            EXPECT_TRUE(ListItems(root.Get(), SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &listed).empty());
            EXPECT_EQ(S_OK, listed);
            ComPtr<IContextMenu> menu;
            EXPECT_EQ(S_OK, root->CreateViewObject(nullptr, IID_IContextMenu, menu.PutVoid()));
            // A receiver the shell remembers: its folder binds to nothing and lists nothing.
            LPITEMIDLIST remembered = nullptr;
            std::wstring key = L"5302-00871!Q9 GNSS!USB";
            ASSERT_EQ(S_OK, root->ParseDisplayName(nullptr, nullptr, &key[0], nullptr, &remembered, nullptr));
            ComPtr<IShellFolder> receiver;
            EXPECT_EQ(S_OK, root->BindToObject(remembered, nullptr, IID_IShellFolder, receiver.PutVoid()));
            CoTaskMemFree(remembered);
            ASSERT_TRUE(receiver);
            EXPECT_TRUE(ListItems(receiver.Get(), SHCONTF_NONFOLDERS, &listed).empty());
            EXPECT_EQ(S_OK, listed);
        }
    }
}
