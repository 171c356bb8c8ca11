#include "module/ModuleApp.h"

#include <vector>

#include "com/Handles.h"
#include "module/ClassIds.h"
#include "module/ClassTable.h"
#include "module/Settings.h"
#include "resources/resource.h"
#include "trace/TraceLog.h"

extern "C" IMAGE_DOS_HEADER __ImageBase;

HINSTANCE ModuleInstance() { return reinterpret_cast<HINSTANCE>(&__ImageBase); }

HINSTANCE ResourceInstance() {
    HINSTANCE instance = CModuleApp::Instance().resourceInstance;
    return instance ? instance : ModuleInstance();
}
DisplayState& Display() { return CModuleApp::Instance().display; }
HIMAGELIST LargeImageList() { return CModuleApp::Instance().largeImages; }
HIMAGELIST SmallImageList() { return CModuleApp::Instance().smallImages; }
UINT UpdateFolderMessage() { return CModuleApp::Instance().updateFolderMessage; }
UINT ViewNotificationMessage() { return CModuleApp::Instance().viewNotificationMessage; }

std::wstring LoadModuleString(UINT id) {
    const wchar_t* text = nullptr;
    int length = LoadStringW(ResourceInstance(), id, reinterpret_cast<LPWSTR>(&text), 0);
    return length > 0 ? std::wstring(text, static_cast<size_t>(length)) : std::wstring();
}

CModuleApp& CModuleApp::Instance() {
    static CModuleApp app;
    return app;
}

HRESULT CModuleApp::EnsureInitialized() {
    InitOnceExecuteOnce(
        &m_once,
        [](PINIT_ONCE, PVOID self, PVOID*) -> BOOL {
            auto* app = static_cast<CModuleApp*>(self);
            app->m_initResult = app->InitInstance();
            app->m_initialized = SUCCEEDED(app->m_initResult);
            return TRUE;
        },
        this, nullptr);
    return m_initialized ? S_OK : E_UNEXPECTED;
}

HRESULT CModuleApp::InitInstance() {
    OpenTraceLog();
    TraceA("CModuleApp::InitInstance\r\n");
    TraceModuleIdentity();

    typeLibrary = LIBID_CalvexReceiversShellExtLib;
    CallClassStartHooks();

    resourceInstance = ModuleInstance();
    const HRESULT result = S_OK;  // the base initialisation has nothing that can fail

    ReadDisplaySettings(display);
    RebuildImageLists();
    updateFolderMessage = RegisterWindowMessageW(L"CalvexReceiversShellExt - Update Folder");
    viewNotificationMessage = RegisterWindowMessageW(L"CCalvexReceiversShellView - Notification Message");
    return result;
}

void CModuleApp::ExitInstance(bool processTerminating) {
    if (!m_initialized) return;
    TraceA("CModuleApp::ExitInstance\r\n");
    WriteDisplaySettings(display);
    // At process exit the image lists and windows go with the process; destroying them then
    // would call into user32 from other threads' leftovers.
    if (!processTerminating) DestroyImageLists();
    TerminateClassTable();
    CloseTraceLog();
    m_initialized = false;
}

void CModuleApp::TraceModuleIdentity() {
    wchar_t path[MAX_PATH] = L"";
    DWORD length = GetModuleFileNameW(ModuleInstance(), path, MAX_PATH);
    if (length == 0 || length >= MAX_PATH) return;
    DWORD ignored = 0;
    DWORD size = GetFileVersionInfoSizeW(path, &ignored);
    if (size == 0) return;
    std::vector<BYTE> block(size);
    if (!GetFileVersionInfoW(path, 0, size, block.data())) return;
    VS_FIXEDFILEINFO* info = nullptr;
    UINT infoLength = 0;
    if (!VerQueryValueW(block.data(), L"\\", reinterpret_cast<void**>(&info), &infoLength) || !info)
        return;
    TraceW(L"Module is loaded [%s] [%u.%u.%u.%u]\r\n", path, HIWORD(info->dwFileVersionMS),
           LOWORD(info->dwFileVersionMS), HIWORD(info->dwFileVersionLS), LOWORD(info->dwFileVersionLS));
}

void CModuleApp::DestroyImageLists() {
    if (largeImages) ImageList_Destroy(largeImages);
    if (smallImages) ImageList_Destroy(smallImages);
    largeImages = smallImages = nullptr;
}

void CModuleApp::RebuildImageLists() {
    DestroyImageLists();
    static const WORD icons[] = {IDI_CALVEX, IDI_BRENNOR, IDI_CALVEX, IDI_BRENNOR, IDI_NOITEM, IDI_FILE};
    auto build = [](int cx, int cy) {
        HIMAGELIST list = ImageList_Create(cx, cy, ILC_COLOR32, 4, 0);
        if (!list) return list;
        for (WORD id : icons) {
            UniqueIcon icon(static_cast<HICON>(LoadImageW(ResourceInstance(), MAKEINTRESOURCEW(id),
                                                          IMAGE_ICON, cx, cy, LR_CREATEDIBSECTION)));
            ImageList_ReplaceIcon(list, -1, icon.Get());
        }
        return list;
    };
    largeImages = build(GetSystemMetrics(SM_CXICON), GetSystemMetrics(SM_CYICON));
    smallImages = build(GetSystemMetrics(SM_CXSMICON), GetSystemMetrics(SM_CYSMICON));
}
