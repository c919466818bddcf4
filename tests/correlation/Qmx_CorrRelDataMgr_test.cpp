// The relationship record table: the default that is never written, the kinds, freed slots,
// and the write rule that gives a relationship a record of its own.
#include "Qmx_CorrRelDataMgr.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <sstream>
#include <string>

#include "../support/FakeOwner.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStream_Internal.h"

namespace {

using qmxtest::DataRelationship;
using qmxtest::FakeOwner;
using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Record = boost::shared_ptr<Qmx_CorrRelData>;

std::string U32(unsigned int v) {
    std::string bytes;
    for (int shift = 0; shift < 32; shift += 8) bytes += static_cast<char>((v >> shift) & 0xFF);
    return bytes;
}
std::string U8(unsigned char v) { return std::string(1, static_cast<char>(v)); }
std::string Str(const std::string& s) { return U32(static_cast<unsigned int>(s.size())) + s; }

class CorrRelDataMgrTest : public ::testing::Test {
protected:
    CorrRelDataMgrTest()
        : m_stream(&m_bytes, "stream.cpd"), m_storage("store.cpd", &m_stream, m_data) {}

    std::string Archived(const Qmx_CorrRelDataMgr& mgr) {
        m_bytes.str("");
        m_bytes.clear();
        mgr.Archive(m_storage);
        return m_bytes.str();
    }
    void RestoreFrom(Qmx_CorrRelDataMgr& mgr, const std::string& bytes) {
        m_bytes.str(bytes);
        m_bytes.clear();
        m_stream.SeekPos(0);
        mgr.Restore(m_storage);
    }

    std::stringstream m_bytes;
    Qmx_CorrStream_Internal m_stream;
    Qmx_CorrStorageData m_data;
    Qmx_CorrStorage m_storage;
    FakeOwner m_owner;
    Qmx_CorrRelDataMgr& m_mgr = *m_owner.GetRelDataMgr();
};

// Slot 1 a named record two holders share, slot 2 a record its relationship holds, slot 3 a
// record whose relationship was unloaded, slot 4 freed.
const std::string kTable = U32(0) + U32(1) + U32(4) +                                 //
                           U8(1) + U32(0) + Str("derives") +                          //
                           U8(2) + U32(1) + Str("p") + U32(0) + U32(7) + Str("") +    //
                           U8(1) + U32(1) + Str("q") + U32(1) + Str("v") + Str("") +  //
                           U8(0);

TEST_F(CorrRelDataMgrTest, DatabaseWithoutPropertiesWritesNoSlots) {
    DataRelationship r1(m_mgr);
    DataRelationship r2(m_mgr);
    EXPECT_EQ(Archived(m_mgr), U32(0) + U32(0) + U32(0));
    r1.Release();
    r2.Release();
    // Held by the manager and its slot alone, the default still is never freed.
    m_mgr.ReleaseData(m_mgr.GetDefaultData());
    EXPECT_EQ(m_mgr.GetData(0), m_mgr.GetDefaultData());
    EXPECT_EQ(m_mgr.GetFreeSlots(), 0u);
}

TEST_F(CorrRelDataMgrTest, KindTwoIsARecordHeldByOneRelationship) {
    const Record named = m_mgr.CreateData("derives");
    const Record sharer = named;
    DataRelationship held(m_mgr);
    held.SetProperty_INT32("p", 7, nullptr);
    auto unloaded = std::make_unique<DataRelationship>(m_mgr);
    unloaded->SetProperty_String("q", "v", nullptr);
    unloaded.reset();
    DataRelationship deleted(m_mgr);
    deleted.SetProperty_INT32("gone", 1, nullptr);
    deleted.Release();
    EXPECT_EQ(Archived(m_mgr), kTable);
}

TEST_F(CorrRelDataMgrTest, RestoreKeepsTheDefaultAndBringsBackNamesAndProperties) {
    FakeOwner reopened;
    Qmx_CorrRelDataMgr& mgr = *reopened.GetRelDataMgr();
    const Record before = mgr.GetDefaultData();
    const Record dropped = mgr.CreateData("old");
    RestoreFrom(mgr, kTable);
    ASSERT_EQ(mgr.GetSlotCount(), 5u);
    EXPECT_EQ(mgr.GetData(0), before);
    EXPECT_EQ(mgr.GetDefaultData(), before);
    EXPECT_THROW(mgr.GetIndex(dropped.get()), Qmx_CorrException::InvalidRequest);
    EXPECT_EQ(mgr.GetData(1)->GetName(), "derives");
    EXPECT_EQ(mgr.GetData(2)->GetProperties().at("p").GetINT32(), 7);
    EXPECT_EQ(mgr.GetData(3)->GetProperties().at("q").GetString(), "v");
    EXPECT_EQ(mgr.GetData(3)->GetOwner(), &reopened);
    EXPECT_EQ(mgr.GetData(4), Record());
    EXPECT_EQ(mgr.GetFreeSlots(), 1u);
    // The freed slot is the next one used.
    DataRelationship r(mgr);
    r.SetProperty_INT32("n", 1, nullptr);
    EXPECT_EQ(mgr.GetIndex(r.GetRecord().get()), 4u);
    EXPECT_EQ(mgr.GetFreeSlots(), 0u);
}

TEST_F(CorrRelDataMgrTest, DamagedStreamsAreRefusedWithTheStorageName) {
    const std::string refused =
        "Qmx_CorrException::InvalidDatabaseFormat. Unable to read 'store.cpd'.\n";
    const std::string cases[] = {
        U32(1) + U32(0) + U32(0),
        U32(0) + U32(0) + U32(1) + U8(3) + U32(0) + Str(""),
        U32(0) + U32(0) + U32(0xFFFFFFFF) + U8(0),
    };
    for (const std::string& bytes : cases) {
        EXPECT_THAT([&] { RestoreFrom(m_mgr, bytes); },
                    ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(StrEq(refused)));
        EXPECT_EQ(m_mgr.GetSlotCount(), 1u);
        EXPECT_EQ(m_mgr.GetData(0), m_mgr.GetDefaultData());
    }
}

TEST_F(CorrRelDataMgrTest, WritingGivesASharedRelationshipAFreshRecord) {
    DataRelationship first(m_mgr);
    DataRelationship second(m_mgr);
    first.SetProperty_String("why", "copy", nullptr);
    const Record own = first.GetRecord();
    EXPECT_NE(own, m_mgr.GetDefaultData());
    EXPECT_EQ(own->GetName(), m_mgr.GetDefaultData()->GetName());
    EXPECT_EQ(m_mgr.GetIndex(own.get()), 1u);
    EXPECT_EQ(second.GetRecord(), m_mgr.GetDefaultData());
    EXPECT_TRUE(m_mgr.GetDefaultData()->GetProperties().empty());
    // Shared by a copy, the record is left to the copy; the writer starts empty again.
    DataRelationship copy(first);
    first.SetProperty_INT32("n", 2, nullptr);
    EXPECT_EQ(copy.GetRecord(), own);
    EXPECT_EQ(m_mgr.GetIndex(first.GetRecord().get()), 2u);
    EXPECT_FALSE(first.HasProperty("why"));
    EXPECT_EQ(copy.GetProperty_String("why", nullptr), "copy");
    // Held alone, it is written in place.
    first.SetProperty_INT32("n", 3, nullptr);
    EXPECT_EQ(m_mgr.GetIndex(first.GetRecord().get()), 2u);
    EXPECT_EQ(m_mgr.GetSlotCount(), 3u);
}

}  // namespace
