// Qmx_CorrManagedItemPool: a pool of 128 items of one container (see Qmx_ObjectPoolT).
#ifndef QMX_CORRMANAGEDITEMPOOL_H
#define QMX_CORRMANAGEDITEMPOOL_H
#include "QmxCorrExport.h"
#include "Qmx_CorrManagedItem.h"
#include "Qmx_ObjectPoolT.h"

class QMX_CORR_EXPORT Qmx_CorrManagedItemPool : public Qmx_ObjectPoolT<Qmx_CorrManagedItem, 128> {
public:
    ~Qmx_CorrManagedItemPool() override;
};

#endif
