// Qmx_CorrItemRelOverflowMgr: the explicit-relationship lists of items that do not fit the
// one inline handle of an item record (selector 0 incoming, 1 outgoing), kept under the
// item's pool handle and archived to the stream "item_rel_overflow" in the layout of
// Qmx_CorrOverflowMgrT. Its elements are written as pool handles. Created by the data
// manager with a new swizzler of the item pool manager, which it owns. One thread at a time.
#ifndef QMX_CORRITEMRELOVERFLOWMGR_H
#define QMX_CORRITEMRELOVERFLOWMGR_H
#include "QmxCorrExport.h"
#include "Qmx_CorrItemRelOverflowMgrI.h"
#include "Qmx_CorrOverflowMgrT.h"
#include "Qmx_CorrStorage.h"

// How this manager's stream and errors differ from the other overflow manager's.
struct Qmx_CorrItemRelOverflowTraits {
    static constexpr const char* kSourceFile = "s/Qmx_CorrItemRelOverflowMgr";
    static constexpr const char* kRevision = "1";
    static void WriteElement(Qmx_CorrStorage& storage, unsigned int handle) {
        storage.WriteHandle(handle);
    }
    static unsigned int ReadElement(Qmx_CorrStorage& storage) { return storage.ReadHandle(); }
};

class QMX_CORR_EXPORT Qmx_CorrItemRelOverflowMgr
    : public Qmx_CorrOverflowMgrT<Qmx_CorrManagedItem, Qmx_CorrItemRelOverflowMgrI,
                                  Qmx_CorrItemRelOverflowTraits> {
public:
    // Takes ownership of `swizzler` (the item pool manager's). REQUIRES: not null.
    explicit Qmx_CorrItemRelOverflowMgr(Swizzler* swizzler);
    ~Qmx_CorrItemRelOverflowMgr() override;
};

#endif
