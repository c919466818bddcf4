// Gorsk::IRepository: a project repository, one SQLite database file that holds named
// storages, each a named set of streams. The component factory makes one repository object
// per CreateInstance with kRepositoryClassId (BrokP_Factory.h); the object is bound to a file
// by Open and released through Gorsk::IDisposable (or Gorsk::IRefCounted) after Close. Several
// repository objects, in one process or in several, may use one file at the same time: every
// change is one SQLite transaction.
//
// The file (SQLite, application_id kApplicationId, user_version kFormatVersion):
//
// | table         | column  | type              | content                                  |
// |---------------|---------|-------------------|------------------------------------------|
// | gorsk_storage | id      | INTEGER PRIMARY KEY | the storage's number                   |
// |               | name    | BLOB, unique      | the storage name, every byte             |
// | gorsk_stream  | storage | INTEGER           | gorsk_storage.id of the storage          |
// |               | name    | BLOB              | the stream name, unique in its storage   |
// |               | data    | BLOB              | the stream's bytes (Gorsk_IStream.h)     |
//
// A file that is not an SQLite database, or one with another application_id, other tables
// and no application_id, or another user_version, is refused with kInvalidFormat and left as
// it is.
#ifndef GORSK_IREPOSITORY_H
#define GORSK_IREPOSITORY_H
#include "Gorsk_IObject.h"
#include "Gorsk_Status.h"
#include "Vesk_StringBase.h"

namespace Gorsk {

constexpr const char* kIRepositoryId = "6f695dca-d3d5-43b5-a4c9-71677df8f4c0";
// The class that the component factory makes.
constexpr const char* kRepositoryClassId = "a0c3cbf5-321f-4298-a065-581e276ab571";

constexpr int kApplicationId = 0x47524B31;  // "GRK1"
constexpr int kFormatVersion = 1;
// How long an open or a stream close waits for another client's lock, with kAccessShared.
constexpr int kBusyTimeoutMs = 5000;

class IStorage;

class IRepository : public IObject {
public:
    // Binds this object to the repository file `repositoryName` (a path; a name with a zero
    // byte is refused) with the access mode of Gorsk_AccessMode.h. `clientName` names the
    // caller and must not be empty; `reserved` must be 0. On success *opened is this same
    // interface, now open; on any failure it is null and nothing stays open. kNotFound: no
    // file and no create bit, or a read-only open of a file that holds no repository yet.
    virtual Status Open(const char* clientName, const Vesk::StringBase<char>& repositoryName,
                        int accessMode, IRepository** opened, unsigned int reserved) = 0;
    // Releases every storage still open (closing their streams, as IStorage::CloseStream
    // does), then unbinds the file. kStoreError when a stream could not be kept.
    virtual Status Close() = 0;
    // Opens the storage `storageName` (not empty; any bytes). *storage is null on failure.
    // The storage belongs to this repository until ReleaseStorage or Close.
    virtual Status OpenStorage(const Vesk::StringBase<char>& storageName, int accessMode,
                               IStorage** storage) = 0;
    // Closes the storage's open streams (as IStorage::CloseStream does) and destroys it.
    // kBadRequest for a storage that this repository did not hand out.
    virtual Status ReleaseStorage(IStorage* storage) = 0;

protected:
    ~IRepository() override = default;
};

}  // namespace Gorsk

#endif
