// Qmx_CorrNameRepo_Basic: the name repository. Its table of strings grows only at its end, so
// an index, once given, keeps naming the same slot; slot 0 always holds the empty string, and
// any other slot holding the empty string is empty, waiting for reuse (lowest index first).
// CreateName never searches for an equal text. The records it hands out are
// Qmx_CorrName_Basic objects, which belong to their holders (see Qmx_CorrName_Basic for the
// two counts); the repository owns only its table and its null record. A handle is valid here
// when it points to a record of this repository whose index is below the table size.
//
// Every data manager gives its database a repository of its own unless the host passes one;
// GetDefault is the process-wide one for hosts that want to share theirs. No locking.
//
// Stream "Qmx_CorrNameRepo_Basic" (a portable stream of the database; each value 4 bytes,
// least significant first; a string its 4-byte length, then its bytes):
//   order  size  field
//   1      4     format version: 0
//   2      4     first free slot: the lowest empty slot, 0 when there is none
//   3      4     free count: the number of empty slots
//   4      4     N: the strings that follow (table size - 1)
//   5      ...   slots 1 to N in index order, an empty slot as the empty string
// Slot 0 is not stored.
//
// Object records hold a name as two values (ArchiveName, RestoreName):
//   offset  size  field
//   0       4     reference count of the record
//   4       4     index of its text (0: the empty name)
#ifndef QMX_CORRNAMEREPO_BASIC_H
#define QMX_CORRNAMEREPO_BASIC_H
#include <cstddef>
#include <vector>

#include "Qmx_CorrNameRepository.h"

class Qmx_CorrName_Basic;
class Qmx_CorrStream;

class QMX_CORR_EXPORT Qmx_CorrNameRepo_Basic : public Qmx_CorrNameRepository {
public:
    static constexpr const char* kStreamName = "Qmx_CorrNameRepo_Basic";
    static constexpr unsigned int kFormatVersion = 0;
    // OpenStream modes: write a portable stream from scratch, read a portable stream.
    static constexpr int kArchiveMode = 14;
    static constexpr int kRestoreMode = 9;

    // The table holds slot 0 only.
    Qmx_CorrNameRepo_Basic();
    ~Qmx_CorrNameRepo_Basic() override;
    Qmx_CorrNameRepo_Basic(const Qmx_CorrNameRepo_Basic&) = delete;
    Qmx_CorrNameRepo_Basic& operator=(const Qmx_CorrNameRepo_Basic&) = delete;

    // Traces the table's counts (STRING_ARCHIVE, level 10) after writing it. A null
    // stream throws CannotWriteDatabase with the database name; nothing is written then.
    void Archive(Qmx_CorrDb* db) const override;
    // Throws InvalidDatabaseFormat with the database name when the stream is damaged: another
    // format version, a first free slot and free count that disagree with the stored slots, a
    // count beyond the bytes left, a stream cut short or bytes after its end. The repository
    // is then as it was before the call. The stream is closed again in every case.
    void Restore(Qmx_CorrDb* db) override;
    // 8.
    unsigned int GetNameArchiveSize() const override;
    // Writes the reference count and the index; 0 and 0 for an invalid handle.
    void ArchiveName(Qmx_CorrStorage& storage, Qmx_CorrNameHandle name) const override;
    Qmx_CorrNameHandle RestoreName(Qmx_CorrStorage& storage) override;
    Qmx_CorrNameHandle CreateName(const Vesk::StringBase<char>& text) override;
    Vesk::StringBase<char> GetString(Qmx_CorrNameHandle name) const override;
    // A record of another kind, or no record, gives the null record.
    Qmx_CorrNameHandle CopyName(Qmx_CorrNameHandle name) override;
    // The reference count falls only for a valid handle with a non-zero index, and the slot is
    // freed when it reaches 0. The holder count falls for every record but a null record.
    void ReleaseName(Qmx_CorrNameHandle name) override;
    void DiscardName(Qmx_CorrNameHandle name) override;
    bool IsLess(Qmx_CorrNameHandle a, Qmx_CorrNameHandle b) const override;
    bool IsEqual(Qmx_CorrNameHandle a, Qmx_CorrNameHandle b) const override;
    // Without copying the text: whether the record is one of this repository's and its
    // index lies within the string table.
    bool NamesStoredText(Qmx_CorrNameHandle name) override;

    // The process-wide repository, made on first use and destroyed when the library is
    // unloaded. Every database that uses it writes its names into it, and each restore
    // replaces its table.
    static Qmx_CorrNameRepo_Basic* GetDefault();

    // The record of the empty name; owned by the repository.
    Qmx_CorrNameHandle GetNullName() const;
    // Slots, slot 0 included.
    std::size_t GetTableSize() const { return m_table.size(); }
    unsigned int GetFirstFreeSlot() const { return m_firstFreeSlot; }
    unsigned int GetFreeCount() const { return m_freeCount; }

private:
    using Table = std::vector<Vesk::StringBase<char>>;

    // The record of `name` when it is valid here, else null.
    const Qmx_CorrName_Basic* GetValidRecord(Qmx_CorrNameHandle name) const;
    unsigned int PlaceString(const Vesk::StringBase<char>& text);
    void FreeSlot(unsigned int index);
    static void DropHolder(Qmx_CorrName_Basic* record);
    std::size_t CountDuplicates() const;
    void WriteTable(Qmx_CorrStream& stream) const;
    void ReadTable(Qmx_CorrStream& stream, const Vesk::StringBase<char>& dbName);

    Qmx_CorrName_Basic* m_nullRecord;  // owned; reference count 0, index 0, no holders
    Table m_table;                     // slot 0 is the empty string
    unsigned int m_firstFreeSlot;      // meaningful only while m_freeCount is not 0
    unsigned int m_freeCount;
};

#endif
