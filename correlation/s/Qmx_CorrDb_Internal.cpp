#include "Qmx_CorrDb_Internal.h"

#include <algorithm>
#include <fstream>
#include <iostream>
#include <memory>
#include <set>

#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrStream_Internal.h"
#include "Qmx_CorrStream_UTStr.h"
#include "Vesk_Env.h"
#include "Vesk_File.h"
#include "Vesk_IOException.h"
#include "Vesk_Stream.h"

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrDb_Internal";
constexpr const char* kRevision = "1";
constexpr const char* kMagic = "OBRENT CPD V1.0\n";
constexpr std::size_t kCopyBlockSize = 65536;
constexpr std::int64_t kMaxStreamSize = 4294967295LL;
// Longer names cannot be file names, so a longer directory entry is damage.
constexpr std::size_t kMaxStreamName = 256;
// A directory entry is at least its name's length and its own length.
constexpr std::int64_t kMinEntrySize = 8;

// Each looked up once per process, as files must be read and written alike for its lifetime.
bool CompressOnRead() {
    static const bool value = Vesk_Env::GetEnv("OBR_QMX_USE_COMPRESSION") != nullptr;
    return value;
}

bool CompressOnWrite() {
    static const bool value = Vesk_Env::GetEnv("OBR_QMX_USE_COMPRESSION") != nullptr;
    return value;
}

// Stream names are data, not paths: a name must stay a file directly inside the temporary
// directory.
bool IsPlainFileName(const Vesk::StringBase<char>& name) {
    return !name.empty() && name != "." && name != ".." && name.size() < kMaxStreamName &&
           name.find_first_of(std::string("/\\\0", 3)) == std::string::npos;
}

struct DirectoryEntry {
    Vesk::StringBase<char> name;
    std::uint32_t length;
};

// A directory entry's name, read without trusting its length: a name too long for a file
// name throws before anything is reserved for it.
Vesk::StringBase<char> ReadStreamName(Vesk::Stream& file) {
    const std::uint32_t length = file.readuint32();
    if (length >= kMaxStreamName) {
        throw Vesk::IOException(Vesk::IOException::kDamagedData, kSourceFile, __LINE__,
                                "Stream name too long.");
    }
    Vesk::StringBase<char> name(length, '\0');
    file.read(&name[0], length);
    return name;
}

enum class CopyFailure { kNone, kReading, kWriting };

// Copies exactly `count` bytes through `buffer`, in blocks of its size, and says which side
// failed, if any.
CopyFailure CopyBytes(Vesk::Stream& from, Vesk::Stream& to, std::int64_t count,
                      std::vector<char>& buffer) {
    while (count > 0) {
        const std::size_t piece = static_cast<std::size_t>(
            std::min<std::int64_t>(count, static_cast<std::int64_t>(buffer.size())));
        try {
            from.read(buffer.data(), piece);
        } catch (const Vesk::IOException&) {
            return CopyFailure::kReading;
        }
        try {
            to.write(buffer.data(), piece);
        } catch (const Vesk::IOException&) {
            return CopyFailure::kWriting;
        }
        count -= static_cast<std::int64_t>(piece);
    }
    return CopyFailure::kNone;
}

}  // namespace

Qmx_CorrDb_Internal::Qmx_CorrDb_Internal(const Vesk::StringBase<char>& name)
    : m_name(name), m_ownsTempDir(true), m_isNew(false) {
    Open();
}

Qmx_CorrDb_Internal::Qmx_CorrDb_Internal(const Vesk::StringBase<char>& name,
                                         const Vesk::StringBase<char>& tempDir)
    : m_name(name), m_tempDir(tempDir), m_ownsTempDir(false), m_isNew(false) {
    Open();
}

Qmx_CorrDb_Internal::~Qmx_CorrDb_Internal() { Release(); }

void Qmx_CorrDb_Internal::Release() {
    for (Qmx_CorrStream* stream : m_openStreams) delete stream;
    m_openStreams.clear();
    m_portableWriters.clear();
    if (m_ownsTempDir && !m_tempDir.empty()) {
        Vesk::StringBase<char> dir = m_tempDir;
        dir.Truncate(dir.size() - 1);
        Vesk::File::remove_r(dir);
        Vesk::File::remtmpnam(dir);
        m_tempDir.clear();
    }
}

void Qmx_CorrDb_Internal::Open() {
    if (!Vesk::File::exist(m_name) || Vesk::File::getsize_noopen(m_name) == 0) {
        QMX_CORR_TRACE("ARCHIVE", 10, "Creating '" << m_name << "' as a new empty archive.");
        Vesk::File::touchfile(m_name);
        m_isNew = true;
    }
    Vesk::Stream* file = Vesk::File::open(m_name, CompressOnRead() ? 9 : 1, false);
    if (!file) QMX_CORR_THROW(CannotWriteDatabase, m_name.c_str());
    try {
        PrepareTempDir();
        QMX_CORR_TRACE(
            "ARCHIVE", 10,
            "Using directory " << m_tempDir << " as temporary storage for database " << m_name);
        if (m_isNew) {
            QMX_CORR_TRACE("ARCHIVE", 5, "Database: " << m_name << " contains 0 data streams.");
        } else {
            Unpack(*file);
        }
    } catch (...) {
        // Nothing of a failed opening stays behind: no descriptor, no owned directory.
        Vesk::File::close(file);
        Release();
        throw;
    }
    // The streams now live in the temporary directory; the file is read again only by the
    // next opening.
    Vesk::File::close(file);
}

void Qmx_CorrDb_Internal::PrepareTempDir() {
    if (m_tempDir.empty()) {
        m_tempDir = Vesk::File::tmpnam(nullptr);
        if (m_tempDir.empty()) QMX_CORR_THROW(CannotWriteDatabase, m_tempDir.c_str());
    }
    if (m_tempDir.back() != '/') m_tempDir += "/";
    if (!Vesk::File::isdir(m_tempDir)) Vesk::File::mkdir(m_tempDir, false);
    if (!Vesk::File::isdir(m_tempDir) || !Vesk::File::canwrite_dir(m_tempDir)) {
        QMX_CORR_THROW(CannotWriteDatabase, m_tempDir.c_str());
    }
}

void Qmx_CorrDb_Internal::Unpack(Vesk::Stream& file) {
    std::vector<DirectoryEntry> entries;
    try {
        char magic[kMaxStreamName];
        file.readstring(magic, sizeof magic);
        if (Vesk::StringBase<char>(magic) != kMagic) {
            QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
        }
        const std::uint32_t count = file.readuint32();
        // Compare the count with the bytes left first: a damaged count must not become a
        // huge allocation.
        const std::int64_t left = file.remaining();
        if (left >= 0 && static_cast<std::int64_t>(count) * kMinEntrySize > left) {
            QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
        }
        std::set<Vesk::StringBase<char>> names;
        std::int64_t total = 0;
        for (std::uint32_t i = 0; i < count; ++i) {
            DirectoryEntry entry;
            entry.name = ReadStreamName(file);
            entry.length = file.readuint32();
            if (!IsPlainFileName(entry.name) || !names.insert(entry.name).second) {
                QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
            }
            total += entry.length;
            entries.push_back(entry);
        }
        // The bodies must fill the rest of the file exactly: shorter is truncation, longer is
        // a directory that lost entries.
        if (file.remaining() >= 0 && file.remaining() != total) {
            QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
        }
    } catch (const Vesk::IOException&) {
        QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
    }
    QMX_CORR_TRACE("ARCHIVE", 5,
                   "Database: " << m_name << " contains " << entries.size() << " data streams.");

    std::vector<char> buffer(kCopyBlockSize);
    for (const DirectoryEntry& entry : entries) {
        QMX_CORR_TRACE("ARCHIVE", 10,
                       "Extracting stream '" << entry.name << "' (length " << entry.length
                                             << ") from archive");
        const Vesk::StringBase<char> path = m_tempDir + entry.name;
        Vesk::Stream* out = Vesk::File::open(path, 2, true);
        if (!out) QMX_CORR_THROW(CannotWriteDatabase, path.c_str());
        const CopyFailure failure = CopyBytes(file, *out, entry.length, buffer);
        const bool closed = Vesk::File::close(out);
        if (failure == CopyFailure::kReading) {
            QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
        }
        if (failure == CopyFailure::kWriting || !closed) {
            QMX_CORR_THROW(CannotWriteDatabase, path.c_str());
        }
    }
    // A compressed file cannot tell its length in advance: whatever follows the last body is
    // damage too.
    char extra;
    try {
        if (file.readsome(&extra, 1) != 0) QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
    } catch (const Vesk::IOException&) {
        QMX_CORR_THROW(InvalidDatabaseFormat, m_name.c_str());
    }
}

Vesk::StringBase<char> Qmx_CorrDb_Internal::GetName() const { return m_name; }

bool Qmx_CorrDb_Internal::StreamExists(const Vesk::StringBase<char>& name) const {
    return IsPlainFileName(name) && Vesk::File::exist(m_tempDir + name);
}

void Qmx_CorrDb_Internal::DeleteStream(const Vesk::StringBase<char>& name) {
    if (IsPlainFileName(name)) Vesk::File::remove_f(m_tempDir + name);
}

Qmx_CorrStream* Qmx_CorrDb_Internal::OpenStream(const Vesk::StringBase<char>& name, int mode) {
    if (!IsPlainFileName(name)) return nullptr;
    const Vesk::StringBase<char> path = m_tempDir + name;
    const bool read = (mode & kRead) != 0;
    const bool write = (mode & kWrite) != 0;
    const bool truncate = (mode & kTruncate) != 0;
    Qmx_CorrStream* stream = nullptr;
    try {
        if (mode & kPortable) {
            if (read && write) return nullptr;
            const int access = read ? 9 : (write && truncate ? 10 : 14);
            stream = new Qmx_CorrStream_UTStr(path, access, truncate, m_name);
            if (write) m_portableWriters[stream] = name;
        } else {
            std::ios::openmode openMode = std::ios::binary;
            if (read) openMode |= std::ios::in;
            if (write) openMode |= std::ios::out;
            if (truncate) openMode |= std::ios::trunc;
            stream = new Qmx_CorrStream_Internal(path, static_cast<int>(openMode), m_name);
        }
    } catch (const Qmx_CorrException::Base&) {
        return nullptr;
    }
    m_openStreams.push_back(stream);
    return stream;
}

void Qmx_CorrDb_Internal::CloseStream(Qmx_CorrStream* stream) {
    const auto found = std::find(m_openStreams.begin(), m_openStreams.end(), stream);
    if (found == m_openStreams.end()) return;
    m_openStreams.erase(found);
    const auto writer = m_portableWriters.find(stream);
    if (writer != m_portableWriters.end()) {
        const bool complete = static_cast<Qmx_CorrStream_UTStr*>(stream)->Close();
        if (complete) {
            m_incompleteStreams.erase(writer->second);
        } else {
            m_incompleteStreams.insert(writer->second);
        }
        m_portableWriters.erase(writer);
    }
    delete stream;
}

void Qmx_CorrDb_Internal::SetStreamSize(const Vesk::StringBase<char>& name, int size) {
    if (IsPlainFileName(name)) Vesk::File::resize_f(m_tempDir + name, size);
}

void Qmx_CorrDb_Internal::Commit() const {
    if (!m_incompleteStreams.empty()) {
        QMX_CORR_THROW(CannotWriteDatabase, (m_tempDir + *m_incompleteStreams.begin()).c_str());
    }
    for (Qmx_CorrStream* stream : m_openStreams) stream->Flush();
    // The new file is written beside the old one and renamed over it only when it is whole
    // and durable, so that the last committed file survives every failure and power loss.
    const Vesk::StringBase<char> tempPath = m_name + ".commit-tmp";
    try {
        WriteCpdFile(tempPath);
    } catch (...) {
        Vesk::File::remove_f(tempPath);
        throw;
    }
    if (!Vesk::File::rename_f(tempPath, m_name)) {
        Vesk::File::remove_f(tempPath);
        QMX_CORR_THROW(CannotWriteDatabase, m_name.c_str());
    }
    const std::size_t slash = m_name.GetIndexOfLastChar('/');
    const Vesk::StringBase<char> dir =
        slash == Vesk::StringBase<char>::npos ? "." : m_name.substr(0, slash == 0 ? 1 : slash);
    // The rename is only durable once the directory is; until then a power loss may bring
    // back the old file, so this is a failure too.
    if (!Vesk::File::sync_dir(dir)) QMX_CORR_THROW(CannotWriteDatabase, m_name.c_str());
}

void Qmx_CorrDb_Internal::WriteCpdFile(const Vesk::StringBase<char>& path) const {
    Vesk::Stream* file = Vesk::File::open(path, CompressOnWrite() ? 10 : 2, true);
    if (!file) QMX_CORR_THROW(CannotWriteDatabase, m_name.c_str());
    std::unique_ptr<Vesk::Stream, bool (*)(Vesk::Stream*)> guard(file, Vesk::File::close);
    std::vector<DirectoryEntry> entries;
    try {
        file->writestring(kMagic);
        for (const Vesk::StringBase<char>& name : Vesk::File::listdir(m_tempDir)) {
            const std::int64_t size = Vesk::File::getsize_noopen(m_tempDir + name);
            if (size < 0) QMX_CORR_THROW(CannotReadDatabase, (m_tempDir + name).c_str());
            if (size > kMaxStreamSize) {
                throw Vesk::Exception("Quillmark", kSourceFile, kRevision, __LINE__,
                                      "The correlation data has grown to be larger than 4GB. "
                                      "Qmx is unable to store that much data.");
            }
            entries.push_back(DirectoryEntry{name, static_cast<std::uint32_t>(size)});
        }
        QMX_CORR_TRACE("ARCHIVE", 5,
                       "Saving " << entries.size() << " streams in database '" << m_name << "'");
        file->writeuint32(static_cast<std::uint32_t>(entries.size()));
        for (const DirectoryEntry& entry : entries) {
            file->writestring(entry.name);
            file->writeuint32(entry.length);
        }
    } catch (const Vesk::IOException&) {
        QMX_CORR_THROW(CannotWriteDatabase, m_name.c_str());
    }
    std::vector<char> buffer(kCopyBlockSize);
    for (const DirectoryEntry& entry : entries) {
        QMX_CORR_TRACE(
            "ARCHIVE", 10,
            "Saving stream '" << entry.name << "' (length " << entry.length << ") to database.");
        const Vesk::StringBase<char> streamPath = m_tempDir + entry.name;
        Vesk::Stream* in =
            Vesk::File::open(streamPath, Vesk::File::kRead | Vesk::File::kRaw, false);
        if (!in) QMX_CORR_THROW(CannotReadDatabase, streamPath.c_str());
        const CopyFailure failure = CopyBytes(*in, *file, entry.length, buffer);
        Vesk::File::close(in);
        if (failure == CopyFailure::kReading) {
            QMX_CORR_THROW(CannotReadDatabase, streamPath.c_str());
        }
        if (failure == CopyFailure::kWriting) QMX_CORR_THROW(CannotWriteDatabase, m_name.c_str());
    }
    try {
        file->finish();
        file->sync();
    } catch (const Vesk::IOException&) {
        QMX_CORR_THROW(CannotWriteDatabase, m_name.c_str());
    }
    guard.release();
    if (!Vesk::File::close(file)) QMX_CORR_THROW(CannotWriteDatabase, m_name.c_str());
}

bool Qmx_CorrDb_Internal::DbgValidateState() const { return true; }

void Qmx_CorrDb_Internal::DbgDump(std::ostream& out, unsigned int indent) const {
    Qmx_CorrDbg::PrintEmptyBlock(
        out, indent, Qmx_CorrDbg::GetDumpName(typeid(Qmx_CorrDb_Internal)) + ": '" + m_name + "'");
}

void Qmx_CorrDb_Internal::DbgDump() const { DbgDump(std::cerr, 0); }
