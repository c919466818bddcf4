// Gorsk::Storage: the component's storage object (Gorsk_IStorage.h), one row of
// gorsk_storage and the streams opened from it. Made and owned by Gorsk::Repository, which
// closes it before it closes its connection; owns its open streams.
#ifndef GORSK_STORAGE_H
#define GORSK_STORAGE_H
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "Gorsk_IStorage.h"

struct sqlite3;

namespace Gorsk {

class Stream;

class Storage final : public IStorage {
public:
    // The number of the storage `name` in `db`; with `create`, the storage is made when it is
    // missing. kNotFound when it is missing and may not be made.
    static Status Locate(sqlite3* db, const Vesk::StringBase<char>& name, bool create,
                         std::int64_t& id);

    // `accessMode` is the storage's (read, with or without write).
    Storage(sqlite3* db, std::int64_t id, int accessMode);
    // Drops open streams without storing them; CloseAll first to keep them.
    ~Storage() override;
    Storage(const Storage&) = delete;
    Storage& operator=(const Storage&) = delete;

    BrokI::IInterface* QueryInterface(const Vesk::ClassId& interfaceId) override;
    Status OpenStream(const Vesk::StringBase<char>& streamName, int accessMode,
                      IStream** stream) override;
    Status CloseStream(IStream* stream) override;

    // Closes every open stream as CloseStream does; the first failure, or kOk.
    Status CloseAll();

private:
    // The stored content of `name`; `found` false when there is none.
    Status Load(const Vesk::StringBase<char>& name, std::string& content, bool& found) const;
    // Replaces the stored content of the stream by its whole content, in one transaction.
    Status Store(const Stream& stream) const;
    std::size_t MaxStreamSize() const;

    sqlite3* m_db;                                   // the repository's connection, not owned
    std::int64_t m_id;                               // gorsk_storage.id
    int m_accessMode;                                // Gorsk_AccessMode.h
    std::vector<std::unique_ptr<Stream>> m_streams;  // open streams, owned
};

}  // namespace Gorsk

#endif
