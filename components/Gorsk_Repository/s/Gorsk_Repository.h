// Gorsk::Repository: the class the component factory makes (Gorsk_IRepository.h). Holds one
// SQLite connection to the repository file while it is open, and the storages opened from it.
// It starts with one reference, its maker's, and destroys itself when the last is given back
// (Dispose or Release); it closes itself then if its holder did not.
#ifndef GORSK_REPOSITORY_H
#define GORSK_REPOSITORY_H
#include <memory>
#include <vector>

#include "Gorsk_IDisposable.h"
#include "Gorsk_IRefCounted.h"
#include "Gorsk_IRepository.h"

struct sqlite3;

namespace Gorsk {

class Storage;

class Repository final : public IRepository, public IDisposable, public IRefCounted {
public:
    Repository();
    Repository(const Repository&) = delete;
    Repository& operator=(const Repository&) = delete;

    // kIObjectId gives the IRepository base; so does kIRepositoryId.
    BrokI::IInterface* QueryInterface(const Vesk::ClassId& interfaceId) override;

    Status Open(const char* clientName, const Vesk::StringBase<char>& repositoryName,
                int accessMode, IRepository** opened, unsigned int reserved) override;
    Status Close() override;
    Status OpenStorage(const Vesk::StringBase<char>& storageName, int accessMode,
                       IStorage** storage) override;
    Status ReleaseStorage(IStorage* storage) override;

    void Dispose() override;
    unsigned int AddRef() override;
    unsigned int Release() override;

private:
    ~Repository() override;

    // Checks that `db` holds this component's tables, making them in an empty file when
    // `accessMode` has write.
    static Status PrepareSchema(sqlite3* db, int accessMode);
    static Status CheckSchema(sqlite3* db, bool mayCreate);
    static Status CreateSchema(sqlite3* db);
    static Status Configure(sqlite3* db, int accessMode);

    sqlite3* m_db;                                     // owned; null while not open
    int m_accessMode;                                  // Gorsk_AccessMode.h, of Open
    unsigned int m_references;                         // holders of this object
    std::vector<std::unique_ptr<Storage>> m_storages;  // open storages, owned
};

}  // namespace Gorsk

#endif
