// Qmx_CorrContainer: a node of a database's container tree. It holds child containers and
// items, each name unique among its kind (a container and an item may share one), and is the
// anchor of implicit relationships. Implemented by Qmx_CorrManagedContainer; the top container
// is made with the database, the others by CreateContainer, and all are destroyed by the
// database. Operations that change the tree mark the database modified.
#ifndef QMX_CORRCONTAINER_H
#define QMX_CORRCONTAINER_H
#include <vector>

#include "QmxCorrExport.h"
#include "Qmx_CorrNameHandle.h"
#include "Qmx_CorrObject.h"

class Qmx_CorrItem;
class Qmx_CorrImplicitRelationship;
class Qmx_CorrManagedContainer;
class Qmx_CorrManagedItem;

class QMX_CORR_EXPORT Qmx_CorrContainer : public Qmx_CorrObject {
public:
    ~Qmx_CorrContainer() override;
    Qmx_CorrContainer() = default;
    Qmx_CorrContainer(const Qmx_CorrContainer&) = default;
    Qmx_CorrContainer& operator=(const Qmx_CorrContainer&) = default;

    // "/" for the top container, else the parent's absolute name, the name and "/".
    virtual Vesk::StringBase<char> GetAbsoluteName() const = 0;
    // Null for the top container.
    virtual const Qmx_CorrContainer* GetParent() const = 0;
    virtual Qmx_CorrContainer* GetParent() = 0;
    // Throws DuplicateObjectFound when a child container of that name exists.
    virtual Qmx_CorrContainer* CreateContainer(const Vesk::StringBase<char>& name) = 0;
    // Throws DuplicateObjectFound when an item of that name exists.
    virtual Qmx_CorrItem* CreateItem(const Vesk::StringBase<char>& name) = 0;
    virtual Qmx_CorrItem* FindOrCreateItem(Qmx_CorrNameHandle name) = 0;
    virtual Qmx_CorrItem* FindOrCreateItem(const Vesk::StringBase<char>& name) = 0;
    // Deletes the container with everything beneath it; relMode as Qmx_CorrItem::Delete.
    // Throws CannotDeleteTopContainer on the top container.
    virtual void Delete(unsigned relMode) = 0;
    virtual void DeleteContainers(unsigned relMode) = 0;
    virtual void DeleteItems(unsigned relMode) = 0;
    // Null when there is none.
    virtual Qmx_CorrContainer* GetContainer(const Vesk::StringBase<char>& name) = 0;
    // Forwards to the non-const overload; an implementation that overrides only that one
    // brings this one in with a using-declaration.
    virtual const Qmx_CorrContainer* GetContainer(const Vesk::StringBase<char>& name) const;
    virtual Qmx_CorrItem* GetItem(const Vesk::StringBase<char>& name) = 0;
    virtual const Qmx_CorrItem* GetItem(const Vesk::StringBase<char>& name) const;  // forwards
    // Sorted by name; loads the container's items first when they are not in memory.
    virtual const std::vector<Qmx_CorrManagedItem*>& GetItems() const = 0;
    virtual std::vector<Qmx_CorrManagedItem*>& GetItems() = 0;
    // In the order they were made.
    virtual const std::vector<Qmx_CorrManagedContainer*>& GetContainers() const = 0;
    virtual std::vector<Qmx_CorrManagedContainer*>& GetContainers() = 0;
    // Implicit relationships whose source is this container.
    virtual const std::vector<Qmx_CorrImplicitRelationship*>& GetOutgoingRelationships() const = 0;
    virtual std::vector<Qmx_CorrImplicitRelationship*>& GetOutgoingRelationships() = 0;
    // Implicit relationships whose destination is this container.
    virtual const std::vector<Qmx_CorrImplicitRelationship*>& GetIncomingRelationships() const = 0;
    virtual std::vector<Qmx_CorrImplicitRelationship*>& GetIncomingRelationships() = 0;
    // Re-parents the container to its grandparent. Throws InvalidRequest for the top
    // container, a child of the top container, or a name clash there.
    virtual void MoveUp() = 0;
    // Null when no item has oldName; throws DuplicateObjectFound when newName is taken.
    virtual Qmx_CorrItem* RenameItem(const Vesk::StringBase<char>& oldName,
                                     const Vesk::StringBase<char>& newName) = 0;
};

#endif
