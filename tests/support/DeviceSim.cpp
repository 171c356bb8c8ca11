#include "support/DeviceSim.h"

#include "com/Bstr.h"
#include "com/Handles.h"

namespace testsupport {

namespace {

const wchar_t kSimKey[] = L"Software\\Calvex\\DeviceSim";

bool WriteBytes(const std::wstring& path, const std::string& bytes) {
    UniqueFile file(CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr));
    DWORD written = 0;
    return file && WriteFile(file.Get(), bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr) &&
           written == bytes.size();
}

std::string PatternBytes(size_t size, const std::wstring& seed) {
    unsigned state = 2166136261u;
    for (wchar_t c : seed) state = (state ^ c) * 16777619u;
    std::string bytes(size, '\0');
    for (char& b : bytes) {
        state = state * 1103515245u + 12345u;
        b = static_cast<char>(state >> 16);
    }
    return bytes;
}

}  // namespace

std::wstring SampleReceiversDir() { return SourceDir() + L"\\sample-receivers"; }

ReceiverTree::ReceiverTree() : m_dir(L"receivers") {}

std::wstring ReceiverTree::AddReceiver(const ReceiverSetup& setup) {
    std::wstring text = L"[Receiver]\r\nBrand=" + std::to_wstring(setup.brand) + L"\r\nLabel=" + setup.label +
                        L"\r\nSerialNumber=" + setup.serialNumber + L"\r\nModel=" + setup.model +
                        L"\r\nPortType=" + std::to_wstring(setup.portType) + L"\r\nPortName=" + setup.portName + L"\r\n";
    for (const std::wstring& line : setup.extraLines) text += line + L"\r\n";
    WriteDescription(setup.folder, Narrow(text));
    return FolderPath(setup.folder);
}

void ReceiverTree::WriteDescription(const std::wstring& folder, const std::string& text) {
    CreateDirectoryW(FolderPath(folder).c_str(), nullptr);
    WriteBytes(FolderPath(folder) + L"\\receiver.ini", text);
}

std::wstring ReceiverTree::AddFile(const std::wstring& folder, const std::wstring& name, const std::string& bytes) {
    const std::wstring path = FolderPath(folder) + L"\\" + name;
    WriteBytes(path, bytes);
    return path;
}

std::wstring ReceiverTree::AddFile(const std::wstring& folder, const std::wstring& name, size_t size) {
    return AddFile(folder, name, PatternBytes(size, folder + name));
}

bool ReceiverTree::RemoveFile(const std::wstring& folder, const std::wstring& name) {
    return DeleteFileW((FolderPath(folder) + L"\\" + name).c_str()) != FALSE;
}

bool ReceiverTree::RemoveReceiver(const std::wstring& folder) { return DeleteTree(FolderPath(folder)); }

bool FileExists(const std::wstring& path) { return GetFileAttributesW(path.c_str()) != INVALID_FILE_ATTRIBUTES; }

void StopDeviceSimServers() {
    // Pumped: a quitting server releases its proxies of this thread's sinks.
    RunProcess(L"\"" + BuildDir() + L"\\CalvexDeviceSim.exe\" /Quit", 30000);
}

void UseDeviceSimRoot(const std::wstring& root) {
    StopDeviceSimServers();
    RegSetKeyValueW(HKEY_CURRENT_USER, kSimKey, L"Root", REG_SZ, root.c_str(),
                    static_cast<DWORD>((root.size() + 1) * sizeof(wchar_t)));
}

void SetDeviceSimValue(const wchar_t* name, DWORD value) {
    RegSetKeyValueW(HKEY_CURRENT_USER, kSimKey, name, REG_DWORD, &value, sizeof value);
}

void SetDeviceSimCallFailure(const std::wstring& call, HRESULT result) {
    DWORD value = static_cast<DWORD>(result);
    RegSetKeyValueW(HKEY_CURRENT_USER, (std::wstring(kSimKey) + L"\\Fail").c_str(), call.c_str(), REG_DWORD, &value,
                    sizeof value);
}

void RestoreDeviceSimDefaults() {
    StopDeviceSimServers();
    RegDeleteTreeW(HKEY_CURRENT_USER, kSimKey);
}

DeviceSimScope::DeviceSimScope(const std::wstring& root) {
    RestoreDeviceSimDefaults();
    if (!root.empty()) UseDeviceSimRoot(root);
}

DeviceSimScope::~DeviceSimScope() { RestoreDeviceSimDefaults(); }

namespace {

// Runs one call that hands out an object and queries it for T.
template <class T, class Call>
ComPtr<T> Fetch(Call call, REFIID iid, HRESULT* result = nullptr) {
    ComPtr<IDispatch> object;
    HRESULT hr = call(object.ReleaseAndGetAddressOf());
    if (result) *result = hr;
    ComPtr<T> out;
    if (object) object->QueryInterface(iid, out.PutVoid());
    return out;
}

}  // namespace

ComPtr<IDeviceMgr> CreateDeviceManager(HRESULT* result) {
    ComPtr<IDeviceMgr> manager;
    HRESULT hr = CoCreateInstance(CLSID_DeviceMgr, nullptr, CLSCTX_LOCAL_SERVER, IID_IDeviceMgr, manager.PutVoid());
    if (result) *result = hr;
    return manager;
}

ComPtr<IReceiversColl> ReceiversOf(IDeviceMgr* manager) {
    if (!manager) return nullptr;
    return Fetch<IReceiversColl>([&](IDispatch** out) { return manager->get_Receivers(out); }, IID_IReceiversColl);
}

ComPtr<IReceiver> ReceiverAt(IReceiversColl* receivers, LONG index, HRESULT* result) {
    return Fetch<IReceiver>([&](IDispatch** out) { return receivers->get_Item(index, out); }, IID_IReceiver, result);
}

ComPtr<IReceiver> ReceiverByKey(IReceiversColl* receivers, const std::wstring& key, HRESULT* result) {
    Bstr text(key);
    return Fetch<IReceiver>([&](IDispatch** out) { return receivers->get_ItemByKey(text.Get(), out); },
                            IID_IReceiver, result);
}

ComPtr<IFilesColl> FilesOf(IReceiver* receiver) {
    if (!receiver) return nullptr;
    return Fetch<IFilesColl>([&](IDispatch** out) { return receiver->get_Files(out); }, IID_IFilesColl);
}

ComPtr<IReceiverFile> FileAt(IFilesColl* files, LONG index, HRESULT* result) {
    return Fetch<IReceiverFile>([&](IDispatch** out) { return files->get_Item(index, out); }, IID_IReceiverFile,
                                result);
}

ComPtr<IReceiverFile> FileByName(IFilesColl* files, const std::wstring& name, HRESULT* result) {
    Bstr text(name);
    return Fetch<IReceiverFile>([&](IDispatch** out) { return files->get_ItemByName(text.Get(), out); },
                                IID_IReceiverFile, result);
}

std::wstring FileName(IReceiverFile* file) {
    Bstr text;
    if (file) file->get_Name(text.Put());
    return text.Str();
}

ComPtr<IStream> NewMemoryStream() {
    ComPtr<IStream> stream;
    CreateStreamOnHGlobal(nullptr, TRUE, &stream);
    return stream;
}

HRESULT StartDownload(IReceiverFile* file, IStream* stream) {
    VARIANT destination;
    VariantInit(&destination);
    destination.vt = VT_UNKNOWN;
    destination.punkVal = stream;  // borrowed: Download takes its own reference
    return file->Download(destination);
}

std::string StreamBytes(IStream* stream) {
    HGLOBAL block = nullptr;
    STATSTG stat = {};
    if (FAILED(GetHGlobalFromStream(stream, &block)) || FAILED(stream->Stat(&stat, STATFLAG_NONAME)))
        return std::string();
    GlobalLockGuard<const char> data(block);
    return data ? std::string(data.Get(), static_cast<size_t>(stat.cbSize.QuadPart)) : std::string();
}

ULONGLONG StreamPosition(IStream* stream) {
    LARGE_INTEGER zero = {};
    ULARGE_INTEGER position = {};
    stream->Seek(zero, STREAM_SEEK_CUR, &position);
    return position.QuadPart;
}

bool IsServerGone(HRESULT hr) {
    return hr == RPC_E_SERVERFAULT || hr == HRESULT_FROM_WIN32(RPC_S_SERVER_UNAVAILABLE) ||
           hr == HRESULT_FROM_WIN32(RPC_S_CALL_FAILED) || hr == CO_E_OBJNOTCONNECTED || hr == RPC_E_DISCONNECTED ||
           hr == RPC_E_SERVER_DIED || hr == RPC_E_SERVER_DIED_DNE;
}

SimEventRecorder::~SimEventRecorder() {
    Unadvise();
    Clear();
}

void SimEventRecorder::DispatchEvent(DISPID id, const VARIANT* args, UINT count) {
    Event event{id, nullptr, {}};
    VariantInit(&event.second);
    if (count >= 1 && args[0].vt == VT_DISPATCH) event.subject = ComPtr<IDispatch>(args[0].pdispVal);
    if (count >= 2) VariantCopy(&event.second, const_cast<VARIANT*>(&args[1]));
    m_received.push_back(event);
}

HRESULT SimEventRecorder::Advise(IUnknown* source) {
    const HRESULT hr = DispEventSink::Advise(source);
    if (SUCCEEDED(hr)) m_source = ComPtr<IUnknown>(source);
    return hr;
}

HRESULT SimEventRecorder::Unadvise() {
    if (!m_source) return S_FALSE;
    const HRESULT hr = DispEventSink::Unadvise(m_source.Get());
    m_source.Reset();
    return hr;
}

size_t SimEventRecorder::Count(DISPID id) const {
    size_t count = 0;
    for (const Event& event : m_received) count += event.id == id;
    return count;
}

bool SimEventRecorder::WaitFor(DISPID id, DWORD timeoutMilliseconds, size_t count) const {
    return PumpUntil([&] { return Count(id) >= count; }, timeoutMilliseconds);
}

void SimEventRecorder::Clear() {
    for (Event& event : m_received) VariantClear(&event.second);
    m_received.clear();
}

RecordedDownload::RecordedDownload(ComPtr<IReceiverFile> file)
    : m_file(std::move(file)), m_stream(NewMemoryStream()), m_events(SimEventRecorder::Create(DIID__IReceiverFileEvents)) {
    if (m_file && SUCCEEDED(m_started = m_events->Advise(m_file.Get())))
        m_started = StartDownload(m_file.Get(), m_stream.Get());
}

RecordedDownload::~RecordedDownload() { m_events->Unadvise(); }

bool RecordedDownload::WaitForFinish(DWORD timeoutMilliseconds) const { return m_events->WaitFor(3, timeoutMilliseconds); }

HRESULT RecordedDownload::FinishResult() const {
    for (const auto& event : m_events->Events())
        if (event.id == 3) return event.second.lVal;
    return S_FALSE;
}

std::vector<int> RecordedDownload::Percents() const {
    std::vector<int> percents;
    for (const auto& event : m_events->Events())
        if (event.id == 2) percents.push_back(event.second.bVal);
    return percents;
}

std::wstring SubjectName(IDispatch* subject) {
    if (!subject) return std::wstring();
    BSTR text = nullptr;
    ComPtr<IReceiverFile> file;
    ComPtr<IReceiver> receiver;
    if (SUCCEEDED(subject->QueryInterface(IID_IReceiverFile, file.PutVoid())))
        file->get_Name(&text);
    else if (SUCCEEDED(subject->QueryInterface(IID_IReceiver, receiver.PutVoid())))
        receiver->get_SerialNumber(&text);
    std::wstring name = text ? std::wstring(text, SysStringLen(text)) : std::wstring();
    SysFreeString(text);
    return name;
}

}  // namespace testsupport
