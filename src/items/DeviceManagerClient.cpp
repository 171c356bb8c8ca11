#include "items/DeviceManagerClient.h"

#include <cwchar>

#include "com/Bstr.h"
#include "items/CReceiversPidlMgr.h"
#include "items/ItemPath.h"
#include "module/ModuleState.h"
#include "resources/resource.h"

namespace {
const wchar_t kFileExtension[] = L".qpr";
const DWORD kPortTypeNamed = 1;
const DWORD kPortTypeUsb = 2;

// The object a call handed out, as the interface asked for; E_POINTER when there was none.
template <class T>
HRESULT QueryHandedOut(HRESULT hr, const ComPtr<IDispatch>& object, REFIID iid, ComPtr<T>& out) {
    if (FAILED(hr)) return hr;
    if (!object) return E_POINTER;
    hr = object.QueryTo(iid, out.PutVoid());
    return SUCCEEDED(hr) && !out ? E_POINTER : hr;
}

template <class T>
HRESULT QueryCollection(IUnknown* object, REFIID iid, ComPtr<T>& out) {
    if (!object) return E_NOINTERFACE;
    HRESULT hr = object->QueryInterface(iid, out.PutVoid());
    return SUCCEEDED(hr) && !out ? E_POINTER : hr;
}

std::wstring PortText(IReceiver* receiver) {
    long portType = 0;
    receiver->get_PortType(&portType);
    if (static_cast<DWORD>(portType) != kPortTypeNamed)
        return LoadModuleString(static_cast<DWORD>(portType) == kPortTypeUsb ? IDS_PORT_USB : IDS_PORT_UNKNOWN);
    Bstr portName;
    receiver->get_PortName(portName.Put());
    return portName.Str();
}
}  // namespace

HRESULT CreateDeviceManager(ComPtr<IDeviceMgr>& manager) {
    return CoCreateInstance(CLSID_DeviceMgr, nullptr, CLSCTX_LOCAL_SERVER, IID_IDeviceMgr, manager.PutVoid());
}

HRESULT GetReceivers(IDeviceMgr* manager, ComPtr<IDispatch>& object, ComPtr<IReceiversColl>& receivers) {
    HRESULT hr = manager->get_Receivers(object.ReleaseAndGetAddressOf());
    return QueryHandedOut(hr, object, IID_IReceiversColl, receivers);
}

HRESULT QueryReceiversColl(IUnknown* object, ComPtr<IReceiversColl>& receivers) {
    return QueryCollection(object, IID_IReceiversColl, receivers);
}

HRESULT QueryFilesColl(IUnknown* object, ComPtr<IFilesColl>& files) {
    return QueryCollection(object, IID_IFilesColl, files);
}

HRESULT GetReceiverByKey(IReceiversColl* receivers, BSTR lookupKey, ComPtr<IDispatch>& receiver) {
    HRESULT hr = receivers->get_ItemByKey(lookupKey, receiver.ReleaseAndGetAddressOf());
    return SUCCEEDED(hr) && !receiver ? E_POINTER : hr;
}

HRESULT GetReceiverFiles(IDispatch* object, ComPtr<IReceiver>& receiver, ComPtr<IDispatch>& files) {
    HRESULT hr = QueryCollection(object, IID_IReceiver, receiver);
    return SUCCEEDED(hr) ? receiver->get_Files(files.ReleaseAndGetAddressOf()) : hr;
}

HRESULT GetReceiverAt(IReceiversColl* receivers, long index, ComPtr<IReceiver>& receiver) {
    ComPtr<IDispatch> item;
    HRESULT hr = receivers->get_Item(index, &item);
    return QueryHandedOut(hr, item, IID_IReceiver, receiver);
}

HRESULT GetFileAt(IFilesColl* files, long index, ComPtr<IReceiverFile>& file) {
    ComPtr<IDispatch> item;
    HRESULT hr = files->get_Item(index, &item);
    return QueryHandedOut(hr, item, IID_IReceiverFile, file);
}

bool ReadListedReceiverKey(IReceiver* receiver, DWORD brand, std::wstring* key) {
    long receiverBrand = 0;
    // Exactly S_OK: a receiver that answers S_FALSE has not told its brand.
    if (receiver->get_Brand(&receiverBrand) != S_OK || static_cast<DWORD>(receiverBrand) != brand) return false;
    Bstr label;
    if (receiver->get_Label(label.Put()) != S_OK || label.Length() == 0) return false;
    Bstr serial, model;
    receiver->get_SerialNumber(serial.Put());
    receiver->get_Model(model.Put());
    *key = MakeReceiverKey(serial.Str(), model.Str(), PortText(receiver));
    return true;
}

ReceiverFileInfo ReadFileInfo(IReceiverFile* file) {
    ReceiverFileInfo info;
    Bstr name;
    // Results not looked at: a value that cannot be read stays empty or 0.
    file->get_Name(name.Put());
    file->get_Time(&info.time);
    file->get_Size(&info.size);
    info.name = name.Str();
    return info;
}

// Of brand 2 only the HVL3 family stores files that the shell must show with the extension.
bool FilesShowExtension(DWORD brand, const std::wstring& receiverKey) {
    if (brand == BrandCalvex) return true;
    const std::vector<std::wstring> fields = SplitReceiverKey(receiverKey.c_str());
    if (fields.size() < 2) return false;
    return wcsncmp(ModelFromKeyField(fields[1]).c_str(), L"HVL3", 4) == 0;
}

std::wstring FileDisplayName(const std::wstring& deviceName, bool withExtension) {
    return withExtension ? deviceName + kFileExtension : deviceName;
}

// Only an extension of the last component counts, in any case; other extensions stay.
std::wstring FileDeviceName(const std::wstring& displayName) {
    const size_t lastSeparator = displayName.find_last_of(L"\\/");
    const size_t dot = displayName.rfind(L'.');
    if (dot == std::wstring::npos || (lastSeparator != std::wstring::npos && dot < lastSeparator)) return displayName;
    if (CompareStringOrdinal(displayName.c_str() + dot, -1, kFileExtension, -1, TRUE) != CSTR_EQUAL) return displayName;
    return displayName.substr(0, dot);
}

HRESULT GetFileByName(IFilesColl* files, const std::wstring& deviceName, ComPtr<IDispatch>& file) {
    Bstr name(deviceName);
    return files->get_ItemByName(name.Get(), file.ReleaseAndGetAddressOf());
}

HRESULT QueryReceiverFile(IUnknown* object, ComPtr<IReceiverFile>& file) {
    return QueryCollection(object, IID_IReceiverFile, file);
}

HRESULT FindShownFile(IUnknown* filesCollection, const std::wstring& displayName, FoundReceiverFile& found) {
    HRESULT hr = QueryFilesColl(filesCollection, found.files);
    if (SUCCEEDED(hr)) hr = GetFileByName(found.files.Get(), FileDeviceName(displayName), found.object);
    if (SUCCEEDED(hr)) hr = found.object ? QueryReceiverFile(found.object.Get(), found.file) : E_POINTER;
    return hr;
}

HRESULT StartDownload(IReceiverFile* file, IStream* stream) {
    VARIANT destination;
    VariantInit(&destination);
    destination.vt = VT_UNKNOWN;
    destination.punkVal = stream;
    if (stream) stream->AddRef();
    const HRESULT hr = file->Download(destination);
    VariantClear(&destination);
    return hr;
}
