// Qmx_CorrDb: a correlation database as a set of named byte streams, which it opens, closes,
// sizes and deletes by name and commits as a whole. The database owns every stream it hands
// out until CloseStream or its own destruction. Implementations: Qmx_CorrDb_Internal (one
// file) and Qmx_CorrDb_Gorsk (a storage of the project-repository component). One thread at a
// time.
#ifndef QMX_CORRDB_H
#define QMX_CORRDB_H
#include <ostream>

#include "QmxCorrExport.h"
#include "Vesk_StringBase.h"

class Qmx_CorrStream;

class QMX_CORR_EXPORT Qmx_CorrDb {
public:
    // Bits of the `mode` of OpenStream.
    static constexpr int kRead = 1;
    static constexpr int kWrite = 2;
    static constexpr int kTruncate = 4;  // discard the stream's old contents
    static constexpr int kPortable = 8;  // a stream of the portability layer (compressed form)

    virtual ~Qmx_CorrDb();

    virtual Vesk::StringBase<char> GetName() const = 0;
    virtual bool StreamExists(const Vesk::StringBase<char>& name) const = 0;
    virtual void DeleteStream(const Vesk::StringBase<char>& name) = 0;
    // Null when the stream cannot be opened (for reading: when it does not exist). The
    // database keeps ownership.
    virtual Qmx_CorrStream* OpenStream(const Vesk::StringBase<char>& name, int mode) = 0;
    // Destroys a stream this database handed out; any other pointer is left alone.
    virtual void CloseStream(Qmx_CorrStream* stream) = 0;
    // Sets the stream's length, creating it when it is missing.
    virtual void SetStreamSize(const Vesk::StringBase<char>& name, int size) = 0;
    virtual void Commit() const = 0;
    virtual bool DbgValidateState() const = 0;
    virtual void DbgDump(std::ostream& out, unsigned int indent) const = 0;
    virtual void DbgDump() const = 0;

protected:
    Qmx_CorrDb() = default;
};

#endif
