#include "Qmx_CorrMgr.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "Qmx_CorrDataMgr.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrNameRepo_Basic.h"

namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::StartsWith;
using ::testing::ThrowsMessage;

const auto kReadOnly = Qmx_CorrMgr::DB_READ_ONLY;
const auto kReadWrite = Qmx_CorrMgr::DB_READ_WRITE;
const auto kBoth = Qmx_CorrImplicitRelationship::DIR_BOTH;

std::unique_ptr<Qmx_CorrMgr> Open(Qmx_CorrMgr::DB_MODE mode = kReadWrite) {
    return std::unique_ptr<Qmx_CorrMgr>(new Qmx_CorrMgr("", "", mode, nullptr));
}

Qmx_CorrDataMgr* DataMgrOf(Qmx_CorrManagedContainer* container) {
    return static_cast<Qmx_CorrDataMgr*>(container->GetOwner());
}

Qmx_CorrManagedContainer* Top(Qmx_CorrMgr& mgr) {
    return static_cast<Qmx_CorrManagedContainer*>(mgr.GetTopContainer());
}

std::vector<std::string> AbsoluteNames(const std::vector<Qmx_CorrItem*>& items) {
    std::vector<std::string> names;
    for (const Qmx_CorrItem* item : items) names.push_back(item ? item->GetAbsoluteName() : "-");
    return names;
}

template <class List>
std::vector<Qmx_CorrItem*> ToVector(const List& list) {
    return std::vector<Qmx_CorrItem*>(list.begin(), list.end());
}

TEST(CorrMgr, DatabaseWithoutFileCannotCommit) {
    auto writable = Open();
    EXPECT_FALSE(writable->CanCommit());
    EXPECT_THAT([&] { writable->Commit(); }, ThrowsMessage<Qmx_CorrException::DatabaseIsReadonly>(
                                                 "Qmx_CorrException::DatabaseIsReadonly\n"));
    // A writable database without a file has nowhere to save its changes: it stays modified.
    EXPECT_TRUE(writable->IsModified());
    writable->FlushAll();
    EXPECT_TRUE(writable->IsModified());

    auto readOnly = Open(kReadOnly);
    EXPECT_FALSE(readOnly->CanCommit());
    EXPECT_FALSE(readOnly->IsModified());
    EXPECT_THROW(readOnly->Commit(), Qmx_CorrException::DatabaseIsReadonly);
    EXPECT_EQ(readOnly->GetTopContainer()->GetAbsoluteName(), "/");
    EXPECT_TRUE(readOnly->GetTopContainer()->GetItems().empty());
}

// Every kind of change marks the database modified, so that a commit writes it. A read-only
// database starts unmodified and may still be changed in memory.
TEST(CorrMgr, EveryChangeMarksTheDatabaseModified) {
    const std::vector<std::pair<const char*, void (*)(Qmx_CorrContainer*)>> changes = {
        {"container", [](Qmx_CorrContainer* top) { top->CreateContainer("a"); }},
        {"item", [](Qmx_CorrContainer* top) { top->CreateItem("x"); }},
        {"found or created item", [](Qmx_CorrContainer* top) { top->FindOrCreateItem("x"); }},
        {"property", [](Qmx_CorrContainer* top) { top->SetProperty_INT32("p", 1, nullptr); }},
    };
    for (const auto& change : changes) {
        auto mgr = Open(kReadOnly);
        change.second(mgr->GetTopContainer());
        EXPECT_TRUE(mgr->IsModified()) << change.first;
    }
    auto mgr = Open(kReadOnly);
    mgr->GetTopContainer()->GetItem("absent");
    mgr->GetTopContainer()->DestroyProperty("absent", nullptr);
    EXPECT_FALSE(mgr->IsModified()) << "looking changes nothing";
}

TEST(CorrMgr, ExplicitRelationshipsNeedTwoDifferentEnds) {
    auto mgr = Open();
    Qmx_CorrItem* x = mgr->GetTopContainer()->CreateItem("x");
    EXPECT_THROW(mgr->CreateExplicitRelationship(nullptr, nullptr),
                 Qmx_CorrException::SrcAndDstIdentical);
    EXPECT_THROW(mgr->CreateExplicitRelationship(x, x), Qmx_CorrException::SrcAndDstIdentical);
    EXPECT_TRUE(x->GetOutgoingRelationships().empty());

    Qmx_CorrExplicitRelationship* rel = mgr->CreateExplicitRelationship(nullptr, x);
    EXPECT_TRUE(rel->GetSrcItems().empty());
    EXPECT_THAT(AbsoluteNames(ToVector(rel->GetDstItems())), ElementsAre("/x"));
    ASSERT_EQ(x->GetIncomingRelationships().size(), 1u);
    EXPECT_EQ(x->GetIncomingRelationships()[0], rel);
    EXPECT_TRUE(mgr->DbgValidateState());
}

TEST(CorrMgr, ImplicitRelationshipArgumentsAreChecked) {
    auto mgr = Open();
    Qmx_CorrContainer* a = mgr->GetTopContainer()->CreateContainer("a");
    Qmx_CorrContainer* b = mgr->GetTopContainer()->CreateContainer("b");
    EXPECT_THAT([&] { mgr->CreateImplicitRelationship(nullptr, b, false, kBoth); },
                ThrowsMessage<Qmx_CorrException::InvalidSrcItem>(HasSubstr("'NULL'")));
    EXPECT_THAT([&] { mgr->CreateImplicitRelationship(a, nullptr, false, kBoth); },
                ThrowsMessage<Qmx_CorrException::InvalidDstItem>(HasSubstr("'NULL'")));
    EXPECT_THROW(mgr->CreateImplicitRelationship(a, a, false, kBoth),
                 Qmx_CorrException::SrcAndDstIdentical);
    EXPECT_THAT(
        [&] { mgr->CreateImplicitRelationship(a, b, false, kBoth, nullptr, "$1"); },
        ThrowsMessage<Qmx_CorrException::BadExpression>("Qmx_CorrException::BadExpression\n"));
    EXPECT_THAT([&] { mgr->CreateImplicitRelationship(a, b, false, kBoth, "(u", "x"); },
                ThrowsMessage<Qmx_CorrException::BadExpression>(
                    "Qmx_CorrException::BadExpression.  '(u' is not a valid regular "
                    "expresssion.\n"));
    // Containers of another database are refused, as the relationship would outlive them.
    auto other = Open();
    Qmx_CorrContainer* foreign = other->GetTopContainer()->CreateContainer("f");
    EXPECT_THROW(mgr->CreateImplicitRelationship(foreign, b, false, kBoth),
                 Qmx_CorrException::InvalidSrcItem);
    EXPECT_THROW(mgr->CreateImplicitRelationship(a, foreign, false, kBoth),
                 Qmx_CorrException::InvalidDstItem);
    EXPECT_TRUE(a->GetOutgoingRelationships().empty());
    EXPECT_TRUE(b->GetIncomingRelationships().empty());
    EXPECT_TRUE(DataMgrOf(Top(*mgr))->GetImplicitRelationships().empty());

    Qmx_CorrImplicitRelationship* rel =
        mgr->CreateImplicitRelationship(a, b, true, kBoth, "_in$", "_out");
    EXPECT_THAT(a->GetOutgoingRelationships(), ElementsAre(rel));
    EXPECT_THAT(b->GetIncomingRelationships(), ElementsAre(rel));
    EXPECT_STREQ(rel->GetDstFormat(), "_out");
}

TEST(CorrMgr, EachObjectKnowsItsManager) {
    auto first = Open();
    auto second = Open();
    for (Qmx_CorrMgr* mgr : {first.get(), second.get()}) {
        Qmx_CorrContainer* a = mgr->GetTopContainer()->CreateContainer("a");
        Qmx_CorrItem* x = a->CreateItem("x");
        Qmx_CorrItem* y = mgr->GetTopContainer()->CreateItem("y");
        Qmx_CorrObject* objects[] = {
            a, x, mgr->CreateExplicitRelationship(x, y),
            mgr->CreateImplicitRelationship(a, mgr->GetTopContainer(), false, kBoth)};
        for (Qmx_CorrObject* object : objects)
            EXPECT_EQ(Qmx_CorrMgr::GetCorrMgrForObject(object), mgr);
    }
    struct Stranger : Qmx_CorrObject {
        const Qmx_CorrObjectData* GetObjectData() const override { return nullptr; }
        Qmx_CorrObjectData* GetObjectDataForWrite() override { return nullptr; }
        Vesk::StringBase<char> GetName() const override { return "stranger"; }
    } stranger;
    EXPECT_EQ(Qmx_CorrMgr::GetCorrMgrForObject(&stranger), nullptr);
    EXPECT_EQ(Qmx_CorrMgr::GetCorrMgrForObject(static_cast<Qmx_CorrObject*>(nullptr)), nullptr);
}

// Databases opened without a repository each get their own: names interned by one never
// show up in another's string table.
TEST(CorrMgr, DatabasesWithoutARepositoryHaveTheirOwn) {
    auto first = Open();
    auto second = Open();
    Qmx_CorrObjectOwner* firstOwner = Top(*first)->GetOwner();
    Qmx_CorrObjectOwner* secondOwner = Top(*second)->GetOwner();
    EXPECT_NE(firstOwner->GetNameRepo(), secondOwner->GetNameRepo());
    EXPECT_NE(firstOwner->GetNameRepo(), Qmx_CorrNameRepo_Basic::GetDefault());
    first->GetTopContainer()->CreateItem("only_in_first");
    second.reset();
    EXPECT_EQ(first->GetTopContainer()->GetItem("only_in_first")->GetName(), "only_in_first");

    Qmx_CorrNameRepo_Basic shared;
    Qmx_CorrMgr withRepo("", "", kReadWrite, &shared);
    EXPECT_EQ(Top(withRepo)->GetOwner()->GetNameRepo(), &shared);
}

TEST(CorrMgr, DeletingAContainerDeletesTheImplicitRelationshipsAtAndBeneathIt) {
    auto mgr = Open();
    Qmx_CorrContainer* top = mgr->GetTopContainer();
    Qmx_CorrContainer* a = top->CreateContainer("a");
    Qmx_CorrContainer* ab = a->CreateContainer("b");
    Qmx_CorrContainer* c = top->CreateContainer("c");
    Qmx_CorrImplicitRelationship* kept = mgr->CreateImplicitRelationship(c, top, false, kBoth);
    mgr->CreateImplicitRelationship(a, c, false, kBoth);
    mgr->CreateImplicitRelationship(c, ab, false, kBoth);
    mgr->CreateImplicitRelationship(ab, a, false, kBoth);
    Qmx_CorrItem* x = ab->CreateItem("x");
    Qmx_CorrItem* y = c->CreateItem("y");
    mgr->CreateExplicitRelationship(x, y);

    a->Delete(1);
    EXPECT_THAT(c->GetOutgoingRelationships(), ElementsAre(kept));
    EXPECT_TRUE(c->GetIncomingRelationships().empty());
    EXPECT_THAT(DataMgrOf(Top(*mgr))->GetImplicitRelationships(), ElementsAre(kept));
    EXPECT_EQ(top->GetContainer("a"), nullptr);
    // The relationship lost its only source, so relMode 1 deleted it.
    EXPECT_TRUE(y->GetIncomingRelationships().empty());
    EXPECT_TRUE(mgr->DbgValidateState());
}

// Records what the listeners of both events see, in order.
class EventLog : public Qmx_CorrEvent::Listener1<Qmx_CorrMgr*>,
                 public Qmx_CorrEvent::Listener1<Qmx_CorrContainer*> {
public:
    EventLog() {
        Qmx_CorrEvent::GetCorrMgrDeletedEmitter().AddListener(this);
        Qmx_CorrEvent::GetCorrContainerDeletedEmitter().AddListener(this);
    }
    ~EventLog() override {
        Qmx_CorrEvent::GetCorrMgrDeletedEmitter().RemoveListener(this);
        Qmx_CorrEvent::GetCorrContainerDeletedEmitter().RemoveListener(this);
    }
    void Notify(Qmx_CorrMgr* mgr) override {
        entries.push_back("manager " + mgr->GetTopContainer()->GetAbsoluteName());
    }
    // Reads everything a listener may look at while the database closes.
    void Notify(Qmx_CorrContainer* container) override {
        std::ostringstream entry;
        entry << container->GetAbsoluteName() << ":";
        for (Qmx_CorrItem* item : container->GetItems()) {
            entry << " " << item->GetName() << "(";
            for (const Qmx_CorrExplicitRelationship* rel : item->GetOutgoingRelationships())
                for (const Qmx_CorrItem* dst : rel->GetDstItems()) entry << dst->GetAbsoluteName();
            entry << ")";
        }
        for (const Qmx_CorrImplicitRelationship* rel : container->GetOutgoingRelationships())
            entry << " ->" << rel->GetDstContainer()->GetAbsoluteName();
        if (container->HasProperty("tag"))
            entry << " tag=" << container->GetProperty_String("tag", nullptr);
        entries.push_back(entry.str());
    }

    std::vector<std::string> entries;
};

TEST(CorrMgr, ClosingTellsListenersOnceEachWhileTheDatabaseIsWhole) {
    EventLog log;
    {
        auto mgr = Open();
        Qmx_CorrContainer* top = mgr->GetTopContainer();
        Qmx_CorrContainer* rtl = top->CreateContainer("rtl");
        Qmx_CorrContainer* syn = top->CreateContainer("syn");
        Qmx_CorrContainer* core = rtl->CreateContainer("core");
        Qmx_CorrItem* a = core->CreateItem("a");
        Qmx_CorrItem* b = syn->CreateItem("b");
        mgr->CreateExplicitRelationship(a, b);
        mgr->CreateImplicitRelationship(rtl, syn, false, kBoth);
        syn->SetProperty_String("tag", "gates", nullptr);
    }
    EXPECT_THAT(log.entries, ElementsAre("manager /", "/:", "/rtl/: ->/syn/",
                                         "/rtl/core/: a(/syn/b)", "/syn/: b() tag=gates"));
}

TEST(CorrMgr, DeletingAContainerTellsChildrenFirst) {
    auto mgr = Open();
    Qmx_CorrContainer* a = mgr->GetTopContainer()->CreateContainer("a");
    a->CreateContainer("b")->CreateContainer("c");
    EventLog log;
    a->Delete(0);
    EXPECT_THAT(log.entries, ElementsAre("/a/b/c/:", "/a/b/:", "/a/:"));
}

TEST(CorrMgr, DumpShowsTheManagersAndValidationPasses) {
    auto mgr = Open();
    Qmx_CorrItem* x = mgr->GetTopContainer()->CreateItem("x");
    Qmx_CorrItem* y = mgr->GetTopContainer()->CreateContainer("s")->CreateItem("y");
    mgr->CreateExplicitRelationship(x, y);
    EXPECT_TRUE(mgr->DbgValidateState());
    std::ostringstream out;
    mgr->DbgDump(out, 1);
    EXPECT_THAT(out.str(), StartsWith("   Qmx_CorrMgr\n   {\n      Qmx_CorrDataMgr\n      {\n"));
    EXPECT_THAT(out.str(), HasSubstr("Qmx_CorrManagedItemMgr"));
    EXPECT_THAT(out.str(), HasSubstr("Qmx_CorrManagedExpRelMgr"));
}

}  // namespace
