// Qmx_CorrItemData: the shared data record of items: the property map and the container of
// the items that use it. An item keeps no container of its own; its parent is the container
// of its record, which is why defaults are per container and why a private record carries the
// container too. Records live in the database's Qmx_CorrItemDataMgr table.
//
// Record (after the property map record of Qmx_CorrObjectData): container, as the storage's
// container ordinal.
#ifndef QMX_CORRITEMDATA_H
#define QMX_CORRITEMDATA_H
#include "QmxCorrExport.h"
#include "Qmx_CorrObjectData.h"

class Qmx_CorrContainer;

class QMX_CORR_EXPORT Qmx_CorrItemData : public Qmx_CorrObjectData {
public:
    Qmx_CorrItemData(Qmx_CorrObjectOwner* owner, Qmx_CorrContainer* container);
    // Reads the property map record, then the container ordinal.
    Qmx_CorrItemData(Qmx_CorrObjectOwner* owner, Qmx_CorrStorage& storage);
    ~Qmx_CorrItemData() override;

    Qmx_CorrContainer* GetContainer() const { return m_container; }
    // Throws InvalidRequest when the container is not in the storage's table.
    void Archive(Qmx_CorrStorage& storage) const;

private:
    Qmx_CorrContainer* m_container;  // not owned
};

#endif
