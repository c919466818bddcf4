#include "Gorsk_Stream.h"

#include <algorithm>
#include <initializer_list>
#include <new>
#include <utility>

#include "Gorsk_AccessMode.h"

namespace Gorsk {

namespace {

constexpr std::size_t kUInt32Size = 4;

std::string EncodeUInt32(std::uint32_t value) {
    std::string bytes(kUInt32Size, '\0');
    for (std::size_t i = 0; i < kUInt32Size; ++i) {
        bytes[i] = static_cast<char>((value >> (8 * i)) & 0xFFu);
    }
    return bytes;
}

}  // namespace

Stream::Stream(const Vesk::StringBase<char>& name, int accessMode, std::string content,
               std::size_t maxSize)
    : m_name(name),
      m_accessMode(accessMode),
      m_content(std::move(content)),
      m_position(0),
      m_maxSize(maxSize) {}

Stream::~Stream() = default;

BrokI::IInterface* Stream::QueryInterface(const Vesk::ClassId& interfaceId) {
    static const Vesk::ClassId kObject(kIObjectId);
    static const Vesk::ClassId kStream(kIStreamId);
    return interfaceId == kObject || interfaceId == kStream ? this : nullptr;
}

Status Stream::ReadString(Vesk::StringBase<char>& text) {
    const Status status = CanRead(kUInt32Size);
    if (status != Status::kOk) return status;
    // The length comes from the stream: compare it with what is left before taking anything.
    const std::size_t length = PeekUInt32();
    if (length > m_content.size() - m_position - kUInt32Size) return Status::kEndOfStream;
    text.assign(m_content, m_position + kUInt32Size, length);
    m_position += kUInt32Size + length;
    return Status::kOk;
}

Status Stream::WriteString(const Vesk::StringBase<char>& text) {
    if (text.size() > 0xFFFFFFFFu) return Status::kTooLarge;
    return Put(EncodeUInt32(static_cast<std::uint32_t>(text.size())), text);
}

Status Stream::ReadByte(unsigned char& value) {
    const Status status = CanRead(1);
    if (status != Status::kOk) return status;
    value = static_cast<unsigned char>(m_content[m_position]);
    ++m_position;
    return Status::kOk;
}

Status Stream::WriteByte(unsigned char value) {
    return Put(std::string(1, static_cast<char>(value)));
}

Status Stream::ReadUInt32(std::uint32_t& value) {
    const Status status = CanRead(kUInt32Size);
    if (status != Status::kOk) return status;
    value = PeekUInt32();
    m_position += kUInt32Size;
    return Status::kOk;
}

Status Stream::WriteUInt32(std::uint32_t value) { return Put(EncodeUInt32(value)); }

Status Stream::Flush() { return Status::kOk; }

std::int64_t Stream::BytesLeft() const {
    return static_cast<std::int64_t>(m_content.size() - m_position);
}

bool Stream::IsWritable() const { return (m_accessMode & kAccessWrite) != 0; }

bool Stream::IsReadable() const { return (m_accessMode & kAccessRead) != 0; }

Status Stream::CanRead(std::size_t count) const {
    if (!IsReadable()) return Status::kBadRequest;
    return count > m_content.size() - m_position ? Status::kEndOfStream : Status::kOk;
}

std::uint32_t Stream::PeekUInt32() const {
    std::uint32_t value = 0;
    for (std::size_t i = 0; i < kUInt32Size; ++i) {
        value |= static_cast<std::uint32_t>(static_cast<unsigned char>(m_content[m_position + i]))
                 << (8 * i);
    }
    return value;
}

Status Stream::Put(const std::string& head, const std::string& body) {
    if (!IsWritable()) return Status::kBadRequest;
    const std::size_t count = head.size() + body.size();  // each below 4 GiB
    if (count > m_maxSize || m_position > m_maxSize - count) return Status::kTooLarge;
    try {
        // With the room reserved first, the replacements below cannot fail halfway.
        m_content.reserve(std::max(m_content.size(), m_position + count));
    } catch (const std::bad_alloc&) {
        return Status::kTooLarge;  // no exception leaves the component
    }
    for (const std::string* piece : {&head, &body}) {
        const std::size_t overwritten = std::min(piece->size(), m_content.size() - m_position);
        m_content.replace(m_position, overwritten, *piece);
        m_position += piece->size();
    }
    return Status::kOk;
}

}  // namespace Gorsk
