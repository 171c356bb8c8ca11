// Guards the dispatch event sink: wrong identity, a cookie kept or lost wrongly, events lost, wrongly refused or handed on in the wrong order or types.
#include <windows.h>
#include <ocidl.h>

#include <gtest/gtest.h>

#include <vector>

#include "CalvexDeviceMgrLib.h"
#include "com/ComPtr.h"
#include "com/DispEventSink.h"
#include "SimDeviceManager.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"

using namespace testsupport;

namespace {
struct Call {
    int handler;
    std::vector<VARTYPE> types;
    IDispatch* file;
    LONG number;
    bool operator==(const Call& o) const {
        return handler == o.handler && types == o.types && file == o.file && number == o.number;
    }
};

// Handlers reached through the sink map, recording the types they were handed.
class FileEventsSink : public DispEventSinkImpl<FileEventsSink> {
public:
    FileEventsSink() : DispEventSinkImpl(DIID__IReceiverFileEvents, LIBID_CalvexDeviceMgrLib, 1, 0) {}
    static const SinkEntry* SinkMap() {
        static const SinkEntry map[] = {
            {1, &FileEventsSink::OnBegin}, {2, &FileEventsSink::OnProgress}, {3, &FileEventsSink::OnFinish}, {0, nullptr}};
        return map;
    }
    std::vector<Call> calls;

private:
    void Record(int handler, const VARIANT* args, UINT count, LONG number) {
        Call call{handler, {}, count ? args[0].pdispVal : nullptr, number};
        for (UINT i = 0; i < count; ++i) call.types.push_back(args[i].vt);
        calls.push_back(call);
    }
    void OnBegin(const VARIANT* args, UINT count) { Record(1, args, count, 0); }
    void OnProgress(const VARIANT* args, UINT count) { Record(2, args, count, args[1].bVal); }
    void OnFinish(const VARIANT* args, UINT count) { Record(3, args, count, args[1].lVal); }
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
    ASSERT_TRUE(PumpUntil([&] { return !sink->calls.empty() && sink->calls.back().handler == 3; }, 5000));
    EXPECT_EQ(1, sink->calls.front().handler);
    EXPECT_EQ((std::vector<VARTYPE>{VT_DISPATCH, VT_UI1}), sink->calls[1].types);
    EXPECT_EQ(100, sink->calls[sink->calls.size() - 2].number);
    EXPECT_EQ(S_OK, sink->calls.back().number);
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
        {1, {Arg(VT_DISPATCH, 0, file)}, S_OK, 99, {{1, {VT_DISPATCH}, file, 0}}},
        {2, {Arg(VT_I4, 50), Arg(VT_DISPATCH, 0, file)}, S_OK, 99, {{2, {VT_DISPATCH, VT_UI1}, file, 50}}},
        {2, {Arg(VT_BSTR, 0, nullptr, L"75"), Arg(VT_DISPATCH, 0, file)}, S_OK, 99, {{2, {VT_DISPATCH, VT_UI1}, file, 75}}},
        {3, {Arg(VT_I2, -5), Arg(VT_DISPATCH, 0, file)}, S_OK, 99, {{3, {VT_DISPATCH, VT_I4}, file, -5}}},
        {3, {Arg(VT_I4, E_ABORT), Arg(VT_DISPATCH, 0, file)}, S_OK, 99,
         {{3, {VT_DISPATCH, VT_I4}, file, static_cast<LONG>(E_ABORT)}}},
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
