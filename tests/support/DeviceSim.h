#pragma once
// Test helpers around the simulated device manager: temporary receiver trees, and the one
// out-of-process simulator that every test program of the Wine prefix shares. A test that
// points the simulator elsewhere (or sets faults in the registry) changes it for everyone:
// its test program must run alone (a sibling <stem>.cmake with set(TEST_SERIAL SERIAL)).
#include <windows.h>

#include <functional>
#include <string>
#include <vector>

#include "CalvexDeviceMgrLib.h"
#include "com/DispEventSink.h"
#include "com/ComPtr.h"
#include "support/TestSupport.h"

namespace testsupport {

// The sample tree of the repository, the simulator's default.
std::wstring SampleReceiversDir();

// The fields of one receiver's description file.
struct ReceiverSetup {
    std::wstring folder;
    long brand = 1;
    std::wstring label = L"Test receiver";
    std::wstring serialNumber = L"1000-0001";
    std::wstring model = L"Q9 GNSS";
    long portType = 2;
    std::wstring portName;
    // Further lines written as they stand, e.g. L"[Transfer]", L"Rate=11520".
    std::vector<std::wstring> extraLines;
};

// A receiver tree under %TEMP%, removed with its contents at the end.
class ReceiverTree {
public:
    ReceiverTree();
    const std::wstring& Root() const { return m_dir.Path(); }
    std::wstring FolderPath(const std::wstring& folder) const { return Root() + L"\\" + folder; }

    // Makes the folder and writes its description file; returns the folder's path.
    std::wstring AddReceiver(const ReceiverSetup& setup);
    // Writes the description file as given (UTF-8), for malformed ones.
    void WriteDescription(const std::wstring& folder, const std::string& text);
    // A file in a receiver's memory; returns its path.
    std::wstring AddFile(const std::wstring& folder, const std::wstring& name, const std::string& bytes);
    // A file of size bytes that differ from file to file.
    std::wstring AddFile(const std::wstring& folder, const std::wstring& name, size_t size);
    bool RemoveFile(const std::wstring& folder, const std::wstring& name);
    bool RemoveReceiver(const std::wstring& folder);

private:
    TempDirectory m_dir;
};

bool FileExists(const std::wstring& path);

// Makes every running CalvexDeviceSim.exe of the prefix quit ("CalvexDeviceSim.exe /Quit")
// and waits until they are gone; this thread's messages are pumped meanwhile.
void StopDeviceSimServers();
// Points the out-of-process simulator at root; the next client starts a fresh server.
void UseDeviceSimRoot(const std::wstring& root);
// Global faults of the simulator (DWORD values of its registry key, and call failures).
void SetDeviceSimValue(const wchar_t* name, DWORD value);
void SetDeviceSimCallFailure(const std::wstring& call, HRESULT result);
// Back to the sample tree without faults; any running server is ended.
void RestoreDeviceSimDefaults();

// Scope of a test that owns the out-of-process simulator: defaults before and after.
class DeviceSimScope {
public:
    explicit DeviceSimScope(const std::wstring& root = std::wstring());
    ~DeviceSimScope();
    DeviceSimScope(const DeviceSimScope&) = delete;
    DeviceSimScope& operator=(const DeviceSimScope&) = delete;
};

// Walking the contract through the interfaces' slots, as the extension does; a failed step
// gives a null pointer (and its result where asked for).
ComPtr<IDeviceMgr> CreateDeviceManager(HRESULT* result = nullptr);  // the local server
ComPtr<IReceiversColl> ReceiversOf(IDeviceMgr* manager);
ComPtr<IReceiver> ReceiverAt(IReceiversColl* receivers, LONG index, HRESULT* result = nullptr);
ComPtr<IReceiver> ReceiverByKey(IReceiversColl* receivers, const std::wstring& key, HRESULT* result = nullptr);
ComPtr<IFilesColl> FilesOf(IReceiver* receiver);
ComPtr<IReceiverFile> FileAt(IFilesColl* files, LONG index, HRESULT* result = nullptr);
ComPtr<IReceiverFile> FileByName(IFilesColl* files, const std::wstring& name, HRESULT* result = nullptr);
std::wstring FileName(IReceiverFile* file);

// One row of a table of calls and the result each must give.
struct CallCase {
    const char* call;
    std::function<HRESULT()> make;
    HRESULT expected;
};

// Downloads into memory streams.
ComPtr<IStream> NewMemoryStream();
HRESULT StartDownload(IReceiverFile* file, IStream* stream);
std::string StreamBytes(IStream* stream);  // the whole content, wherever the position is
ULONGLONG StreamPosition(IStream* stream);
// A failure by which a client learns that the server has gone.
bool IsServerGone(HRESULT hr);

// A sink for any of the device manager's three event interfaces that records every call.
// Subjects are kept, not read, inside the call: a handler never calls back into the server.
class SimEventRecorder : public DispEventSink {
public:
    struct Event {
        DISPID id;
        ComPtr<IDispatch> subject;
        VARIANT second;  // VT_EMPTY when the event has one parameter
    };

    explicit SimEventRecorder(REFIID events) : DispEventSink(events, LIBID_CalvexDeviceMgrLib, 1, 0) {}
    // A new recorder with one reference, owned by the caller.
    static ComPtr<SimEventRecorder> Create(REFIID events) { return ComPtr<SimEventRecorder>(new SimEventRecorder(events)); }

    HRESULT Advise(IUnknown* source);
    HRESULT Unadvise();
    const std::vector<Event>& Events() const { return m_received; }
    size_t Count(DISPID id) const;
    // Waits (pumping messages) until an event id has arrived; false after the timeout.
    bool WaitFor(DISPID id, DWORD timeoutMilliseconds, size_t count = 1) const;
    void Clear();

protected:
    ~SimEventRecorder() override;
    void DispatchEvent(DISPID id, const VARIANT* args, UINT count) override;

private:
    ComPtr<IUnknown> m_source;
    std::vector<Event> m_received;
};

// One download into a memory stream, started at construction, with its events recorded.
class RecordedDownload {
public:
    explicit RecordedDownload(ComPtr<IReceiverFile> file);
    ~RecordedDownload();
    RecordedDownload(const RecordedDownload&) = delete;
    RecordedDownload& operator=(const RecordedDownload&) = delete;

    HRESULT Started() const { return m_started; }
    // Pumps messages until OnFileFinish; false after the timeout.
    bool WaitForFinish(DWORD timeoutMilliseconds = 15000) const;
    HRESULT FinishResult() const;  // S_FALSE while there is none
    std::vector<int> Percents() const;  // of the progress events, in order
    IReceiverFile* File() const { return m_file.Get(); }
    IStream* Stream() const { return m_stream.Get(); }
    const SimEventRecorder& Events() const { return *m_events.Get(); }

private:
    ComPtr<IReceiverFile> m_file;
    ComPtr<IStream> m_stream;
    ComPtr<SimEventRecorder> m_events;
    HRESULT m_started = E_FAIL;
};

// The name of what an event is about: a file's name or a receiver's serial number.
std::wstring SubjectName(IDispatch* subject);

}  // namespace testsupport
