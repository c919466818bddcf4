// Qmx_CorrRelDataMgr: the shared data records of one database's explicit and implicit
// relationships. One default record (no properties, empty name), always slot 0, is shared by
// every relationship without properties or name of its own; others get private records in
// further slots. Owned by the database's Qmx_CorrObjectOwner. No locking.
//
// Stream "shared_rel_data" (UINT8, UINT32 and strings as the storage writes them):
//   format      UINT32   0
//   free slots  UINT32   the table's free-slot counter
//   slot count  UINT32   N - 1: the slots after the default slot 0, which is never written
//   then per slot 1 to N - 1:
//     kind      UINT8    0 free slot; 2 a record held by one relationship besides the table;
//                        1 any other record (both are read alike)
//     record    Qmx_CorrRelData record (properties, name), for kinds 1 and 2
#ifndef QMX_CORRRELDATAMGR_H
#define QMX_CORRRELDATAMGR_H
#include <boost/shared_ptr.hpp>
#include <iosfwd>

#include "QmxCorrExport.h"
#include "Qmx_CorrDataTableT.h"
#include "Qmx_CorrRelData.h"

class Qmx_CorrObjectOwner;
class Qmx_CorrStorage;

class QMX_CORR_EXPORT Qmx_CorrRelDataMgr {
public:
    explicit Qmx_CorrRelDataMgr(Qmx_CorrObjectOwner* owner);
    Qmx_CorrRelDataMgr(const Qmx_CorrRelDataMgr&) = delete;
    Qmx_CorrRelDataMgr& operator=(const Qmx_CorrRelDataMgr&) = delete;

    const boost::shared_ptr<Qmx_CorrRelData>& GetDefaultData() const { return m_default; }
    // A new private record with that name, entered in the table.
    boost::shared_ptr<Qmx_CorrRelData> CreateData(const Vesk::StringBase<char>& name);
    // Null for a free slot; InvalidRequest for an index beyond the table.
    boost::shared_ptr<Qmx_CorrRelData> GetData(unsigned int index) const;
    // InvalidRequest when the record is in no slot.
    unsigned int GetIndex(const Qmx_CorrRelData* record) const;
    // As Qmx_CorrItemDataMgr::ReleaseData; the default is never freed.
    void ReleaseData(const boost::shared_ptr<Qmx_CorrRelData>& record);

    unsigned int GetFreeSlots() const { return m_table.GetFreeSlots(); }
    std::size_t GetSlotCount() const { return m_table.GetSize(); }

    void Archive(Qmx_CorrStorage& storage) const;
    // Throws InvalidDatabaseFormat (database name) for a format other than 0, a kind above 2
    // or counts the stream cannot hold; keeps what was read so far.
    void Restore(Qmx_CorrStorage& storage);

    void DbgDump(std::ostream& out, unsigned indent) const;
    void DbgDump() const;

private:
    Qmx_CorrObjectOwner* m_owner;  // not owned
    boost::shared_ptr<Qmx_CorrRelData> m_default;
    Qmx_CorrDataTableT<Qmx_CorrRelData> m_table;
};

#endif
