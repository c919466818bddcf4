// Gorsk::Stream: the component's stream object (Gorsk_IStream.h): the stream's bytes in
// memory, one position, the access it was opened with. Made and owned by Gorsk::Storage,
// which stores the content when it closes the stream.
#ifndef GORSK_STREAM_H
#define GORSK_STREAM_H
#include <cstddef>
#include <cstdint>
#include <string>

#include "Gorsk_IStream.h"

namespace Gorsk {

class Stream final : public IStream {
public:
    // `content` is the stored content to start from (empty for a new or truncated stream);
    // `maxSize` the largest the stream may grow to.
    Stream(const Vesk::StringBase<char>& name, int accessMode, std::string content,
           std::size_t maxSize);
    ~Stream() override;

    BrokI::IInterface* QueryInterface(const Vesk::ClassId& interfaceId) override;
    Status ReadString(Vesk::StringBase<char>& text) override;
    Status WriteString(const Vesk::StringBase<char>& text) override;
    Status ReadByte(unsigned char& value) override;
    Status WriteByte(unsigned char value) override;
    Status ReadUInt32(std::uint32_t& value) override;
    Status WriteUInt32(std::uint32_t value) override;
    Status Flush() override;
    std::int64_t BytesLeft() const override;

    const Vesk::StringBase<char>& Name() const { return m_name; }
    bool IsWritable() const;
    const std::string& Content() const { return m_content; }

private:
    bool IsReadable() const;
    // Checks that `count` bytes are left (and that reading is allowed) without moving.
    Status CanRead(std::size_t count) const;
    std::uint32_t PeekUInt32() const;
    // Writes `head`, then `body`, at the position after checking access and size; all or
    // nothing.
    Status Put(const std::string& head, const std::string& body = std::string());

    Vesk::StringBase<char> m_name;
    int m_accessMode;        // the stream bits of Gorsk_AccessMode.h
    std::string m_content;   // the whole stream
    std::size_t m_position;  // bytes from the start, at most m_content.size()
    std::size_t m_maxSize;   // bytes
};

}  // namespace Gorsk

#endif
