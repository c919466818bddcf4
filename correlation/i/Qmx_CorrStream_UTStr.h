// Qmx_CorrStream_UTStr: a Qmx_CorrStream over a stream of the portability layer (a portable
// stream, kept in the compressed form). Owns the Vesk::Stream. A read that cannot be
// satisfied throws InvalidDatabaseFormat with the error name, a refused write
// CannotWriteDatabase. The compressed form reads and writes sequentially: it can only move
// forward while reading. One thread at a time.
#ifndef QMX_CORRSTREAM_UTSTR_H
#define QMX_CORRSTREAM_UTSTR_H
#include "Qmx_CorrStream.h"

namespace Vesk {
class Stream;
}

class QMX_CORR_EXPORT Qmx_CorrStream_UTStr : public Qmx_CorrStream {
public:
    // Vesk::File::open(path, access, create); null throws CannotReadDatabase with the path.
    // `errorName` (the path when empty) is what later errors carry.
    Qmx_CorrStream_UTStr(const Vesk::StringBase<char>& path, int access, bool create,
                         const Vesk::StringBase<char>& errorName = "");
    ~Qmx_CorrStream_UTStr() override;
    Qmx_CorrStream_UTStr(const Qmx_CorrStream_UTStr&) = delete;
    Qmx_CorrStream_UTStr& operator=(const Qmx_CorrStream_UTStr&) = delete;

    unsigned int GetPos() const override;
    void SeekEnd() override;
    void SeekPos(unsigned int pos) override;
    Vesk::StringBase<char> ReadString() override;
    void WriteString(const Vesk::StringBase<char>& text) override;
    unsigned char ReadUINT8() override;
    void WriteUINT8(unsigned char value) override;
    unsigned int ReadUINT32() override;
    void WriteUINT32(unsigned int value) override;
    void read(char* buffer, unsigned int count) override;
    void write(const char* buffer, unsigned int count) override;
    void Flush() override;
    std::int64_t BytesLeft() const override;

    // Completes and closes the file (a compressed stream's data is written out only now).
    // False when that failed: the file is then incomplete. Later operations are not allowed.
    bool Close();

private:
    Vesk::Stream* m_stream;  // owned
    Vesk::StringBase<char> m_errorName;
};

#endif
