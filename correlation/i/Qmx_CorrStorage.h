// Qmx_CorrStorage: the typed reader and writer of one record stream. Forwards the primitives
// to the stream and turns object pointers into numbers and back: containers and implicit
// relationships as ordinals of the shared tables (WriteUINT32), items and explicit
// relationships as pool handles (4 raw bytes, least significant first). A short-lived local
// object; does not own the stream or the shared data.
#ifndef QMX_CORRSTORAGE_H
#define QMX_CORRSTORAGE_H
#include <cstdint>

#include "QmxCorrExport.h"
#include "Qmx_CorrStorageData.h"
#include "Vesk_StringBase.h"

class Qmx_CorrContainer;
class Qmx_CorrStream;

class QMX_CORR_EXPORT Qmx_CorrStorage {
public:
    // `name` is the database's, carried by the exceptions of every reader.
    // REQUIRES: `stream` is not null and outlives the storage.
    Qmx_CorrStorage(const Vesk::StringBase<char>& name, Qmx_CorrStream* stream,
                    Qmx_CorrStorageData& data);

    const Vesk::StringBase<char>& GetName() const { return m_name; }
    Qmx_CorrStream* GetStream() const { return m_stream; }
    Qmx_CorrStorageData& GetData() const { return m_data; }

    Vesk::StringBase<char> ReadString();
    void WriteString(const Vesk::StringBase<char>& text);
    bool ReadBool();
    void WriteBool(bool value);
    unsigned char ReadUINT8();
    void WriteUINT8(unsigned char value);
    unsigned int ReadUINT32();
    void WriteUINT32(unsigned int value);

    // Ordinal readers: an ordinal beyond its table is InvalidDatabaseFormat.
    Qmx_CorrManagedContainer* ReadManagedContainerPtr();
    Qmx_CorrContainer* ReadContainerPtr();
    Qmx_CorrManagedImplicitRelationship* ReadManagedImpRelPtr();
    // REQUIRES: the table is sorted by std::less. Null writes 0; an object that is not in
    // the table throws InvalidRequest and writes nothing.
    void WriteContainerPtr(void* p);
    void WriteImpRelPtr(void* p);

    // Handle readers ask the pool manager's swizzler (for handle 0 too); without a swizzler
    // handle 0 reads as null and any other is InvalidDatabaseFormat. Writers ask the
    // swizzler; without one, null writes 0 and an object throws InvalidRequest.
    Qmx_CorrManagedItem* ReadManagedItemPtr();
    void WriteItemPtr(void* p);
    Qmx_CorrManagedExplicitRelationship* ReadManagedExpRelPtr();
    void WriteExpRelPtr(void* p);

    // A pool handle as 4 raw bytes, least significant first.
    unsigned int ReadHandle();
    void WriteHandle(unsigned int handle);

    // The stream's BytesLeft: -1 when it cannot tell.
    std::int64_t BytesLeft() const;
    // Throws InvalidDatabaseFormat with the database name unless `count` records of at least
    // `bytesEach` bytes can still follow (when the stream can tell).
    void CheckCount(std::uint64_t count, std::uint64_t bytesEach) const;

private:
    unsigned int ReadOrdinal(std::size_t tableSize);

    Vesk::StringBase<char> m_name;
    Qmx_CorrStream* m_stream;  // not owned
    Qmx_CorrStorageData& m_data;
};

#endif
