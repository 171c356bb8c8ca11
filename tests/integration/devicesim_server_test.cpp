// The simulated device manager as the extension meets it: a local server made by COM under
// Wine, called through the contract's virtual table slots, with events from the server.
#include <windows.h>
#include <objbase.h>
#include <oleauto.h>

#include <map>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "CalvexDeviceMgrLib.h"
#include "com/Bstr.h"
#include "com/ComPtr.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {

const DWORD kEventWait = 3000;  // events are due within a second; the bound only stops a hang

ComPtr<IDeviceMgr> CreateServer(HRESULT* result = nullptr) {
    ComPtr<IDeviceMgr> manager;
    HRESULT hr = CoCreateInstance(CLSID_DeviceMgr, nullptr, CLSCTX_LOCAL_SERVER, IID_IDeviceMgr, manager.PutVoid());
    if (result) *result = hr;
    return manager;
}

template <class T>
ComPtr<T> As(IDispatch* object, REFIID iid) {
    ComPtr<T> out;
    if (object) object->QueryInterface(iid, out.PutVoid());
    return out;
}

ComPtr<IReceiversColl> Receivers(IDeviceMgr* manager) {
    ComPtr<IDispatch> object;
    EXPECT_EQ(S_OK, manager->get_Receivers(&object));
    return As<IReceiversColl>(object.Get(), IID_IReceiversColl);
}

ComPtr<IReceiver> ReceiverByKey(IReceiversColl* receivers, const wchar_t* key, HRESULT* result = nullptr) {
    ComPtr<IDispatch> object;
    Bstr text(key);
    HRESULT hr = receivers->get_ItemByKey(text.Get(), &object);
    if (result) *result = hr;
    return As<IReceiver>(object.Get(), IID_IReceiver);
}

ComPtr<IFilesColl> Files(IReceiver* receiver) {
    ComPtr<IDispatch> object;
    EXPECT_EQ(S_OK, receiver->get_Files(&object));
    return As<IFilesColl>(object.Get(), IID_IFilesColl);
}

ComPtr<IReceiverFile> FileByName(IFilesColl* files, const std::wstring& name, HRESULT* result = nullptr) {
    ComPtr<IDispatch> object;
    Bstr text(name);
    HRESULT hr = files->get_ItemByName(text.Get(), &object);
    if (result) *result = hr;
    return As<IReceiverFile>(object.Get(), IID_IReceiverFile);
}

std::wstring Text(HRESULT (STDMETHODCALLTYPE IReceiver::*get)(BSTR*), IReceiver* receiver) {
    Bstr text;
    EXPECT_EQ(S_OK, (receiver->*get)(text.Put()));
    return text.Str();
}

long Number(HRESULT (STDMETHODCALLTYPE IReceiver::*get)(LONG*), IReceiver* receiver) {
    LONG value = -12345;
    EXPECT_EQ(S_OK, (receiver->*get)(&value));
    return value;
}

ComPtr<IStream> NewStream() {
    ComPtr<IStream> stream;
    EXPECT_EQ(S_OK, CreateStreamOnHGlobal(nullptr, TRUE, &stream));
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
    GetHGlobalFromStream(stream, &block);
    STATSTG stat = {};
    stream->Stat(&stat, STATFLAG_NONAME);
    const char* data = static_cast<const char*>(GlobalLock(block));
    std::string bytes(data, data + stat.cbSize.QuadPart);
    GlobalUnlock(block);
    return bytes;
}

ULONGLONG StreamPosition(IStream* stream) {
    LARGE_INTEGER zero = {};
    ULARGE_INTEGER position = {};
    stream->Seek(zero, STREAM_SEEK_CUR, &position);
    return position.QuadPart;
}

std::vector<int> ProgressPercents(const SimEventRecorder& recorder) {
    std::vector<int> percents;
    for (const auto& event : recorder.Events())
        if (event.id == 2) percents.push_back(event.second.bVal);
    return percents;
}

HRESULT FinishResult(const SimEventRecorder& recorder) {
    for (const auto& event : recorder.Events())
        if (event.id == 3) return event.second.lVal;
    return S_FALSE;
}

// A failure that says the server is gone, as a client sees it.
bool IsServerGone(HRESULT hr) {
    return hr == RPC_E_SERVERFAULT || hr == HRESULT_FROM_WIN32(RPC_S_SERVER_UNAVAILABLE) ||
           hr == CO_E_OBJNOTCONNECTED || hr == RPC_E_DISCONNECTED || hr == HRESULT_FROM_WIN32(RPC_S_CALL_FAILED) ||
           hr == RPC_E_SERVER_DIED || hr == RPC_E_SERVER_DIED_DNE;
}

class DeviceSimServerTest : public ::testing::Test {
protected:
    void SetUp() override {}
};

}  // namespace

TEST(DeviceSimServerTest, RegistrationNamesTheServerAndItsTypeLibrary) {
    wchar_t server[MAX_PATH] = L"";
    LONG size = sizeof server;
    ASSERT_EQ(ERROR_SUCCESS,
              RegQueryValueW(HKEY_CLASSES_ROOT, L"CLSID\\{0FADF314-B4FD-413C-9E26-6BC49B066080}\\LocalServer32",
                             server, &size));
    EXPECT_NE(nullptr, wcsstr(server, L"CalvexDeviceSim.exe")) << Narrow(server);
    ComPtr<ITypeLib> library;
    ASSERT_EQ(S_OK, LoadRegTypeLib(LIBID_CalvexDeviceMgrLib, 1, 0, LOCALE_NEUTRAL, &library));
    ComPtr<ITypeInfo> events;
    EXPECT_EQ(S_OK, library->GetTypeInfoOfGuid(DIID__IReceiverFileEvents, &events));
}

TEST(DeviceSimServerTest, ServesTheSampleTreeThroughTheContractSlots) {
    DeviceSimScope scope;
    HRESULT created = E_FAIL;
    ComPtr<IDeviceMgr> manager = CreateServer(&created);
    ASSERT_EQ(S_OK, created);
    EXPECT_EQ(S_OK, manager->Refresh());
    ComPtr<IReceiversColl> receivers = Receivers(manager.Get());
    ASSERT_TRUE(receivers);

    struct Expected {
        const wchar_t* serial;
        const wchar_t* model;
        long portType;
        const wchar_t* portName;
        long brand;
        const wchar_t* label;
        long files;
    } const expected[] = {  // sorted by folder name, as the server lists them
        {L"HV3-0042117", L"HVL3-GNSS", 2, L"", 2, L"North pillar", 3},
        {L"BR-5500-0009", L"Compact \u00DC/2", 2, L"", 2, L"Field kit #2!", 5},
        {L"R2-77810", L"R2/Net", 1, L"COM4", 2, L"Boat", 2},
        {L"R2-77811", L"R2", 2, L"", 2, L"", 1},
        {L"5400-00003", L"Q7/L1-L2", 3, L"", 1, L"Lab unit", 0},
        {L"5211-40125", L"Q7/RTK", 1, L"COM3", 1, L"Survey base", 3},
        {L"5302-00871", L"Q9 GNSS", 2, L"", 1, L"Rover 1", 7},
        {L"123-45678", L"Z/5", 1, L"COM12", 1, L"Z5 spare", 2},
    };
    LONG count = -1;
    ASSERT_EQ(S_OK, receivers->get_Count(&count));
    ASSERT_EQ(static_cast<LONG>(std::size(expected)), count);
    for (LONG i = 0; i < count; ++i) {
        const Expected& e = expected[i];
        SCOPED_TRACE(Narrow(e.serial));
        ComPtr<IDispatch> object;
        ASSERT_EQ(S_OK, receivers->get_Item(i, &object));
        ComPtr<IReceiver> receiver = As<IReceiver>(object.Get(), IID_IReceiver);
        ASSERT_TRUE(receiver);
        EXPECT_EQ(e.serial, Text(&IReceiver::get_SerialNumber, receiver.Get()));
        EXPECT_EQ(e.model, Text(&IReceiver::get_Model, receiver.Get()));
        EXPECT_EQ(e.portType, Number(&IReceiver::get_PortType, receiver.Get()));
        EXPECT_EQ(e.portName, Text(&IReceiver::get_PortName, receiver.Get()));
        EXPECT_EQ(e.brand, Number(&IReceiver::get_Brand, receiver.Get()));
        EXPECT_EQ(e.label, Text(&IReceiver::get_Label, receiver.Get()));
        ComPtr<IFilesColl> files = Files(receiver.Get());
        LONG fileCount = -1;
        ASSERT_EQ(S_OK, files->get_Count(&fileCount));
        EXPECT_EQ(e.files, fileCount);
    }
    ComPtr<IDispatch> none;
    EXPECT_EQ(E_INVALIDARG, receivers->get_Item(count, &none));
    EXPECT_FALSE(none);
}

TEST(DeviceSimServerTest, FilesCarryTheTreeSizesAndTheDescribedTimes) {
    DeviceSimScope scope;
    ComPtr<IDeviceMgr> manager = CreateServer();
    ASSERT_TRUE(manager);
    ComPtr<IReceiver> receiver = ReceiverByKey(Receivers(manager.Get()).Get(), L"USB-5302-00871");
    ASSERT_TRUE(receiver);
    ComPtr<IFilesColl> files = Files(receiver.Get());
    const std::wstring folder = SampleReceiversDir() + L"\\Calvex Q9 USB\\";
    const wchar_t* const names[] = {L"20261103A.T02", L"20261103B.T02", L"20261104A.T02", L"LOG0001",
                                    L"LOG0002",       L"LOG0003",       L"LOG0004"};
    for (LONG i = 0; i < static_cast<LONG>(std::size(names)); ++i) {
        SCOPED_TRACE(Narrow(names[i]));
        ComPtr<IDispatch> object;
        ASSERT_EQ(S_OK, files->get_Item(i, &object));
        ComPtr<IReceiverFile> file = As<IReceiverFile>(object.Get(), IID_IReceiverFile);
        ASSERT_TRUE(file);
        Bstr name;
        LONG size = -1;
        ASSERT_EQ(S_OK, file->get_Name(name.Put()));
        ASSERT_EQ(S_OK, file->get_Size(&size));
        EXPECT_EQ(names[i], name.Str());
        EXPECT_EQ(ReadFileBytes(folder + names[i]).size(), static_cast<size_t>(size));
    }
    // 20261103B.T02=2026-11-03 17:45:10 in the description file.
    DATE time = 0;
    SYSTEMTIME st = {};
    ASSERT_EQ(S_OK, FileByName(files.Get(), L"20261103B.T02")->get_Time(&time));
    ASSERT_TRUE(VariantTimeToSystemTime(time, &st));
    EXPECT_EQ((std::vector<int>{2026, 11, 3, 17, 45, 10}),
              (std::vector<int>{st.wYear, st.wMonth, st.wDay, st.wHour, st.wMinute, st.wSecond}));
}

TEST(DeviceSimServerTest, FindsReceiversByKeyAndFilesByName) {
    DeviceSimScope scope;
    ComPtr<IDeviceMgr> manager = CreateServer();
    ASSERT_TRUE(manager);
    ComPtr<IReceiversColl> receivers = Receivers(manager.Get());
    const struct {
        const wchar_t* key;
        HRESULT result;
        const wchar_t* serial;
    } keys[] = {
        {L"COM3-5211-40125", S_OK, L"5211-40125"},   {L"USB-5302-00871", S_OK, L"5302-00871"},
        {L"Unknown-5400-00003", S_OK, L"5400-00003"}, {L"COM12-123-45678", S_OK, L"123-45678"},
        {L"USB-HV3-0042117", S_OK, L"HV3-0042117"},  {L"COM4-5211-40125", E_INVALIDARG, nullptr},
        {L"5211-40125", E_INVALIDARG, nullptr},      {L"", E_INVALIDARG, nullptr},
    };
    for (const auto& k : keys) {
        SCOPED_TRACE(Narrow(k.key));
        HRESULT hr = E_FAIL;
        ComPtr<IReceiver> receiver = ReceiverByKey(receivers.Get(), k.key, &hr);
        EXPECT_EQ(k.result, hr);
        EXPECT_EQ(k.serial != nullptr, static_cast<bool>(receiver));
        if (receiver) EXPECT_EQ(k.serial, Text(&IReceiver::get_SerialNumber, receiver.Get()));
    }
    ComPtr<IFilesColl> odd = Files(ReceiverByKey(receivers.Get(), L"USB-BR-5500-0009").Get());
    const struct {
        const wchar_t* name;
        HRESULT result;
    } names[] = {
        {L"site survey 1.dat", S_OK}, {L"Mesure \u00E9t\u00E9.log", S_OK}, {L"point#3", S_OK}, {L"done!", S_OK},
        {L"\u00C5\u00C4\u00D6-\u6F22\u5B57.T02", S_OK}, {L"done!.qpr", E_INVALIDARG}, {L"receiver.ini", E_INVALIDARG},
    };
    for (const auto& n : names) {
        SCOPED_TRACE(Narrow(n.name));
        HRESULT hr = E_FAIL;
        ComPtr<IReceiverFile> file = FileByName(odd.Get(), n.name, &hr);
        EXPECT_EQ(n.result, hr);
        if (!file) continue;
        Bstr name;
        EXPECT_EQ(S_OK, file->get_Name(name.Put()));
        EXPECT_EQ(n.name, name.Str());
    }
}
