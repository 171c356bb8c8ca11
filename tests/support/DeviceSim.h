#pragma once
// Receiver trees, the one out-of-process simulator every test program of the prefix shares,
// and a client's walk through its contract. A test that repoints or faults the simulator must
// run alone (a sibling <stem>.cmake with set(TEST_SERIAL SERIAL)).
#include <windows.h>

#include <string>
#include <vector>

#include "CalvexDeviceMgrLib.h"
#include "com/ComPtr.h"
#include "com/DispEventSink.h"
#include "support/TestSupport.h"

namespace testsupport {

// One receiver's description file; extra lines as they stand (L"[Transfer]", L"Rate=11520").
struct ReceiverSetup {
    std::wstring folder;
    long brand = 1;
    std::wstring label = L"Test receiver";
    std::wstring serialNumber = L"1000-0001";
    std::wstring model = L"Q9 GNSS";
    long portType = 2;
    std::wstring portName;
    std::vector<std::wstring> extraLines;
};

// A receiver tree under %TEMP%, removed with its contents at the end.
class ReceiverTree {
public:
    ReceiverTree() : m_dir(L"receivers") {}
    const std::wstring& Root() const { return m_dir.Path(); }
    std::wstring FolderPath(const std::wstring& folder) const { return Root() + L"\\" + folder; }
    // Makes the folder and its description file (as given: UTF-8, maybe malformed); the folder's path.
    std::wstring AddReceiver(const ReceiverSetup& setup);
    void WriteDescription(const std::wstring& folder, const std::string& text);
    // A file in a receiver's memory, of these bytes or of size bytes that differ from file to file.
    std::wstring AddFile(const std::wstring& folder, const std::wstring& name, const std::string& bytes);
    std::wstring AddFile(const std::wstring& folder, const std::wstring& name, size_t size);
    bool RemoveFile(const std::wstring& folder, const std::wstring& name) {
        return DeleteFileW((FolderPath(folder) + L"\\" + name).c_str()) != FALSE;
    }
    bool RemoveReceiver(const std::wstring& folder) { return DeleteTree(FolderPath(folder)); }

private:
    TempDirectory m_dir;
};

inline bool FileExists(const std::wstring& path) { return GetFileAttributesW(path.c_str()) != INVALID_FILE_ATTRIBUTES; }

// Makes every CalvexDeviceSim.exe of the prefix quit and waits, pumping this thread's messages.
void StopDeviceSimServers();
// A call's result for every receiver ("IReceiver.get_Label"), in the simulator's registry key.
void SetDeviceSimCallFailure(const std::wstring& call, HRESULT result);

// The simulator of the sample tree (or root) without faults, and no server from before or after.
class DeviceSimScope {
public:
    explicit DeviceSimScope(const std::wstring& root = std::wstring());
    ~DeviceSimScope();
    DeviceSimScope(const DeviceSimScope&) = delete;
    DeviceSimScope& operator=(const DeviceSimScope&) = delete;
};

// The contract walked through the interfaces' slots, as the extension does; a failed step
// gives null (and its result where asked for).
ComPtr<IDeviceMgr> CreateDeviceManager();  // the local server
ComPtr<IReceiversColl> ReceiversOf(IDeviceMgr* manager);
ComPtr<IReceiver> ReceiverAt(IReceiversColl* receivers, LONG index, HRESULT* result = nullptr);
ComPtr<IReceiver> ReceiverByKey(IReceiversColl* receivers, const std::wstring& key, HRESULT* result = nullptr);
ComPtr<IFilesColl> FilesOf(IReceiver* receiver);
ComPtr<IReceiverFile> FileAt(IFilesColl* files, LONG index, HRESULT* result = nullptr);
ComPtr<IReceiverFile> FileByName(IFilesColl* files, const std::wstring& name, HRESULT* result = nullptr);
// A file's name or a receiver's serial number; empty for anything else.
std::wstring NameOf(IDispatch* object);

ComPtr<IStream> NewMemoryStream();
HRESULT StartDownload(IReceiverFile* file, IStream* stream);
// What the stream holds from its position on (a finished download has moved it to the start).
std::string StreamBytes(IStream* stream);

// A sink for any of the device manager's three event interfaces that records every call
// (advised and unadvised through DispEventSink). Subjects are kept, not read, inside the
// call: a handler never calls back into the server.
class SimEventRecorder : public DispEventSink {
public:
    // value: the second argument (percent, result); 0 when there is none.
    struct Event { DISPID id; ComPtr<IDispatch> subject; LONG value; };
    // A new recorder with one reference, owned by the caller.
    static ComPtr<SimEventRecorder> Create(REFIID iid) { return ComPtr<SimEventRecorder>(new SimEventRecorder(iid)); }

    size_t Count(DISPID id) const { return Values(id).size(); }
    std::vector<LONG> Values(DISPID id) const;  // of every event of this id, in order
    bool WaitFor(DISPID id, DWORD timeout) const { return PumpUntil([&] { return Count(id) > 0; }, timeout); }

    std::vector<Event> events;

protected:
    explicit SimEventRecorder(REFIID iid) : DispEventSink(iid, LIBID_CalvexDeviceMgrLib, 1, 0) {}
    void DispatchEvent(DISPID id, const VARIANT* args, UINT count) override;
};

}  // namespace testsupport
