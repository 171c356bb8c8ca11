#include "SimReceiver.h"

#include <utility>

#include "SimCreate.h"
#include "SimFilesColl.h"
#include "SimResults.h"

SimReceiver::SimReceiver(std::shared_ptr<SimModel> model, std::shared_ptr<SimReceiverRecord> record)
    : m_model(std::move(model)), m_record(std::move(record)) {}

HRESULT SimReceiver::Create(const std::shared_ptr<SimModel>& model,
                            const std::shared_ptr<SimReceiverRecord>& record, IDispatch** out) {
    return CreateSimObject<SimReceiver>(out, model, record);
}

STDMETHODIMP SimReceiver::get_Files(IDispatch** files) {
    if (!files) return E_POINTER;
    *files = nullptr;
    HRESULT hr = Fault(L"IReceiver.get_Files");
    if (FAILED(hr)) return hr;
    if (!m_files) {
        HRESULT created = SimFilesColl::Create(m_model, m_record, m_files.ReleaseAndGetAddressOf());
        if (FAILED(created)) return created;
    }
    m_files.CopyTo(files);
    return hr;
}

STDMETHODIMP SimReceiver::get_Connected(VARIANT_BOOL* connected) {
    return SimHandOut<VARIANT_BOOL>(Fault(L"IReceiver.get_Connected"), m_record->online ? VARIANT_TRUE : VARIANT_FALSE,
                                    connected);
}

STDMETHODIMP SimReceiver::get_FirmwareVersion(BSTR* version) {
    return SimHandOutText(Fault(L"IReceiver.get_FirmwareVersion"), Description().firmwareVersion, version);
}

STDMETHODIMP SimReceiver::get_PortName(BSTR* portName) {
    return SimHandOutText(Fault(L"IReceiver.get_PortName"), Description().portName, portName);
}

STDMETHODIMP SimReceiver::get_PortType(LONG* portType) {
    return SimHandOut<LONG>(Fault(L"IReceiver.get_PortType"), Description().portType, portType);
}

STDMETHODIMP SimReceiver::get_SerialNumber(BSTR* serialNumber) {
    return SimHandOutText(Fault(L"IReceiver.get_SerialNumber"), Description().serialNumber, serialNumber);
}

STDMETHODIMP SimReceiver::get_Model(BSTR* model) {
    return SimHandOutText(Fault(L"IReceiver.get_Model"), Description().model, model);
}

STDMETHODIMP SimReceiver::get_Brand(LONG* brand) {
    return SimHandOut<LONG>(Fault(L"IReceiver.get_Brand"), Description().brand, brand);
}

STDMETHODIMP SimReceiver::get_BatteryLevel(LONG* percent) {
    return SimHandOut<LONG>(Fault(L"IReceiver.get_BatteryLevel"), Description().batteryLevel, percent);
}

STDMETHODIMP SimReceiver::get_FreeMemory(LONG* bytes) {
    return SimHandOut<LONG>(Fault(L"IReceiver.get_FreeMemory"), Description().freeMemory, bytes);
}

STDMETHODIMP SimReceiver::get_Label(BSTR* label) {
    return SimHandOutText(Fault(L"IReceiver.get_Label"), Description().label, label);
}
