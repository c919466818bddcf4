// The name repository in memory: slot placement and reuse, references and holders, byte-wise
// order, invalid handles, and the two values of a name inside an object record.
#include "Qmx_CorrNameRepo_Basic.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <sstream>
#include <string>
#include <vector>

#include "Qmx_CorrName_Basic.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStorageData.h"
#include "Qmx_CorrStream_Internal.h"

namespace {

using Handle = Qmx_CorrNameHandle;

class ForeignName : public Qmx_CorrName {};  // a record of some other repository kind

const Qmx_CorrName_Basic& Record(Handle h) {
    return *dynamic_cast<const Qmx_CorrName_Basic*>(h.GetRecord());
}

std::string U32(unsigned int v) {
    std::string bytes(4, '\0');
    for (int i = 0; i < 4; ++i) bytes[i] = static_cast<char>((v >> (8 * i)) & 0xFF);
    return bytes;
}

class NameRepo : public ::testing::Test {
protected:
    // Every handle a test still holds is given back at the end, so that a record destroyed
    // too early shows up under the address sanitizer and one never destroyed as a leak.
    void TearDown() override {
        for (Handle h : m_held) m_repo.ReleaseName(h);
    }

    Handle Create(const std::string& text) { return Hold(m_repo.CreateName(text)); }
    Handle Copy(Handle h) { return Hold(m_repo.CopyName(h)); }
    void Release(Handle h) { m_repo.ReleaseName(Forget(h)); }
    void Discard(Handle h) { m_repo.DiscardName(Forget(h)); }
    unsigned int IndexOf(Handle h) { return Record(h).GetIndex(); }

    // A record read from an object record holding `refCount` and `index`.
    Handle Restored(unsigned int refCount, unsigned int index) {
        m_buffer.clear();
        m_buffer.str(U32(refCount) + U32(index));
        return Hold(m_repo.RestoreName(m_storage));
    }
    // What ArchiveName writes for `h` into an object record.
    std::string Archived(Handle h) {
        m_buffer.clear();
        m_buffer.str("");
        m_repo.ArchiveName(m_storage, h);
        m_stream.Flush();
        return m_buffer.str();
    }
    void ExpectCounters(std::size_t size, unsigned int firstFree, unsigned int freeCount) {
        EXPECT_EQ(m_repo.GetTableSize(), size);
        EXPECT_EQ(m_repo.GetFirstFreeSlot(), firstFree);
        EXPECT_EQ(m_repo.GetFreeCount(), freeCount);
    }

    Qmx_CorrNameRepo_Basic m_repo;

private:
    Handle Hold(Handle h) {
        m_held.push_back(h);
        return h;
    }
    Handle Forget(Handle h) {
        auto it = std::find_if(m_held.begin(), m_held.end(),
                               [h](Handle held) { return held.GetRecord() == h.GetRecord(); });
        if (it != m_held.end()) m_held.erase(it);
        return h;
    }

    std::vector<Handle> m_held;
    std::stringstream m_buffer{std::ios::in | std::ios::out | std::ios::binary};
    Qmx_CorrStream_Internal m_stream{&m_buffer};
    Qmx_CorrStorageData m_data;
    Qmx_CorrStorage m_storage{"names.cpd", &m_stream, m_data};
};

TEST_F(NameRepo, SlotsAreAppendedThenReusedLowestFirst) {
    ExpectCounters(1, 0, 0);
    std::vector<Handle> names = {Create("a"), Create("a")};
    EXPECT_EQ(IndexOf(names[0]), 1u);
    EXPECT_EQ(IndexOf(names[1]), 2u);
    EXPECT_EQ(Record(names[1]).GetRefCount(), 1u);
    for (const char* text : {"n3", "n4", "n5", "n6"}) names.push_back(Create(text));
    Release(names[4]);
    Release(names[2]);
    ExpectCounters(7, 3, 2);
    EXPECT_EQ(IndexOf(Create("x")), 3u);
    ExpectCounters(7, 5, 1);
    Release(names[0]);  // below the first free slot
    ExpectCounters(7, 1, 2);
    EXPECT_EQ(IndexOf(Create("y")), 1u);
    EXPECT_EQ(IndexOf(Create("z")), 5u);
    ExpectCounters(7, 0, 0);
    EXPECT_EQ(IndexOf(Create("w")), 7u);
    EXPECT_EQ(m_repo.GetString(names[1]), "a");
}

TEST_F(NameRepo, SlotStaysUntilItsLastReferenceGoes) {
    Handle original = Create("top");
    Handle copy = Copy(original);
    EXPECT_EQ(copy.GetRecord(), original.GetRecord());
    EXPECT_EQ(Record(copy).GetRefCount(), 2u);
    Release(original);
    EXPECT_EQ(m_repo.GetString(copy), "top");
    EXPECT_EQ(Record(copy).GetRefCount(), 1u);
    ExpectCounters(2, 0, 0);
    Release(copy);
    ExpectCounters(2, 1, 1);
}

TEST_F(NameRepo, EmptyTextIsTheUncountedNullRecord) {
    Handle empty = Create("");
    EXPECT_EQ(empty.GetRecord(), m_repo.GetNullName().GetRecord());
    EXPECT_EQ(Copy(empty).GetRecord(), empty.GetRecord());
    Release(empty);
    Discard(empty);
    EXPECT_EQ(Record(m_repo.GetNullName()).GetRefCount(), 0u);
    EXPECT_EQ(Archived(m_repo.GetNullName()), U32(0) + U32(0));
    ExpectCounters(1, 0, 0);
}

// An item made from another item's name shares its record; unloading one of them used to
// destroy the record under the other.
TEST_F(NameRepo, SharedRecordOutlivesTheHolderThatLeavesMemory) {
    for (Handle first : {Create("u1"), Restored(1, 1)}) {
        Handle second = Copy(first);
        Discard(first);
        EXPECT_EQ(m_repo.GetString(second), "u1");
        EXPECT_EQ(Record(second).GetHolderCount(), 1u);
        // The unloaded holder still names the text in the database.
        EXPECT_EQ(Archived(second), U32(2) + U32(1));
    }
}

TEST_F(NameRepo, OrderIsByUnsignedBytesWithPrefixFirst) {
    struct Case {
        std::string left, right;
        bool less, greater;
    };
    const std::vector<Case> cases = {
        {"ab", "abc", true, false},
        {"B", "a", true, false},
        {"z", "\xE9", true, false},
        {"\x7F", "\x80", true, false},
        {std::string("a\0b", 3), std::string("a\0c", 3), true, false},
        {std::string("a\0", 2), "a", false, true},
        {"same", "same", false, false},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.left + " / " + c.right);
        Handle left = Create(c.left);
        Handle right = Create(c.right);
        EXPECT_EQ(m_repo.IsLess(left, right), c.less);
        EXPECT_EQ(m_repo.IsLess(right, left), c.greater);
        EXPECT_EQ(m_repo.IsEqual(left, right), !c.less && !c.greater);
    }
    EXPECT_TRUE(m_repo.IsLess(m_repo.GetNullName(), Create("a")));
}

TEST_F(NameRepo, InvalidHandlesReadEmptyAndChangeNothing) {
    Qmx_CorrNameRepo_Basic other;
    Handle fromOther = other.CreateName("a");
    ForeignName foreign;
    Handle valid = Create("a");
    const std::vector<Handle> invalid = {Handle(), Handle(&foreign), Restored(1, 7), fromOther};
    for (std::size_t i = 0; i < invalid.size(); ++i) {
        SCOPED_TRACE(i);
        Handle h = invalid[i];
        EXPECT_EQ(m_repo.GetString(h), "");
        EXPECT_TRUE(m_repo.IsEqual(h, h));
        EXPECT_FALSE(m_repo.IsEqual(h, valid));
        EXPECT_FALSE(m_repo.IsEqual(m_repo.GetNullName(), h));
        EXPECT_FALSE(m_repo.IsLess(h, valid));
        EXPECT_FALSE(m_repo.IsLess(valid, h));
        EXPECT_EQ(Archived(h), std::string(8, '\0'));
    }
    EXPECT_EQ(m_repo.CopyName(Handle(&foreign)).GetRecord(), m_repo.GetNullName().GetRecord());
    m_repo.ReleaseName(Handle());
    m_repo.DiscardName(Handle(&foreign));
    // A name of another repository must not free the slot of the same index here.
    m_repo.ReleaseName(fromOther);
    ExpectCounters(2, 0, 0);
    EXPECT_EQ(other.GetFreeCount(), 0u);
}

TEST_F(NameRepo, RestoredNameKeepsItsStoredValues) {
    Create("a");
    Handle restored = Restored(0x01020304, 1);
    EXPECT_EQ(Record(restored).GetRefCount(), 0x01020304u);
    EXPECT_EQ(Archived(restored), U32(0x01020304) + U32(1));
    EXPECT_EQ(IndexOf(Restored(5, 2)), 2u);
    // A restored empty name is a record of its own, destroyed with its holder in TearDown.
    Handle empty = Restored(0, 0);
    EXPECT_NE(empty.GetRecord(), m_repo.GetNullName().GetRecord());
    EXPECT_TRUE(m_repo.IsEqual(empty, m_repo.GetNullName()));
    EXPECT_EQ(m_repo.CopyName(empty).GetRecord(), m_repo.GetNullName().GetRecord());
}

// Object records written at different times may carry stale counts. A slot freed twice must
// be counted once, or the stored counters disagree with the table and the database cannot be
// opened again; a damaged count of 0 must not free a slot still in use.
TEST_F(NameRepo, StaleRecordsKeepTheFreeListTrue) {
    Create("a");
    Create("b");
    Release(Restored(1, 2));
    Release(Restored(1, 2));
    ExpectCounters(3, 2, 1);
    Release(Restored(0, 1));
    ExpectCounters(3, 2, 1);
    EXPECT_EQ(m_repo.GetString(Restored(1, 1)), "a");
}

TEST(NameRepoDefault, OneRepositoryServesEveryHostWithoutItsOwn) {
    Qmx_CorrNameRepo_Basic* repo = Qmx_CorrNameRepo_Basic::GetDefault();
    ASSERT_NE(repo, nullptr);
    EXPECT_EQ(Qmx_CorrNameRepo_Basic::GetDefault(), repo);
    Handle h = repo->CreateName("shared");
    EXPECT_EQ(Qmx_CorrNameRepo_Basic::GetDefault()->GetString(h), "shared");
    repo->ReleaseName(h);
}

}  // namespace
