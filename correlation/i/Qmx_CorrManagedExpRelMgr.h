// Qmx_CorrManagedExpRelMgr: the pool manager of a database's explicit relationships (see
// Qmx_CorrObjMgrT), with its pool stream "Qmx_CorrManagedExpRelMgr" and free-pool stream
// "Qmx_CorrManagedExpRelMgr_Data". Owned by the data manager. One thread at a time.
#ifndef QMX_CORRMANAGEDEXPRELMGR_H
#define QMX_CORRMANAGEDEXPRELMGR_H
#include "QmxCorrExport.h"
#include "Qmx_CorrManagedExpRelPool.h"
#include "Qmx_CorrObjMgrT.h"

class QMX_CORR_EXPORT Qmx_CorrManagedExpRelMgr
    : public Qmx_CorrObjMgrTData::Qmx_CorrObjMgrT<Qmx_CorrManagedExplicitRelationship, unsigned int,
                                                  Qmx_CorrManagedExpRelPool> {
public:
    // `recordSize` is Qmx_CorrManagedExplicitRelationship::GetArchiveSize (28).
    explicit Qmx_CorrManagedExpRelMgr(unsigned int recordSize);
    ~Qmx_CorrManagedExpRelMgr() override;

    // A new relationship without items, on the default relationship data; null when no slot
    // can be had.
    Qmx_CorrManagedExplicitRelationship* CreateManagedExpRel(Qmx_CorrObjectOwner* owner);
};

#endif
