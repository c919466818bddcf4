// Qmx_CorrHandleList: a list of 32-bit pool handles in insertion order, with its first handle
// inline. Items keep their relationship handles and explicit relationships their item handles
// in it; most hold at most one per list, so only a second handle allocates. Not copyable: it
// lives inside pooled objects, which are never copied.
//
// The whole list is one 64-bit word, since a pooled object carries two of them: 0 is the
// empty list; an odd word holds one handle in its upper 32 bits; any other word is the
// address of the owned vector of two or more handles (a vector's address is even).
#ifndef QMX_CORRHANDLELIST_H
#define QMX_CORRHANDLELIST_H
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <vector>

class Qmx_CorrHandleList {
public:
    enum : unsigned int { kEmpty = 0, kSingle = 1, kArray = 2 };

    Qmx_CorrHandleList() = default;
    Qmx_CorrHandleList(const Qmx_CorrHandleList&) = delete;
    Qmx_CorrHandleList& operator=(const Qmx_CorrHandleList&) = delete;
    ~Qmx_CorrHandleList() { Clear(); }

    unsigned int GetState() const {
        if (m_word == 0) return kEmpty;
        return (m_word & kSingleTag) != 0 ? kSingle : kArray;
    }
    std::size_t Size() const {
        const unsigned int state = GetState();
        return state == kArray ? Many()->size() : state;
    }
    // REQUIRES: index < Size().
    unsigned int Get(std::size_t index) const {
        return GetState() == kArray ? (*Many())[index] : One();
    }
    bool Contains(unsigned int handle) const {
        const unsigned int state = GetState();
        if (state == kArray) {
            const std::vector<unsigned int>& many = *Many();
            return std::find(many.begin(), many.end(), handle) != many.end();
        }
        return state == kSingle && One() == handle;
    }
    // The handles in order, as a new vector.
    std::vector<unsigned int> ToVector() const {
        const unsigned int state = GetState();
        if (state == kArray) return *Many();
        return state == kSingle ? std::vector<unsigned int>{One()} : std::vector<unsigned int>();
    }

    // No duplicate check: the same handle may be added twice.
    void Add(unsigned int handle) {
        const unsigned int state = GetState();
        if (state == kEmpty) {
            SetOne(handle);
        } else if (state == kSingle) {
            SetMany(new std::vector<unsigned int>{One(), handle});
        } else {
            Many()->push_back(handle);
        }
    }
    // Replaces the contents by `handles`, in order; the array, when one is needed, is made at
    // its final size.
    void Assign(const std::vector<unsigned int>& handles) {
        Clear();
        if (handles.size() == 1) {
            SetOne(handles[0]);
        } else if (handles.size() > 1) {
            SetMany(new std::vector<unsigned int>(handles));
        }
    }
    // Removes the first occurrence; a list left with one handle holds it inline again.
    // Returns whether one was removed.
    bool Remove(unsigned int handle) {
        const unsigned int state = GetState();
        if (state == kSingle) {
            if (One() != handle) return false;
            m_word = 0;
            return true;
        }
        if (state != kArray) return false;
        std::vector<unsigned int>* many = Many();
        auto it = std::find(many->begin(), many->end(), handle);
        if (it == many->end()) return false;
        many->erase(it);
        if (many->size() <= 1) {
            const bool one = many->size() == 1;
            const unsigned int last = one ? many->front() : 0;
            delete many;
            m_word = 0;
            if (one) SetOne(last);
        }
        return true;
    }
    void Clear() {
        if (GetState() == kArray) delete Many();
        m_word = 0;
    }

private:
    static constexpr std::uint64_t kSingleTag = 1;

    unsigned int One() const { return static_cast<unsigned int>(m_word >> 32); }
    void SetOne(unsigned int handle) {
        m_word = (static_cast<std::uint64_t>(handle) << 32) | kSingleTag;
    }
    std::vector<unsigned int>* Many() const {
        return reinterpret_cast<std::vector<unsigned int>*>(static_cast<std::uintptr_t>(m_word));
    }
    void SetMany(std::vector<unsigned int>* many) {
        m_word = static_cast<std::uint64_t>(reinterpret_cast<std::uintptr_t>(many));
    }

    std::uint64_t m_word = 0;  // see the head comment; the vector is owned
};

#endif
