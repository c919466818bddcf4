#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>
#include <string>
#include <vector>

#include "../support/FakeOwner.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrObject.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStream_Internal.h"

namespace {

using qmxtest::DataItem;
using qmxtest::FakeOwner;
using ::testing::HasSubstr;
using ::testing::Property;
using ::testing::Throws;

const char* const kRestricted = "Qmx_CorrMgrTest_Data";
const char* const kCode = "kqzva";

template <class E>
auto ThrowsNaming(const std::string& name) {
    return Throws<E>(Property(&E::what, HasSubstr("'" + name + "'")));
}

std::vector<std::string> Names(const Qmx_CorrPropertyMap& map) {
    std::vector<std::string> names;
    for (const auto& entry : map) names.push_back(entry.first);
    return names;
}

class CorrObjectPropertiesTest : public ::testing::Test {
protected:
    FakeOwner m_owner;
    Qmx_CorrItemDataMgr& m_mgr = *m_owner.GetItemDataMgr();
    DataItem m_item{m_mgr, nullptr, "u1"};
};

TEST_F(CorrObjectPropertiesTest, UnrestrictedNamesDemandANullAccessor) {
    m_item.SetProperty_INT32("width", 8, nullptr);
    EXPECT_THAT([&] { m_item.GetProperty_INT32("width", kCode); },
                ThrowsNaming<Qmx_CorrException::IncorrectPropertyAccessor>("width"));
    EXPECT_THAT([&] { m_item.GetProperty_String("width", ""); },
                ThrowsNaming<Qmx_CorrException::IncorrectPropertyAccessor>("width"));
    EXPECT_THAT([&] { m_item.SetProperty_INT32("width", 9, "x"); },
                ThrowsNaming<Qmx_CorrException::IncorrectPropertyAccessor>("width"));
    EXPECT_THAT([&] { m_item.SetProperty_String("width", "9", "x"); },
                ThrowsNaming<Qmx_CorrException::IncorrectPropertyAccessor>("width"));
    EXPECT_THAT([&] { m_item.DestroyProperty("width", "x"); },
                ThrowsNaming<Qmx_CorrException::IncorrectPropertyAccessor>("width"));
    // Nothing the refused calls did shows.
    EXPECT_EQ(m_item.GetProperty_INT32("width", nullptr), 8);
    EXPECT_TRUE(m_item.HasProperty("width"));
    m_item.DestroyProperty("width", nullptr);
    EXPECT_FALSE(m_item.HasProperty("width"));
}

TEST_F(CorrObjectPropertiesTest, RestrictedNameDemandsItsCodeBeforeAnythingElse) {
    EXPECT_THAT([&] { m_item.GetProperty_INT32(kRestricted, nullptr); },
                ThrowsNaming<Qmx_CorrException::IncorrectPropertyAccessor>(kRestricted));
    EXPECT_THAT([&] { m_item.GetProperty_INT32(kRestricted, kCode); },
                ThrowsNaming<Qmx_CorrException::PropertyDoesNotExist>(kRestricted));
    for (const char* wrong : {"kqzv", "kqzvaa", "KQZVA", ""}) {
        EXPECT_THROW(m_item.SetProperty_String(kRestricted, "v", wrong),
                     Qmx_CorrException::IncorrectPropertyAccessor)
            << wrong;
    }
    EXPECT_FALSE(m_item.HasProperty(kRestricted));
    m_item.SetProperty_String(kRestricted, "secret", kCode);
    EXPECT_EQ(m_item.GetProperty_String(kRestricted, kCode), "secret");
    EXPECT_THROW(m_item.DestroyProperty(kRestricted, nullptr),
                 Qmx_CorrException::IncorrectPropertyAccessor);
    m_item.DestroyProperty(kRestricted, kCode);
    EXPECT_FALSE(m_item.HasProperty(kRestricted));
}

TEST_F(CorrObjectPropertiesTest, RemovingAnAbsentPropertyNeverChecksTheAccessor) {
    EXPECT_FALSE(m_item.HasProperty("none"));
    EXPECT_NO_THROW(m_item.DestroyProperty("none", "any accessor"));
    EXPECT_NO_THROW(m_item.DestroyProperty(kRestricted, nullptr));
    // And it leaves a shared record shared.
    EXPECT_EQ(m_item.GetRecord(), m_mgr.GetDefaultData(nullptr));
    EXPECT_THAT([&] { m_item.GetProperty_String("none", nullptr); },
                ThrowsNaming<Qmx_CorrException::PropertyDoesNotExist>("none"));
}

TEST_F(CorrObjectPropertiesTest, TypeChangesKeepTheOtherField) {
    m_item.SetProperty_INT32("p", 41, nullptr);
    m_item.SetProperty_String("p", "text", nullptr);
    EXPECT_EQ(m_item.GetProperty_String("p", nullptr), "text");
    EXPECT_THAT([&] { m_item.GetProperty_INT32("p", nullptr); },
                ThrowsNaming<Qmx_CorrException::IncorrectPropertyType>("p"));

    Qmx_CorrPropertyValue value = m_item.GetProperties().at("p");
    value.SetType(Qmx_CorrPropertyValue::kINT32);
    EXPECT_EQ(value.GetINT32(), 41);

    m_item.SetProperty_INT32("p", 7, nullptr);
    EXPECT_THAT([&] { m_item.GetProperty_String("p", nullptr); },
                ThrowsNaming<Qmx_CorrException::IncorrectPropertyType>("p"));
    value = m_item.GetProperties().at("p");
    value.SetType(Qmx_CorrPropertyValue::kString);
    EXPECT_EQ(value.GetString(), "text");

    // A new string property starts with the integer 0.
    m_item.SetProperty_String("q", "s", nullptr);
    value = m_item.GetProperties().at("q");
    value.SetType(Qmx_CorrPropertyValue::kINT32);
    EXPECT_EQ(value.GetINT32(), 0);
}

TEST_F(CorrObjectPropertiesTest, StringSetFromItsOwnValueIsKept) {
    m_item.SetProperty_String("a", "same", nullptr);
    m_item.SetProperty_String("a", m_item.GetProperty_String("a", nullptr), nullptr);
    EXPECT_EQ(m_item.GetProperty_String("a", nullptr), "same");
}

TEST_F(CorrObjectPropertiesTest, RecordKeepsByteOrderAndTheIntegersBitPattern) {
    for (const char* name : {"abc", "a", "\xC3\xA9", "B", "ab"})
        m_item.SetProperty_INT32(name, -1, nullptr);
    m_item.SetProperty_String("ab", std::string("x\0y", 3), nullptr);
    EXPECT_EQ(Names(m_item.GetProperties()),
              (std::vector<std::string>{"B", "a", "ab", "abc", "\xC3\xA9"}));

    std::stringstream bytes;
    Qmx_CorrStream_Internal stream(&bytes, "db.cpd");
    Qmx_CorrStorageData data;
    Qmx_CorrStorage storage("db.cpd", &stream, data);
    Qmx_CorrObjectData::WritePropertyMap(storage, m_item.GetProperties());
    const std::string expected = std::string("\x05\0\0\0", 4) +  // count
                                 std::string(
                                     "\x01\0\0\0"
                                     "B"
                                     "\0\0\0\0",
                                     9) +                              // B, INT32
                                 std::string("\xFF\xFF\xFF\xFF", 4) +  // -1
                                 std::string(
                                     "\x01\0\0\0"
                                     "a"
                                     "\0\0\0\0",
                                     9) +
                                 std::string("\xFF\xFF\xFF\xFF", 4) +
                                 std::string(
                                     "\x02\0\0\0"
                                     "ab"
                                     "\x01\0\0\0",
                                     10) +  // String
                                 std::string(
                                     "\x03\0\0\0"
                                     "x\0y",
                                     7) +
                                 std::string(
                                     "\x03\0\0\0"
                                     "abc"
                                     "\0\0\0\0",
                                     11) +
                                 std::string("\xFF\xFF\xFF\xFF", 4) +
                                 std::string(
                                     "\x02\0\0\0"
                                     "\xC3\xA9"
                                     "\0\0\0\0",
                                     10) +
                                 std::string("\xFF\xFF\xFF\xFF", 4);
    EXPECT_EQ(bytes.str(), expected);

    stream.SeekPos(0);
    Qmx_CorrPropertyMap back;
    Qmx_CorrObjectData::ReadPropertyMap(storage, back);
    EXPECT_EQ(Names(back), Names(m_item.GetProperties()));
    EXPECT_EQ(back.at("a").GetINT32(), -1);
    EXPECT_EQ(back.at("ab").GetString(), std::string("x\0y", 3));
}

TEST_F(CorrObjectPropertiesTest, DamagedPropertyRecordsAreRefused) {
    std::stringstream bytes;
    Qmx_CorrStream_Internal stream(&bytes, "db.cpd");
    Qmx_CorrStorageData data;
    Qmx_CorrStorage storage("db.cpd", &stream, data);
    Qmx_CorrPropertyMap map;
    // A stored tag of 2.
    bytes.str(
        std::string("\x01\0\0\0"
                    "\x01\0\0\0"
                    "n"
                    "\x02\0\0\0"
                    "\0\0\0\0",
                    17));
    EXPECT_THROW(Qmx_CorrObjectData::ReadPropertyMap(storage, map),
                 Qmx_CorrException::IncorrectPropertyType);
    // A count that the stream cannot hold is refused before anything is read.
    bytes.str(
        std::string("\xFF\xFF\xFF\x7F"
                    "\0\0\0\0",
                    8));
    stream.SeekPos(0);
    EXPECT_THROW(Qmx_CorrObjectData::ReadPropertyMap(storage, map),
                 Qmx_CorrException::InvalidDatabaseFormat);
    // A name stored twice keeps the later value.
    bytes.str(
        std::string("\x02\0\0\0"
                    "\x01\0\0\0"
                    "n"
                    "\0\0\0\0"
                    "\x01\0\0\0"
                    "\x01\0\0\0"
                    "n"
                    "\0\0\0\0"
                    "\x02\0\0\0",
                    30));
    stream.SeekPos(0);
    Qmx_CorrObjectData::ReadPropertyMap(storage, map);
    ASSERT_EQ(map.size(), 1u);
    EXPECT_EQ(map.at("n").GetINT32(), 2);
    // Writing a value with a tag that is neither 0 nor 1.
    map.at("n").SetType(5);
    EXPECT_THROW(Qmx_CorrObjectData::WritePropertyMap(storage, map),
                 Qmx_CorrException::IncorrectPropertyType);
}

TEST_F(CorrObjectPropertiesTest, WritingOnSharedDataGivesAFreshRecordAtTheFirstFreeSlot) {
    DataItem second(m_mgr, nullptr, "u2");
    DataItem third(m_mgr, nullptr, "u3");
    const boost::shared_ptr<Qmx_CorrItemData> shared = m_mgr.GetDefaultData(nullptr);
    // Slots: 0 the default, 1 and 2 private records, then slot 1 freed.
    DataItem doomed(m_mgr, nullptr, "d");
    doomed.SetProperty_INT32("x", 1, nullptr);
    DataItem keeper(m_mgr, nullptr, "k");
    keeper.SetProperty_INT32("y", 2, nullptr);
    EXPECT_EQ(m_mgr.GetIndex(keeper.GetRecord().get()), 2u);
    doomed.Release();
    EXPECT_EQ(m_mgr.GetFreeSlots(), 1u);

    second.SetProperty_String("note", "mine", nullptr);
    EXPECT_EQ(m_mgr.GetIndex(second.GetRecord().get()), 1u);
    EXPECT_EQ(m_mgr.GetFreeSlots(), 0u);
    EXPECT_EQ(m_mgr.GetSlotCount(), 3u);
    EXPECT_EQ(second.GetRecord()->GetContainer(), nullptr);
    // The default and its other users see nothing of it.
    EXPECT_EQ(third.GetRecord(), shared);
    EXPECT_EQ(m_item.GetRecord(), shared);
    EXPECT_TRUE(shared->GetProperties().empty());
    // A record held alone is written in place; the next record is appended.
    second.SetProperty_INT32("n", 3, nullptr);
    EXPECT_EQ(m_mgr.GetIndex(second.GetRecord().get()), 1u);
    third.SetProperty_INT32("n", 4, nullptr);
    EXPECT_EQ(m_mgr.GetIndex(third.GetRecord().get()), 3u);
}

TEST_F(CorrObjectPropertiesTest, RefusedWriteMayLeaveAPrivateEmptyRecord) {
    m_item.SetProperty_INT32("kept", 1, nullptr);
    DataItem other(m_mgr, nullptr, "u2");
    EXPECT_THROW(other.SetProperty_INT32("p", 1, "wrong"),
                 Qmx_CorrException::IncorrectPropertyAccessor);
    EXPECT_NE(other.GetRecord(), m_mgr.GetDefaultData(nullptr));
    EXPECT_TRUE(other.GetProperties().empty());
    EXPECT_EQ(m_item.GetProperty_INT32("kept", nullptr), 1);
}

}  // namespace
