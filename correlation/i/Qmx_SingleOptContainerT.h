// Qmx_SingleOptContainerT: the value-type list in which items return their relationships and
// relationships their items. Most objects have no or one entry, so those two cases live inline
// and allocate nothing; only two or more entries use a vector. Built fresh by every call that
// returns one; the caller owns its copy.
#ifndef QMX_SINGLEOPTCONTAINERT_H
#define QMX_SINGLEOPTCONTAINERT_H
#include <cstddef>
#include <cstring>
#include <new>
#include <type_traits>
#include <utility>
#include <vector>

template <class T>
class Qmx_SingleOptContainerT {
    // The elements are pointers; the inline storage is cleared bytewise.
    static_assert(std::is_trivially_copyable<T>::value, "elements must be trivially copyable");

public:
    // The storage modes: no element, one element inline, two or more (or reserved for two
    // or more) in the vector.
    enum : unsigned int { kEmpty = 0, kSingle = 1, kVector = 2 };

    // As a standard container names them, so that generic code and test matchers take it.
    typedef T value_type;
    typedef T* iterator;
    typedef const T* const_iterator;
    typedef std::size_t size_type;

    Qmx_SingleOptContainerT() : m_mode(kEmpty), m_raw() {}
    Qmx_SingleOptContainerT(const Qmx_SingleOptContainerT& other) : m_mode(kEmpty), m_raw() {
        CopyFrom(other);
    }
    Qmx_SingleOptContainerT(Qmx_SingleOptContainerT&& other) noexcept : m_mode(kEmpty), m_raw() {
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
            // Built aside first: if allocating fails, the list still holds its element.
            std::vector<T> both;
            both.reserve(2);
            both.push_back(m_single);
            both.push_back(value);
            new (&m_many) std::vector<T>(std::move(both));
            m_mode = kVector;
            return;
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
        ZeroStorage();
    }
    // Outside mode 2 every byte of the union is kept defined (zero, or the inline element),
    // and each branch below sets the mode it built rather than copying the other's: the
    // optimiser cannot always prove that the vector is read only in mode 2, and a read it
    // thinks uninitialised becomes -Wmaybe-uninitialized, an error in builds with -Werror.
    void ZeroStorage() { std::memset(static_cast<void*>(m_raw), 0, sizeof(m_raw)); }
    // REQUIRES (both): this list is empty.
    void CopyFrom(const Qmx_SingleOptContainerT& other) {
        if (other.m_mode == kVector) {
            new (&m_many) std::vector<T>(other.m_many);
            m_mode = kVector;
        } else if (other.m_mode == kSingle) {
            m_single = other.m_single;
            m_mode = kSingle;
        }
    }
    void MoveFrom(Qmx_SingleOptContainerT& other) {
        if (other.m_mode == kVector) {
            new (&m_many) std::vector<T>(std::move(other.m_many));
            other.m_many.~vector();
            m_mode = kVector;
        } else if (other.m_mode == kSingle) {
            m_single = other.m_single;
            m_mode = kSingle;
        }
        other.m_mode = kEmpty;
        other.ZeroStorage();
    }

    unsigned int m_mode;
    union {
        T m_single;                                   // mode 1
        std::vector<T> m_many;                        // mode 2
        unsigned char m_raw[sizeof(std::vector<T>)];  // modes 0 and 1: all bytes defined
    };
};

#endif
