// Qmx_CorrManagedContainer: the container of a database. Containers form the tree: the top
// container "/" has no parent, every other one parent, which owns it. A container holds its
// child containers (in the order they were made), its items (sorted by name, binary search)
// and the implicit relationships that start or end at it. Containers are all in memory while
// the database is open; their item lists are not: Flush writes a container's item handles to
// its own items stream and drops the list, and the next access reloads it ("delayed
// loading"), so that item pools can be unloaded. One thread at a time.
//
// Items stream "Container_Items_<container id>" (portable): count (UINT32), then count item
// handles of 4 bytes each, least significant byte first, in list order.
//
// Container record (containerVersion 1; primitives as the storage writes them):
//   1  object data block      Qmx_CorrObjectData::ArchiveObjectData
//   2  parent                 container ordinal (0 for the top container)
//   3  name                   the repository's name record
//   4  items stream name      string
//   5  container id           UINT32
//   6  child count C          UINT32, then C container ordinals in list order
//   7  outgoing count O       UINT32, then O implicit-relationship ordinals
//   8  incoming count I       UINT32, then I implicit-relationship ordinals
#ifndef QMX_CORRMANAGEDCONTAINER_H
#define QMX_CORRMANAGEDCONTAINER_H
#include <boost/shared_ptr.hpp>
#include <iosfwd>
#include <utility>
#include <vector>

#include "QmxCorrExport.h"
#include "Qmx_CorrContainer.h"
#include "Qmx_CorrNameHandle.h"
#include "Qmx_CorrObjectData.h"

class Qmx_CorrManagedItem;
class Qmx_CorrNameRepository;
class Qmx_CorrObjectOwner;
class Qmx_CorrStorage;
class Qmx_CorrStream;

class QMX_CORR_EXPORT Qmx_CorrManagedContainer : public Qmx_CorrContainer {
public:
    // Fires the container-deleted event for this container and then for every container
    // beneath it (parents first, children in list order) before anything is destroyed; then
    // destroys the children and gives the name back last. So a listener, also one of a
    // closing database, reads every container of the subtree whole, the other ends of its
    // implicit relationships included.
    ~Qmx_CorrManagedContainer() override;

    // A new container with the owner's default object data and the owner's next container id;
    // it does not enter itself in the parent, the creator does.
    Qmx_CorrManagedContainer(const Vesk::StringBase<char>& name, Qmx_CorrObjectOwner* owner,
                             Qmx_CorrManagedContainer* parent);
    // Reads one record; the items stay unloaded. Throws InvalidDatabaseFormat (storage name)
    // unless the storage's containerVersion is 1, when a count exceeds the bytes left, and for
    // itself as its parent, a null, repeated or own child or a null implicit relationship.
    Qmx_CorrManagedContainer(Qmx_CorrStorage& storage, Qmx_CorrObjectOwner* owner);
    Qmx_CorrManagedContainer(const Qmx_CorrManagedContainer&) = delete;
    Qmx_CorrManagedContainer& operator=(const Qmx_CorrManagedContainer&) = delete;

    const Qmx_CorrObjectData* GetObjectData() const override;
    Qmx_CorrObjectData* GetObjectDataForWrite() override;
    Vesk::StringBase<char> GetName() const override;
    // No duplicate names among children or (loaded) items, every child and (loaded) item
    // valid; the first failure goes to the message manager.
    bool DbgValidateState() const override;
    void DbgDump(std::ostream& out, unsigned indent) const override;
    void DbgDump() const override;
    Vesk::StringBase<char> GetAbsoluteName() const override;
    const Qmx_CorrContainer* GetParent() const override;
    Qmx_CorrContainer* GetParent() override;
    Qmx_CorrContainer* CreateContainer(const Vesk::StringBase<char>& name) override;
    Qmx_CorrItem* CreateItem(const Vesk::StringBase<char>& name) override;
    Qmx_CorrItem* FindOrCreateItem(Qmx_CorrNameHandle name) override;
    Qmx_CorrItem* FindOrCreateItem(const Vesk::StringBase<char>& name) override;
    // Deletes the items (relMode as Qmx_CorrItem::Delete), the children and the implicit
    // relationships at this container, then the container itself, which must not be used
    // afterwards.
    void Delete(unsigned relMode) override;
    // Should one Delete throw, the children (items) deleted before it have left the list and
    // the one that threw stays in it; the removal notices are heard again either way.
    void DeleteContainers(unsigned relMode) override;
    // relMode above 3 is taken as 0.
    void DeleteItems(unsigned relMode) override;
    using Qmx_CorrContainer::GetContainer;
    Qmx_CorrContainer* GetContainer(const Vesk::StringBase<char>& name) override;
    using Qmx_CorrContainer::GetItem;
    Qmx_CorrItem* GetItem(const Vesk::StringBase<char>& name) override;
    const std::vector<Qmx_CorrManagedItem*>& GetItems() const override;
    std::vector<Qmx_CorrManagedItem*>& GetItems() override;
    const std::vector<Qmx_CorrManagedContainer*>& GetContainers() const override;
    std::vector<Qmx_CorrManagedContainer*>& GetContainers() override;
    const std::vector<Qmx_CorrImplicitRelationship*>& GetOutgoingRelationships() const override;
    std::vector<Qmx_CorrImplicitRelationship*>& GetOutgoingRelationships() override;
    const std::vector<Qmx_CorrImplicitRelationship*>& GetIncomingRelationships() const override;
    std::vector<Qmx_CorrImplicitRelationship*>& GetIncomingRelationships() override;
    // Marks the database modified.
    void MoveUp() override;
    Qmx_CorrItem* RenameItem(const Vesk::StringBase<char>& oldName,
                             const Vesk::StringBase<char>& newName) override;

    bool NameMatches(Qmx_CorrNameHandle name) const;
    Qmx_CorrNameHandle GetNameHandle() const { return m_name; }
    Qmx_CorrObjectOwner* GetOwner() const { return m_data->GetOwner(); }
    unsigned int GetContainerId() const { return m_containerId; }
    const Vesk::StringBase<char>& GetItemsStreamName() const { return m_itemsStreamName; }
    bool AreItemsLoaded() const { return m_itemsLoaded; }

    void AddOutgoingRelationship(Qmx_CorrImplicitRelationship* rel);
    void AddIncomingRelationship(Qmx_CorrImplicitRelationship* rel);
    // Erase the first equal entry; nothing if absent.
    void RemoveOutgoingRelationship(Qmx_CorrImplicitRelationship* rel);
    void RemoveIncomingRelationship(Qmx_CorrImplicitRelationship* rel);
    // A child or an item leaves the lists, unless this container is deleting them all itself.
    void NotifyContainerRemoved(Qmx_CorrManagedContainer* child);
    void NotifyItemRemoved(Qmx_CorrManagedItem* item);

    // Writes the record, then the items stream when it is not current.
    void Archive(Qmx_CorrStorage& storage) const;
    // With a database behind the owner and the items loaded: writes the items stream when it
    // is not current, flushes the container's item pools when asked, and drops the list.
    void Flush(bool flushPools) const;
    // Flush of this container, then of every child, depth first.
    void FlushAll(bool flushPools) const;

private:
    using ItemIterator = std::vector<Qmx_CorrManagedItem*>::iterator;
    using ItemRange = std::pair<ItemIterator, ItemIterator>;

    Qmx_CorrNameRepository* GetRepo() const;
    Qmx_CorrManagedContainer* FindChild(Qmx_CorrNameHandle name) const;
    // The equal range of `name` in the item list. REQUIRES: the items are loaded.
    ItemRange FindItems(Qmx_CorrNameHandle name) const;
    // The items list is a cache of the items stream, filled and dropped by const operations.
    // A stream that does not open leaves the list unloaded; a damaged one (a count beyond its
    // bytes, a handle of no item or of another container's item, names out of order) throws
    // InvalidDatabaseFormat with the database name and leaves it unloaded too.
    void LoadItems() const;
    void ReadItemsStream(Qmx_CorrStream& stream, const Vesk::StringBase<char>& dbName) const;
    // Throws CannotWriteDatabase (stream name) when the stream cannot be opened: dropping a
    // list that was not written would lose the items.
    void WriteItemsStream() const;
    Qmx_CorrItem* InsertNewItem(ItemIterator at, Qmx_CorrNameHandle name);
    // The self-checks of RenameItem, sent as debug output only.
    bool CheckItemOrder(const char* label) const;
    void CheckRenamed(const Qmx_CorrManagedItem* item, const Vesk::StringBase<char>& oldName,
                      const Vesk::StringBase<char>& newName) const;
    // Each implicit relationship at this container, through its own Delete, so that its data
    // is released and the other container forgets it too.
    void DeleteImplicitRelationships();
    void ReadRestoredLists(Qmx_CorrStorage& storage);
    // The container-deleted event of this container and of those beneath it, once each.
    void NotifyDeletion();

    boost::shared_ptr<Qmx_CorrObjectData> m_data;
    Qmx_CorrManagedContainer* m_parent;                     // not owned; null for the top container
    Qmx_CorrNameHandle m_name;                              // one reference owned
    mutable std::vector<Qmx_CorrManagedItem*> m_items;      // not owned; sorted by IsLess
    std::vector<Qmx_CorrManagedContainer*> m_containers;    // owned, in insertion order
    std::vector<Qmx_CorrImplicitRelationship*> m_outgoing;  // not owned
    std::vector<Qmx_CorrImplicitRelationship*> m_incoming;  // not owned
    bool m_notifyOnRemove;
    bool m_deletionNotified;  // the container-deleted event has been fired for this one
    mutable bool m_itemsLoaded;
    mutable bool m_itemsStreamCurrent;  // the items stream holds exactly m_items
    Vesk::StringBase<char> m_itemsStreamName;
    unsigned int m_containerId;
};

#endif
