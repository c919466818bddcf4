#include "Qmx_CorrStream_Buffer.h"

#include <cstring>
#include <utility>

#include "Qmx_CorrException.h"
#include "Vesk_Endian.h"

namespace {
const char* const kSourceFile = "s/Qmx_CorrStream_Buffer";
const char* const kRevision = "1";
}  // namespace

Qmx_CorrStream_Buffer::Qmx_CorrStream_Buffer(const Vesk::StringBase<char>& errorName)
    : m_errorName(errorName), m_pos(0) {}

Qmx_CorrStream_Buffer::~Qmx_CorrStream_Buffer() = default;

void Qmx_CorrStream_Buffer::ThrowShortRead() const {
    QMX_CORR_THROW(InvalidDatabaseFormat, m_errorName.c_str());
}

void Qmx_CorrStream_Buffer::SeekPos(unsigned int pos) {
    if (pos > m_bytes.size()) ThrowShortRead();
    m_pos = pos;
}

Vesk::StringBase<char> Qmx_CorrStream_Buffer::ReadString() {
    const unsigned int length = ReadUINT32();
    if (length > m_bytes.size() - m_pos) ThrowShortRead();
    Vesk::StringBase<char> text(m_bytes.substr(m_pos, length));
    m_pos += length;
    return text;
}

void Qmx_CorrStream_Buffer::WriteString(const Vesk::StringBase<char>& text) {
    if (text.size() > 0xFFFFFFFFu) QMX_CORR_THROW(CannotWriteDatabase, m_errorName.c_str());
    WriteUINT32(static_cast<unsigned int>(text.size()));
    write(text.data(), static_cast<unsigned int>(text.size()));
}

unsigned int Qmx_CorrStream_Buffer::ReadUINT32() {
    if (m_bytes.size() - m_pos < 4) ThrowShortRead();
    const unsigned int value = Vesk_Endian::DecodeUINT32LE(m_bytes.data() + m_pos);
    m_pos += 4;
    return value;
}

void Qmx_CorrStream_Buffer::WriteUINT32(unsigned int value) {
    if (m_pos != m_bytes.size()) {
        Qmx_CorrStream::WriteUINT32(value);
        return;
    }
    for (int shift = 0; shift < 32; shift += 8) {
        m_bytes.push_back(static_cast<char>((value >> shift) & 0xFFu));
    }
    m_pos += 4;
}

void Qmx_CorrStream_Buffer::read(char* buffer, unsigned int count) {
    if (count > m_bytes.size() - m_pos) ThrowShortRead();
    if (count != 0) std::memcpy(buffer, m_bytes.data() + m_pos, count);
    m_pos += count;
}

void Qmx_CorrStream_Buffer::write(const char* buffer, unsigned int count) {
    if (m_pos == m_bytes.size()) {
        m_bytes.append(buffer, count);
    } else {
        const std::size_t overlap = std::min<std::size_t>(count, m_bytes.size() - m_pos);
        m_bytes.replace(m_pos, overlap, buffer, count);
    }
    m_pos += count;
}

void Qmx_CorrStream_Buffer::Assign(std::string bytes) {
    m_bytes = std::move(bytes);
    m_pos = 0;
}
