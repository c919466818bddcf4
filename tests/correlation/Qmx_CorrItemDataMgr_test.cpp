// The item record table: its stream bytes, the kinds that decide which records come back as
// container defaults, the slot rules, and damaged streams.
#include "Qmx_CorrItemDataMgr.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <sstream>
#include <string>

#include "../support/FakeOwner.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStream_Internal.h"

namespace {

using qmxtest::DataItem;
using qmxtest::FakeOwner;
using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Record = boost::shared_ptr<Qmx_CorrItemData>;

std::string U32(unsigned int v) {
    std::string bytes;
    for (int shift = 0; shift < 32; shift += 8) bytes += static_cast<char>((v >> shift) & 0xFF);
    return bytes;
}
std::string U8(unsigned char v) { return std::string(1, static_cast<char>(v)); }
std::string Str(const std::string& s) { return U32(static_cast<unsigned int>(s.size())) + s; }
// A property map record holding one INT32 property, or none.
std::string NoProps() { return U32(0); }
std::string IntProp(const std::string& name, unsigned int value) {
    return U32(1) + Str(name) + U32(0) + U32(value);
}

// Stand-ins for containers: only their addresses are stored and compared.
Qmx_CorrManagedContainer* Managed(std::uintptr_t n) {
    return reinterpret_cast<Qmx_CorrManagedContainer*>(n * 16);
}
Qmx_CorrContainer* Container(std::uintptr_t n) {
    return reinterpret_cast<Qmx_CorrContainer*>(Managed(n));
}

const std::string kRefused =
    "Qmx_CorrException::InvalidDatabaseFormat. Unable to read 'store.cpd'.\n";

class CorrItemDataMgrTest : public ::testing::Test {
protected:
    // The stream carries another name than the storage, so that a refusal by a reader's own
    // check can be told from a read that ran past the end.
    CorrItemDataMgrTest()
        : m_stream(&m_bytes, "stream.cpd"), m_storage("store.cpd", &m_stream, m_data) {
        m_data.containers = {nullptr, Managed(1), Managed(2)};
    }

    std::string Archived(const Qmx_CorrItemDataMgr& mgr) {
        m_bytes.str("");
        m_bytes.clear();
        mgr.Archive(m_storage);
        return m_bytes.str();
    }
    void RestoreFrom(Qmx_CorrItemDataMgr& mgr, const std::string& bytes) {
        m_bytes.str(bytes);
        m_bytes.clear();
        m_stream.SeekPos(0);
        mgr.Restore(m_storage);
    }
    // Restoring into another database whose containers came back at new addresses.
    Qmx_CorrItemDataMgr& Reopened() {
        m_data.containers = {nullptr, Managed(101), Managed(102)};
        return *m_reopened.GetItemDataMgr();
    }

    std::stringstream m_bytes;
    Qmx_CorrStream_Internal m_stream;
    Qmx_CorrStorageData m_data;
    Qmx_CorrStorage m_storage;
    FakeOwner m_owner;
    FakeOwner m_reopened;
    Qmx_CorrItemDataMgr& m_mgr = *m_owner.GetItemDataMgr();
};

// Slot 0 the default of container 1 (an item holds it), slot 1 the default of container 2 (no
// item holds it any more), slot 2 a private record whose item was unloaded, slot 3 freed.
const std::string kTable = U32(0) + U32(1) + U32(4) +                   //
                           U8(1) + NoProps() + U32(1) +                 //
                           U8(1) + NoProps() + U32(2) +                 //
                           U8(2) + IntProp("w", 0xFFFFFFFB) + U32(1) +  //
                           U8(0);

TEST_F(CorrItemDataMgrTest, KindsFollowTheDefaultsNotTheHolderCounts) {
    DataItem a1(m_mgr, Container(1), "a1");
    auto b1 = std::make_unique<DataItem>(m_mgr, Container(2), "b1");
    auto a2 = std::make_unique<DataItem>(m_mgr, Container(1), "a2");
    a2->SetProperty_INT32("w", -5, nullptr);
    DataItem a3(m_mgr, Container(1), "a3");
    a3.SetProperty_String("s", "gone", nullptr);
    a3.Release();
    b1.reset();
    a2.reset();
    EXPECT_EQ(Archived(m_mgr), kTable);
}

TEST_F(CorrItemDataMgrTest, RestoreMakesOnlyKindOneRecordsDefaults) {
    Qmx_CorrItemDataMgr& mgr = Reopened();
    RestoreFrom(mgr, kTable);
    ASSERT_EQ(mgr.GetSlotCount(), 4u);
    EXPECT_EQ(mgr.GetFreeSlots(), 1u);
    EXPECT_EQ(mgr.GetData(3), Record());
    EXPECT_EQ(mgr.GetDefaultData(Container(101)), mgr.GetData(0));
    EXPECT_EQ(mgr.GetDefaultData(Container(102)), mgr.GetData(1));
    // The private record keeps its properties for its own item only.
    const Record priv = mgr.GetData(2);
    EXPECT_EQ(priv->GetContainer(), Container(101));
    EXPECT_EQ(priv->GetProperties().at("w").GetINT32(), -5);
    DataItem newcomer(mgr, Container(101), "a4");
    EXPECT_FALSE(newcomer.HasProperty("w"));
    // Written again, the table is the same bytes.
    EXPECT_EQ(Archived(mgr), kTable);
}

TEST_F(CorrItemDataMgrTest, LaterDefaultOfAContainerWins) {
    RestoreFrom(m_mgr, U32(0) + U32(0) + U32(2) + U8(1) + NoProps() + U32(1) + U8(1) +
                           IntProp("late", 1) + U32(1));
    EXPECT_EQ(m_mgr.GetDefaultData(Container(1)), m_mgr.GetData(1));
    DataItem item(m_mgr, Container(1), "i");
    EXPECT_EQ(item.GetProperty_INT32("late", nullptr), 1);
    // The earlier record is no default any more and is written as such.
    EXPECT_EQ(Archived(m_mgr).substr(12, 1), U8(2));
}

TEST_F(CorrItemDataMgrTest, DamagedStreamsAreRefusedWithTheStorageName) {
    const struct {
        const char* what;
        std::string bytes;
        std::size_t slotsKept;
    } cases[] = {
        {"format 1", U32(1) + U32(0) + U32(0), 0},
        {"kind 3", U32(0) + U32(0) + U32(2) + U8(0) + U8(3) + NoProps() + U32(0), 1},
        {"kind 255", U32(0) + U32(0) + U32(1) + U8(255) + NoProps() + U32(0), 0},
        // Checked before the loop: reading would run out at the second slot.
        {"two slots, one byte", U32(0) + U32(0) + U32(2) + U8(0), 0},
        // 64 GiB of slots if it were reserved.
        {"absurd slot count", U32(0) + U32(0) + U32(0xFFFFFFFF) + U8(0), 0},
    };
    for (const auto& c : cases) {
        Qmx_CorrItemDataMgr mgr(&m_owner);
        EXPECT_THAT([&] { RestoreFrom(mgr, c.bytes); },
                    ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(StrEq(kRefused)))
            << c.what;
        EXPECT_EQ(mgr.GetSlotCount(), c.slotsKept) << c.what;
    }
}

TEST_F(CorrItemDataMgrTest, LookupsOutsideTheTableAreInvalidRequests) {
    const Record kept = m_mgr.CreateData(Container(1));
    // Held by the table and this test only, as a deleted item's record is.
    const Record released = m_mgr.CreateData(Container(1));
    m_mgr.ReleaseData(released);
    ASSERT_EQ(m_mgr.GetSlotCount(), 2u);
    EXPECT_EQ(m_mgr.GetData(0), kept);
    EXPECT_EQ(m_mgr.GetData(1), Record());
    EXPECT_THAT([&] { m_mgr.GetData(2); },
                ThrowsMessage<Qmx_CorrException::InvalidRequest>(
                    StrEq("Qmx_CorrException::InvalidRequest.  "
                          "'Qmx_CorrItemDataMgr::GetData: index beyond the table'\n")));
    EXPECT_THAT([&] { m_mgr.GetIndex(released.get()); },
                ThrowsMessage<Qmx_CorrException::InvalidRequest>(
                    StrEq("Qmx_CorrException::InvalidRequest.  "
                          "'Qmx_CorrItemDataMgr::GetIndex: the record is in no slot'\n")));
    const Record stranger = m_reopened.GetItemDataMgr()->GetDefaultData(Container(1));
    EXPECT_THROW(m_mgr.GetIndex(stranger.get()), Qmx_CorrException::InvalidRequest);
}

TEST_F(CorrItemDataMgrTest, ReleaseFreesOnlyARecordItsItemHeldAlone) {
    DataItem a1(m_mgr, Container(1), "a1");
    DataItem a2(m_mgr, Container(1), "a2");
    DataItem kept(m_mgr, Container(1), "k");
    kept.SetProperty_INT32("p", 1, nullptr);
    DataItem p1(m_mgr, Container(1), "p1");
    p1.SetProperty_INT32("p", 2, nullptr);
    DataItem p2(m_mgr, Container(1), "p2");
    p2.SetProperty_INT32("p", 3, nullptr);
    const Record alsoHeld = kept.GetRecord();

    a1.Release();    // the default, still used by a2
    kept.Release();  // held elsewhere too
    EXPECT_EQ(m_mgr.GetFreeSlots(), 0u);
    EXPECT_EQ(m_mgr.GetIndex(alsoHeld.get()), 1u);
    p2.Release();
    p1.Release();
    EXPECT_EQ(Archived(m_mgr).substr(4, 4), U32(2));
    EXPECT_EQ(m_mgr.GetData(2), Record());

    const Record reused = m_mgr.CreateData(Container(2));
    EXPECT_EQ(m_mgr.GetIndex(reused.get()), 2u);
    EXPECT_EQ(Archived(m_mgr).substr(4, 4), U32(1));
    EXPECT_EQ(m_mgr.GetSlotCount(), 4u);
}

TEST_F(CorrItemDataMgrTest, RemovingAContainerFreesItsDefaultWhoeverHoldsIt) {
    DataItem a1(m_mgr, Container(1), "a1");
    DataItem b1(m_mgr, Container(2), "b1");
    m_mgr.RemoveContainer(Container(3));  // never had a default
    m_mgr.RemoveContainer(Container(1));
    EXPECT_EQ(m_mgr.GetData(0), Record());
    EXPECT_EQ(m_mgr.GetFreeSlots(), 1u);
    EXPECT_THROW(m_mgr.GetIndex(a1.GetRecord().get()), Qmx_CorrException::InvalidRequest);
    // Asked again, the container gets a fresh default in the freed slot.
    const Record fresh = m_mgr.GetDefaultData(Container(1));
    EXPECT_NE(fresh, a1.GetRecord());
    EXPECT_EQ(m_mgr.GetIndex(fresh.get()), 0u);
    EXPECT_EQ(m_mgr.GetFreeSlots(), 0u);
    // Releasing the orphan touches no slot.
    a1.Release();
    EXPECT_EQ(m_mgr.GetData(0), fresh);
    EXPECT_EQ(m_mgr.GetData(1), b1.GetRecord());
}

TEST_F(CorrItemDataMgrTest, FreeSlotCounterIsKeptAsStored) {
    // Three free slots announced, one null slot stored.
    RestoreFrom(m_mgr, U32(0) + U32(3) + U32(2) + U8(0) + U8(2) + NoProps() + U32(1));
    EXPECT_EQ(m_mgr.GetFreeSlots(), 3u);
    EXPECT_EQ(m_mgr.GetIndex(m_mgr.CreateData(Container(1)).get()), 0u);
    EXPECT_EQ(m_mgr.GetFreeSlots(), 2u);
    EXPECT_EQ(m_mgr.GetIndex(m_mgr.CreateData(Container(1)).get()), 2u);
    EXPECT_EQ(m_mgr.GetFreeSlots(), 0u);
    // No free slot announced, one null slot stored: the null slot stays unused.
    RestoreFrom(m_mgr, U32(0) + U32(0) + U32(1) + U8(0));
    EXPECT_EQ(m_mgr.GetIndex(m_mgr.CreateData(Container(1)).get()), 1u);
    EXPECT_EQ(m_mgr.GetData(0), Record());
}

}  // namespace
