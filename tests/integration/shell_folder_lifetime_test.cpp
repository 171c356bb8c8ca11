// Guards folder lifetimes: threads, locks or handles left behind, hangs or crashes when the device manager is missing.
#include <shlobj.h>
#include <tlhelp32.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "com/Handles.h"
#include "module/ClassIds.h"
#include "support/DeviceSim.h"
#include "support/LoadedModule.h"

using namespace testsupport;

namespace {

// Threads of this process; with a module, only those whose start routine lies in it (the
// folders' own threads).
size_t Threads(HMODULE module = nullptr) {
    auto query = reinterpret_cast<LONG(WINAPI*)(HANDLE, int, void*, ULONG, ULONG*)>(
        GetProcAddress(GetModuleHandleW(L"ntdll.dll"), "NtQueryInformationThread"));
    const auto* image = reinterpret_cast<const BYTE*>(module);
    const auto* dos = reinterpret_cast<const IMAGE_DOS_HEADER*>(module);
    const BYTE* end = image + (module ? reinterpret_cast<const IMAGE_NT_HEADERS*>(image + dos->e_lfanew)->OptionalHeader.SizeOfImage : 0);
    size_t count = 0;
    UniqueHandle snapshot(CreateToolhelp32Snapshot(TH32CS_SNAPTHREAD, 0));
    THREADENTRY32 entry = {sizeof entry};
    for (BOOL more = Thread32First(snapshot.Get(), &entry); more; more = Thread32Next(snapshot.Get(), &entry)) {
        if (entry.th32OwnerProcessID != GetCurrentProcessId()) continue;
        UniqueHandle thread(OpenThread(THREAD_QUERY_INFORMATION, FALSE, entry.th32ThreadID));
        const BYTE* start = nullptr;  // information class 9: ThreadQuerySetWin32StartAddress
        count += !module || (thread && query(thread.Get(), 9, &start, sizeof start, nullptr) == 0 && start >= image && start < end);
    }
    return count;
}

// Open handles of this process, found by probing (Wine's GetProcessHandleCount gives 0).
DWORD HandleCount() {
    DWORD count = 0, flags = 0;
    for (UINT_PTR value = 4; value < 0x20000; value += 4) count += GetHandleInformation(reinterpret_cast<HANDLE>(value), &flags) != FALSE;
    return count;
}

// A root folder made and initialised as Explorer binds it; with folders asked for, listed and
// walked into its first receiver, whose files are listed, as a user opening a receiver does.
struct Opened {
    ComPtr<IShellFolder> root, receiver;
    std::vector<TaskPidl> receivers;
};
Opened Open(LoadedModule& module, const CLSID& clsid, SHCONTF flags = SHCONTF_FOLDERS) {
    Opened o;
    ComPtr<IClassFactory> factory;
    ComPtr<IPersistFolder> persist;
    EXPECT_EQ(S_OK, module.getClassObject(clsid, IID_IClassFactory, factory.PutVoid()));
    if (!factory || FAILED(factory->CreateInstance(nullptr, IID_IPersistFolder, persist.PutVoid()))) return o;
    EXPECT_EQ(S_OK, persist->Initialize(nullptr));
    persist.QueryTo(IID_IShellFolder, o.root.PutVoid());
    HRESULT listed = E_FAIL;
    o.receivers = ListItems(o.root.Get(), flags, &listed);
    EXPECT_EQ(S_OK, listed);
    if (o.receivers.empty()) return o;
    EXPECT_EQ(S_OK, o.root->BindToObject(o.receivers[0].get(), nullptr, IID_IShellFolder, o.receiver.PutVoid()));
    if (o.receiver) ListItems(o.receiver.Get(), SHCONTF_NONFOLDERS);
    return o;
}
}  // namespace

TEST(ShellFolderLifetime, BoundFoldersLeaveNothingBehind) {
    DeviceSimScope scope;  // the sample tree
    LoadedModule module;
    ASSERT_TRUE(module.Loaded());
    // Warm up: the type library, COM's own threads and the server.
    for (int i = 0; i < 5; ++i) ASSERT_TRUE(Open(module, CLSID_CalvexReceiversShellFolder).receiver);
    {
        Opened alive = Open(module, CLSID_BrennorReceiversShellFolder, 0);  // bound, nothing read
        ASSERT_EQ(1u, Threads(module.Handle())) << "a live folder has its thread";
    }
    PumpMessagesFor(500);
    const size_t threads = Threads();
    const DWORD handles = HandleCount();
    ASSERT_GT(handles, 0u);

    // 200 rounds: a handle lost per bind of either brand overruns the slack many times over.
    for (int i = 0; i < 200; ++i) {
        Open(module, i % 2 ? CLSID_BrennorReceiversShellFolder : CLSID_CalvexReceiversShellFolder, i % 20 ? 0 : SHCONTF_FOLDERS);
        if (i % 20 == 0) PumpMessagesFor(10);
    }
    EXPECT_EQ(0u, Threads(module.Handle())) << "every folder's notification thread has ended";
    EXPECT_EQ(S_OK, module.canUnloadNow()) << "no object or lock is left";
    // COM may keep a worker thread of its own a little longer.
    EXPECT_TRUE(PumpUntil([&] { return Threads() <= threads; }, 10000)) << Threads() << " > " << threads;
    EXPECT_LE(HandleCount(), handles + 8) << "timers, events and threads are closed";
}

TEST(ShellFolderLifetime, UnregisteredDeviceManagerLetsARememberedReceiverBindAndListNothing) {
    DeviceSimScope scope;
    const std::wstring simulator = L"\"" + BuildDir() + L"\\CalvexDeviceSim.exe\" ";
    struct Reregister {
        std::wstring command;
        ~Reregister() { EXPECT_EQ(0u, RunProcess(command + L"/RegServer")); }
    } reregister{simulator};
    ASSERT_EQ(0u, RunProcess(simulator + L"/UnregServer"));
    LoadedModule module;
    Opened opened = Open(module, CLSID_BrennorReceiversShellFolder, 0);
    ASSERT_TRUE(opened.root);
    HRESULT listed = E_FAIL;
    EXPECT_TRUE(ListItems(opened.root.Get(), SHCONTF_FOLDERS, &listed).empty()) << "an empty brand folder";
    EXPECT_EQ(S_OK, listed);
    LPITEMIDLIST remembered = nullptr;
    std::wstring key = L"5302-00871!Q9 GNSS!USB";
    ASSERT_EQ(S_OK, opened.root->ParseDisplayName(nullptr, nullptr, &key[0], nullptr, &remembered, nullptr));
    TaskPidl owned(remembered);
    ComPtr<IShellFolder> receiver;
    EXPECT_EQ(S_OK, opened.root->BindToObject(remembered, nullptr, IID_IShellFolder, receiver.PutVoid()));
    ASSERT_TRUE(receiver);
    listed = E_FAIL;
    EXPECT_TRUE(ListItems(receiver.Get(), SHCONTF_NONFOLDERS, &listed).empty());
    EXPECT_EQ(S_OK, listed);
}
