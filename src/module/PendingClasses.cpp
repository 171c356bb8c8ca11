// Classes of the table whose behaviour is not built yet: they exist, count towards the
// module lock and answer IUnknown only, so the class table and its factories are complete.
#include "com/ComObject.h"
#include "module/ClassCreators.h"

namespace {
class PendingObject : public ComObjectRoot, public IUnknown {
public:
    BEGIN_INTERFACE_TABLE(PendingObject)
        INTERFACE_ENTRY(IUnknown)
    END_INTERFACE_TABLE()
};
}  // namespace

HRESULT CreateCalvexReceiversShellView(IUnknown* o, REFIID r, void** p) { return CreateComInstance<PendingObject>(o, r, p); }
