// The pooled explicit relationship: the invariants its add and remove operations keep, the
// link mirrored on the items, its record with two inline handles a side and the overflow
// lists beyond, damaged records, deletion, validation, trace and dump.
#include "Qmx_CorrManagedExplicitRelationship.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <initializer_list>
#include <new>
#include <sstream>
#include <string>
#include <vector>

#include "Qmx_CorrDataMgr.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrMgr.h"
#include "Qmx_CorrRelDataMgr.h"
#include "Qmx_CorrRelItemOverflowMgr.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStorageData.h"
#include "Qmx_CorrStream_Internal.h"
#include "Vesk_MsgManData.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::MatchesRegex;
using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Item = Qmx_CorrManagedItem;
using Rel = Qmx_CorrManagedExplicitRelationship;
using Handles = std::vector<unsigned int>;

constexpr const char* kStorageName = "rels.cpd";
constexpr const char* kIdentical =
    "Qmx_CorrException::SrcAndDstIdentical. Both the source and correlation items provided are "
    "the same item.\n";

std::string U32(unsigned int v) {
    std::string bytes;
    for (int shift = 0; shift < 32; shift += 8) bytes += static_cast<char>((v >> shift) & 0xFF);
    return bytes;
}

std::string Words(std::initializer_list<unsigned int> values) {
    std::string bytes;
    for (unsigned int v : values) bytes += U32(v);
    return bytes;
}

std::string InvalidFormat(const std::string& name) {
    return "Qmx_CorrException::InvalidDatabaseFormat. Unable to read '" + name + "'.\n";
}

template <class T>
std::vector<T> Listed(const Qmx_SingleOptContainerT<T>& list) {
    return std::vector<T>(list.begin(), list.end());
}

template <class Step>
std::string DebugOutputOf(Step step) {
    Vesk_MsgManData::SetDebugOutput(true);
    ::testing::internal::CaptureStderr();
    step();
    std::string text = ::testing::internal::GetCapturedStderr();
    Vesk_MsgManData::SetDebugOutput(false);
    return text;
}

// The BUILD records written while `step` runs.
template <class Step>
std::string BuildTraceOf(Step step) {
    std::ostringstream out;
    Qmx_CorrDbg::s_Tracer->SetOutput(out);
    Qmx_CorrDbg::s_Tracer->SetTraceLevel("BUILD", 10);
    step();
    Qmx_CorrDbg::s_Tracer->RemoveTrace("BUILD");
    Qmx_CorrDbg::s_Tracer->SetOutput(std::clog);
    return out.str();
}

class CorrManagedExplicitRelationshipTest : public ::testing::Test {
protected:
    CorrManagedExplicitRelationshipTest()
        : m_mgr("", "", Qmx_CorrMgr::DB_READ_WRITE, nullptr),
          m_stream(&m_bytes, kStorageName),
          m_storage(kStorageName, &m_stream, m_storageData) {}

    Qmx_CorrContainer* Top() { return m_mgr.GetTopContainer(); }
    Qmx_CorrDataMgr& Data() {
        return *static_cast<Qmx_CorrDataMgr*>(
            static_cast<Qmx_CorrManagedContainer*>(Top())->GetOwner());
    }
    Item* MakeItem(const char* name) { return static_cast<Item*>(Top()->CreateItem(name)); }
    Rel* Relate(Item* src, Item* dst) {
        return static_cast<Rel*>(m_mgr.CreateExplicitRelationship(src, dst));
    }
    unsigned int HandleOf(const Item* item) { return Data().GetItemHandle(item); }
    unsigned int HandleOf(const Rel* rel) { return Data().GetManagedExpRelMgr()->GetHandle(rel); }
    Handles Overflow(const Rel* rel, int selector) {
        return Data().GetRelItemOverflowMgr()->GetList(rel, selector);
    }

    std::string Archive(const Rel* rel) {
        m_bytes.str("");
        m_bytes.clear();
        rel->Archive(m_storage);
        return m_bytes.str();
    }
    void Load(const std::string& record) {
        m_bytes.str(record);
        m_bytes.clear();
        m_stream.SeekPos(0);
    }
    // Writes the record and rebuilds the relationship from it where it stands, as reloading
    // its pool does; returns the record.
    std::string RoundTrip(Rel* rel) {
        const std::string record = Archive(rel);
        Qmx_CorrObjectOwner* const owner = rel->GetOwner();
        rel->~Rel();
        Load(record);
        new (rel) Rel(m_storage, owner);
        EXPECT_EQ(m_stream.BytesLeft(), 0);
        return record;
    }
    // Rebuilds the relationship in place from a record made by hand. REQUIRES: the record
    // is read without an exception.
    void Replace(Rel* rel, const std::string& record) {
        Qmx_CorrObjectOwner* const owner = rel->GetOwner();
        rel->~Rel();
        Load(record);
        new (rel) Rel(m_storage, owner);
    }
    void ReadAlone(const std::string& record) {
        Load(record);
        Rel rel(m_storage, &Data());
    }

    Qmx_CorrMgr m_mgr;
    std::stringstream m_bytes;
    Qmx_CorrStream_Internal m_stream;
    Qmx_CorrStorageData m_storageData;
    Qmx_CorrStorage m_storage;
};

TEST_F(CorrManagedExplicitRelationshipTest, AddingKeepsEachItemOnOneSideOnce) {
    Item* s = MakeItem("s");
    Item* d = MakeItem("d");
    Rel* rel = Relate(s, d);
    for (int attempt = 0; attempt < 2; ++attempt) {
        EXPECT_THAT([&] { rel->AddSrcItem(d); },
                    ThrowsMessage<Qmx_CorrException::SrcAndDstIdentical>(StrEq(kIdentical)));
        EXPECT_THAT([&] { rel->AddDstItem(s); },
                    ThrowsMessage<Qmx_CorrException::SrcAndDstIdentical>(StrEq(kIdentical)));
    }
    rel->AddSrcItem(s);
    rel->AddDstItem(d);
    EXPECT_THAT(rel->GetSrcHandles().ToVector(), ElementsAre(HandleOf(s)));
    EXPECT_THAT(rel->GetDstHandles().ToVector(), ElementsAre(HandleOf(d)));
    EXPECT_THAT(s->GetOutgoingHandles().ToVector(), ElementsAre(HandleOf(rel)));
    EXPECT_THAT(d->GetIncomingHandles().ToVector(), ElementsAre(HandleOf(rel)));
    EXPECT_EQ(s->GetIncomingHandles().Size() + d->GetOutgoingHandles().Size(), 0u);
    EXPECT_THAT([&] { rel->AddSrcItem(nullptr); },
                ThrowsMessage<Qmx_CorrException::InvalidSrcItem>(
                    StrEq("Qmx_CorrException::InvalidSrcItem.")));
    EXPECT_THAT([&] { rel->AddDstItem(nullptr); },
                ThrowsMessage<Qmx_CorrException::InvalidDstItem>(
                    StrEq("Qmx_CorrException::InvalidDstItem.")));
    EXPECT_TRUE(rel->DbgValidateState());
}

TEST_F(CorrManagedExplicitRelationshipTest, ItemsOfAnotherDatabaseAreRefused) {
    Qmx_CorrMgr other("", "", Qmx_CorrMgr::DB_READ_WRITE, nullptr);
    Qmx_CorrItem* foreign = other.GetTopContainer()->CreateItem("far");
    Rel* rel = Relate(MakeItem("s"), MakeItem("d"));
    EXPECT_THAT([&] { rel->AddSrcItem(foreign); },
                ThrowsMessage<Qmx_CorrException::InvalidSrcItem>(
                    StrEq("Qmx_CorrException::InvalidSrcItem. The correlation item '/far' is not a "
                          "valid relationship source for the attempted operation.")));
    EXPECT_THAT([&] { rel->AddDstItem(foreign); },
                ThrowsMessage<Qmx_CorrException::InvalidDstItem>(
                    StrEq("Qmx_CorrException::InvalidDstItem. The correlation item '/far' is not a "
                          "valid relationship destination for the attempted operation.")));
    EXPECT_EQ(rel->GetSrcHandles().Size() + rel->GetDstHandles().Size(), 2u);
    EXPECT_TRUE(foreign->GetOutgoingRelationships().empty());
    EXPECT_TRUE(foreign->GetIncomingRelationships().empty());
}

TEST_F(CorrManagedExplicitRelationshipTest, RemovingUnlinksAndKeepsAnEmptySide) {
    Item* s = MakeItem("s");
    Item* d = MakeItem("d");
    Item* stranger = MakeItem("stranger");
    Rel* rel = Relate(s, d);
    rel->RemoveDstItem(stranger);
    rel->RemoveDstItem(s);
    rel->RemoveSrcItem(nullptr);
    EXPECT_EQ(rel->GetDstHandles().Size(), 1u);
    rel->RemoveDstItem(d);
    EXPECT_TRUE(rel->GetDstItems().empty());
    EXPECT_TRUE(d->GetIncomingRelationships().empty());
    EXPECT_THAT(Listed(rel->GetSrcItems()), ElementsAre(s));
    EXPECT_THAT(Listed(s->GetOutgoingRelationships()), ElementsAre(rel));
    rel->RemoveSrcItem(s);
    EXPECT_TRUE(s->GetOutgoingRelationships().empty());
    EXPECT_EQ(Data().GetExpRelPtr(HandleOf(rel)), rel);
}

TEST_F(CorrManagedExplicitRelationshipTest, OnlyAddingASourceIsTraced) {
    Item* s = MakeItem("s");
    Item* d = MakeItem("d");
    Rel* rel = Relate(s, d);
    Item* s2 = MakeItem("s2");
    EXPECT_THAT(BuildTraceOf([&] { rel->AddSrcItem(s2); }),
                MatchesRegex("QMX_CORR_TRACE:BUILD:10:s/Qmx_CorrManagedExplicitRelationship"
                             "\\([0-9]+\\): Adding item '/s2' to explicit relationship\\.\n"));
    EXPECT_EQ(BuildTraceOf([&] { rel->AddSrcItem(s2); }), "");
    Item* d2 = MakeItem("d2");
    EXPECT_EQ(BuildTraceOf([&] { rel->AddDstItem(d2); }), "");
    EXPECT_EQ(rel->GetDstHandles().Size(), 2u);
}

TEST_F(CorrManagedExplicitRelationshipTest, OneItemASideLeavesTheOtherSlotsZero) {
    Item* s = MakeItem("s");
    Item* d = MakeItem("d");
    Rel* rel = Relate(s, d);
    m_storageData.expRelVersion = 0;
    const std::string record = RoundTrip(rel);
    EXPECT_EQ(m_storageData.expRelVersion, 1u);
    EXPECT_EQ(Rel::GetArchiveSize(&Data()), 28u);
    EXPECT_EQ(record, Words({0, 1, HandleOf(s), 0, 1, HandleOf(d), 0}));
    EXPECT_THAT(Overflow(rel, 0), IsEmpty());
    EXPECT_THAT(Overflow(rel, 1), IsEmpty());
    EXPECT_THAT(Listed(rel->GetSrcItems()), ElementsAre(s));
    EXPECT_THAT(Listed(rel->GetDstItems()), ElementsAre(d));
}

TEST_F(CorrManagedExplicitRelationshipTest, ThreeItemsASideGoToTheOverflowLists) {
    Item *a = MakeItem("a"), *b = MakeItem("b"), *c = MakeItem("c");
    Item *p = MakeItem("p"), *q = MakeItem("q"), *r = MakeItem("r");
    Rel* rel = Relate(b, q);
    rel->AddSrcItem(a);
    rel->AddDstItem(r);
    EXPECT_EQ(Archive(rel), Words({0, 2, HandleOf(b), HandleOf(a), 2, HandleOf(q), HandleOf(r)}));
    EXPECT_THAT(Overflow(rel, 0), IsEmpty());
    rel->AddSrcItem(c);
    rel->AddDstItem(p);
    const Handles sources = {HandleOf(b), HandleOf(a), HandleOf(c)};
    const Handles destinations = {HandleOf(q), HandleOf(r), HandleOf(p)};
    const std::string record = RoundTrip(rel);
    EXPECT_EQ(record, Words({0, 3, 0, 0, 3, 0, 0}));
    EXPECT_EQ(Overflow(rel, 0), sources);
    EXPECT_EQ(Overflow(rel, 1), destinations);
    EXPECT_EQ(rel->GetSrcHandles().ToVector(), sources);
    EXPECT_EQ(rel->GetDstHandles().ToVector(), destinations);
    EXPECT_THAT(Listed(rel->GetSrcItems()), ElementsAre(b, a, c));
    EXPECT_EQ(Archive(rel), record);
    EXPECT_TRUE(rel->DbgValidateState());
}

TEST_F(CorrManagedExplicitRelationshipTest, DamagedRecordsAreRefused) {
    Rel* gone = Relate(MakeItem("s"), MakeItem("d"));
    gone->SetProperty_INT32("p", 1, nullptr);
    const unsigned int freedSlot = Data().GetRelDataMgr()->GetIndex(
        static_cast<const Qmx_CorrRelData*>(gone->GetObjectData()));
    gone->Delete();
    const unsigned int slots = static_cast<unsigned int>(Data().GetRelDataMgr()->GetSlotCount());
    const unsigned int item = HandleOf(MakeItem("x"));
    const std::vector<std::string> damaged = {
        Words({slots, 0, 0, 0, 0, 0, 0}),      // beyond the table
        Words({freedSlot, 0, 0, 0, 0, 0, 0}),  // a free slot
        Words({0, 1, 5, 0, 0, 0, 0}),          // a handle of no pool
        Words({0, 0, 0, 0, 3, 0, 0}),          // no overflow list
        Words({0, 1, item, 0, 0, 0}),          // cut short
    };
    for (const std::string& record : damaged) {
        EXPECT_THAT([&] { ReadAlone(record); },
                    ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(
                        StrEq(InvalidFormat(kStorageName))));
    }
    m_storageData.expRelVersion = 2;
    EXPECT_THAT(
        [&] {
            ReadAlone(Words({0, 1, item, 0, 0, 0, 0}));
        },
        ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(
            StrEq(InvalidFormat(kStorageName))));
}

TEST_F(CorrManagedExplicitRelationshipTest, DeleteUnlinksTheItemsAndFreesTheRecord) {
    Item* s = MakeItem("s");
    Item* d = MakeItem("d");
    Rel* keep = Relate(s, d);
    Rel* rel = Relate(s, d);
    rel->AddSrcItem(MakeItem("s2"));
    rel->AddSrcItem(MakeItem("s3"));
    rel->SetProperty_String("why", "copied", nullptr);
    Archive(rel);
    const unsigned int handle = HandleOf(rel);
    const unsigned int slot =
        Data().GetRelDataMgr()->GetIndex(static_cast<const Qmx_CorrRelData*>(rel->GetObjectData()));
    rel->Delete();
    EXPECT_EQ(Data().GetExpRelPtr(handle), nullptr);
    EXPECT_EQ(Data().GetRelDataMgr()->GetData(slot), nullptr);
    EXPECT_THAT(Listed(s->GetOutgoingRelationships()), ElementsAre(keep));
    EXPECT_THAT(Listed(d->GetIncomingRelationships()), ElementsAre(keep));
    // The next relationship takes the freed slot, and must not inherit the old lists.
    Rel* next = Relate(MakeItem("n"), nullptr);
    EXPECT_EQ(HandleOf(next), handle);
    EXPECT_THAT(Overflow(next, 0), IsEmpty());
}

TEST_F(CorrManagedExplicitRelationshipTest, WritingAPropertyGivesTheRelationshipARecordOfItsOwn) {
    Rel* rel = Relate(MakeItem("s"), MakeItem("d"));
    Rel* other = Relate(MakeItem("s2"), MakeItem("d2"));
    const Qmx_CorrObjectData* shared = rel->GetObjectData();
    EXPECT_EQ(shared, Data().GetRelDataMgr()->GetDefaultData().get());
    rel->SetProperty_INT32("weight", 3, nullptr);
    const Qmx_CorrObjectData* own = rel->GetObjectData();
    EXPECT_NE(own, shared);
    EXPECT_EQ(other->GetObjectData(), shared);
    rel->SetProperty_INT32("weight", 4, nullptr);
    EXPECT_EQ(rel->GetObjectData(), own);
    EXPECT_EQ(rel->GetName(), "");
    const unsigned int slot =
        Data().GetRelDataMgr()->GetIndex(static_cast<const Qmx_CorrRelData*>(own));
    EXPECT_EQ(RoundTrip(rel).substr(0, 4), U32(slot));
    EXPECT_EQ(rel->GetProperty_INT32("weight", nullptr), 4);
}

TEST_F(CorrManagedExplicitRelationshipTest, ValidationReportsTheFirstBrokenRule) {
    Item* s = MakeItem("s");
    Item* d = MakeItem("d");
    Rel* rel = Relate(s, d);
    const unsigned int hs = HandleOf(s), hd = HandleOf(d), hr = HandleOf(rel);
    const auto reportOf = [&] {
        return DebugOutputOf([&] { EXPECT_FALSE(rel->DbgValidateState()); });
    };
    s->RemoveOutgoingRelationship(hr);
    EXPECT_EQ(reportOf(),
              "Relationship has item '/s' as a source but the item does not list this "
              "relationship.\n");
    s->AddOutgoingRelationship(hr);
    d->RemoveIncomingRelationship(hr);
    EXPECT_EQ(reportOf(),
              "Relationship has item '/d' as a destination but the item does not list this "
              "relationship.\n");
    d->AddIncomingRelationship(hr);
    EXPECT_TRUE(rel->DbgValidateState());
    // Records that break the invariants the operations keep.
    Replace(rel, Words({0, 2, hs, hs, 1, hd, 0}));
    EXPECT_EQ(reportOf(), "Relationship contains source item '/s' multiple times\n");
    Replace(rel, Words({0, 1, hs, 0, 2, hd, hd}));
    EXPECT_EQ(reportOf(), "Relationship contains destination item '/d' multiple times\n");
    Replace(rel, Words({0, 1, hs, 0, 2, hd, hs}));
    EXPECT_EQ(reportOf(), "Relationship contains duplicate source and destination items.\n");
    Replace(rel, Words({0, 1, hs, 0, 1, hd, 0}));
    EXPECT_TRUE(rel->DbgValidateState());
}

TEST_F(CorrManagedExplicitRelationshipTest, DumpShowsTheRelationshipAroundItsObject) {
    std::ostringstream out;
    Relate(MakeItem("s"), MakeItem("d"))->DbgDump(out, 0);
    EXPECT_EQ(out.str(),
              "Qmx_CorrManagedExplicitRelationship:\n"
              "{\n"
              "   Qmx_CorrObject: ''\n"
              "   {\n"
              "   }\n"
              "}\n");
}

}  // namespace
