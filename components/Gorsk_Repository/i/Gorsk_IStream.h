// Gorsk::IStream: one open stream of a storage, a byte sequence with one position for reading
// and writing. Opening places the position at 0 over the stream's stored content (empty with
// truncate, or for a new stream); each read and write moves it past its bytes; a write
// overwrites the bytes at the position and lengthens the stream when it runs past the end.
// The content is held in memory and reaches the repository whole when the storage closes the
// stream (IStorage::CloseStream); nothing is stored earlier. A stream is at most the largest
// blob the store keeps (SQLite's length limit, 1,000,000,000 bytes unless the build raises
// it) and never longer than 4 GiB - 1.
//
// Encodings, the same as the rest of the system:
//
// | value       | bytes                                                            |
// |-------------|------------------------------------------------------------------|
// | byte        | 1: the value                                                     |
// | 32-bit      | 4: the value, least significant byte first                       |
// | string      | 4: its length L, least significant byte first; then its L bytes, |
// |             | zero bytes included; no terminator                               |
//
// Reads are checked against the bytes left before anything is consumed: a read that needs
// more (a string length past the end included) gives kEndOfStream and leaves the position
// and the argument as they were. Reads need read access and writes write access
// (kBadRequest otherwise).
#ifndef GORSK_ISTREAM_H
#define GORSK_ISTREAM_H
#include <cstdint>

#include "Gorsk_IObject.h"
#include "Gorsk_Status.h"
#include "Vesk_StringBase.h"

namespace Gorsk {

constexpr const char* kIStreamId = "d493168e-e178-4184-824e-c7e9413132cf";

class IStream : public IObject {
public:
    // Replaces `text` by the string read.
    virtual Status ReadString(Vesk::StringBase<char>& text) = 0;
    virtual Status WriteString(const Vesk::StringBase<char>& text) = 0;
    virtual Status ReadByte(unsigned char& value) = 0;
    virtual Status WriteByte(unsigned char value) = 0;
    virtual Status ReadUInt32(std::uint32_t& value) = 0;
    virtual Status WriteUInt32(std::uint32_t value) = 0;
    // Stores nothing: a stream reaches the repository whole at its close, so that no reader
    // ever sees part of it. kOk on an open stream.
    virtual Status Flush() = 0;
    // Bytes between the position and the end.
    virtual std::int64_t BytesLeft() const = 0;

protected:
    ~IStream() override = default;
};

}  // namespace Gorsk

#endif
