#pragma once
// A drop target that takes virtual files: it accepts a drag that carries a file descriptor,
// offers copy, and on the drop extracts the files at once (inside Drop, as Explorer does, so
// the source's download dialogs run while the source waits for the drop to end).
#include <windows.h>
#include <ole2.h>

#include <string>

#include "VirtualFiles.h"
#include "com/ComObject.h"

// Made with new, holding its creator's reference.
class PasteDropTarget : public RefCounted<PasteDropTarget, IDropTarget> {
public:
    PasteDropTarget(std::wstring targetDir, PasteReport report);

    BEGIN_INTERFACE_TABLE(PasteDropTarget)
        INTERFACE_ENTRY(IDropTarget)
    END_INTERFACE_TABLE()

    STDMETHODIMP DragEnter(IDataObject* data, DWORD keyState, POINTL point, DWORD* effect) override;
    STDMETHODIMP DragOver(DWORD keyState, POINTL point, DWORD* effect) override;
    STDMETHODIMP DragLeave() override;
    STDMETHODIMP Drop(IDataObject* data, DWORD keyState, POINTL point, DWORD* effect) override;

    bool Dropped() const { return m_dropped; }
    int Written() const { return m_written; }
    int Failed() const { return m_failed; }

private:
    ~PasteDropTarget() override = default;

    std::wstring m_targetDir;
    PasteReport m_report;
    bool m_acceptable = false;
    bool m_dropped = false;
    int m_written = 0;
    int m_failed = 0;
};
