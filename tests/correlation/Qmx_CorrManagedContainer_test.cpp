// The managed container: names and sorted items, renaming and moving, deleting with all that
// lies beneath, the items stream on a real database file, the record, dump and self-check,
// and the tree a closing database shows its listeners.
#include "Qmx_CorrManagedContainer.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <new>
#include <sstream>
#include <string>
#include <vector>

#include "../support/TempDir.h"
#include "Qmx_CorrDataMgr.h"
#include "Qmx_CorrDb_Internal.h"
#include "Qmx_CorrDbg.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrMgr.h"
#include "Qmx_CorrNameRepo_Basic.h"
#include "Qmx_CorrRelDataMgr.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStream_Internal.h"
#include "Vesk_Endian.h"
#include "Vesk_MsgManData.h"

namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::ThrowsMessage;
using Container = Qmx_CorrManagedContainer;
using ImpRel = Qmx_CorrManagedImplicitRelationship;
using Rel = Qmx_CorrExplicitRelationship;
namespace Ex = Qmx_CorrException;

const char* const kDbName = "corr.cpd";
const auto kBoth = Qmx_CorrImplicitRelationship::DIR_BOTH;

template <class List>
std::vector<std::string> Names(const List& list) {
    std::vector<std::string> names;
    for (const auto* object : list) names.push_back(object->GetName());
    return names;
}

template <class T>
std::vector<T> Vec(const Qmx_SingleOptContainerT<T>& list) {
    return std::vector<T>(list.begin(), list.end());
}

std::string Damaged(const std::string& name) {
    return "Qmx_CorrException::InvalidDatabaseFormat. Unable to read '" + name + "'.\n";
}

// Runs `f` with debug output on and gives back what reached standard error.
template <class F>
std::string Messages(F f) {
    Vesk_MsgManData::SetDebugOutput(true);
    ::testing::internal::CaptureStderr();
    f();
    Vesk_MsgManData::SetDebugOutput(false);
    return ::testing::internal::GetCapturedStderr();
}

// Builds trees by path: "a/b" is the container /a/b/, "a/b/x" its item x, made when missing.
struct Tree {
    Container* Dir(const std::string& path) const {
        Qmx_CorrContainer* c = top;
        std::istringstream parts(path);
        for (std::string part; std::getline(parts, part, '/');) {
            Qmx_CorrContainer* next = c->GetContainer(part);
            c = next ? next : c->CreateContainer(part);
        }
        return static_cast<Container*>(c);
    }
    Qmx_CorrManagedItem* Item(const std::string& path) const {
        const std::size_t slash = path.rfind('/');
        Container* c = slash == std::string::npos ? top : Dir(path.substr(0, slash));
        return static_cast<Qmx_CorrManagedItem*>(c->FindOrCreateItem(path.substr(slash + 1)));
    }
    Container* top;
};

// What each container-deleted notice could read of its container.
class DeletionRecorder : public Qmx_CorrEvent::Listener1<Qmx_CorrContainer*> {
public:
    DeletionRecorder() { Qmx_CorrEvent::GetCorrContainerDeletedEmitter().AddListener(this); }
    ~DeletionRecorder() override {
        Qmx_CorrEvent::GetCorrContainerDeletedEmitter().RemoveListener(this);
    }
    void Notify(Qmx_CorrContainer* c) override {
        std::string line = c->GetAbsoluteName() + ":";
        for (const Qmx_CorrItem* item : c->GetItems()) line += " " + item->GetAbsoluteName();
        for (const Qmx_CorrImplicitRelationship* rel : c->GetOutgoingRelationships())
            line += " to " + rel->GetDstContainer()->GetAbsoluteName();
        for (const Qmx_CorrImplicitRelationship* rel : c->GetIncomingRelationships())
            line += " from " + rel->GetSrcContainer()->GetAbsoluteName();
        lines.push_back(line);
    }
    std::vector<std::string> lines;
};

// A database without a file, opened as a host opens it.
class ManagedContainerTest : public ::testing::Test {
protected:
    ManagedContainerTest() { Reopen(); }
    void Reopen() {
        mgr.reset();
        mgr.reset(new Qmx_CorrMgr("", "", Qmx_CorrMgr::DB_READ_WRITE, nullptr));
        tree.top = static_cast<Container*>(mgr->GetTopContainer());
    }
    Container* Dir(const std::string& path) { return tree.Dir(path); }
    Qmx_CorrManagedItem* Item(const std::string& path) { return tree.Item(path); }
    Qmx_CorrDataMgr* Data() { return static_cast<Qmx_CorrDataMgr*>(tree.top->GetOwner()); }
    std::size_t UsedNameSlots() {
        auto* repo = static_cast<Qmx_CorrNameRepo_Basic*>(Data()->GetNameRepo());
        return repo->GetTableSize() - repo->GetFreeCount();
    }

    std::unique_ptr<Qmx_CorrMgr> mgr;
    Tree tree{nullptr};
};

TEST_F(ManagedContainerTest, NamesOrderAndDuplicates) {
    Container* a = Dir("a");
    EXPECT_EQ(tree.top->GetAbsoluteName(), "/");
    EXPECT_EQ(Dir("a/b")->GetAbsoluteName(), "/a/b/");
    EXPECT_EQ(Item("a/x")->GetAbsoluteName(), "/a/x");
    for (const char* name : {"m", "b", "z"}) a->CreateItem(name);
    a->CreateContainer("x");  // an item and a container may share a name
    EXPECT_THAT(Names(a->GetItems()), ElementsAre("b", "m", "x", "z"));
    EXPECT_THAT(Names(a->GetContainers()), ElementsAre("b", "x"));
    EXPECT_GE(a->GetItems().capacity(), 128u);
    const Container* constA = a;
    EXPECT_EQ(constA->GetItem("m"), a->FindOrCreateItem("m"));
    EXPECT_EQ(constA->GetContainer("x"), a->GetContainer("x"));
    EXPECT_EQ(a->GetItem("nothing"), nullptr);
    // Names taken for lookups go back to the table, also when the lookup throws.
    const std::size_t used = UsedNameSlots();
    EXPECT_THAT([&] { a->CreateContainer("x"); },
                ThrowsMessage<Ex::DuplicateObjectFound>(
                    "Qmx_CorrException::DuplicateObjectFound. Container 'a' already contains an "
                    "item or container named 'x'.\n"));
    EXPECT_THROW(a->CreateItem("b"), Ex::DuplicateObjectFound);
    EXPECT_THROW(a->RenameItem("b", "m"), Ex::DuplicateObjectFound);
    a->GetItem("m"), a->GetContainer("b"), a->RenameItem("none", "y");
    EXPECT_EQ(UsedNameSlots(), used);
}

TEST_F(ManagedContainerTest, RenameItemResortsAndChecksItself) {
    Container* c = Dir("c");
    for (const char* name : {"a", "m", "z"}) c->CreateItem(name);
    Qmx_CorrItem* a = c->GetItem("a");
    EXPECT_EQ(Messages([&] { EXPECT_EQ(c->RenameItem("a", "n"), a); }), "renamed worked a n\n");
    EXPECT_THAT(Names(c->GetItems()), ElementsAre("m", "n", "z"));
    EXPECT_EQ(c->GetItem("a"), nullptr);
    EXPECT_EQ(c->RenameItem("unknown", "b"), nullptr);
    EXPECT_THROW(c->RenameItem("m", "z"), Ex::DuplicateObjectFound);
    EXPECT_THAT(Names(c->GetItems()), ElementsAre("m", "n", "z"));
    // Only y and z out of place: the searches for m and b still find their way.
    c->CreateItem("y");
    std::swap(c->GetItems()[2], c->GetItems()[3]);
    EXPECT_EQ(Messages([&] { c->RenameItem("m", "b"); }),
              "eek, ITEM NOT SORTED RI z y\neek, ITEM NOT SORTED BAD z y\n"
              "eek, ITEM NOT SORTED RenameItem done z y\nrenamed worked m b\n");
    std::swap(c->GetItems()[2], c->GetItems()[3]);
}

TEST_F(ManagedContainerTest, MoveUpReparentsUnlessTheNameIsTaken) {
    const std::string refused = "Qmx_CorrException::InvalidRequest\n";
    EXPECT_THAT([&] { tree.top->MoveUp(); }, ThrowsMessage<Ex::InvalidRequest>(refused));
    EXPECT_THAT([&] { Dir("a")->MoveUp(); }, ThrowsMessage<Ex::InvalidRequest>(refused));
    EXPECT_THROW(Dir("a/a")->MoveUp(), Ex::InvalidRequest);  // the parent itself is there
    Dir("x");
    EXPECT_THROW(Dir("a/x")->MoveUp(), Ex::InvalidRequest);
    Container* b = Dir("a/b");
    Qmx_CorrItem* item = Item("a/b/i");
    b->MoveUp();
    EXPECT_EQ(item->GetAbsoluteName(), "/b/i");
    EXPECT_THAT(Names(tree.top->GetContainers()), ElementsAre("a", "x", "b"));
    EXPECT_THAT(Names(Dir("a")->GetContainers()), ElementsAre("a", "x"));
}

// relMode as an item's Delete takes it, values above 3 as 0. A relationship that survives has
// lost the deleted items, and every remaining list agrees with its relationships.
TEST_F(ManagedContainerTest, DeleteLeavesTheRemainingRelationshipsWhole) {
    struct Case {
        unsigned relMode;
        bool fromXSurvives, toYSurvives;
    };
    for (const Case& test : {Case{0, true, true}, Case{1, false, false}, Case{2, false, true},
                             Case{3, true, false}, Case{9, true, true}}) {
        Reopen();
        Qmx_CorrItem* z = Item("c/z");
        Rel* fromX = mgr->CreateExplicitRelationship(Item("a/x"), z);
        Rel* toY = mgr->CreateExplicitRelationship(z, Item("a/b/y"));
        Rel* shared = mgr->CreateExplicitRelationship(Item("a/x"), z);
        shared->AddSrcItem(Item("c/w"));
        Dir("a")->Delete(test.relMode);
        std::vector<Rel*> incoming = {shared}, outgoing;
        if (test.fromXSurvives) incoming.insert(incoming.begin(), fromX);
        if (test.toYSurvives) outgoing.push_back(toY);
        EXPECT_EQ(Vec(z->GetIncomingRelationships()), incoming) << test.relMode;
        EXPECT_EQ(Vec(z->GetOutgoingRelationships()), outgoing) << test.relMode;
        EXPECT_THAT(Names(Vec(shared->GetSrcItems())), ElementsAre("w"));
        EXPECT_TRUE(tree.top->DbgValidateState()) << test.relMode;
    }
}

// Deleting a subtree takes the implicit relationships at each of its containers, notifies
// the children first and leaves the parent hearing removal notices again.
TEST_F(ManagedContainerTest, DeleteTakesItsImplicitRelationshipsAndNotifiesChildrenFirst) {
    EXPECT_THAT([&] { tree.top->Delete(0); },
                ThrowsMessage<Ex::CannotDeleteTopContainer>(
                    "Qmx_CorrException::CannotDeleteTopContainer. The top level container may "
                    "not be deleted.\n"));
    Container* c = Dir("c");
    Qmx_CorrImplicitRelationship* out = mgr->CreateImplicitRelationship(Dir("a"), c, false, kBoth);
    mgr->CreateImplicitRelationship(c, Dir("a/b"), false, kBoth);
    Qmx_CorrImplicitRelationship* kept = mgr->CreateImplicitRelationship(c, Dir("d"), false, kBoth);
    out->SetProperty_INT32("p", 1, nullptr);
    const unsigned int freeSlots = Data()->GetRelDataMgr()->GetFreeSlots();
    Item("a/x");
    DeletionRecorder recorder;
    Dir("a")->Delete(0);
    EXPECT_THAT(recorder.lines, ElementsAre("/a/b/:", "/a/:"));
    EXPECT_THAT(c->GetOutgoingRelationships(), ElementsAre(kept));
    EXPECT_THAT(c->GetIncomingRelationships(), IsEmpty());
    EXPECT_THAT(Data()->GetImplicitRelationships(), ElementsAre(kept));
    EXPECT_EQ(Data()->GetRelDataMgr()->GetFreeSlots(), freeSlots + 1);
    Item("c/x"), Dir("c/e");
    c->DeleteItems(0);
    c->DeleteContainers(0);
    Item("c/y")->Delete(0);
    Dir("c/f")->Delete(0);
    EXPECT_THAT(c->GetItems(), IsEmpty());
    EXPECT_THAT(c->GetContainers(), IsEmpty());
}

// Parents before children, and everything readable: a listener may follow an implicit
// relationship to a container of the same closing tree. Meant for the sanitizer build too.
TEST_F(ManagedContainerTest, ClosingListenersReadEveryContainerWhole) {
    Item("a/x");
    Item("a/b/y");
    mgr->CreateImplicitRelationship(Dir("a"), Dir("c"), false, kBoth);
    DeletionRecorder recorder;
    mgr.reset();
    EXPECT_THAT(recorder.lines,
                ElementsAre("/:", "/a/: /a/x to /c/", "/a/b/: /a/b/y", "/c/: from /a/"));
}

TEST_F(ManagedContainerTest, DumpAndValidation) {
    Container* a = Dir("a");
    Item("a/y"), Item("a/x"), Dir("a/b");
    std::ostringstream out;
    a->DbgDump(out, 1);
    EXPECT_EQ(out.str(),
              "   Qmx_CorrManagedContainer: 'a'\n   {\n      Qmx_CorrObject: 'a'\n      {\n"
              "      }\n      Contains 2 items\n         x\n         y\n"
              "      Contains 1 containers\n         b\n   }\n");
    EXPECT_TRUE(tree.top->DbgValidateState());
    // A second child b made behind CreateContainer's back (a owns it), then an item listed
    // twice: each is the first fault found, reported by a and then by the top.
    a->GetContainers().push_back(new Container("b", a->GetOwner(), a));
    EXPECT_EQ(Messages([&] { EXPECT_FALSE(tree.top->DbgValidateState()); }),
              "Container 'a' has containers with duplicate name (b).\nContainer 'a' is invalid\n");
    delete a->GetContainers().back();
    a->GetContainers().pop_back();
    a->GetItems().push_back(a->GetItems()[0]);
    EXPECT_EQ(Messages([&] { EXPECT_FALSE(a->DbgValidateState()); }),
              "Container 'a' has items with duplicate name (x).\n");
    a->GetItems().pop_back();
}

// A database file whose stream operations a test can make fail.
class TestDb : public Qmx_CorrDb_Internal {
public:
    using Qmx_CorrDb_Internal::Qmx_CorrDb_Internal;
    Qmx_CorrStream* OpenStream(const Vesk::StringBase<char>& name, int mode) override {
        if (name == refuseWriting && (mode & kWrite)) return nullptr;
        return Qmx_CorrDb_Internal::OpenStream(name, mode);
    }
    void DeleteStream(const Vesk::StringBase<char>& name) override {
        if (name == failDeleting) throw Ex::CannotWriteDatabase("Quillmark", "test", "1", 1);
        Qmx_CorrDb_Internal::DeleteStream(name);
    }
    std::string refuseWriting, failDeleting;
};

// A data manager with a database file; its item pools stay in memory.
class FileDataMgr : public Qmx_CorrDataMgr {
public:
    explicit FileDataMgr(Qmx_CorrDb* db) : Qmx_CorrDataMgr("", "", false, nullptr), m_db(db) {}
    Qmx_CorrDb* GetDatabase() override { return m_db; }

private:
    Qmx_CorrDb* m_db;  // not owned
};

// One record stream with the tables of a commit: null first, then the objects by address.
struct RecordIo {
    RecordIo(std::vector<Container*> containers, std::vector<ImpRel*> rels) {
        std::sort(containers.begin(), containers.end(), std::less<Container*>());
        std::sort(rels.begin(), rels.end(), std::less<ImpRel*>());
        data.containers = containers;
        data.containers.insert(data.containers.begin(), nullptr);
        data.implicitRelationships = rels;
        data.implicitRelationships.insert(data.implicitRelationships.begin(), nullptr);
    }
    template <class T>
    static unsigned int Of(const std::vector<T*>& table, const T* object) {
        return static_cast<unsigned int>(std::find(table.begin(), table.end(), object) -
                                         table.begin());
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

class ContainerStreamTest : public ::testing::Test {
protected:
    std::vector<unsigned int> Stored(const std::string& stream) {
        Qmx_CorrStream* in = db.OpenStream(stream, 9);
        if (!in) return {0xDEAD};
        std::vector<unsigned int> handles(in->ReadUINT32());
        for (unsigned int& handle : handles) handle = Handle(*in);
        EXPECT_THROW(Handle(*in), Ex::InvalidDatabaseFormat);  // nothing after them
        db.CloseStream(in);
        return handles;
    }
    static unsigned int Handle(Qmx_CorrStream& in) {
        char bytes[4];
        in.read(bytes, 4);
        return Vesk_Endian::DecodeUINT32LE(bytes);
    }
    void Store(const std::string& stream, unsigned int count, std::vector<unsigned int> handles) {
        Qmx_CorrStream* out = db.OpenStream(stream, 14);
        out->WriteUINT32(count);
        for (unsigned int handle : handles) {
            char bytes[4];
            Vesk_Endian::EncodeUINT32LE(handle, bytes);
            out->write(bytes, 4);
        }
        db.CloseStream(out);
    }
    std::vector<unsigned int> HandlesOf(const std::vector<Qmx_CorrManagedItem*>& items) {
        std::vector<unsigned int> handles;
        for (const Qmx_CorrManagedItem* item : items) handles.push_back(data.GetItemHandle(item));
        return handles;
    }

    TempDir dir;
    TestDb db{dir / kDbName};
    FileDataMgr data{&db};
    Tree tree{static_cast<Container*>(data.GetTopContainer())};
};

TEST_F(ContainerStreamTest, FlushWritesTheHandlesAndTheNextAccessReloadsThem) {
    Container* c = tree.Dir("c");
    for (const char* name : {"b", "a", "c"}) c->CreateItem(name);
    const std::vector<Qmx_CorrManagedItem*> items = c->GetItems();
    Qmx_CorrDbg::Tracer& tracer = *Qmx_CorrDbg::s_Tracer;
    std::ostringstream trace, dump;
    tracer.SetOutput(trace);
    tracer.SetTraceLevel("POOL", 10);
    tree.top->FlushAll(true);
    c->DbgDump(dump, 0);
    const Qmx_CorrItem* b = c->GetItem("b");
    tracer.RemoveTrace("POOL");
    tracer.SetOutput(std::clog);
    EXPECT_THAT(dump.str(), HasSubstr("\n   Items not currently loaded.\n"));
    EXPECT_EQ(Stored("Container_Items_1"), HandlesOf(items));
    EXPECT_THAT(Stored("Container_Items_0"), IsEmpty());
    EXPECT_EQ(b, items[1]);
    EXPECT_EQ(c->GetItems(), items);
    EXPECT_THAT(trace.str(), HasSubstr("QMX_CORR_TRACE:POOL:10:s/Qmx_CorrManagedContainer("));
    EXPECT_THAT(trace.str(), HasSubstr("): Flushing out items for container '/c/'\n"));
    EXPECT_THAT(trace.str(), HasSubstr("): Performing delayed loading of items for container /c/ "
                                       "(ID: Container_Items_1)\n"));
}

// A current stream is not written again, by Flush or by the record; one that does not open
// leaves the list unloaded, to be tried again at the next access.
TEST_F(ContainerStreamTest, OnlyAStaleStreamIsWrittenAndAMissingOneLeavesTheListUnloaded) {
    Container* c = tree.Dir("c");
    tree.Item("c/x");
    RecordIo first({tree.top, c}, {});
    c->Archive(first.storage);
    EXPECT_EQ(Stored("Container_Items_1"), HandlesOf(c->GetItems()));
    db.DeleteStream("Container_Items_1");
    RecordIo second({tree.top, c}, {});
    c->Archive(second.storage);
    c->Flush(false);
    EXPECT_EQ(second.bytes.str(), first.bytes.str());
    EXPECT_FALSE(db.StreamExists("Container_Items_1"));
    EXPECT_THAT(c->GetItems(), IsEmpty());
    EXPECT_FALSE(c->AreItemsLoaded());
}

TEST_F(ContainerStreamTest, DamagedOrUnwritableStreamsLoseNoItems) {
    Container* c = tree.Dir("c");
    const unsigned int x = data.GetItemHandle(tree.Item("c/x"));
    const unsigned int y = data.GetItemHandle(tree.Item("c/y"));
    const unsigned int foreign = data.GetItemHandle(tree.Item("d/z"));
    db.refuseWriting = "Container_Items_1";
    EXPECT_THAT([&] { c->Flush(false); },
                ThrowsMessage<Ex::CannotWriteDatabase>("Qmx_CorrException::CannotWriteDatabase. "
                                                       "Unable to write 'Container_Items_1'.\n"));
    EXPECT_TRUE(c->AreItemsLoaded());
    db.refuseWriting.clear();
    c->Flush(false);
    // Short, absurd, long; a null, dangling or foreign handle; out of order; twice.
    for (const auto& stream :
         std::vector<std::pair<unsigned int, std::vector<unsigned int>>>{{3, {x, y}},
                                                                         {0xFFFFFFFF, {x, y}},
                                                                         {1, {x, y}},
                                                                         {2, {x, 0}},
                                                                         {2, {x, x + 1000}},
                                                                         {2, {x, foreign}},
                                                                         {2, {y, x}},
                                                                         {2, {x, x}}}) {
        Store("Container_Items_1", stream.first, stream.second);
        EXPECT_THAT([&] { c->GetItems(); },
                    ThrowsMessage<Ex::InvalidDatabaseFormat>(Damaged(db.GetName())));
        EXPECT_FALSE(c->AreItemsLoaded());
    }
    Store("Container_Items_1", 2, {x, y});
    EXPECT_EQ(HandlesOf(c->GetItems()), (std::vector<unsigned int>{x, y}));
}

// A child whose Delete fails stays listed; those deleted before it are gone from the list.
TEST_F(ContainerStreamTest, DeleteRemovesTheItemsStreamsAndAFailedChildStaysListed) {
    Container* p = tree.Dir("p");
    tree.Item("p/c1/x");
    Container* c2 = tree.Dir("p/c2");
    tree.top->FlushAll(false);
    db.failDeleting = "Container_Items_3";
    EXPECT_THROW(p->DeleteContainers(0), Ex::CannotWriteDatabase);
    EXPECT_THAT(p->GetContainers(), ElementsAre(c2));
    EXPECT_FALSE(db.StreamExists("Container_Items_2"));
    db.failDeleting.clear();
    c2->Delete(0);
    EXPECT_THAT(p->GetContainers(), IsEmpty());
    p->Delete(0);
    EXPECT_FALSE(db.StreamExists("Container_Items_1"));
}

// A restored copy shares the original's children and name slot and lets go of neither.
void DestroyCopy(Container* copy) {
    Qmx_CorrNameRepository* repo = copy->GetOwner()->GetNameRepo();
    const Qmx_CorrNameHandle name = repo->CopyName(copy->GetNameHandle());
    copy->GetContainers().clear();
    copy->~Container();
    repo->DiscardName(name);
}

TEST_F(ManagedContainerTest, RecordRoundTrip) {
    Container *a = Dir("a"), *b = Dir("a/b"), *d = Dir("a/d"), *c = Dir("c");
    auto* out = static_cast<ImpRel*>(mgr->CreateImplicitRelationship(a, c, false, kBoth));
    auto* in = static_cast<ImpRel*>(mgr->CreateImplicitRelationship(c, a, false, kBoth));
    a->SetProperty_String("note", "kept", nullptr);
    RecordIo io({tree.top, a, b, c, d}, {out, in});
    a->Archive(io.storage);
    RecordIo expected({tree.top, a, b, c, d}, {out, in});
    Qmx_CorrStorage& e = expected.storage;
    const auto& cs = expected.data.containers;
    const auto& rs = expected.data.implicitRelationships;
    e.WriteBool(true);  // a record of its own: one string property
    e.WriteUINT32(1);
    e.WriteString("note");
    e.WriteUINT32(1);
    e.WriteString("kept");
    e.WriteUINT32(RecordIo::Of(cs, tree.top));
    Data()->GetNameRepo()->ArchiveName(e, a->GetNameHandle());
    e.WriteString("Container_Items_1");
    for (unsigned int value : {1u, 2u, RecordIo::Of(cs, b), RecordIo::Of(cs, d), 1u,
                               RecordIo::Of(rs, out), 1u, RecordIo::Of(rs, in)})
        e.WriteUINT32(value);
    EXPECT_EQ(io.bytes.str(), expected.bytes.str());

    alignas(Container) unsigned char memory[sizeof(Container)];
    Container* copy = new (memory) Container(io.storage, Data());
    EXPECT_EQ(io.storage.BytesLeft(), 0);
    EXPECT_EQ(copy->GetName(), "a");
    EXPECT_EQ(copy->GetParent(), tree.top);
    EXPECT_THAT(copy->GetContainers(), ElementsAre(b, d));
    EXPECT_THAT(copy->GetOutgoingRelationships(), ElementsAre(out));
    EXPECT_THAT(copy->GetIncomingRelationships(), ElementsAre(in));
    EXPECT_EQ(copy->GetContainerId(), 1u);
    EXPECT_FALSE(copy->AreItemsLoaded());
    EXPECT_EQ(copy->GetProperty_String("note", nullptr), "kept");
    RecordIo again({tree.top, a, b, c, d}, {out, in});
    copy->Archive(again.storage);
    EXPECT_EQ(again.bytes.str(), io.bytes.str());
    DestroyCopy(copy);
}

TEST_F(ManagedContainerTest, DamagedRecordsAreRefused) {
    alignas(Container) unsigned char memory[sizeof(Container)];
    RecordIo io({}, {});
    // Read in restore order; entry 3 is the container being read.
    io.data.containers = {nullptr, tree.top, Dir("a"), reinterpret_cast<Container*>(memory)};
    const auto record = [&](unsigned int parent, std::vector<unsigned int> lists) {
        io.Reset("");
        io.storage.WriteBool(false);  // no data of its own
        for (unsigned int value : {parent, 1u, 0u}) io.storage.WriteUINT32(value);  // + name
        io.storage.WriteString("Container_Items_9");
        io.storage.WriteUINT32(9);
        for (unsigned int value : lists) io.storage.WriteUINT32(value);
        return io.bytes.str();
    };
    const std::string good = record(1, {1, 2, 0, 0});
    // Parent itself; absurd counts; null, own, repeated or unknown children; null relationship.
    std::vector<std::string> cases = {record(3, {0, 0, 0}),       record(1, {0xFFFFFFFF, 2, 0, 0}),
                                      record(1, {1, 0, 0, 0}),    record(1, {1, 3, 0, 0}),
                                      record(1, {2, 2, 2, 0, 0}), record(1, {1, 4, 0, 0}),
                                      record(1, {0, 1, 0, 0}),    record(1, {0, 0, 0x40000000})};
    for (std::size_t length = 0; length < good.size(); ++length)
        cases.push_back(good.substr(0, length));
    const auto restore = [&](const std::string& bytes) {
        io.Reset(bytes);
        DestroyCopy(new (memory) Container(io.storage, Data()));
    };
    for (const std::string& bytes : cases) {
        EXPECT_THAT([&] { restore(bytes); },
                    ThrowsMessage<Ex::InvalidDatabaseFormat>(Damaged(kDbName)))
            << ::testing::PrintToString(bytes);
    }
    EXPECT_NO_THROW(restore(good));
    io.data.containerVersion = 2;
    EXPECT_THAT([&] { restore(good); }, ThrowsMessage<Ex::InvalidDatabaseFormat>(Damaged(kDbName)));
}

}  // namespace
