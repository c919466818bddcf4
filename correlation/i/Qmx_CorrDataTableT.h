// Qmx_CorrDataTableT: the slot table of one kind of shared data record (item or relationship
// records), whose slot positions are the indices that pooled objects archive. A null slot is
// free; the free-slot counter is kept as stored files and the slot rules expect it, even where
// a damaged file made it differ from the number of null slots. Besides the table sit two
// indexes that only make lookups fast: record to slot, and the null slots in order. Owned by
// its data manager; holds one reference to every record in it.
#ifndef QMX_CORRDATATABLET_H
#define QMX_CORRDATATABLET_H
#include <boost/shared_ptr.hpp>
#include <cstddef>
#include <set>
#include <unordered_map>
#include <vector>

template <class T>
class Qmx_CorrDataTableT {
public:
    typedef boost::shared_ptr<T> Record;

    std::size_t GetSize() const { return m_slots.size(); }
    unsigned int GetFreeSlots() const { return m_freeSlots; }
    void SetFreeSlots(unsigned int count) { m_freeSlots = count; }
    // Null for a free slot. REQUIRES: index < GetSize().
    const Record& GetSlot(std::size_t index) const { return m_slots[index]; }

    // While the counter says there are free slots, the first null slot from the front is
    // used; when it is wrong (no null slot is left) the record is appended and it becomes 0.
    unsigned int Add(const Record& record) {
        if (m_freeSlots != 0) {
            if (!m_nullSlots.empty()) {
                const unsigned int slot = *m_nullSlots.begin();
                m_nullSlots.erase(m_nullSlots.begin());
                m_slots[slot] = record;
                m_index[record.get()] = slot;
                --m_freeSlots;
                return slot;
            }
            m_freeSlots = 0;
        }
        Append(record);
        return static_cast<unsigned int>(m_slots.size() - 1);
    }

    // Appends as restoring does, without touching the counter; a null record makes a free slot.
    void Append(const Record& record) {
        const auto slot = static_cast<unsigned int>(m_slots.size());
        m_slots.push_back(record);
        if (record)
            m_index[record.get()] = slot;
        else
            m_nullSlots.insert(slot);
    }

    // Whether the record is in a slot, and which.
    bool Find(const T* record, unsigned int& slot) const {
        auto it = m_index.find(record);
        if (it == m_index.end()) return false;
        slot = it->second;
        return true;
    }

    // Frees the slot of `record` and counts it free; a record not in the table is ignored.
    void Free(const T* record) {
        unsigned int slot = 0;
        if (!Find(record, slot)) return;
        m_index.erase(record);
        m_slots[slot].reset();
        m_nullSlots.insert(slot);
        ++m_freeSlots;
    }

    void Clear() {
        m_slots.clear();
        m_index.clear();
        m_nullSlots.clear();
        m_freeSlots = 0;
    }
    void Reserve(std::size_t count) { m_slots.reserve(count); }

private:
    std::vector<Record> m_slots;
    unsigned int m_freeSlots = 0;
    std::unordered_map<const T*, unsigned int> m_index;  // every non-null slot's record
    std::set<unsigned int> m_nullSlots;                  // every null slot
};

#endif
