// Qmx_ObjectPoolT: N objects of T in one allocation, constructed and destroyed in place, with
// the record of the pool stream that holds them. A pool belongs to its Qmx_CorrObjMgrT, which
// creates, loads, writes and deletes it; deleting a pool destroys its live objects. A pool
// knows the id of the container whose objects it holds (0 for explicit relationships). One
// thread at a time.
//
// Free slots are found through `unusedRanges`: each entry is the first slot of a run of free
// slots, used as a stack (allocation takes the last entry). It always lists every free slot
// that is slot 0 or follows a live slot, and only free slots.
//
// Pool record (R = the record size of T; 4-byte integers least significant byte first):
//   offset       size  field
//   0            16    live bits: byte k holds slots 8k to 8k + 7, slot 8k in its lowest bit
//   16           4     container id
//   20 + s * R   R     slot s, s = 0 to N - 1: the object's Archive record when the slot is
//                      live, otherwise R zero bytes
// T provides T(Qmx_CorrStorage&, Qmx_CorrObjectOwner*) (reads exactly R bytes),
// Archive(Qmx_CorrStorage&) const (writes exactly R bytes) and DbgValidateState() const.
#ifndef QMX_OBJECTPOOLT_H
#define QMX_OBJECTPOOLT_H
#include <bitset>
#include <cstddef>
#include <cstdint>
#include <iostream>
#include <new>
#include <typeinfo>
#include <utility>
#include <vector>

#include "Qmx_CorrDbg.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStream.h"

class Qmx_CorrObjectOwner;

template <class T, unsigned int N>
class Qmx_ObjectPoolT {
public:
    static_assert(N > 0 && N % 8 == 0, "the live bits are stored in whole bytes");
    static constexpr unsigned int kCapacity = N;
    static constexpr unsigned int kBitBytes = N / 8;
    // Bytes of the record before the first slot.
    static constexpr unsigned int kRecordHeadSize = kBitBytes + 4;

    // An empty pool of container 0: no live object, unusedRanges = [0].
    Qmx_ObjectPoolT() : m_unusedRanges(1, 0u), m_containerId(0) {}
    // Destroys the live objects.
    virtual ~Qmx_ObjectPoolT() {
        for (unsigned int slot = 0; slot < N; ++slot) {
            if (m_inUse.test(slot)) Slot(slot)->~T();
        }
    }
    Qmx_ObjectPoolT(const Qmx_ObjectPoolT&) = delete;
    Qmx_ObjectPoolT& operator=(const Qmx_ObjectPoolT&) = delete;

    unsigned int GetContainerId() const { return m_containerId; }
    void SetContainerId(unsigned int containerId) { m_containerId = containerId; }

    bool IsFull() const { return m_unusedRanges.empty(); }
    bool IsEmpty() const { return m_inUse.none(); }
    unsigned int GetLiveCount() const { return static_cast<unsigned int>(m_inUse.count()); }
    bool IsLive(unsigned int slot) const { return slot < N && m_inUse.test(slot); }
    const std::vector<unsigned int>& GetUnusedRanges() const { return m_unusedRanges; }

    // The object in `slot`, or null when the slot is not live.
    T* GetObject(unsigned int slot) { return IsLive(slot) ? Slot(slot) : nullptr; }

    // The address range of the object storage, [begin, end).
    std::uintptr_t StorageBegin() const { return reinterpret_cast<std::uintptr_t>(m_objects); }
    std::uintptr_t StorageEnd() const { return StorageBegin() + sizeof(m_objects); }

    // Takes a free slot (the last entry of unusedRanges) and constructs T(args...) in it. Null
    // when the pool is full. If the constructor throws, the pool is as it was.
    template <class... Args>
    T* Create(Args&&... args) {
        if (m_unusedRanges.empty()) return nullptr;
        const unsigned int slot = m_unusedRanges.back();
        const bool advanced = TakeSlot();
        try {
            ::new (static_cast<void*>(m_objects + slot * sizeof(T))) T(std::forward<Args>(args)...);
        } catch (...) {
            m_inUse.reset(slot);
            // The vector keeps its capacity after pop_back, so this push cannot throw.
            if (advanced) {
                m_unusedRanges.back() = slot;
            } else {
                m_unusedRanges.push_back(slot);
            }
            throw;
        }
        return Slot(slot);
    }

    // Destroys the object at `object` and gives its slot back. Throws the int 1, changing
    // nothing, unless `object` is the address of a live object of this pool.
    void Destroy(T* object) {
        const std::uintptr_t address = reinterpret_cast<std::uintptr_t>(object);
        if (address < StorageBegin() || address >= StorageEnd()) throw 1;
        if ((address - StorageBegin()) % sizeof(T) != 0) throw 1;
        const unsigned int slot = static_cast<unsigned int>((address - StorageBegin()) / sizeof(T));
        if (!m_inUse.test(slot)) throw 1;
        Slot(slot)->~T();
        m_inUse.reset(slot);
        if (!RunIsListed(slot)) m_unusedRanges.push_back(slot);
    }

    // Replaces this empty pool's contents by the record at the storage's position (layout
    // above). The position must have room for the whole record. On an exception the objects
    // restored so far stay live; the caller deletes the pool.
    void Restore(Qmx_CorrStorage& storage, Qmx_CorrObjectOwner* owner, unsigned int recordSize) {
        Qmx_CorrStream* stream = storage.GetStream();
        unsigned char bits[kBitBytes];
        stream->read(reinterpret_cast<char*>(bits), kBitBytes);
        m_containerId = storage.ReadUINT32();
        std::vector<char> skipped(recordSize);
        for (unsigned int slot = 0; slot < N; ++slot) {
            if ((bits[slot / 8] >> (slot % 8)) & 1u) {
                ::new (static_cast<void*>(m_objects + slot * sizeof(T))) T(storage, owner);
                m_inUse.set(slot);
            } else if (recordSize != 0) {
                stream->read(skipped.data(), recordSize);
            }
        }
        RebuildUnusedRanges();
    }

    // Writes the record (layout above) at the storage's position; `zeros` holds recordSize
    // zero bytes.
    void Archive(Qmx_CorrStorage& storage, unsigned int recordSize, const char* zeros) const {
        unsigned char bits[kBitBytes] = {};
        for (unsigned int slot = 0; slot < N; ++slot) {
            if (m_inUse.test(slot)) bits[slot / 8] |= static_cast<unsigned char>(1u << (slot % 8));
        }
        Qmx_CorrStream* stream = storage.GetStream();
        stream->write(reinterpret_cast<const char*>(bits), kBitBytes);
        storage.WriteUINT32(m_containerId);
        for (unsigned int slot = 0; slot < N; ++slot) {
            if (m_inUse.test(slot)) {
                Slot(slot)->Archive(storage);
            } else if (recordSize != 0) {
                stream->write(zeros, recordSize);
            }
        }
    }

    // True when unusedRanges lists only free slots and every free slot that is slot 0 or
    // follows a live slot, and every live object is valid. Reports nothing.
    bool DbgValidateState() const {
        for (unsigned int slot : m_unusedRanges) {
            if (slot >= N || m_inUse.test(slot)) return false;
        }
        for (unsigned int slot = 0; slot < N; ++slot) {
            if (m_inUse.test(slot)) {
                if (!Slot(slot)->DbgValidateState()) return false;
            } else if ((slot == 0 || m_inUse.test(slot - 1)) && !IsListed(slot)) {
                return false;
            }
        }
        return true;
    }

    void DbgDump(std::ostream& out, unsigned int indent) const {
        Qmx_CorrDbg::Println(out, indent, "%s", Qmx_CorrDbg::GetDumpName(typeid(*this)).c_str());
        Qmx_CorrDbg::Println(out, indent, "{");
        Qmx_CorrDbg::Println(out, indent + 1, "ID: %d", static_cast<int>(m_containerId));
        if (!m_unusedRanges.empty()) {
            const unsigned int live = GetLiveCount();
            Qmx_CorrDbg::Println(out, indent + 1,
                                 "Pool contains %d objects out of a possible %d.  (%lf %% full)",
                                 static_cast<int>(live), static_cast<int>(N), live * 100.0 / N);
            Qmx_CorrDbg::Println(out, indent + 1, "Pool has %d unused ranges.",
                                 static_cast<int>(m_unusedRanges.size()));
        } else {
            Qmx_CorrDbg::Println(out, indent + 1, "Pool is 100%% full.");
        }
        Qmx_CorrDbg::Println(out, indent, "}");
    }
    void DbgDump() const { DbgDump(std::cerr, 0); }

private:
    T* Slot(unsigned int slot) {
        return std::launder(reinterpret_cast<T*>(m_objects + slot * sizeof(T)));
    }
    const T* Slot(unsigned int slot) const {
        return std::launder(reinterpret_cast<const T*>(m_objects + slot * sizeof(T)));
    }

    bool IsListed(unsigned int slot) const {
        for (unsigned int listed : m_unusedRanges) {
            if (listed == slot) return true;
        }
        return false;
    }

    // Marks the last listed slot live; its successor, when free and not yet listed, takes its
    // place (true), so the run it starts stays reachable; otherwise the entry goes (false).
    bool TakeSlot() {
        const unsigned int slot = m_unusedRanges.back();
        m_inUse.set(slot);
        const unsigned int next = slot + 1;
        if (next < N && !m_inUse.test(next) && !IsListed(next)) {
            m_unusedRanges.back() = next;
            return true;
        }
        m_unusedRanges.pop_back();
        return false;
    }

    // True when the freed `slot` already belongs to the run that the last entry starts.
    bool RunIsListed(unsigned int slot) const {
        if (m_unusedRanges.empty() || m_unusedRanges.back() > slot) return false;
        for (unsigned int free = m_unusedRanges.back(); free <= slot; ++free) {
            if (m_inUse.test(free)) return false;
        }
        return true;
    }

    // Ascending: every free slot that is slot 0 or follows a live slot.
    void RebuildUnusedRanges() {
        m_unusedRanges.clear();
        for (unsigned int slot = 0; slot < N; ++slot) {
            if (!m_inUse.test(slot) && (slot == 0 || m_inUse.test(slot - 1))) {
                m_unusedRanges.push_back(slot);
            }
        }
    }

    alignas(T) unsigned char m_objects[N * sizeof(T)];  // slot s at s * sizeof(T)
    std::bitset<N> m_inUse;                             // bit s: slot s holds a live object
    std::vector<unsigned int> m_unusedRanges;           // first slots of free runs; a stack
    unsigned int m_containerId;
};

#endif
