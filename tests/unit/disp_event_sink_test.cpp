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

// Its own three interfaces answer in every advise and live event; nothing else may.
TEST_F(DispEventSinkTest, AnswersItsThreeInterfacesOnly) {
    for (const IID* iid : {&DIID__IFilesCollEvents, &IID_IConnectionPoint}) {
        void* object = reinterpret_cast<void*>(1);
        EXPECT_EQ(E_NOINTERFACE, sink->QueryInterface(*iid, &object));
        EXPECT_EQ(nullptr, object);
    }
    EXPECT_EQ(E_POINTER, sink->QueryInterface(IID_IDispatch, nullptr));
}

// Against a file of the in-process simulator: the cookie rule, told by a real download's events.
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
    EXPECT_EQ(S_OK, std::get<3>(sink->calls.back())) << "finished";
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
    const VARIANT f = Arg(VT_DISPATCH, 0, file);
    struct { DISPID dispid; std::vector<VARIANT> rgvarg; HRESULT hr; UINT argErr; std::vector<Call> calls; } cases[] = {
        // rgvarg: last argument first, as callers pass them
        {1, {f}, S_OK, 99, {Call{1, {VT_DISPATCH}, file, 0}}},
        {2, {Arg(VT_I4, 50), f}, S_OK, 99, {Call{2, {VT_DISPATCH, VT_UI1}, file, 50}}},
        {2, {Arg(VT_BSTR, 0, nullptr, L"75"), f}, S_OK, 99, {Call{2, {VT_DISPATCH, VT_UI1}, file, 75}}},
        {3, {Arg(VT_I2, -5), f}, S_OK, 99, {Call{3, {VT_DISPATCH, VT_I4}, file, -5}}},
        {3, {Arg(VT_I4, E_ABORT), f}, S_OK, 99, {Call{3, {VT_DISPATCH, VT_I4}, file, static_cast<LONG>(E_ABORT)}}},
        {2, {f}, DISP_E_BADPARAMCOUNT, 99, {}},
        // argErr: the index into rgvarg of the bad argument
        {2, {Arg(VT_BSTR, 0, nullptr, L"many"), f}, DISP_E_TYPEMISMATCH, 0, {}},
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
