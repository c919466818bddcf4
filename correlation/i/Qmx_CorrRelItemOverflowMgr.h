// Qmx_CorrRelItemOverflowMgr: the item lists of explicit relationships that do not fit the
// two inline handles of a relationship record (selector 0 sources, 1 destinations), kept
// under the relationship's pool handle and archived to the stream "rel_item_overflow" in the
// layout of Qmx_CorrOverflowMgrT. Its elements are written as UINT32 (the same four bytes as
// a handle). Created by the data manager with a new swizzler of the explicit-relationship
// pool manager, which it owns. One thread at a time.
#ifndef QMX_CORRRELITEMOVERFLOWMGR_H
#define QMX_CORRRELITEMOVERFLOWMGR_H
#include "QmxCorrExport.h"
#include "Qmx_CorrOverflowMgrT.h"
#include "Qmx_CorrRelItemOverflowMgrI.h"
#include "Qmx_CorrStorage.h"

// How this manager's stream and errors differ from the other overflow manager's.
struct Qmx_CorrRelItemOverflowTraits {
    static constexpr const char* kSourceFile = "s/Qmx_CorrRelItemOverflowMgr";
    static constexpr const char* kRevision = "1";
    static void WriteElement(Qmx_CorrStorage& storage, unsigned int handle) {
        storage.WriteUINT32(handle);
    }
    static unsigned int ReadElement(Qmx_CorrStorage& storage) { return storage.ReadUINT32(); }
};

class QMX_CORR_EXPORT Qmx_CorrRelItemOverflowMgr
    : public Qmx_CorrOverflowMgrT<Qmx_CorrManagedExplicitRelationship, Qmx_CorrRelItemOverflowMgrI,
                                  Qmx_CorrRelItemOverflowTraits> {
public:
    // Takes ownership of `swizzler` (the explicit-relationship pool manager's). REQUIRES: not
    // null.
    explicit Qmx_CorrRelItemOverflowMgr(Swizzler* swizzler);
    ~Qmx_CorrRelItemOverflowMgr() override;
};

#endif
