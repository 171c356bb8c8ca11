// The simulated device manager as the extension meets it: a local server made by COM under
// Wine and called through the contract's virtual table slots.
#include <windows.h>
#include <objbase.h>
#include <oleauto.h>

#include <iterator>
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
    const IID* const events[] = {&DIID__IReceiversCollEvents, &DIID__IFilesCollEvents, &DIID__IReceiverFileEvents};
    for (const IID* iid : events) {
        ComPtr<ITypeInfo> info;
        EXPECT_EQ(S_OK, library->GetTypeInfoOfGuid(*iid, &info));
    }
}

TEST(DeviceSimServerTest, ServesTheSampleTreeThroughTheContractSlots) {
    DeviceSimScope scope;
    HRESULT created = E_FAIL;
    ComPtr<IDeviceMgr> manager = CreateDeviceManager(&created);
    ASSERT_EQ(S_OK, created);
    EXPECT_EQ(S_OK, manager->Refresh());
    ComPtr<IReceiversColl> receivers = ReceiversOf(manager.Get());
    ASSERT_TRUE(receivers);

    struct Expected {
        const wchar_t* serial;
        const wchar_t* model;
        long portType;
        const wchar_t* portName;
        long brand;
        const wchar_t* label;
        long files;
    } const expected[] = {  // in folder name order, as the server lists them
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
        ComPtr<IReceiver> receiver = ReceiverAt(receivers.Get(), i);
        ASSERT_TRUE(receiver);
        EXPECT_EQ(e.serial, Text(&IReceiver::get_SerialNumber, receiver.Get()));
        EXPECT_EQ(e.model, Text(&IReceiver::get_Model, receiver.Get()));
        EXPECT_EQ(e.portType, Number(&IReceiver::get_PortType, receiver.Get()));
        EXPECT_EQ(e.portName, Text(&IReceiver::get_PortName, receiver.Get()));
        EXPECT_EQ(e.brand, Number(&IReceiver::get_Brand, receiver.Get()));
        EXPECT_EQ(e.label, Text(&IReceiver::get_Label, receiver.Get()));
        ComPtr<IFilesColl> files = FilesOf(receiver.Get());
        ASSERT_TRUE(files);
        LONG fileCount = -1;
        ASSERT_EQ(S_OK, files->get_Count(&fileCount));
        EXPECT_EQ(e.files, fileCount);
    }
    HRESULT past = S_OK;
    EXPECT_FALSE(ReceiverAt(receivers.Get(), count, &past));
    EXPECT_EQ(E_INVALIDARG, past);
}

TEST(DeviceSimServerTest, FilesCarryTheTreeSizesAndTheDescribedTimes) {
    DeviceSimScope scope;
    ComPtr<IReceiver> receiver = ReceiverByKey(ReceiversOf(CreateDeviceManager().Get()).Get(), L"USB-5302-00871");
    ASSERT_TRUE(receiver);
    ComPtr<IFilesColl> files = FilesOf(receiver.Get());
    ASSERT_TRUE(files);
    const std::wstring folder = SampleReceiversDir() + L"\\Calvex Q9 USB\\";
    const wchar_t* const names[] = {L"20261103A.T02", L"20261103B.T02", L"20261104A.T02", L"LOG0001",
                                    L"LOG0002",       L"LOG0003",       L"LOG0004"};
    for (LONG i = 0; i < static_cast<LONG>(std::size(names)); ++i) {
        SCOPED_TRACE(Narrow(names[i]));
        ComPtr<IReceiverFile> file = FileAt(files.Get(), i);
        ASSERT_TRUE(file);
        LONG size = -1;
        ASSERT_EQ(S_OK, file->get_Size(&size));
        EXPECT_EQ(names[i], FileName(file.Get()));
        EXPECT_EQ(ReadFileBytes(folder + names[i]).size(), static_cast<size_t>(size));
    }
    // The description file says 20261103B.T02=2026-11-03 17:45:10, local time.
    DATE time = 0;
    SYSTEMTIME st = {};
    ComPtr<IReceiverFile> described = FileByName(files.Get(), L"20261103B.T02");
    ASSERT_TRUE(described);
    ASSERT_EQ(S_OK, described->get_Time(&time));
    ASSERT_TRUE(VariantTimeToSystemTime(time, &st));
    EXPECT_EQ((std::vector<int>{2026, 11, 3, 17, 45, 10}),
              (std::vector<int>{st.wYear, st.wMonth, st.wDay, st.wHour, st.wMinute, st.wSecond}));
}

TEST(DeviceSimServerTest, FindsReceiversByKeyAndFilesByName) {
    DeviceSimScope scope;
    ComPtr<IReceiversColl> receivers = ReceiversOf(CreateDeviceManager().Get());
    ASSERT_TRUE(receivers);
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
        ASSERT_EQ(k.serial != nullptr, static_cast<bool>(receiver));
        if (receiver) {
            EXPECT_EQ(k.serial, Text(&IReceiver::get_SerialNumber, receiver.Get()));
        }
    }
    ComPtr<IFilesColl> odd = FilesOf(ReceiverByKey(receivers.Get(), L"USB-BR-5500-0009").Get());
    ASSERT_TRUE(odd);
    const struct {
        const wchar_t* name;
        HRESULT result;
    } names[] = {
        {L"site survey 1.dat", S_OK},
        {L"Mesure \u00E9t\u00E9.log", S_OK},
        {L"point#3", S_OK},
        {L"done!", S_OK},
        {L"\u00C5\u00C4\u00D6-\u6F22\u5B57.T02", S_OK},
        {L"done!.qpr", E_INVALIDARG},
        {L"receiver.ini", E_INVALIDARG},
    };
    for (const auto& n : names) {
        SCOPED_TRACE(Narrow(n.name));
        HRESULT hr = E_FAIL;
        ComPtr<IReceiverFile> file = FileByName(odd.Get(), n.name, &hr);
        EXPECT_EQ(n.result, hr);
        if (file) {
            EXPECT_EQ(n.name, FileName(file.Get()));
        }
    }
}

// Script clients reach the same objects by name through IDispatch.
TEST(DeviceSimServerTest, AnswersLateBoundCallsByName) {
    DeviceSimScope scope;
    ComPtr<IReceiversColl> receivers = ReceiversOf(CreateDeviceManager().Get());
    ASSERT_TRUE(receivers);
    LPOLESTR name = const_cast<LPOLESTR>(L"Count");
    DISPID id = 0;
    ASSERT_EQ(S_OK, receivers->GetIDsOfNames(IID_NULL, &name, 1, LOCALE_USER_DEFAULT, &id));
    EXPECT_EQ(1, id);
    DISPPARAMS none = {};
    VARIANT result;
    VariantInit(&result);
    ASSERT_EQ(S_OK, receivers->Invoke(id, IID_NULL, LOCALE_USER_DEFAULT, DISPATCH_PROPERTYGET, &none, &result,
                                      nullptr, nullptr));
    EXPECT_EQ(VT_I4, result.vt);
    EXPECT_EQ(8, result.lVal);
}

// (Wine's proxy of IClassFactory answers LockServer with E_NOTIMPL: only objects keep it here.)
TEST(DeviceSimServerTest, EndsAShortTimeAfterItsLastObject) {
    DeviceSimScope scope;
    ComPtr<IReceiversColl> receivers = ReceiversOf(CreateDeviceManager().Get());
    ASSERT_TRUE(receivers);
    PumpMessagesFor(3000);
    EXPECT_EQ(1, RunningDeviceSimServers());  // the collection alone keeps it
    receivers.Reset();
    const ULONGLONG released = GetTickCount64();
    ASSERT_TRUE(PumpUntil([] { return RunningDeviceSimServers() == 0; }, 10000));
    EXPECT_GE(GetTickCount64() - released, 1000u);  // it waits about two seconds for a new client
}

TEST(DeviceSimServerTest, ServesTheTreeNamedOnItsCommandLine) {
    ReceiverTree tree;
    tree.AddReceiver({L"only", 2, L"Only", L"CMD-1", L"R2", 1, L"COM9", {}});
    DeviceSimScope scope;
    std::wstring command = L"\"" + BuildDir() + L"\\CalvexDeviceSim.exe\" /Root \"" + tree.Root() + L"\"";
    STARTUPINFOW startup = {sizeof startup};
    PROCESS_INFORMATION info = {};
    ASSERT_TRUE(CreateProcessW(nullptr, &command[0], nullptr, nullptr, FALSE, 0, nullptr, nullptr, &startup, &info));
    CloseHandle(info.hThread);
    CloseHandle(info.hProcess);
    // The server makes its quit event just before it registers its class.
    ASSERT_TRUE(PumpUntil([] {
        HANDLE quit = OpenEventW(SYNCHRONIZE, FALSE, L"CalvexDeviceSim.Quit");
        if (quit) CloseHandle(quit);
        return quit != nullptr;
    }, 10000));
    PumpMessagesFor(500);
    ComPtr<IReceiversColl> receivers = ReceiversOf(CreateDeviceManager().Get());
    ASSERT_TRUE(receivers);
    LONG count = 0;
    ASSERT_EQ(S_OK, receivers->get_Count(&count));
    EXPECT_EQ(1, count);
    EXPECT_TRUE(ReceiverByKey(receivers.Get(), L"COM9-CMD-1"));
    EXPECT_EQ(1, RunningDeviceSimServers());
}
