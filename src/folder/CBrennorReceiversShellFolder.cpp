#include "folder/CBrennorReceiversShellFolder.h"

#include "module/ClassCreators.h"

HRESULT CreateBrennorReceiversShellFolder(IUnknown* outer, REFIID riid, void** ppv) {
    return CreateComInstance<CBrennorReceiversShellFolder>(outer, riid, ppv);
}
