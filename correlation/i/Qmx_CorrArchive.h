// Qmx_CorrArchive: a whole correlation graph as the streams of one database file. The
// constructor opens the file and restores the graph in a fixed order (name repository, shared
// data, overflow lists, pool managers, containers, implicit relationships); items and explicit
// relationships stay in their pools until used. Commit writes everything back in a fixed order
// and commits the file. Created by the data manager, which takes the restored top container
// and implicit relationships over; the archive owns the database object, the two swizzlers
// and the ordinal tables of the records. One thread at a time.
//
// Stream "info" (internal; 4-byte integers least significant byte first, strings as a 4-byte
// length and the bytes):
//   1   identifier                       string "Qmx_Corr_Archive"
//   2   format version                   1
//   3   container table size N           containers + 1 (entry 0 is null)
//   4   implicit relationship table M    implicit relationships + 1
//   5-9 record versions                  container 1, item 2, explicit 1, implicit 1,
//                                        object data 1 (0 for a kind never written)
//   10  top container ordinal
//   11  next container id
// "containers" holds the records of container table entries 1 to N - 1 in order, "irels"
// those of the implicit relationships; the other streams are their managers'.
#ifndef QMX_CORRARCHIVE_H
#define QMX_CORRARCHIVE_H
#include <cstddef>
#include <memory>
#include <vector>

#include "QmxCorrExport.h"
#include "Qmx_CorrStorageData.h"
#include "Vesk_StringBase.h"

class Qmx_CorrDb;
class Qmx_CorrItemDataMgr;
class Qmx_CorrItemRelOverflowMgr;
class Qmx_CorrManagedContainer;
class Qmx_CorrManagedExpRelMgr;
class Qmx_CorrManagedImplicitRelationship;
class Qmx_CorrManagedItemMgr;
class Qmx_CorrNameRepository;
class Qmx_CorrObjectOwner;
class Qmx_CorrRelDataMgr;
class Qmx_CorrRelItemOverflowMgr;

class QMX_CORR_EXPORT Qmx_CorrArchive {
public:
    // Opens `dbName` (created when missing) and restores what it holds. `tempDir`, when not
    // empty, is the directory in which the database makes its own temporary directory. Either
    // overflow manager may be null: its stream is then neither read nor written. Throws
    // InvalidDatabaseFormat or CannotReadDatabase (database name) for a damaged file; nothing
    // of a failed restore survives, and the file is left as it was.
    Qmx_CorrArchive(const Vesk::StringBase<char>& dbName, const Vesk::StringBase<char>& tempDir,
                    Qmx_CorrManagedItemMgr* itemMgr, Qmx_CorrManagedExpRelMgr* expRelMgr,
                    Qmx_CorrItemRelOverflowMgr* itemRelOverflow,
                    Qmx_CorrRelItemOverflowMgr* relItemOverflow, Qmx_CorrObjectOwner* owner);
    // Detaches both pool managers (cutting their pool streams to size) and closes the
    // database; the restored objects belong to the data manager.
    ~Qmx_CorrArchive();
    Qmx_CorrArchive(const Qmx_CorrArchive&) = delete;
    Qmx_CorrArchive& operator=(const Qmx_CorrArchive&) = delete;

    // Writes every stream and commits the file. Nothing happens without a top container.
    // Throws CannotWriteDatabase (database name) when a stream cannot be written.
    void Commit(const Qmx_CorrNameRepository* repo, const Qmx_CorrItemDataMgr* itemData,
                const Qmx_CorrRelDataMgr* relData,
                const Qmx_CorrItemRelOverflowMgr* itemRelOverflow,
                const Qmx_CorrRelItemOverflowMgr* relItemOverflow,
                const Qmx_CorrManagedContainer* top, const Qmx_CorrObjectOwner* owner);

    // Null for a new database (no "info").
    Qmx_CorrManagedContainer* GetTopContainer() const;
    // The table size, null entry 0 included; 0 for a new database.
    unsigned int GetNumImplicitRelationships() const;
    // Null for 0.
    Qmx_CorrManagedImplicitRelationship* GetImplicitRelationship(unsigned int index) const;
    Qmx_CorrDb* GetDatabase() const { return m_db.get(); }

private:
    void OpenDatabase(const Vesk::StringBase<char>& dbName, const Vesk::StringBase<char>& tempDir);
    void CloseDatabase();
    void ReadInfo();
    void CheckTableSize(unsigned int size, const char* streamName, unsigned int minRecord,
                        unsigned int least) const;
    template <class T>
    static void PrepareTable(std::vector<T*>& table, unsigned int size);
    void RestoreManagers(Qmx_CorrItemRelOverflowMgr* itemRelOverflow,
                         Qmx_CorrRelItemOverflowMgr* relItemOverflow);
    template <class Reader>
    void RestoreStream(const char* name, const char* trace, Reader read);
    void RestoreContainers();
    void RestoreImplicitRelationships();
    template <class T>
    void RestoreTable(std::vector<T*>& table, const char* name, std::size_t& constructed);
    void CheckGraph() const;
    static std::size_t CountTree(const Qmx_CorrManagedContainer* top);
    void DiscardRestored();
    void RebuildTables(const Qmx_CorrManagedContainer* top);
    template <class T>
    static void SortUnique(std::vector<T*>& table);
    template <class Writer>
    void WriteStream(const char* name, Writer write);
    template <class T>
    void WriteRecords(const char* name, const std::vector<T*>& table);
    void WriteInfo(const Qmx_CorrObjectOwner* owner);

    std::unique_ptr<Qmx_CorrDb> m_db;
    Vesk::StringBase<char> m_ownTempDir;  // made inside the host's directory; empty otherwise
    unsigned int m_topContainerOrdinal;
    Qmx_CorrManagedItemMgr* m_itemMgr;      // not owned
    Qmx_CorrManagedExpRelMgr* m_expRelMgr;  // not owned
    Qmx_CorrObjectOwner* m_owner;           // not owned
    Qmx_CorrStorageData m_storageData;      // swizzlers owned
    // While restoring: how many table entries hold constructed objects (the others are raw
    // memory that a failed restore must free without destroying).
    std::size_t m_constructedContainers;
    std::size_t m_constructedImpRels;
};

#endif
