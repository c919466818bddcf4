#include "Qmx_CorrDb_Internal.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <memory>
#include <sstream>
#include <utility>
#include <vector>

#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrStream.h"
#include "TempDir.h"
#include "Vesk_Env.h"
#include "Vesk_FaultInjector.h"
#include "Vesk_File.h"
#include "Vesk_Stream.h"

namespace {

using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Str = Vesk::StringBase<char>;
using Streams = std::vector<std::pair<std::string, std::string>>;  // name, bytes

// The suite runs twice: plain, and with OBR_QMX_USE_COMPRESSION set (own test program).
bool Compressed() { return Vesk_Env::GetEnv("OBR_QMX_USE_COMPRESSION") != nullptr; }

std::string Le32(std::uint32_t v) {
    return std::string{static_cast<char>(v & 0xFF), static_cast<char>((v >> 8) & 0xFF),
                       static_cast<char>((v >> 16) & 0xFF), static_cast<char>(v >> 24)};
}

std::string PlainCpd(const Streams& streams) {
    std::string bytes = Le32(16) + "OBRENT CPD V1.0\n" + Le32(streams.size());
    for (const auto& s : streams) bytes += Le32(s.first.size()) + s.first + Le32(s.second.size());
    for (const auto& s : streams) bytes += s.second;
    return bytes;
}

std::string InvalidFormat(const std::string& name) {
    return "Qmx_CorrException::InvalidDatabaseFormat. Unable to read '" + name + "'.\n";
}

class CorrDbInternalTest : public ::testing::Test {
protected:
    void SetUp() override {
        // Private temporary directories of the databases land here, so that the tests can
        // see that none is left behind.
        const char* old = std::getenv("TMPDIR");
        m_oldTmpdir = old ? old : "";
        Vesk::File::mkdir(m_dir / "tmp", false);
        ::setenv("TMPDIR", (m_dir / "tmp").c_str(), 1);
    }
    void TearDown() override {
        Vesk::FaultInjector::Disarm();
        m_oldTmpdir.empty() ? ::unsetenv("TMPDIR") : ::setenv("TMPDIR", m_oldTmpdir.c_str(), 1);
    }

    std::string DbPath() const { return m_dir / "test.cpd"; }
    std::unique_ptr<Qmx_CorrDb_Internal> OpenDb() {
        return std::make_unique<Qmx_CorrDb_Internal>(DbPath());
    }
    static void Write(Qmx_CorrDb& db, const std::string& name, const std::string& bytes,
                      int mode = 6) {
        Qmx_CorrStream* stream = db.OpenStream(name, mode);
        ASSERT_NE(stream, nullptr) << name;
        stream->write(bytes.data(), static_cast<unsigned>(bytes.size()));
        db.CloseStream(stream);
    }
    static std::string Read(Qmx_CorrDb& db, const std::string& name, int mode = 1) {
        Qmx_CorrStream* stream = db.OpenStream(name, mode);
        EXPECT_NE(stream, nullptr) << name;
        if (!stream) return std::string();
        std::string bytes;
        char byte;
        while (stream->BytesLeft() != 0) {
            try {
                stream->read(&byte, 1);
            } catch (const Qmx_CorrException::InvalidDatabaseFormat&) {
                break;  // the end of a stream that cannot tell its length
            }
            bytes += byte;
        }
        db.CloseStream(stream);
        return bytes;
    }
    // The plain bytes of the committed file, whichever form it was written in.
    std::string CommittedBytes() const {
        Vesk::Stream* in = Vesk::File::open(DbPath(), Vesk::File::kRead, false);
        std::string bytes;
        char buffer[4096];
        while (std::size_t got = in->readsome(buffer, sizeof buffer)) bytes.append(buffer, got);
        Vesk::File::close(in);
        return bytes;
    }
    // No private directory of a database and no half-written commit is left.
    bool NothingLeftBehind() const {
        return std::filesystem::is_empty(m_dir / "tmp") &&
               !Vesk::File::exist(DbPath() + ".commit-tmp");
    }
    // Opens `bytes` as a database file and says how it went: "" when it opened.
    std::string OpenOutcome(const std::string& bytes) {
        WriteFileBytes(DbPath(), bytes);
        try {
            Qmx_CorrDb_Internal db(DbPath());
        } catch (const Qmx_CorrException::InvalidDatabaseFormat& e) {
            return e.what();
        }
        return std::string();
    }

    TempDir m_dir;
    std::string m_oldTmpdir;
};

TEST_F(CorrDbInternalTest, MissingFileBecomesAnEmptyDatabaseWithMagicAndZeroStreams) {
    {
        auto db = OpenDb();
        EXPECT_TRUE(db->IsNew());
        EXPECT_EQ(Vesk::File::getsize_noopen(DbPath()), 0);
        EXPECT_EQ(db->GetTempDir().back(), '/');
        db->Commit();
    }
    EXPECT_EQ(CommittedBytes(), PlainCpd({}));
    EXPECT_EQ(ReadFileBytes(DbPath()).substr(0, 4),
              Compressed() ? std::string("\x28\xB5\x2F\xFD") : Le32(16));
    EXPECT_FALSE(OpenDb()->IsNew());
    EXPECT_TRUE(NothingLeftBehind());
}

TEST_F(CorrDbInternalTest, CommittedFileHoldsDirectoryThenBodiesInNameOrder) {
    {
        auto db = OpenDb();
        Write(*db, "b", "");
        Write(*db, "a", "xy");
        db->Commit();
    }
    EXPECT_EQ(CommittedBytes(), PlainCpd({{"a", "xy"}, {"b", ""}}));
}

TEST_F(CorrDbInternalTest, StreamsOfEveryKindSurviveCommitAndReopen) {
    std::string big;
    for (int i = 0; i < 200000; ++i) big += static_cast<char>(i * 7 + i / 256);
    {
        auto db = OpenDb();
        Write(*db, "internal", big);
        Write(*db, "empty", "");
        Write(*db, "portable", "ab\0cd" + big, 14);
        Write(*db, "zero", std::string(3, '\0'), 7);
        db->Commit();
        Write(*db, "after", "not committed");
    }
    auto db = OpenDb();
    EXPECT_EQ(Read(*db, "internal"), big);
    EXPECT_EQ(Read(*db, "empty"), "");
    EXPECT_EQ(Read(*db, "portable", 9), "ab\0cd" + big);
    EXPECT_EQ(Read(*db, "zero"), std::string(3, '\0'));
    EXPECT_FALSE(db->StreamExists("after"));
    EXPECT_EQ(Vesk::File::getsize_noopen(db->GetTempDir() + "internal"), 200000);
}

TEST_F(CorrDbInternalTest, OpenStreamModesAndStreamHousekeeping) {
    auto db = OpenDb();
    EXPECT_EQ(db->OpenStream("missing", 1), nullptr);
    EXPECT_EQ(db->OpenStream("missing", 9), nullptr);
    EXPECT_EQ(db->OpenStream("missing", 3), nullptr);
    Write(*db, "s", "abc");
    EXPECT_EQ(db->OpenStream("s", 11), nullptr);
    for (const char* bad : {"", ".", "..", "../s", "a/b", "a\\b"}) {
        EXPECT_EQ(db->OpenStream(bad, 7), nullptr) << bad;
        EXPECT_FALSE(db->StreamExists(bad)) << bad;
    }
    Qmx_CorrStream* both = db->OpenStream("s", 3);
    ASSERT_NE(both, nullptr);
    both->SeekPos(1);
    both->write("Z", 1);
    db->CloseStream(both);
    EXPECT_EQ(Read(*db, "s"), "aZc");

    auto other = std::make_unique<Qmx_CorrDb_Internal>(m_dir / "other.cpd");
    Qmx_CorrStream* foreign = other->OpenStream("f", 7);
    db->CloseStream(foreign);  // not this database's: left alone
    foreign->write("q", 1);
    other->CloseStream(foreign);

    db->SetStreamSize("grown", 10);
    EXPECT_EQ(Read(*db, "grown"), std::string(10, '\0'));
    db->SetStreamSize("s", 1);
    EXPECT_EQ(Read(*db, "s"), "a");
    EXPECT_TRUE(db->StreamExists("s"));
    db->DeleteStream("s");
    db->DeleteStream("s");
    EXPECT_FALSE(db->StreamExists("s"));
}

TEST_F(CorrDbInternalTest, ReadPastTheEndOfAStreamNamesTheDatabase) {
    auto db = OpenDb();
    Write(*db, "short", "ab");
    Qmx_CorrStream* stream = db->OpenStream("short", 1);
    EXPECT_THAT(
        [&] { stream->ReadUINT32(); },
        ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(StrEq(InvalidFormat(DbPath()))));
}

TEST_F(CorrDbInternalTest, CallersTemporaryDirectoryIsUsedAndKept) {
    const std::string dir = m_dir / "mine";
    {
        Qmx_CorrDb_Internal db(DbPath(), dir);
        EXPECT_EQ(db.GetTempDir(), dir + "/");
        Write(db, "kept", "k");
    }
    EXPECT_EQ(ReadFileBytes(dir + "/kept"), "k");
    EXPECT_THROW(Qmx_CorrDb_Internal(m_dir / "x.cpd", m_dir / "no/such/dir"),
                 Qmx_CorrException::CannotWriteDatabase);
}

TEST_F(CorrDbInternalTest, TracesTellWhatOpeningAndCommittingDo) {
    std::ostringstream log;
    Qmx_CorrDbg::s_Tracer->SetOutput(log);
    Qmx_CorrDbg::s_Tracer->SetTraceLevel("ARCHIVE", 10);
    std::string tempDir;
    {
        auto db = OpenDb();
        tempDir = db->GetTempDir();
        Write(*db, "a", "xy");
        db->Commit();
    }
    { auto db = OpenDb(); }
    Qmx_CorrDbg::s_Tracer->RemoveTrace("ARCHIVE");
    Qmx_CorrDbg::s_Tracer->SetOutput(std::clog);
    std::vector<std::string> messages;
    std::istringstream lines(log.str());
    for (std::string line; std::getline(lines, line);) {
        EXPECT_EQ(line.rfind("QMX_CORR_TRACE:ARCHIVE:", 0), 0u) << line;
        EXPECT_NE(line.find(":s/Qmx_CorrDb_Internal("), std::string::npos) << line;
        messages.push_back(line.substr(line.find("): ") + 3));
    }
    const std::string db = DbPath();
    ASSERT_GE(messages.size(), 8u);
    EXPECT_EQ(messages[0], "Creating '" + db + "' as a new empty archive.");
    EXPECT_EQ(messages[1],
              "Using directory " + tempDir + " as temporary storage for database " + db);
    EXPECT_EQ(messages[2], "Database: " + db + " contains 0 data streams.");
    EXPECT_EQ(messages[3], "Saving 1 streams in database '" + db + "'");
    EXPECT_EQ(messages[4], "Saving stream 'a' (length 2) to database.");
    EXPECT_EQ(messages[6], "Database: " + db + " contains 1 data streams.");
    EXPECT_EQ(messages[7], "Extracting stream 'a' (length 2) from archive");
}

TEST_F(CorrDbInternalTest, DumpShowsClassAndName) {
    auto db = OpenDb();
    std::ostringstream out;
    db->DbgDump(out, 1);
    EXPECT_EQ(out.str(), "   Qmx_CorrDb_Internal: '" + DbPath() + "'\n   {\n   }\n");
    EXPECT_TRUE(db->DbgValidateState());
}

// A commit that fails at any file operation leaves the last committed file byte for byte and
// no temporary file; a failure after the rename may leave the new one, never a mixture.
TEST_F(CorrDbInternalTest, FailedCommitAtEveryOperationKeepsTheLastCommittedFile) {
    auto db = OpenDb();
    Write(*db, "a", std::string(100000, 'a'));
    db->Commit();
    const std::string before = ReadFileBytes(DbPath());
    Write(*db, "a", std::string(150000, 'b'));
    Write(*db, "c", "new");
    Vesk::FaultInjector::Arm(0);
    db->Commit();
    const std::string after = ReadFileBytes(DbPath());
    const unsigned operations = Vesk::FaultInjector::Count();
    ASSERT_GE(operations, 6u);
    WriteFileBytes(DbPath(), before);

    for (unsigned n = 1; n <= operations; ++n) {
        Vesk::FaultInjector::Arm(n);
        EXPECT_THROW(db->Commit(), Qmx_CorrException::Base) << "operation " << n;
        Vesk::FaultInjector::Disarm();
        const std::string now = ReadFileBytes(DbPath());
        EXPECT_TRUE(now == before || now == after) << "operation " << n;
        EXPECT_FALSE(Vesk::File::exist(DbPath() + ".commit-tmp")) << "operation " << n;
        WriteFileBytes(DbPath(), before);
    }
    db->Commit();
    EXPECT_EQ(ReadFileBytes(DbPath()), after);
}

// A portable stream writes its compressed bytes when it is closed; a failure there must not
// let the next commit pack the cut-off stream.
TEST_F(CorrDbInternalTest, PortableStreamThatFailedToCloseStopsTheCommit) {
    auto db = OpenDb();
    Write(*db, "names", "first", 14);
    db->Commit();
    const std::string before = ReadFileBytes(DbPath());
    Qmx_CorrStream* stream = db->OpenStream("names", 14);
    stream->WriteString("second, never whole");
    Vesk::FaultInjector::Arm(1);
    db->CloseStream(stream);
    Vesk::FaultInjector::Disarm();
    EXPECT_THAT([&] { db->Commit(); },
                ThrowsMessage<Qmx_CorrException::CannotWriteDatabase>(
                    StrEq("Qmx_CorrException::CannotWriteDatabase. Unable to write '" +
                          db->GetTempDir() + "names'.\n")));
    EXPECT_EQ(ReadFileBytes(DbPath()), before);
    Write(*db, "names", "third", 14);
    db->Commit();
    EXPECT_EQ(Read(*OpenDb(), "names", 9), "third");
}

TEST_F(CorrDbInternalTest, StreamOverFourGigabytesIsRefusedAndNothingChanges) {
    auto db = OpenDb();
    Write(*db, "a", "a");
    db->Commit();
    const std::string before = ReadFileBytes(DbPath());
    // A sparse file: no disk space is used.
    ASSERT_TRUE(Vesk::File::resize_f(db->GetTempDir() + "huge", 4294967296LL));
    try {
        db->Commit();
        FAIL() << "commit of a stream of 4 GiB accepted";
    } catch (const Qmx_CorrException::Base&) {
        FAIL() << "the size limit is a plain platform exception";
    } catch (const Vesk::Exception& e) {
        EXPECT_STREQ(e.what(),
                     "The correlation data has grown to be larger than 4GB. Qmx is unable to "
                     "store that much data.");
        EXPECT_EQ(e.getComponent(), "Quillmark");
    }
    EXPECT_EQ(ReadFileBytes(DbPath()), before);
    EXPECT_FALSE(Vesk::File::exist(DbPath() + ".commit-tmp"));
}

TEST_F(CorrDbInternalTest, BadMagicIsRefusedWithoutUnpackingAnything) {
    std::string bytes = PlainCpd({{"a", "x"}});
    bytes[10] = 'X';
    EXPECT_EQ(OpenOutcome(bytes), InvalidFormat(DbPath()));
    EXPECT_EQ(OpenOutcome("not a database at all"), InvalidFormat(DbPath()));
    EXPECT_EQ(ReadFileBytes(DbPath()), "not a database at all");
    EXPECT_TRUE(NothingLeftBehind());
}

// Directory entries are data, never paths: nothing may appear outside the temporary
// directory, and no file is made before the whole directory is checked.
TEST_F(CorrDbInternalTest, HostileDirectoryEntriesAreRefusedBeforeAnyFileIsMade) {
    const std::vector<Streams> hostile = {
        {{"../x", "escape"}},
        {{"ok", "1"}, {"/x", "abs"}},
        {{"", "empty"}},
        {{".", "dot"}},
        {{"..", "dotdot"}},
        {{"a\\x", "back"}},
        {{std::string("a\0x", 3), "zero"}},
        {{"dup", "1"}, {"dup", "2"}},
    };
    for (const Streams& streams : hostile) {
        EXPECT_EQ(OpenOutcome(PlainCpd(streams)), InvalidFormat(DbPath())) << streams[0].first;
        EXPECT_FALSE(Vesk::File::exist(m_dir / "x"));
        EXPECT_FALSE(Vesk::File::exist(m_dir / "tmp/x"));
        EXPECT_TRUE(NothingLeftBehind());
    }
}

TEST_F(CorrDbInternalTest, CountsAndLengthsThatDisagreeWithTheFileAreRefused) {
    const std::string good = PlainCpd({{"a", "xyz"}});
    const std::string absurdCount = Le32(16) + "OBRENT CPD V1.0\n" + Le32(0xFFFFFFFFu);
    const std::string longName = Le32(16) + "OBRENT CPD V1.0\n" + Le32(1) + Le32(0x7FFFFFFFu);
    std::string tooShort = good.substr(0, good.size() - 1);
    std::string tooLong = good + "!";
    std::string lengthTooBig = good;
    lengthTooBig[29] = 4;  // length of "a" claims 4 bytes
    for (const std::string& bytes : {absurdCount, longName, tooShort, tooLong, lengthTooBig}) {
        EXPECT_EQ(OpenOutcome(bytes), InvalidFormat(DbPath()));
        EXPECT_TRUE(NothingLeftBehind());
    }
    EXPECT_EQ(OpenOutcome(good), "");
}

TEST_F(CorrDbInternalTest, CutAtEveryLengthIsRefusedAndFileIsLeftAsItWas) {
    {
        auto db = OpenDb();
        Write(*db, "a", "first stream");
        Write(*db, "b", "second");
        db->Commit();
    }
    const std::string file = ReadFileBytes(DbPath());
    for (std::size_t length = 1; length < file.size(); ++length) {
        const std::string cut = file.substr(0, length);
        EXPECT_EQ(OpenOutcome(cut), InvalidFormat(DbPath())) << "cut at " << length;
        EXPECT_EQ(ReadFileBytes(DbPath()), cut);
    }
    EXPECT_TRUE(NothingLeftBehind());
}

// Without a checksum a flipped body byte cannot be noticed, but it may change no more than
// that byte: never a crash, never a stream made of other bytes.
TEST_F(CorrDbInternalTest, FlippedByteIsRefusedOrChangesOnlyThatByte) {
    const Streams original = {{"alpha", "0123456789"}, {"beta", "abc"}};
    {
        auto db = OpenDb();
        for (const auto& s : original) Write(*db, s.first, s.second);
        db->Commit();
    }
    const std::string file = ReadFileBytes(DbPath());
    const std::string plain = PlainCpd(original);
    for (std::size_t i = 0; i < file.size(); ++i) {
        std::string flipped = file;
        flipped[i] ^= 0x01;
        WriteFileBytes(DbPath(), flipped);
        std::unique_ptr<Qmx_CorrDb_Internal> db;
        try {
            db = OpenDb();
        } catch (const Qmx_CorrException::InvalidDatabaseFormat& e) {
            EXPECT_EQ(std::string(e.what()), InvalidFormat(DbPath()));
            continue;
        }
        Streams back;
        for (const Str& name : Vesk::File::listdir(db->GetTempDir())) {
            back.emplace_back(name, ReadFileBytes(db->GetTempDir() + name));
        }
        const std::string reread = PlainCpd(back);
        ASSERT_EQ(reread.size(), plain.size()) << "flip at " << i;
        std::size_t differences = 0;
        for (std::size_t k = 0; k < plain.size(); ++k) differences += reread[k] != plain[k];
        EXPECT_LE(differences, 1u) << "flip at " << i;
    }
}

}  // namespace
