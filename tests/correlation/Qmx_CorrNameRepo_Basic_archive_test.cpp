// The name repository's string table in its database stream: the bytes written, the round
// trip, damaged streams and the traces. The scenarios run on a database file, whose portable
// stream cannot tell its length before it is read, and on an in-memory database whose
// streams know their length.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "Qmx_CorrDb.h"
#include "Qmx_CorrDb_Internal.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrNameRepo_Basic.h"
#include "Qmx_CorrName_Basic.h"
#include "Qmx_CorrStream_Internal.h"
#include "TempDir.h"
#include "Vesk_File.h"
#include "Vesk_Stream.h"

namespace {

using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Handle = Qmx_CorrNameHandle;
using Repo = Qmx_CorrNameRepo_Basic;

std::string U32(unsigned int v) {
    std::string bytes(4, '\0');
    for (int i = 0; i < 4; ++i) bytes[i] = static_cast<char>((v >> (8 * i)) & 0xFF);
    return bytes;
}
std::string Str(const std::string& text) { return U32(text.size()) + text; }

// Slots p, (empty), r: first free slot 2, free count 1.
const std::string kHoleStream = U32(0) + U32(2) + U32(1) + U32(3) + Str("p") + Str("") + Str("r");

// Named byte strings; a stream opened for writing replaces its bytes when it is closed. It can
// refuse every stream, and counts the streams that are open.
class MemoryDb : public Qmx_CorrDb {
public:
    ~MemoryDb() override {
        while (!m_open.empty()) CloseStream(m_open.begin()->first);
    }
    Vesk::StringBase<char> GetName() const override { return "memory.cpd"; }
    bool StreamExists(const Vesk::StringBase<char>& name) const override {
        return m_streams.count(name) != 0;
    }
    void DeleteStream(const Vesk::StringBase<char>& name) override { m_streams.erase(name); }
    Qmx_CorrStream* OpenStream(const Vesk::StringBase<char>& name, int mode) override {
        const bool reading = (mode & kRead) != 0;
        if (m_refuse || (reading && !StreamExists(name))) return nullptr;
        auto buffer = std::make_unique<std::stringstream>(
            reading ? m_streams[name] : "", std::ios::in | std::ios::out | std::ios::binary);
        auto* stream = new Qmx_CorrStream_Internal(buffer.get(), GetName());
        m_open[stream] = {reading ? "" : name, std::move(buffer)};
        return stream;
    }
    void CloseStream(Qmx_CorrStream* stream) override {
        auto it = m_open.find(stream);
        if (it == m_open.end()) return;
        if (!it->second.first.empty()) m_streams[it->second.first] = it->second.second->str();
        delete stream;
        m_open.erase(it);
    }
    void SetStreamSize(const Vesk::StringBase<char>&, int) override {}
    void Commit() const override {}
    bool DbgValidateState() const override { return true; }
    void DbgDump(std::ostream&, unsigned int) const override {}
    void DbgDump() const override {}

    std::map<std::string, std::string> m_streams;
    // Each open stream with the name it is written to ("" when read) and its bytes.
    std::map<Qmx_CorrStream*, std::pair<std::string, std::unique_ptr<std::stringstream>>> m_open;
    bool m_refuse = false;
};

class NameRepoArchive : public ::testing::TestWithParam<bool> {
protected:
    void SetUp() override {
        if (GetParam()) Reopen();
    }
    void TearDown() override {
        for (Handle h : m_held) m_repo.ReleaseName(h);
    }

    Qmx_CorrDb* Db() { return m_file ? static_cast<Qmx_CorrDb*>(m_file.get()) : &m_memory; }
    // Commits the database file and opens it again.
    void Reopen() {
        if (m_file) m_file->Commit();
        m_file.reset();
        m_file = std::make_unique<Qmx_CorrDb_Internal>(m_dir / "names.cpd");
    }
    // The stream's bytes as a reader gets them (a file stream is stored compressed).
    std::string Stored() {
        if (!m_file) return m_memory.m_streams[Repo::kStreamName];
        Vesk::Stream* file =
            Vesk::File::open(m_file->GetTempDir() + Repo::kStreamName, Vesk::File::kRead, false);
        if (!file) return "<missing>";
        std::string bytes;
        char block[256];
        while (std::size_t n = file->readsome(block, sizeof block)) bytes.append(block, n);
        Vesk::File::close(file);
        return bytes;
    }
    void Put(const std::string& bytes) {
        Qmx_CorrStream* stream = Db()->OpenStream(Repo::kStreamName, Repo::kArchiveMode);
        ASSERT_NE(stream, nullptr);
        stream->write(bytes.data(), static_cast<unsigned int>(bytes.size()));
        Db()->CloseStream(stream);
    }
    void FillWithAHole() {
        m_held = {m_repo.CreateName("p"), m_repo.CreateName("q"), m_repo.CreateName("r")};
        m_repo.ReleaseName(m_held[1]);
        m_held.erase(m_held.begin() + 1);
    }
    static void ExpectHoleTable(const Repo& repo) {
        EXPECT_EQ(repo.GetTableSize(), 4u);
        EXPECT_EQ(repo.GetFirstFreeSlot(), 2u);
        EXPECT_EQ(repo.GetFreeCount(), 1u);
    }
    void ExpectRefused() {
        const std::string text =
            "Qmx_CorrException::InvalidDatabaseFormat. Unable to read '" + Db()->GetName() + "'.\n";
        EXPECT_THAT([&] { m_repo.Restore(Db()); },
                    ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(StrEq(text)));
    }

    TempDir m_dir;
    MemoryDb m_memory;
    std::unique_ptr<Qmx_CorrDb_Internal> m_file;
    Repo m_repo;
    std::vector<Handle> m_held;
};

TEST_P(NameRepoArchive, TableIsWrittenSlotBySlotWithItsFreeList) {
    m_repo.Archive(Db());
    EXPECT_EQ(Stored(), std::string(16, '\0'));
    FillWithAHole();
    m_repo.Archive(Db());
    EXPECT_EQ(Stored(), kHoleStream);
    m_held.push_back(m_repo.CreateName(std::string("z\0\xFF", 3)));
    m_repo.Archive(Db());
    EXPECT_EQ(Stored(), U32(0) + U32(0) + U32(0) + U32(3) + Str("p") +
                            Str(std::string("z\0\xFF", 3)) + Str("r"));
}

TEST_P(NameRepoArchive, RestoredTableKeepsIndexesAndFreeList) {
    FillWithAHole();
    m_repo.Archive(Db());
    if (m_file) Reopen();
    Repo restored;
    restored.Restore(Db());
    ExpectHoleTable(restored);
    Handle reused = restored.CreateName("s");
    EXPECT_EQ(dynamic_cast<Qmx_CorrName_Basic*>(reused.GetRecord())->GetIndex(), 2u);
    EXPECT_EQ(restored.GetFreeCount(), 0u);
    restored.ReleaseName(reused);
}

TEST_P(NameRepoArchive, RestoreWithoutStreamGivesTheEmptyTable) {
    FillWithAHole();
    m_repo.Restore(Db());
    EXPECT_EQ(m_repo.GetTableSize(), 1u);
    EXPECT_EQ(m_repo.GetFreeCount(), 0u);
    EXPECT_EQ(m_repo.GetFirstFreeSlot(), 0u);
    EXPECT_EQ(m_repo.GetString(m_held[0]), "");
}

// A refused stream leaves the repository as it was, and it goes on working.
TEST_P(NameRepoArchive, DamagedStreamIsRefusedAndChangesNothing) {
    const std::string v0 = U32(0);
    const std::vector<std::pair<const char*, std::string>> damaged = {
        {"format version 1", U32(1) + U32(0) + U32(0) + U32(0)},
        {"free count without an empty slot", v0 + U32(1) + U32(1) + U32(1) + Str("a")},
        {"first free slot without a free count", v0 + U32(1) + U32(0) + U32(1) + Str("a")},
        {"empty slot left out of the free count", v0 + U32(0) + U32(0) + U32(1) + Str("")},
        {"free count above the empty slots", v0 + U32(1) + U32(2) + U32(1) + Str("")},
        {"first free slot not the lowest", v0 + U32(2) + U32(2) + U32(2) + Str("") + Str("")},
        {"first free slot on a used slot", v0 + U32(1) + U32(1) + U32(2) + Str("a") + Str("")},
        {"first free slot beyond the table", v0 + U32(9) + U32(1) + U32(1) + Str("")},
        {"absurd string count", v0 + U32(0) + U32(0) + U32(0xFFFFFFFF) + Str("a")},
        {"string longer than the data", v0 + U32(0) + U32(0) + U32(1) + U32(0x7FFFFFFF)},
    };
    FillWithAHole();
    for (const auto& [what, bytes] : damaged) {
        SCOPED_TRACE(what);
        Put(bytes);
        ExpectRefused();
        ExpectHoleTable(m_repo);
        EXPECT_EQ(m_repo.GetString(m_held[0]), "p");
    }
    m_held.push_back(m_repo.CreateName("s"));
    EXPECT_EQ(dynamic_cast<Qmx_CorrName_Basic*>(m_held.back().GetRecord())->GetIndex(), 2u);
}

TEST_P(NameRepoArchive, StreamCutAtAnyLengthIsRefused) {
    for (std::size_t length = 0; length < kHoleStream.size(); ++length) {
        SCOPED_TRACE(length);
        Put(kHoleStream.substr(0, length));
        ExpectRefused();
        EXPECT_EQ(m_repo.GetTableSize(), 1u);
    }
    Put(kHoleStream);
    m_repo.Restore(Db());
    ExpectHoleTable(m_repo);
}

INSTANTIATE_TEST_SUITE_P(Databases, NameRepoArchive, ::testing::Bool(),
                         [](const ::testing::TestParamInfo<bool>& p) {
                             return p.param ? "File" : "Memory";
                         });

// What only the in-memory database can show.
class NameRepoMemoryDb : public ::testing::Test {
protected:
    MemoryDb m_db;
    Repo m_repo;
};

TEST_F(NameRepoMemoryDb, ArchiveWithoutStreamIsRefused) {
    m_db.m_refuse = true;
    EXPECT_THAT([&] { m_repo.Archive(&m_db); },
                ThrowsMessage<Qmx_CorrException::CannotWriteDatabase>(StrEq(
                    "Qmx_CorrException::CannotWriteDatabase. Unable to write 'memory.cpd'.\n")));
    EXPECT_TRUE(m_db.m_streams.empty());
}

TEST_F(NameRepoMemoryDb, StreamsAreClosedAfterUseAndAfterRefusal) {
    m_repo.Archive(&m_db);
    m_repo.Restore(&m_db);
    EXPECT_TRUE(m_db.m_open.empty());
    // A stream that knows its length also refuses bytes after the last string.
    m_db.m_streams[Repo::kStreamName] = kHoleStream + "x";
    EXPECT_THROW(m_repo.Restore(&m_db), Qmx_CorrException::InvalidDatabaseFormat);
    EXPECT_TRUE(m_db.m_open.empty());
    EXPECT_EQ(m_repo.GetTableSize(), 1u);
}

class NameRepoTrace : public NameRepoMemoryDb {
protected:
    void SetUp() override { Qmx_CorrDbg::s_Tracer->SetOutput(m_out); }
    void TearDown() override {
        Qmx_CorrDbg::s_Tracer->SetOutput(std::clog);
        Qmx_CorrDbg::s_Tracer->RemoveTrace("STRING_ARCHIVE");
    }
    std::ostringstream m_out;
};

TEST_F(NameRepoTrace, ArchiveAndRestoreReportTheirCountsAtLevelTen) {
    Qmx_CorrDbg::s_Tracer->SetTraceLevel("STRING_ARCHIVE", 9);
    m_repo.Archive(&m_db);
    EXPECT_EQ(m_out.str(), "");

    Qmx_CorrDbg::s_Tracer->SetTraceLevel("STRING_ARCHIVE", 10);
    const Handle a[] = {m_repo.CreateName("a"), m_repo.CreateName("a")};
    m_repo.ReleaseName(m_repo.CreateName("z"));
    m_repo.Archive(&m_db);
    m_repo.Restore(&m_db);
    std::vector<std::string> texts;
    std::istringstream records(m_out.str());
    const std::string head = "QMX_CORR_TRACE:STRING_ARCHIVE:10:s/Qmx_CorrNameRepo_Basic(";
    for (std::string line; std::getline(records, line);) {
        EXPECT_EQ(line.compare(0, head.size(), head), 0) << line;
        texts.push_back(line.substr(line.find("): ") + 3));
    }
    EXPECT_THAT(texts, ::testing::ElementsAre(
                           "Wrote 4 total strings. (including empty slots)",
                           "Currently there are 1 empty slots in the string table.",
                           "There are 2 strings that were duplicates of other strings or were "
                           "empty slots.",
                           "Read in 3 strings."));
    for (Handle h : a) m_repo.ReleaseName(h);
}

}  // namespace
