#pragma once
// The simulator's local server, started by the benchmark with "/Root <tree>" so that it
// serves that tree whatever the registry says, and told to quit at the end. Servers that run
// already (the class object of only one can answer) are asked to quit first.
#include <windows.h>
#include <tlhelp32.h>

#include <string>

#include "com/Handles.h"

class SimServerProcess {
public:
    explicit SimServerProcess(const std::wstring& root) {
        StopRunningServers();
        const std::wstring exe = RegisteredExe();
        if (exe.empty()) return;
        const size_t logBefore = ReadLog().size();  // a server of an earlier run may have had the same id
        std::wstring command = L"\"" + exe + L"\" /Root \"" + root + L"\"";
        STARTUPINFOW startup = {sizeof startup};
        PROCESS_INFORMATION info = {};
        if (!CreateProcessW(exe.c_str(), &command[0], nullptr, nullptr, FALSE, 0, nullptr, nullptr, &startup, &info))
            return;
        CloseHandle(info.hThread);
        m_process.Reset(info.hProcess);
        m_ready = WaitForLogLine("[" + std::to_string(info.dwProcessId) + "] server started", logBefore, 20000);
    }
    ~SimServerProcess() {
        if (!m_process) return;
        SignalQuit(true);
        WaitForSingleObject(m_process.Get(), 20000);
        SignalQuit(false);
    }
    SimServerProcess(const SimServerProcess&) = delete;
    SimServerProcess& operator=(const SimServerProcess&) = delete;

    // Started, and its class object registered.
    bool Ready() const { return m_ready; }

private:
    static std::wstring RegisteredExe() {
        wchar_t value[MAX_PATH * 2] = L"";
        DWORD bytes = sizeof value;
        if (RegGetValueW(HKEY_CLASSES_ROOT, L"CLSID\\{0FADF314-B4FD-413C-9E26-6BC49B066080}\\LocalServer32", nullptr,
                         RRF_RT_REG_SZ, nullptr, value, &bytes) != ERROR_SUCCESS)
            return std::wstring();
        std::wstring exe = value;
        if (!exe.empty() && exe.front() == L'"') exe = exe.substr(1, exe.find(L'"', 1) - 1);
        return exe;
    }

    static void SignalQuit(bool quit) {
        UniqueHandle event(OpenEventW(EVENT_MODIFY_STATE, FALSE, L"CalvexDeviceSim.Quit"));
        if (event) quit ? SetEvent(event.Get()) : ResetEvent(event.Get());
    }

    static bool AnyServerRunning() {
        UniqueHandle snapshot(CreateToolhelp32Snapshot(TH32CS_SNAPPROCESS, 0));
        PROCESSENTRY32W entry = {sizeof entry};
        for (BOOL more = snapshot && Process32FirstW(snapshot.Get(), &entry); more;
             more = Process32NextW(snapshot.Get(), &entry))
            if (lstrcmpiW(entry.szExeFile, L"CalvexDeviceSim.exe") == 0) return true;
        return false;
    }

    static void StopRunningServers() {
        if (!AnyServerRunning()) return;
        SignalQuit(true);
        for (int i = 0; i < 200 && AnyServerRunning(); ++i) Sleep(100);
        SignalQuit(false);
    }

    static std::string ReadLog() {
        wchar_t dir[MAX_PATH] = L"";
        GetTempPathW(MAX_PATH, dir);
        const std::wstring path = std::wstring(dir) + L"CalvexDeviceSim.log";
        UniqueFile file(CreateFileW(path.c_str(), GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_WRITE, nullptr,
                                    OPEN_EXISTING, 0, nullptr));
        if (!file) return std::string();
        std::string text(GetFileSize(file.Get(), nullptr), '\0');
        DWORD read = 0;
        if (!text.empty()) ReadFile(file.Get(), &text[0], static_cast<DWORD>(text.size()), &read, nullptr);
        return text;
    }

    // The server writes this line once its class object is registered; looked for past from.
    static bool WaitForLogLine(const std::string& line, size_t from, DWORD milliseconds) {
        for (DWORD waited = 0; waited < milliseconds; waited += 50, Sleep(50)) {
            const std::string text = ReadLog();
            if (text.size() > from && text.find(line, from) != std::string::npos) return true;
        }
        return false;
    }

    UniqueHandle m_process;
    bool m_ready = false;
};
