#include "transfer/CCalvexReceiversContextMenu.h"

#include "module/ClassCreators.h"
#include "trace/TraceLog.h"

HRESULT CreateCalvexReceiversContextMenu(IUnknown* outer, REFIID riid, void** ppv) {
    return CreateComInstance<CCalvexReceiversContextMenu>(outer, riid, ppv);
}

namespace {
// Narrow text copied into a buffer that the caller asked to be wide, bounded by cchMax as a
// byte count: a wide reader sees the bytes of the narrow text. Kept as it always was.
void CopyNarrow(LPSTR buffer, const char* text, UINT cchMax) {
    lstrcpynA(buffer, text, static_cast<int>(cchMax));
}
}  // namespace

STDMETHODIMP CCalvexReceiversContextMenu::QueryContextMenu(HMENU menu, UINT indexMenu, UINT idCmdFirst,
                                                           UINT idCmdLast, UINT flags) {
    TraceA("CCalvexReceiversContextMenu::QueryContextMenu\r\n");
    if (flags & CMF_DEFAULTONLY) return MAKE_HRESULT(SEVERITY_SUCCESS, FACILITY_NULL, 0);
    // The last id is not checked and a failed insertion still reports one id used.
    InsertMenuW(menu, indexMenu, MF_BYPOSITION, idCmdFirst, L"&Sample Explorer Bar Command");
    return MAKE_HRESULT(SEVERITY_SUCCESS, FACILITY_NULL, 1);
}

STDMETHODIMP CCalvexReceiversContextMenu::InvokeCommand(LPCMINVOKECOMMANDINFO info) {
    TraceA("CCalvexReceiversContextMenu::InvokeCommand\r\n");
    // Only command offset 0 is ours; verbs given as strings are refused, even "command".
    if (!info || info->lpVerb) return E_INVALIDARG;
    MessageBoxW(info->hwnd, L"Explorer Bar Command selected.", L"Sample Explorer Bar", MB_ICONINFORMATION);
    return S_OK;
}

STDMETHODIMP CCalvexReceiversContextMenu::GetCommandString(UINT_PTR idCmd, UINT type, UINT* reserved, LPSTR name,
                                                           UINT cchMax) {
    TraceA("CCalvexReceiversContextMenu::GetCommandString\r\n");
    switch (type) {
    case GCS_VERBW:
        if (idCmd != 0) return E_INVALIDARG;
        CopyNarrow(name, "command", cchMax);
        return S_OK;
    case GCS_HELPTEXTW:
        if (idCmd != 0) return E_INVALIDARG;
        CopyNarrow(name, "Explorer Bar command help text", cchMax);
        return S_OK;
    case GCS_VALIDATEW:
        return S_OK;
    default:
        return E_INVALIDARG;
    }
}
