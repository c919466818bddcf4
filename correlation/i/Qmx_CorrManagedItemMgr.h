// Qmx_CorrManagedItemMgr: the pool manager of a database's items (see Qmx_CorrObjMgrT), with
// its pool stream "Qmx_CorrManagedItemMgr" and free-pool stream "Qmx_CorrManagedItemMgr_Data".
// Owned by the data manager. One thread at a time.
#ifndef QMX_CORRMANAGEDITEMMGR_H
#define QMX_CORRMANAGEDITEMMGR_H
#include "QmxCorrExport.h"
#include "Qmx_CorrManagedItemPool.h"
#include "Qmx_CorrObjMgrT.h"

class QMX_CORR_EXPORT Qmx_CorrManagedItemMgr
    : public Qmx_CorrObjMgrTData::Qmx_CorrObjMgrT<Qmx_CorrManagedItem, unsigned int,
                                                  Qmx_CorrManagedItemPool> {
public:
    // `recordSize` is Qmx_CorrManagedItem::GetArchiveSize of the database's owner.
    explicit Qmx_CorrManagedItemMgr(unsigned int recordSize);
    ~Qmx_CorrManagedItemMgr() override;

    // A new item in a pool of `containerId`, sharing `name` (one more reference); null when
    // no slot can be had.
    Qmx_CorrManagedItem* CreateManagedItem(Qmx_CorrNameHandle name, Qmx_CorrObjectOwner* owner,
                                           Qmx_CorrContainer* container, unsigned int containerId);
};

#endif
