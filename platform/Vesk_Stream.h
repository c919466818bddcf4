// Vesk::Stream: a byte stream over one file, plain or in the compressed form, made by
// Vesk::File::open and destroyed by Vesk::File::close. The typed operations share one
// encoding on every host: a 32-bit value is 4 bytes, least significant first; a string is its
// length as such a value, then every byte of it (zero bytes included). A read that cannot be
// satisfied throws Vesk::IOException and never yields short data. One thread at a time.
#ifndef VESK_STREAM_H
#define VESK_STREAM_H
#include <cstddef>
#include <cstdint>

#include "VeskExport.h"
#include "Vesk_StringBase.h"

namespace Vesk {

class VESK_EXPORT Stream {
public:
    virtual ~Stream();
    Stream(const Stream&) = delete;
    Stream& operator=(const Stream&) = delete;

    // Exactly `count` bytes; throws IOException(kEndOfData) when the data ends first.
    void read(char* buffer, std::size_t count);
    void read(unsigned char& byte);
    // Up to `count` bytes, fewer only at the end of the data. Returns how many.
    std::size_t readsome(char* buffer, std::size_t count) { return doRead(buffer, count); }
    // Throws IOException(kSystemError) when the medium refuses the bytes.
    void write(const char* buffer, std::size_t count) { doWrite(buffer, count); }
    void write(unsigned char byte);

    void readstring(StringBase<char>& text);
    // Into a buffer of `size` bytes, NUL-terminated; a string that does not fit (with its NUL)
    // throws IOException(kDamagedData) and leaves the buffer empty.
    void readstring(char* buffer, std::size_t size);
    void writestring(const StringBase<char>& text);
    void writestring(const char* text);
    std::uint32_t readuint32();
    void writeuint32(std::uint32_t value);

    // Positions count bytes of the plain data, also in the compressed form. A compressed
    // stream can only move forward while reading and cannot move while writing
    // (IOException(kUnsupported)).
    virtual std::int64_t getfoffset() const = 0;
    virtual void setfoffset(std::int64_t offset) = 0;
    virtual void seekend() = 0;

    // Bytes between the position and the end of the data, or -1 where the form cannot tell
    // before reading them (compressed). Readers compare counts with it before they reserve.
    virtual std::int64_t remaining() const = 0;
    virtual bool iscompressed() const = 0;

    // Pushes buffered bytes to the operating system.
    virtual void flush() = 0;
    // Completes the written data (the compressed form's end mark) and flushes. Nothing may be
    // written afterwards. Idempotent.
    virtual void finish() = 0;
    // Makes what was written durable (fsync); call after finish.
    virtual void sync() = 0;
    // Completes what was written and closes the file; false on any failure. Idempotent.
    // Vesk::File::close calls it before it deletes the stream.
    virtual bool closefile() = 0;

protected:
    Stream() = default;
    virtual std::size_t doRead(char* buffer, std::size_t count) = 0;
    virtual void doWrite(const char* buffer, std::size_t count) = 0;
};

}  // namespace Vesk

#endif
