// The managed implicit relationship: mapping items between the mirrored subtrees of its two
// containers, with and without creating them, its direction rules, its name transform, its
// record, its dump and its self-check, and its deletion.
#include "Qmx_CorrManagedImplicitRelationship.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <sstream>
#include <string>
#include <vector>

#include "Qmx_CorrDataMgr.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrMgr.h"
#include "Qmx_CorrRelDataMgr.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStream_Internal.h"
#include "Vesk_MsgManData.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::ThrowsMessage;
using Container = Qmx_CorrManagedContainer;
using ImpRel = Qmx_CorrManagedImplicitRelationship;
using Dir_t = Qmx_CorrImplicitRelationship::DIRECTION;
namespace Ex = Qmx_CorrException;

const char* const kDbName = "corr.cpd";
const std::string kDamaged =
    "Qmx_CorrException::InvalidDatabaseFormat. Unable to read 'corr.cpd'.\n";
const Dir_t kForward = Qmx_CorrImplicitRelationship::DIR_SRC_TO_DST;
const Dir_t kBackward = Qmx_CorrImplicitRelationship::DIR_DST_TO_SRC;
const Dir_t kBoth = Qmx_CorrImplicitRelationship::DIR_BOTH;

class ImplicitRelationshipTest : public ::testing::Test {
protected:
    Container* Top() { return static_cast<Container*>(mgr.GetTopContainer()); }
    Qmx_CorrObjectOwner* Owner() { return Top()->GetOwner(); }
    Qmx_CorrRelDataMgr* RelData() { return Owner()->GetRelDataMgr(); }
    // "a/b": the container /a/b/, made on the way.
    Container* Dir(const std::string& path) {
        Qmx_CorrContainer* c = Top();
        std::istringstream parts(path);
        for (std::string part; std::getline(parts, part, '/');) {
            Qmx_CorrContainer* next = c->GetContainer(part);
            c = next ? next : c->CreateContainer(part);
        }
        return static_cast<Container*>(c);
    }
    // "a/b/x": the item x of /a/b/, made when missing.
    Qmx_CorrItem* Item(const std::string& path) {
        const std::size_t slash = path.rfind('/');
        Container* c = slash == std::string::npos ? Top() : Dir(path.substr(0, slash));
        return c->FindOrCreateItem(path.substr(slash + 1));
    }
    ImpRel* Relate(const char* src, const char* dst, bool create, Dir_t dir,
                   const char* expression = nullptr, const char* format = nullptr) {
        return static_cast<ImpRel*>(
            mgr.CreateImplicitRelationship(Dir(src), Dir(dst), create, dir, expression, format));
    }

    Qmx_CorrMgr mgr{"", "", Qmx_CorrMgr::DB_READ_WRITE, nullptr};
};

TEST_F(ImplicitRelationshipTest, ItemsMapToTheMirroredPlaceMadeOnlyWhenAllowed) {
    ImpRel* plain = Relate("a", "b", false, kBoth);
    Qmx_CorrItem* deep = Item("a/s/t/x");
    EXPECT_EQ(plain->GetDstItem(deep), nullptr);
    EXPECT_EQ(plain->MapToDst(deep, true), nullptr);
    EXPECT_THAT(Dir("b")->GetContainers(), IsEmpty());
    Qmx_CorrItem* copy = Item("b/s/t/x");
    EXPECT_EQ(plain->GetDstItem(deep), copy);
    EXPECT_EQ(plain->GetSrcItem(copy), deep);
    const ImpRel* constRel = plain;
    EXPECT_EQ(constRel->GetDstItem(deep), copy);
    EXPECT_EQ(constRel->GetSrcItem(copy), deep);

    ImpRel* creating = Relate("c", "d", true, kBoth);
    Qmx_CorrItem* src = Item("c/s/t/x");
    EXPECT_EQ(creating->MapToDst(src, false), nullptr);
    EXPECT_THAT(Dir("d")->GetContainers(), IsEmpty());
    Qmx_CorrItem* made = creating->GetDstItem(src);
    ASSERT_NE(made, nullptr);
    EXPECT_EQ(made->GetAbsoluteName(), "/d/s/t/x");
    EXPECT_EQ(creating->MapToDst(src, false), made);
    Qmx_CorrItem* dst = Item("d/u/y");
    EXPECT_EQ(creating->MapToSrc(dst, false), nullptr);
    EXPECT_EQ(Dir("c")->GetContainer("u"), nullptr);
    EXPECT_EQ(creating->GetSrcItem(dst)->GetAbsoluteName(), "/c/u/y");
}

TEST_F(ImplicitRelationshipTest, DirectionAndItemRules) {
    const std::string wrongWay = "Qmx_CorrException::InvalidDirection\n";
    ImpRel* forward = Relate("a", "b", true, kForward);
    ImpRel* backward = Relate("c", "d", true, kBackward);
    // The direction is checked before anything else, the item included.
    EXPECT_THAT([&] { forward->GetSrcItem(nullptr); },
                ThrowsMessage<Ex::InvalidDirection>(wrongWay));
    EXPECT_THAT([&] { backward->GetDstItem(Item("c/x")); },
                ThrowsMessage<Ex::InvalidDirection>(wrongWay));
    EXPECT_THROW(forward->MapToSrc(Item("b/y"), false), Ex::InvalidDirection);
    EXPECT_THAT(Dir("d")->GetItems(), IsEmpty());
    EXPECT_NE(forward->GetDstItem(Item("a/x")), nullptr);
    EXPECT_NE(backward->GetSrcItem(Item("d/y")), nullptr);
    // A direction outside the three is followed both ways.
    ImpRel* other = Relate("e", "f", true, static_cast<Dir_t>(7));
    EXPECT_NE(other->GetDstItem(Item("e/x")), nullptr);
    EXPECT_NE(other->GetSrcItem(Item("f/y")), nullptr);

    EXPECT_THAT([&] { forward->GetDstItem(nullptr); },
                ThrowsMessage<Ex::InvalidSrcItem>("Qmx_CorrException::InvalidSrcItem."));
    EXPECT_THAT([&] { backward->GetSrcItem(nullptr); },
                ThrowsMessage<Ex::InvalidDstItem>("Qmx_CorrException::InvalidDstItem."));
    // /ab/ shares a prefix with /a/ but is not beneath it.
    EXPECT_THAT([&] { forward->GetDstItem(Item("ab/x")); },
                ThrowsMessage<Ex::InvalidSrcItem>(
                    "Qmx_CorrException::InvalidSrcItem. The correlation item '/ab/x' is not a "
                    "valid relationship source for the attempted operation."));
    EXPECT_THAT([&] { backward->GetSrcItem(Item("x")); },
                ThrowsMessage<Ex::InvalidDstItem>(
                    "Qmx_CorrException::InvalidDstItem. The correlation item '/x' is not a valid "
                    "relationship destination for the attempted operation."));
    EXPECT_EQ(Dir("b")->GetContainer("ab"), nullptr);
}

TEST_F(ImplicitRelationshipTest, TheTransformRewritesNamesTheSameWayInBothDirections) {
    ImpRel* rel = Relate("a", "b", false, kBoth, "_in$", "_out");
    Qmx_CorrItem* clkOut = Item("b/clk_out");
    Qmx_CorrItem* data = Item("b/data");
    EXPECT_EQ(rel->GetDstItem(Item("a/clk_in")), clkOut);
    EXPECT_EQ(rel->GetDstItem(Item("a/data")), data);
    // Not inverted: the destination item's name goes through the same expression.
    Qmx_CorrItem* rstOut = Item("a/rst_out");
    EXPECT_EQ(rel->GetSrcItem(Item("b/rst_in")), rstOut);
    EXPECT_STREQ(rel->GetSrcExpression(), "_in$");
    EXPECT_STREQ(rel->GetDstFormat(), "_out");

    struct Case {
        const char* expression;
        const char* format;
        const char* name;
        const char* expected;
    };
    const Case cases[] = {
        {"x*", "-", "ab", "-a-b-"},  // an empty match at every position
        {"(\\w+?)_(\\d+)", "$2_$1", "bus_7 net_12", "7_bus 12_net"},
        {"a", "A", "banana", "bAnAnA"},
        {"zz", "Q", "abc", "abc"},
        {"^", "p_", "abc", "p_abc"},
    };
    for (const Case& test : cases) {
        const ImpRel local(Owner(), Dir("p"), Dir("q"), false, kBoth, test.expression, test.format);
        EXPECT_EQ(local.TransformName(test.name), test.expected) << test.expression;
    }
    // No transform, or an empty expression: neither text is given, the names stay.
    for (ImpRel* plain :
         {Relate("c", "d", false, kBoth), Relate("e", "f", false, kBoth, "", "x")}) {
        EXPECT_EQ(plain->GetSrcExpression(), nullptr);
        EXPECT_EQ(plain->GetDstFormat(), nullptr);
        EXPECT_EQ(plain->TransformName("clk_in"), "clk_in");
    }
}

// One record stream with the tables of a commit: null first, then the objects by address.
class RecordIo {
public:
    RecordIo(std::vector<Container*> containers, std::vector<ImpRel*> rels) {
        std::sort(containers.begin(), containers.end(), std::less<Container*>());
        std::sort(rels.begin(), rels.end(), std::less<ImpRel*>());
        containers.insert(containers.begin(), nullptr);
        rels.insert(rels.begin(), nullptr);
        data.containers = containers;
        data.implicitRelationships = rels;
    }
    unsigned int Of(const Container* c) const {
        const auto& table = data.containers;
        return static_cast<unsigned int>(std::find(table.begin(), table.end(), c) - table.begin());
    }
    void Reset(const std::string& content) {
        bytes.str(content);
        bytes.clear();
    }

    std::stringstream bytes;
    Qmx_CorrStream_Internal stream{&bytes, kDbName};
    Qmx_CorrStorageData data;
    Qmx_CorrStorage storage{kDbName, &stream, data};
};

TEST_F(ImplicitRelationshipTest, RecordRoundTrip) {
    Container* a = Dir("a");
    Container* b = Dir("b");
    ImpRel* rel = Relate("a", "b", true, kBackward, "_in$", "_out");
    rel->SetProperty_INT32("weight", 3, nullptr);
    ImpRel* plain = Relate("b", "a", false, kForward);
    RecordIo io({Top(), a, b}, {rel, plain});
    rel->Archive(io.storage);
    const std::string written = io.bytes.str();

    RecordIo expected({Top(), a, b}, {rel, plain});
    Qmx_CorrStorage& e = expected.storage;
    e.WriteUINT32(RelData()->GetIndex(static_cast<const Qmx_CorrRelData*>(rel->GetObjectData())));
    e.WriteUINT32(expected.Of(a));
    e.WriteUINT32(expected.Of(b));
    e.WriteBool(true);
    e.WriteUINT32(1);
    e.WriteBool(true);
    e.WriteString("_in$");
    e.WriteString("_out");
    EXPECT_EQ(written, expected.bytes.str());
    EXPECT_EQ(io.data.impRelVersion, 1u);

    // The copy writes the same bytes, so it holds the same fields.
    const ImpRel copy(io.storage, Owner());
    EXPECT_EQ(io.storage.BytesLeft(), 0);
    EXPECT_EQ(copy.GetObjectData(), rel->GetObjectData());
    EXPECT_EQ(copy.TransformName("clk_in"), "clk_out");
    RecordIo again({Top(), a, b}, {rel, plain});
    copy.Archive(again.storage);
    EXPECT_EQ(again.bytes.str(), written);
    // Without a transform the record ends with its flag.
    RecordIo bare({Top(), a, b}, {rel, plain});
    plain->Archive(bare.storage);
    EXPECT_EQ(bare.bytes.str().size(), 4u * 4 + 2);
    EXPECT_EQ(ImpRel(bare.storage, Owner()).GetDstFormat(), nullptr);
}

TEST_F(ImplicitRelationshipTest, DamagedRecordsAreRefused) {
    ImpRel* gone = Relate("a", "b", false, kBoth);
    gone->SetProperty_INT32("p", 1, nullptr);
    const unsigned int freeSlot =
        RelData()->GetIndex(static_cast<const Qmx_CorrRelData*>(gone->GetObjectData()));
    gone->Delete();
    RecordIo io({}, {});
    io.data.containers = {nullptr, Top(), Dir("a"), Dir("b")};  // read in restore order
    const auto record = [&](unsigned int index, unsigned int src, unsigned int dst, bool transform,
                            const char* expression) {
        io.Reset("");
        io.storage.WriteUINT32(index);
        io.storage.WriteUINT32(src);
        io.storage.WriteUINT32(dst);
        io.storage.WriteBool(true);
        io.storage.WriteUINT32(2);
        io.storage.WriteBool(transform);
        if (transform) {
            io.storage.WriteString(expression);
            io.storage.WriteString("$1");
        }
        return io.bytes.str();
    };
    const std::string good = record(0, 2, 3, true, "(x+)");
    std::vector<std::string> cases = {
        record(99, 2, 3, false, ""), record(freeSlot, 2, 3, false, ""), record(0, 0, 3, false, ""),
        record(0, 2, 0, false, ""),  record(0, 2, 4, false, ""),        record(0, 2, 3, true, "(x"),
        record(0, 2, 3, true, ""),
    };
    for (std::size_t length = 0; length < good.size(); ++length)
        cases.push_back(good.substr(0, length));
    const auto restore = [&](const std::string& bytes) {
        io.Reset(bytes);
        const ImpRel copy(io.storage, Owner());
        return copy.TransformName("axx");
    };
    for (const std::string& bytes : cases) {
        EXPECT_THAT([&] { restore(bytes); }, ThrowsMessage<Ex::InvalidDatabaseFormat>(kDamaged))
            << ::testing::PrintToString(bytes);
    }
    EXPECT_EQ(restore(good), "axx");
    io.data.impRelVersion = 2;
    EXPECT_THAT([&] { restore(good); }, ThrowsMessage<Ex::InvalidDatabaseFormat>(kDamaged));
}

TEST_F(ImplicitRelationshipTest, DumpAndValidation) {
    std::ostringstream out;
    ImpRel* rel = Relate("a", "b", true, kBoth, "_in$", "_out");
    rel->DbgDump(out, 1);
    Relate("a/c", "b", false, static_cast<Dir_t>(5))->DbgDump(out, 0);
    EXPECT_EQ(out.str(),
              "   Qmx_CorrManagedImplicitRelationship:\n   {\n"
              "      Source container:      /a/\n      Destination container: /b/\n"
              "      Can create items: true\n      Travseral direction: SRC <-> DST\n"
              "      Transforms '_in$' to '_out'\n      Qmx_CorrObject: ''\n      {\n      }\n"
              "   }\n"
              "Qmx_CorrManagedImplicitRelationship:\n{\n"
              "   Source container:      /a/c/\n   Destination container: /b/\n"
              "   Can create items: false\n   Travseral direction: ERROR!\n"
              "   Qmx_CorrObject: ''\n   {\n   }\n}\n");

    const auto messages = [](const ImpRel& checked) {
        Vesk_MsgManData::SetDebugOutput(true);
        ::testing::internal::CaptureStderr();
        const bool valid = checked.DbgValidateState();
        Vesk_MsgManData::SetDebugOutput(false);
        const std::string text = ::testing::internal::GetCapturedStderr();
        return valid ? "valid" + text : text;
    };
    EXPECT_EQ(messages(*rel), "valid");
    Dir("a")->RemoveOutgoingRelationship(rel);
    EXPECT_EQ(messages(*rel),
              "Relationship has container '/a/' as a source but the container does not list "
              "this relationship.\n");
    Dir("a")->AddOutgoingRelationship(rel);
    Dir("b")->RemoveIncomingRelationship(rel);
    EXPECT_EQ(messages(*rel),
              "Relationship has container '/b/' as a destination but the container does not "
              "list this relationship.\n");
    Dir("b")->AddIncomingRelationship(rel);
    EXPECT_EQ(messages(ImpRel(Owner(), Dir("c"), Dir("c"), false, kBoth)),
              "Implicit relationship source and destination containers are identical\n");
    // Null containers never make a relationship; the source is named first.
    EXPECT_THAT([&] { ImpRel(Owner(), nullptr, nullptr, false, kBoth); },
                ThrowsMessage<Ex::InvalidSrcItem>("Qmx_CorrException::InvalidSrcItem."));
    EXPECT_THAT([&] { ImpRel(Owner(), Dir("c"), nullptr, false, kBoth, "a", "b"); },
                ThrowsMessage<Ex::InvalidDstItem>("Qmx_CorrException::InvalidDstItem."));
}

TEST_F(ImplicitRelationshipTest, DataIsSharedUntilWrittenAndReleasedOnDelete) {
    ImpRel* rel = Relate("a", "b", false, kBoth);
    ImpRel* other = Relate("b", "a", false, kBoth);
    EXPECT_EQ(rel->GetObjectData(), RelData()->GetDefaultData().get());
    rel->SetProperty_INT32("p", 1, nullptr);
    const Qmx_CorrObjectData* own = rel->GetObjectData();
    EXPECT_NE(own, RelData()->GetDefaultData().get());
    rel->SetProperty_INT32("q", 2, nullptr);
    EXPECT_EQ(rel->GetObjectData(), own);
    EXPECT_EQ(other->GetObjectData(), RelData()->GetDefaultData().get());

    const unsigned int freeSlots = RelData()->GetFreeSlots();
    rel->Delete();
    EXPECT_EQ(RelData()->GetFreeSlots(), freeSlots + 1);
    EXPECT_THAT(Dir("a")->GetOutgoingRelationships(), IsEmpty());
    EXPECT_THAT(Dir("b")->GetIncomingRelationships(), IsEmpty());
    auto* data = static_cast<Qmx_CorrDataMgr*>(Owner());
    EXPECT_THAT(data->GetImplicitRelationships(), ElementsAre(other));
    other->Delete();
    EXPECT_THAT(data->GetImplicitRelationships(), IsEmpty());
    EXPECT_EQ(RelData()->GetFreeSlots(), freeSlots + 1);  // the default is never freed
}

}  // namespace
