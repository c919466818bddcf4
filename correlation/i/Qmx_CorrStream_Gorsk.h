// Qmx_CorrStream_Gorsk: a stream of the project-repository component's storage, made by
// Qmx_CorrDb_Gorsk::OpenStream and owned by that database. Each operation is one call on the
// component's stream object, which keeps the encodings of Qmx_CorrStream.h; the raw read and
// write go byte by byte. The component keeps no positions that a caller may set, so GetPos,
// SeekEnd and SeekPos throw InvalidRequest. What is written reaches the repository whole when
// the stream is closed. One thread at a time.
#ifndef QMX_CORRSTREAM_GORSK_H
#define QMX_CORRSTREAM_GORSK_H
#include <cstdint>

#include "QmxCorrExport.h"
#include "Qmx_CorrStream.h"
#include "Vesk_StringBase.h"

namespace Gorsk {
class IStorage;
class IStream;
enum class Status : int;
}  // namespace Gorsk

class QMX_CORR_EXPORT Qmx_CorrStream_Gorsk : public Qmx_CorrStream {
public:
    // Opens `streamName` of `storage` with the component's access value (1 read, 2 write,
    // 3 both, plus 16 to truncate). Throws InvalidRequest when `storage` is null or the
    // component gives no stream (for reading: when the stream does not exist).
    // `databaseName` is the name that read and write failures carry.
    Qmx_CorrStream_Gorsk(Gorsk::IStorage* storage, const Vesk::StringBase<char>& streamName,
                         int accessMode, const Vesk::StringBase<char>& databaseName);
    // Closes the component's stream if Close has not; a write that cannot be kept then is
    // reported through the message manager, as a destructor does not throw.
    ~Qmx_CorrStream_Gorsk() override;
    Qmx_CorrStream_Gorsk(const Qmx_CorrStream_Gorsk&) = delete;
    Qmx_CorrStream_Gorsk& operator=(const Qmx_CorrStream_Gorsk&) = delete;

    // Throw InvalidRequest: not supported by a repository stream.
    unsigned int GetPos() const override;
    void SeekEnd() override;
    void SeekPos(unsigned int pos) override;
    // Reads throw InvalidDatabaseFormat (with the database name) when the stream holds fewer
    // bytes than asked, before consuming any; InvalidRequest on a stream not open for reading.
    Vesk::StringBase<char> ReadString() override;
    // Writes throw InvalidRequest on a stream not open for writing, CannotWriteDatabase when
    // the stream would outgrow what the repository keeps.
    void WriteString(const Vesk::StringBase<char>& text) override;
    bool ReadBool() override;
    void WriteBool(bool value) override;
    unsigned char ReadUINT8() override;
    void WriteUINT8(unsigned char value) override;
    unsigned int ReadUINT32() override;
    void WriteUINT32(unsigned int value) override;
    void read(char* buffer, unsigned int count) override;
    void write(const char* buffer, unsigned int count) override;
    void Flush() override;

    std::int64_t BytesLeft() const override;

    // Closes the component's stream, which stores what was written. Throws
    // CannotWriteDatabase (with the database name) when it could not be stored; the
    // component's stream is gone either way, and every later operation throws InvalidRequest.
    void Close();

private:
    // The component's stream; throws InvalidRequest, naming `request`, once closed.
    Gorsk::IStream& Live(const char* request) const;
    void CheckRead(Gorsk::Status status, const char* request) const;
    void CheckWrite(Gorsk::Status status, const char* request) const;

    Gorsk::IStorage* m_repoStorage;         // the storage it was opened from; not owned
    Gorsk::IStream* m_stream;               // the component's; null once closed
    Vesk::StringBase<char> m_databaseName;  // for the exceptions
};

#endif
