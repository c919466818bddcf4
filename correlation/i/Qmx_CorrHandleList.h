// Qmx_CorrHandleList: a list of 32-bit pool handles in insertion order, with its first handle
// inline. Items keep their relationship handles and explicit relationships their item handles
// in it; most hold at most one per list, so only a second handle allocates. Not copyable: it
// lives inside pooled objects, which are never copied.
#ifndef QMX_CORRHANDLELIST_H
#define QMX_CORRHANDLELIST_H
#include <algorithm>
#include <cstddef>
#include <vector>

class Qmx_CorrHandleList {
public:
    enum : unsigned int { kEmpty = 0, kSingle = 1, kArray = 2 };

    Qmx_CorrHandleList() = default;
    Qmx_CorrHandleList(const Qmx_CorrHandleList&) = delete;
    Qmx_CorrHandleList& operator=(const Qmx_CorrHandleList&) = delete;
    ~Qmx_CorrHandleList() { Clear(); }

    unsigned int GetState() const { return m_state; }
    std::size_t Size() const { return m_state == kArray ? m_many->size() : m_state; }
    // REQUIRES: index < Size().
    unsigned int Get(std::size_t index) const {
        return m_state == kArray ? (*m_many)[index] : m_one;
    }
    bool Contains(unsigned int handle) const {
        if (m_state == kArray)
            return std::find(m_many->begin(), m_many->end(), handle) != m_many->end();
        return m_state == kSingle && m_one == handle;
    }
    // The handles in order, as a new vector.
    std::vector<unsigned int> ToVector() const {
        if (m_state == kArray) return *m_many;
        return m_state == kSingle ? std::vector<unsigned int>{m_one} : std::vector<unsigned int>();
    }

    // No duplicate check: the same handle may be added twice.
    void Add(unsigned int handle) {
        if (m_state == kEmpty) {
            m_one = handle;
            m_state = kSingle;
        } else if (m_state == kSingle) {
            m_many = new std::vector<unsigned int>{m_one, handle};
            m_state = kArray;
        } else {
            m_many->push_back(handle);
        }
    }
    // Fills an empty list from `handles`, in order, allocating at most once.
    void Assign(const std::vector<unsigned int>& handles) {
        Clear();
        if (handles.size() == 1) {
            Add(handles[0]);
        } else if (handles.size() > 1) {
            m_many = new std::vector<unsigned int>(handles);
            m_state = kArray;
        }
    }
    // Removes the first occurrence; a list left with one handle holds it inline again.
    // Returns whether one was removed.
    bool Remove(unsigned int handle) {
        if (m_state == kSingle) {
            if (m_one != handle) return false;
            m_state = kEmpty;
            m_one = 0;
            return true;
        }
        if (m_state != kArray) return false;
        auto it = std::find(m_many->begin(), m_many->end(), handle);
        if (it == m_many->end()) return false;
        m_many->erase(it);
        if (m_many->size() <= 1) {
            const bool one = m_many->size() == 1;
            const unsigned int last = one ? m_many->front() : 0;
            delete m_many;
            m_one = last;
            m_state = one ? kSingle : kEmpty;
        }
        return true;
    }
    void Clear() {
        if (m_state == kArray) delete m_many;
        m_state = kEmpty;
        m_one = 0;
    }

private:
    unsigned int m_state = kEmpty;
    union {
        unsigned int m_one = 0;             // kSingle
        std::vector<unsigned int>* m_many;  // kArray: two or more handles, owned
    };
};

#endif
