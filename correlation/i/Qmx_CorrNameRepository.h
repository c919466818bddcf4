// Qmx_CorrNameRepository: the interned names of containers and items. A repository hands out
// name records for strings, gives their texts back, compares them byte-wise, counts their
// references, and keeps its string table in one stream of a database. Every open database has
// one (its own, or one its host passes in); objects reach it through their owner's
// GetNameRepo. Implementation: Qmx_CorrNameRepo_Basic. No locking: one thread at a time uses
// a repository and every database that shares it.
#ifndef QMX_CORRNAMEREPOSITORY_H
#define QMX_CORRNAMEREPOSITORY_H
#include "QmxCorrExport.h"
#include "Qmx_CorrNameHandle.h"
#include "Vesk_StringBase.h"

class Qmx_CorrDb;
class Qmx_CorrStorage;

class QMX_CORR_EXPORT Qmx_CorrNameRepository {
public:
    // Records still held by objects are not the repository's to destroy.
    virtual ~Qmx_CorrNameRepository();

    // Writes the string table into `db`. Throws CannotWriteDatabase (database name) when the
    // stream cannot be opened.
    virtual void Archive(Qmx_CorrDb* db) const = 0;
    // Replaces the string table by the one stored in `db`; a database without one gives the
    // empty table. Throws InvalidDatabaseFormat (database name) when the stored table is
    // damaged. Records that objects hold are not touched.
    virtual void Restore(Qmx_CorrDb* db) = 0;
    // Bytes one ArchiveName writes into an object record.
    virtual unsigned int GetNameArchiveSize() const = 0;
    virtual void ArchiveName(Qmx_CorrStorage& storage, Qmx_CorrNameHandle name) const = 0;
    // A new record exactly as stored (one holder); nothing is looked up or checked.
    virtual Qmx_CorrNameHandle RestoreName(Qmx_CorrStorage& storage) = 0;
    // A fresh record (one reference, one holder) in a slot of its own; equal texts are not
    // shared. The empty text gives the null record, which takes no reference.
    virtual Qmx_CorrNameHandle CreateName(const Vesk::StringBase<char>& text) = 0;
    // The empty string for an invalid handle.
    virtual Vesk::StringBase<char> GetString(Qmx_CorrNameHandle name) const = 0;
    // One more reference and holder of the same record; the null record for the empty name.
    virtual Qmx_CorrNameHandle CopyName(Qmx_CorrNameHandle name) = 0;
    // Gives one reference and holding back: the table slot is freed with the last reference,
    // the record object with its last holder. The handle must not be used afterwards.
    virtual void ReleaseName(Qmx_CorrNameHandle name) = 0;
    // Gives one holding back without touching the table or the reference count: the object
    // leaves memory but stays in the database. The handle must not be used afterwards.
    virtual void DiscardName(Qmx_CorrNameHandle name) = 0;
    // Byte-wise order of the texts (bytes unsigned, a proper prefix first); false for the
    // same record and when either handle is invalid.
    virtual bool IsLess(Qmx_CorrNameHandle a, Qmx_CorrNameHandle b) const = 0;
    // Equal texts; an invalid handle equals only itself.
    virtual bool IsEqual(Qmx_CorrNameHandle a, Qmx_CorrNameHandle b) const = 0;

    // Whether a restored record names a text of the string table. RestoreName checks nothing,
    // and a record beyond the table reads as the empty text: an object would silently lose
    // its name. Such a record equals not even the empty name. Asked for every object
    // restored, so a repository that can tell directly overrides it.
    virtual bool NamesStoredText(Qmx_CorrNameHandle name);

protected:
    Qmx_CorrNameRepository() = default;
    Qmx_CorrNameRepository(const Qmx_CorrNameRepository&) = default;
    Qmx_CorrNameRepository& operator=(const Qmx_CorrNameRepository&) = default;
};

#endif
