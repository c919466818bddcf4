// Both overflow managers against the same expectations: lists kept per (object, selector),
// streams in key order, and damaged streams refused without changing the manager.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#include "Qmx_CorrException.h"
#include "Qmx_CorrItemRelOverflowMgr.h"
#include "Qmx_CorrRelItemOverflowMgr.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStream_Internal.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Handles = std::vector<unsigned int>;

// The stream bytes of a list of UINT32 values.
std::string Bytes(const std::vector<unsigned int>& values) {
    std::string bytes;
    for (unsigned int v : values) {
        for (int shift = 0; shift < 32; shift += 8) bytes += static_cast<char>((v >> shift) & 0xFF);
    }
    return bytes;
}

// Objects are never dereferenced: the swizzler gives each fake address the handle it
// stands for, and refuses addresses it does not know, as a pool manager does.
template <class T>
class FakeSwizzler : public Qmx_CorrPtrSwizzlerT<T, unsigned int> {
public:
    explicit FakeSwizzler(bool* destroyed) : m_destroyed(destroyed) {}
    ~FakeSwizzler() override { *m_destroyed = true; }
    unsigned int GetHandle(T* object) override {
        const auto handle = reinterpret_cast<std::uintptr_t>(object) / 8;
        if (handle == 0 || handle > 1000) throw std::out_of_range("unknown object");
        return static_cast<unsigned int>(handle);
    }
    T* GetPtr(unsigned int handle) override { return Object(handle); }
    static T* Object(unsigned int handle) {
        return reinterpret_cast<T*>(static_cast<std::uintptr_t>(handle) * 8);
    }

private:
    bool* m_destroyed;
};

template <class Mgr>
class CorrOverflowMgrTest : public ::testing::Test {
protected:
    using Object = typename Mgr::Object;
    using Swizzler = FakeSwizzler<Object>;

    CorrOverflowMgrTest() : m_mgr(new Swizzler(&m_swizzlerDestroyed)) {}
    static const Object* Obj(unsigned int handle) { return Swizzler::Object(handle); }

    std::string Archived(const Mgr& mgr) {
        std::stringstream bytes;
        Qmx_CorrStream_Internal stream(&bytes, "db.cpd");
        Qmx_CorrStorage storage("db.cpd", &stream, m_data);
        mgr.Archive(storage);
        return bytes.str();
    }
    void Restore(Mgr& mgr, const std::string& bytes) {
        std::stringstream in(bytes);
        Qmx_CorrStream_Internal stream(&in, "db.cpd");
        Qmx_CorrStorage storage("db.cpd", &stream, m_data);
        mgr.Restore(storage);
    }
    // Restoring `bytes` is refused with the database name and leaves the manager as it was.
    void ExpectRefused(const std::string& bytes, const std::string& why) {
        const std::string before = Archived(m_mgr);
        EXPECT_THAT([&] { Restore(m_mgr, bytes); },
                    ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(StrEq(
                        "Qmx_CorrException::InvalidDatabaseFormat. Unable to read 'db.cpd'.\n")))
            << why;
        EXPECT_EQ(Archived(m_mgr), before) << why;
    }

    Qmx_CorrStorageData m_data;
    bool m_swizzlerDestroyed = false;
    Mgr m_mgr;
};

using Managers = ::testing::Types<Qmx_CorrItemRelOverflowMgr, Qmx_CorrRelItemOverflowMgr>;
TYPED_TEST_SUITE(CorrOverflowMgrTest, Managers);

TYPED_TEST(CorrOverflowMgrTest, ListsAreKeptPerObjectAndSelector) {
    auto& mgr = this->m_mgr;
    EXPECT_THAT(mgr.GetList(this->Obj(5), 0), IsEmpty());
    EXPECT_THAT(mgr.SetList(this->Obj(5), 0, {7, 3, 7}), ElementsAre(7, 3, 7));
    mgr.SetList(this->Obj(5), 1, {1, 2});
    mgr.SetList(this->Obj(6), 0, {4, 4, 4});
    Handles copy = mgr.GetList(this->Obj(5), 0);
    copy.push_back(99);  // a copy: the kept list does not change
    EXPECT_THAT(mgr.GetList(this->Obj(5), 0), ElementsAre(7, 3, 7));
    EXPECT_THAT(mgr.SetList(this->Obj(5), 0, {8}), ElementsAre(8));
    EXPECT_THAT(mgr.GetList(this->Obj(5), 0), ElementsAre(8));

    mgr.RemoveLists(this->Obj(5));
    mgr.RemoveLists(this->Obj(9));  // has none
    EXPECT_THAT(mgr.GetList(this->Obj(5), 0), IsEmpty());
    EXPECT_THAT(mgr.GetList(this->Obj(5), 1), IsEmpty());
    EXPECT_THAT(mgr.GetList(this->Obj(6), 0), ElementsAre(4, 4, 4));
}

TYPED_TEST(CorrOverflowMgrTest, StreamHoldsEntriesInKeyOrder) {
    EXPECT_EQ(this->Archived(this->m_mgr), Bytes({0, 0}));
    this->m_mgr.SetList(this->Obj(9), 0, {11, 12, 13});
    this->m_mgr.SetList(this->Obj(5), 1, {258, 0x01020304});
    this->m_mgr.SetList(this->Obj(5), 0, {7, 3, 7});
    EXPECT_EQ(this->Archived(this->m_mgr), Bytes({0, 3,                      //
                                                  5, 0, 3, 7, 3, 7,          //
                                                  5, 1, 2, 258, 0x01020304,  //
                                                  9, 0, 3, 11, 12, 13}));
}

TYPED_TEST(CorrOverflowMgrTest, RestoreGivesBackEveryListAndReplacesKeptOnes) {
    this->m_mgr.SetList(this->Obj(5), 0, {7, 3, 7});
    this->m_mgr.SetList(this->Obj(5), 1, {});
    this->m_mgr.SetList(this->Obj(1000), 1, {0xFFFFFFFFu, 0, 1});
    const std::string stream = this->Archived(this->m_mgr);

    bool destroyed = false;
    TypeParam reopened(new typename TestFixture::Swizzler(&destroyed));
    reopened.SetList(this->Obj(5), 0, {1});
    reopened.SetList(this->Obj(2), 1, {2, 2, 2});
    this->Restore(reopened, stream);
    EXPECT_THAT(reopened.GetList(this->Obj(5), 0), ElementsAre(7, 3, 7));
    EXPECT_THAT(reopened.GetList(this->Obj(1000), 1), ElementsAre(0xFFFFFFFFu, 0, 1));
    EXPECT_THAT(reopened.GetList(this->Obj(2), 1), ElementsAre(2, 2, 2));
    reopened.RemoveLists(this->Obj(2));
    EXPECT_EQ(this->Archived(reopened), stream);
}

TYPED_TEST(CorrOverflowMgrTest, DamagedStreamsAreRefusedAndChangeNothing) {
    this->m_mgr.SetList(this->Obj(3), 0, {1, 2, 3});
    const std::string good = Bytes({0, 2, 5, 0, 3, 7, 3, 7, 6, 1, 0});
    this->ExpectRefused(Bytes({1, 0}), "format 1");
    this->ExpectRefused(Bytes({0, 0xFFFFFFFFu}), "absurd entry count");
    this->ExpectRefused(Bytes({0, 1, 5, 0, 0x40000000u, 1}), "absurd element count");
    this->ExpectRefused(Bytes({0, 1, 5, 2, 0}), "selector 2");
    this->ExpectRefused(Bytes({0, 1, 5, 0xFFFFFFFFu, 0}), "selector -1");
    this->ExpectRefused(Bytes({0, 2, 6, 0, 0, 5, 0, 0}), "keys out of order");
    this->ExpectRefused(Bytes({0, 2, 5, 1, 0, 5, 1, 0}), "key twice");
    this->ExpectRefused(good + Bytes({0}), "bytes after the last entry");
    for (std::size_t length = 0; length < good.size(); ++length) {
        this->ExpectRefused(good.substr(0, length), "cut at " + std::to_string(length));
    }
    this->Restore(this->m_mgr, good);
    EXPECT_THAT(this->m_mgr.GetList(this->Obj(5), 0), ElementsAre(7, 3, 7));
    EXPECT_THAT(this->m_mgr.GetList(this->Obj(3), 0), ElementsAre(1, 2, 3));
}

TYPED_TEST(CorrOverflowMgrTest, RefusedRequestsKeepNothing) {
    EXPECT_THAT(
        [&] {
            this->m_mgr.SetList(this->Obj(5), 2, {1, 2, 3});
        },
        ThrowsMessage<Qmx_CorrException::InvalidRequest>(
            StrEq("Qmx_CorrException::InvalidRequest.  'SetList: the selector is "
                  "neither 0 nor 1'\n")));
    // An object its pool manager does not know: the swizzler's failure passes through.
    EXPECT_THROW(this->m_mgr.SetList(this->Obj(2000), 0, {1, 2, 3}), std::out_of_range);
    EXPECT_EQ(this->Archived(this->m_mgr), Bytes({0, 0}));
}

TYPED_TEST(CorrOverflowMgrTest, ManagerDeletesItsSwizzler) {
    bool destroyed = false;
    {
        TypeParam mgr(new typename TestFixture::Swizzler(&destroyed));
        mgr.SetList(this->Obj(1), 0, {1, 2, 3});
        EXPECT_FALSE(destroyed);
    }
    EXPECT_TRUE(destroyed);
}

}  // namespace
