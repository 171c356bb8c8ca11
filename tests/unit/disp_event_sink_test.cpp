// Guards the dispatch event sink: wrong identity, a cookie kept or lost wrongly, events lost or handed on in the wrong order or types.
#include <windows.h>
#include <ocidl.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "CalvexDeviceMgrLib.h"
#include "com/ComPtr.h"
#include "com/DispEventSink.h"
#include "SimDeviceManager.h"
#include "support/DeviceSim.h"
#include "support/TestSupport.h"

namespace {
struct Call {
    int handler;
    std::vector<VARTYPE> types;
    IDispatch* file;
    LONG number;
};

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

class DispEventSinkTest : public testing::Test {
protected:
    static void SetUpTestSuite() {
        // The simulator registers the library in the tests' prefix; register it here as well
        // when it is missing so that the sink can be tested on its own.
        ITypeLib* library = nullptr;
        if (FAILED(LoadRegTypeLib(LIBID_CalvexDeviceMgrLib, 1, 0, LOCALE_NEUTRAL, &library))) {
            std::wstring path = testsupport::BuildDir() + L"\\generated\\CalvexDeviceMgrLib.tlb";
            ASSERT_EQ(S_OK, LoadTypeLibEx(path.c_str(), REGKIND_REGISTER, &library));
        }
        library->Release();
    }
    void SetUp() override {
        sink = new FileEventsSink();
        sink->AddRef();
    }
    void TearDown() override { sink->Release(); }

    HRESULT Invoke(DISPID dispid, std::vector<VARIANT> args, UINT* argErr = nullptr) {
        DISPPARAMS params = {args.data(), nullptr, static_cast<UINT>(args.size()), 0};
        HRESULT hr = sink->Invoke(dispid, IID_NULL, 0, DISPATCH_METHOD, &params, nullptr, nullptr, argErr);
        for (VARIANT& arg : args)
            if (arg.vt == VT_BSTR) SysFreeString(arg.bstrVal);
        return hr;
    }
    FileEventsSink* sink = nullptr;
};

VARIANT Arg(VARTYPE type, LONG value, IDispatch* object = nullptr, const wchar_t* text = nullptr) {
    VARIANT v = {};
    v.vt = type;
    if (type == VT_DISPATCH) v.pdispVal = object;
    else if (type == VT_BSTR) v.bstrVal = SysAllocString(text);  // freed by Invoke() above
    else if (type == VT_I2) v.iVal = static_cast<SHORT>(value);
    else v.lVal = value;
    return v;
}
}  // namespace

TEST_F(DispEventSinkTest, AnswersItsThreeInterfacesOnly) {
    struct { const IID* iid; HRESULT result; } cases[] = {{&IID_IUnknown, S_OK}, {&IID_IDispatch, S_OK},
        {&DIID__IReceiverFileEvents, S_OK}, {&DIID__IFilesCollEvents, E_NOINTERFACE}, {&IID_IConnectionPoint, E_NOINTERFACE}};
    for (const auto& c : cases) {
        void* object = reinterpret_cast<void*>(1);
        EXPECT_EQ(c.result, sink->QueryInterface(*c.iid, &object));
        EXPECT_EQ(c.result == S_OK ? static_cast<IDispatch*>(sink) : nullptr, object);
        if (object) sink->Release();
    }
    EXPECT_EQ(E_POINTER, sink->QueryInterface(IID_IDispatch, nullptr));
}

// Against a file of the in-process simulator: the cookie rule, and a real download's events
// arriving through the type library in order.
TEST_F(DispEventSinkTest, CookieRuleAndADownloadsEvents) {
    testsupport::ReceiverTree tree;
    tree.AddReceiver({L"r", 1, L"R", L"1", L"Q7", 2, L"", {}});
    tree.AddFile(L"r", L"LOG0001", 100000);
    ComPtr<IDeviceMgr> manager;
    ASSERT_EQ(S_OK, CreateSimDeviceManager(tree.Root().c_str(), IID_IDeviceMgr, manager.PutVoid()));
    using namespace testsupport;
    ComPtr<IReceiverFile> file = FileAt(FilesOf(ReceiverAt(ReceiversOf(manager.Get()).Get(), 0).Get()).Get(), 0);
    ASSERT_TRUE(file);

    EXPECT_EQ(0xFEFEFEFEu, sink->Cookie());
    ASSERT_EQ(S_OK, sink->Advise(file.Get()));
    const DWORD cookie = sink->Cookie();
    EXPECT_NE(0xFEFEFEFEu, cookie);
    EXPECT_EQ(E_FAIL, sink->Advise(file.Get())) << "already advised";
    EXPECT_EQ(cookie, sink->Cookie());
    ComPtr<IStream> stream = NewMemoryStream();
    ASSERT_EQ(S_OK, StartDownload(file.Get(), stream.Get()));
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

    IUnknown* notASource = sink;  // has no connection points
    EXPECT_EQ(E_NOINTERFACE, sink->Advise(notASource));
    EXPECT_EQ(0xFEFEFEFEu, sink->Cookie());
}

TEST_F(DispEventSinkTest, InvokeCoercesToTheLibrarysTypesInDeclarationOrder) {
    IDispatch* file = sink;  // any dispatch pointer stands for the file
    struct { DISPID dispid; std::vector<VARIANT> rgvarg; int handler; std::vector<VARTYPE> types; LONG number; } cases[] = {
        // rgvarg: last argument first, as callers pass them
        {1, {Arg(VT_DISPATCH, 0, file)}, 1, {VT_DISPATCH}, 0},
        {2, {Arg(VT_I4, 50), Arg(VT_DISPATCH, 0, file)}, 2, {VT_DISPATCH, VT_UI1}, 50},
        {2, {Arg(VT_BSTR, 0, nullptr, L"75"), Arg(VT_DISPATCH, 0, file)}, 2, {VT_DISPATCH, VT_UI1}, 75},
        {3, {Arg(VT_I2, -5), Arg(VT_DISPATCH, 0, file)}, 3, {VT_DISPATCH, VT_I4}, -5},
        {3, {Arg(VT_I4, E_ABORT), Arg(VT_DISPATCH, 0, file)}, 3, {VT_DISPATCH, VT_I4}, static_cast<LONG>(E_ABORT)},
    };
    for (auto& c : cases) {
        SCOPED_TRACE(c.dispid);
        sink->calls.clear();
        ASSERT_EQ(S_OK, Invoke(c.dispid, c.rgvarg));
        ASSERT_EQ(1u, sink->calls.size());
        const Call& call = sink->calls[0];
        EXPECT_TRUE(c.handler == call.handler && c.types == call.types && file == call.file && c.number == call.number);
    }
}

TEST_F(DispEventSinkTest, InvokeRefusesWhatTheLibraryDoesNotDeclare) {
    IDispatch* file = sink;
    UINT argErr = 99;
    EXPECT_EQ(DISP_E_BADPARAMCOUNT, Invoke(2, {Arg(VT_DISPATCH, 0, file)}));
    EXPECT_EQ(DISP_E_TYPEMISMATCH, Invoke(2, {Arg(VT_BSTR, 0, nullptr, L"many"), Arg(VT_DISPATCH, 0, file)}, &argErr));
    EXPECT_EQ(0u, argErr) << "index into rgvarg of the bad argument";
    EXPECT_EQ(S_OK, Invoke(99, {})) << "events nobody listens to are ignored";
    EXPECT_TRUE(sink->calls.empty());
}
