#pragma once
// The benchmarks' floor: a receiver's files reached and downloaded through the device manager
// contract alone (get_ItemByKey, get_Files, an _IReceiverFileEvents sink, Download into a
// stream, the finish event), with no folder, no dialog and no disk.
#include <windows.h>

#include "CalvexDeviceMgrLib.h"
#include "com/Bstr.h"
#include "com/ComPtr.h"
#include "com/DispEventSink.h"

// Ends a download's wait on the finish event.
class FinishSink : public DispEventSinkImpl<FinishSink> {
public:
    FinishSink() : DispEventSinkImpl<FinishSink>(DIID__IReceiverFileEvents, LIBID_CalvexDeviceMgrLib, 1, 0) {}
    static const SinkEntry* SinkMap() {
        static const SinkEntry map[] = {{3, &FinishSink::OnFinish}, {0, nullptr}};
        return map;
    }
    bool finished = false;
    LONG result = E_PENDING;

private:
    void OnFinish(const VARIANT* args, UINT count) {
        finished = true;
        if (count >= 2) result = args[1].lVal;
    }
};

inline void PumpOnce() {
    MSG message;
    MsgWaitForMultipleObjectsEx(0, nullptr, 20, QS_ALLINPUT, MWMO_INPUTAVAILABLE);
    while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) DispatchMessageW(&message);
}

inline double SecondsSince(LARGE_INTEGER from) {
    LARGE_INTEGER now, frequency;
    QueryPerformanceCounter(&now);
    QueryPerformanceFrequency(&frequency);
    return double(now.QuadPart - from.QuadPart) / double(frequency.QuadPart);
}

// The files collection of the receiver with this lookup key ("USB-<serial>").
inline HRESULT OpenReceiverFiles(const wchar_t* lookupKey, ComPtr<IFilesColl>& files) {
    ComPtr<IDeviceMgr> manager;
    HRESULT hr = CoCreateInstance(CLSID_DeviceMgr, nullptr, CLSCTX_LOCAL_SERVER, IID_IDeviceMgr, manager.PutVoid());
    ComPtr<IDispatch> receiversObject, receiverObject, filesObject;
    ComPtr<IReceiversColl> receivers;
    ComPtr<IReceiver> receiver;
    if (SUCCEEDED(hr)) hr = manager->get_Receivers(&receiversObject);
    if (SUCCEEDED(hr)) hr = receiversObject.QueryTo(IID_IReceiversColl, receivers.PutVoid());
    Bstr key(lookupKey);
    if (SUCCEEDED(hr)) hr = receivers->get_ItemByKey(key.Get(), &receiverObject);
    if (SUCCEEDED(hr)) hr = receiverObject.QueryTo(IID_IReceiver, receiver.PutVoid());
    if (SUCCEEDED(hr)) hr = receiver->get_Files(&filesObject);
    return SUCCEEDED(hr) ? filesObject.QueryTo(IID_IFilesColl, files.PutVoid()) : hr;
}

// One download into the stream, waited for; the result the finish event gave.
inline HRESULT DownloadThroughContract(IDispatch* fileObject, IStream* stream) {
    ComPtr<IReceiverFile> file;
    HRESULT hr = fileObject->QueryInterface(IID_IReceiverFile, file.PutVoid());
    if (FAILED(hr)) return hr;
    ComPtr<FinishSink> sink(new FinishSink());
    sink->Advise(fileObject);
    VARIANT destination;
    VariantInit(&destination);
    destination.vt = VT_UNKNOWN;
    destination.punkVal = stream;
    stream->AddRef();
    hr = file->Download(destination);
    VariantClear(&destination);
    while (SUCCEEDED(hr) && !sink->finished) PumpOnce();
    sink->Unadvise(fileObject);
    return FAILED(hr) ? hr : sink->result;
}
