// The pooled item: its record with the inline handles and the overflow lists, the refusal of
// damaged records, deletion under every relMode, renaming, private data, validation and dump.
#include "Qmx_CorrManagedItem.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <initializer_list>
#include <new>
#include <sstream>
#include <string>
#include <vector>

#include "Qmx_CorrDataMgr.h"
#include "Qmx_CorrDb_Internal.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrItemDataMgr.h"
#include "Qmx_CorrItemRelOverflowMgr.h"
#include "Qmx_CorrMgr.h"
#include "Qmx_CorrNameRepo_Basic.h"
#include "Qmx_CorrName_Basic.h"
#include "Qmx_CorrRelItemOverflowMgr.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStorageData.h"
#include "Qmx_CorrStream_Internal.h"
#include "TempDir.h"
#include "Vesk_MsgManData.h"

namespace {

// Every allocation of this test program, counted.
long g_allocations = 0;

}  // namespace

// Kept out of line: inlined into callers, the compiler would take the free() for a
// mismatch of the operator new it cannot see through.
__attribute__((noinline)) void* operator new(std::size_t size) {
    ++g_allocations;
    if (void* p = std::malloc(size ? size : 1)) return p;
    throw std::bad_alloc();
}
__attribute__((noinline)) void operator delete(void* p) noexcept { std::free(p); }
__attribute__((noinline)) void operator delete(void* p, std::size_t) noexcept { std::free(p); }

namespace {

using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::IsEmpty;
using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Item = Qmx_CorrManagedItem;
using Rel = Qmx_CorrManagedExplicitRelationship;
using Handles = std::vector<unsigned int>;

constexpr const char* kStorageName = "items.cpd";

std::string U32(unsigned int v) {
    std::string bytes;
    for (int shift = 0; shift < 32; shift += 8) bytes += static_cast<char>((v >> shift) & 0xFF);
    return bytes;
}

std::string InvalidFormat(const std::string& name) {
    return "Qmx_CorrException::InvalidDatabaseFormat. Unable to read '" + name + "'.\n";
}

// A returned list as a vector, for the container matchers.
template <class T>
std::vector<T> Listed(const Qmx_SingleOptContainerT<T>& list) {
    return std::vector<T>(list.begin(), list.end());
}

template <class Step>
long AllocationsOf(Step step) {
    const long before = g_allocations;
    step();
    return g_allocations - before;
}

// What debugStub writes while `step` runs, with debug output on.
template <class Step>
std::string DebugOutputOf(Step step) {
    Vesk_MsgManData::SetDebugOutput(true);
    ::testing::internal::CaptureStderr();
    step();
    std::string text = ::testing::internal::GetCapturedStderr();
    Vesk_MsgManData::SetDebugOutput(false);
    return text;
}

// One database without a file, with a vocabulary for items, relationships and records.
class CorrManagedItemTest : public ::testing::Test {
protected:
    CorrManagedItemTest()
        : m_mgr("", "", Qmx_CorrMgr::DB_READ_WRITE, nullptr),
          m_stream(&m_bytes, kStorageName),
          m_storage(kStorageName, &m_stream, m_storageData) {}

    Qmx_CorrContainer* Top() { return m_mgr.GetTopContainer(); }
    Qmx_CorrDataMgr& Data() {
        return *static_cast<Qmx_CorrDataMgr*>(
            static_cast<Qmx_CorrManagedContainer*>(Top())->GetOwner());
    }
    Item* MakeItem(const char* name, Qmx_CorrContainer* in = nullptr) {
        return static_cast<Item*>((in ? in : Top())->CreateItem(name));
    }
    Rel* Relate(std::initializer_list<Item*> sources, std::initializer_list<Item*> destinations) {
        auto* rel =
            static_cast<Rel*>(m_mgr.CreateExplicitRelationship(nullptr, *destinations.begin()));
        for (Item* src : sources) rel->AddSrcItem(src);
        for (Item* dst : destinations) rel->AddDstItem(dst);
        return rel;
    }
    unsigned int HandleOf(const Rel* rel) { return Data().GetManagedExpRelMgr()->GetHandle(rel); }
    unsigned int HandleOf(const Item* item) { return Data().GetItemHandle(item); }
    unsigned int DataIndexOf(const Item* item) {
        return Data().GetItemDataMgr()->GetIndex(
            static_cast<const Qmx_CorrItemData*>(item->GetObjectData()));
    }
    static unsigned int NameIndexOf(const Item* item) {
        return static_cast<const Qmx_CorrName_Basic*>(item->GetNameHandle().GetRecord())
            ->GetIndex();
    }
    Handles Overflow(const Item* item, int selector) {
        return Data().GetItemRelOverflowMgr()->GetList(item, selector);
    }

    std::string Archive(const Item* item) {
        m_bytes.str("");
        m_bytes.clear();
        item->Archive(m_storage);
        return m_bytes.str();
    }
    void Load(const std::string& record) {
        m_bytes.str(record);
        m_bytes.clear();
        m_stream.SeekPos(0);
    }
    // Writes the item's record and rebuilds the item from it where it stands, as reloading
    // its pool does; returns the record.
    std::string RoundTrip(Item* item) {
        const std::string record = Archive(item);
        Qmx_CorrObjectOwner* const owner = item->GetOwner();
        item->~Item();
        Load(record);
        new (item) Item(m_storage, owner);
        EXPECT_EQ(m_stream.BytesLeft(), 0);
        return record;
    }
    // Reads `record` into an item of its own; what the reader throws passes on.
    void ReadAlone(const std::string& record) {
        Load(record);
        Item item(m_storage, &Data());
    }

    Qmx_CorrMgr m_mgr;
    std::stringstream m_bytes;
    Qmx_CorrStream_Internal m_stream;
    Qmx_CorrStorageData m_storageData;
    Qmx_CorrStorage m_storage;
};

TEST_F(CorrManagedItemTest, FreshItemWritesTwentyEightBytesOfZeroCounts) {
    Item* x = MakeItem("x");
    m_storageData.itemVersion = 0;
    const std::string record = Archive(x);
    EXPECT_EQ(m_storageData.itemVersion, 2u);
    EXPECT_EQ(Item::GetArchiveSize(&Data()), 28u);
    EXPECT_EQ(record, U32(DataIndexOf(x)) + U32(1) + U32(NameIndexOf(x)) + U32(0) + U32(0) +
                          U32(0) + U32(0));
    EXPECT_EQ(RoundTrip(x), record);
    EXPECT_EQ(Archive(x), record);
    EXPECT_EQ(x->GetName(), "x");
    EXPECT_EQ(x->GetParent(), Top());
    EXPECT_EQ(x->GetOutgoingHandles().GetState(), Qmx_CorrHandleList::kEmpty);
}

TEST_F(CorrManagedItemTest, OneRelationshipEachWayStaysInlineAndCostsNothing) {
    Item* x = MakeItem("x");
    Rel* out = Relate({x}, {MakeItem("d")});
    Rel* in = Relate({MakeItem("s")}, {x});
    const std::string record = RoundTrip(x);
    EXPECT_EQ(record.substr(12), U32(1) + U32(HandleOf(in)) + U32(1) + U32(HandleOf(out)));
    EXPECT_THAT(Overflow(x, 0), IsEmpty());
    EXPECT_THAT(Overflow(x, 1), IsEmpty());
    EXPECT_EQ(AllocationsOf([&] {
                  const auto outgoing = x->GetOutgoingRelationships();
                  const auto incoming = static_cast<const Item*>(x)->GetIncomingRelationships();
                  EXPECT_EQ(outgoing.GetMode(), 1u);
                  EXPECT_EQ(outgoing[0], out);
                  EXPECT_EQ(incoming.GetMode(), 1u);
                  EXPECT_EQ(incoming[0], in);
              }),
              0);
    EXPECT_LE(sizeof(Item), 48u);
}

TEST_F(CorrManagedItemTest, LongListsGoToTheOverflowListsAndComeBackInOrder) {
    Item* x = MakeItem("x");
    Rel* in1 = Relate({MakeItem("s1")}, {x});
    Rel* in2 = Relate({MakeItem("s2")}, {x});
    Rel* in3 = Relate({MakeItem("s3")}, {x});
    Rel* out1 = Relate({x}, {MakeItem("d1")});
    Rel* out2 = Relate({x}, {MakeItem("d2")});
    const Handles incoming = {HandleOf(in1), HandleOf(in2), HandleOf(in3)};
    const Handles outgoing = {HandleOf(out1), HandleOf(out2)};
    const std::string record = RoundTrip(x);
    EXPECT_EQ(record.substr(12), U32(3) + U32(0) + U32(2) + U32(0));
    EXPECT_EQ(Overflow(x, 0), incoming);
    EXPECT_EQ(Overflow(x, 1), outgoing);
    EXPECT_EQ(x->GetIncomingHandles().ToVector(), incoming);
    EXPECT_EQ(x->GetOutgoingHandles().ToVector(), outgoing);
    EXPECT_THAT(Listed(x->GetIncomingRelationships()), ElementsAre(in1, in2, in3));
    EXPECT_EQ(Archive(x), record);
    EXPECT_TRUE(x->DbgValidateState());
}

TEST_F(CorrManagedItemTest, DamagedRecordsAreRefused) {
    Item* gone = MakeItem("gone");
    gone->SetProperty_INT32("p", 1, nullptr);
    const unsigned int freedSlot = DataIndexOf(gone);
    gone->Delete(0);
    const unsigned int slots = static_cast<unsigned int>(Data().GetItemDataMgr()->GetSlotCount());
    Item* x = MakeItem("x");
    const std::string name = U32(1) + U32(NameIndexOf(x));
    const std::string fine = U32(DataIndexOf(x)) + name + U32(0) + U32(0) + U32(0) + U32(0);
    const std::vector<std::string> damaged = {
        U32(slots) + name + U32(0) + U32(0) + U32(0) + U32(0),           // beyond the table
        U32(freedSlot) + name + U32(0) + U32(0) + U32(0) + U32(0),       // a free slot
        U32(DataIndexOf(x)) + name + U32(1) + U32(0) + U32(0) + U32(0),  // the null handle
        U32(DataIndexOf(x)) + name + U32(0) + U32(0) + U32(3) + U32(0),  // no overflow list
        fine.substr(0, 27),                                              // cut short
    };
    for (const std::string& record : damaged) {
        EXPECT_THAT([&] { ReadAlone(record); },
                    ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(
                        StrEq(InvalidFormat(kStorageName))));
    }
    m_storageData.itemVersion = 1;
    EXPECT_THAT([&] { ReadAlone(fine); }, ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(
                                              StrEq(InvalidFormat(kStorageName))));
}

TEST_F(CorrManagedItemTest, DeleteTakesTheRelationshipsThatRelModeNames) {
    struct Case {
        unsigned relMode;
        bool soleSourceSurvives;       // x -> d
        bool soleDestinationSurvives;  // s -> x
    };
    const Case cases[] = {
        {0, true, true}, {1, false, false}, {2, false, true}, {3, true, false}, {7, true, true}};
    for (const Case& c : cases) {
        SCOPED_TRACE(c.relMode);
        Qmx_CorrContainer* in = Top()->CreateContainer("c" + std::to_string(c.relMode));
        Item *x = MakeItem("x", in), *d = MakeItem("d", in), *s = MakeItem("s", in);
        Item *y = MakeItem("y", in), *e = MakeItem("e", in), *z = MakeItem("z", in);
        Relate({x}, {d});
        Rel* twoSources = Relate({x, y}, {e});
        Relate({s}, {x});
        Rel* twoDestinations = Relate({s}, {x, z});
        const unsigned int handle = HandleOf(x);
        x->Delete(c.relMode);
        EXPECT_EQ(in->GetItem("x"), nullptr);
        EXPECT_EQ(Data().GetItemPtr(handle), nullptr);
        EXPECT_EQ(d->GetIncomingRelationships().size(), c.soleSourceSurvives ? 1u : 0u);
        EXPECT_EQ(s->GetOutgoingRelationships().size(), c.soleDestinationSurvives ? 2u : 1u);
        EXPECT_THAT(Listed(twoSources->GetSrcItems()), ElementsAre(y));
        EXPECT_THAT(Listed(twoDestinations->GetDstItems()), ElementsAre(z));
        for (Rel* rel : {twoSources, twoDestinations}) EXPECT_TRUE(rel->DbgValidateState());
        for (Item* item : {d, s, y, e, z}) EXPECT_TRUE(item->DbgValidateState());
    }
}

TEST_F(CorrManagedItemTest, DeleteGivesBackTheNameAndThePrivateRecord) {
    auto* repo = static_cast<Qmx_CorrNameRepo_Basic*>(Data().GetNameRepo());
    Item* x = MakeItem("x");
    Rel* out = Relate({x}, {MakeItem("d1")});
    Relate({x}, {MakeItem("d2")});
    x->SetProperty_INT32("p", 1, nullptr);
    Archive(x);
    ASSERT_EQ(Overflow(x, 1).size(), 2u);
    const unsigned int slot = DataIndexOf(x);
    const unsigned int handle = HandleOf(x);
    const unsigned int freeNames = repo->GetFreeCount();
    x->Delete(0);
    EXPECT_EQ(repo->GetFreeCount(), freeNames + 1);
    EXPECT_EQ(Data().GetItemDataMgr()->GetData(slot), nullptr);
    EXPECT_TRUE(out->GetSrcItems().empty());
    // The next item takes the freed slot, and must not inherit the old item's lists.
    Item* next = MakeItem("next");
    EXPECT_EQ(HandleOf(next), handle);
    EXPECT_THAT(Overflow(next, 1), IsEmpty());
}

TEST_F(CorrManagedItemTest, AbsoluteNameIsTheContainerPathAndTheName) {
    Qmx_CorrContainer* b = Top()->CreateContainer("a")->CreateContainer("b");
    EXPECT_EQ(MakeItem("x", b)->GetAbsoluteName(), "/a/b/x");
    EXPECT_EQ(MakeItem("y")->GetAbsoluteName(), "/y");
}

TEST_F(CorrManagedItemTest, WritingAPropertyGivesTheItemARecordOfItsOwn) {
    Item* x = MakeItem("x");
    Item* y = MakeItem("y");
    const Qmx_CorrObjectData* shared = x->GetObjectData();
    EXPECT_EQ(y->GetObjectData(), shared);
    x->SetProperty_String("kind", "source", nullptr);
    const Qmx_CorrObjectData* own = x->GetObjectData();
    EXPECT_NE(own, shared);
    EXPECT_EQ(y->GetObjectData(), shared);
    EXPECT_FALSE(y->HasProperty("kind"));
    x->SetProperty_INT32("size", 4, nullptr);
    EXPECT_EQ(x->GetObjectData(), own);
    EXPECT_EQ(x->GetParent(), Top());
    RoundTrip(x);
    EXPECT_EQ(x->GetObjectData(), own);
    EXPECT_EQ(x->GetProperty_INT32("size", nullptr), 4);
}

// A repository that keeps only the first four bytes of a name.
class ShortNameRepo : public Qmx_CorrNameRepo_Basic {
public:
    Qmx_CorrNameHandle CreateName(const Vesk::StringBase<char>& text) override {
        return Qmx_CorrNameRepo_Basic::CreateName(text.substr(0, 4));
    }
};

TEST(CorrManagedItem, RenameReportsANameTheRepositoryDidNotKeep) {
    ShortNameRepo repo;
    Qmx_CorrMgr mgr("", "", Qmx_CorrMgr::DB_READ_WRITE, &repo);
    Item* x = static_cast<Item*>(mgr.GetTopContainer()->CreateItem("abc"));
    EXPECT_EQ(DebugOutputOf([&] { x->SetName("wxyz"); }), "");
    EXPECT_EQ(x->GetName(), "wxyz");
    const std::size_t slots = repo.GetTableSize();
    EXPECT_EQ(DebugOutputOf([&] { x->SetName("abcdefgh"); }),
              "eek RenameItem failed abcdefgh abcd\n");
    EXPECT_EQ(x->GetName(), "abcd");
    // The old name's slot was freed first and taken again by the new name.
    EXPECT_EQ(repo.GetTableSize(), slots);
    EXPECT_EQ(repo.GetFreeCount(), 0u);
}

TEST_F(CorrManagedItemTest, ValidationReportsTheFirstBrokenRule) {
    Item* x = MakeItem("x");
    Rel* unrelated = Relate({MakeItem("s")}, {MakeItem("d")});
    Rel* in = Relate({MakeItem("s2")}, {x});
    Rel* out = Relate({x}, {MakeItem("d2")});
    const std::string prefix = "Item '/x' ";
    struct Case {
        void (Item::*add)(unsigned int);
        void (Item::*remove)(unsigned int);
        Rel* rel;
        std::string message;
    };
    const Case cases[] = {
        {&Item::AddIncomingRelationship, &Item::RemoveIncomingRelationship, unrelated,
         "thinks it is a destination for a relationship but the relationship does not have it "
         "listed.\n"},
        {&Item::AddIncomingRelationship, &Item::RemoveIncomingRelationship, in,
         "has an individual incoming relationship in its list more than once.\n"},
        {&Item::AddOutgoingRelationship, &Item::RemoveOutgoingRelationship, unrelated,
         "thinks it is a source for a relationship but the relationship does not have "
         "itlisted.\n"},
        {&Item::AddOutgoingRelationship, &Item::RemoveOutgoingRelationship, out,
         "has an individual outgoing relationship in its list more than once.\n"},
    };
    for (const Case& c : cases) {
        (x->*c.add)(HandleOf(c.rel));
        EXPECT_EQ(DebugOutputOf([&] { EXPECT_FALSE(x->DbgValidateState()); }), prefix + c.message);
        (x->*c.remove)(HandleOf(c.rel));
        EXPECT_TRUE(x->DbgValidateState());
    }
}

TEST_F(CorrManagedItemTest, DumpShowsTheItemAroundItsObject) {
    std::ostringstream out;
    MakeItem("x")->DbgDump(out, 1);
    EXPECT_EQ(out.str(),
              "   Qmx_CorrManagedItem: 'x'\n"
              "   {\n"
              "      Qmx_CorrObject: 'x'\n"
              "      {\n"
              "      }\n"
              "   }\n");
}

// Items and relationships leave memory with their pools and come back from the pool streams,
// long lists through the overflow lists, at the same handles.
TEST(CorrManagedItemPools, UnloadedPoolsReloadEqualObjects) {
    TempDir dir;
    Qmx_CorrDb_Internal db(dir / "pools.cpd");
    Qmx_CorrStorageData data;
    Qmx_CorrMgr mgr("", "", Qmx_CorrMgr::DB_READ_WRITE, nullptr);
    Qmx_CorrContainer* top = mgr.GetTopContainer();
    auto& dataMgr =
        *static_cast<Qmx_CorrDataMgr*>(static_cast<Qmx_CorrManagedContainer*>(top)->GetOwner());
    Qmx_CorrManagedItemMgr& items = *dataMgr.GetManagedItemMgr();
    Qmx_CorrManagedExpRelMgr& rels = *dataMgr.GetManagedExpRelMgr();
    items.OpenDb(&db, data, &dataMgr);
    rels.OpenDb(&db, data, &dataMgr);
    std::vector<Qmx_CorrItem*> sources;
    for (const char* name : {"s1", "s2", "s3"}) sources.push_back(top->CreateItem(name));
    Qmx_CorrItem* x = top->CreateItem("x");
    Qmx_CorrExplicitRelationship* wide = mgr.CreateExplicitRelationship(sources[0], x);
    wide->AddSrcItem(sources[1]);
    wide->AddSrcItem(sources[2]);
    mgr.CreateExplicitRelationship(x, sources[0]);
    mgr.CreateExplicitRelationship(x, sources[1]);
    const unsigned int xHandle = dataMgr.GetItemHandle(static_cast<Item*>(x));
    const unsigned int wideHandle = rels.GetHandle(static_cast<Rel*>(wide));
    const Handles outgoing = static_cast<Item*>(x)->GetOutgoingHandles().ToVector();
    const Handles wideSources = static_cast<Rel*>(wide)->GetSrcHandles().ToVector();

    items.FlushAllPools(true);
    rels.FlushAllPools(true);
    EXPECT_EQ(items.GetNumLoadedPools(), 0u);
    EXPECT_EQ(rels.GetNumLoadedPools(), 0u);

    Item* reloaded = dataMgr.GetItemPtr(xHandle);
    ASSERT_NE(reloaded, nullptr);
    EXPECT_EQ(reloaded->GetAbsoluteName(), "/x");
    ASSERT_EQ(outgoing.size(), 2u);
    EXPECT_EQ(reloaded->GetOutgoingHandles().ToVector(), outgoing);
    Rel* wideAgain = dataMgr.GetExpRelPtr(wideHandle);
    ASSERT_NE(wideAgain, nullptr);
    EXPECT_EQ(wideAgain->GetSrcHandles().ToVector(), wideSources);
    EXPECT_THAT(Listed(wideAgain->GetDstItems()), ElementsAre(reloaded));
    std::vector<std::string> names;
    for (const Qmx_CorrItem* src : wideAgain->GetSrcItems()) names.push_back(src->GetName());
    EXPECT_THAT(names, ElementsAreArray({"s1", "s2", "s3"}));
    EXPECT_TRUE(reloaded->DbgValidateState());
    EXPECT_TRUE(wideAgain->DbgValidateState());
    rels.CloseDb();
    items.CloseDb();
}

}  // namespace
