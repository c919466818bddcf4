// Qmx_CorrManagedExpRelPool: a pool of 128 explicit relationships (see Qmx_ObjectPoolT); all
// relationships belong to container id 0.
#ifndef QMX_CORRMANAGEDEXPRELPOOL_H
#define QMX_CORRMANAGEDEXPRELPOOL_H
#include "QmxCorrExport.h"
#include "Qmx_CorrManagedExplicitRelationship.h"
#include "Qmx_ObjectPoolT.h"

class QMX_CORR_EXPORT Qmx_CorrManagedExpRelPool
    : public Qmx_ObjectPoolT<Qmx_CorrManagedExplicitRelationship, 128> {
public:
    ~Qmx_CorrManagedExpRelPool() override;
};

#endif
