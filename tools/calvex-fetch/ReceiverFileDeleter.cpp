#include "ReceiverFileDeleter.h"

#include "KillPoint.h"
#include "ReceiverList.h"
#include "VirtualFiles.h"
#include "com/Bstr.h"

namespace {
const wchar_t kShownExtension[] = L".qpr";  // what the namespace adds to the names of some brands

// "serial!model!port" gives the device manager's lookup key "port-serial".
std::wstring LookupKey(const std::wstring& key) {
    const size_t first = key.find(L'!'), last = key.rfind(L'!');
    if (first == std::wstring::npos || last == first) return key;
    return key.substr(last + 1) + L"-" + key.substr(0, first);
}

// As the namespace shows them: every Calvex receiver's files, of Brennor the HVL3 family's.
bool ShowsExtension(const Receiver& receiver) {
    return receiver.brand == kBrandNames[0] || receiver.Fields().model.compare(0, 4, L"HVL3") == 0;
}

bool EndsWithExtension(const std::wstring& name) {
    const size_t length = wcslen(kShownExtension);
    return name.size() > length && CompareStringOrdinal(name.c_str() + name.size() - length, -1, kShownExtension, -1,
                                                        TRUE) == CSTR_EQUAL;
}

template <class Wanted>
HRESULT Query(HRESULT hr, IDispatch* object, REFIID iid, ComPtr<Wanted>& wanted) {
    if (FAILED(hr)) return hr;
    return object ? object->QueryInterface(iid, wanted.PutVoid()) : E_POINTER;
}
}  // namespace

ReceiverFileDeleter::ReceiverFileDeleter(const Receiver& receiver)
    : m_lookupKey(LookupKey(receiver.key)), m_showsExtension(ShowsExtension(receiver)) {}

bool ReportMatchesDescriptor(long size, DATE time, const FILEDESCRIPTORW& descriptor) {
    SYSTEMTIME clock;
    FILETIME reported = {};
    if (size < 0 || !VariantTimeToSystemTime(time, &clock) || !SystemTimeToFileTime(&clock, &reported)) return false;
    return static_cast<ULONGLONG>(size) == DescriptorSize(descriptor) &&
           CompareFileTime(&reported, &descriptor.ftLastWriteTime) == 0;
}

HRESULT ReceiverFileDeleter::OpenFiles() {
    if (m_files) return S_OK;
    ComPtr<IDispatch> manager, object;
    ComPtr<IDeviceMgr> typed;
    ComPtr<IReceiversColl> receivers;
    ComPtr<IReceiver> receiver;
    HRESULT hr = ConnectDeviceManager(manager);
    hr = Query(hr, manager.Get(), IID_IDeviceMgr, typed);
    if (SUCCEEDED(hr)) hr = typed->get_Receivers(&object);
    hr = Query(hr, object.Get(), IID_IReceiversColl, receivers);
    Bstr key(m_lookupKey);
    if (SUCCEEDED(hr)) hr = receivers->get_ItemByKey(key.Get(), &object);
    hr = Query(hr, object.Get(), IID_IReceiver, receiver);
    if (SUCCEEDED(hr)) hr = receiver->get_Files(&object);
    return Query(hr, object.Get(), IID_IFilesColl, m_files);
}

// The device knows its files without the extension that the namespace may show; the file it
// finds must answer to that name.
HRESULT ReceiverFileDeleter::FindFile(const std::wstring& shownName, ComPtr<IReceiverFile>& file) {
    const std::wstring deviceName =
        m_showsExtension && EndsWithExtension(shownName) ? shownName.substr(0, shownName.size() - wcslen(kShownExtension)) : shownName;
    ComPtr<IDispatch> object;
    Bstr name(deviceName), answered;
    HRESULT hr = m_files->get_ItemByName(name.Get(), &object);
    hr = Query(hr, object.Get(), IID_IReceiverFile, file);
    if (SUCCEEDED(hr)) hr = file->get_Name(answered.Put());
    if (SUCCEEDED(hr) && answered.Str() != deviceName) hr = HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND);
    return hr;
}

ReceiverFileDeleter::Outcome ReceiverFileDeleter::Delete(const FILEDESCRIPTORW& descriptor, HRESULT& why) {
    ComPtr<IReceiverFile> file;
    long size = -1;
    DATE time = 0;
    why = OpenFiles();
    if (SUCCEEDED(why)) why = FindFile(descriptor.cFileName, file);
    if (SUCCEEDED(why)) why = file->get_Size(&size);
    if (SUCCEEDED(why)) why = file->get_Time(&time);
    if (FAILED(why)) return Outcome::Refused;
    if (!ReportMatchesDescriptor(size, time, descriptor)) return Outcome::Changed;
    KillPoint::Pass("deleting", descriptor.cFileName);
    why = file->Delete();
    if (why == S_OK) KillPoint::Pass("deleted", descriptor.cFileName);
    return why == S_OK ? Outcome::Deleted : Outcome::Refused;
}
