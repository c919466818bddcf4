#include "Qmx_CorrObjMgrT.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <iostream>
#include <map>
#include <memory>
#include <random>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#include "Qmx_CorrDb_Internal.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStorageData.h"
#include "TempDir.h"
#include "Vesk_FaultInjector.h"
#include "Vesk_File.h"

namespace pooltest {

constexpr const char* kSourceFile = "tests/Qmx_CorrObjMgrT_test";
constexpr const char* kRevision = "1";
constexpr unsigned int kRecordSize = 8;
constexpr unsigned int kPoolRecordSize = kRecordSize * 128 + 20;
constexpr unsigned int kBroken = 0xDEAD0000u;   // a value whose record reports itself invalid
constexpr unsigned int kRefused = 0xBAD00000u;  // a value the constructor refuses

int g_ownerTag;
Qmx_CorrObjectOwner* const kOwner = reinterpret_cast<Qmx_CorrObjectOwner*>(&g_ownerTag);

// A pooled record of exactly 8 bytes: a value and its complement, so that damage shows.
class Sample {
public:
    explicit Sample(unsigned int value) : m_value(value), m_owner(nullptr) {
        if (value == kRefused) throw std::runtime_error("refused");
        ++s_live;
    }
    Sample(Qmx_CorrStorage& storage, Qmx_CorrObjectOwner* owner) : m_owner(owner) {
        m_value = storage.ReadUINT32();
        if (storage.ReadUINT32() != ~m_value) {
            QMX_CORR_THROW(InvalidDatabaseFormat, storage.GetName().c_str());
        }
        ++s_live;
    }
    ~Sample() { --s_live; }
    void Archive(Qmx_CorrStorage& storage) const {
        storage.WriteUINT32(m_value);
        storage.WriteUINT32(~m_value);
    }
    bool DbgValidateState() const { return m_value != kBroken; }
    unsigned int Value() const { return m_value; }
    Qmx_CorrObjectOwner* Owner() const { return m_owner; }

    static int s_live;  // constructed and not yet destroyed

private:
    unsigned int m_value;
    Qmx_CorrObjectOwner* m_owner;
};
int Sample::s_live = 0;

class SamplePool : public Qmx_ObjectPoolT<Sample, 128> {};

class SampleMgr : public Qmx_CorrObjMgrTData::Qmx_CorrObjMgrT<Sample, unsigned int, SamplePool> {
public:
    explicit SampleMgr(const char* name = "Sample_Pools", const char* dataName = "Sample_Free")
        : Qmx_CorrObjMgrT(name, dataName, kRecordSize) {}
    // The handle of a new sample, 0 when none could be made.
    unsigned int Create(unsigned int containerId, unsigned int value) {
        return GetHandle(CreateObject(containerId, value));
    }
};

using ::testing::ElementsAre;
using ::testing::StrEq;
using ::testing::ThrowsMessage;

// 32-bit values as stored: 4 bytes each, least significant first.
std::string Words(const std::vector<unsigned int>& values) {
    std::string bytes;
    for (unsigned int v : values) {
        for (int shift = 0; shift < 32; shift += 8) bytes += static_cast<char>((v >> shift) & 0xFF);
    }
    return bytes;
}

// A pool record holding `values` by slot.
std::string PoolRecord(unsigned int containerId,
                       const std::map<unsigned int, unsigned int>& values) {
    std::string bits(16, '\0');
    std::string slots(128 * kRecordSize, '\0');
    for (const auto& [slot, value] : values) {
        bits[slot / 8] = static_cast<char>(bits[slot / 8] | (1 << (slot % 8)));
        slots.replace(slot * kRecordSize, kRecordSize, Words({value, ~value}));
    }
    return bits + Words({containerId}) + slots;
}

std::string InvalidFormat(const std::string& name) {
    return "Qmx_CorrException::InvalidDatabaseFormat. Unable to read '" + name + "'.\n";
}

// One open database with one manager on it; closes the manager as the archive does.
struct Session {
    explicit Session(const std::string& path, const std::string& tempDir = "",
                     const char* poolName = "Sample_Pools", const char* freeName = "Sample_Free")
        : db(tempDir.empty() ? new Qmx_CorrDb_Internal(path)
                             : new Qmx_CorrDb_Internal(path, tempDir)),
          mgr(poolName, freeName) {}
    ~Session() { mgr.CloseDb(); }
    void Open() { mgr.OpenDb(db.get(), data, kOwner); }
    void Commit() {
        mgr.Commit();
        db->Commit();
    }
    unsigned int Value(unsigned int handle) {
        Sample* sample = mgr.GetPtr(handle);
        return sample ? sample->Value() : 0;
    }
    std::string StreamBytes(const std::string& name) {
        db->Commit();  // flushes the open pool stream
        return ReadFileBytes(db->GetTempDir() + name);
    }
    // The free-pool stream as 32-bit words.
    std::vector<unsigned int> FreeWords() {
        Qmx_CorrStream* stream = db->OpenStream("Sample_Free", 9);
        std::vector<unsigned int> words;
        if (!stream) return words;
        try {
            for (;;) words.push_back(stream->ReadUINT32());
        } catch (const Qmx_CorrException::InvalidDatabaseFormat&) {
        }
        db->CloseStream(stream);
        return words;
    }

    std::unique_ptr<Qmx_CorrDb_Internal> db;
    Qmx_CorrStorageData data;
    SampleMgr mgr;
};

class CorrObjMgrTest : public ::testing::Test {
protected:
    void TearDown() override {
        Vesk::FaultInjector::Disarm();
        EXPECT_EQ(Sample::s_live, 0) << "samples leaked or destroyed twice";
    }
    std::string Path() const { return m_dir / "pools.cpd"; }
    std::unique_ptr<Session> OpenSession() {
        auto session = std::make_unique<Session>(Path());
        session->Open();
        return session;
    }
    // A new database whose streams are the given bytes (a plain file each), not yet opened.
    std::unique_ptr<Session> SessionWithStreams(const std::string& pools, const std::string& free) {
        auto session = std::make_unique<Session>(m_dir / "crafted.cpd", m_dir / "streams");
        if (!pools.empty()) WriteFileBytes(session->db->GetTempDir() + "Sample_Pools", pools);
        if (!free.empty()) WriteFileBytes(session->db->GetTempDir() + "Sample_Free", free);
        return session;
    }
    std::string CraftedName() const { return m_dir / "crafted.cpd"; }

    TempDir m_dir;
};

TEST_F(CorrObjMgrTest, HandlesCountSlotsWithinPoolsOfOneContainer) {
    auto s = OpenSession();
    EXPECT_EQ(s->mgr.Create(0, 1), 128u);
    for (unsigned int i = 2; i <= 128; ++i) s->mgr.Create(0, i);
    EXPECT_EQ(s->mgr.Create(9, 9), 256u);  // another container, another pool
    EXPECT_EQ(s->mgr.Create(0, 129), 384u);
    EXPECT_EQ(s->mgr.Create(9, 10), 257u);
    EXPECT_EQ(s->Value(128 + 127), 128u);
    for (unsigned int none : {0u, 5u, 258u, 4u * 128}) EXPECT_EQ(s->mgr.GetPtr(none), nullptr);
    EXPECT_TRUE(s->mgr.DbgValidateState());
}

TEST_F(CorrObjMgrTest, RemovingTheLastPoolShrinksTheCountInTheNextHeader) {
    auto s = OpenSession();
    s->mgr.Create(1, 10);
    const unsigned int only = s->mgr.Create(2, 20);
    s->Commit();
    EXPECT_EQ(s->StreamBytes("Sample_Pools").size(), 12 + 2 * kPoolRecordSize);
    s->mgr.Destroy(s->mgr.GetPtr(only));
    EXPECT_EQ(s->mgr.GetNumPools(), 1u);
    s->Commit();
    const std::string bytes = s->StreamBytes("Sample_Pools");
    EXPECT_EQ(bytes.substr(0, 12), Words({0, kPoolRecordSize, 1}));
    EXPECT_EQ(bytes.size(), 12 + 2 * kPoolRecordSize);  // the stale record stays until closing
    // The reuse key stays, empty, once a new pool was made.
    EXPECT_THAT(s->FreeWords(), ElementsAre(0, 2, 1, 1, 0, 0xFFFFFFFFu, 0));
    s->mgr.CloseDb();
    EXPECT_EQ(ReadFileBytes(s->db->GetTempDir() + "Sample_Pools").size(), 12 + kPoolRecordSize);
}

TEST_F(CorrObjMgrTest, EmptiedPoolIsReusedByTheNextNewPoolOfAnyContainer) {
    auto s = OpenSession();
    const unsigned int first = s->mgr.Create(1, 10);
    s->mgr.Create(2, 20);
    s->mgr.Destroy(s->mgr.GetPtr(first));
    EXPECT_FALSE(s->mgr.PoolInMemory(0));
    EXPECT_EQ(s->mgr.GetPtr(first), nullptr);  // never brought back from its old record
    s->Commit();
    EXPECT_THAT(s->FreeWords(), ElementsAre(0, 2, 2, 1, 1, 0xFFFFFFFFu, 1, 0));
    EXPECT_EQ(s->mgr.Create(3, 30), 128u);
    EXPECT_EQ(s->mgr.LoadPool(0)->GetContainerId(), 3u);
    EXPECT_EQ(s->mgr.GetNumPools(), 2u);
}

TEST_F(CorrObjMgrTest, UnloadedPoolReloadsEqualObjects) {
    auto s = OpenSession();
    const unsigned int a = s->mgr.Create(4, 41), b = s->mgr.Create(4, 42);
    const unsigned int other = s->mgr.Create(5, 51);
    s->mgr.FlushPools(4, true);
    EXPECT_FALSE(s->mgr.PoolInMemory(0));
    EXPECT_TRUE(s->mgr.PoolInMemory(1));
    EXPECT_EQ(Sample::s_live, 1);  // unloading destroyed the objects
    EXPECT_EQ(s->Value(a), 41u);
    EXPECT_EQ(s->Value(b), 42u);
    EXPECT_EQ(s->mgr.GetPtr(a)->Owner(), kOwner);
    s->mgr.FlushAllPools(true);
    EXPECT_EQ(s->mgr.GetNumLoadedPools(), 0u);
    EXPECT_EQ(s->Value(other), 51u);
}

TEST_F(CorrObjMgrTest, FreeRunsAreUsedLastFirstInMemoryAndAfterRestoring) {
    auto s = OpenSession();
    for (unsigned int i = 0; i < 4; ++i) s->mgr.Create(1, i);
    s->mgr.Destroy(s->mgr.GetPtr(129));
    s->mgr.Destroy(s->mgr.GetPtr(130));  // joins the run that slot 1 starts
    EXPECT_THAT(s->mgr.LoadPool(0)->GetUnusedRanges(), ElementsAre(4, 1));
    EXPECT_EQ(s->mgr.Create(1, 10), 129u);
    EXPECT_EQ(s->mgr.Create(1, 11), 130u);
    EXPECT_THROW(s->mgr.Create(1, kRefused), std::runtime_error);  // leaves the slot free
    EXPECT_THAT(s->mgr.LoadPool(0)->GetUnusedRanges(), ElementsAre(4));
    s->mgr.Destroy(s->mgr.GetPtr(129));
    s->mgr.Destroy(s->mgr.GetPtr(131));  // live: 0 and 2
    s->mgr.FlushAllPools(true);
    EXPECT_THAT(s->mgr.LoadPool(0)->GetUnusedRanges(), ElementsAre(1, 3));
    EXPECT_EQ(s->mgr.Create(1, 12), 131u);
    EXPECT_EQ(s->mgr.Create(1, 13), 132u);
    EXPECT_TRUE(s->mgr.DbgValidateState());
}

TEST_F(CorrObjMgrTest, DumpShowsFillAndUnloadedPools) {
    auto s = OpenSession();
    for (unsigned int i = 0; i < 128; ++i) s->mgr.Create(3, i);
    s->mgr.Create(6, 1);
    s->mgr.Create(6, 2);
    s->mgr.Create(8, 1);
    s->mgr.FlushPools(3, true);
    s->mgr.FlushPools(8, true);
    s->mgr.LoadPool(0);  // full after reloading too
    std::ostringstream out;
    s->mgr.DbgDump(out, 1);
    EXPECT_EQ(out.str(),
              "   pooltest::SampleMgr\n   {\n"
              "      Contains 3 object pools\n      2 pools are currently loaded\n"
              "      Pool 0:\n      pooltest::SamplePool\n      {\n         ID: 3\n"
              "         Pool is 100% full.\n      }\n"
              "      Pool 1:\n      pooltest::SamplePool\n      {\n         ID: 6\n"
              "         Pool contains 2 objects out of a possible 128.  (1.562500 % full)\n"
              "         Pool has 1 unused ranges.\n      }\n"
              "      Pool 2 is not loaded.\n   }\n");
}

TEST_F(CorrObjMgrTest, PointersResolveOnlyAtSlotStarts) {
    auto s = OpenSession();
    const unsigned int handle = s->mgr.Create(0, 5);
    Sample* sample = s->mgr.GetPtr(handle);
    std::unique_ptr<SampleMgr::ManagedSwizzler> swizzler(s->mgr.GetNewSwizzler());
    EXPECT_EQ(swizzler->GetHandle(sample), handle);
    EXPECT_EQ(swizzler->GetPtr(handle), sample);
    EXPECT_EQ(s->mgr.GetHandle(nullptr), 0u);
    Sample outside(1);
    EXPECT_EQ(s->mgr.GetHandle(&outside), 0u);
    const Sample* inside =
        reinterpret_cast<const Sample*>(reinterpret_cast<const char*>(sample) + 1);
    EXPECT_THAT(
        [&] { s->mgr.GetHandle(inside); },
        ThrowsMessage<std::invalid_argument>(StrEq("GetPtrOffset called with invalid pointer")));
}

TEST_F(CorrObjMgrTest, DestroyingWhatIsNotLiveThrowsOneAndChangesNothing) {
    auto s = OpenSession();
    const unsigned int keep = s->mgr.Create(0, 1), gone = s->mgr.Create(0, 2);
    Sample* dangling = s->mgr.GetPtr(gone);
    s->mgr.Destroy(dangling);
    int thrown = 0;
    try {
        s->mgr.Destroy(dangling);
    } catch (int value) {
        thrown = value;
    }
    EXPECT_EQ(thrown, 1);
    Sample outside(3);
    s->mgr.Destroy(&outside);  // not pooled: ignored
    s->mgr.Destroy(nullptr);
    EXPECT_EQ(s->Value(keep), 1u);
    EXPECT_TRUE(s->mgr.DbgValidateState());
    s->mgr.Create(0, kBroken);
    EXPECT_FALSE(s->mgr.DbgValidateState());
}

TEST_F(CorrObjMgrTest, TracesNameTheStreamAndTheCounts) {
    Qmx_CorrDbg::Tracer& tracer = *Qmx_CorrDbg::s_Tracer;
    std::ostringstream out;
    tracer.SetOutput(out);
    tracer.SetTraceLevel("POOL", 11);
    tracer.SetTraceLevel("ARCHIVE", 8);
    {
        auto s = OpenSession();
        const unsigned int handle = s->mgr.Create(4, 1);
        s->mgr.FlushPools(4, true);
        s->mgr.GetPtr(handle + 1);
        s->mgr.GetPtr(5);
        s->mgr.FlushAllPools(false);
    }
    tracer.RemoveTrace("POOL");
    tracer.RemoveTrace("ARCHIVE");
    tracer.SetOutput(std::clog);
    // "QMX_CORR_TRACE:<category>:<level>:<file>(<line>): <message>" of this header only,
    // as "<category>:<level> <message>".
    std::vector<std::string> records;
    const std::string head = "QMX_CORR_TRACE:", file = ":correlation/i/Qmx_CorrObjMgrT(";
    std::istringstream lines(out.str());
    for (std::string line; std::getline(lines, line);) {
        const std::size_t at = line.find(file), end = line.find("): ");
        if (line.compare(0, head.size(), head) != 0 || at == std::string::npos || end < at)
            continue;
        records.push_back(line.substr(head.size(), at - head.size()) + " " + line.substr(end + 3));
    }
    EXPECT_THAT(
        records,
        ElementsAre("POOL:10 Opening data stream Sample_Pools",
                    "POOL:11 Data stream Sample_Pools contains 0 pools.",
                    "POOL:5 Pool Sample_Pools: Creating a new pool for container Id 4",
                    "POOL:11 Pool Sample_Pools: Flushing all pools with ID 4",
                    "ARCHIVE:8 Pool Sample_Pools: Flushing pool 0 to disk.",
                    "POOL:11 Pool Sample_Pools: 0 out of 1 pools are currently in memory.",
                    "POOL:11 Pool Sample_Pools: Flushed 1 pools and removed them from memory.",
                    "POOL:8 Pool Sample_Pools: Loading pool 0 from disk.",
                    "POOL:11 Pool Sample_Pools: 1 out of 1 pools are currently in memory.",
                    "POOL:2 Attempt to get pointer by offset but given offset is not in use "
                    "currently.",
                    "POOL:1 ERROR: Request to get item for handle but handle is out of "
                    "range. Returning NULL.",
                    "POOL:11 Pool Sample_Pools: 1 out of 1 pools are being flushed.",
                    "ARCHIVE:8 Pool Sample_Pools: Flushing pool 0 to disk."));
}

TEST_F(CorrObjMgrTest, CommitAndReopenKeepObjectsAndFreeLists) {
    unsigned int freed;
    {
        auto s = OpenSession();
        for (unsigned int i = 0; i < 130; ++i) s->mgr.Create(1, 1000 + i);
        s->mgr.Create(2, 2000);
        freed = s->mgr.Create(3, 3000);
        s->mgr.Create(3, 3001);
        s->mgr.Destroy(s->mgr.GetPtr(freed));
        s->mgr.FlushPools(1, true);  // some pools written before the commit, some by it
        s->Commit();
    }
    auto s = OpenSession();
    EXPECT_EQ(s->mgr.GetNumPools(), 4u);
    EXPECT_EQ(s->mgr.GetNumLoadedPools(), 0u);
    EXPECT_EQ(s->Value(128), 1000u);
    EXPECT_EQ(s->Value(256 + 1), 1129u);
    EXPECT_EQ(s->Value(freed), 0u);
    EXPECT_EQ(s->Value(freed + 1), 3001u);
    // Container 3's pool is still listed; restored, it offers its runs [0, 2] from the end.
    EXPECT_EQ(s->mgr.Create(3, 3002), freed + 2);
    EXPECT_EQ(s->mgr.Create(1, 1130), 256u + 2);
    EXPECT_TRUE(s->mgr.DbgValidateState());
}

TEST_F(CorrObjMgrTest, NeverWrittenReusablePoolIsPaddedSoTheDatabaseReopens) {
    {
        auto s = OpenSession();
        s->mgr.Create(1, 1);
        const unsigned int middle = s->mgr.Create(2, 2);
        const unsigned int last = s->mgr.Create(3, 3);
        s->mgr.Destroy(s->mgr.GetPtr(middle));
        s->mgr.Destroy(s->mgr.GetPtr(last));
        s->Commit();
        EXPECT_EQ(s->StreamBytes("Sample_Pools").size(), 12 + 2 * kPoolRecordSize);
    }
    auto s = OpenSession();
    EXPECT_EQ(s->mgr.GetNumPools(), 2u);
    EXPECT_EQ(s->mgr.Create(9, 9), 256u);
}

TEST_F(CorrObjMgrTest, FailedCommitLeavesTheLastCommitIntact) {
    {
        auto s = OpenSession();
        s->mgr.Create(1, 11);
        s->Commit();
    }
    for (unsigned int n = 1;; ++n) {
        bool committed = false;
        {
            auto s = OpenSession();
            s->mgr.Create(2, 22);
            Vesk::FaultInjector::Arm(n);
            try {
                s->Commit();
                committed = true;
            } catch (const std::exception&) {
            }
            Vesk::FaultInjector::Disarm();
            if (!Vesk::FaultInjector::Fired()) break;
        }
        // Either commit is whole: the old one, or (a fault after the rename) the new one.
        auto s = OpenSession();
        const unsigned int pools = s->mgr.GetNumPools();
        EXPECT_TRUE(pools == 2 || (pools == 1 && !committed)) << "fault " << n;
        EXPECT_EQ(s->Value(128), 11u) << "fault " << n;
        EXPECT_EQ(s->Value(256), pools == 2 ? 22u : 0u) << "fault " << n;
        EXPECT_TRUE(s->mgr.DbgValidateState());
    }
}

TEST_F(CorrObjMgrTest, UnopenableStreamsAreRefusedWithTheirNames) {
    Session noPools(Path(), "", "no/pools");
    EXPECT_THAT([&] { noPools.Open(); },
                ThrowsMessage<Qmx_CorrException::CannotWriteDatabase>(StrEq(
                    "Qmx_CorrException::CannotWriteDatabase. Unable to write 'no/pools'.\n")));
    EXPECT_EQ(noPools.mgr.GetNumPools(), 0u);

    Session bad(m_dir / "other.cpd", "", "Sample_Pools", "no/free");
    bad.Open();
    bad.mgr.Create(1, 1);
    const std::string before = bad.StreamBytes("Sample_Pools");
    EXPECT_THAT([&] { bad.mgr.Commit(); },
                ThrowsMessage<Qmx_CorrException::CannotWriteDatabase>(
                    StrEq("Qmx_CorrException::CannotWriteDatabase. Unable to write 'no/free'.\n")));
    EXPECT_EQ(bad.StreamBytes("Sample_Pools"), before);
}

TEST_F(CorrObjMgrTest, DamagedStreamsAreRefusedAndLeaveTheManagerDetached) {
    const std::string pool = PoolRecord(1, {{0, 5}});
    const std::string pools = Words({0, kPoolRecordSize, 2}) + pool + PoolRecord(2, {{0, 6}});
    const std::vector<std::pair<std::string, std::vector<unsigned int>>> damaged = {
        {Words({1, kPoolRecordSize, 1}) + pool, {}},      // pool stream version
        {Words({0, kPoolRecordSize + 8, 1}) + pool, {}},  // records of another size
        {Words({0, kPoolRecordSize, 2}) + pool, {}},      // more pools than records
        {Words({0, kPoolRecordSize, 0xFFFFFFFFu}), {}},   // absurd pool count
        {Words({0, kPoolRecordSize}), {}},                // cut header
        {pools, {1, 0}},                                  // free-pool stream version
        {pools, {0, 0xFFFFFFFFu, 1, 1, 0}},               // absurd entry count
        {pools, {0, 1, 1, 0xFFFFFFFFu, 0}},               // absurd index count
        {pools, {0, 1, 1, 1, 2}},                         // index beyond the pools
        {pools, {0, 2, 1, 1, 0, 2, 1, 0}},                // one pool under two keys
        {pools, {0, 1, 1, 2, 0, 0}},                      // one pool twice
        {pools, {0, 2, 2, 1, 1, 1, 1, 0}},                // keys out of order
        {pools, {0, 1, 1, 1, 0, 7}},                      // spare bytes
    };
    for (const auto& [poolBytes, freeWords] : damaged) {
        auto s = SessionWithStreams(poolBytes, Words(freeWords));
        EXPECT_THAT([&] { s->Open(); }, ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(
                                            StrEq(InvalidFormat(CraftedName()))));
        EXPECT_EQ(s->mgr.GetNumPools(), 0u);
        s.reset();
        Vesk::File::remove_r(m_dir / "streams");
    }
    // A compressed stream cannot tell its length: the absurd count runs into its end.
    auto s = SessionWithStreams(pools, "");
    Qmx_CorrStream* free = s->db->OpenStream("Sample_Free", 14);
    for (unsigned int word : {0u, 0xFFFFFFFFu, 1u, 1u, 0u}) free->WriteUINT32(word);
    s->db->CloseStream(free);
    EXPECT_THROW(s->Open(), Qmx_CorrException::InvalidDatabaseFormat);
}

TEST_F(CorrObjMgrTest, PoolListedForAnotherContainerIsRefusedWhenUsed) {
    auto s = SessionWithStreams(Words({0, kPoolRecordSize, 1}) + PoolRecord(3, {{0, 5}}),
                                Words({0, 1, 7, 1, 0}));
    s->Open();
    EXPECT_THAT([&] { s->mgr.Create(7, 1); },
                ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(
                    StrEq(InvalidFormat(CraftedName()))));
    EXPECT_EQ(s->Value(128), 5u);
}

// A flipped byte of a real pool stream ends in a refusal or in a valid manager.
TEST_F(CorrObjMgrTest, FlippedBytesEndInRefusalOrValidPools) {
    std::string good;
    {
        auto s = OpenSession();
        for (unsigned int i = 0; i < 3; ++i) s->mgr.Create(1, i + 100);
        s->mgr.Create(2, 7);
        s->Commit();
        good = s->StreamBytes("Sample_Pools");
    }
    auto s = SessionWithStreams(good, "");
    const std::string path = s->db->GetTempDir() + "Sample_Pools";
    // Every byte of the header, the pool heads and the live records; a sample of the rest.
    std::set<std::size_t> offsets;
    for (std::size_t at = 0; at < good.size(); at += 53) offsets.insert(at);
    for (std::size_t at = 0; at < 12 + 20 + 3 * kRecordSize; ++at) offsets.insert(at);
    for (std::size_t at = 0; at < 20 + kRecordSize; ++at) offsets.insert(12 + kPoolRecordSize + at);
    for (std::size_t at : offsets) {
        std::string bytes = good;
        bytes[at] = static_cast<char>(bytes[at] ^ 0x41);
        WriteFileBytes(path, bytes);
        SampleMgr mgr;
        try {
            mgr.OpenDb(s->db.get(), s->data, kOwner);
            for (unsigned int i = 0; i < mgr.GetNumPools(); ++i) mgr.LoadPool(i);
            EXPECT_TRUE(mgr.DbgValidateState()) << "byte " << at;
        } catch (const Qmx_CorrException::InvalidDatabaseFormat& e) {
            EXPECT_THAT(e.what(), StrEq(InvalidFormat(CraftedName()))) << "byte " << at;
        }
        mgr.CloseDb();
    }
    for (std::size_t length = 0; length < good.size(); length += 97) {
        WriteFileBytes(path, good.substr(0, length));
        SampleMgr mgr;
        EXPECT_THROW(mgr.OpenDb(s->db.get(), s->data, kOwner),
                     Qmx_CorrException::InvalidDatabaseFormat)
            << "length " << length;
    }
}

TEST_F(CorrObjMgrTest, DamagedPoolRecordStaysUnloaded) {
    std::string record = PoolRecord(1, {{0, 5}, {1, 6}});
    record[20 + kRecordSize + 4] ^= 1;  // slot 1's complement
    auto s = SessionWithStreams(Words({0, kPoolRecordSize, 1}) + record, "");
    s->Open();
    for (int attempt = 0; attempt < 2; ++attempt) {
        EXPECT_THROW(s->mgr.GetPtr(128), Qmx_CorrException::InvalidDatabaseFormat);
        EXPECT_FALSE(s->mgr.PoolInMemory(0));
        EXPECT_EQ(Sample::s_live, 0);
    }
}

// The same random operations on the manager and on a map of handles, with commits and
// reopening now and then.
TEST_F(CorrObjMgrTest, RandomOperationsAgreeWithAModel) {
    const unsigned int seed = std::random_device{}();
    std::cout << "seed " << seed << std::endl;  // also shown when an exception ends the test
    SCOPED_TRACE("seed " + std::to_string(seed));
    std::mt19937 random(seed);
    std::map<unsigned int, std::pair<unsigned int, unsigned int>> live;  // container, value
    std::set<unsigned int> dead;
    auto s = OpenSession();
    auto check = [&] {
        for (const auto& [handle, entry] : live) {
            ASSERT_EQ(s->Value(handle), entry.second) << handle;
            ASSERT_EQ(s->mgr.LoadPool(SampleMgr::GetPoolIndex(handle))->GetContainerId(),
                      entry.first);
        }
        for (unsigned int handle : dead) {
            if (!live.count(handle)) {
                ASSERT_EQ(s->mgr.GetPtr(handle), nullptr) << handle;
            }
        }
        ASSERT_TRUE(s->mgr.DbgValidateState());
    };
    for (unsigned int step = 1; step <= 3000; ++step) {
        const unsigned int op = random() % 100, container = random() % 3;
        if (op < 50) {
            const unsigned int handle = s->mgr.Create(container, step);
            ASSERT_EQ(live.count(handle), 0u);
            live[handle] = {container, step};
        } else if (op < 85 && !live.empty()) {
            auto victim = std::next(live.begin(), random() % live.size());
            s->mgr.Destroy(s->mgr.GetPtr(victim->first));
            dead.insert(victim->first);
            live.erase(victim);
        } else if (op < 95) {
            s->mgr.FlushPools(container, random() % 2);
        } else if (op < 98) {
            s->mgr.FlushAllPools(random() % 2);
        } else {
            s->Commit();
            s.reset();
            s = OpenSession();
        }
        if (step % 250 == 0) check();
    }
    check();
}

}  // namespace pooltest
