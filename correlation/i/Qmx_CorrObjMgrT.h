// Qmx_CorrObjMgrT: the pool manager of one kind of pooled object (items, explicit
// relationships). Objects live in pools of 128 (Qmx_ObjectPoolT); each is known by a 32-bit
// handle, (pool index + 1) * 128 + slot, 0 being the null handle. Every pool has a fixed place
// in the manager's pool stream, so that it is loaded when a handle into it is followed and
// stays in memory until it is flushed with the unload flag; pointers to objects are valid only
// while their pool is in memory. Pools hold the objects of one container id each; pools
// emptied by Destroy are reused for any container.
//
// The data manager owns the manager; the archive attaches it to a database (OpenDb), commits
// it and detaches it (CloseDb). The manager owns its pools, its objects and the storage over
// its pool stream; the database owns the streams. One thread at a time.
//
// Pool stream (internal; 4-byte integers least significant byte first; R = the pool record
// size, recordSize * 128 + 20, layout in Qmx_ObjectPoolT.h):
//   offset       size  field
//   0            4     format version, 0
//   4            4     R
//   8            4     pool count P
//   12 + i * R   R     the record of pool i, i = 0 to P - 1
// A pool emptied and not reused keeps its old record; only the free-pool stream says it is
// free. Commit pads the stream with zero bytes to 12 + P * R where pools were never written.
//
// Free-pool stream (portable; 4-byte integers):
//   version 0, entry count N, then N entries in strictly ascending key order, each: key
//   (a container id, or kReuseKey for emptied pools that any container may reuse), count M,
//   M pool indices (the last one is used first). Every index is below P and occurs once.
//
// Damaged streams are refused with Qmx_CorrException::InvalidDatabaseFormat carrying the
// database name; GetPtr of a handle that names no live object gives null and a trace.
#ifndef QMX_CORROBJMGRT_H
#define QMX_CORROBJMGRT_H
#include <cassert>
#include <climits>
#include <cstdint>
#include <iostream>
#include <map>
#include <memory>
#include <set>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <typeinfo>
#include <unordered_set>
#include <utility>
#include <vector>

#include "Qmx_CorrDb.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrPtrSwizzlerT.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStorageData.h"
#include "Qmx_CorrStream.h"
#include "Qmx_CorrStreamCloser.h"
#include "Qmx_CorrStream_Buffer.h"
#include "Qmx_ObjectPoolT.h"

class Qmx_CorrObjectOwner;

namespace Qmx_CorrObjMgrTData {

// What the manager's traces and exceptions name as their source.
inline constexpr const char* kSourceFile = "correlation/i/Qmx_CorrObjMgrT";
inline constexpr const char* kRevision = "1";

// The key of the pools that were emptied and may be reused by any container.
inline constexpr unsigned int kReuseKey = 0xFFFFFFFFu;

// A sequence of pool indices used from its end, with a membership set beside it so that
// "append unless present" and "is it listed" do not scan the sequence.
class PoolIndexStack {
public:
    bool Empty() const { return m_order.empty(); }
    std::size_t Size() const { return m_order.size(); }
    unsigned int Back() const { return m_order.back(); }
    const std::vector<unsigned int>& Indices() const { return m_order; }
    bool Contains(unsigned int index) const { return m_members.count(index) != 0; }
    // Appends `index` unless it is listed already; false when it was.
    bool PushUnique(unsigned int index) {
        if (!m_members.insert(index).second) return false;
        m_order.push_back(index);
        return true;
    }
    void PopBack() {
        m_members.erase(m_order.back());
        m_order.pop_back();
    }
    // Removes `index` wherever it stands; the order of the others is kept.
    void Remove(unsigned int index) {
        if (m_members.erase(index) == 0) return;
        for (auto it = m_order.end(); it != m_order.begin();) {
            if (*--it == index) {
                m_order.erase(it);
                return;
            }
        }
    }

private:
    std::vector<unsigned int> m_order;
    std::unordered_set<unsigned int> m_members;
};

// T: the pooled class (see Qmx_ObjectPoolT.h for what it provides); H: the handle type,
// unsigned int; PoolT: a class derived from Qmx_ObjectPoolT<T, 128>.
template <class T, class H, class PoolT>
class Qmx_CorrObjMgrT {
    static_assert(std::is_same<H, unsigned int>::value, "handles are unsigned 32-bit");

public:
    static constexpr unsigned int kPoolSize = 128;
    static constexpr unsigned int kHeaderSize = 12;
    // At most this many pools, so that every handle fits in 32 bits.
    static constexpr unsigned int kMaxPoolCount = 0xFFFFFFFFu / kPoolSize;

    // Turns handles into pointers and back for Qmx_CorrStorage, through its manager, which
    // must outlive it.
    class ManagedSwizzler : public Qmx_CorrPtrSwizzlerT<T, unsigned int> {
    public:
        explicit ManagedSwizzler(Qmx_CorrObjMgrT* manager) : m_manager(manager) {}
        unsigned int GetHandle(T* object) override { return m_manager->GetHandle(object); }
        T* GetPtr(unsigned int handle) override { return m_manager->GetPtr(handle); }

    private:
        Qmx_CorrObjMgrT* m_manager;  // not owned
    };

    // `name` is the pool stream, `dataName` the free-pool stream; `recordSize` the exact
    // size of one object's Archive record. REQUIRES: recordSize * 128 + 20 fits in 32 bits.
    Qmx_CorrObjMgrT(const Vesk::StringBase<char>& name, const Vesk::StringBase<char>& dataName,
                    unsigned int recordSize)
        : m_headerSize(kHeaderSize),
          m_recordSize(recordSize),
          m_poolRecordSize(recordSize * kPoolSize + PoolT::kRecordHeadSize),
          m_usedStreamSize(0),
          m_name(name),
          m_dataName(dataName),
          m_db(nullptr),
          m_owner(nullptr),
          m_streamEnd(0),
          m_zeros(recordSize, '\0') {
        assert(recordSize <= (0xFFFFFFFFu - PoolT::kRecordHeadSize) / kPoolSize);
        static_assert(PoolT::kCapacity == kPoolSize, "pools hold 128 objects");
    }
    // Deletes every pool in memory, destroying its objects; writes nothing.
    virtual ~Qmx_CorrObjMgrT() {
        for (PoolT* pool : m_pools) delete pool;
    }
    Qmx_CorrObjMgrT(const Qmx_CorrObjMgrT&) = delete;
    Qmx_CorrObjMgrT& operator=(const Qmx_CorrObjMgrT&) = delete;

    // A new swizzler over this manager; the caller owns it.
    ManagedSwizzler* GetNewSwizzler() { return new ManagedSwizzler(this); }

    // Attaches to `db` and reads the free-pool stream and the pool stream header; no pool is
    // loaded. Creates the pool stream when it is missing. Throws CannotWriteDatabase (with
    // the pool stream name) when the pool stream cannot be opened, InvalidDatabaseFormat
    // (with the database name) when a stream is damaged; after a throw the manager is
    // detached and empty, as constructed. REQUIRES: not attached.
    void OpenDb(Qmx_CorrDb* db, Qmx_CorrStorageData& data, Qmx_CorrObjectOwner* owner) {
        m_db = db;
        m_owner = owner;
        try {
            ReadFreePools(data);
            OpenPoolStream(data);
            ReadHeader();
            CheckFreePools();
        } catch (...) {
            Detach();
            throw;
        }
    }

    // The object of `handle`, loading its pool when needed. Null, with a trace, for 0, for a
    // handle beyond the pools, in an emptied pool, or of a free slot. Throws
    // InvalidDatabaseFormat when the pool's record is damaged.
    T* GetPtr(unsigned int handle) {
        if (handle == 0) return nullptr;
        const unsigned int index = GetPoolIndex(handle);
        if (index >= m_pools.size()) {
            QMX_CORR_TRACE("POOL", 1,
                           "ERROR: Request to get item for handle but handle is out of range. "
                           "Returning NULL.");
            return nullptr;
        }
        PoolT* pool = LoadPool(index);
        T* object = pool ? pool->GetObject(handle % kPoolSize) : nullptr;
        if (!object) {
            QMX_CORR_TRACE("POOL", 2,
                           "Attempt to get pointer by offset but given offset is not in use "
                           "currently.");
        }
        return object;
    }

    // 0 for null or for an address in no pool in memory. Throws std::invalid_argument for an
    // address inside a pool's object storage that is not the start of a slot.
    unsigned int GetHandle(const T* object) const {
        const LoadedRange* range = FindRange(object);
        if (!range) return 0;
        const std::uintptr_t offset = reinterpret_cast<std::uintptr_t>(object) - range->begin;
        if (offset % sizeof(T) != 0) {
            throw std::invalid_argument("GetPtrOffset called with invalid pointer");
        }
        return range->baseHandle + static_cast<unsigned int>(offset / sizeof(T));
    }

    // Destroys `object` and gives its slot back; an emptied pool is deleted and its index
    // reused, or dropped when it is the last pool. Null, or an address in no pool in memory,
    // does nothing. Throws the int 1, changing nothing, for an address in a pool that is not a
    // live object.
    void Destroy(T* object) {
        const LoadedRange* range = FindRange(object);
        if (!range) return;
        const unsigned int index = GetPoolIndex(range->baseHandle);
        PoolT* pool = m_pools[index];
        pool->Destroy(object);
        if (!pool->IsEmpty()) {
            m_poolsWithFreeSlots[pool->GetContainerId()].PushUnique(index);
            return;
        }
        ForgetFreePool(pool->GetContainerId(), index);
        if (index + 1 == m_pools.size()) {
            m_pools.pop_back();
        } else {
            m_poolsWithFreeSlots[kReuseKey].PushUnique(index);
            m_pools[index] = nullptr;
        }
        Unregister(pool, index);
        delete pool;
    }

    // The pool of `index`, read from the pool stream when it is not in memory. Null when
    // `index` names no pool, names an emptied pool waiting for reuse, or the pool is not in
    // memory and the manager is detached. Throws InvalidDatabaseFormat for a damaged record;
    // the pool then stays unloaded.
    PoolT* LoadPool(unsigned int index) {
        if (index >= m_pools.size()) return nullptr;
        if (m_pools[index]) return m_pools[index];  // a reusable pool is never in memory
        if (IsReusable(index) || !m_storage) return nullptr;
        QMX_CORR_TRACE("POOL", 8, "Pool " << m_name << ": Loading pool " << index << " from disk.");
        std::unique_ptr<PoolT> pool(new PoolT());
        m_pools[index] = pool.get();
        Register(pool.get(), index);
        try {
            RestorePool(*pool, index);
        } catch (...) {
            m_pools[index] = nullptr;
            Unregister(pool.get(), index);
            throw;
        }
        m_loadedByContainer[pool->GetContainerId()].insert(index);
        QMX_CORR_TRACE("POOL", 11,
                       "Pool " << m_name << ": " << m_loadedPools.size() << " out of "
                               << m_pools.size() << " pools are currently in memory.");
        return pool.release();
    }

    // Writes pool `index` to its place in the pool stream if it is in memory; with `unload`
    // also deletes it (destroying its objects). Detached, nothing is written or unloaded.
    void FlushPool(unsigned int index, bool unload) {
        if (!WritePool(index) || !unload) return;
        PoolT* pool = m_pools[index];
        m_pools[index] = nullptr;
        Unregister(pool, index);
        delete pool;
        QMX_CORR_TRACE("POOL", 11,
                       "Pool " << m_name << ": " << m_loadedPools.size() << " out of "
                               << m_pools.size() << " pools are currently in memory.");
    }

    // FlushPool for every pool in memory whose container id is `containerId`.
    void FlushPools(unsigned int containerId, bool unload) {
        QMX_CORR_TRACE("POOL", 11,
                       "Pool " << m_name << ": "
                               << "Flushing all pools with ID " << containerId);
        unsigned int flushed = 0;
        auto loaded = m_loadedByContainer.find(containerId);
        if (loaded != m_loadedByContainer.end() && m_storage) {
            const std::vector<unsigned int> indices(loaded->second.begin(), loaded->second.end());
            for (unsigned int index : indices) {
                FlushPool(index, unload);
                ++flushed;
            }
        }
        QMX_CORR_TRACE("POOL", 11,
                       "Pool " << m_name << ": "
                               << "Flushed " << flushed << " pools"
                               << (unload ? " and removed them from memory." : "."));
    }

    // FlushPool for every pool, in index order.
    void FlushAllPools(bool unload) {
        TraceFlushAll(unload);
        for (unsigned int index = 0; index < m_pools.size(); ++index) FlushPool(index, unload);
    }

    // Writes the free-pool stream (from scratch), the pool stream header and every pool in
    // memory, which stays in memory. Throws CannotWriteDatabase (with the free-pool stream
    // name) when the free-pool stream cannot be opened or the manager is detached; nothing is
    // written then.
    void Commit() const {
        if (!m_db) QMX_CORR_THROW(CannotWriteDatabase, m_dataName.c_str());
        WriteFreePools();
        WriteHeader();
        TraceFlushAll(false);
        for (unsigned int index = 0; index < m_pools.size(); ++index) WritePool(index);
        m_usedStreamSize = static_cast<unsigned int>(UsedSize(m_pools.size()));
        PadStreamTo(m_usedStreamSize);
    }

    // Detaches from the database: closes the pool stream and, after a commit, cuts it to the
    // size that commit used. Pools in memory stay; others can no longer be loaded.
    void CloseDb() {
        if (!m_db) return;
        Qmx_CorrStream* stream = m_storage->GetStream();
        m_storage.reset();
        m_db->CloseStream(stream);
        // SetStreamSize takes an int; a longer stream keeps its stale tail, which no reader
        // looks at.
        if (m_usedStreamSize != 0 && m_usedStreamSize <= static_cast<unsigned int>(INT_MAX)) {
            m_db->SetStreamSize(m_name, static_cast<int>(m_usedStreamSize));
        }
        m_db = nullptr;
    }

    unsigned int GetNumPools() const { return static_cast<unsigned int>(m_pools.size()); }
    unsigned int GetNumLoadedPools() const {
        return static_cast<unsigned int>(m_loadedPools.size());
    }
    bool PoolInMemory(unsigned int index) const {
        return index < m_pools.size() && m_pools[index] != nullptr;
    }
    // Handles below 128 give an index beyond every pool.
    static unsigned int GetPoolIndex(unsigned int handle) { return handle / kPoolSize - 1; }

    // Writes version 0, the pool record size and the pool count at the start of the pool
    // stream. Throws InvalidDatabaseFormat when the header read at opening was not 12 bytes.
    // REQUIRES: attached.
    void WriteHeader() const {
        assert(m_storage);
        Qmx_CorrStream* stream = m_storage->GetStream();
        stream->SeekPos(0);
        if (m_headerSize != kHeaderSize) QMX_CORR_THROW(InvalidDatabaseFormat, DbName().c_str());
        stream->WriteUINT32(0);
        stream->WriteUINT32(m_poolRecordSize);
        stream->WriteUINT32(static_cast<unsigned int>(m_pools.size()));
        if (m_streamEnd < kHeaderSize) m_streamEnd = kHeaderSize;
    }

    void DbgDump(std::ostream& out, unsigned int indent) const {
        Qmx_CorrDbg::Println(out, indent, "%s", Qmx_CorrDbg::GetDumpName(typeid(*this)).c_str());
        Qmx_CorrDbg::Println(out, indent, "{");
        Qmx_CorrDbg::Println(out, indent + 1, "Contains %d object pools",
                             static_cast<int>(m_pools.size()));
        Qmx_CorrDbg::Println(out, indent + 1, "%d pools are currently loaded",
                             static_cast<int>(m_loadedPools.size()));
        for (unsigned int index = 0; index < m_pools.size(); ++index) {
            if (m_pools[index]) {
                Qmx_CorrDbg::Println(out, indent + 1, "Pool %d:", static_cast<int>(index));
                m_pools[index]->DbgDump(out, indent + 1);
            } else {
                Qmx_CorrDbg::Println(out, indent + 1, "Pool %d is not loaded.",
                                     static_cast<int>(index));
            }
        }
        Qmx_CorrDbg::Println(out, indent, "}");
    }
    void DbgDump() const { DbgDump(std::cerr, 0); }

    // False, without a message, when a pool in memory fails its own check or its address
    // registration, or a registered range belongs to no pool in memory.
    bool DbgValidateState() const {
        for (unsigned int index = 0; index < m_pools.size(); ++index) {
            const PoolT* pool = m_pools[index];
            if (!pool) continue;
            if (!pool->DbgValidateState()) return false;
            auto range = m_loadedPools.find(pool->StorageBegin());
            if (range == m_loadedPools.end() || range->second.baseHandle != BaseHandle(index)) {
                return false;
            }
        }
        for (const auto& entry : m_loadedPools) {
            const unsigned int index = GetPoolIndex(entry.second.baseHandle);
            if (index >= m_pools.size() || !m_pools[index] ||
                m_pools[index]->StorageBegin() != entry.first) {
                return false;
            }
        }
        return true;
    }

protected:
    // A pool of `containerId` with a free slot: the last listed pool of that container that
    // is not full, else a new pool at the last reusable index or at the end. Null when no new
    // pool can be had (the handle space is used up, or the pool is not in memory and the
    // manager is detached). Throws InvalidDatabaseFormat when a listed pool belongs to another
    // container. REQUIRES: containerId != kReuseKey.
    PoolT* GetNextPoolWithFreeSlot(unsigned int containerId) {
        PoolIndexStack& listed = m_poolsWithFreeSlots[containerId];
        while (!listed.Empty()) {
            PoolT* pool = LoadPool(listed.Back());
            if (!pool) return nullptr;
            if (pool->GetContainerId() != containerId) {
                QMX_CORR_THROW(InvalidDatabaseFormat, DbName().c_str());
            }
            if (!pool->IsFull()) return pool;
            listed.PopBack();
        }
        PoolIndexStack& reusable = m_poolsWithFreeSlots[kReuseKey];
        unsigned int index;
        if (reusable.Empty()) {
            if (m_pools.size() >= MaxPoolCount()) return nullptr;
            m_pools.push_back(nullptr);
            index = static_cast<unsigned int>(m_pools.size() - 1);
        } else {
            index = reusable.Back();
            reusable.PopBack();
        }
        return CreateNewPool(listed, index, containerId);
    }

    // Makes an empty pool of `containerId` at `index` (in memory only until it is flushed)
    // and lists it in `listed`. REQUIRES: entry `index` of the pools exists and is null.
    PoolT* CreateNewPool(PoolIndexStack& listed, unsigned int index, unsigned int containerId) {
        QMX_CORR_TRACE(
            "POOL", 5,
            "Pool " << m_name << ": Creating a new pool for container Id " << containerId);
        PoolT* pool = new PoolT();
        pool->SetContainerId(containerId);
        m_pools[index] = pool;
        Register(pool, index);
        m_loadedByContainer[containerId].insert(index);
        listed.PushUnique(index);
        return pool;
    }

    // A new object T(args...) in a free slot of a pool of `containerId`; null when no slot
    // can be had. What the managers of items and explicit relationships create with.
    template <class... Args>
    T* CreateObject(unsigned int containerId, Args&&... args) {
        PoolT* pool = GetNextPoolWithFreeSlot(containerId);
        return pool ? pool->Create(std::forward<Args>(args)...) : nullptr;
    }

private:
    struct LoadedRange {
        std::uintptr_t begin;  // the pool's object storage, [begin, end)
        std::uintptr_t end;
        unsigned int baseHandle;  // handle of slot 0
    };

    static unsigned int BaseHandle(unsigned int index) { return (index + 1) * kPoolSize; }

    Vesk::StringBase<char> DbName() const { return m_db->GetName(); }

    std::uint64_t UsedSize(std::uint64_t poolCount) const {
        return m_headerSize + poolCount * m_poolRecordSize;
    }

    // The most pools whose handles fit in 32 bits and whose records end within a 32-bit
    // stream position.
    std::size_t MaxPoolCount() const {
        const std::uint64_t bySize = (0xFFFFFFFFull - kHeaderSize) / m_poolRecordSize;
        return static_cast<std::size_t>(bySize < kMaxPoolCount ? bySize : kMaxPoolCount);
    }

    bool IsReusable(unsigned int index) const {
        auto reusable = m_poolsWithFreeSlots.find(kReuseKey);
        return reusable != m_poolsWithFreeSlots.end() && reusable->second.Contains(index);
    }

    // Objects are mostly looked up near the one before (a container's items, a chain of
    // relationships), so the last range found is tried before the map.
    const LoadedRange* FindRange(const T* object) const {
        if (!object || m_loadedPools.empty()) return nullptr;
        const std::uintptr_t address = reinterpret_cast<std::uintptr_t>(object);
        if (m_lastRange && address >= m_lastRange->begin && address < m_lastRange->end)
            return m_lastRange;
        auto next = m_loadedPools.upper_bound(address);
        if (next == m_loadedPools.begin()) return nullptr;
        const LoadedRange& range = (--next)->second;
        if (address >= range.end) return nullptr;
        m_lastRange = &range;
        return &range;
    }

    void Register(const PoolT* pool, unsigned int index) {
        m_loadedPools[pool->StorageBegin()] =
            LoadedRange{pool->StorageBegin(), pool->StorageEnd(), BaseHandle(index)};
    }

    void Unregister(const PoolT* pool, unsigned int index) {
        m_lastRange = nullptr;
        m_loadedPools.erase(pool->StorageBegin());
        auto loaded = m_loadedByContainer.find(pool->GetContainerId());
        if (loaded == m_loadedByContainer.end()) return;
        loaded->second.erase(index);
        if (loaded->second.empty()) m_loadedByContainer.erase(loaded);
    }

    // An emptied pool leaves its container's list; the key goes with its last pool.
    void ForgetFreePool(unsigned int containerId, unsigned int index) {
        auto listed = m_poolsWithFreeSlots.find(containerId);
        if (listed == m_poolsWithFreeSlots.end()) return;
        listed->second.Remove(index);
        if (listed->second.Empty()) m_poolsWithFreeSlots.erase(listed);
    }

    // Back to the state of construction, after an OpenDb that failed.
    void Detach() {
        for (PoolT* pool : m_pools) delete pool;
        m_pools.clear();
        m_loadedPools.clear();
        m_lastRange = nullptr;
        m_loadedByContainer.clear();
        m_poolsWithFreeSlots.clear();
        if (m_storage) {
            Qmx_CorrStream* stream = m_storage->GetStream();
            m_storage.reset();
            m_db->CloseStream(stream);
        }
        m_headerSize = kHeaderSize;
        m_streamEnd = 0;
        m_db = nullptr;
        m_owner = nullptr;
    }

    // No stream means no free pools. Nothing is reserved from a count: a portable stream may
    // not know its length, so a damaged count runs into the end of the data instead.
    void ReadFreePools(Qmx_CorrStorageData& data) {
        Qmx_CorrStream* stream =
            m_db->OpenStream(m_dataName, Qmx_CorrDb::kRead | Qmx_CorrDb::kPortable);
        if (!stream) return;
        Qmx_CorrStreamCloser closer(m_db, stream);
        Qmx_CorrStorage storage(DbName(), stream, data);
        if (storage.ReadUINT32() != 0) QMX_CORR_THROW(InvalidDatabaseFormat, DbName().c_str());
        const unsigned int entries = storage.ReadUINT32();
        storage.CheckCount(entries, 8);
        for (unsigned int entry = 0; entry < entries; ++entry) ReadFreePoolEntry(storage);
        if (stream->HasMoreBytes()) QMX_CORR_THROW(InvalidDatabaseFormat, DbName().c_str());
    }

    void ReadFreePoolEntry(Qmx_CorrStorage& storage) {
        const unsigned int key = storage.ReadUINT32();
        if (!m_poolsWithFreeSlots.empty() && m_poolsWithFreeSlots.rbegin()->first >= key) {
            QMX_CORR_THROW(InvalidDatabaseFormat, DbName().c_str());
        }
        PoolIndexStack& listed = m_poolsWithFreeSlots[key];
        const unsigned int count = storage.ReadUINT32();
        storage.CheckCount(count, 4);
        for (unsigned int i = 0; i < count; ++i) {
            if (!listed.PushUnique(storage.ReadUINT32())) {
                QMX_CORR_THROW(InvalidDatabaseFormat, DbName().c_str());
            }
        }
    }

    // Every listed index names a pool of the stream, and no pool is listed twice: a pool
    // listed for two containers, or also as reusable, would be handed out twice.
    void CheckFreePools() const {
        std::unordered_set<unsigned int> seen;
        for (const auto& entry : m_poolsWithFreeSlots) {
            for (unsigned int index : entry.second.Indices()) {
                if (index >= m_pools.size() || !seen.insert(index).second) {
                    QMX_CORR_THROW(InvalidDatabaseFormat, DbName().c_str());
                }
            }
        }
    }

    void OpenPoolStream(Qmx_CorrStorageData& data) {
        QMX_CORR_TRACE("POOL", 10, "Opening data stream " << m_name);
        const bool exists = m_db->StreamExists(m_name);
        const int mode =
            Qmx_CorrDb::kRead | Qmx_CorrDb::kWrite | (exists ? 0 : Qmx_CorrDb::kTruncate);
        Qmx_CorrStream* stream = m_db->OpenStream(m_name, mode);
        if (!stream) QMX_CORR_THROW(CannotWriteDatabase, m_name.c_str());
        m_storage.reset(new Qmx_CorrStorage(DbName(), stream, data));
        if (!exists) WriteHeader();
        stream->SeekEnd();
        m_streamEnd = stream->GetPos();
    }

    // The pool records must fit in what follows the header: a damaged count must not lead
    // to reads beyond the data, and records of another size cannot be ours.
    void ReadHeader() {
        Qmx_CorrStream* stream = m_storage->GetStream();
        stream->SeekPos(0);
        if (stream->ReadUINT32() != 0) QMX_CORR_THROW(InvalidDatabaseFormat, DbName().c_str());
        const unsigned int poolRecordSize = stream->ReadUINT32();
        const unsigned int poolCount = stream->ReadUINT32();
        m_headerSize = stream->GetPos();
        if (m_headerSize != kHeaderSize || poolRecordSize != m_poolRecordSize ||
            poolCount > MaxPoolCount()) {
            QMX_CORR_THROW(InvalidDatabaseFormat, DbName().c_str());
        }
        m_storage->CheckCount(poolCount, poolRecordSize);
        QMX_CORR_TRACE("POOL", 11,
                       "Data stream " << m_name << " contains " << poolCount << " pools.");
        m_pools.assign(poolCount, nullptr);
    }

    // The record is read from the file in one piece and parsed in memory.
    void RestorePool(PoolT& pool, unsigned int index) {
        Qmx_CorrStream* stream = m_storage->GetStream();
        const std::uint64_t start = UsedSize(index);
        stream->SeekPos(static_cast<unsigned int>(start));
        m_storage->CheckCount(1, m_poolRecordSize);
        std::string bytes(m_poolRecordSize, '\0');
        stream->read(&bytes[0], m_poolRecordSize);
        Qmx_CorrStream_Buffer buffer(DbName());
        buffer.Assign(std::move(bytes));
        Qmx_CorrStorage storage(m_storage->GetName(), &buffer, m_storage->GetData());
        pool.Restore(storage, m_owner, m_recordSize);
        // Each record must take exactly its size, or the slots after it are misread.
        if (buffer.BytesLeft() != 0) QMX_CORR_THROW(InvalidDatabaseFormat, DbName().c_str());
    }

    // Writes pool `index` to its place; false when it is not in memory or the manager is
    // detached.
    bool WritePool(unsigned int index) const {
        if (index >= m_pools.size() || !m_pools[index] || !m_storage) return false;
        QMX_CORR_TRACE("ARCHIVE", 8,
                       "Pool " << m_name << ": Flushing pool " << index << " to disk.");
        const unsigned int start = static_cast<unsigned int>(UsedSize(index));
        PadStreamTo(start);
        // Built in memory and written in one piece.
        Qmx_CorrStream_Buffer buffer(DbName());
        buffer.Reserve(m_poolRecordSize);
        Qmx_CorrStorage storage(m_storage->GetName(), &buffer, m_storage->GetData());
        m_pools[index]->Archive(storage, m_recordSize, m_zeros.data());
        Qmx_CorrStream* stream = m_storage->GetStream();
        stream->SeekPos(start);
        stream->write(buffer.GetBytes().data(),
                      static_cast<unsigned int>(buffer.GetBytes().size()));
        if (m_streamEnd < start + m_poolRecordSize) m_streamEnd = start + m_poolRecordSize;
        return true;
    }

    // Fills the stream with zero bytes up to `size`, so that no pool record lies beyond its
    // end: a pool that was never written reads back as an empty pool.
    void PadStreamTo(unsigned int size) const {
        if (m_streamEnd >= size) return;
        Qmx_CorrStream* stream = m_storage->GetStream();
        stream->SeekPos(m_streamEnd);
        const std::vector<char> zeros(64 * 1024, '\0');
        while (m_streamEnd < size) {
            const unsigned int chunk = size - m_streamEnd < zeros.size()
                                           ? size - m_streamEnd
                                           : static_cast<unsigned int>(zeros.size());
            stream->write(zeros.data(), chunk);
            m_streamEnd += chunk;
        }
    }

    void WriteFreePools() const {
        Qmx_CorrStream* stream = m_db->OpenStream(
            m_dataName, Qmx_CorrDb::kWrite | Qmx_CorrDb::kTruncate | Qmx_CorrDb::kPortable);
        if (!stream) QMX_CORR_THROW(CannotWriteDatabase, m_dataName.c_str());
        Qmx_CorrStreamCloser closer(m_db, stream);
        stream->WriteUINT32(0);
        stream->WriteUINT32(static_cast<unsigned int>(m_poolsWithFreeSlots.size()));
        for (const auto& entry : m_poolsWithFreeSlots) {
            stream->WriteUINT32(entry.first);
            stream->WriteUINT32(static_cast<unsigned int>(entry.second.Size()));
            for (unsigned int index : entry.second.Indices()) stream->WriteUINT32(index);
        }
        // Closing cannot report a failure, so a write that fails must show here, before the
        // pool stream or the database is committed.
        stream->Flush();
    }

    void TraceFlushAll(bool unload) const {
        QMX_CORR_TRACE("POOL", 11,
                       "Pool " << m_name << ": " << m_loadedPools.size() << " out of "
                               << m_pools.size() << " pools are being flushed"
                               << (unload ? " and removed from memory." : "."));
    }

    unsigned int m_headerSize;                   // bytes before pool 0: 12
    unsigned int m_recordSize;                   // bytes of one object's record
    unsigned int m_poolRecordSize;               // m_recordSize * 128 + 20
    mutable unsigned int m_usedStreamSize;       // set by Commit; CloseDb cuts the stream to it
    std::vector<PoolT*> m_pools;                 // by pool index; null when not in memory; owned
    Vesk::StringBase<char> m_name;               // the pool stream
    Vesk::StringBase<char> m_dataName;           // the free-pool stream
    Qmx_CorrDb* m_db;                            // not owned; null when detached
    std::unique_ptr<Qmx_CorrStorage> m_storage;  // over the pool stream
    Qmx_CorrObjectOwner* m_owner;                // handed to every restored object
    // Object storage of each pool in memory, by its first address.
    std::map<std::uintptr_t, LoadedRange> m_loadedPools;
    mutable const LoadedRange* m_lastRange = nullptr;  // into m_loadedPools, or null
    // Pools of each container id that may have a free slot; kReuseKey: emptied pools.
    std::map<unsigned int, PoolIndexStack> m_poolsWithFreeSlots;
    // The indices of the pools in memory, by container id, so that flushing one container's
    // pools does not walk every pool.
    std::map<unsigned int, std::set<unsigned int>> m_loadedByContainer;
    mutable unsigned int m_streamEnd;  // length of the pool stream as far as written
    std::vector<char> m_zeros;         // m_recordSize zero bytes: a free slot's record
};

}  // namespace Qmx_CorrObjMgrTData

#endif
