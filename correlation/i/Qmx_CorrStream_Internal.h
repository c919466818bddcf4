// Qmx_CorrStream_Internal: a Qmx_CorrStream over a standard-library byte stream: a file it
// opens itself (and owns), or a caller's std::basic_iostream (not owned). A read that cannot
// be satisfied throws InvalidDatabaseFormat carrying the stream's error name; a write the
// stream refuses throws CannotWriteDatabase with it. One thread at a time.
#ifndef QMX_CORRSTREAM_INTERNAL_H
#define QMX_CORRSTREAM_INTERNAL_H
#include <iosfwd>

#include "Qmx_CorrStream.h"

class QMX_CORR_EXPORT Qmx_CorrStream_Internal : public Qmx_CorrStream {
public:
    // Wraps `stream`, which the caller keeps. Null, or a stream whose bad bit is set, throws
    // CannotReadDatabase with "unknown" (the error name too, unless one is given).
    explicit Qmx_CorrStream_Internal(std::basic_iostream<char>* stream,
                                     const Vesk::StringBase<char>& errorName = "");
    // Opens `path` as a std::fstream with `openMode` (std::ios bits: in, out, binary, trunc).
    // Failure throws CannotReadDatabase with the path. `errorName` (the path when empty) is
    // what later errors carry: a database passes its own name.
    Qmx_CorrStream_Internal(const Vesk::StringBase<char>& path, int openMode,
                            const Vesk::StringBase<char>& errorName = "");
    ~Qmx_CorrStream_Internal() override;
    Qmx_CorrStream_Internal(const Qmx_CorrStream_Internal&) = delete;
    Qmx_CorrStream_Internal& operator=(const Qmx_CorrStream_Internal&) = delete;

    unsigned int GetPos() const override;
    // Positioning moves reading and writing alike (a file has one position).
    void SeekEnd() override;
    void SeekPos(unsigned int pos) override;
    Vesk::StringBase<char> ReadString() override;
    void WriteString(const Vesk::StringBase<char>& text) override;
    bool ReadBool() override;
    void WriteBool(bool value) override;
    unsigned char ReadUINT8() override;
    void WriteUINT8(unsigned char value) override;
    unsigned int ReadUINT32() override;
    void WriteUINT32(unsigned int value) override;
    void read(char* buffer, unsigned int count) override;
    void write(const char* buffer, unsigned int count) override;
    void Flush() override;
    std::int64_t BytesLeft() const override;

private:
    [[noreturn]] void ThrowShortRead() const;
    [[noreturn]] void ThrowFailedWrite() const;

    std::basic_iostream<char>* m_stream;  // owned when m_owned
    bool m_owned;
    Vesk::StringBase<char> m_errorName;
};

#endif
