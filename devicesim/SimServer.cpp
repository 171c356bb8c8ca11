#include "SimServer.h"

#include <tlhelp32.h>

#include <utility>
#include <vector>

#include "CalvexDeviceMgrLib.h"
#include "DeviceSimConfig.h"
#include "SimClassFactory.h"
#include "SimLog.h"
#include "SimModel.h"
#include "SimSettings.h"
#include "SimTypeLibrary.h"
#include "com/Handles.h"
#include "com/ModuleLock.h"

namespace {

const UINT kIdleCheckPeriod = 250;
const ULONGLONG kIdleExitAfter = 2000;
const DWORD kQuitWait = 10000;

std::wstring BackSlashes(std::wstring path) {
    for (wchar_t& c : path)
        if (c == L'/') c = L'\\';
    while (path.size() > 3 && path.back() == L'\\') path.pop_back();
    return path;
}

}  // namespace

const wchar_t SimServer::kQuitEventName[] = L"CalvexDeviceSim.Quit";

SimServer::SimServer(std::wstring rootOverride) : m_rootOverride(std::move(rootOverride)) {}

std::wstring SimServer::ExePath() {
    wchar_t path[MAX_PATH * 2] = L"";
    GetModuleFileNameW(nullptr, path, MAX_PATH * 2);
    return path;
}

std::wstring SimServer::DefaultRoot() { return BackSlashes(CALVEX_DEVICESIM_DEFAULT_ROOT); }

std::wstring SimServer::Root() const {
    if (!m_rootOverride.empty()) return BackSlashes(m_rootOverride);
    std::wstring root = SimSettings::RegistryRoot();
    return root.empty() ? DefaultRoot() : BackSlashes(root);
}

int SimServer::StopRunningServers() {
    const std::wstring self = ExePath();
    const wchar_t* exeName = wcsrchr(self.c_str(), L'\\') ? wcsrchr(self.c_str(), L'\\') + 1 : self.c_str();
    std::vector<UniqueHandle> servers;
    UniqueHandle snapshot(CreateToolhelp32Snapshot(TH32CS_SNAPPROCESS, 0));
    PROCESSENTRY32W entry = {sizeof entry};
    for (BOOL more = snapshot && Process32FirstW(snapshot.Get(), &entry); more;
         more = Process32NextW(snapshot.Get(), &entry)) {
        if (entry.th32ProcessID == GetCurrentProcessId() ||
            CompareStringOrdinal(entry.szExeFile, -1, exeName, -1, TRUE) != CSTR_EQUAL)
            continue;
        UniqueHandle process(OpenProcess(PROCESS_TERMINATE | SYNCHRONIZE, FALSE, entry.th32ProcessID));
        if (process) servers.push_back(std::move(process));
    }
    UniqueHandle quit(CreateEventW(nullptr, TRUE, FALSE, kQuitEventName));
    if (quit) SetEvent(quit.Get());
    for (const UniqueHandle& process : servers) {
        if (WaitForSingleObject(process.Get(), kQuitWait) == WAIT_OBJECT_0) continue;
        SimLog::Write(L"a server did not quit: killed");
        TerminateProcess(process.Get(), 1);
        WaitForSingleObject(process.Get(), kQuitWait);
    }
    if (quit) ResetEvent(quit.Get());
    return static_cast<int>(servers.size());
}

int SimServer::Run() {
    SimModel::SetAbruptExit([this] { ExitAbruptly(); });
    SimTypeLibrary::UseFile(ExePath());
    UniqueHandle quit(CreateEventW(nullptr, TRUE, FALSE, kQuitEventName));
    if (quit) ResetEvent(quit.Get());  // a request left over from before this server is not for it
    SimClassFactory factory([this] { return Root(); });
    HRESULT hr = CoRegisterClassObject(CLSID_DeviceMgr, &factory, CLSCTX_LOCAL_SERVER, REGCLS_MULTIPLEUSE,
                                       &m_classCookie);
    if (FAILED(hr)) {
        SimLog::Write(L"CoRegisterClassObject failed");
        return 1;
    }
    SimLog::Write(L"server started, root \"" + Root() + L"\"");
    MessageLoop(quit.Get());
    CoRevokeClassObject(m_classCookie);
    return 0;
}

void SimServer::ExitAbruptly() {
    // Wine's rpcss keeps the class registration of a process that dies and hands the dead
    // class object to every later client; revoked first, the next client starts a new server.
    CoRevokeClassObject(m_classCookie);
    TerminateProcess(GetCurrentProcess(), 3);
}

void SimServer::MessageLoop(HANDLE quit) {
    const UINT_PTR timer = SetTimer(nullptr, 0, kIdleCheckPeriod, nullptr);
    ULONGLONG busySince = GetTickCount64();
    for (;;) {
        DWORD wait = MsgWaitForMultipleObjects(quit ? 1 : 0, &quit, FALSE, INFINITE, QS_ALLINPUT);
        if (quit && wait == WAIT_OBJECT_0) {
            SimLog::Write(L"server asked to quit");
            break;
        }
        MSG msg;
        while (PeekMessageW(&msg, nullptr, 0, 0, PM_REMOVE)) {
            if (msg.message == WM_QUIT) return;
            if (msg.message == WM_TIMER && msg.hwnd == nullptr && msg.wParam == timer) {
                const ULONGLONG now = GetTickCount64();
                if (ModuleLock::Count() != 0) {
                    busySince = now;
                } else if (now - busySince >= kIdleExitAfter) {
                    SimLog::Write(L"server idle: exiting");
                    KillTimer(nullptr, timer);
                    return;
                }
                continue;
            }
            TranslateMessage(&msg);
            DispatchMessageW(&msg);
        }
    }
    KillTimer(nullptr, timer);
}
