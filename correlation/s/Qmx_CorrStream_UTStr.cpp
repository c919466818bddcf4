#include "Qmx_CorrStream_UTStr.h"

#include "Qmx_CorrException.h"
#include "Vesk_File.h"
#include "Vesk_IOException.h"
#include "Vesk_Stream.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrStream_UTStr";
constexpr const char* kRevision = "1";

}  // namespace

// Every operation on the layer's stream goes through here: its failures become the errors of
// a database stream (damage when reading, a refused write otherwise).
#define QMX_UTSTR_CALL(reading, expression)                                      \
    try {                                                                        \
        expression;                                                              \
    } catch (const Vesk::IOException&) {                                         \
        if (reading) QMX_CORR_THROW(InvalidDatabaseFormat, m_errorName.c_str()); \
        QMX_CORR_THROW(CannotWriteDatabase, m_errorName.c_str());                \
    }

Qmx_CorrStream_UTStr::Qmx_CorrStream_UTStr(const Vesk::StringBase<char>& path, int access,
                                           bool create, const Vesk::StringBase<char>& errorName)
    : m_stream(Vesk::File::open(path, access, create)),
      m_errorName(errorName.empty() ? path : errorName) {
    if (!m_stream) QMX_CORR_THROW(CannotReadDatabase, path.c_str());
}

Qmx_CorrStream_UTStr::~Qmx_CorrStream_UTStr() { Close(); }

bool Qmx_CorrStream_UTStr::Close() {
    const bool ok = Vesk::File::close(m_stream);
    m_stream = nullptr;
    return ok;
}

unsigned int Qmx_CorrStream_UTStr::GetPos() const {
    return static_cast<unsigned int>(m_stream->getfoffset());
}

void Qmx_CorrStream_UTStr::SeekEnd() { QMX_UTSTR_CALL(true, m_stream->seekend()); }

void Qmx_CorrStream_UTStr::SeekPos(unsigned int pos) {
    QMX_UTSTR_CALL(true, m_stream->setfoffset(pos));
}

Vesk::StringBase<char> Qmx_CorrStream_UTStr::ReadString() {
    Vesk::StringBase<char> text;
    QMX_UTSTR_CALL(true, m_stream->readstring(text));
    return text;
}

void Qmx_CorrStream_UTStr::WriteString(const Vesk::StringBase<char>& text) {
    QMX_UTSTR_CALL(false, m_stream->writestring(text));
}

unsigned char Qmx_CorrStream_UTStr::ReadUINT8() {
    unsigned char byte = 0;
    QMX_UTSTR_CALL(true, m_stream->read(byte));
    return byte;
}

void Qmx_CorrStream_UTStr::WriteUINT8(unsigned char value) {
    QMX_UTSTR_CALL(false, m_stream->write(value));
}

unsigned int Qmx_CorrStream_UTStr::ReadUINT32() {
    unsigned int value = 0;
    QMX_UTSTR_CALL(true, value = m_stream->readuint32());
    return value;
}

void Qmx_CorrStream_UTStr::WriteUINT32(unsigned int value) {
    QMX_UTSTR_CALL(false, m_stream->writeuint32(value));
}

void Qmx_CorrStream_UTStr::read(char* buffer, unsigned int count) {
    QMX_UTSTR_CALL(true, m_stream->read(buffer, count));
}

void Qmx_CorrStream_UTStr::write(const char* buffer, unsigned int count) {
    QMX_UTSTR_CALL(false, m_stream->write(buffer, count));
}

void Qmx_CorrStream_UTStr::Flush() { QMX_UTSTR_CALL(false, m_stream->flush()); }

std::int64_t Qmx_CorrStream_UTStr::BytesLeft() const { return m_stream->remaining(); }
