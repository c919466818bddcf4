// The pieces of the object model that hold no database: the link list type, direction texts,
// the deletion events, the owner's own fields, the default dump and the container data block.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <cstdlib>
#include <new>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "../support/FakeOwner.h"
#include "Qmx_CorrEvent.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrImplicitRelationship.h"
#include "Qmx_CorrItem.h"
#include "Qmx_CorrNameRepo_Basic.h"
#include "Qmx_CorrObjectData.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStream_Internal.h"
#include "Qmx_SingleOptContainerT.h"

// Every allocation of this program is counted, so that a test can see what a list allocated.
namespace {
std::size_t g_allocations = 0;
std::size_t g_releases = 0;

void* CountedAllocation(std::size_t size) {
    ++g_allocations;
    return std::malloc(size == 0 ? 1 : size);
}
void CountedRelease(void* p) {
    if (p) ++g_releases;
    std::free(p);
}
}  // namespace

void* operator new(std::size_t size) {
    if (void* p = CountedAllocation(size)) return p;
    throw std::bad_alloc();
}
void* operator new[](std::size_t size) { return operator new(size); }
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    return CountedAllocation(size);
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
    return CountedAllocation(size);
}
void operator delete(void* p) noexcept { CountedRelease(p); }
void operator delete[](void* p) noexcept { CountedRelease(p); }
void operator delete(void* p, std::size_t) noexcept { CountedRelease(p); }
void operator delete[](void* p, std::size_t) noexcept { CountedRelease(p); }
void operator delete(void* p, const std::nothrow_t&) noexcept { CountedRelease(p); }
void operator delete[](void* p, const std::nothrow_t&) noexcept { CountedRelease(p); }

namespace {

using qmxtest::DataItem;
using qmxtest::FakeOwner;
using ::testing::ElementsAre;
using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Items = Qmx_SingleOptContainerT<const Qmx_CorrItem*>;

// What happened to the heap since construction; read it into locals before asserting, as
// the assertions allocate too.
class HeapCount {
public:
    std::size_t Allocations() const { return g_allocations - m_allocations; }
    std::size_t Releases() const { return g_releases - m_releases; }
    void Restart() { *this = HeapCount(); }

private:
    std::size_t m_allocations = g_allocations;
    std::size_t m_releases = g_releases;
};

template <class T>
T* Fake(std::uintptr_t n) {
    return reinterpret_cast<T*>(n * 16);
}
const Qmx_CorrItem* Item(std::uintptr_t n) { return Fake<const Qmx_CorrItem>(n); }

// Through range-for, as callers walk the lists.
std::vector<const Qmx_CorrItem*> Elements(const Items& list) {
    std::vector<const Qmx_CorrItem*> elements;
    for (const Qmx_CorrItem* item : list) elements.push_back(item);
    return elements;
}

TEST(SingleOptContainer, NoneAndOneLiveInline) {
    const HeapCount heap;
    Items none;
    none.Reserve(1);
    std::size_t iterations = 0;
    for ([[maybe_unused]] const Qmx_CorrItem* item : none) ++iterations;
    Items one;
    one.PushBack(Item(1));
    one.Reserve(4);  // only an empty list is prepared
    Items copy(one);
    const Items moved(std::move(copy));
    const std::size_t allocated = heap.Allocations();

    EXPECT_EQ(allocated, 0u);
    EXPECT_EQ(iterations, 0u);
    EXPECT_EQ(none.GetMode(), 0u);
    EXPECT_TRUE(none.empty());
    EXPECT_EQ(moved.GetMode(), 1u);
    EXPECT_THAT(Elements(moved), ElementsAre(Item(1)));
    EXPECT_EQ(copy.GetMode(), 0u);
    EXPECT_EQ(copy.size(), 0u);
}

TEST(SingleOptContainer, TwoOrMoreAreAVectorThatEachCopyOwns) {
    Items list;
    list.PushBack(Item(1));
    list.PushBack(Item(2));
    HeapCount heap;
    Items copy(list);
    const std::size_t copyAllocations = heap.Allocations();
    copy.PushBack(Item(3));
    list[0] = Item(9);
    EXPECT_EQ(copyAllocations, 1u);
    EXPECT_EQ(copy.GetMode(), 2u);
    EXPECT_THAT(Elements(list), ElementsAre(Item(9), Item(2)));
    EXPECT_THAT(Elements(copy), ElementsAre(Item(1), Item(2), Item(3)));

    heap.Restart();
    list = copy;  // its own vector goes, a copy of the other comes
    const std::size_t assignAllocations = heap.Allocations();
    const std::size_t assignReleases = heap.Releases();
    copy = Items();
    const std::size_t clearReleases = heap.Releases() - assignReleases;
    EXPECT_EQ(assignAllocations, 1u);
    EXPECT_EQ(assignReleases, 1u);
    EXPECT_EQ(clearReleases, 1u);
    EXPECT_THAT(Elements(list), ElementsAre(Item(1), Item(2), Item(3)));
}

TEST(SingleOptContainer, MovesHandTheVectorOverAndReserveAllocatesOnce) {
    HeapCount heap;
    Items source;
    source.Reserve(3);
    const unsigned int reservedMode = source.GetMode();
    for (std::uintptr_t n = 1; n <= 3; ++n) source.PushBack(Item(n));
    const std::size_t filled = heap.Allocations();
    const Qmx_CorrItem* const* storage = source.begin();
    Items one;
    one.PushBack(Item(7));

    heap.Restart();
    Items target(std::move(source));
    const bool sameStorage = target.begin() == storage;
    target = std::move(one);  // frees the vector it took over
    const std::size_t moveAllocations = heap.Allocations();
    const std::size_t moveReleases = heap.Releases();

    EXPECT_EQ(reservedMode, 2u);
    EXPECT_EQ(filled, 1u);
    EXPECT_TRUE(sameStorage);
    EXPECT_EQ(moveAllocations, 0u);
    EXPECT_EQ(moveReleases, 1u);
    EXPECT_THAT(Elements(target), ElementsAre(Item(7)));
    EXPECT_TRUE(Elements(source).empty());
    EXPECT_EQ(source.GetMode(), 0u);
    EXPECT_EQ(one.GetMode(), 0u);
}

TEST(ImplicitRelationshipDirection, EveryValueHasADisplayText) {
    const std::pair<unsigned int, const char*> texts[] = {
        {Qmx_CorrImplicitRelationship::DIR_SRC_TO_DST, "SRC -> DST"},
        {Qmx_CorrImplicitRelationship::DIR_DST_TO_SRC, "SRC <- DST"},
        {Qmx_CorrImplicitRelationship::DIR_BOTH, "SRC <-> DST"},
        {3, "ERROR!"},
        {0xFFFFFFFF, "ERROR!"},
    };
    for (const auto& t : texts)
        EXPECT_STREQ(Qmx_CorrImplicitRelationship::GetDirectionText(t.first), t.second) << t.first;
}

template <class T>
class RecordingListener : public Qmx_CorrEvent::Listener1<T> {
public:
    RecordingListener(std::vector<std::string>& log, const char* name) : m_log(log), m_name(name) {}
    void Notify(T subject) override {
        m_log.push_back(m_name + "@" + std::to_string(reinterpret_cast<std::uintptr_t>(subject)));
    }

private:
    std::vector<std::string>& m_log;
    std::string m_name;
};

TEST(CorrEvent, EmittersNotifyEveryEntryFrontToBack) {
    auto& containers = Qmx_CorrEvent::GetCorrContainerDeletedEmitter();
    auto& managers = Qmx_CorrEvent::GetCorrMgrDeletedEmitter();
    EXPECT_EQ(&containers, &Qmx_CorrEvent::GetCorrContainerDeletedEmitter());
    EXPECT_EQ(&managers, &Qmx_CorrEvent::GetCorrMgrDeletedEmitter());
    std::vector<std::string> log;
    RecordingListener<Qmx_CorrContainer*> a(log, "a");
    RecordingListener<Qmx_CorrContainer*> b(log, "b");
    RecordingListener<Qmx_CorrMgr*> m(log, "m");
    containers.AddListener(&a);
    containers.AddListener(&b);
    containers.AddListener(&a);
    managers.AddListener(&m);

    containers.Fire(Fake<Qmx_CorrContainer>(1));
    EXPECT_THAT(log, ElementsAre("a@16", "b@16", "a@16"));
    log.clear();
    containers.RemoveListener(&a);  // the first entry only
    containers.Fire(Fake<Qmx_CorrContainer>(2));
    EXPECT_THAT(log, ElementsAre("b@32", "a@32"));
    log.clear();
    containers.RemoveListener(&b);
    containers.RemoveListener(&b);  // no longer there: ignored
    managers.Fire(Fake<Qmx_CorrMgr>(3));
    containers.Fire(Fake<Qmx_CorrContainer>(4));
    EXPECT_THAT(log, ElementsAre("m@48", "a@64"));

    containers.RemoveListener(&a);
    managers.RemoveListener(&m);
    EXPECT_TRUE(containers.GetListeners().empty());
    EXPECT_TRUE(managers.GetListeners().empty());
}

TEST(CorrObjectOwner, HandsOutContainerIdsAndSharesOnlyTheDefaultRepository) {
    FakeOwner owner;
    EXPECT_EQ(owner.GetLastContainerId(), 0u);
    for (unsigned int id : {0u, 1u, 2u}) EXPECT_EQ(owner.GetNextContainerId(), id);
    EXPECT_EQ(owner.GetLastContainerId(), 3u);
    EXPECT_EQ(owner.GetLastContainerId(), 3u);
    owner.SetNextContainerId(40);  // as restoring a database does
    EXPECT_EQ(owner.GetNextContainerId(), 40u);

    FakeOwner second(nullptr);
    Qmx_CorrNameRepo_Basic own;
    FakeOwner third(&own);
    EXPECT_EQ(owner.GetNameRepo(), Qmx_CorrNameRepo_Basic::GetDefault());
    EXPECT_EQ(second.GetNameRepo(), owner.GetNameRepo());
    EXPECT_EQ(third.GetNameRepo(), &own);
    EXPECT_NE(owner.GetItemDataMgr(), second.GetItemDataMgr());
    EXPECT_EQ(owner.GetDatabase(), nullptr);
}

TEST(CorrObject, DefaultDumpIsThreeLinesAtTheIndent) {
    FakeOwner owner;
    DataItem item(*owner.GetItemDataMgr(), nullptr, "u1");
    std::ostringstream out;
    item.DbgDump(out, 0);
    EXPECT_EQ(out.str(), "Qmx_CorrObject: 'u1'\n{\n}\n");
    out.str("");
    item.DbgDump(out, 2);
    EXPECT_EQ(out.str(), "      Qmx_CorrObject: 'u1'\n      {\n      }\n");
    // A name is text, never a format.
    DataItem odd(*owner.GetItemDataMgr(), nullptr, "100% %s%n");
    out.str("");
    odd.DbgDump(out, 0);
    EXPECT_EQ(out.str(), "Qmx_CorrObject: '100% %s%n'\n{\n}\n");
    ::testing::internal::CaptureStderr();
    item.DbgDump();
    EXPECT_EQ(::testing::internal::GetCapturedStderr(), "Qmx_CorrObject: 'u1'\n{\n}\n");
}

class ContainerObjectDataTest : public ::testing::Test {
protected:
    ContainerObjectDataTest()
        : m_stream(&m_bytes, "stream.cpd"), m_storage("store.cpd", &m_stream, m_data) {}
    ~ContainerObjectDataTest() override {
        Qmx_CorrObjectData::ReleaseDefaultObjectData(&m_owner);
        Qmx_CorrObjectData::ReleaseDefaultObjectData(&m_other);
    }
    void Rewind() { m_stream.SeekPos(0); }

    std::stringstream m_bytes;
    Qmx_CorrStream_Internal m_stream;
    Qmx_CorrStorageData m_data;
    Qmx_CorrStorage m_storage;
    FakeOwner m_owner;
    FakeOwner m_other;
};

TEST_F(ContainerObjectDataTest, PrivateRecordsAreWrittenAndSharedOnesComeBackAsTheDefault) {
    const auto shared = Qmx_CorrObjectData::GetDefaultObjectData(&m_owner);
    const auto own = Qmx_CorrObjectData::CreateObjectData(&m_owner);
    own->GetPropertiesForWrite()["n"].SetINT32(7);
    m_data.objectDataVersion = 0;
    Qmx_CorrObjectData::ArchiveObjectData(m_storage, shared);
    EXPECT_EQ(m_data.objectDataVersion, 1u);
    Qmx_CorrObjectData::ArchiveObjectData(m_storage, own);
    Qmx_CorrObjectData::ArchiveObjectData(m_storage, shared);
    // false; true, one property "n", INT32 7; false.
    EXPECT_EQ(m_bytes.str(), std::string("\x00\x01"
                                         "\x01\x00\x00\x00"
                                         "\x01\x00\x00\x00"
                                         "n"
                                         "\x00\x00\x00\x00"
                                         "\x07\x00\x00\x00"
                                         "\x00",
                                         20));

    Rewind();
    EXPECT_EQ(Qmx_CorrObjectData::RestoreObjectData(m_storage, &m_owner), shared);
    const auto back = Qmx_CorrObjectData::RestoreObjectData(m_storage, &m_other);
    EXPECT_NE(back, Qmx_CorrObjectData::GetDefaultObjectData(&m_other));
    EXPECT_EQ(back->GetOwner(), &m_other);
    EXPECT_EQ(back->GetProperties().at("n").GetINT32(), 7);
    // Each owner has a default of its own.
    const auto otherDefault = Qmx_CorrObjectData::RestoreObjectData(m_storage, &m_other);
    EXPECT_EQ(otherDefault, Qmx_CorrObjectData::GetDefaultObjectData(&m_other));
    EXPECT_NE(otherDefault, shared);
    EXPECT_EQ(m_storage.BytesLeft(), 0);
}

TEST_F(ContainerObjectDataTest, OtherObjectDataVersionsAreRefusedBeforeAnyRead) {
    m_bytes.str(std::string("\x01\x00\x00\x00\x00", 5));
    for (unsigned int version : {0u, 2u}) {
        m_data.objectDataVersion = version;
        EXPECT_THAT([&] { Qmx_CorrObjectData::RestoreObjectData(m_storage, &m_owner); },
                    ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(StrEq(
                        "Qmx_CorrException::InvalidDatabaseFormat. Unable to read 'store.cpd'.\n")))
            << version;
        EXPECT_EQ(m_storage.BytesLeft(), 5);
    }
}

}  // namespace
