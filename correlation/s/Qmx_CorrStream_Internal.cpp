#include "Qmx_CorrStream_Internal.h"

#include <algorithm>
#include <fstream>
#include <iostream>

#include "Qmx_CorrException.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrStream_Internal";
constexpr const char* kRevision = "1";
// Long strings are read in pieces, so that a damaged length costs no more memory than the
// bytes that really follow.
constexpr std::size_t kStringPiece = 64 * 1024;

}  // namespace

Qmx_CorrStream_Internal::Qmx_CorrStream_Internal(std::basic_iostream<char>* stream,
                                                 const Vesk::StringBase<char>& errorName)
    : m_stream(stream),
      m_owned(false),
      m_errorName(errorName.empty() ? "unknown" : errorName),
      m_knownEnd(-1),
      m_knownPos(-1) {
    if (!m_stream || m_stream->bad()) QMX_CORR_THROW(CannotReadDatabase, "unknown");
}

Qmx_CorrStream_Internal::Qmx_CorrStream_Internal(const Vesk::StringBase<char>& path, int openMode,
                                                 const Vesk::StringBase<char>& errorName)
    : m_stream(nullptr),
      m_owned(true),
      m_errorName(errorName.empty() ? path : errorName),
      m_knownEnd(-1),
      m_knownPos(-1) {
    const auto mode = static_cast<std::ios::openmode>(openMode);
    auto* file = new std::fstream(path, mode);
    if (!file->is_open() || file->fail()) {
        delete file;
        QMX_CORR_THROW(CannotReadDatabase, path.c_str());
    }
    m_stream = file;
    if (!(mode & (std::ios::ate | std::ios::app))) m_knownPos = 0;
}

Qmx_CorrStream_Internal::~Qmx_CorrStream_Internal() {
    if (m_owned) delete m_stream;
}

void Qmx_CorrStream_Internal::ThrowShortRead() const {
    m_stream->clear();
    QMX_CORR_THROW(InvalidDatabaseFormat, m_errorName.c_str());
}

void Qmx_CorrStream_Internal::ThrowFailedWrite() const {
    m_stream->clear();
    QMX_CORR_THROW(CannotWriteDatabase, m_errorName.c_str());
}

unsigned int Qmx_CorrStream_Internal::GetPos() const {
    if (m_owned && m_knownPos >= 0) return static_cast<unsigned int>(m_knownPos);
    std::streamoff pos = m_stream->tellp();
    if (pos < 0) pos = m_stream->tellg();
    m_stream->clear();
    return static_cast<unsigned int>(pos < 0 ? 0 : pos);
}

bool Qmx_CorrStream_Internal::Reposition(std::streamoff offset, std::ios_base::seekdir from) {
    if (m_owned) {
        // A file has one position for both sides, so one move does; and pools are mostly
        // written and read in order, where the file is already at the place asked for.
        if (from == std::ios::beg && offset == m_knownPos) return true;
        m_stream->clear();
        const std::streamoff moved = m_stream->rdbuf()->pubseekoff(offset, from);
        m_knownPos = moved;
        if (moved >= 0) return true;
        m_knownPos = -1;
    }
    // A stream open for one direction only cannot move the other side; a position that
    // neither side can take is refused, since reading on from the old one would misread.
    m_knownPos = -1;
    const std::streampos oldPut = m_stream->tellp();
    const std::streampos oldGet = m_stream->tellg();
    m_stream->clear();
    const bool putMoved = !m_stream->seekp(offset, from).fail();
    m_stream->clear();
    const bool getMoved = !m_stream->seekg(offset, from).fail();
    m_stream->clear();
    if (putMoved || getMoved) return true;
    if (oldPut >= 0) m_stream->seekp(oldPut);
    if (oldGet >= 0) m_stream->seekg(oldGet);
    m_stream->clear();
    return false;
}

void Qmx_CorrStream_Internal::SeekEnd() {
    if (!Reposition(0, std::ios::end)) ThrowShortRead();
}

void Qmx_CorrStream_Internal::SeekPos(unsigned int pos) {
    if (!Reposition(static_cast<std::streamoff>(pos), std::ios::beg)) ThrowShortRead();
}

Vesk::StringBase<char> Qmx_CorrStream_Internal::ReadString() {
    const unsigned int length = ReadUINT32();
    const std::int64_t left = BytesLeft();
    if (left >= 0 && static_cast<std::int64_t>(length) > left) ThrowShortRead();
    std::string text;
    while (text.size() < length) {
        const std::size_t piece = std::min<std::size_t>(kStringPiece, length - text.size());
        const std::size_t old = text.size();
        text.resize(old + piece);
        read(&text[old], static_cast<unsigned int>(piece));
    }
    return text;
}

void Qmx_CorrStream_Internal::WriteString(const Vesk::StringBase<char>& text) {
    // No length of 4 bytes can describe a longer string, and a cut one would misread.
    if (text.size() > 0xFFFFFFFFu) ThrowFailedWrite();
    WriteUINT32(static_cast<unsigned int>(text.size()));
    write(text.data(), static_cast<unsigned int>(text.size()));
}

void Qmx_CorrStream_Internal::read(char* buffer, unsigned int count) {
    if (count == 0) return;
    m_stream->read(buffer, count);
    if (static_cast<unsigned int>(m_stream->gcount()) != count) {
        m_knownPos = -1;
        ThrowShortRead();
    }
    if (m_knownPos >= 0) m_knownPos += count;
}

void Qmx_CorrStream_Internal::write(const char* buffer, unsigned int count) {
    if (count == 0) return;
    m_stream->write(buffer, count);
    if (!*m_stream) {
        m_knownPos = -1;
        m_knownEnd = -1;
        ThrowFailedWrite();
    }
    if (m_knownPos >= 0) {
        m_knownPos += count;
        if (m_knownEnd >= 0 && m_knownPos > m_knownEnd) m_knownEnd = m_knownPos;
    } else {
        m_knownEnd = -1;
    }
}

void Qmx_CorrStream_Internal::Flush() {
    m_stream->flush();
    if (!*m_stream) ThrowFailedWrite();
}

std::int64_t Qmx_CorrStream_Internal::BytesLeft() const {
    const std::int64_t pos = Position();
    if (pos < 0) return -1;
    const std::int64_t end = DataEnd();
    if (end < 0) return -1;
    return end < pos ? 0 : end - pos;
}

std::int64_t Qmx_CorrStream_Internal::Position() const {
    if (m_owned && m_knownPos >= 0) return m_knownPos;
    const std::streamoff pos = m_stream->tellg();
    if (pos < 0) {
        m_stream->clear();
        return -1;
    }
    if (m_owned) m_knownPos = static_cast<std::int64_t>(pos);
    return static_cast<std::int64_t>(pos);
}

std::int64_t Qmx_CorrStream_Internal::DataEnd() const {
    // Finding the end of a file drops its read buffer; readers ask before every string, so
    // a file of our own is measured once and again only after a write.
    if (m_owned && m_knownEnd >= 0) return m_knownEnd;
    const std::streampos pos = m_stream->tellg();
    m_stream->seekg(0, std::ios::end);
    const std::streamoff end = m_stream->tellg();
    m_stream->seekg(pos);
    m_stream->clear();
    if (end < 0) return -1;
    if (m_owned) m_knownEnd = static_cast<std::int64_t>(end);
    return static_cast<std::int64_t>(end);
}
