// Qmx_CorrManagedItem: the item of a database. Items are many, so they are small fixed-size
// records in pools of 128 (Qmx_CorrManagedItemMgr), paged to and from the item pool stream;
// an item names other objects only by 32-bit handles, holds its shared item data (properties
// and parent container) and one reference of its interned name. Its relationship lists keep
// one handle inline; longer lists go to the item-to-relationship overflow lists when the item
// is archived. Made by its container through the owner, destroyed by Delete or when its pool
// is unloaded or freed. One thread at a time.
//
// Item record (28 bytes with the basic name repository; 4-byte values as the storage writes
// UINT32; itemVersion 2):
//   offset  size  field
//   0       4     data index: the slot of the item data in the item data manager
//   4       N     name record (N = the repository's GetNameArchiveSize, 8 for the basic one)
//   4+N     4     incoming count
//   8+N     4     incoming value: the handle when the count is 1, else 0 (two or more: the
//                 overflow lists hold them under (item, selector 0))
//   12+N    4     outgoing count
//   16+N    4     outgoing value, as incoming (selector 1)
#ifndef QMX_CORRMANAGEDITEM_H
#define QMX_CORRMANAGEDITEM_H
#include <boost/shared_ptr.hpp>
#include <iosfwd>

#include "QmxCorrExport.h"
#include "Qmx_CorrHandleList.h"
#include "Qmx_CorrItem.h"
#include "Qmx_CorrItemData.h"
#include "Qmx_CorrNameHandle.h"

class Qmx_CorrObjectOwner;
class Qmx_CorrStorage;

class QMX_CORR_EXPORT Qmx_CorrManagedItem : public Qmx_CorrItem {
public:
    // The name is discarded, not released: the database still names the item.
    ~Qmx_CorrManagedItem() override;

    // Both share the parent's default item data; the first interns a new name, the second
    // takes one more reference of an existing one.
    Qmx_CorrManagedItem(const Vesk::StringBase<char>& name, Qmx_CorrObjectOwner* owner,
                        Qmx_CorrContainer* parent);
    Qmx_CorrManagedItem(Qmx_CorrNameHandle name, Qmx_CorrObjectOwner* owner,
                        Qmx_CorrContainer* parent);
    // Reads one record. Throws InvalidDatabaseFormat (storage name) unless the storage's
    // itemVersion is 2, when fewer bytes than a record are left, when the data index names a
    // free slot or none, when an inline handle is below 128, or when a list of two or more
    // finds a different number of handles in the overflow lists.
    Qmx_CorrManagedItem(Qmx_CorrStorage& storage, Qmx_CorrObjectOwner* owner);
    Qmx_CorrManagedItem(const Qmx_CorrManagedItem&) = delete;
    Qmx_CorrManagedItem& operator=(const Qmx_CorrManagedItem&) = delete;

    const Qmx_CorrObjectData* GetObjectData() const override;
    Qmx_CorrObjectData* GetObjectDataForWrite() override;
    Vesk::StringBase<char> GetName() const override;
    // Every relationship listed lists the item back, and none is listed twice; the first
    // failure goes to the debug output.
    bool DbgValidateState() const override;
    void DbgDump(std::ostream& out, unsigned indent) const override;
    void DbgDump() const override;
    Vesk::StringBase<char> GetAbsoluteName() const override;
    const Qmx_CorrContainer* GetParent() const override;
    Qmx_CorrContainer* GetParent() override;
    // The relationship lists leave out handles that name no live relationship (only a damaged
    // database has them), so that no caller meets a null.
    Qmx_SingleOptContainerT<const Qmx_CorrExplicitRelationship*> GetOutgoingRelationships()
        const override;
    Qmx_SingleOptContainerT<Qmx_CorrExplicitRelationship*> GetOutgoingRelationships() override;
    Qmx_SingleOptContainerT<const Qmx_CorrExplicitRelationship*> GetIncomingRelationships()
        const override;
    Qmx_SingleOptContainerT<Qmx_CorrExplicitRelationship*> GetIncomingRelationships() override;
    // The object must not be used afterwards.
    void Delete(unsigned relMode) override;
    void SetName(const Vesk::StringBase<char>& newName) override;

    // Without taking a reference.
    Qmx_CorrNameHandle GetNameHandle() const { return m_name; }
    bool NameMatches(Qmx_CorrNameHandle name) const;
    Qmx_CorrObjectOwner* GetOwner() const { return m_data->GetOwner(); }

    // Explicit-relationship handles; the data manager keeps them in step with the
    // relationships (the item is a source of its outgoing ones).
    void AddOutgoingRelationship(unsigned int handle) { m_outgoing.Add(handle); }
    void AddIncomingRelationship(unsigned int handle) { m_incoming.Add(handle); }
    void RemoveOutgoingRelationship(unsigned int handle) { m_outgoing.Remove(handle); }
    void RemoveIncomingRelationship(unsigned int handle) { m_incoming.Remove(handle); }
    const Qmx_CorrHandleList& GetOutgoingHandles() const { return m_outgoing; }
    const Qmx_CorrHandleList& GetIncomingHandles() const { return m_incoming; }

    // Throws InvalidRequest when the item data is in no slot of the item data manager.
    void Archive(Qmx_CorrStorage& storage) const;
    // 20 + the repository's name record size.
    static unsigned int GetArchiveSize(Qmx_CorrObjectOwner* owner);

private:
    boost::shared_ptr<Qmx_CorrItemData> m_data;
    Qmx_CorrNameHandle m_name;  // one reference owned; null after Delete
    Qmx_CorrHandleList m_incoming;
    Qmx_CorrHandleList m_outgoing;
};

#endif
