// Qmx_CorrManagedExplicitRelationship: the explicit relationship of a database: source and
// destination items held as item handles, each link mirrored on the item through the owner.
// No handle is twice in one list, none on both sides. Relationships are fixed-size records in
// pools of 128 (Qmx_CorrManagedExpRelMgr); a side of three or more items goes to the
// relationship-to-item overflow lists when archived. Made by the data manager, destroyed by
// Delete or when its pool is unloaded or freed. One thread at a time.
//
// Record (28 bytes; 4-byte values as the storage writes UINT32; expRelVersion 1):
//   offset  size  field
//   0       4     data index: the slot of the relationship data in the relationship data
//                 manager
//   4       4     source count
//   8       4     source slot 1: the first handle when the count is 1 or 2, else 0
//   12      4     source slot 2: the second handle when the count is 2, else 0 (three or
//                 more: the overflow lists hold them under (relationship, selector 0))
//   16      4     destination count
//   20      4     destination slot 1, as for sources
//   24      4     destination slot 2, as for sources (selector 1)
#ifndef QMX_CORRMANAGEDEXPLICITRELATIONSHIP_H
#define QMX_CORRMANAGEDEXPLICITRELATIONSHIP_H
#include <boost/shared_ptr.hpp>
#include <iosfwd>

#include "QmxCorrExport.h"
#include "Qmx_CorrExplicitRelationship.h"
#include "Qmx_CorrHandleList.h"
#include "Qmx_CorrRelData.h"

class Qmx_CorrObjectOwner;
class Qmx_CorrStorage;

class QMX_CORR_EXPORT Qmx_CorrManagedExplicitRelationship : public Qmx_CorrExplicitRelationship {
public:
    ~Qmx_CorrManagedExplicitRelationship() override;

    // No items; the relationship data manager's default data.
    explicit Qmx_CorrManagedExplicitRelationship(Qmx_CorrObjectOwner* owner);
    // Reads one record. Throws InvalidDatabaseFormat (storage name) unless the storage's
    // expRelVersion is 1, when fewer bytes than a record are left, when the data index names a
    // free slot or none, when a handle is below 128, or when a side of three or more finds a
    // different number of handles in the overflow lists.
    Qmx_CorrManagedExplicitRelationship(Qmx_CorrStorage& storage, Qmx_CorrObjectOwner* owner);
    Qmx_CorrManagedExplicitRelationship(const Qmx_CorrManagedExplicitRelationship&) = delete;
    Qmx_CorrManagedExplicitRelationship& operator=(const Qmx_CorrManagedExplicitRelationship&) =
        delete;

    const Qmx_CorrObjectData* GetObjectData() const override;
    Qmx_CorrObjectData* GetObjectDataForWrite() override;
    Vesk::StringBase<char> GetName() const override;
    // No item twice, none on both sides, every item lists the relationship back; the first
    // failure goes to the debug output.
    bool DbgValidateState() const override;
    void DbgDump(std::ostream& out, unsigned indent) const override;
    void DbgDump() const override;
    // The item lists leave out handles that name no live item (only a damaged database has
    // them), so that no caller meets a null.
    Qmx_SingleOptContainerT<const Qmx_CorrItem*> GetSrcItems() const override;
    Qmx_SingleOptContainerT<Qmx_CorrItem*> GetSrcItems() override;
    Qmx_SingleOptContainerT<const Qmx_CorrItem*> GetDstItems() const override;
    Qmx_SingleOptContainerT<Qmx_CorrItem*> GetDstItems() override;
    // Throws InvalidSrcItem for null (short form) and for an item that is not in this
    // database's pools (with its absolute name), SrcAndDstIdentical when the item is a
    // destination; nothing changes then. An item that is already a source is left as it is.
    void AddSrcItem(Qmx_CorrItem* item) override;
    // Removing an item that is not a source changes nothing; an empty side is kept.
    void RemoveSrcItem(Qmx_CorrItem* item) override;
    // As AddSrcItem, with InvalidDstItem for null.
    void AddDstItem(Qmx_CorrItem* item) override;
    void RemoveDstItem(Qmx_CorrItem* item) override;
    // The object must not be used afterwards.
    void Delete() override;

    Qmx_CorrObjectOwner* GetOwner() const { return m_data->GetOwner(); }
    const Qmx_CorrHandleList& GetSrcHandles() const { return m_sources; }
    const Qmx_CorrHandleList& GetDstHandles() const { return m_destinations; }

    // Throws InvalidRequest when the data is in no slot of the relationship data manager.
    void Archive(Qmx_CorrStorage& storage) const;
    static unsigned int GetArchiveSize(Qmx_CorrObjectOwner* owner);

private:
    boost::shared_ptr<Qmx_CorrRelData> m_data;
    Qmx_CorrHandleList m_sources;       // item handles
    Qmx_CorrHandleList m_destinations;  // item handles
};

#endif
