// Qmx_CorrItem: a named item inside a container, the unit that derivations connect. Explicit
// relationships list items as sources and destinations; an item knows the relationships it
// takes part in. Implemented by Qmx_CorrManagedItem; made and destroyed by its container and
// the data manager only.
#ifndef QMX_CORRITEM_H
#define QMX_CORRITEM_H
#include "QmxCorrExport.h"
#include "Qmx_CorrObject.h"
#include "Qmx_SingleOptContainerT.h"

class Qmx_CorrContainer;
class Qmx_CorrExplicitRelationship;

class QMX_CORR_EXPORT Qmx_CorrItem : public Qmx_CorrObject {
public:
    ~Qmx_CorrItem() override;
    Qmx_CorrItem() = default;
    Qmx_CorrItem(const Qmx_CorrItem&) = default;
    Qmx_CorrItem& operator=(const Qmx_CorrItem&) = default;

    // The parent's absolute name followed directly by the item's name.
    virtual Vesk::StringBase<char> GetAbsoluteName() const = 0;
    virtual const Qmx_CorrContainer* GetParent() const = 0;
    virtual Qmx_CorrContainer* GetParent() = 0;
    // The relationships of which the item is a source, built fresh on each call.
    virtual Qmx_SingleOptContainerT<const Qmx_CorrExplicitRelationship*> GetOutgoingRelationships()
        const = 0;
    virtual Qmx_SingleOptContainerT<Qmx_CorrExplicitRelationship*> GetOutgoingRelationships() = 0;
    // The relationships of which the item is a destination.
    virtual Qmx_SingleOptContainerT<const Qmx_CorrExplicitRelationship*> GetIncomingRelationships()
        const = 0;
    virtual Qmx_SingleOptContainerT<Qmx_CorrExplicitRelationship*> GetIncomingRelationships() = 0;
    // Deletes the item. relMode says which of its relationships die with it: 0 none; 1 those
    // of which it is the only source or the only destination; 2 those of which it is the only
    // source; 3 those of which it is the only destination. The others merely lose the item.
    virtual void Delete(unsigned relMode) = 0;
    // A new interned name; only the container's RenameItem calls it, as the container keeps
    // its items sorted by name.
    virtual void SetName(const Vesk::StringBase<char>& newName) = 0;
};

#endif
