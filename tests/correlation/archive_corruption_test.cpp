// Damaged databases. A real committed database is unpacked into its streams, one stream is
// damaged, the file is packed again and opened. The only outcomes allowed are a database that
// can be walked whole or a refusal that names the database; the file keeps its bytes and no
// temporary directory stays behind.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <iostream>
#include <map>
#include <memory>
#include <random>
#include <set>
#include <sstream>
#include <string>
#include <typeinfo>
#include <utility>
#include <vector>

#include "Qmx_CorrDataMgr.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrMgr.h"
#include "TempDir.h"
#include "Vesk_File.h"
#include "Vesk_IOException.h"
#include "Vesk_Stream.h"

namespace {

using Streams = std::vector<std::pair<std::string, std::string>>;  // name, bytes, file order

const auto kReadOnly = Qmx_CorrMgr::DB_READ_ONLY;
const auto kReadWrite = Qmx_CorrMgr::DB_READ_WRITE;

std::uint32_t Get32(const std::string& bytes, std::size_t at) {
    std::uint32_t value = 0;
    for (int i = 3; i >= 0; --i)
        value = (value << 8) | static_cast<unsigned char>(bytes.at(at + i));
    return value;
}

void Put32(std::string& bytes, std::size_t at, std::uint32_t value) {
    for (int i = 0; i < 4; ++i) bytes.at(at + i) = static_cast<char>((value >> (8 * i)) & 0xFF);
}

std::string Le32(std::uint32_t value) {
    std::string bytes(4, '\0');
    Put32(bytes, 0, value);
    return bytes;
}

// Reads the primitives of the CPD file and of internal streams, front to back.
class Cursor {
public:
    explicit Cursor(const std::string& bytes) : m_bytes(bytes) {}
    std::uint32_t U32() {
        const std::uint32_t value = Get32(m_bytes, m_pos);
        m_pos += 4;
        return value;
    }
    std::string Bytes(std::size_t count) {
        const std::string bytes = m_bytes.substr(m_pos, count);
        if (bytes.size() != count) throw std::out_of_range("short");
        m_pos += count;
        return bytes;
    }
    std::string String() { return Bytes(U32()); }
    std::size_t Pos() const { return m_pos; }
    bool AtEnd() const { return m_pos == m_bytes.size(); }

private:
    const std::string& m_bytes;
    std::size_t m_pos = 0;
};

Streams Unpack(const std::string& file) {
    Cursor in(file);
    if (in.String() != "OBRENT CPD V1.0\n") throw std::runtime_error("not a CPD file");
    std::vector<std::pair<std::string, std::uint32_t>> directory(in.U32());
    for (auto& entry : directory) {
        entry.first = in.String();
        entry.second = in.U32();
    }
    Streams streams;
    for (const auto& entry : directory) streams.emplace_back(entry.first, in.Bytes(entry.second));
    return streams;
}

std::string Pack(const Streams& streams) {
    std::string file = Le32(16) + "OBRENT CPD V1.0\n" + Le32(streams.size());
    for (const auto& s : streams) file += Le32(s.first.size()) + s.first + Le32(s.second.size());
    for (const auto& s : streams) file += s.second;
    return file;
}

std::string& StreamOf(Streams& streams, const std::string& name) {
    for (auto& s : streams)
        if (s.first == name) return s.second;
    throw std::runtime_error("no stream " + name);
}

void Remove(Streams& streams, const std::string& name) {
    streams.erase(std::find_if(streams.begin(), streams.end(),
                               [&](const auto& s) { return s.first == name; }));
}

// Portable streams are stored as one zstd frame; damage is aimed at their plain bytes, which
// the platform layer gives and takes through a scratch file.
bool IsCompressed(const std::string& stored) {
    return stored.compare(0, 4, "\x28\xB5\x2F\xFD") == 0;
}

// Throws Vesk::IOException for a damaged frame.
std::string Decompress(const std::string& stored, const std::string& scratch) {
    WriteFileBytes(scratch, stored);
    const std::unique_ptr<Vesk::Stream, bool (*)(Vesk::Stream*)> in(
        Vesk::File::open(scratch, Vesk::File::kRead, false), Vesk::File::close);
    std::string plain;
    char buffer[4096];
    while (const std::size_t got = in->readsome(buffer, sizeof buffer)) plain.append(buffer, got);
    return plain;
}

std::string Compress(const std::string& plain, const std::string& scratch) {
    Vesk::Stream* out =
        Vesk::File::open(scratch, Vesk::File::kWrite | Vesk::File::kCompressed, true);
    out->write(plain.data(), plain.size());
    Vesk::File::close(out);
    return ReadFileBytes(scratch);
}

// One record of "containers", with its object data block kept as bytes.
struct ContainerRecord {
    std::string objectData;
    std::uint32_t parent = 0;
    std::string name;  // reference count and string index
    std::string itemsStream;
    std::uint32_t id = 0;
    std::vector<std::uint32_t> children, outgoing, incoming;
};

// The object data block: a private flag, then for a private record its properties.
void SkipObjectData(Cursor& in) {
    if (in.Bytes(1)[0] == 0) return;
    for (std::uint32_t count = in.U32(); count > 0; --count) {
        in.String();
        in.U32() == 0 ? in.Bytes(4) : in.String();
    }
}

std::vector<std::uint32_t> Ordinals(Cursor& in) {
    std::vector<std::uint32_t> list(in.U32());
    for (auto& ordinal : list) ordinal = in.U32();
    return list;
}

// Keyed by container id, which the test knows from building the database.
std::map<std::uint32_t, ContainerRecord> ParseContainers(const std::string& bytes,
                                                         std::vector<std::uint32_t>& order) {
    std::map<std::uint32_t, ContainerRecord> records;
    Cursor in(bytes);
    while (!in.AtEnd()) {
        ContainerRecord r;
        const std::size_t start = in.Pos();
        SkipObjectData(in);
        r.objectData = bytes.substr(start, in.Pos() - start);
        r.parent = in.U32();
        r.name = in.Bytes(8);
        r.itemsStream = in.String();
        r.id = in.U32();
        r.children = Ordinals(in);
        r.outgoing = Ordinals(in);
        r.incoming = Ordinals(in);
        order.push_back(r.id);
        records[r.id] = r;
    }
    return records;
}

std::string FormatContainers(const std::map<std::uint32_t, ContainerRecord>& records,
                             const std::vector<std::uint32_t>& order) {
    std::string bytes;
    for (std::uint32_t id : order) {
        const ContainerRecord& r = records.at(id);
        bytes += r.objectData + Le32(r.parent) + r.name + Le32(r.itemsStream.size()) +
                 r.itemsStream + Le32(r.id);
        for (const auto* list : {&r.children, &r.outgoing, &r.incoming}) {
            bytes += Le32(list->size());
            for (std::uint32_t ordinal : *list) bytes += Le32(ordinal);
        }
    }
    return bytes;
}

std::string Invalid(const std::string& db) {
    return "Qmx_CorrException::InvalidDatabaseFormat. Unable to read '" + db + "'.\n";
}

std::string Unreadable(const std::string& db) {
    return "Qmx_CorrException::CannotReadDatabase. Unable to read '" + db + "'.\n";
}

// Everything a host can reach, as text: containers depth first with their properties, items
// with their relationships, implicit relationships with their counterparts, and the
// database's own check. A null anywhere, or a tree deeper than the database, is a failure.
class Walker {
public:
    std::string Walk(Qmx_CorrMgr& mgr) {
        Container(*mgr.GetTopContainer(), 0);
        // The check reports on the standard error stream; a damaged database says a lot.
        std::ostringstream reports;
        const std::unique_ptr<std::streambuf, void (*)(std::streambuf*)> restore(
            std::cerr.rdbuf(reports.rdbuf()), [](std::streambuf* old) { std::cerr.rdbuf(old); });
        m_out << (mgr.DbgValidateState() ? "valid" : "invalid") << "\n";
        return m_out.str();
    }

private:
    void Properties(const Qmx_CorrObject& object) {
        for (const auto& p : object.GetProperties()) {
            m_out << " " << p.first << "=";
            if (p.second.GetType() == Qmx_CorrPropertyValue::kINT32)
                m_out << p.second.GetINT32();
            else
                m_out << "'" << p.second.GetString() << "'";
        }
    }

    template <class List>
    void Names(const char* label, const List& items) {
        m_out << " " << label;
        for (const Qmx_CorrItem* item : items) {
            if (!item) throw std::logic_error("null item in a relationship");
            m_out << " " << item->GetAbsoluteName();
        }
    }

    void Container(Qmx_CorrContainer& container, int depth) {
        if (depth > 8) throw std::logic_error("container tree deeper than built");
        m_out << container.GetAbsoluteName();
        Properties(container);
        m_out << "\n";
        for (Qmx_CorrManagedItem* item : container.GetItems()) Item(*item);
        for (Qmx_CorrImplicitRelationship* rel : container.GetOutgoingRelationships())
            Implicit(*rel, container);
        for (Qmx_CorrManagedContainer* child : container.GetContainers()) {
            if (!child) throw std::logic_error("null child container");
            Container(*child, depth + 1);
        }
    }

    void Item(Qmx_CorrItem& item) {
        m_out << "  " << item.GetName();
        Properties(item);
        for (Qmx_CorrExplicitRelationship* rel : item.GetOutgoingRelationships()) {
            if (!rel) throw std::logic_error("null relationship");
            m_out << " {";
            Properties(*rel);
            Names("from", rel->GetSrcItems());
            Names("to", rel->GetDstItems());
            m_out << " }";
        }
        for (const Qmx_CorrExplicitRelationship* rel : item.GetIncomingRelationships())
            if (!rel) throw std::logic_error("null relationship");
        m_out << "\n";
    }

    void Implicit(Qmx_CorrImplicitRelationship& rel, Qmx_CorrContainer& src) {
        Qmx_CorrContainer* dst = rel.GetDstContainer();
        if (rel.GetSrcContainer() != &src || !dst) throw std::logic_error("implicit ends");
        m_out << "  => " << dst->GetAbsoluteName() << " "
              << Qmx_CorrImplicitRelationship::GetDirectionText(rel.GetDirection()) << " "
              << (rel.GetSrcExpression() ? rel.GetSrcExpression() : "-");
        Properties(rel);
        for (Qmx_CorrManagedItem* item : src.GetItems()) {
            const Qmx_CorrItem* counterpart = rel.GetDstItem(item);
            m_out << " " << item->GetName() << ":" << (counterpart ? counterpart->GetName() : "-");
        }
        m_out << "\n";
    }

    std::ostringstream m_out;
};

// What opening and walking gave: the walk when both succeeded, else the refusal's text.
struct Outcome {
    bool opened = false;
    std::string walk;
    std::string refusal;
};

using Records = std::map<std::uint32_t, ContainerRecord>;

class ArchiveCorruption : public ::testing::Test {
protected:
    void SetUp() override {
        // Each database makes its temporary directory under TMPDIR, so that the tests see
        // whether one is left behind.
        const char* old = std::getenv("TMPDIR");
        m_oldTmpdir = old ? old : "";
        Vesk::File::mkdir(m_dir / "tmp", false);
        ::setenv("TMPDIR", (m_dir / "tmp").c_str(), 1);
        Build();
        m_stored = Unpack(ReadFileBytes(Db()));
        m_good = m_stored;
        for (auto& stream : m_good) {
            if (!IsCompressed(stream.second)) continue;
            const std::string stored = stream.second;
            stream.second = Decompress(stored, m_dir / "codec");
            m_compressed[stream.first] = {stream.second, stored};
        }
        ParseContainers(StreamOf(m_good, "containers"), m_order);
        m_goodWalk = TryStored(m_stored, "as committed").walk;
        ASSERT_NE(m_goodWalk, "");
    }
    void TearDown() override {
        m_oldTmpdir.empty() ? ::unsetenv("TMPDIR") : ::setenv("TMPDIR", m_oldTmpdir.c_str(), 1);
    }

    std::string Db() const { return m_dir / "graph.cpd"; }

    // /, /src/ with a, b and c, /src/sub/ with x, /dst/ with a.out and b.out, /dst/sub/ with
    // x.out; a relationship with three destinations and one with three sources (relationship
    // overflow lists), a and b with two outgoing relationships each (item overflow lists); two
    // implicit relationships, one with a transform; properties on every kind of object.
    void Build() {
        Qmx_CorrMgr mgr(Db(), "", kReadWrite, nullptr);
        Qmx_CorrContainer* top = mgr.GetTopContainer();
        top->SetProperty_String("origin", "build", nullptr);
        Qmx_CorrContainer* src = top->CreateContainer("src");
        Qmx_CorrContainer* srcSub = src->CreateContainer("sub");
        Qmx_CorrContainer* dst = top->CreateContainer("dst");
        Qmx_CorrContainer* dstSub = dst->CreateContainer("sub");
        src->SetProperty_INT32("level", 1, nullptr);
        Qmx_CorrItem* a = src->CreateItem("a");
        Qmx_CorrItem* b = src->CreateItem("b");
        Qmx_CorrItem* c = src->CreateItem("c");
        Qmx_CorrItem* x = srcSub->CreateItem("x");
        Qmx_CorrItem* aOut = dst->CreateItem("a.out");
        Qmx_CorrItem* bOut = dst->CreateItem("b.out");
        Qmx_CorrItem* xOut = dstSub->CreateItem("x.out");
        a->SetProperty_String("kind", "input", nullptr);
        Qmx_CorrExplicitRelationship* fanOut = mgr.CreateExplicitRelationship(a, aOut);
        fanOut->AddDstItem(bOut);
        fanOut->AddDstItem(xOut);
        fanOut->SetProperty_INT32("weight", 3, nullptr);
        Qmx_CorrExplicitRelationship* fanIn = mgr.CreateExplicitRelationship(a, bOut);
        fanIn->AddSrcItem(b);
        fanIn->AddSrcItem(c);
        mgr.CreateExplicitRelationship(b, x);
        mgr.CreateExplicitRelationship(x, xOut);
        mgr.CreateImplicitRelationship(src, dst, false, Qmx_CorrImplicitRelationship::DIR_BOTH,
                                       "(.+)", "$1.out")
            ->SetProperty_String("note", "outputs", nullptr);
        mgr.CreateImplicitRelationship(srcSub, dstSub, false,
                                       Qmx_CorrImplicitRelationship::DIR_SRC_TO_DST);
        auto* data =
            static_cast<Qmx_CorrDataMgr*>(static_cast<Qmx_CorrManagedContainer*>(top)->GetOwner());
        m_handleA = data->GetItemHandle(static_cast<Qmx_CorrManagedItem*>(a));
        m_handleX = data->GetItemHandle(static_cast<Qmx_CorrManagedItem*>(x));
        m_handleFanOut = data->GetManagedExpRelMgr()->GetHandle(
            static_cast<Qmx_CorrManagedExplicitRelationship*>(fanOut));
        for (Qmx_CorrContainer* container : {top, src, srcSub, dst, dstSub})
            m_ids.push_back(static_cast<Qmx_CorrManagedContainer*>(container)->GetContainerId());
        mgr.Commit();
    }

    // Opens the file and walks it. A refused open must leave the file as it was and no
    // temporary directory; a read-only one never writes.
    Outcome OpenAndWalk(Qmx_CorrMgr::DB_MODE mode) {
        const std::string installed = ReadFileBytes(Db());
        Outcome outcome;
        try {
            Qmx_CorrMgr mgr(Db(), "", mode, nullptr);
            outcome.opened = true;
            outcome.walk = Walker().Walk(mgr);
            // A writable database that opened must also write back what it read.
            if (mode == kReadWrite) {
                mgr.FlushAll();
                mgr.GetTopContainer()->SetProperty_INT32("reopened", 1, nullptr);
                mgr.CreateExplicitRelationship(nullptr,
                                               mgr.GetTopContainer()->FindOrCreateItem("new"));
                mgr.Commit();
            }
        } catch (const Qmx_CorrException::InvalidDatabaseFormat& e) {
            outcome.refusal = e.what();
        } catch (const Qmx_CorrException::CannotReadDatabase& e) {
            outcome.refusal = e.what();
        } catch (const std::exception& e) {
            ADD_FAILURE() << m_case << ": " << typeid(e).name() << ": " << e.what();
        }
        EXPECT_TRUE(Vesk::File::listdir(m_dir / "tmp").empty()) << m_case;
        if (!outcome.opened || mode == kReadOnly) {
            EXPECT_TRUE(ReadFileBytes(Db()) == installed) << m_case << ": the file changed";
        }
        if (!outcome.refusal.empty()) {
            EXPECT_THAT(outcome.refusal, ::testing::AnyOf(Invalid(Db()), Unreadable(Db())))
                << m_case;
        }
        return outcome;
    }

    Outcome TryStored(const Streams& stored, const std::string& label,
                      Qmx_CorrMgr::DB_MODE mode = kReadOnly) {
        m_case = label;
        WriteFileBytes(Db(), Pack(stored));
        return OpenAndWalk(mode);
    }

    // `plain` stored as the database stores it: portable streams compressed again.
    Outcome Try(Streams plain, const std::string& label, Qmx_CorrMgr::DB_MODE mode = kReadOnly) {
        for (auto& stream : plain) {
            const auto found = m_compressed.find(stream.first);
            if (found == m_compressed.end()) continue;
            stream.second = stream.second == found->second.first
                                ? found->second.second
                                : Compress(stream.second, m_dir / "codec");
        }
        return TryStored(plain, label, mode);
    }

    // Where a damaged 32-bit value shows: in the header (InvalidDatabaseFormat at opening),
    // in a record read at opening (CannotReadDatabase), in a pool that loads when used
    // (InvalidDatabaseFormat while walking), or in the objects left out (the walk differs and
    // the database's check fails; or refused while walking).
    enum Shows { kHeader, kRecords, kOnUse, kLeftOut };
    struct Field {
        std::string label;
        const char* stream;
        std::size_t offset;
        std::uint32_t value;
        Shows shows;
    };

    // Refusals at opening are expected in both modes.
    void ExpectShows(const Streams& plain, const std::string& label, Shows shows) {
        if (shows == kHeader || shows == kRecords) {
            for (auto mode : {kReadOnly, kReadWrite}) {
                const Outcome outcome = Try(plain, label, mode);
                EXPECT_FALSE(outcome.opened) << label;
                EXPECT_EQ(outcome.refusal, shows == kHeader ? Invalid(Db()) : Unreadable(Db()))
                    << label;
            }
            return;
        }
        const Outcome outcome = Try(plain, label);
        EXPECT_TRUE(outcome.opened) << label;
        if (shows == kLeftOut && outcome.refusal.empty()) {
            EXPECT_NE(outcome.walk, m_goodWalk) << label;
            EXPECT_THAT(outcome.walk, ::testing::EndsWith("\ninvalid\n")) << label;
        } else {
            EXPECT_EQ(outcome.refusal, Invalid(Db())) << label;
        }
    }
    void ExpectShows(const Field& f) {
        ExpectShows(With(f.stream, f.offset, f.value), f.label, f.shows);
    }

    Streams With(const std::string& name, std::size_t offset, std::uint32_t value) const {
        Streams plain = m_good;
        Put32(StreamOf(plain, name), offset, value);
        return plain;
    }

    // "containers" parsed, changed by `change` and written back in the same order.
    Streams WithContainers(const std::function<void(Records&)>& change) const {
        Streams plain = m_good;
        std::vector<std::uint32_t> order;
        Records records = ParseContainers(StreamOf(plain, "containers"), order);
        change(records);
        StreamOf(plain, "containers") = FormatContainers(records, order);
        return plain;
    }

    // The table ordinal of the container with `id`: the position of its record, from 1.
    std::uint32_t Ordinal(std::uint32_t id) const {
        return static_cast<std::uint32_t>(std::find(m_order.begin(), m_order.end(), id) -
                                          m_order.begin() + 1);
    }

    // Offset in its pool stream of the record of `handle` (records of 28 bytes, 128 a pool).
    static std::size_t RecordOffset(std::uint32_t handle) {
        return 12 + (handle / 128 - 1) * (28 * 128 + 20) + 20 + (handle % 128) * 28;
    }

    TempDir m_dir;
    std::string m_oldTmpdir;
    Streams m_stored;  // as committed
    Streams m_good;    // the same with portable streams decompressed
    // The portable streams by name: plain and stored bytes.
    std::map<std::string, std::pair<std::string, std::string>> m_compressed;
    std::string m_goodWalk;
    std::string m_case;
    std::uint32_t m_handleA = 0, m_handleX = 0, m_handleFanOut = 0;
    std::vector<std::uint32_t> m_ids;    // of /, /src/, /src/sub/, /dst/, /dst/sub/
    std::vector<std::uint32_t> m_order;  // container ids in record order
};

// Offsets in "info": identifier (4 + 16 bytes), format version, N, M, the five record
// versions, top ordinal, next container id.
constexpr std::size_t kVersion = 20, kTableN = 24, kTableM = 28, kRecordVersions = 32, kTop = 52;

TEST_F(ArchiveCorruption, UnpackedAndPackedAgainTheDatabaseReadsTheSame) {
    EXPECT_EQ(Pack(m_stored), ReadFileBytes(Db()));
    EXPECT_EQ(Try(m_good, "recompressed").walk, m_goodWalk);
    EXPECT_THAT(m_goodWalk, ::testing::HasSubstr("a kind='input' { weight=3 from /src/a to "
                                                 "/dst/a.out /dst/b.out /dst/sub/x.out }"));
    EXPECT_THAT(m_goodWalk, ::testing::HasSubstr("=> /dst/ SRC <-> DST (.+) note='outputs' "
                                                 "a:a.out b:b.out c:-"));
    EXPECT_THAT(m_goodWalk, ::testing::EndsWith("\nvalid\n"));
}

// Table sizes the streams cannot hold fail before any table is allocated (the sanitizer build
// aborts on a huge allocation); one record more or fewer than the stream holds, too. The
// record versions are checked by the readers: containers and implicit relationships at
// opening, items and explicit relationships when their pools load.
TEST_F(ArchiveCorruption, InfoThatDisagreesWithTheStreamsIsRefused) {
    ASSERT_EQ(Get32(StreamOf(m_good, "info"), kTableN), 6u);
    ASSERT_EQ(Get32(StreamOf(m_good, "info"), kTableM), 3u);
    std::vector<Field> fields = {{"identifier", "info", 4, 0x78787878, kHeader},
                                 {"version 0", "info", kVersion, 0, kHeader},
                                 {"version 2", "info", kVersion, 2, kHeader},
                                 {"N huge", "info", kTableN, 0xFFFFFFFF, kHeader},
                                 {"N large", "info", kTableN, 0x40000000, kHeader},
                                 {"N 0", "info", kTableN, 0, kHeader},
                                 {"N 1", "info", kTableN, 1, kHeader},
                                 {"M huge", "info", kTableM, 0xFFFFFFFF, kHeader},
                                 {"M large", "info", kTableM, 0x40000000, kHeader},
                                 {"M 0", "info", kTableM, 0, kHeader},
                                 {"N + 1", "info", kTableN, 7, kRecords},
                                 {"M + 1", "info", kTableM, 4, kRecords},
                                 {"M - 1", "info", kTableM, 2, kRecords},
                                 {"top 0", "info", kTop, 0, kHeader},
                                 {"top N", "info", kTop, 6, kHeader},
                                 {"top huge", "info", kTop, 0xFFFFFFFF, kHeader},
                                 {"top /src/", "info", kTop, Ordinal(m_ids[1]), kRecords}};
    const char* kinds[] = {"container", "item", "explicit", "implicit", "object data"};
    const std::uint32_t needed[] = {1, 2, 1, 1, 1};
    for (unsigned kind = 0; kind < 5; ++kind) {
        for (std::uint32_t wrong : {0u, needed[kind] + 1})
            fields.push_back({std::string(kinds[kind]) + " version " + std::to_string(wrong),
                              "info", kRecordVersions + 4 * kind, wrong,
                              kind == 1 || kind == 2 ? kOnUse : kRecords});
    }
    for (const Field& f : fields) ExpectShows(f);
    // One container fewer: refused by whichever record first names the last one.
    EXPECT_FALSE(Try(With("info", kTableN, 5), "N - 1").opened);
}

// Without the string table every name would read as empty; without a pool stream its
// free-pool stream lists pools that are not there; without an overflow stream the lists that
// records count are missing.
TEST_F(ArchiveCorruption, MissingStreamsAreRefusedOrLeaveTheirObjectsOut) {
    const std::string itemPools = "Qmx_CorrManagedItemMgr", relPools = "Qmx_CorrManagedExpRelMgr";
    const std::pair<std::vector<std::string>, Shows> cases[] = {
        {{"containers"}, kRecords},
        {{"irels"}, kRecords},
        {{"Container_Items_2"}, kRecords},
        {{"Qmx_CorrNameRepo_Basic"}, kRecords},
        {{"item_rel_overflow"}, kOnUse},
        {{itemPools}, kHeader},
        {{relPools}, kHeader},
        {{itemPools, itemPools + "_Data"}, kOnUse},
        {{relPools, relPools + "_Data"}, kLeftOut}};
    for (const auto& c : cases) {
        Streams plain = m_good;
        std::string label = "without";
        for (const std::string& name : c.first) {
            Remove(plain, name);
            label += " " + name;
        }
        ExpectShows(plain, label, c.second);
    }
}

TEST_F(ArchiveCorruption, DanglingContainerOrdinalsAreRefused) {
    const std::uint32_t top = m_ids[0], src = m_ids[1], srcSub = m_ids[2], dst = m_ids[3];
    const std::vector<std::pair<const char*, std::function<void(Records&)>>> cases = {
        {"parent beyond the table", [&](Records& r) { r[src].parent = 99; }},
        {"child beyond the table", [&](Records& r) { r[src].children.push_back(6); }},
        {"child listed twice", [&](Records& r) { r[src].children.push_back(r[src].children[0]); }},
        {"child of two parents",
         [&](Records& r) { r[dst].children.push_back(r[src].children[0]); }},
        {"child naming another parent", [&](Records& r) { r[srcSub].parent = Ordinal(dst); }},
        {"own child", [&](Records& r) { r[dst].children.push_back(Ordinal(dst)); }},
        {"cycle beside the tree",
         [&](Records& r) {
             // /src/ and /src/sub/ hold each other, and the top container lets /src/ go.
             r[src].parent = Ordinal(srcSub);
             r[srcSub].children.push_back(Ordinal(src));
             auto& list = r[top].children;
             list.erase(std::find(list.begin(), list.end(), Ordinal(src)));
         }},
        {"implicit relationship at a container that is not its source",
         [&](Records& r) { std::swap(r[dst].outgoing, r[src].outgoing); }},
        {"implicit relationship beyond the table", [&](Records& r) { r[src].incoming = {3}; }},
        {"implicit relationship listed twice",
         [&](Records& r) { r[src].outgoing.push_back(r[src].outgoing[0]); }},
        {"name beyond the string table", [&](Records& r) { Put32(r[dst].name, 4, 9999); }}};
    for (const auto& c : cases) ExpectShows(WithContainers(c.second), c.first, kRecords);
}

// Ordinals and handles that name nothing, or the wrong thing. Records read at opening are
// refused there; damage inside the pools shows when a pool loads: the record is refused, or
// the object a handle names is left out; never a null.
TEST_F(ArchiveCorruption, DanglingReferencesAreRefusedOrLeftOut) {
    const std::size_t fanOut = RecordOffset(m_handleFanOut), a = RecordOffset(m_handleA),
                      x = RecordOffset(m_handleX);
    const std::uint32_t freeSlot = m_handleA + 3;  // after a, b and c
    const char* const rels = "Qmx_CorrManagedExpRelMgr";
    const char* const items = "Qmx_CorrManagedItemMgr";
    const char* const listed = "Container_Items_1";
    // The first record of "irels": data index, source and destination ordinals.
    const Field fields[] = {
        {"implicit data beyond the table", "irels", 0, 99, kRecords},
        {"implicit source beyond the table", "irels", 4, 99, kRecords},
        {"no implicit source", "irels", 4, 0, kRecords},
        {"implicit destination beyond the table", "irels", 8, 0xFFFFFFFF, kRecords},
        {"no implicit destination", "irels", 8, 0, kRecords},
        {"source beyond the pools", rels, fanOut + 8, 128000, kLeftOut},
        {"source in a free slot", rels, fanOut + 8, freeSlot, kLeftOut},
        {"source below the first pool", rels, fanOut + 8, 5, kOnUse},
        {"relationship data beyond the table", rels, fanOut, 9999, kOnUse},
        {"item data beyond the table", items, a, 9999, kOnUse},
        {"item name beyond the string table", items, x + 8, 9999, kOnUse},
        {"outgoing count beyond the overflow list", items, a + 20, 3, kOnUse},
        {"incoming relationship beyond the pools", items, x + 16, 128000, kLeftOut},
        {"listed item beyond the pools", listed, 4, 128000, kOnUse},
        {"listed item in a free slot", listed, 4, freeSlot, kOnUse},
        {"listed item of another container", listed, 4, m_handleX, kOnUse},
        {"listed item twice", listed, 8, m_handleA, kOnUse},
        {"pool count beyond the stream", items, 8, 0x01000000, kHeader},
        {"pool record size", rels, 4, 28 * 128 + 24, kHeader},
        {"free pool beyond the pools", "Qmx_CorrManagedExpRelMgr_Data", 16, 999, kHeader}};
    for (const Field& f : fields) ExpectShows(f);
}

// A stored property tag that is neither an integer nor a string is damage like any other.
TEST_F(ArchiveCorruption, PropertyTagsOfNeitherTypeAreRefused) {
    const std::vector<std::pair<const char*, const char*>> cases = {
        {"shared_item_data", "kind"}, {"shared_rel_data", "weight"}, {"containers", "origin"}};
    for (const auto& c : cases) {
        Streams plain = m_good;
        std::string& bytes = StreamOf(plain, c.first);
        Put32(bytes, bytes.find(c.second) + std::strlen(c.second), 2);
        ExpectShows(plain, c.second, c.first == std::string("containers") ? kRecords : kHeader);
    }
}

// Every record is consumed exactly: bytes after the last one mean that a count or a length
// was damaged and part of the graph would silently be missing. Pool streams are the exception:
// a pool removed from the end leaves its stale record behind, which no reader looks at.
TEST_F(ArchiveCorruption, BytesAfterTheLastRecordAreRefused) {
    for (const auto& stream : m_good) {
        if (stream.first == "Qmx_CorrManagedItemMgr" || stream.first == "Qmx_CorrManagedExpRelMgr")
            continue;
        Streams plain = m_good;
        StreamOf(plain, stream.first) += std::string(4, '\0');
        const Outcome outcome = Try(plain, stream.first + " with spare bytes");
        EXPECT_NE(outcome.refusal, "") << stream.first;
    }
}

// Cut to nothing, to one byte, a third, a half, all but one byte. Every stream is read to its
// end, so each cut is refused.
TEST_F(ArchiveCorruption, TruncatedStreamsAreRefused) {
    for (const auto& stream : m_good) {
        const std::size_t size = stream.second.size();
        for (std::size_t cut : std::set<std::size_t>{0, 1, size / 3, size / 2, size - 1}) {
            if (cut >= size) continue;
            Streams plain = m_good;
            StreamOf(plain, stream.first).resize(cut);
            const std::string label = stream.first + " cut at " + std::to_string(cut);
            const Outcome outcome = Try(plain, label, cut == size / 2 ? kReadWrite : kReadOnly);
            EXPECT_NE(outcome.refusal, "") << label;
        }
    }
}

// A zstd frame proves itself whole (its checksum) only at its end: a reader that stops after
// its last record must still see the frame through. A damaged frame is refused even where
// the bytes a reader wants came out whole; only a change that decodes to the same bytes (a
// window size) may open.
TEST_F(ArchiveCorruption, DamagedCompressedStreamsAreRefused) {
    for (const auto& portable : m_compressed) {
        const std::string& stored = portable.second.second;
        std::vector<std::pair<std::string, std::string>> damaged;
        for (std::size_t cut : {stored.size() / 2, stored.size() - 4, stored.size() - 1})
            damaged.emplace_back("cut at " + std::to_string(cut), stored.substr(0, cut));
        // Every byte of the header and of the last block's end, every third between.
        for (std::size_t at = 0; at < stored.size();
             at += at < 6 || at + 9 > stored.size() ? 1 : 3) {
            damaged.emplace_back("flipped at " + std::to_string(at), stored);
            damaged.back().second[at] ^= 0x01;
        }
        for (const auto& d : damaged) {
            Streams streams = m_stored;
            StreamOf(streams, portable.first) = d.second;
            const Outcome outcome = TryStored(streams, portable.first + " " + d.first);
            bool same = false;
            try {
                same = Decompress(d.second, m_dir / "codec") == portable.second.first;
            } catch (const Vesk::IOException&) {
            }
            if (same) {
                EXPECT_EQ(outcome.walk, m_goodWalk) << m_case;
            } else {
                EXPECT_NE(outcome.refusal, "") << m_case;
            }
        }
    }
}

// Fixed seed, a bounded number of flips per stream.
TEST_F(ArchiveCorruption, FlippedBytesAreRefusedOrOpenWhole) {
    const unsigned kSeed = 20240601;
    std::mt19937 random(kSeed);
    for (const auto& stream : m_good) {
        std::uniform_int_distribution<std::size_t> position(0, stream.second.size() - 1);
        std::uniform_int_distribution<int> mask(1, 255);
        for (int flip = 0; flip < 10; ++flip) {
            Streams plain = m_good;
            const std::size_t at = position(random);
            StreamOf(plain, stream.first)[at] ^= static_cast<char>(mask(random));
            Try(plain,
                stream.first + " flipped at " + std::to_string(at) + ", seed " +
                    std::to_string(kSeed),
                flip % 5 == 0 ? kReadWrite : kReadOnly);
        }
    }
}

// A host's temporary directory holds the database's own directory only while it is open.
TEST_F(ArchiveCorruption, RefusedOpenLeavesTheHostsTemporaryDirectoryEmpty) {
    const std::string host = m_dir / "host";
    Put32(StreamOf(m_stored, "info"), kTableN, 0xFFFFFFFF);
    const std::string damaged = Pack(m_stored);
    WriteFileBytes(Db(), damaged);
    EXPECT_THROW(Qmx_CorrMgr(Db(), host, kReadWrite, nullptr),
                 Qmx_CorrException::InvalidDatabaseFormat);
    EXPECT_TRUE(Vesk::File::listdir(host).empty());
    EXPECT_TRUE(Vesk::File::listdir(m_dir / "tmp").empty());
    EXPECT_TRUE(ReadFileBytes(Db()) == damaged);
}

}  // namespace
