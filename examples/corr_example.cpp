// A host program in small: it records that the gates of a synthesised design were derived from
// the registers of its source, commits the database, opens it again read-only and asks where
// one gate came from.
//
//   corr_example [FILE]      (default: example.cpd, removed again at the end)
#include <cstdio>
#include <iostream>

#include "Qmx_CorrException.h"
#include "Qmx_CorrMgr.h"
#include "Vesk_File.h"

namespace {

void Build(const Vesk::StringBase<char>& path) {
    Qmx_CorrMgr mgr(path, "", Qmx_CorrMgr::DB_READ_WRITE, nullptr);
    Qmx_CorrContainer* rtl = mgr.GetTopContainer()->CreateContainer("rtl");
    Qmx_CorrContainer* syn = mgr.GetTopContainer()->CreateContainer("syn");
    Qmx_CorrContainer* alu = rtl->CreateContainer("u_core")->CreateContainer("alu");
    Qmx_CorrItem* add = alu->CreateItem("add_3");
    Qmx_CorrItem* carry = alu->CreateItem("carry_in");
    for (int bit = 0; bit < 4; ++bit) {
        char name[32];
        std::snprintf(name, sizeof name, "add_3_reg[%d]", bit);
        Qmx_CorrItem* gate = syn->CreateItem(name);
        Qmx_CorrExplicitRelationship* rel = mgr.CreateExplicitRelationship(add, gate);
        if (bit == 0) rel->AddSrcItem(carry);
        gate->SetProperty_INT32("bit", bit, nullptr);
    }
    // Whatever lies beneath /rtl/ corresponds by name to the same place beneath /syn/,
    // "_in" names becoming "_out" names.
    mgr.CreateImplicitRelationship(rtl, syn, true, Qmx_CorrImplicitRelationship::DIR_BOTH, "_in$",
                                   "_out");
    add->SetProperty_String("kind", "adder", nullptr);
    mgr.Commit();
}

void Ask(const Vesk::StringBase<char>& path) {
    const Qmx_CorrMgr mgr(path, "", Qmx_CorrMgr::DB_READ_ONLY, nullptr);
    const Qmx_CorrContainer* syn = mgr.GetTopContainer()->GetContainer("syn");
    const Qmx_CorrItem* gate = syn->GetItem("add_3_reg[0]");
    std::cout << gate->GetAbsoluteName() << " (bit " << gate->GetProperty_INT32("bit", nullptr)
              << ") was derived from:\n";
    for (const Qmx_CorrExplicitRelationship* rel : gate->GetIncomingRelationships())
        for (const Qmx_CorrItem* source : rel->GetSrcItems()) {
            std::cout << "  " << source->GetAbsoluteName();
            if (source->HasProperty("kind"))
                std::cout << " (" << source->GetProperty_String("kind", nullptr) << ")";
            std::cout << "\n";
        }
    const Qmx_CorrImplicitRelationship* rel =
        mgr.GetTopContainer()->GetContainer("rtl")->GetOutgoingRelationships().front();
    std::cout << "implicit: " << rel->GetSrcContainer()->GetAbsoluteName() << " "
              << Qmx_CorrImplicitRelationship::GetDirectionText(rel->GetDirection()) << " "
              << rel->GetDstContainer()->GetAbsoluteName() << ", '" << rel->GetSrcExpression()
              << "' to '" << rel->GetDstFormat() << "'\n";
    std::cout << "database " << path << ": " << Vesk::File::getsize_noopen(path) << " bytes, "
              << (mgr.DbgValidateState() ? "valid" : "INVALID") << "\n";
}

}  // namespace

int main(int argc, char** argv) {
    const Vesk::StringBase<char> path = argc > 1 ? argv[1] : "example.cpd";
    try {
        Vesk::File::remove_f(path);
        Build(path);
        Ask(path);
        Vesk::File::remove_f(path);
        return 0;
    } catch (const Vesk::Exception& e) {
        std::cerr << "corr_example: " << e.what() << "\n";
        return 1;
    }
}
