// Guards the dispatch event sink: wrong identity, a cookie kept or lost wrongly, events lost, wrongly refused or handed on in the wrong order or types.
#include <gtest/gtest.h>

#include <tuple>
#include <vector>

#include "SimDeviceManager.h"
#include "support/DeviceSim.h"  // the device manager's library, the sink, the contract walk

using namespace testsupport;

namespace {
// One handler call: the handler, the types it was handed, the file and the number argument.
using Call = std::tuple<int, std::vector<VARTYPE>, IDispatch*, LONG>;

// Handlers reached through the sink map, recording the types they were handed.
class FileEventsSink : public DispEventSinkImpl<FileEventsSink> {
public:
    FileEventsSink() : DispEventSinkImpl(DIID__IReceiverFileEvents, LIBID_CalvexDeviceMgrLib, 1, 0) {}
    static const SinkEntry* SinkMap() {
        static const SinkEntry map[] = {
            {1, &FileEventsSink::On<1>}, {2, &FileEventsSink::On<2>}, {3, &FileEventsSink::On<3>}, {0, nullptr}};
        return map;
    }
    std::vector<Call> calls;

private:
    template <int handler>
    void On(const VARIANT* args, UINT count) {
        std::vector<VARTYPE> types;
        for (UINT i = 0; i < count; ++i) types.push_back(args[i].vt);
        const LONG number = count < 2 ? 0 : args[1].vt == VT_UI1 ? args[1].bVal : args[1].lVal;
        calls.emplace_back(handler, types, count ? args[0].pdispVal : nullptr, number);
    }
};

VARIANT Arg(VARTYPE type, LONG value, IDispatch* object = nullptr, const wchar_t* text = nullptr) {
    VARIANT v = {};
    v.vt = type;
    if (type == VT_DISPATCH) v.pdispVal = object;
    else if (type == VT_BSTR) v.bstrVal = SysAllocString(text);  // freed by the test that passes it
    else if (type == VT_I2) v.iVal = static_cast<SHORT>(value);
    else v.lVal = value;
    return v;
}

class DispEventSinkTest : public testing::Test {
protected:
    ComPtr<FileEventsSink> sink{new FileEventsSink()};
};

TEST_F(DispEventSinkTest, AnswersItsThreeInterfacesOnly) {
    struct { const IID* iid; HRESULT result; } cases[] = {{&IID_IUnknown, S_OK}, {&IID_IDispatch, S_OK},
        {&DIID__IReceiverFileEvents, S_OK}, {&DIID__IFilesCollEvents, E_NOINTERFACE}, {&IID_IConnectionPoint, E_NOINTERFACE}};
    for (const auto& c : cases) {
        void* object = reinterpret_cast<void*>(1);
        EXPECT_EQ(c.result, sink->QueryInterface(*c.iid, &object));
        EXPECT_EQ(c.result == S_OK ? static_cast<IDispatch*>(sink.Get()) : nullptr, object);
        if (object) sink->Release();
    }
    EXPECT_EQ(E_POINTER, sink->QueryInterface(IID_IDispatch, nullptr));
}

// Against a file of the in-process simulator: the cookie rule, and a real download's events
// arriving through the type library in order.
TEST_F(DispEventSinkTest, CookieRuleAndADownloadsEvents) {
    ReceiverTree tree;
    tree.AddReceiver({L"r", 1, L"R", L"1", L"Q7", 2, L"", {}});
    tree.AddFile(L"r", L"LOG0001", 100000);
    ComPtr<IDeviceMgr> manager;
    ASSERT_EQ(S_OK, CreateSimDeviceManager(tree.Root().c_str(), IID_IDeviceMgr, manager.PutVoid()));
    ComPtr<IReceiverFile> file = FileAt(FilesOf(ReceiverAt(ReceiversOf(manager.Get()).Get(), 0).Get()).Get(), 0);
    ASSERT_TRUE(file);

    EXPECT_EQ(0xFEFEFEFEu, sink->Cookie());
    ASSERT_EQ(S_OK, sink->Advise(file.Get()));
    const DWORD cookie = sink->Cookie();
    EXPECT_NE(0xFEFEFEFEu, cookie);
    EXPECT_EQ(E_FAIL, sink->Advise(file.Get())) << "already advised";
    EXPECT_EQ(cookie, sink->Cookie());
    ASSERT_EQ(S_OK, StartDownload(file.Get(), NewMemoryStream().Get()));
    ASSERT_TRUE(PumpUntil([&] { return !sink->calls.empty() && std::get<0>(sink->calls.back()) == 3; }, 5000));
    EXPECT_EQ(1, std::get<0>(sink->calls.front()));
    EXPECT_EQ((std::vector<VARTYPE>{VT_DISPATCH, VT_UI1}), std::get<1>(sink->calls[1]));
    EXPECT_EQ(100, std::get<3>(sink->calls[sink->calls.size() - 2])) << "the last progress";
    EXPECT_EQ(S_OK, std::get<3>(sink->calls.back()));
    EXPECT_EQ(S_OK, sink->Unadvise(file.Get()));
    EXPECT_EQ(0xFEFEFEFEu, sink->Cookie());
    const size_t heard = sink->calls.size();
    ASSERT_EQ(S_OK, StartDownload(file.Get(), NewMemoryStream().Get()));
    PumpMessagesFor(300);
    EXPECT_EQ(heard, sink->calls.size()) << "an unadvised sink was called";

    EXPECT_EQ(E_NOINTERFACE, sink->Advise(sink.Get())) << "a source without connection points";
    EXPECT_EQ(0xFEFEFEFEu, sink->Cookie());
}

TEST_F(DispEventSinkTest, InvokeCoercesToTheLibrarysTypesInDeclarationOrderOrRefuses) {
    IDispatch* file = sink.Get();  // any dispatch pointer stands for the file
    struct { DISPID dispid; std::vector<VARIANT> rgvarg; HRESULT hr; UINT argErr; std::vector<Call> calls; } cases[] = {
        // rgvarg: last argument first, as callers pass them
        {1, {Arg(VT_DISPATCH, 0, file)}, S_OK, 99, {Call{1, {VT_DISPATCH}, file, 0}}},
        {2, {Arg(VT_I4, 50), Arg(VT_DISPATCH, 0, file)}, S_OK, 99, {Call{2, {VT_DISPATCH, VT_UI1}, file, 50}}},
        {2, {Arg(VT_BSTR, 0, nullptr, L"75"), Arg(VT_DISPATCH, 0, file)}, S_OK, 99,
         {Call{2, {VT_DISPATCH, VT_UI1}, file, 75}}},
        {3, {Arg(VT_I2, -5), Arg(VT_DISPATCH, 0, file)}, S_OK, 99, {Call{3, {VT_DISPATCH, VT_I4}, file, -5}}},
        {3, {Arg(VT_I4, E_ABORT), Arg(VT_DISPATCH, 0, file)}, S_OK, 99,
         {Call{3, {VT_DISPATCH, VT_I4}, file, static_cast<LONG>(E_ABORT)}}},
        {2, {Arg(VT_DISPATCH, 0, file)}, DISP_E_BADPARAMCOUNT, 99, {}},
        // argErr: the index into rgvarg of the bad argument
        {2, {Arg(VT_BSTR, 0, nullptr, L"many"), Arg(VT_DISPATCH, 0, file)}, DISP_E_TYPEMISMATCH, 0, {}},
        {99, {}, S_OK, 99, {}},  // events nobody listens to are ignored
    };
    for (auto& c : cases) {
        SCOPED_TRACE(testing::Message() << c.dispid << " with " << c.rgvarg.size() << " arguments");
        sink->calls.clear();
        DISPPARAMS params = {c.rgvarg.data(), nullptr, static_cast<UINT>(c.rgvarg.size()), 0};
        UINT argErr = 99;
        EXPECT_EQ(c.hr, sink->Invoke(c.dispid, IID_NULL, 0, DISPATCH_METHOD, &params, nullptr, nullptr, &argErr));
        EXPECT_EQ(c.argErr, argErr);
        EXPECT_TRUE(c.calls == sink->calls);
        for (VARIANT& arg : c.rgvarg)
            if (arg.vt == VT_BSTR) SysFreeString(arg.bstrVal);
    }
}
}  // namespace
