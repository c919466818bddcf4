// Qmx_SingleOptContainerT: the value-type list in which items return their relationships and
// relationships their items. Most objects have no or one entry, so those two cases live inline
// and allocate nothing; only two or more entries use a vector. Built fresh by every call that
// returns one; the caller owns its copy.
#ifndef QMX_SINGLEOPTCONTAINERT_H
#define QMX_SINGLEOPTCONTAINERT_H
#include <cstddef>
#include <new>
#include <utility>
#include <vector>

template <class T>
class Qmx_SingleOptContainerT {
public:
    // The storage modes: no element, one element inline, two or more (or reserved for two
    // or more) in the vector.
    enum : unsigned int { kEmpty = 0, kSingle = 1, kVector = 2 };

    Qmx_SingleOptContainerT() : m_mode(kEmpty), m_single() {}
    Qmx_SingleOptContainerT(const Qmx_SingleOptContainerT& other) : m_mode(kEmpty), m_single() {
        CopyFrom(other);
    }
    Qmx_SingleOptContainerT(Qmx_SingleOptContainerT&& other) noexcept : m_mode(kEmpty), m_single() {
        MoveFrom(other);
    }
    Qmx_SingleOptContainerT& operator=(const Qmx_SingleOptContainerT& other) {
        if (this != &other) {
            Clear();
            CopyFrom(other);
        }
        return *this;
    }
    Qmx_SingleOptContainerT& operator=(Qmx_SingleOptContainerT&& other) noexcept {
        if (this != &other) {
            Clear();
            MoveFrom(other);
        }
        return *this;
    }
    ~Qmx_SingleOptContainerT() { Clear(); }

    unsigned int GetMode() const { return m_mode; }

    // Prepares for `count` elements: from two on, the vector is made and reserved at once,
    // so that filling it allocates only once. Only on an empty list.
    void Reserve(std::size_t count) {
        if (m_mode != kEmpty || count < 2) return;
        new (&m_many) std::vector<T>();
        m_many.reserve(count);
        m_mode = kVector;
    }

    void PushBack(const T& value) {
        if (m_mode == kEmpty) {
            m_single = value;
            m_mode = kSingle;
            return;
        }
        if (m_mode == kSingle) {
            const T first = m_single;
            new (&m_many) std::vector<T>();
            m_mode = kVector;
            m_many.reserve(2);
            m_many.push_back(first);
        }
        m_many.push_back(value);
    }

    T* begin() { return m_mode == kVector ? m_many.data() : &m_single; }
    T* end() { return m_mode == kVector ? m_many.data() + m_many.size() : &m_single + m_mode; }
    const T* begin() const { return m_mode == kVector ? m_many.data() : &m_single; }
    const T* end() const {
        return m_mode == kVector ? m_many.data() + m_many.size() : &m_single + m_mode;
    }
    std::size_t size() const { return m_mode == kVector ? m_many.size() : m_mode; }
    bool empty() const { return size() == 0; }
    // REQUIRES: index < size().
    T& operator[](std::size_t index) { return begin()[index]; }
    const T& operator[](std::size_t index) const { return begin()[index]; }

private:
    void Clear() {
        if (m_mode == kVector) m_many.~vector();
        m_mode = kEmpty;
        m_single = T();
    }
    void CopyFrom(const Qmx_SingleOptContainerT& other) {
        if (other.m_mode == kVector) {
            new (&m_many) std::vector<T>(other.m_many);
        } else {
            m_single = other.m_single;
        }
        m_mode = other.m_mode;
    }
    void MoveFrom(Qmx_SingleOptContainerT& other) {
        if (other.m_mode == kVector) {
            new (&m_many) std::vector<T>(std::move(other.m_many));
            other.m_many.~vector();
        } else {
            m_single = other.m_single;
        }
        m_mode = other.m_mode;
        other.m_mode = kEmpty;
        other.m_single = T();
    }

    unsigned int m_mode;
    union {
        T m_single;             // mode 1
        std::vector<T> m_many;  // mode 2
    };
};

#endif
