// Qmx_CorrObjectOwner: the context of one open database, reached by every managed object
// through its shared data. It holds the name repository (owned only when it made it), the two
// shared-data managers (owned) and the container id counter, and declares the operations through
// which objects create, link and delete one another; the data manager (Qmx_CorrDataMgr) is its one
// implementation, so that the managed objects depend on this interface only. No locking.
#ifndef QMX_CORROBJECTOWNER_H
#define QMX_CORROBJECTOWNER_H
#include "QmxCorrExport.h"
#include "Qmx_CorrNameHandle.h"

class Qmx_CorrContainer;
class Qmx_CorrDb;
class Qmx_CorrExplicitRelationship;
class Qmx_CorrItem;
class Qmx_CorrItemDataMgr;
class Qmx_CorrItemRelOverflowMgr;
class Qmx_CorrManagedContainer;
class Qmx_CorrManagedExplicitRelationship;
class Qmx_CorrManagedImplicitRelationship;
class Qmx_CorrManagedItem;
class Qmx_CorrManagedItemMgr;
class Qmx_CorrNameRepository;
class Qmx_CorrRelDataMgr;
class Qmx_CorrRelItemOverflowMgr;

class QMX_CORR_EXPORT Qmx_CorrObjectOwner {
public:
    // Deletes the item data manager, then the relationship data manager.
    virtual ~Qmx_CorrObjectOwner();

    // Explicit relationship ends of LinkRelationshipItem and UnlinkRelationshipItem.
    enum : unsigned int { kSourceEnd = 0, kDestinationEnd = 1 };

    // Adds the relationship's handle to the item's outgoing (kSourceEnd) or incoming
    // (kDestinationEnd) list, or nothing for another end; then marks the database modified.
    virtual void LinkRelationshipItem(Qmx_CorrExplicitRelationship* rel, Qmx_CorrItem* item,
                                      unsigned end) = 0;
    // The same, removing the handle.
    virtual void UnlinkRelationshipItem(Qmx_CorrExplicitRelationship* rel, Qmx_CorrItem* item,
                                        unsigned end) = 0;
    // Called by a container's Delete once its children and items are gone, before it
    // destroys itself: the parent drops it and its shared data is forgotten.
    virtual void DeleteContainer(Qmx_CorrManagedContainer* container) = 0;
    // Detaches the item from every relationship that still lists it, releases its overflow
    // lists and frees its pool slot.
    virtual void DeleteItem(Qmx_CorrManagedItem* item) = 0;
    // Removes the relationship from its items, releases its overflow lists, frees its slot.
    virtual void DeleteExplicitRelationship(Qmx_CorrManagedExplicitRelationship* rel) = 0;
    // Removes the relationship from its containers and the database, then destroys it.
    virtual void DeleteImplicitRelationship(Qmx_CorrManagedImplicitRelationship* rel) = 0;
    // A new item in a slot of the item pool manager.
    virtual Qmx_CorrManagedItem* CreateManagedItem(Qmx_CorrNameHandle name,
                                                   Qmx_CorrContainer* parent,
                                                   unsigned containerId) = 0;
    // Null here; the data manager gives its item pool manager.
    virtual Qmx_CorrManagedItemMgr* GetManagedItemMgr();
    // Null here and when the database has no file behind it.
    virtual Qmx_CorrDb* GetDatabase();
    // The object of a handle, its pool loaded first if needed; null for a dangling handle.
    virtual const Qmx_CorrManagedItem* GetItemPtr(unsigned handle) const = 0;
    virtual Qmx_CorrManagedItem* GetItemPtr(unsigned handle) = 0;
    virtual unsigned GetItemHandle(const Qmx_CorrManagedItem* item) = 0;
    virtual const Qmx_CorrManagedExplicitRelationship* GetExpRelPtr(unsigned handle) const = 0;
    virtual Qmx_CorrManagedExplicitRelationship* GetExpRelPtr(unsigned handle) = 0;
    virtual Qmx_CorrItemRelOverflowMgr* GetItemRelOverflowMgr() = 0;
    virtual Qmx_CorrRelItemOverflowMgr* GetRelItemOverflowMgr() = 0;
    virtual void SetModified() = 0;

    Qmx_CorrNameRepository* GetNameRepo() { return m_nameRepo; }
    const Qmx_CorrNameRepository* GetNameRepo() const { return m_nameRepo; }
    Qmx_CorrItemDataMgr* GetItemDataMgr() { return m_itemDataMgr; }
    const Qmx_CorrItemDataMgr* GetItemDataMgr() const { return m_itemDataMgr; }
    Qmx_CorrRelDataMgr* GetRelDataMgr() { return m_relDataMgr; }
    const Qmx_CorrRelDataMgr* GetRelDataMgr() const { return m_relDataMgr; }

    void SetNextContainerId(unsigned id) { m_nextContainerId = id; }
    // The id for a new container; the counter moves on.
    unsigned GetNextContainerId() { return m_nextContainerId++; }
    // The id the next container will get, the counter unchanged.
    unsigned GetLastContainerId() const { return m_nextContainerId; }

protected:
    // Both use the process-wide default repository when given none (a data manager always
    // passes its own). Then make the item data manager and the relationship data manager.
    Qmx_CorrObjectOwner();
    explicit Qmx_CorrObjectOwner(Qmx_CorrNameRepository* repo);
    // With `privateRepo` set, a null `repo` gives this owner a Qmx_CorrNameRepo_Basic of its
    // own, destroyed after the data managers: databases that share a repository share their
    // string tables, so each database gets its own unless its host passes one.
    Qmx_CorrObjectOwner(Qmx_CorrNameRepository* repo, bool privateRepo);
    // Not copyable: a copy would share the data managers, which each owner deletes, and they
    // point back at the owner that made them.
    Qmx_CorrObjectOwner(const Qmx_CorrObjectOwner&) = delete;
    Qmx_CorrObjectOwner& operator=(const Qmx_CorrObjectOwner&) = delete;

private:
    Qmx_CorrNameRepository* m_nameRepo;  // owned only when it is m_ownRepo
    Qmx_CorrItemDataMgr* m_itemDataMgr;  // owned
    Qmx_CorrRelDataMgr* m_relDataMgr;    // owned
    unsigned m_nextContainerId;
    Qmx_CorrNameRepository* m_ownRepo;  // owned; null unless the owner made its repository
};

#endif
