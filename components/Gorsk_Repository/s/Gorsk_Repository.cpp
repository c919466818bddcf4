#include "Gorsk_Repository.h"

#include <sqlite3.h>

#include <algorithm>
#include <cstdint>
#include <new>
#include <string>

#include "Gorsk_AccessMode.h"
#include "Gorsk_Statement.h"
#include "Gorsk_Storage.h"
#include "Gorsk_Transaction.h"

namespace Gorsk {

namespace {

constexpr int kOpenBits = kAccessRead | kAccessWrite | kAccessCreate | kAccessShared;

// Read is required, create needs write; truncate and unknown bits are refused.
bool IsOpenMode(int accessMode) {
    if ((accessMode & ~kOpenBits) != 0 || (accessMode & kAccessRead) == 0) return false;
    return (accessMode & kAccessCreate) == 0 || (accessMode & kAccessWrite) != 0;
}

bool IsPath(const Vesk::StringBase<char>& name) {
    return !name.empty() && name.find('\0') == std::string::npos;
}

int SqliteOpenFlags(int accessMode) {
    if ((accessMode & kAccessWrite) == 0) return SQLITE_OPEN_READONLY;
    return SQLITE_OPEN_READWRITE | ((accessMode & kAccessCreate) ? SQLITE_OPEN_CREATE : 0);
}

// One value of a query that yields a single integer (a pragma or a count).
Status QueryInt(sqlite3* db, const char* sql, std::int64_t& value) {
    Statement query(db, sql);
    value = query.Step() ? query.ColumnInt64(0) : 0;
    return query.Result();
}

}  // namespace

Repository::Repository() : m_db(nullptr), m_accessMode(0), m_references(1) {}

Repository::~Repository() {
    if (m_db) Close();
}

BrokI::IInterface* Repository::QueryInterface(const Vesk::ClassId& interfaceId) {
    static const Vesk::ClassId kObject(kIObjectId);
    static const Vesk::ClassId kRepository(kIRepositoryId);
    static const Vesk::ClassId kDisposable(kIDisposableId);
    static const Vesk::ClassId kRefCounted(kIRefCountedId);
    // Each interface reaches BrokI::IInterface through its own base; IRepository's is the
    // object's identity.
    if (interfaceId == kObject || interfaceId == kRepository) {
        return static_cast<IRepository*>(this);
    }
    if (interfaceId == kDisposable) return static_cast<IDisposable*>(this);
    if (interfaceId == kRefCounted) return static_cast<IRefCounted*>(this);
    return nullptr;
}

Status Repository::Open(const char* clientName, const Vesk::StringBase<char>& repositoryName,
                        int accessMode, IRepository** opened, unsigned int reserved) {
    if (!opened) return Status::kBadRequest;
    *opened = nullptr;
    if (m_db || reserved != 0 || !clientName || !*clientName || !IsPath(repositoryName) ||
        !IsOpenMode(accessMode)) {
        return Status::kBadRequest;
    }
    sqlite3* db = nullptr;
    const int code =
        sqlite3_open_v2(repositoryName.c_str(), &db, SqliteOpenFlags(accessMode), nullptr);
    Status status = Statement::FromSqlite(code);
    // SQLite falls back to reading only when the file may not be written; say so at once
    // rather than at the first stream close.
    if (status == Status::kOk && (accessMode & kAccessWrite) != 0 &&
        sqlite3_db_readonly(db, "main") == 1) {
        status = Status::kReadOnly;
    }
    if (status == Status::kOk) status = Configure(db, accessMode);
    if (status == Status::kOk) status = PrepareSchema(db, accessMode);
    if (status != Status::kOk) {
        sqlite3_close(db);  // also after a failed open, which may still have made a handle
        return status;
    }
    m_db = db;
    m_accessMode = accessMode;
    *opened = this;
    return Status::kOk;
}

Status Repository::Close() {
    if (!m_db) return Status::kBadRequest;
    Status first = Status::kOk;
    for (const std::unique_ptr<Storage>& storage : m_storages) {
        const Status status = storage->CloseAll();
        if (first == Status::kOk) first = status;
    }
    m_storages.clear();
    // Every statement is finalized by now, so the connection closes at once.
    sqlite3_close(m_db);
    m_db = nullptr;
    return first;
}

Status Repository::OpenStorage(const Vesk::StringBase<char>& storageName, int accessMode,
                               IStorage** storage) {
    if (!storage) return Status::kBadRequest;
    *storage = nullptr;
    if (!m_db || storageName.empty() || !IsOpenMode(accessMode)) return Status::kBadRequest;
    if ((accessMode & kAccessWrite) != 0 && (m_accessMode & kAccessWrite) == 0) {
        return Status::kReadOnly;
    }
    std::int64_t id = 0;
    const Status status = Storage::Locate(m_db, storageName, (accessMode & kAccessCreate) != 0, id);
    if (status != Status::kOk) return status;
    try {
        m_storages.push_back(std::make_unique<Storage>(m_db, id, accessMode));
    } catch (const std::bad_alloc&) {
        return Status::kStoreError;  // no exception leaves the component
    }
    *storage = m_storages.back().get();
    return Status::kOk;
}

Status Repository::ReleaseStorage(IStorage* storage) {
    const auto found = std::find_if(
        m_storages.begin(), m_storages.end(),
        [storage](const std::unique_ptr<Storage>& open) { return open.get() == storage; });
    if (!storage || found == m_storages.end()) return Status::kBadRequest;
    const Status status = (*found)->CloseAll();
    m_storages.erase(found);
    return status;
}

void Repository::Dispose() { Release(); }

unsigned int Repository::AddRef() { return ++m_references; }

unsigned int Repository::Release() {
    const unsigned int left = --m_references;
    if (left == 0) delete this;
    return left;
}

Status Repository::Configure(sqlite3* db, int accessMode) {
    sqlite3_extended_result_codes(db, 1);
    if ((accessMode & kAccessShared) != 0) {
        return Statement::FromSqlite(sqlite3_busy_timeout(db, kBusyTimeoutMs));
    }
    // Unshared: the first lock taken is kept until the connection closes.
    return Statement(db, "PRAGMA locking_mode = EXCLUSIVE").Run();
}

Status Repository::PrepareSchema(sqlite3* db, int accessMode) {
    const Status status = CheckSchema(db, false);
    if (status != Status::kNotFound || (accessMode & kAccessWrite) == 0) return status;
    // Look again and make the tables under the write lock, so that two clients that find
    // the same empty file never both make them.
    Transaction transaction(db);
    if (transaction.Begun() != Status::kOk) return transaction.Begun();
    const Status made = CheckSchema(db, true);
    return made == Status::kOk ? transaction.Commit() : made;
}

Status Repository::CheckSchema(sqlite3* db, bool mayCreate) {
    std::int64_t application = 0;
    std::int64_t version = 0;
    std::int64_t objects = 0;
    // The first read is where a file that is not a database shows (SQLITE_NOTADB).
    Status status = QueryInt(db, "PRAGMA application_id", application);
    if (status == Status::kOk) status = QueryInt(db, "PRAGMA user_version", version);
    if (status == Status::kOk) status = QueryInt(db, "SELECT count(*) FROM sqlite_schema", objects);
    if (status != Status::kOk) return status;
    if (application == kApplicationId) {
        return version == kFormatVersion ? Status::kOk : Status::kInvalidFormat;
    }
    // Another program's database: refuse it rather than add tables to it.
    if (application != 0 || objects != 0) return Status::kInvalidFormat;
    return mayCreate ? CreateSchema(db) : Status::kNotFound;
}

Status Repository::CreateSchema(sqlite3* db) {
    static const std::string kSchema =
        "CREATE TABLE gorsk_storage(id INTEGER PRIMARY KEY, name BLOB NOT NULL UNIQUE);"
        "CREATE TABLE gorsk_stream(storage INTEGER NOT NULL REFERENCES gorsk_storage(id),"
        " name BLOB NOT NULL, data BLOB NOT NULL, UNIQUE(storage, name));"
        "PRAGMA application_id = " +
        std::to_string(kApplicationId) +
        "; PRAGMA user_version = " + std::to_string(kFormatVersion) + ";";
    return Statement::FromSqlite(sqlite3_exec(db, kSchema.c_str(), nullptr, nullptr, nullptr));
}

}  // namespace Gorsk
