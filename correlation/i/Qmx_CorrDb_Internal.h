// Qmx_CorrDb_Internal: a correlation database kept in one file (the CPD file). While it is
// open, every stream is an ordinary file of the same name in a temporary directory: opening
// unpacks the CPD file into it, Commit packs every file of the directory back. Commit is
// atomic: the new CPD file is written beside the old one under a temporary name, made durable
// and renamed over it, so a failed commit (or a crash) leaves the last committed file as it
// was. Owns the streams it hands out. One thread at a time; two databases never share a
// temporary directory.
//
// CPD file layout (each integer 4 bytes, least significant first; a string is its 4-byte
// length, then its bytes). The whole file may be one zstd frame holding these bytes.
//   offset  size  field
//   0       4     length of the magic: 16
//   4       16    magic "OBRENT CPD V1.0\n"
//   20      4     stream count N
//   24      ...   N directory entries: name (string), length (4 bytes), in body order
//   ...     ...   N bodies, each exactly its length, back to back, nothing after the last
// An empty file is a new database without streams.
#ifndef QMX_CORRDB_INTERNAL_H
#define QMX_CORRDB_INTERNAL_H
#include <map>
#include <set>
#include <vector>

#include "Qmx_CorrDb.h"

namespace Vesk {
class Stream;
}

class QMX_CORR_EXPORT Qmx_CorrDb_Internal : public Qmx_CorrDb {
public:
    // Opens the CPD file `name`, creating an empty one when it is missing, and unpacks it into
    // a fresh private temporary directory, removed again on destruction. Throws
    // CannotWriteDatabase when the file or directory cannot be made, InvalidDatabaseFormat
    // (with `name`) when the file is damaged; a failed construction leaves no directory
    // behind and the file untouched.
    explicit Qmx_CorrDb_Internal(const Vesk::StringBase<char>& name);
    // The same, unpacking into `tempDir` (made if missing), which the caller keeps: it is not
    // removed, and the stream files stay in it.
    Qmx_CorrDb_Internal(const Vesk::StringBase<char>& name, const Vesk::StringBase<char>& tempDir);
    // Closes every stream; does not commit.
    ~Qmx_CorrDb_Internal() override;
    Qmx_CorrDb_Internal(const Qmx_CorrDb_Internal&) = delete;
    Qmx_CorrDb_Internal& operator=(const Qmx_CorrDb_Internal&) = delete;

    Vesk::StringBase<char> GetName() const override;
    bool StreamExists(const Vesk::StringBase<char>& name) const override;
    void DeleteStream(const Vesk::StringBase<char>& name) override;
    // Modes: 1 read, 3 read and write an existing stream, 7 (or 6) start it empty; plus 8 for
    // a portable stream (9 read, 10 or 14 write from scratch; read and write together give
    // null). Null when the stream cannot be opened, or when `name` is not a plain file name.
    Qmx_CorrStream* OpenStream(const Vesk::StringBase<char>& name, int mode) override;
    void CloseStream(Qmx_CorrStream* stream) override;
    void SetStreamSize(const Vesk::StringBase<char>& name, int size) override;
    // Packs every file of the temporary directory into the CPD file (compressed when
    // OBR_QMX_USE_COMPRESSION is set). Open streams are flushed and stay open. A portable
    // stream whose closing failed is incomplete: Commit refuses it with CannotWriteDatabase
    // until it has been written and closed again. Throws
    // CannotWriteDatabase or CannotReadDatabase on failure, and Vesk::Exception when a stream
    // is larger than 4 GiB - 1 bytes; the last committed file is then untouched and no
    // temporary file is left.
    void Commit() const override;
    bool DbgValidateState() const override;
    void DbgDump(std::ostream& out, unsigned int indent) const override;
    void DbgDump() const override;

    // True when opening found no file, or an empty one.
    bool IsNew() const { return m_isNew; }
    // The temporary directory, ending in "/".
    const Vesk::StringBase<char>& GetTempDir() const { return m_tempDir; }

private:
    void Open();
    void PrepareTempDir();
    void Unpack(Vesk::Stream& file);
    void Release();
    void WriteCpdFile(const Vesk::StringBase<char>& path) const;

    Vesk::StringBase<char> m_name;               // path of the CPD file
    Vesk::StringBase<char> m_tempDir;            // ends in "/"
    std::vector<Qmx_CorrStream*> m_openStreams;  // owned
    // Portable streams open for writing, by name: their bytes reach the file only when they
    // are closed, and a close that fails must stop the next commit.
    std::map<Qmx_CorrStream*, Vesk::StringBase<char>> m_portableWriters;
    std::set<Vesk::StringBase<char>> m_incompleteStreams;  // closes that failed
    bool m_ownsTempDir;
    bool m_isNew;
};

#endif
