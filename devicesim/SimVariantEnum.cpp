#include "SimVariantEnum.h"

#include <utility>

#include "SimCreate.h"

SimVariantEnum::SimVariantEnum(std::vector<ComPtr<IDispatch>> items, ULONG position)
    : m_items(std::move(items)), m_position(position) {}

HRESULT SimVariantEnum::Create(std::vector<ComPtr<IDispatch>> items, IUnknown** out) {
    return CreateSimObject<SimVariantEnum>(out, std::move(items));
}

STDMETHODIMP SimVariantEnum::Next(ULONG count, VARIANT* items, ULONG* fetched) {
    if (fetched) *fetched = 0;
    if (!items || (count > 1 && !fetched)) return E_POINTER;
    ULONG done = 0;
    for (; done < count && m_position < m_items.size(); ++done, ++m_position) {
        VariantInit(&items[done]);
        items[done].vt = VT_DISPATCH;
        m_items[m_position].CopyTo(&items[done].pdispVal);
    }
    if (fetched) *fetched = done;
    return done == count ? S_OK : S_FALSE;
}

STDMETHODIMP SimVariantEnum::Skip(ULONG count) {
    ULONG left = static_cast<ULONG>(m_items.size()) - m_position;
    m_position += count < left ? count : left;
    return count <= left ? S_OK : S_FALSE;
}

STDMETHODIMP SimVariantEnum::Reset() {
    m_position = 0;
    return S_OK;
}

STDMETHODIMP SimVariantEnum::Clone(IEnumVARIANT** copy) {
    if (!copy) return E_POINTER;
    return CreateSimObject<SimVariantEnum>(copy, m_items, m_position);
}
