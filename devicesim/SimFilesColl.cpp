#include "SimFilesColl.h"

#include <utility>

#include "SimCreate.h"
#include "SimReceiverFile.h"
#include "SimResults.h"
#include "SimVariantEnum.h"

SimFilesColl::SimFilesColl(std::shared_ptr<SimModel> model, std::shared_ptr<SimReceiverRecord> record)
    : SimEventSource(DIID__IFilesCollEvents), m_model(std::move(model)), m_record(std::move(record)) {
    m_model->AddListener(this);
}

SimFilesColl::~SimFilesColl() { m_model->RemoveListener(this); }

HRESULT SimFilesColl::Create(const std::shared_ptr<SimModel>& model,
                             const std::shared_ptr<SimReceiverRecord>& record, IDispatch** out) {
    return CreateSimObject<SimFilesColl>(out, model, record);
}

STDMETHODIMP SimFilesColl::get__NewEnum(IUnknown** enumerator) {
    if (!enumerator) return E_POINTER;
    *enumerator = nullptr;
    HRESULT hr = m_model->CallFault(L"IFilesColl.get__NewEnum", m_record.get());
    if (FAILED(hr)) return hr;
    std::vector<ComPtr<IDispatch>> items;
    for (const auto& file : m_record->files) {
        ComPtr<IDispatch> item;
        if (SUCCEEDED(SimReceiverFile::Create(m_model, m_record, file, &item))) items.push_back(item);
    }
    return SimVariantEnum::Create(std::move(items), enumerator);
}

STDMETHODIMP SimFilesColl::get_Item(LONG index, IDispatch** file) {
    if (!file) return E_POINTER;
    *file = nullptr;
    if (index < 0 || static_cast<size_t>(index) >= m_record->files.size()) return E_INVALIDARG;
    const auto& record = m_record->files[static_cast<size_t>(index)];
    HRESULT hr = m_model->CallFault(L"IFilesColl.get_Item", m_record.get(), record->name);
    if (FAILED(hr)) return hr;
    HRESULT created = SimReceiverFile::Create(m_model, m_record, record, file);
    return FAILED(created) ? created : hr;
}

STDMETHODIMP SimFilesColl::get_Count(LONG* count) {
    return SimHandOut<LONG>(m_model->CallFault(L"IFilesColl.get_Count", m_record.get()),
                            static_cast<LONG>(m_record->files.size()), count);
}

STDMETHODIMP SimFilesColl::get_ItemByName(BSTR name, IDispatch** file) {
    if (!file) return E_POINTER;
    *file = nullptr;
    const std::wstring text = name ? std::wstring(name, SysStringLen(name)) : std::wstring();
    auto record = m_record->FindFile(text);
    if (!record) return E_INVALIDARG;
    HRESULT hr = m_model->CallFault(L"IFilesColl.get_ItemByName", m_record.get(), record->name);
    if (FAILED(hr)) return hr;
    HRESULT created = SimReceiverFile::Create(m_model, m_record, record, file);
    return FAILED(created) ? created : hr;
}

void SimFilesColl::OnTreeEvent(const SimTreeEvent& event) {
    if (event.receiver != m_record) return;
    DISPID id = event.kind == SimTreeEvent::FileAdded ? 1 : event.kind == SimTreeEvent::FileDeleted ? 2 : 0;
    if (id == 0) return;
    ComPtr<IDispatch> file;
    if (SUCCEEDED(SimReceiverFile::Create(m_model, m_record, event.file, &file))) m_point.Fire(id, file.Get());
}
