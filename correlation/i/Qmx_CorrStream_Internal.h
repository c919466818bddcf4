// Qmx_CorrStream_Internal: a Qmx_CorrStream over a standard-library byte stream: a file it
// opens itself (and owns), or a caller's std::basic_iostream (not owned). A read that cannot
// be satisfied throws InvalidDatabaseFormat carrying the stream's error name; a write the
// stream refuses throws CannotWriteDatabase with it. One thread at a time.
#ifndef QMX_CORRSTREAM_INTERNAL_H
#define QMX_CORRSTREAM_INTERNAL_H
#include <cstdint>
#include <ios>
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
    // Positioning moves reading and writing alike (a file has one position). A position the
    // stream cannot take (beyond the end of a string stream) throws InvalidDatabaseFormat
    // and leaves the position as it was.
    void SeekEnd() override;
    void SeekPos(unsigned int pos) override;
    Vesk::StringBase<char> ReadString() override;
    void WriteString(const Vesk::StringBase<char>& text) override;
    void read(char* buffer, unsigned int count) override;
    void write(const char* buffer, unsigned int count) override;
    void Flush() override;
    // From the end of the data and the read position; -1 when the stream cannot tell.
    std::int64_t BytesLeft() const override;

private:
    [[noreturn]] void ThrowShortRead() const;
    [[noreturn]] void ThrowFailedWrite() const;
    // Moves both sides; false (position unchanged) when neither side could move.
    bool Reposition(std::streamoff offset, std::ios_base::seekdir from);
    // The end of the data, or -1. Cached for a file of our own, whose end only our writes
    // move; a caller's stream may be written behind our back and is asked every time.
    std::int64_t DataEnd() const;
    // The read position, or -1; cached for a file of our own like the end.
    std::int64_t Position() const;

    std::basic_iostream<char>* m_stream;  // owned when m_owned
    bool m_owned;
    Vesk::StringBase<char> m_errorName;
    mutable std::int64_t m_knownEnd;  // -1: not known; used only when m_owned
    // The position of a file of our own, -1 when not known. Asking a file for its position
    // costs a system call, and readers ask before every record: our own reads, writes and
    // moves keep it instead.
    mutable std::int64_t m_knownPos;
};

#endif
