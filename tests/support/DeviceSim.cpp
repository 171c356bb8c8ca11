#include "support/DeviceSim.h"

#include "com/Bstr.h"
#include "com/Handles.h"

namespace testsupport {

namespace {

const wchar_t kSimKey[] = L"Software\\Calvex\\DeviceSim";

template <class T, class Call>
ComPtr<T> Fetch(Call call, REFIID iid, HRESULT* result = nullptr) {
    ComPtr<IDispatch> object;
    const HRESULT hr = call(object.ReleaseAndGetAddressOf());
    if (result) *result = hr;
    ComPtr<T> out;
    if (object) object->QueryInterface(iid, out.PutVoid());
    return out;
}

}  // namespace

std::wstring ReceiverTree::AddReceiver(const ReceiverSetup& s) {
    std::wstring text = L"[Receiver]\r\nBrand=" + std::to_wstring(s.brand) + L"\r\nLabel=" + s.label +
                        L"\r\nSerialNumber=" + s.serialNumber + L"\r\nModel=" + s.model + L"\r\nPortType=" +
                        std::to_wstring(s.portType) + L"\r\nPortName=" + s.portName + L"\r\n";
    for (const std::wstring& line : s.extraLines) text += line + L"\r\n";
    WriteDescription(s.folder, Narrow(text));
    return FolderPath(s.folder);
}

void ReceiverTree::WriteDescription(const std::wstring& folder, const std::string& text) {
    CreateDirectoryW(FolderPath(folder).c_str(), nullptr);
    AddFile(folder, L"receiver.ini", text);
}

std::wstring ReceiverTree::AddFile(const std::wstring& folder, const std::wstring& name, const std::string& bytes) {
    const std::wstring path = FolderPath(folder) + L"\\" + name;
    WriteFileBytes(path, bytes);
    return path;
}

std::wstring ReceiverTree::AddFile(const std::wstring& folder, const std::wstring& name, size_t size) {
    unsigned state = 2166136261u;  // seeded by the file's name
    for (wchar_t c : folder + name) state = (state ^ c) * 16777619u;
    std::string bytes(size, '\0');
    for (char& b : bytes) b = static_cast<char>((state = state * 1103515245u + 12345u) >> 16);
    return AddFile(folder, name, bytes);
}

void StopDeviceSimServers() { RunProcess(L"\"" + BuildDir() + L"\\CalvexDeviceSim.exe\" /Quit", 30000); }

void SetDeviceSimCallFailure(const std::wstring& call, HRESULT result) {
    const DWORD value = static_cast<DWORD>(result);
    RegSetKeyValueW(HKEY_CURRENT_USER, (std::wstring(kSimKey) + L"\\Fail").c_str(), call.c_str(), REG_DWORD, &value,
                    sizeof value);
}

static void RestoreDeviceSimDefaults() {
    StopDeviceSimServers();
    RegDeleteTreeW(HKEY_CURRENT_USER, kSimKey);
}

DeviceSimScope::DeviceSimScope(const std::wstring& root) {
    RestoreDeviceSimDefaults();
    if (!root.empty())
        RegSetKeyValueW(HKEY_CURRENT_USER, kSimKey, L"Root", REG_SZ, root.c_str(),
                        static_cast<DWORD>((root.size() + 1) * sizeof(wchar_t)));
}

DeviceSimScope::~DeviceSimScope() { RestoreDeviceSimDefaults(); }

ComPtr<IDeviceMgr> CreateDeviceManager() {
    ComPtr<IDeviceMgr> manager;
    CoCreateInstance(CLSID_DeviceMgr, nullptr, CLSCTX_LOCAL_SERVER, IID_IDeviceMgr, manager.PutVoid());
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
    return Fetch<IReceiver>([&](IDispatch** out) { return receivers->get_ItemByKey(text.Get(), out); }, IID_IReceiver, result);
}

ComPtr<IFilesColl> FilesOf(IReceiver* receiver) {
    if (!receiver) return nullptr;
    return Fetch<IFilesColl>([&](IDispatch** out) { return receiver->get_Files(out); }, IID_IFilesColl);
}

ComPtr<IReceiverFile> FileAt(IFilesColl* files, LONG index, HRESULT* result) {
    return Fetch<IReceiverFile>([&](IDispatch** out) { return files->get_Item(index, out); }, IID_IReceiverFile, result);
}

ComPtr<IReceiverFile> FileByName(IFilesColl* files, const std::wstring& name, HRESULT* result) {
    Bstr text(name);
    return Fetch<IReceiverFile>([&](IDispatch** out) { return files->get_ItemByName(text.Get(), out); }, IID_IReceiverFile, result);
}

std::wstring NameOf(IDispatch* object) {
    Bstr text;
    ComPtr<IReceiverFile> file;
    ComPtr<IReceiver> receiver;
    if (object && SUCCEEDED(object->QueryInterface(IID_IReceiverFile, file.PutVoid())))
        file->get_Name(text.Put());
    else if (object && SUCCEEDED(object->QueryInterface(IID_IReceiver, receiver.PutVoid())))
        receiver->get_SerialNumber(text.Put());
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
    std::string bytes;
    char chunk[4096];
    ULONG read = 0;
    while (SUCCEEDED(stream->Read(chunk, sizeof chunk, &read)) && read > 0) bytes.append(chunk, read);
    return bytes;
}

void SimEventRecorder::DispatchEvent(DISPID id, const VARIANT* args, UINT count) {
    Event event{id, nullptr, 0};
    if (count >= 1 && args[0].vt == VT_DISPATCH) event.subject = ComPtr<IDispatch>(args[0].pdispVal);
    if (count >= 2) event.value = args[1].vt == VT_UI1 ? args[1].bVal : args[1].lVal;
    events.push_back(event);
}

std::vector<LONG> SimEventRecorder::Values(DISPID id) const {
    std::vector<LONG> values;
    for (const Event& event : events)
        if (event.id == id) values.push_back(event.value);
    return values;
}

}  // namespace testsupport
