#include "Qmx_CorrStream_Gorsk.h"

#include "Gorsk_IStorage.h"
#include "Gorsk_IStream.h"
#include "Qmx_CorrException.h"
#include "Vesk_MsgManData.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrStream_Gorsk";
constexpr const char* kRevision = "1";

}  // namespace

Qmx_CorrStream_Gorsk::Qmx_CorrStream_Gorsk(Gorsk::IStorage* storage,
                                           const Vesk::StringBase<char>& streamName, int accessMode,
                                           const Vesk::StringBase<char>& databaseName)
    : m_repoStorage(storage), m_stream(nullptr), m_databaseName(databaseName) {
    if (m_repoStorage) m_repoStorage->OpenStream(streamName, accessMode, &m_stream);
    if (!m_stream) {
        Vesk::StringBase<char> request;
        request.Format("Open stream '%s' of a repository storage", streamName.c_str());
        QMX_CORR_THROW(InvalidRequest, request.c_str());
    }
}

Qmx_CorrStream_Gorsk::~Qmx_CorrStream_Gorsk() {
    if (!m_stream) return;
    if (m_repoStorage->CloseStream(m_stream) != Gorsk::Status::kOk) {
        Vesk_MsgManData::createObject("Quillmark", kSourceFile, __LINE__, kRevision)
            .issueError("A stream of '%s' could not be stored in the repository.\n",
                        m_databaseName.c_str());
    }
}

unsigned int Qmx_CorrStream_Gorsk::GetPos() const {
    QMX_CORR_THROW(InvalidRequest, "GetPos is not supported by a repository stream");
}

void Qmx_CorrStream_Gorsk::SeekEnd() {
    QMX_CORR_THROW(InvalidRequest, "SeekEnd is not supported by a repository stream");
}

void Qmx_CorrStream_Gorsk::SeekPos(unsigned int /*pos*/) {
    QMX_CORR_THROW(InvalidRequest, "SeekPos is not supported by a repository stream");
}

Vesk::StringBase<char> Qmx_CorrStream_Gorsk::ReadString() {
    Vesk::StringBase<char> text;
    CheckRead(Live("ReadString").ReadString(text), "ReadString");
    return text;
}

void Qmx_CorrStream_Gorsk::WriteString(const Vesk::StringBase<char>& text) {
    CheckWrite(Live("WriteString").WriteString(text), "WriteString");
}

bool Qmx_CorrStream_Gorsk::ReadBool() {
    unsigned char value = 0;
    CheckRead(Live("ReadBool").ReadByte(value), "ReadBool");
    return value != 0;
}

void Qmx_CorrStream_Gorsk::WriteBool(bool value) {
    CheckWrite(Live("WriteBool").WriteByte(value ? 1 : 0), "WriteBool");
}

unsigned char Qmx_CorrStream_Gorsk::ReadUINT8() {
    unsigned char value = 0;
    CheckRead(Live("ReadUINT8").ReadByte(value), "ReadUINT8");
    return value;
}

void Qmx_CorrStream_Gorsk::WriteUINT8(unsigned char value) {
    CheckWrite(Live("WriteUINT8").WriteByte(value), "WriteUINT8");
}

unsigned int Qmx_CorrStream_Gorsk::ReadUINT32() {
    std::uint32_t value = 0;
    CheckRead(Live("ReadUINT32").ReadUInt32(value), "ReadUINT32");
    return value;
}

void Qmx_CorrStream_Gorsk::WriteUINT32(unsigned int value) {
    CheckWrite(Live("WriteUINT32").WriteUInt32(value), "WriteUINT32");
}

void Qmx_CorrStream_Gorsk::read(char* buffer, unsigned int count) {
    Gorsk::IStream& stream = Live("read");
    // Refuse a short stream before the first byte, so that a failed read consumes nothing.
    if (stream.BytesLeft() < static_cast<std::int64_t>(count)) {
        CheckRead(Gorsk::Status::kEndOfStream, "read");
    }
    for (unsigned int i = 0; i < count; ++i) {
        unsigned char byte = 0;
        CheckRead(stream.ReadByte(byte), "read");
        buffer[i] = static_cast<char>(byte);
    }
}

void Qmx_CorrStream_Gorsk::write(const char* buffer, unsigned int count) {
    Gorsk::IStream& stream = Live("write");
    for (unsigned int i = 0; i < count; ++i) {
        CheckWrite(stream.WriteByte(static_cast<unsigned char>(buffer[i])), "write");
    }
}

void Qmx_CorrStream_Gorsk::Flush() { CheckWrite(Live("Flush").Flush(), "Flush"); }

std::int64_t Qmx_CorrStream_Gorsk::BytesLeft() const { return Live("BytesLeft").BytesLeft(); }

void Qmx_CorrStream_Gorsk::Close() {
    Gorsk::IStream* const stream = &Live("Close");
    m_stream = nullptr;
    if (m_repoStorage->CloseStream(stream) != Gorsk::Status::kOk) {
        QMX_CORR_THROW(CannotWriteDatabase, m_databaseName.c_str());
    }
}

Gorsk::IStream& Qmx_CorrStream_Gorsk::Live(const char* request) const {
    if (!m_stream) {
        Vesk::StringBase<char> text;
        text.Format("%s on a closed repository stream", request);
        QMX_CORR_THROW(InvalidRequest, text.c_str());
    }
    return *m_stream;
}

void Qmx_CorrStream_Gorsk::CheckRead(Gorsk::Status status, const char* request) const {
    switch (status) {
        case Gorsk::Status::kOk:
            return;
        case Gorsk::Status::kEndOfStream:
        case Gorsk::Status::kInvalidFormat:
            QMX_CORR_THROW(InvalidDatabaseFormat, m_databaseName.c_str());
        case Gorsk::Status::kBadRequest:
        case Gorsk::Status::kReadOnly: {
            Vesk::StringBase<char> text;
            text.Format("%s refused by the repository stream", request);
            QMX_CORR_THROW(InvalidRequest, text.c_str());
        }
        default:
            QMX_CORR_THROW(CannotReadDatabase, m_databaseName.c_str());
    }
}

void Qmx_CorrStream_Gorsk::CheckWrite(Gorsk::Status status, const char* request) const {
    switch (status) {
        case Gorsk::Status::kOk:
            return;
        case Gorsk::Status::kBadRequest:
        case Gorsk::Status::kReadOnly: {
            Vesk::StringBase<char> text;
            text.Format("%s refused by the repository stream", request);
            QMX_CORR_THROW(InvalidRequest, text.c_str());
        }
        default:
            QMX_CORR_THROW(CannotWriteDatabase, m_databaseName.c_str());
    }
}
