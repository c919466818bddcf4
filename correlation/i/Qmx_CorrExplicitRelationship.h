// Qmx_CorrExplicitRelationship: a stated derivation from a set of source items to a set of
// destination items. No item is on both sides and none twice on one side; every change is
// mirrored in the items' own relationship lists. Implemented by
// Qmx_CorrManagedExplicitRelationship; made by the manager, destroyed by Delete or with the
// database.
#ifndef QMX_CORREXPLICITRELATIONSHIP_H
#define QMX_CORREXPLICITRELATIONSHIP_H
#include "QmxCorrExport.h"
#include "Qmx_CorrRelationship.h"
#include "Qmx_SingleOptContainerT.h"

class Qmx_CorrItem;

class QMX_CORR_EXPORT Qmx_CorrExplicitRelationship : public Qmx_CorrRelationship {
public:
    ~Qmx_CorrExplicitRelationship() override;
    Qmx_CorrExplicitRelationship() = default;
    Qmx_CorrExplicitRelationship(const Qmx_CorrExplicitRelationship&) = default;
    Qmx_CorrExplicitRelationship& operator=(const Qmx_CorrExplicitRelationship&) = default;

    // Built fresh on each call.
    virtual Qmx_SingleOptContainerT<const Qmx_CorrItem*> GetSrcItems() const = 0;
    virtual Qmx_SingleOptContainerT<Qmx_CorrItem*> GetSrcItems() = 0;
    virtual Qmx_SingleOptContainerT<const Qmx_CorrItem*> GetDstItems() const = 0;
    virtual Qmx_SingleOptContainerT<Qmx_CorrItem*> GetDstItems() = 0;
    // Each adds the item and records the link on it, or removes both; see the implementation
    // for the items it refuses.
    virtual void AddSrcItem(Qmx_CorrItem* item) = 0;
    virtual void RemoveSrcItem(Qmx_CorrItem* item) = 0;
    virtual void AddDstItem(Qmx_CorrItem* item) = 0;
    virtual void RemoveDstItem(Qmx_CorrItem* item) = 0;
    // Destroys the relationship through its database; the pointer is dangling afterwards.
    virtual void Delete() = 0;
};

#endif
