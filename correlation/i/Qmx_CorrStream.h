// Qmx_CorrStream: a seekable byte stream of one database stream, with the typed primitives
// that every persistent record is made of. A database hands streams out by name
// (Qmx_CorrDb::OpenStream) and keeps ownership; callers give them back with CloseStream.
// Encodings: 32-bit values are 4 bytes, least significant first; a bool or 8-bit value one
// byte; a string its 4-byte length, then its bytes. A read past the end of the data throws
// Qmx_CorrException::InvalidDatabaseFormat: no correct database leads there. One thread at a
// time.
#ifndef QMX_CORRSTREAM_H
#define QMX_CORRSTREAM_H
#include <cstdint>

#include "QmxCorrExport.h"
#include "Vesk_StringBase.h"

class QMX_CORR_EXPORT Qmx_CorrStream {
public:
    virtual ~Qmx_CorrStream();

    // Positions are bytes from the start; no stream is longer than 4 GiB - 1.
    virtual unsigned int GetPos() const = 0;
    virtual void SeekEnd() = 0;
    virtual void SeekPos(unsigned int pos) = 0;
    virtual Vesk::StringBase<char> ReadString() = 0;
    virtual void WriteString(const Vesk::StringBase<char>& text) = 0;
    // By default through read and write in the encodings above.
    virtual bool ReadBool();
    virtual void WriteBool(bool value);
    virtual unsigned char ReadUINT8();
    virtual void WriteUINT8(unsigned char value);
    virtual unsigned int ReadUINT32();
    virtual void WriteUINT32(unsigned int value);
    // Exactly `count` raw bytes.
    virtual void read(char* buffer, unsigned int count) = 0;
    virtual void write(const char* buffer, unsigned int count) = 0;
    virtual void Flush() = 0;

    // Bytes between the position and the end of the stream, or -1 where the stream cannot
    // tell before reading them. Readers compare every count read from a stream with it
    // before they reserve memory or loop.
    virtual std::int64_t BytesLeft() const;
    // Whether bytes follow the read position: a reader that has read its last record asks,
    // since spare bytes mean a damaged count. A stream that cannot tell its length (a
    // compressed one) is read to its end, where a damaged frame throws InvalidDatabaseFormat
    // rather than passing for the end.
    bool HasMoreBytes();

protected:
    Qmx_CorrStream() = default;
};

#endif
