// The dispatch event sink: its identity, its advise cookie, and Invoke driven by the device
// manager's registered type library (argument order, coercion to the declared types).
#include <windows.h>
#include <ocidl.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "CalvexDeviceMgrLib.h"
#include "com/ComPtr.h"
#include "com/DispEventSink.h"
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

// One object serving as both the container and its single connection point.
class FakeSource : public IConnectionPointContainer, public IConnectionPoint {
public:
    IID askedFor = GUID_NULL;
    IUnknown* advised = nullptr;
    DWORD unadvisedCookie = 0;

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        *ppv = nullptr;
        if (IsEqualIID(riid, IID_IUnknown) || IsEqualIID(riid, IID_IConnectionPointContainer))
            *ppv = static_cast<IConnectionPointContainer*>(this);
        else if (IsEqualIID(riid, IID_IConnectionPoint))
            *ppv = static_cast<IConnectionPoint*>(this);
        else
            return E_NOINTERFACE;
        return S_OK;
    }
    STDMETHODIMP_(ULONG) AddRef() override { return 2; }
    STDMETHODIMP_(ULONG) Release() override { return 1; }
    STDMETHODIMP EnumConnectionPoints(IEnumConnectionPoints**) override { return E_NOTIMPL; }
    STDMETHODIMP FindConnectionPoint(REFIID riid, IConnectionPoint** point) override {
        askedFor = riid;
        *point = this;
        return S_OK;
    }
    STDMETHODIMP GetConnectionInterface(IID*) override { return E_NOTIMPL; }
    STDMETHODIMP GetConnectionPointContainer(IConnectionPointContainer**) override { return E_NOTIMPL; }
    STDMETHODIMP Advise(IUnknown* sink, DWORD* cookie) override {
        advised = sink;
        *cookie = 0x1234;
        return S_OK;
    }
    STDMETHODIMP Unadvise(DWORD cookie) override {
        unadvisedCookie = cookie;
        return S_OK;
    }
    STDMETHODIMP EnumConnections(IEnumConnections**) override { return E_NOTIMPL; }
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

VARIANT Dispatch(IDispatch* value) {
    VARIANT v;
    v.vt = VT_DISPATCH;
    v.pdispVal = value;
    return v;
}
VARIANT Int(VARTYPE type, LONG value) {
    VARIANT v;
    v.vt = type;
    v.lVal = 0;
    if (type == VT_I2) v.iVal = static_cast<SHORT>(value); else v.lVal = value;
    return v;
}
VARIANT Text(const wchar_t* text) {
    VARIANT v;
    v.vt = VT_BSTR;
    v.bstrVal = SysAllocString(text);  // freed by Invoke() above
    return v;
}
}  // namespace

TEST_F(DispEventSinkTest, AnswersItsThreeInterfacesOnly) {
    struct { const IID* iid; HRESULT result; } cases[] = {
        {&IID_IUnknown, S_OK}, {&IID_IDispatch, S_OK}, {&DIID__IReceiverFileEvents, S_OK},
        {&DIID__IFilesCollEvents, E_NOINTERFACE}, {&IID_IConnectionPoint, E_NOINTERFACE},
    };
    for (const auto& c : cases) {
        void* object = reinterpret_cast<void*>(1);
        EXPECT_EQ(c.result, sink->QueryInterface(*c.iid, &object));
        EXPECT_EQ(c.result == S_OK ? static_cast<IDispatch*>(sink) : nullptr, object);
        if (object) sink->Release();
    }
    EXPECT_EQ(E_POINTER, sink->QueryInterface(IID_IDispatch, nullptr));
}

TEST_F(DispEventSinkTest, CookieRule) {
    FakeSource source;
    EXPECT_EQ(0xFEFEFEFEu, sink->Cookie());
    ASSERT_EQ(S_OK, sink->Advise(static_cast<IConnectionPointContainer*>(&source)));
    EXPECT_TRUE(IsEqualIID(DIID__IReceiverFileEvents, source.askedFor));
    EXPECT_EQ(0x1234u, sink->Cookie());
    source.advised = nullptr;
    EXPECT_EQ(E_FAIL, sink->Advise(static_cast<IConnectionPointContainer*>(&source))) << "already advised";
    EXPECT_EQ(nullptr, source.advised);
    EXPECT_EQ(S_OK, sink->Unadvise(static_cast<IConnectionPointContainer*>(&source)));
    EXPECT_EQ(0x1234u, source.unadvisedCookie);
    EXPECT_EQ(0xFEFEFEFEu, sink->Cookie());

    IUnknown* notASource = sink;  // has no connection points
    EXPECT_EQ(E_NOINTERFACE, sink->Advise(notASource));
    EXPECT_EQ(0xFEFEFEFEu, sink->Cookie());
}

TEST_F(DispEventSinkTest, InvokeCoercesToTheLibrarysTypesInDeclarationOrder) {
    IDispatch* file = sink;  // any dispatch pointer stands for the file
    struct {
        DISPID dispid;
        std::vector<VARIANT> rgvarg;  // last argument first, as callers pass them
        int handler;
        std::vector<VARTYPE> types;
        LONG number;
    } cases[] = {
        {1, {Dispatch(file)}, 1, {VT_DISPATCH}, 0},
        {2, {Int(VT_I4, 50), Dispatch(file)}, 2, {VT_DISPATCH, VT_UI1}, 50},
        {2, {Text(L"75"), Dispatch(file)}, 2, {VT_DISPATCH, VT_UI1}, 75},
        {3, {Int(VT_I2, -5), Dispatch(file)}, 3, {VT_DISPATCH, VT_I4}, -5},
        {3, {Int(VT_I4, static_cast<LONG>(E_ABORT)), Dispatch(file)}, 3, {VT_DISPATCH, VT_I4}, static_cast<LONG>(E_ABORT)},
    };
    for (auto& c : cases) {
        SCOPED_TRACE(c.dispid);
        sink->calls.clear();
        ASSERT_EQ(S_OK, Invoke(c.dispid, c.rgvarg));
        ASSERT_EQ(1u, sink->calls.size());
        EXPECT_EQ(c.handler, sink->calls[0].handler);
        EXPECT_EQ(c.types, sink->calls[0].types);
        EXPECT_EQ(file, sink->calls[0].file);
        EXPECT_EQ(c.number, sink->calls[0].number);
    }
}

TEST_F(DispEventSinkTest, InvokeRefusesWhatTheLibraryDoesNotDeclare) {
    IDispatch* file = sink;
    UINT argErr = 99;
    EXPECT_EQ(DISP_E_BADPARAMCOUNT, Invoke(2, {Dispatch(file)}));
    EXPECT_EQ(DISP_E_TYPEMISMATCH, Invoke(2, {Text(L"many"), Dispatch(file)}, &argErr));
    EXPECT_EQ(0u, argErr) << "index into rgvarg of the bad argument";
    EXPECT_EQ(S_OK, Invoke(99, {})) << "events nobody listens to are ignored";
    EXPECT_TRUE(sink->calls.empty());
}
