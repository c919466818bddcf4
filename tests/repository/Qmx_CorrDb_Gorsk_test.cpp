// The repository-backed database over the real repository component, as a host uses it;
// SQLite is used directly only to look at and to damage the repository file.
#include "Qmx_CorrDb_Gorsk.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sqlite3.h>
#include <sys/wait.h>
#include <unistd.h>

#include <memory>
#include <sstream>
#include <string>

#include "Qmx_CorrException.h"
#include "Qmx_CorrStream.h"
#include "TempDir.h"

namespace {

using Qmx_CorrException::CannotReadDatabase;
using Qmx_CorrException::InvalidDatabaseFormat;
using Qmx_CorrException::InvalidRequest;
using ::testing::StrEq;
using ::testing::ThrowsMessage;

class CorrDbGorsk : public ::testing::Test {
protected:
    std::unique_ptr<Qmx_CorrDb_Gorsk> OpenDb(const std::string& storage = "corr") {
        return std::make_unique<Qmx_CorrDb_Gorsk>(m_repository, storage);
    }

    // Replaces the stream by `bytes`, through the database.
    void Write(const std::string& storage, const std::string& stream, const std::string& bytes,
               int mode = 6) {
        auto db = OpenDb(storage);
        Qmx_CorrStream* s = db->OpenStream(stream, mode);
        ASSERT_NE(s, nullptr);
        s->write(bytes.data(), static_cast<unsigned int>(bytes.size()));
        db->CloseStream(s);
    }

    // The whole stream, through the database.
    std::string Read(const std::string& storage, const std::string& stream) {
        auto db = OpenDb(storage);
        Qmx_CorrStream* s = db->OpenStream(stream, 1);
        if (!s) return "<missing>";
        std::string bytes(static_cast<std::size_t>(s->BytesLeft()), '\0');
        s->read(&bytes[0], static_cast<unsigned int>(bytes.size()));
        return bytes;
    }

    // Runs `sql` on the repository file with `blob` bound to ?1 (when given); the first
    // column of the first row, or "<none>".
    std::string Sql(const std::string& sql, const std::string* blob = nullptr) {
        sqlite3* db = nullptr;
        EXPECT_EQ(sqlite3_open(m_repository.c_str(), &db), SQLITE_OK);
        sqlite3_stmt* statement = nullptr;
        EXPECT_EQ(sqlite3_prepare_v2(db, sql.c_str(), -1, &statement, nullptr), SQLITE_OK)
            << sqlite3_errmsg(db);
        if (blob) sqlite3_bind_blob(statement, 1, blob->data(), int(blob->size()), nullptr);
        std::string result = "<none>";
        const int code = sqlite3_step(statement);
        if (code == SQLITE_ROW) {
            const char* bytes = static_cast<const char*>(sqlite3_column_blob(statement, 0));
            result.assign(bytes ? bytes : "", size_t(sqlite3_column_bytes(statement, 0)));
        } else {
            EXPECT_EQ(code, SQLITE_DONE) << sqlite3_errmsg(db);
        }
        sqlite3_finalize(statement);
        sqlite3_close(db);
        return result;
    }

    std::string Stored(const std::string& stream) {
        return Sql("SELECT data FROM gorsk_stream WHERE name = CAST('" + stream + "' AS BLOB)");
    }

    std::string Text(const char* cls, const std::string& detail) {
        return std::string("Qmx_CorrException::") + cls + detail;
    }
    std::string Unreadable() {
        return Text("CannotReadDatabase", ". Unable to read '" + m_repository + "'.\n");
    }
    std::string Damaged() {
        return Text("InvalidDatabaseFormat", ". Unable to read '" + m_repository + "'.\n");
    }

    TempDir m_dir;
    std::string m_repository = m_dir / "projects.repo";
};

TEST_F(CorrDbGorsk, EveryPrimitiveRoundTripsInTwoStoragesOfOneRepository) {
    const std::string zeroed("a\0b", 3);
    for (const char* storage : {"alpha", "beta"}) {
        auto db = OpenDb(storage);
        Qmx_CorrStream* s = db->OpenStream("prims", 14);
        ASSERT_NE(s, nullptr);
        s->WriteString(storage);
        s->WriteString("");
        s->WriteString(zeroed);
        s->WriteBool(true);
        s->WriteBool(false);
        s->WriteUINT8(0xFE);
        s->WriteUINT32(0xA1B2C3D4u);
        s->write("\0\xFFz", 3);
        db->CloseStream(s);
    }
    for (const char* storage : {"beta", "alpha"}) {
        auto db = OpenDb(storage);
        Qmx_CorrStream* s = db->OpenStream("prims", 9);
        ASSERT_NE(s, nullptr);
        EXPECT_EQ(s->ReadString(), storage);
        EXPECT_EQ(s->ReadString(), "");
        EXPECT_EQ(s->ReadString(), zeroed);
        EXPECT_TRUE(s->ReadBool());
        EXPECT_FALSE(s->ReadBool());
        EXPECT_EQ(s->ReadUINT8(), 0xFE);
        EXPECT_EQ(s->ReadUINT32(), 0xA1B2C3D4u);
        char raw[3] = {};
        s->read(raw, 3);
        EXPECT_EQ(std::string(raw, 3), std::string("\0\xFFz", 3));
        EXPECT_EQ(s->BytesLeft(), 0);
        EXPECT_THAT([&] { s->ReadUINT8(); },
                    ThrowsMessage<InvalidDatabaseFormat>(StrEq(Damaged())));
    }
    EXPECT_EQ(Sql("SELECT count(*) FROM gorsk_storage"), "2");
}

TEST_F(CorrDbGorsk, StreamBytesUseTheEncodingsOfTheWholeSystem) {
    {
        auto db = OpenDb();
        Qmx_CorrStream* s = db->OpenStream("info", 6);
        s->WriteUINT32(258);
        s->WriteString("abc");
        s->WriteString("");
        s->WriteBool(true);
        s->WriteUINT8(2);
        db->CloseStream(s);
    }
    EXPECT_EQ(Stored("info"), std::string("\x02\x01\0\0\x03\0\0\0abc\0\0\0\0\x01\x02", 17));
    // Any non-zero byte reads back as true.
    auto db = OpenDb();
    Qmx_CorrStream* s = db->OpenStream("info", 1);
    s->read(nullptr, 0);
    EXPECT_EQ(s->ReadUINT32(), 258u);
    EXPECT_EQ(s->ReadString(), "abc");
    EXPECT_EQ(s->ReadString(), "");
    EXPECT_TRUE(s->ReadBool());
    EXPECT_TRUE(s->ReadBool());
}

TEST_F(CorrDbGorsk, OpenModesSelectReadingWritingAndTruncation) {
    Write("corr", "s", "0123456789");
    Write("corr", "s", "XY", 10);  // write without truncation overwrites from the start
    EXPECT_EQ(Read("corr", "s"), "XY23456789");
    Write("corr", "s", "ab", 14);  // portable, write, truncate: access 18
    EXPECT_EQ(Read("corr", "s"), "ab");

    auto db = OpenDb();
    Qmx_CorrStream* both = db->OpenStream("s", 11);  // read and write share one position
    EXPECT_EQ(both->ReadUINT8(), 'a');
    both->WriteUINT8('Z');
    db->CloseStream(both);
    EXPECT_EQ(Read("corr", "s"), "aZ");

    Qmx_CorrStream* writeOnly = db->OpenStream("s", 14);
    EXPECT_THAT([&] { writeOnly->ReadUINT8(); },
                ThrowsMessage<InvalidRequest>(StrEq(
                    Text("InvalidRequest", ".  'ReadUINT8 refused by the repository stream'\n"))));
    Qmx_CorrStream* readOnly = db->OpenStream("s", 9);
    EXPECT_THAT([&] { readOnly->WriteString("x"); },
                ThrowsMessage<InvalidRequest>(StrEq(Text(
                    "InvalidRequest", ".  'WriteString refused by the repository stream'\n"))));
    EXPECT_EQ(db->OpenStream("s", 8), nullptr);  // neither read nor write
    EXPECT_EQ(db->OpenStream("", 6), nullptr);   // a stream needs a name
}

TEST_F(CorrDbGorsk, PositioningIsRefusedAndLeavesTheStreamUsable) {
    Write("corr", "pool", std::string("\x07\0\0\0\x09\0\0\0", 8));
    auto db = OpenDb();
    Qmx_CorrStream* s = db->OpenStream("pool", 3);
    ASSERT_NE(s, nullptr);
    EXPECT_EQ(s->ReadUINT32(), 7u);
    const std::pair<const char*, std::function<void()>> refused[] = {
        {"SeekPos", [&] { s->SeekPos(0); }},
        {"SeekEnd", [&] { s->SeekEnd(); }},
        {"GetPos", [&] { s->GetPos(); }},
    };
    for (const auto& [request, call] : refused) {
        try {
            call();
            ADD_FAILURE() << request << " did not throw";
        } catch (const InvalidRequest& e) {
            EXPECT_EQ(e.what(), Text("InvalidRequest", std::string(".  '") + request +
                                                           " is not supported by a repository "
                                                           "stream'\n"));
            EXPECT_EQ(e.getSourceFile(), "s/Qmx_CorrStream_Gorsk");
        }
    }
    EXPECT_EQ(s->ReadUINT32(), 9u);
}

TEST_F(CorrDbGorsk, DatabaseOperationsLeaveTheStreamsToTheRepository) {
    Write("corr", "info", "kept");
    auto db = OpenDb();
    EXPECT_FALSE(db->StreamExists("info"));
    db->DeleteStream("info");
    db->SetStreamSize("info", 1);
    db->Commit();
    EXPECT_EQ(Read("corr", "info"), "kept");
    EXPECT_EQ(Read("corr", "missing"), "<missing>");
    EXPECT_EQ(db->OpenStream("missing", 9), nullptr);
    EXPECT_EQ(db->GetName(), m_repository);
    EXPECT_TRUE(db->DbgValidateState());

    std::ostringstream dump;
    db->DbgDump(dump, 1);
    EXPECT_EQ(dump.str(), "   Qmx_CorrDb_Gorsk: '" + m_repository + "'\n   {\n   }\n");

    // A stream of another database is not this one's to close.
    auto other = OpenDb();
    Qmx_CorrStream* foreign = other->OpenStream("info", 1);
    db->CloseStream(foreign);
    EXPECT_EQ(foreign->ReadUINT8(), 'k');
}

TEST_F(CorrDbGorsk, StreamBecomesVisibleWholeWhenClosed) {
    Write("corr", "info", "old");
    auto writer = OpenDb();
    Qmx_CorrStream* s = writer->OpenStream("info", 6);
    s->write("new content", 11);
    s->Flush();
    EXPECT_EQ(Read("corr", "info"), "old");
    writer->CloseStream(s);
    EXPECT_EQ(Read("corr", "info"), "new content");

    // A stream still open when the database goes is stored by its destruction.
    writer->OpenStream("late", 6)->WriteUINT8('!');
    writer.reset();
    EXPECT_EQ(Read("corr", "late"), "!");
}

TEST_F(CorrDbGorsk, ProcessKilledWhileWritingLeavesThePreviousContent) {
    Write("corr", "done", "old done");
    Write("corr", "busy", "old busy");
    const pid_t child = ::fork();
    ASSERT_NE(child, -1);
    if (child == 0) {
        Qmx_CorrDb_Gorsk db(m_repository, "corr");
        Qmx_CorrStream* done = db.OpenStream("done", 6);
        done->WriteString("new done");
        db.CloseStream(done);
        Qmx_CorrStream* busy = db.OpenStream("busy", 6);
        busy->WriteString("half of a new");
        ::raise(SIGKILL);
        ::_exit(3);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    ASSERT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL) << status;
    EXPECT_EQ(Read("corr", "busy"), "old busy");
    EXPECT_EQ(Read("corr", "done"), std::string("\x08\0\0\0new done", 12));
}

TEST_F(CorrDbGorsk, ReadsPastTheEndAreRefusedBeforeTakingAnything) {
    Write("corr", "short", "abc");
    auto db = OpenDb();
    Qmx_CorrStream* s = db->OpenStream("short", 1);
    char raw[4] = {'-', '-', '-', '-'};
    EXPECT_THAT([&] { s->read(raw, 4); }, ThrowsMessage<InvalidDatabaseFormat>(StrEq(Damaged())));
    EXPECT_THAT([&] { s->ReadUINT32(); }, ThrowsMessage<InvalidDatabaseFormat>(StrEq(Damaged())));
    EXPECT_EQ(std::string(raw, 4), "----");
    s->read(raw, 3);
    EXPECT_EQ(std::string(raw, 3), "abc");

    // A damaged string length must not become a huge allocation or short data.
    const std::string damaged(
        "\xF0\xFF\xFF\xFF"
        "abc",
        7);
    Sql("UPDATE gorsk_stream SET data = ?1 WHERE name = CAST('short' AS BLOB)", &damaged);
    Qmx_CorrStream* again = db->OpenStream("short", 1);
    EXPECT_THAT([&] { again->ReadString(); },
                ThrowsMessage<InvalidDatabaseFormat>(StrEq(Damaged())));
    EXPECT_EQ(again->ReadUINT32(), 0xFFFFFFF0u);
}

TEST_F(CorrDbGorsk, RepositoryThatCannotBeOpenedIsRefusedAndLeftAsItWas) {
    struct Case {
        const char* what;
        std::function<void()> arrange;
        std::string storage;
    };
    const Case cases[] = {
        {"not a database", [&] { WriteFileBytes(m_repository, std::string(4096, 'x')); }, "corr"},
        {"another program's database", [&] { Sql("CREATE TABLE notes(text)"); }, "corr"},
        {"a newer format",
         [&] {
             Write("corr", "info", "1");
             Sql("PRAGMA user_version = 2");
         },
         "corr"},
        {"an empty storage name", [&] { Write("corr", "info", "1"); }, ""},
    };
    for (const Case& c : cases) {
        Vesk::File::remove_f(m_repository);
        c.arrange();
        const std::string before = ReadFileBytes(m_repository);
        EXPECT_THAT([&] { OpenDb(c.storage); },
                    ThrowsMessage<CannotReadDatabase>(StrEq(Unreadable())))
            << c.what;
        EXPECT_TRUE(ReadFileBytes(m_repository) == before) << c.what;
    }
    m_repository = m_dir / "missing/projects.repo";
    EXPECT_THAT([&] { OpenDb(); }, ThrowsMessage<CannotReadDatabase>(StrEq(Unreadable())));
}

}  // namespace
