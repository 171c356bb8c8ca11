#include "PasteDropTarget.h"

#include <shlobj.h>

PasteDropTarget::PasteDropTarget(std::wstring targetDir, PasteReport report)
    : RefCounted(1), m_targetDir(std::move(targetDir)), m_report(std::move(report)) {}

STDMETHODIMP PasteDropTarget::DragEnter(IDataObject* data, DWORD, POINTL, DWORD* effect) {
    FORMATETC format = {static_cast<CLIPFORMAT>(RegisterClipboardFormatW(CFSTR_FILEDESCRIPTORW)), nullptr,
                        DVASPECT_CONTENT, -1, TYMED_HGLOBAL};
    m_acceptable = data && data->QueryGetData(&format) == S_OK;
    *effect = m_acceptable ? (*effect & DROPEFFECT_COPY) : DROPEFFECT_NONE;
    return S_OK;
}

STDMETHODIMP PasteDropTarget::DragOver(DWORD, POINTL, DWORD* effect) {
    *effect = m_acceptable ? (*effect & DROPEFFECT_COPY) : DROPEFFECT_NONE;
    return S_OK;
}

STDMETHODIMP PasteDropTarget::DragLeave() {
    m_acceptable = false;
    return S_OK;
}

STDMETHODIMP PasteDropTarget::Drop(IDataObject* data, DWORD, POINTL, DWORD* effect) {
    if (!m_acceptable || !data) {
        *effect = DROPEFFECT_NONE;
        return S_OK;
    }
    m_dropped = true;
    m_written = PasteVirtualFiles(data, m_targetDir, m_report, m_failed);
    *effect = m_failed == 0 ? DROPEFFECT_COPY : DROPEFFECT_NONE;
    return S_OK;
}
