// Qmx_CorrItemDataMgr: the shared data records of one database's items. Each container has a
// default record, which its items share until one of them first writes a property and gets a
// private record; every record sits in a table slot whose index the item archives. Owned by
// the database's Qmx_CorrObjectOwner. No locking.
//
// Stream "shared_item_data" (UINT8, UINT32 and strings as the storage writes them):
//   format      UINT32   0
//   free slots  UINT32   the table's free-slot counter
//   slot count  UINT32   N
//   then per slot, N times:
//     kind      UINT8    0 free slot; 1 its container's default record; 2 any other record
//     record    Qmx_CorrItemData record (properties, container), for kinds 1 and 2
// Restoring makes each kind-1 record its container's default (a later one wins).
#ifndef QMX_CORRITEMDATAMGR_H
#define QMX_CORRITEMDATAMGR_H
#include <boost/shared_ptr.hpp>
#include <iosfwd>
#include <map>

#include "QmxCorrExport.h"
#include "Qmx_CorrDataTableT.h"
#include "Qmx_CorrItemData.h"

class Qmx_CorrContainer;
class Qmx_CorrObjectOwner;
class Qmx_CorrStorage;

class QMX_CORR_EXPORT Qmx_CorrItemDataMgr {
public:
    explicit Qmx_CorrItemDataMgr(Qmx_CorrObjectOwner* owner);
    Qmx_CorrItemDataMgr(const Qmx_CorrItemDataMgr&) = delete;
    Qmx_CorrItemDataMgr& operator=(const Qmx_CorrItemDataMgr&) = delete;

    // The container's default record, made and entered in the table on first request.
    boost::shared_ptr<Qmx_CorrItemData> GetDefaultData(Qmx_CorrContainer* container);
    // A new private record of the container, entered in the table.
    boost::shared_ptr<Qmx_CorrItemData> CreateData(Qmx_CorrContainer* container);
    // Null for a free slot; InvalidRequest for an index beyond the table.
    boost::shared_ptr<Qmx_CorrItemData> GetData(unsigned int index) const;
    // InvalidRequest when the record is in no slot.
    unsigned int GetIndex(const Qmx_CorrItemData* record) const;
    // `record` is the one a deleted item held: its slot is freed when that item was its only
    // holder besides the table; a default or a record still in use stays.
    void ReleaseData(const boost::shared_ptr<Qmx_CorrItemData>& record);
    // Forgets the container's default and frees its slot whoever still holds it.
    void RemoveContainer(Qmx_CorrContainer* container);

    unsigned int GetFreeSlots() const { return m_table.GetFreeSlots(); }
    std::size_t GetSlotCount() const { return m_table.GetSize(); }

    // Throws InvalidRequest when a record's container is not in the storage's table.
    void Archive(Qmx_CorrStorage& storage) const;
    // Throws InvalidDatabaseFormat (database name) for a format other than 0, a kind above 2
    // or counts the stream cannot hold; keeps what was read so far.
    void Restore(Qmx_CorrStorage& storage);

    void DbgDump(std::ostream& out, unsigned indent) const;
    void DbgDump() const;

private:
    Qmx_CorrObjectOwner* m_owner;  // not owned
    std::map<Qmx_CorrContainer*, boost::shared_ptr<Qmx_CorrItemData>> m_defaults;
    Qmx_CorrDataTableT<Qmx_CorrItemData> m_table;
};

#endif
