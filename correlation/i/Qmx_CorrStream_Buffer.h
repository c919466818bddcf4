// Qmx_CorrStream_Buffer: a Qmx_CorrStream over bytes in memory that it owns. The pool managers
// build a whole pool record in one and write it to the file at once, and read a record from
// the file at once and parse it here: a file stream costs a call through the standard library
// for every four bytes. A short read throws InvalidDatabaseFormat with the error name. One
// thread at a time.
#ifndef QMX_CORRSTREAM_BUFFER_H
#define QMX_CORRSTREAM_BUFFER_H
#include <string>

#include "Qmx_CorrStream.h"

class QMX_CORR_EXPORT Qmx_CorrStream_Buffer : public Qmx_CorrStream {
public:
    // Empty, at position 0; `errorName` is what a failed read carries (a database's name).
    explicit Qmx_CorrStream_Buffer(const Vesk::StringBase<char>& errorName);
    ~Qmx_CorrStream_Buffer() override;
    Qmx_CorrStream_Buffer(const Qmx_CorrStream_Buffer&) = delete;
    Qmx_CorrStream_Buffer& operator=(const Qmx_CorrStream_Buffer&) = delete;

    unsigned int GetPos() const override { return static_cast<unsigned int>(m_pos); }
    void SeekEnd() override { m_pos = m_bytes.size(); }
    // A position beyond the end throws InvalidDatabaseFormat and leaves the position.
    void SeekPos(unsigned int pos) override;
    Vesk::StringBase<char> ReadString() override;
    void WriteString(const Vesk::StringBase<char>& text) override;
    // Records are mostly 32-bit values: these two skip the general read and write.
    unsigned int ReadUINT32() override;
    void WriteUINT32(unsigned int value) override;
    void read(char* buffer, unsigned int count) override;
    // Overwrites from the position on, growing the bytes where it passes their end.
    void write(const char* buffer, unsigned int count) override;
    void Flush() override {}
    std::int64_t BytesLeft() const override {
        return static_cast<std::int64_t>(m_bytes.size() - m_pos);
    }

    const std::string& GetBytes() const { return m_bytes; }
    // Replaces the bytes and goes back to position 0.
    void Assign(std::string bytes);
    void Reserve(std::size_t size) { m_bytes.reserve(size); }

private:
    [[noreturn]] void ThrowShortRead() const;

    Vesk::StringBase<char> m_errorName;
    std::string m_bytes;
    std::size_t m_pos;  // at most m_bytes.size()
};

#endif
