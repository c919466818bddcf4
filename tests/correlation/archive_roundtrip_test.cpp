// Whole databases through their file: build a graph, commit, reopen in a new manager and compare
// the description of everything the host can see. The suite runs a second time with the files
// written compressed (archive_roundtrip_compressed_test).
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <set>
#include <sstream>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include "Qmx_CorrDataMgr.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrItemDataMgr.h"
#include "Qmx_CorrManagedItemMgr.h"
#include "Qmx_CorrMgr.h"
#include "Qmx_CorrRelDataMgr.h"
#include "TempDir.h"

namespace {

using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Dir = Qmx_CorrImplicitRelationship;

const auto kReadOnly = Qmx_CorrMgr::DB_READ_ONLY;
const auto kReadWrite = Qmx_CorrMgr::DB_READ_WRITE;
const char* const kRestricted = "Qmx_CorrMgrTest_Data";
const char* const kCode = "kqzva";

std::string Numbered(const char* prefix, unsigned number) {
    char text[32];
    std::snprintf(text, sizeof text, "%s%04u", prefix, number);
    return text;
}

Qmx_CorrDataMgr* DataMgrOf(Qmx_CorrMgr& mgr) {
    auto* top = static_cast<Qmx_CorrManagedContainer*>(mgr.GetTopContainer());
    return static_cast<Qmx_CorrDataMgr*>(top->GetOwner());
}

// The container at a relative path such as "c0/d1" below the top container.
Qmx_CorrContainer* At(Qmx_CorrMgr& mgr, const std::string& path) {
    Qmx_CorrContainer* container = mgr.GetTopContainer();
    std::istringstream parts(path);
    for (std::string part; container && std::getline(parts, part, '/');)
        container = container->GetContainer(part);
    return container;
}

// ---- The description of a whole database, compared as text ----

void DescribeProperties(std::ostream& out, const Qmx_CorrObject& object) {
    for (const auto& entry : object.GetProperties()) {
        out << " " << entry.first << "=";
        if (entry.second.GetType() == Qmx_CorrPropertyValue::kINT32)
            out << entry.second.GetINT32();
        else
            out << '"' << entry.second.GetString() << '"';
    }
}

template <class List>
std::string AbsoluteNames(const List& items) {
    std::string text = "[";
    for (const Qmx_CorrItem* item : items)
        text += (text.size() > 1 ? " " : "") + item->GetAbsoluteName();
    return text + "]";
}

void DescribeExplicit(std::ostream& out, const char* tag, const Qmx_CorrExplicitRelationship* rel) {
    out << "    " << tag << " " << AbsoluteNames(rel->GetSrcItems()) << " -> "
        << AbsoluteNames(rel->GetDstItems());
    DescribeProperties(out, *rel);
    out << "\n";
}

void DescribeImplicit(std::ostream& out, const char* tag, const Qmx_CorrImplicitRelationship* rel) {
    out << "  " << tag << " " << rel->GetSrcContainer()->GetAbsoluteName() << " "
        << Dir::GetDirectionText(rel->GetDirection()) << " "
        << rel->GetDstContainer()->GetAbsoluteName() << (rel->CanCreateItems() ? " creates" : "");
    if (rel->GetSrcExpression())
        out << " '" << rel->GetSrcExpression() << "' => '" << rel->GetDstFormat() << "'";
    DescribeProperties(out, *rel);
    out << "\n";
}

// One container: its properties, implicit relationships, and its items in list order with
// their properties and explicit relationships (both sides by absolute name).
void DescribeOne(std::ostream& out, Qmx_CorrContainer* container) {
    out << "container " << container->GetAbsoluteName();
    DescribeProperties(out, *container);
    out << "\n";
    for (const Qmx_CorrImplicitRelationship* rel : container->GetOutgoingRelationships())
        DescribeImplicit(out, "irel-out", rel);
    for (const Qmx_CorrImplicitRelationship* rel : container->GetIncomingRelationships())
        DescribeImplicit(out, "irel-in", rel);
    for (const Qmx_CorrItem* item : container->GetItems()) {
        out << "  item " << item->GetName();
        DescribeProperties(out, *item);
        out << "\n";
        for (const Qmx_CorrExplicitRelationship* rel : item->GetOutgoingRelationships())
            DescribeExplicit(out, "out", rel);
        for (const Qmx_CorrExplicitRelationship* rel : item->GetIncomingRelationships())
            DescribeExplicit(out, "in", rel);
    }
}

// Every container of the tree, parents first, children in list order.
void DescribeEach(Qmx_CorrContainer* container, std::vector<std::string>& texts) {
    std::ostringstream out;
    DescribeOne(out, container);
    texts.push_back(out.str());
    for (Qmx_CorrContainer* child : container->GetContainers()) DescribeEach(child, texts);
}

// The whole database, every container as DescribeOne gives it. The data manager's count of
// implicit relationships shows any it lists that no container does.
std::string Describe(Qmx_CorrMgr& mgr) {
    std::vector<std::string> texts;
    DescribeEach(mgr.GetTopContainer(), texts);
    std::string text = "implicit relationships: " +
                       std::to_string(DataMgrOf(mgr)->GetImplicitRelationships().size()) + "\n";
    for (const std::string& part : texts) text += part;
    return text;
}

// Empty when both texts are equal; otherwise the first line that differs, so that a failure
// does not print two descriptions of thousands of lines.
std::string FirstDifference(const std::string& actual, const std::string& expected) {
    std::istringstream a(actual), e(expected);
    std::string lineA, lineE;
    for (unsigned line = 1;; ++line) {
        const bool moreA = static_cast<bool>(std::getline(a, lineA));
        const bool moreE = static_cast<bool>(std::getline(e, lineE));
        if (!moreA && !moreE) return "";
        if (moreA != moreE || lineA != lineE)
            return "line " + std::to_string(line) + ": got '" + (moreA ? lineA : "<end>") +
                   "', want '" + (moreE ? lineE : "<end>") + "'";
    }
}

// ---- Building graphs ----

// Fixed seeds: every run builds the same graphs.
struct Lcg {
    std::uint32_t state;
    std::size_t Next(std::size_t bound) {
        state = state * 1664525u + 1013904223u;
        return (state >> 8) % bound;
    }
};

struct GraphSize {
    unsigned itemsPerContainer;
    unsigned relationships;
};
const GraphSize kLarge{120, 2500};  // about 4,000 items in 41 containers
const GraphSize kSmall{8, 60};

// Four levels: the top, c0..c3, d0..d2 in each, e0 and e1 in each of those; depth first.
std::vector<Qmx_CorrContainer*> BuildTree(Qmx_CorrContainer* top) {
    std::vector<Qmx_CorrContainer*> all{top};
    for (unsigned i = 0; i < 4; ++i) {
        Qmx_CorrContainer* c = all.emplace_back(top->CreateContainer("c" + std::to_string(i)));
        for (unsigned j = 0; j < 3; ++j) {
            Qmx_CorrContainer* d = all.emplace_back(c->CreateContainer("d" + std::to_string(j)));
            for (unsigned k = 0; k < 2; ++k)
                all.push_back(d->CreateContainer("e" + std::to_string(k)));
        }
    }
    for (std::size_t n = 0; n < all.size(); ++n) {
        if (n % 3 == 0) all[n]->SetProperty_INT32("level", static_cast<int>(n), nullptr);
        if (n % 4 == 1) all[n]->SetProperty_String("label", "box " + std::to_string(n), nullptr);
    }
    all[5]->SetProperty_INT32(kRestricted, -5, kCode);
    return all;
}

std::vector<Qmx_CorrItem*> AddItems(const std::vector<Qmx_CorrContainer*>& containers,
                                    const GraphSize& size) {
    std::vector<Qmx_CorrItem*> items;
    for (std::size_t n = 0; n < containers.size(); ++n) {
        unsigned count = size.itemsPerContainer / 3 + (n * 53) % size.itemsPerContainer;
        if (n == 1 || n == 2) count = 127 + static_cast<unsigned>(n);  // one pool, and one more
        for (unsigned i = 0; i < count; ++i) {
            // Every other container is filled in descending name order: it must come back sorted.
            const unsigned number = n % 2 ? count - 1 - i : i;
            Qmx_CorrItem* item = containers[n]->CreateItem(Numbered("it", number));
            const int g = static_cast<int>(items.size());
            if (g % 10 == 0) item->SetProperty_INT32("n", -3 * g, nullptr);
            if (g % 25 == 0) item->SetProperty_String("s", "text " + std::to_string(g), nullptr);
            if (g % 97 == 0) item->SetProperty_String(kRestricted, Numbered("secret", g), kCode);
            items.push_back(item);
        }
    }
    return items;
}

std::vector<Qmx_CorrItem*> Pick(Lcg& rng, const std::vector<Qmx_CorrItem*>& items, std::size_t n,
                                std::set<Qmx_CorrItem*>& taken) {
    std::vector<Qmx_CorrItem*> picked;
    while (picked.size() < n) {
        Qmx_CorrItem* item = items[rng.Next(items.size())];
        if (taken.insert(item).second) picked.push_back(item);
    }
    return picked;
}

// Sides of 0 to 4 items (an empty side is a null end), plus two hub items with six
// relationships each way.
void AddExplicitRelationships(Qmx_CorrMgr& mgr, const std::vector<Qmx_CorrItem*>& items,
                              unsigned count) {
    Lcg rng{20240611};
    for (unsigned r = 0; r < count; ++r) {
        std::set<Qmx_CorrItem*> taken;
        const std::vector<Qmx_CorrItem*> src = Pick(rng, items, rng.Next(5), taken);
        const std::vector<Qmx_CorrItem*> dst =
            Pick(rng, items, src.empty() ? 1 + rng.Next(4) : rng.Next(5), taken);
        Qmx_CorrExplicitRelationship* rel = mgr.CreateExplicitRelationship(
            src.empty() ? nullptr : src[0], dst.empty() ? nullptr : dst[0]);
        for (std::size_t i = 1; i < src.size(); ++i) rel->AddSrcItem(src[i]);
        for (std::size_t i = 1; i < dst.size(); ++i) rel->AddDstItem(dst[i]);
        if (r % 7 == 0) rel->SetProperty_INT32("w", static_cast<int>(r), nullptr);
        if (r % 11 == 0) rel->SetProperty_String("why", Numbered("rule", r), nullptr);
        if (r % 50 == 0) rel->SetProperty_INT32(kRestricted, static_cast<int>(r), kCode);
    }
    for (Qmx_CorrItem* hub : {items.front(), items[items.size() / 2]}) {
        for (unsigned k = 0; k < 6; ++k) {
            Qmx_CorrItem* other = items[1 + rng.Next(items.size() / 2 - 1)];
            mgr.CreateExplicitRelationship(hub, other);
            mgr.CreateExplicitRelationship(other, hub);
        }
    }
}

void AddImplicitRelationships(Qmx_CorrMgr& mgr) {
    mgr.CreateImplicitRelationship(At(mgr, "c0/d0"), At(mgr, "c1/d0"), false, Dir::DIR_SRC_TO_DST);
    mgr.CreateImplicitRelationship(At(mgr, "c0/d1"), At(mgr, "c2/d1"), true, Dir::DIR_SRC_TO_DST,
                                   "it(\\d+)", "copy$1")
        ->SetProperty_String("why", "copies", nullptr);
    mgr.CreateImplicitRelationship(At(mgr, "c1"), At(mgr, "c3"), false, Dir::DIR_DST_TO_SRC)
        ->SetProperty_INT32(kRestricted, 7, kCode);
    mgr.CreateImplicitRelationship(At(mgr, "c2/d2/e0"), At(mgr, "c3/d0/e1"), true,
                                   Dir::DIR_DST_TO_SRC, "^(.*)$", "$1_v");
    mgr.CreateImplicitRelationship(At(mgr, "c3"), mgr.GetTopContainer(), false, Dir::DIR_BOTH)
        ->SetProperty_INT32("weight", 3, nullptr);
    mgr.CreateImplicitRelationship(mgr.GetTopContainer(), At(mgr, "c0/d0/e0"), true, Dir::DIR_BOTH,
                                   "x", "y");
}

std::vector<Qmx_CorrItem*> BuildGraph(Qmx_CorrMgr& mgr, const GraphSize& size) {
    const std::vector<Qmx_CorrItem*> items = AddItems(BuildTree(mgr.GetTopContainer()), size);
    AddExplicitRelationships(mgr, items, size.relationships);
    AddImplicitRelationships(mgr);
    return items;
}

Qmx_CorrExplicitRelationship* LastOutgoing(Qmx_CorrItem* item) {
    auto outgoing = item->GetOutgoingRelationships();
    return outgoing.empty() ? nullptr : outgoing[outgoing.size() - 1];
}

// The first relationship of an item of `container` with three sources or more: its sources
// live in the overflow lists.
Qmx_CorrExplicitRelationship* WideRelationshipOf(Qmx_CorrContainer* container) {
    for (Qmx_CorrItem* item : container->GetItems())
        for (Qmx_CorrExplicitRelationship* rel : item->GetOutgoingRelationships())
            if (rel->GetSrcItems().size() >= 3) return rel;
    return nullptr;
}

// ---- Files and directories ----

// Inode, modification time in nanoseconds and bytes: a commit that writes changes them all.
using FileStamp = std::tuple<ino_t, std::int64_t, std::string>;

FileStamp StampOf(const std::string& path) {
    struct stat st {};
    if (stat(path.c_str(), &st) != 0) return {};
    return {st.st_ino, std::int64_t{st.st_mtim.tv_sec} * 1000000000 + st.st_mtim.tv_nsec,
            ReadFileBytes(path)};
}

std::vector<std::string> Entries(const std::string& dir) {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(dir))
        names.push_back(entry.path().filename().string());
    return names;
}

bool Compressed() { return std::getenv("OBR_QMX_USE_COMPRESSION") != nullptr; }

class ArchiveRoundTrip : public ::testing::Test {
protected:
    std::unique_ptr<Qmx_CorrMgr> Open(Qmx_CorrMgr::DB_MODE mode) { return OpenAt(m_path, mode); }
    std::unique_ptr<Qmx_CorrMgr> OpenAt(const std::string& path, Qmx_CorrMgr::DB_MODE mode) {
        return std::make_unique<Qmx_CorrMgr>(path, "", mode, nullptr);
    }
    // Reopens the file read-only in a new manager, which must describe as `expected`.
    void ExpectReopenedAs(const std::string& expected) {
        auto mgr = Open(kReadOnly);
        EXPECT_EQ(FirstDifference(Describe(*mgr), expected), "");
        EXPECT_TRUE(mgr->DbgValidateState());
    }

    TempDir m_dir;
    const std::string m_path = m_dir / "graph.cpd";
};

TEST_F(ArchiveRoundTrip, LargeGraphComesBackWhole) {
    std::string expected;
    {
        auto mgr = Open(kReadWrite);
        const std::vector<Qmx_CorrItem*> items = BuildGraph(*mgr, kLarge);
        // The graph has what it is meant to exercise: overflow lists, null ends, busy items.
        unsigned wideSides = 0, nullSides = 0, busyItems = 0;
        for (Qmx_CorrItem* item : items) {
            const auto outgoing = item->GetOutgoingRelationships();
            busyItems += outgoing.size() >= 2 && item->GetIncomingRelationships().size() >= 2;
            for (const Qmx_CorrExplicitRelationship* rel : outgoing) {
                wideSides += rel->GetSrcItems().size() >= 3 || rel->GetDstItems().size() >= 3;
                nullSides += rel->GetDstItems().empty();
            }
        }
        EXPECT_GT(items.size(), 3000u);
        EXPECT_GT(wideSides, 100u);
        EXPECT_GT(nullSides, 100u);
        EXPECT_GT(busyItems, 100u);
        expected = Describe(*mgr);
        mgr->Commit();
        EXPECT_FALSE(mgr->IsModified());
    }
    const std::string head = ReadFileBytes(m_path).substr(0, 20);
    if (Compressed())
        EXPECT_EQ(head.substr(0, 4), std::string("\x28\xB5\x2F\xFD", 4));
    else
        EXPECT_EQ(head, std::string("\x10\0\0\0OBRENT CPD V1.0\n", 20));

    auto mgr = Open(kReadOnly);
    EXPECT_EQ(FirstDifference(Describe(*mgr), expected), "");
    EXPECT_TRUE(mgr->DbgValidateState());
    // A restricted property comes back restricted.
    const Qmx_CorrItem* item = mgr->GetTopContainer()->GetItem("it0000");
    EXPECT_EQ(item->GetProperty_String(kRestricted, kCode), "secret0000");
    EXPECT_THAT([&] { item->GetProperty_String(kRestricted, nullptr); },
                ThrowsMessage<Qmx_CorrException::IncorrectPropertyAccessor>(
                    StrEq("Qmx_CorrException::IncorrectPropertyAccessor. Accessing property "
                          "'Qmx_CorrMgrTest_Data'.\n")));
}

// FlushAll unloads every item list and pool: what is read afterwards comes back from the
// streams the same. Changes made among flushes and committed a second time are what reopens.
TEST_F(ArchiveRoundTrip, FlushedAndRecommittedGraphReopensAsTheSecondState) {
    {
        auto mgr = Open(kReadWrite);
        BuildGraph(*mgr, kSmall);
        const std::string before = Describe(*mgr);
        mgr->FlushAll();
        EXPECT_TRUE(mgr->IsModified());
        EXPECT_EQ(DataMgrOf(*mgr)->GetManagedItemMgr()->GetNumLoadedPools(), 0u);
        EXPECT_EQ(DataMgrOf(*mgr)->GetManagedExpRelMgr()->GetNumLoadedPools(), 0u);
        EXPECT_FALSE(static_cast<Qmx_CorrManagedContainer*>(At(*mgr, "c0/d1"))->AreItemsLoaded());
        EXPECT_EQ(FirstDifference(Describe(*mgr), before), "");
        mgr->Commit();
    }
    std::string expected;
    {
        auto mgr = Open(kReadWrite);
        Qmx_CorrContainer* c0 = At(*mgr, "c0");
        c0->RenameItem("it0001", "renamed");
        c0->GetItem("it0003")->Delete(1);
        At(*mgr, "c0/d1/e0")->MoveUp();
        mgr->GetTopContainer()->SetProperty_String("level", "now a string", nullptr);
        c0->DestroyProperty("label", nullptr);
        Qmx_CorrItem* y = At(*mgr, "c3/d2")->CreateItem("fresh");
        y->SetProperty_INT32("n", 42, nullptr);
        mgr->CreateExplicitRelationship(c0->GetItem("it0000"), y);
        mgr->FlushAll();  // the rest of the changes meet objects reloaded from the pools
        Qmx_CorrExplicitRelationship* rel = LastOutgoing(c0->GetItem("it0000"));
        for (Qmx_CorrItem* src : At(*mgr, "c2")->GetItems()) rel->AddSrcItem(src);
        rel->RemoveSrcItem(At(*mgr, "c2")->GetItem("it0002"));
        rel->SetProperty_String("why", "second", nullptr);
        mgr->FlushAll();
        expected = Describe(*mgr);
        mgr->Commit();
    }
    EXPECT_NE(expected.find("container /c0/e0/"), std::string::npos);
    ExpectReopenedAs(expected);
    // A read-only database flushes into its own streams and gives the same objects back.
    auto reader = Open(kReadOnly);
    reader->FlushAll();
    EXPECT_EQ(FirstDifference(Describe(*reader), expected), "");
}

// Deleted objects do not come back, and the slots they leave are reused without carrying
// anything of them into the new objects.
TEST_F(ArchiveRoundTrip, DeletedObjectsLeaveNoGhosts) {
    {
        auto mgr = Open(kReadWrite);
        BuildGraph(*mgr, kSmall);
        mgr->Commit();
    }
    std::string afterDelete, deletedStream;
    {
        auto mgr = Open(kReadWrite);
        for (unsigned relMode = 0; relMode < 4; ++relMode)
            At(*mgr, "c1")->GetItems()[relMode]->Delete(relMode);
        Qmx_CorrExplicitRelationship* wide = WideRelationshipOf(At(*mgr, "c0"));
        ASSERT_NE(wide, nullptr);
        wide->SetProperty_INT32("doomed", 1, nullptr);
        const unsigned relFree = DataMgrOf(*mgr)->GetRelDataMgr()->GetFreeSlots();
        wide->Delete();
        EXPECT_EQ(DataMgrOf(*mgr)->GetRelDataMgr()->GetFreeSlots(), relFree + 1);
        LastOutgoing(mgr->GetTopContainer()->GetItem("it0000"))->Delete();
        mgr->GetTopContainer()->GetOutgoingRelationships()[0]->Delete();
        // c2 has an implicit relationship at c2/d1 and one at c2/d2/e0.
        deletedStream =
            static_cast<Qmx_CorrManagedContainer*>(At(*mgr, "c2/d0"))->GetItemsStreamName();
        At(*mgr, "c2")->Delete(1);
        EXPECT_EQ(DataMgrOf(*mgr)->GetImplicitRelationships().size(), 3u);
        afterDelete = Describe(*mgr);
        mgr->Commit();
    }
    EXPECT_EQ(afterDelete.find("/c2/"), std::string::npos);
    ExpectReopenedAs(afterDelete);

    // New objects take the freed pool and data slots, and nothing of what held them before.
    std::string afterCreate;
    {
        auto mgr = Open(kReadWrite);
        Qmx_CorrDataMgr* data = DataMgrOf(*mgr);
        EXPECT_FALSE(data->GetDatabase()->StreamExists(deletedStream));
        const unsigned pools = data->GetManagedItemMgr()->GetNumPools();
        const std::size_t itemSlots = data->GetItemDataMgr()->GetSlotCount();
        const std::size_t relSlots = data->GetRelDataMgr()->GetSlotCount();
        // The new container's default record takes one of the item slots.
        unsigned itemFree = data->GetItemDataMgr()->GetFreeSlots();
        unsigned relFree = data->GetRelDataMgr()->GetFreeSlots();
        ASSERT_GT(itemFree, 1u);
        ASSERT_GT(relFree, 0u);
        Qmx_CorrContainer* again = mgr->GetTopContainer()->CreateContainer("c2");
        Qmx_CorrItem* previous = At(*mgr, "c1")->GetItems().back();
        for (unsigned i = 0; i < 40; ++i) {
            Qmx_CorrItem* item = again->CreateItem(Numbered("new", i));
            EXPECT_TRUE(item->GetProperties().empty());
            EXPECT_TRUE(item->GetOutgoingRelationships().empty());
            EXPECT_TRUE(item->GetIncomingRelationships().empty());
            if (itemFree > 1) {
                --itemFree;
                item->SetProperty_INT32("fresh", static_cast<int>(i), nullptr);
            }
            Qmx_CorrExplicitRelationship* rel = mgr->CreateExplicitRelationship(previous, item);
            EXPECT_TRUE(rel->GetProperties().empty());
            if (relFree > 0) {
                --relFree;
                rel->SetProperty_INT32("fresh", static_cast<int>(i), nullptr);
            }
            previous = item;
        }
        mgr->CreateImplicitRelationship(again, At(*mgr, "c0"), false, Dir::DIR_BOTH);
        EXPECT_EQ(data->GetManagedItemMgr()->GetNumPools(), pools);
        EXPECT_EQ(data->GetItemDataMgr()->GetSlotCount(), itemSlots);
        EXPECT_EQ(data->GetRelDataMgr()->GetSlotCount(), relSlots);
        afterCreate = Describe(*mgr);
        mgr->Commit();
    }
    ExpectReopenedAs(afterCreate);
}

// The base of the tests of changes: /a/ (x, y, z, sub/ with w), /b/ (p, q, deep/low/ with
// r); x -> p and (y, z) -> q; a implies b; properties on each kind of object.
void BuildBase(Qmx_CorrMgr& mgr) {
    Qmx_CorrContainer* a = mgr.GetTopContainer()->CreateContainer("a");
    Qmx_CorrContainer* b = mgr.GetTopContainer()->CreateContainer("b");
    for (const char* name : {"x", "y", "z"}) a->CreateItem(name);
    a->CreateContainer("sub")->CreateItem("w");
    for (const char* name : {"p", "q"}) b->CreateItem(name);
    b->CreateContainer("deep")->CreateContainer("low")->CreateItem("r");
    mgr.CreateExplicitRelationship(a->GetItem("x"), b->GetItem("p"))
        ->SetProperty_INT32("w", 2, nullptr);
    mgr.CreateExplicitRelationship(a->GetItem("y"), b->GetItem("q"))->AddSrcItem(a->GetItem("z"));
    mgr.CreateImplicitRelationship(a, b, false, Dir::DIR_BOTH)
        ->SetProperty_String("why", "t", nullptr);
    a->SetProperty_INT32("k", 1, nullptr);
    a->GetItem("x")->SetProperty_String("k", "v", nullptr);
}

// The item at a path such as "a/x".
Qmx_CorrItem* Item(Qmx_CorrMgr& mgr, const std::string& path) {
    const std::size_t slash = path.rfind('/');
    return At(mgr, path.substr(0, slash))->GetItem(path.substr(slash + 1));
}

Qmx_CorrExplicitRelationship* Out(Qmx_CorrMgr& mgr, const std::string& path) {
    return Item(mgr, path)->GetOutgoingRelationships()[0];
}

Qmx_CorrImplicitRelationship* Implied(Qmx_CorrMgr& mgr) {
    return At(mgr, "a")->GetOutgoingRelationships()[0];
}

using M = Qmx_CorrMgr&;
using Change = std::pair<const char*, void (*)(M)>;

const Change kChanges[] = {
    {"create container", [](M m) { At(m, "a")->CreateContainer("n"); }},
    {"create item", [](M m) { At(m, "a")->CreateItem("n"); }},
    {"find or create item", [](M m) { At(m, "b")->FindOrCreateItem("n"); }},
    {"rename item", [](M m) { At(m, "a")->RenameItem("x", "x2"); }},
    {"move up", [](M m) { At(m, "b/deep/low")->MoveUp(); }},
    {"delete item", [](M m) { Item(m, "a/z")->Delete(0); }},
    {"delete container", [](M m) { At(m, "a/sub")->Delete(0); }},
    {"delete items", [](M m) { At(m, "b/deep/low")->DeleteItems(0); }},
    {"delete containers", [](M m) { At(m, "b")->DeleteContainers(0); }},
    {"create explicit", [](M m) { m.CreateExplicitRelationship(Item(m, "a/sub/w"), nullptr); }},
    {"add source", [](M m) { Out(m, "a/x")->AddSrcItem(Item(m, "b/q")); }},
    {"remove source", [](M m) { Out(m, "a/y")->RemoveSrcItem(Item(m, "a/z")); }},
    {"add destination", [](M m) { Out(m, "a/x")->AddDstItem(Item(m, "b/q")); }},
    {"remove destination", [](M m) { Out(m, "a/x")->RemoveDstItem(Item(m, "b/p")); }},
    {"delete explicit", [](M m) { Out(m, "a/y")->Delete(); }},
    {"create implicit",
     [](M m) {
         m.CreateImplicitRelationship(At(m, "b"), At(m, "a/sub"), true, Dir::DIR_SRC_TO_DST, "(.)",
                                      "$1$1");
     }},
    {"delete implicit", [](M m) { Implied(m)->Delete(); }},
    {"container property", [](M m) { At(m, "b")->SetProperty_INT32("k", 5, nullptr); }},
    {"item property", [](M m) { Item(m, "a/y")->SetProperty_String("k", "u", nullptr); }},
    {"property type", [](M m) { Item(m, "a/x")->SetProperty_INT32("k", 9, nullptr); }},
    {"restricted", [](M m) { At(m, "b/deep")->SetProperty_INT32(kRestricted, 1, kCode); }},
    {"explicit property", [](M m) { Out(m, "a/x")->SetProperty_String("v", "1", nullptr); }},
    {"implicit property", [](M m) { Implied(m)->SetProperty_INT32("v", 1, nullptr); }},
    {"destroy property", [](M m) { At(m, "a")->DestroyProperty("k", nullptr); }},
};

TEST_F(ArchiveRoundTrip, EveryKindOfChangeMarksTheDatabaseModifiedAndIsKept) {
    std::string baseText;
    {
        auto mgr = Open(kReadWrite);
        BuildBase(*mgr);
        mgr->Commit();
        baseText = Describe(*mgr);
    }
    const std::string base = ReadFileBytes(m_path);
    for (const Change& change : kChanges) {
        SCOPED_TRACE(change.first);
        WriteFileBytes(m_path, base);
        std::string changed;
        {
            auto mgr = Open(kReadWrite);
            EXPECT_FALSE(mgr->IsModified());
            change.second(*mgr);
            EXPECT_TRUE(mgr->IsModified());
            changed = Describe(*mgr);
            mgr->Commit();
            EXPECT_FALSE(mgr->IsModified());
        }
        EXPECT_NE(changed, baseText);
        ExpectReopenedAs(changed);
    }
}

// Reading, finding what exists, repeating a link and flushing change nothing: a commit then
// leaves the file as it was, bytes, inode and modification time.
TEST_F(ArchiveRoundTrip, CommitWithoutChangeWritesNothing) {
    {
        auto mgr = Open(kReadWrite);
        BuildBase(*mgr);
        mgr->Commit();
    }
    auto mgr = Open(kReadWrite);
    const FileStamp before = StampOf(m_path);
    Describe(*mgr);
    At(*mgr, "b")->FindOrCreateItem("p");
    Out(*mgr, "a/x")->AddSrcItem(Item(*mgr, "a/x"));
    At(*mgr, "a")->DestroyProperty("missing", nullptr);
    mgr->FlushAll();
    EXPECT_EQ(Item(*mgr, "a/x")->GetProperty_String("k", nullptr), "v");
    EXPECT_FALSE(mgr->IsModified());
    mgr->Commit();
    EXPECT_FALSE(std::get<2>(before).empty());
    EXPECT_EQ(StampOf(m_path), before);
}

// Each database was first committed alone, so their string tables differ; opened together,
// the second one's restore must not touch the names of the first, and names made in one
// after another must reach only its own file.
TEST_F(ArchiveRoundTrip, TwoOpenDatabasesKeepTheirOwnNames) {
    const std::string otherPath = m_dir / "other.cpd";
    const auto build = [this](const std::string& path, const char* prefix, unsigned count) {
        auto mgr = OpenAt(path, kReadWrite);
        Qmx_CorrContainer* c = mgr->GetTopContainer()->CreateContainer(prefix);
        for (unsigned i = 0; i < count; ++i) c->CreateItem(Numbered(prefix, i));
        mgr->CreateExplicitRelationship(c->GetItem(Numbered(prefix, 1)),
                                        c->GetItem(Numbered(prefix, count - 1)));
        mgr->Commit();
    };
    build(m_path, "alpha", 150);
    build(otherPath, "beta", 90);
    std::string first, second;
    {
        auto a = Open(kReadWrite);
        const std::string alone = Describe(*a);
        auto b = OpenAt(otherPath, kReadWrite);
        EXPECT_EQ(FirstDifference(Describe(*a), alone), "");
        for (unsigned i = 0; i < 20; ++i) {
            At(*a, "alpha")->CreateItem(Numbered("gamma", i));
            At(*b, "beta")->CreateItem(Numbered("delta", i));
        }
        a->Commit();
        b->Commit();
        first = Describe(*a);
        second = Describe(*b);
    }
    if (!Compressed()) {
        EXPECT_EQ(ReadFileBytes(m_path).find("delta"), std::string::npos);
        EXPECT_EQ(ReadFileBytes(otherPath).find("gamma"), std::string::npos);
    }
    auto b = OpenAt(otherPath, kReadOnly);
    auto a = Open(kReadOnly);
    EXPECT_EQ(FirstDifference(Describe(*a), first), "");
    EXPECT_EQ(FirstDifference(Describe(*b), second), "");
}

// An item made from another item's name handle shares its name record; unloading the other
// item's pool must not take the name away.
TEST_F(ArchiveRoundTrip, ItemMadeFromAnotherItemsNameKeepsIt) {
    {
        auto mgr = Open(kReadWrite);
        auto* from =
            static_cast<Qmx_CorrManagedContainer*>(mgr->GetTopContainer()->CreateContainer("from"));
        Qmx_CorrContainer* to = mgr->GetTopContainer()->CreateContainer("to");
        auto* original = static_cast<Qmx_CorrManagedItem*>(from->CreateItem("shared_name"));
        Qmx_CorrItem* copy = to->FindOrCreateItem(original->GetNameHandle());
        from->Flush(true);
        EXPECT_FALSE(DataMgrOf(*mgr)->GetManagedItemMgr()->PoolInMemory(0));
        to->CreateItem("made_after");
        EXPECT_EQ(copy->GetAbsoluteName(), "/to/shared_name");
        EXPECT_EQ(from->GetItem("shared_name")->GetAbsoluteName(), "/from/shared_name");
        mgr->Commit();
    }
    auto mgr = Open(kReadOnly);
    const std::string expected =
        "implicit relationships: 0\ncontainer /\ncontainer /from/\n  item shared_name\n"
        "container /to/\n  item made_after\n  item shared_name\n";
    EXPECT_EQ(Describe(*mgr), expected);
}

// A private property record of an item that was not in memory at commit stays that item's.
TEST_F(ArchiveRoundTrip, PropertiesStayWithTheirItem) {
    {
        auto mgr = Open(kReadWrite);
        Qmx_CorrContainer* c = mgr->GetTopContainer()->CreateContainer("c");
        c->CreateItem("a")->SetProperty_INT32("p", 1, nullptr);
        c->CreateItem("b");
        mgr->FlushAll();
        mgr->Commit();
    }
    for (unsigned round = 0; round < 2; ++round) {
        SCOPED_TRACE(round);
        auto mgr = Open(kReadWrite);
        Qmx_CorrContainer* c = At(*mgr, "c");
        EXPECT_TRUE(c->CreateItem(Numbered("n", round))->GetProperties().empty());
        EXPECT_TRUE(c->GetItem("b")->GetProperties().empty());
        Qmx_CorrItem* a = c->GetItem("a");
        a->SetProperty_String("q", "two", nullptr);
        EXPECT_EQ(a->GetProperty_INT32("p", nullptr), 1);
        EXPECT_EQ(a->GetProperty_String("q", nullptr), "two");
        mgr->FlushAll();
        mgr->Commit();
    }
    auto mgr = Open(kReadOnly);
    EXPECT_EQ(Describe(*mgr),
              "implicit relationships: 0\ncontainer /\ncontainer /c/\n  item a p=1 q=\"two\"\n"
              "  item b\n  item n0000\n  item n0001\n");
}

TEST_F(ArchiveRoundTrip, MissingFileReadOnlyIsEmptyWritableIsMadeAtOnce) {
    {
        auto mgr = Open(kReadOnly);
        EXPECT_EQ(Describe(*mgr), "implicit relationships: 0\ncontainer /\n");
        EXPECT_FALSE(mgr->IsModified());
        EXPECT_FALSE(mgr->CanCommit());
        mgr->GetTopContainer()->CreateItem("in_memory_only");
        EXPECT_THAT([&] { mgr->Commit(); },
                    ThrowsMessage<Qmx_CorrException::DatabaseIsReadonly>(
                        StrEq("Qmx_CorrException::DatabaseIsReadonly. Unable to commit to '" +
                              m_path + "'. Database is read only.\n")));
    }
    EXPECT_TRUE(Entries(m_dir.Path()).empty());

    auto writer = Open(kReadWrite);
    EXPECT_FALSE(writer->IsModified());
    EXPECT_THAT(Entries(m_dir.Path()), ElementsAre("graph.cpd"));
    auto reader = Open(kReadOnly);
    EXPECT_EQ(Describe(*reader), "implicit relationships: 0\ncontainer /\n");
}

// Each database makes a fresh directory of its own inside the one it is given and removes it
// when it closes: two databases given the same one do not pack each other's streams.
TEST_F(ArchiveRoundTrip, GivenTemporaryDirectoryIsNotShared) {
    const std::string given = m_dir / "scratch/nested";
    const std::string otherPath = m_dir / "other.cpd";
    {
        Qmx_CorrMgr first(m_path, given, kReadWrite, nullptr);
        Qmx_CorrMgr second(otherPath, given, kReadWrite, nullptr);
        const std::vector<std::string> made = Entries(given);
        ASSERT_EQ(made.size(), 2u);
        for (const std::string& name : made)
            EXPECT_TRUE(std::filesystem::exists(given + "/" + name + "/info")) << name;
        first.GetTopContainer()->CreateItem("only_first");
        second.GetTopContainer()->CreateItem("only_second");
        second.Commit();
        first.Commit();
    }
    EXPECT_TRUE(Entries(given).empty());
    EXPECT_EQ(Describe(*Open(kReadOnly)),
              "implicit relationships: 0\ncontainer /\n  item only_first\n");
    EXPECT_EQ(Describe(*OpenAt(otherPath, kReadOnly)),
              "implicit relationships: 0\ncontainer /\n  item only_second\n");
}

// What listeners read while a reopened database closes; items come from the file then.
class CloseLog : public Qmx_CorrEvent::Listener1<Qmx_CorrMgr*>,
                 public Qmx_CorrEvent::Listener1<Qmx_CorrContainer*> {
public:
    CloseLog() {
        Qmx_CorrEvent::GetCorrMgrDeletedEmitter().AddListener(this);
        Qmx_CorrEvent::GetCorrContainerDeletedEmitter().AddListener(this);
    }
    ~CloseLog() override {
        Qmx_CorrEvent::GetCorrMgrDeletedEmitter().RemoveListener(this);
        Qmx_CorrEvent::GetCorrContainerDeletedEmitter().RemoveListener(this);
    }
    void Notify(Qmx_CorrMgr* mgr) override {
        entries.push_back("manager " + mgr->GetTopContainer()->GetAbsoluteName());
    }
    void Notify(Qmx_CorrContainer* container) override {
        unloaded += !static_cast<Qmx_CorrManagedContainer*>(container)->AreItemsLoaded();
        std::ostringstream entry;
        DescribeOne(entry, container);
        entries.push_back(entry.str());
    }

    std::vector<std::string> entries;
    unsigned unloaded = 0;
};

TEST_F(ArchiveRoundTrip, ClosingAReopenedDatabaseTellsListenersWhileItIsWhole) {
    std::vector<std::string> expected{"manager /"};
    {
        auto mgr = Open(kReadWrite);
        BuildBase(*mgr);
        mgr->Commit();
        DescribeEach(mgr->GetTopContainer(), expected);
    }
    CloseLog log;
    Open(kReadOnly).reset();
    EXPECT_THAT(log.entries, ElementsAreArray(expected));
    EXPECT_EQ(log.unloaded, expected.size() - 1);
}

}  // namespace
