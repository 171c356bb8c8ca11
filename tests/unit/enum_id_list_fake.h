#pragma once
// An in-process stand-in for the device manager's collections, receivers and files, with
// only what the enumerator calls. Every object counts itself alive in the shared log and
// records the property calls made on it; each answer can be made to fail.
#include <windows.h>
#include <oleauto.h>

#include <string>
#include <vector>

#include "CalvexDeviceMgrLib.h"

namespace fake {

struct Log {
    std::vector<std::string> calls;
    int live = 0;
};

template <class Interface>
class DispatchObject : public Interface {
public:
    DispatchObject(const IID& iid, Log* log, bool refuse = false) : m_log(log), m_iid(iid), m_refuse(refuse) {
        ++m_log->live;
    }
    virtual ~DispatchObject() { --m_log->live; }

    STDMETHODIMP QueryInterface(REFIID riid, void** ppv) override {
        *ppv = nullptr;
        if (IsEqualIID(riid, IID_IUnknown) || IsEqualIID(riid, IID_IDispatch) ||
            (!m_refuse && IsEqualIID(riid, m_iid))) {
            *ppv = static_cast<Interface*>(this);
            AddRef();
            return S_OK;
        }
        return E_NOINTERFACE;
    }
    STDMETHODIMP_(ULONG) AddRef() override { return ++m_refs; }
    STDMETHODIMP_(ULONG) Release() override {
        ULONG count = --m_refs;
        if (count == 0) delete this;
        return count;
    }
    STDMETHODIMP GetTypeInfoCount(UINT* count) override { *count = 0; return S_OK; }
    STDMETHODIMP GetTypeInfo(UINT, LCID, ITypeInfo**) override { return E_NOTIMPL; }
    STDMETHODIMP GetIDsOfNames(REFIID, LPOLESTR*, UINT, LCID, DISPID*) override { return E_NOTIMPL; }
    STDMETHODIMP Invoke(DISPID, REFIID, LCID, WORD, DISPPARAMS*, VARIANT*, EXCEPINFO*, UINT*) override {
        return E_NOTIMPL;
    }

protected:
    void Called(const char* name) { m_log->calls.push_back(name); }
    static HRESULT Text(const wchar_t* value, BSTR* out, HRESULT result) {
        *out = value ? SysAllocString(value) : nullptr;
        return result;
    }
    Log* m_log;

private:
    const IID& m_iid;
    bool m_refuse;
    ULONG m_refs = 1;
};

// What get_Item gives for one index.
struct ItemAnswer {
    HRESULT result = S_OK;
    bool null = false;           // S_OK without an object
    bool refuseInterface = false;
};

struct ReceiverSpec {
    long brand = 1;
    const wchar_t* label = L"Base";
    const wchar_t* serial = L"123";
    const wchar_t* model = L"M1";
    long portType = 1;
    const wchar_t* portName = L"COM3";
    HRESULT brandResult = S_OK;
    HRESULT labelResult = S_OK;
    ItemAnswer item;
};

struct FileSpec {
    const wchar_t* name = L"LOG1";
    long size = 0;
    DATE time = 0;
    HRESULT sizeResult = S_OK;
    ItemAnswer item;
};

class Receiver : public DispatchObject<IReceiver> {
public:
    Receiver(const ReceiverSpec& spec, Log* log) : DispatchObject(IID_IReceiver, log, spec.item.refuseInterface), m_spec(spec) {}
    STDMETHODIMP get_Files(IDispatch** files) override { Called("get_Files"); *files = nullptr; return E_NOTIMPL; }
    STDMETHODIMP get_Connected(VARIANT_BOOL*) override { Called("get_Connected"); return E_NOTIMPL; }
    STDMETHODIMP get_FirmwareVersion(BSTR*) override { Called("get_FirmwareVersion"); return E_NOTIMPL; }
    STDMETHODIMP get_PortName(BSTR* value) override { Called("get_PortName"); return Text(m_spec.portName, value, S_OK); }
    STDMETHODIMP get_PortType(LONG* value) override { Called("get_PortType"); *value = m_spec.portType; return S_OK; }
    STDMETHODIMP get_SerialNumber(BSTR* value) override { Called("get_SerialNumber"); return Text(m_spec.serial, value, S_OK); }
    STDMETHODIMP get_Model(BSTR* value) override { Called("get_Model"); return Text(m_spec.model, value, S_OK); }
    STDMETHODIMP get_Brand(LONG* value) override { Called("get_Brand"); *value = m_spec.brand; return m_spec.brandResult; }
    STDMETHODIMP get_BatteryLevel(LONG*) override { Called("get_BatteryLevel"); return E_NOTIMPL; }
    STDMETHODIMP get_FreeMemory(LONG*) override { Called("get_FreeMemory"); return E_NOTIMPL; }
    STDMETHODIMP get_Label(BSTR* value) override { Called("get_Label"); return Text(m_spec.label, value, m_spec.labelResult); }

private:
    ReceiverSpec m_spec;
};

class File : public DispatchObject<IReceiverFile> {
public:
    File(const FileSpec& spec, Log* log) : DispatchObject(IID_IReceiverFile, log, spec.item.refuseInterface), m_spec(spec) {}
    STDMETHODIMP get_Name(BSTR* value) override { Called("get_Name"); return Text(m_spec.name, value, S_OK); }
    STDMETHODIMP get_Receiver(IDispatch** value) override { *value = nullptr; return E_NOTIMPL; }
    STDMETHODIMP get_Size(LONG* value) override {
        Called("get_Size");
        if (SUCCEEDED(m_spec.sizeResult)) *value = m_spec.size;
        return m_spec.sizeResult;
    }
    STDMETHODIMP get_Time(DATE* value) override { Called("get_Time"); *value = m_spec.time; return S_OK; }
    STDMETHODIMP Delete() override { return E_NOTIMPL; }
    STDMETHODIMP Download(VARIANT) override { return E_NOTIMPL; }
    STDMETHODIMP get_Downloading(VARIANT_BOOL*) override { return E_NOTIMPL; }
    STDMETHODIMP Cancel() override { return E_NOTIMPL; }

private:
    FileSpec m_spec;
};

// get_Item of either collection: the spec's answer, then a new object for the index.
template <class Object, class Spec>
HRESULT AnswerItem(const std::vector<Spec>& specs, LONG index, IDispatch** out, Log* log) {
    *out = nullptr;
    if (index < 0 || static_cast<size_t>(index) >= specs.size()) return E_INVALIDARG;
    const Spec& spec = specs[static_cast<size_t>(index)];
    if (FAILED(spec.item.result) || spec.item.null) return spec.item.result;
    *out = new Object(spec, log);
    return S_OK;
}

class ReceiversColl : public DispatchObject<IReceiversColl> {
public:
    ReceiversColl(std::vector<ReceiverSpec> specs, Log* log) : DispatchObject(IID_IReceiversColl, log), m_specs(std::move(specs)) {}
    STDMETHODIMP get__NewEnum(IUnknown** value) override { *value = nullptr; return E_NOTIMPL; }
    STDMETHODIMP get_Item(LONG index, IDispatch** out) override {
        Called("get_Item");
        return AnswerItem<Receiver>(m_specs, index, out, m_log);
    }
    STDMETHODIMP get_Count(LONG* count) override { Called("get_Count"); *count = static_cast<LONG>(m_specs.size()); return S_OK; }
    STDMETHODIMP get_ItemBySerialNumber(BSTR, IDispatch** out) override { *out = nullptr; return E_NOTIMPL; }
    STDMETHODIMP get_ItemByKey(BSTR, IDispatch** out) override { *out = nullptr; return E_NOTIMPL; }

private:
    std::vector<ReceiverSpec> m_specs;
};

class FilesColl : public DispatchObject<IFilesColl> {
public:
    FilesColl(std::vector<FileSpec> specs, Log* log) : DispatchObject(IID_IFilesColl, log), m_specs(std::move(specs)) {}
    STDMETHODIMP get__NewEnum(IUnknown** value) override { *value = nullptr; return E_NOTIMPL; }
    STDMETHODIMP get_Item(LONG index, IDispatch** out) override {
        Called("get_Item");
        return AnswerItem<File>(m_specs, index, out, m_log);
    }
    STDMETHODIMP get_Count(LONG* count) override { Called("get_Count"); *count = static_cast<LONG>(m_specs.size()); return S_OK; }
    STDMETHODIMP get_ItemByName(BSTR, IDispatch** out) override { *out = nullptr; return E_NOTIMPL; }

private:
    std::vector<FileSpec> m_specs;
};

}  // namespace fake
