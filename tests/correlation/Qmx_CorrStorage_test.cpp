#include "Qmx_CorrStorage.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <map>
#include <sstream>

#include "Qmx_CorrException.h"
#include "Qmx_CorrStream_Internal.h"

namespace {

using ::testing::StrEq;
using ::testing::ThrowsMessage;

// Stand-ins for managed objects: only their addresses are used, never their contents.
template <class T>
T* Fake(std::uintptr_t n) {
    return reinterpret_cast<T*>(n * 16);
}

// A pool manager's swizzler in miniature: a fixed map between objects and handles.
template <class T>
class MapSwizzler : public Qmx_CorrPtrSwizzlerT<T, unsigned int> {
public:
    void Add(T* object, unsigned int handle) {
        m_handles[object] = handle;
        m_objects[handle] = object;
    }
    unsigned int GetHandle(T* object) override { return object ? m_handles.at(object) : 0; }
    T* GetPtr(unsigned int handle) override {
        ++m_lookups;
        const auto found = m_objects.find(handle);
        return found == m_objects.end() ? nullptr : found->second;
    }

    int m_lookups = 0;

private:
    std::map<T*, unsigned int> m_handles;
    std::map<unsigned int, T*> m_objects;
};

class CorrStorageTest : public ::testing::Test {
protected:
    CorrStorageTest() : m_stream(&m_bytes, "db.cpd"), m_storage("db.cpd", &m_stream, m_data) {
        for (std::uintptr_t n : {9, 3, 5})
            m_data.containers.push_back(Fake<Qmx_CorrManagedContainer>(n));
        std::sort(m_data.containers.begin() + 1, m_data.containers.end(),
                  std::less<Qmx_CorrManagedContainer*>());
        m_data.implicitRelationships.push_back(Fake<Qmx_CorrManagedImplicitRelationship>(7));
        m_items.Add(Fake<Qmx_CorrManagedItem>(1), 258);
        m_relationships.Add(Fake<Qmx_CorrManagedExplicitRelationship>(2), 0x01020304);
        m_data.itemSwizzler = &m_items;
        m_data.expRelSwizzler = &m_relationships;
    }
    void Rewind() { m_stream.SeekPos(0); }

    std::stringstream m_bytes;
    Qmx_CorrStream_Internal m_stream;
    Qmx_CorrStorageData m_data;
    Qmx_CorrStorage m_storage;
    MapSwizzler<Qmx_CorrManagedItem> m_items;
    MapSwizzler<Qmx_CorrManagedExplicitRelationship> m_relationships;
};

TEST_F(CorrStorageTest, FreshDataHoldsNullEntriesAndTodaysVersions) {
    const Qmx_CorrStorageData fresh;
    EXPECT_EQ(fresh.containers, std::vector<Qmx_CorrManagedContainer*>{nullptr});
    EXPECT_EQ(fresh.implicitRelationships.size(), 1u);
    EXPECT_EQ(fresh.itemSwizzler, nullptr);
    EXPECT_EQ(std::vector<unsigned>({fresh.containerVersion, fresh.itemVersion, fresh.expRelVersion,
                                     fresh.impRelVersion, fresh.objectDataVersion}),
              std::vector<unsigned>({1, 2, 1, 1, 1}));
}

TEST_F(CorrStorageTest, ReferencesBecomeOrdinalsAndHandlesAndReadBack) {
    m_storage.WriteContainerPtr(Fake<Qmx_CorrManagedContainer>(5));
    m_storage.WriteContainerPtr(nullptr);
    m_storage.WriteImpRelPtr(Fake<Qmx_CorrManagedImplicitRelationship>(7));
    m_storage.WriteItemPtr(Fake<Qmx_CorrManagedItem>(1));
    m_storage.WriteExpRelPtr(Fake<Qmx_CorrManagedExplicitRelationship>(2));
    EXPECT_EQ(m_bytes.str(), std::string("\x02\x00\x00\x00"
                                         "\x00\x00\x00\x00"
                                         "\x01\x00\x00\x00"
                                         "\x02\x01\x00\x00"
                                         "\x04\x03\x02\x01",
                                         20));
    Rewind();
    EXPECT_EQ(m_storage.ReadManagedContainerPtr(), Fake<Qmx_CorrManagedContainer>(5));
    EXPECT_EQ(m_storage.ReadManagedContainerPtr(), nullptr);
    EXPECT_EQ(m_storage.ReadManagedImpRelPtr(), Fake<Qmx_CorrManagedImplicitRelationship>(7));
    EXPECT_EQ(m_storage.ReadManagedItemPtr(), Fake<Qmx_CorrManagedItem>(1));
    EXPECT_EQ(m_storage.ReadManagedExpRelPtr(), Fake<Qmx_CorrManagedExplicitRelationship>(2));
}

TEST_F(CorrStorageTest, OrdinalsBeyondTheTablesAndHandlesWithoutPoolsAreDamage) {
    const std::string damaged =
        "Qmx_CorrException::InvalidDatabaseFormat. Unable to read 'db.cpd'.\n";
    m_storage.WriteUINT32(4);  // the container table has entries 0 to 3
    m_storage.WriteUINT32(2);  // the implicit-relationship table has entries 0 and 1
    m_storage.WriteHandle(77);
    m_storage.WriteHandle(0);
    Rewind();
    EXPECT_THAT([&] { m_storage.ReadManagedContainerPtr(); },
                ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(StrEq(damaged)));
    EXPECT_THROW(m_storage.ReadManagedImpRelPtr(), Qmx_CorrException::InvalidDatabaseFormat);
    m_data.itemSwizzler = nullptr;
    EXPECT_THROW(m_storage.ReadManagedItemPtr(), Qmx_CorrException::InvalidDatabaseFormat);
    EXPECT_EQ(m_storage.ReadManagedItemPtr(), nullptr);
}

TEST_F(CorrStorageTest, CheckCountComparesWithTheBytesLeft) {
    for (int i = 0; i < 4; ++i) m_storage.WriteUINT32(i);
    Rewind();
    m_storage.ReadUINT32();
    EXPECT_EQ(m_storage.BytesLeft(), 12);
    EXPECT_NO_THROW(m_storage.CheckCount(3, 4));
    EXPECT_THROW(m_storage.CheckCount(4, 4), Qmx_CorrException::InvalidDatabaseFormat);
    // A product that would overflow 64 bits must not pass as small.
    EXPECT_THROW(m_storage.CheckCount(0x4000000000000001ull, 4),
                 Qmx_CorrException::InvalidDatabaseFormat);
    EXPECT_EQ(m_storage.GetName(), "db.cpd");
}

TEST_F(CorrStorageTest, OrdinalsWrittenInTableOrderFindTheRestoredCopies) {
    for (std::size_t i = 1; i < m_data.containers.size(); ++i)
        m_storage.WriteContainerPtr(m_data.containers[i]);
    m_storage.WriteContainerPtr(nullptr);
    // On reopening, the table holds the restored objects in the order their records came.
    m_data.containers = {nullptr, Fake<Qmx_CorrManagedContainer>(100),
                         Fake<Qmx_CorrManagedContainer>(101), Fake<Qmx_CorrManagedContainer>(102)};
    Rewind();
    for (std::size_t i = 1; i < m_data.containers.size(); ++i)
        EXPECT_EQ(m_storage.ReadManagedContainerPtr(), m_data.containers[i]) << "ordinal " << i;
    EXPECT_EQ(m_storage.ReadManagedContainerPtr(), nullptr);
}

TEST_F(CorrStorageTest, ObjectsWithoutANumberAreRefusedAndNothingIsWritten) {
    const auto refused = [](const std::string& what) {
        return ThrowsMessage<Qmx_CorrException::InvalidRequest>(
            StrEq("Qmx_CorrException::InvalidRequest.  '" + what + "'\n"));
    };
    // Between two table entries and beyond the last: the lower bound would be a neighbour's.
    EXPECT_THAT([&] { m_storage.WriteContainerPtr(Fake<Qmx_CorrManagedContainer>(4)); },
                refused("WriteContainerPtr: the container is not in the table"));
    EXPECT_THROW(m_storage.WriteContainerPtr(Fake<Qmx_CorrManagedContainer>(10)),
                 Qmx_CorrException::InvalidRequest);
    EXPECT_THAT([&] { m_storage.WriteImpRelPtr(Fake<Qmx_CorrManagedImplicitRelationship>(8)); },
                refused("WriteImpRelPtr: the relationship is not in the table"));
    m_data.itemSwizzler = nullptr;
    m_data.expRelSwizzler = nullptr;
    EXPECT_THAT([&] { m_storage.WriteItemPtr(Fake<Qmx_CorrManagedItem>(1)); },
                refused("WriteItemPtr: no item swizzler"));
    EXPECT_THAT([&] { m_storage.WriteExpRelPtr(Fake<Qmx_CorrManagedExplicitRelationship>(2)); },
                refused("WriteExpRelPtr: no explicit-relationship swizzler"));
    EXPECT_EQ(m_bytes.str(), "");
    m_storage.WriteItemPtr(nullptr);
    m_storage.WriteExpRelPtr(nullptr);
    EXPECT_EQ(m_bytes.str(), std::string(8, '\0'));
}

TEST_F(CorrStorageTest, NullHandleIsTheSwizzlersToAnswerWhenThereIsOne) {
    m_items.Add(Fake<Qmx_CorrManagedItem>(40), 0);  // a swizzler may map 0 as it likes
    m_storage.WriteHandle(0);
    m_storage.WriteHandle(0);
    Rewind();
    EXPECT_EQ(m_storage.ReadManagedItemPtr(), Fake<Qmx_CorrManagedItem>(40));
    EXPECT_EQ(m_items.m_lookups, 1);
    m_data.itemSwizzler = nullptr;
    EXPECT_EQ(m_storage.ReadManagedItemPtr(), nullptr);
    EXPECT_EQ(m_items.m_lookups, 1);
}

TEST_F(CorrStorageTest, CutHandlesAndOrdinalsAreDamage) {
    const std::string damaged =
        "Qmx_CorrException::InvalidDatabaseFormat. Unable to read 'db.cpd'.\n";
    m_bytes.write("\x01\x02\x03", 3);
    EXPECT_THAT([&] { m_storage.ReadManagedExpRelPtr(); },
                ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(StrEq(damaged)));
    Rewind();
    EXPECT_THROW(m_storage.ReadManagedContainerPtr(), Qmx_CorrException::InvalidDatabaseFormat);
    EXPECT_EQ(m_relationships.m_lookups, 0);
}

}  // namespace
