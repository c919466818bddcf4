#include "Gorsk_Storage.h"

#include <sqlite3.h>

#include <algorithm>
#include <new>
#include <utility>

#include "Gorsk_AccessMode.h"
#include "Gorsk_Statement.h"
#include "Gorsk_Stream.h"
#include "Gorsk_Transaction.h"

namespace Gorsk {

namespace {

constexpr int kStreamBits = kAccessRead | kAccessWrite | kAccessTruncate;

bool IsStreamMode(int accessMode) {
    if ((accessMode & ~kStreamBits) != 0) return false;
    if ((accessMode & (kAccessRead | kAccessWrite)) == 0) return false;
    return (accessMode & kAccessTruncate) == 0 || (accessMode & kAccessWrite) != 0;
}

Status FindStorage(sqlite3* db, const Vesk::StringBase<char>& name, bool& found, std::int64_t& id) {
    Statement select(db, "SELECT id FROM gorsk_storage WHERE name = ?1");
    select.BindBlob(1, name);
    found = select.Step();
    if (found) id = select.ColumnInt64(0);
    return select.Result();
}

}  // namespace

Status Storage::Locate(sqlite3* db, const Vesk::StringBase<char>& name, bool create,
                       std::int64_t& id) {
    bool found = false;
    Status status = FindStorage(db, name, found, id);
    if (status != Status::kOk || found) return status;
    if (!create) return Status::kNotFound;
    // OR IGNORE: another client may make the same storage between the two statements.
    Statement insert(db, "INSERT OR IGNORE INTO gorsk_storage(name) VALUES(?1)");
    insert.BindBlob(1, name);
    status = insert.Run();
    if (status != Status::kOk) return status;
    status = FindStorage(db, name, found, id);
    return status == Status::kOk && !found ? Status::kStoreError : status;
}

Storage::Storage(sqlite3* db, std::int64_t id, int accessMode)
    : m_db(db), m_id(id), m_accessMode(accessMode) {}

Storage::~Storage() = default;

BrokI::IInterface* Storage::QueryInterface(const Vesk::ClassId& interfaceId) {
    static const Vesk::ClassId kObject(kIObjectId);
    static const Vesk::ClassId kStorage(kIStorageId);
    return interfaceId == kObject || interfaceId == kStorage ? this : nullptr;
}

Status Storage::OpenStream(const Vesk::StringBase<char>& streamName, int accessMode,
                           IStream** stream) {
    if (!stream) return Status::kBadRequest;
    *stream = nullptr;
    if (streamName.empty() || !IsStreamMode(accessMode)) return Status::kBadRequest;
    const bool write = (accessMode & kAccessWrite) != 0;
    if (write && (m_accessMode & kAccessWrite) == 0) return Status::kReadOnly;
    std::string content;
    if ((accessMode & kAccessTruncate) == 0) {
        bool found = false;
        const Status status = Load(streamName, content, found);
        if (status != Status::kOk) return status;
        if (!found && !write) return Status::kNotFound;
    }
    try {
        m_streams.push_back(
            std::make_unique<Stream>(streamName, accessMode, std::move(content), MaxStreamSize()));
    } catch (const std::bad_alloc&) {
        return Status::kStoreError;  // no exception leaves the component
    }
    *stream = m_streams.back().get();
    return Status::kOk;
}

Status Storage::CloseStream(IStream* stream) {
    const auto found = std::find_if(
        m_streams.begin(), m_streams.end(),
        [stream](const std::unique_ptr<Stream>& open) { return open.get() == stream; });
    if (!stream || found == m_streams.end()) return Status::kBadRequest;
    const std::unique_ptr<Stream> closing = std::move(*found);
    m_streams.erase(found);
    return closing->IsWritable() ? Store(*closing) : Status::kOk;
}

Status Storage::CloseAll() {
    Status first = Status::kOk;
    while (!m_streams.empty()) {
        const Status status = CloseStream(m_streams.front().get());
        if (first == Status::kOk) first = status;
    }
    return first;
}

Status Storage::Load(const Vesk::StringBase<char>& name, std::string& content, bool& found) const {
    Statement select(m_db, "SELECT data FROM gorsk_stream WHERE storage = ?1 AND name = ?2");
    select.BindInt64(1, m_id);
    select.BindBlob(2, name);
    found = select.Step();
    if (!found) return select.Result();
    try {
        content = select.ColumnBlob(0);
    } catch (const std::bad_alloc&) {
        return Status::kStoreError;
    }
    return Status::kOk;
}

Status Storage::Store(const Stream& stream) const {
    Transaction transaction(m_db);
    if (transaction.Begun() != Status::kOk) return transaction.Begun();
    {
        Statement upsert(m_db,
                         "INSERT INTO gorsk_stream(storage, name, data) VALUES(?1, ?2, ?3) "
                         "ON CONFLICT(storage, name) DO UPDATE SET data = excluded.data");
        upsert.BindInt64(1, m_id);
        upsert.BindBlob(2, stream.Name());
        upsert.BindBlob(3, stream.Content());
        const Status status = upsert.Run();
        if (status != Status::kOk) return status;
    }
    return transaction.Commit();
}

std::size_t Storage::MaxStreamSize() const {
    const int limit = sqlite3_limit(m_db, SQLITE_LIMIT_LENGTH, -1);
    return std::min<std::size_t>(limit > 0 ? static_cast<std::size_t>(limit) : 0, 0xFFFFFFFFu);
}

}  // namespace Gorsk
