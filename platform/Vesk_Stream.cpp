#include "Vesk_Stream.h"

#include <algorithm>

#include "Vesk_Endian.h"
#include "Vesk_IOException.h"

namespace Vesk {

namespace {

// A string is read in pieces of this size, so that a damaged length costs no more memory than
// the bytes that really follow it.
constexpr std::size_t kStringChunk = 64 * 1024;

}  // namespace

Stream::~Stream() = default;

void Stream::read(char* buffer, std::size_t count) {
    std::size_t done = 0;
    while (done < count) {
        const std::size_t got = doRead(buffer + done, count - done);
        if (got == 0) {
            throw IOException(IOException::kEndOfData, "platform/Vesk_Stream", __LINE__,
                              "Unexpected end of data.");
        }
        done += got;
    }
}

void Stream::read(unsigned char& byte) {
    char c;
    read(&c, 1);
    byte = static_cast<unsigned char>(c);
}

void Stream::write(unsigned char byte) {
    const char c = static_cast<char>(byte);
    doWrite(&c, 1);
}

void Stream::readstring(StringBase<char>& text) {
    const std::uint32_t length = readuint32();
    const std::int64_t left = remaining();
    if (left >= 0 && static_cast<std::int64_t>(length) > left) {
        throw IOException(IOException::kEndOfData, "platform/Vesk_Stream", __LINE__,
                          "String longer than the data left.");
    }
    std::string result;
    while (result.size() < length) {
        const std::size_t piece = std::min<std::size_t>(kStringChunk, length - result.size());
        const std::size_t old = result.size();
        result.resize(old + piece);
        read(&result[old], piece);
    }
    text = std::move(result);
}

void Stream::readstring(char* buffer, std::size_t size) {
    if (size > 0) buffer[0] = '\0';
    const std::uint32_t length = readuint32();
    if (static_cast<std::size_t>(length) >= size) {
        throw IOException(IOException::kDamagedData, "platform/Vesk_Stream", __LINE__,
                          "String too long for its buffer.");
    }
    read(buffer, length);
    buffer[length] = '\0';
}

void Stream::writestring(const StringBase<char>& text) {
    writeuint32(static_cast<std::uint32_t>(text.size()));
    doWrite(text.data(), text.size());
}

void Stream::writestring(const char* text) { writestring(StringBase<char>(text)); }

std::uint32_t Stream::readuint32() {
    char bytes[4];
    read(bytes, 4);
    return Vesk_Endian::DecodeUINT32LE(bytes);
}

void Stream::writeuint32(std::uint32_t value) {
    char bytes[4];
    Vesk_Endian::EncodeUINT32LE(value, bytes);
    doWrite(bytes, 4);
}

}  // namespace Vesk
