#pragma once
// A files collection and its files that forward every call to the device manager's proxies
// and count each one by name, so the benchmark can say how many round trips an enumeration
// makes. Releases are counted only when they reach the proxy for good (that one is a call to
// the server; the proxy keeps earlier AddRef/Release pairs to itself).
#include <windows.h>

#include <map>
#include <string>

#include "CalvexDeviceMgrLib.h"
#include "com/ComPtr.h"

using CallCounts = std::map<std::string, long>;

template <class Interface>
class CountingDispatch : public Interface {
public:
    explicit CountingDispatch(CallCounts* counts) : m_counts(counts) {}
    virtual ~CountingDispatch() = default;

    STDMETHODIMP_(ULONG) AddRef() override { return ++m_refs; }
    STDMETHODIMP_(ULONG) Release() override {
        const ULONG count = --m_refs;
        if (count == 0) {
            Count("Release");
            delete this;
        }
        return count;
    }
    STDMETHODIMP GetTypeInfoCount(UINT* count) override { return Real()->GetTypeInfoCount(count); }
    STDMETHODIMP GetTypeInfo(UINT i, LCID l, ITypeInfo** t) override { return Real()->GetTypeInfo(i, l, t); }
    STDMETHODIMP GetIDsOfNames(REFIID r, LPOLESTR* n, UINT c, LCID l, DISPID* d) override {
        return Real()->GetIDsOfNames(r, n, c, l, d);
    }
    STDMETHODIMP Invoke(DISPID d, REFIID r, LCID l, WORD f, DISPPARAMS* p, VARIANT* v, EXCEPINFO* e, UINT* a) override {
        return Real()->Invoke(d, r, l, f, p, v, e, a);
    }

protected:
    virtual IDispatch* Real() = 0;
    void Count(const char* name) { ++(*m_counts)[name]; }
    CallCounts* m_counts;

private:
    ULONG m_refs = 1;
};

// One file as get_Item hands it out: an IDispatch until it is queried for IReceiverFile.
class CountingFile : public CountingDispatch<IReceiverFile> {
public:
    CountingFile(IDispatch* item, CallCounts* counts) : CountingDispatch(counts), m_item(item) {}

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        *ppv = nullptr;
        if (IsEqualIID(riid, IID_IUnknown) || IsEqualIID(riid, IID_IDispatch)) {
            *ppv = static_cast<IReceiverFile*>(this);
            AddRef();
            return S_OK;
        }
        Count("QueryInterface");
        ComPtr<IReceiverFile> file;
        HRESULT hr = m_item->QueryInterface(riid, file.PutVoid());
        if (FAILED(hr)) return hr;
        if (!IsEqualIID(riid, IID_IReceiverFile)) return E_NOINTERFACE;
        m_file = file;
        *ppv = static_cast<IReceiverFile*>(this);
        AddRef();
        return S_OK;
    }
    STDMETHODIMP get_Name(BSTR* v) override { Count("get_Name"); return m_file->get_Name(v); }
    STDMETHODIMP get_Receiver(IDispatch** v) override { Count("get_Receiver"); return m_file->get_Receiver(v); }
    STDMETHODIMP get_Size(LONG* v) override { Count("get_Size"); return m_file->get_Size(v); }
    STDMETHODIMP get_Time(DATE* v) override { Count("get_Time"); return m_file->get_Time(v); }
    STDMETHODIMP Delete() override { Count("Delete"); return m_file->Delete(); }
    STDMETHODIMP Download(VARIANT v) override { Count("Download"); return m_file->Download(v); }
    STDMETHODIMP get_Downloading(VARIANT_BOOL* v) override { Count("get_Downloading"); return m_file->get_Downloading(v); }
    STDMETHODIMP Cancel() override { Count("Cancel"); return m_file->Cancel(); }

private:
    IDispatch* Real() override { return m_item.Get(); }
    ComPtr<IDispatch> m_item;
    ComPtr<IReceiverFile> m_file;
};

class CountingFilesColl : public CountingDispatch<IFilesColl> {
public:
    CountingFilesColl(IFilesColl* files, CallCounts* counts) : CountingDispatch(counts), m_files(files) {}

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        *ppv = nullptr;
        if (!IsEqualIID(riid, IID_IUnknown) && !IsEqualIID(riid, IID_IDispatch) && !IsEqualIID(riid, IID_IFilesColl))
            return E_NOINTERFACE;
        *ppv = static_cast<IFilesColl*>(this);
        AddRef();
        return S_OK;
    }
    STDMETHODIMP get__NewEnum(IUnknown** v) override { Count("get__NewEnum"); return m_files->get__NewEnum(v); }
    STDMETHODIMP get_Item(LONG index, IDispatch** out) override {
        Count("get_Item");
        *out = nullptr;
        ComPtr<IDispatch> item;
        HRESULT hr = m_files->get_Item(index, &item);
        if (SUCCEEDED(hr) && item) *out = new CountingFile(item.Get(), m_counts);
        return hr;
    }
    STDMETHODIMP get_Count(LONG* v) override { Count("get_Count"); return m_files->get_Count(v); }
    STDMETHODIMP get_ItemByName(BSTR n, IDispatch** v) override { Count("get_ItemByName"); return m_files->get_ItemByName(n, v); }

private:
    IDispatch* Real() override { return m_files.Get(); }
    ComPtr<IFilesColl> m_files;
};
