// Measures a whole graph on disk: items in containers of 1000 with one explicit relationship
// from each item to the next are built, committed to a new database file, closed, reopened
// read-only and read back completely (every item, its relationships and the items at their
// other ends).
//
//   graph_file_bench [DIR [ITEMS [ROUNDS]]]
//
// DIR (default: the current directory) receives the database; ITEMS (default 1000000);
// ROUNDS (default 3); the database of the last round stays in DIR. Prints the median seconds
// of each phase, the seconds per million items of commit and reopen, the file size per item,
// and the resident memory before and after the commit (the commit should need little beyond
// the graph).

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "BenchMeasure.h"
#include "Qmx_CorrMgr.h"
#include "Vesk_File.h"

namespace {

using bench::Median;
using bench::Seconds;

constexpr unsigned kItemsPerContainer = 1000;

struct Round {
    double build, commit, close, reopen, read;
    long fileBytes;
    long beforeCommitMiB, peakMiB;
    unsigned long visited;
};

void BuildGraph(Qmx_CorrMgr& mgr, unsigned itemCount) {
    char name[64];
    Qmx_CorrContainer* container = nullptr;
    Qmx_CorrItem* previous = nullptr;
    for (unsigned i = 0; i < itemCount; ++i) {
        if (i % kItemsPerContainer == 0) {
            std::snprintf(name, sizeof name, "mod_%u", i / kItemsPerContainer);
            container = mgr.GetTopContainer()->CreateContainer(name);
        }
        std::snprintf(name, sizeof name, "u_core/alu/add_%u[%u]", i % 997, i / 997);
        Qmx_CorrItem* item = container->CreateItem(name);
        if (previous) mgr.CreateExplicitRelationship(previous, item);
        previous = item;
    }
}

// Touches everything a lineage question may touch, so that every pool is loaded.
unsigned long ReadBack(Qmx_CorrMgr& mgr) {
    unsigned long visited = 0;
    for (Qmx_CorrContainer* container : mgr.GetTopContainer()->GetContainers()) {
        for (Qmx_CorrItem* item : container->GetItems()) {
            for (Qmx_CorrExplicitRelationship* rel : item->GetOutgoingRelationships())
                visited += rel->GetDstItems().size();
            visited += item->GetName().size() != 0;
        }
    }
    return visited;
}

Round RunRound(const std::string& path, unsigned itemCount) {
    Vesk::File::remove_f(path);
    Round round{};
    auto* mgr = new Qmx_CorrMgr(path, "", Qmx_CorrMgr::DB_READ_WRITE, nullptr);
    auto start = std::chrono::steady_clock::now();
    BuildGraph(*mgr, itemCount);
    round.build = Seconds(start);
    round.beforeCommitMiB = bench::ResidentBytes() / (1024 * 1024);
    start = std::chrono::steady_clock::now();
    mgr->Commit();
    round.commit = Seconds(start);
    round.peakMiB = bench::PeakResidentMiB();
    start = std::chrono::steady_clock::now();
    delete mgr;
    round.close = Seconds(start);
    round.fileBytes = static_cast<long>(Vesk::File::getsize_noopen(path.c_str()));

    start = std::chrono::steady_clock::now();
    mgr = new Qmx_CorrMgr(path, "", Qmx_CorrMgr::DB_READ_ONLY, nullptr);
    round.reopen = Seconds(start);
    start = std::chrono::steady_clock::now();
    round.visited = ReadBack(*mgr);
    round.read = Seconds(start);
    delete mgr;
    return round;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc > 1 && (std::string(argv[1]) == "--help" || std::string(argv[1]) == "-h")) {
        std::printf("usage: graph_file_bench [DIR [ITEMS [ROUNDS]]]\n");
        return 0;
    }
    const std::string dir = argc > 1 ? argv[1] : ".";
    const unsigned itemCount = argc > 2 ? static_cast<unsigned>(std::atol(argv[2])) : 1000000;
    const int rounds = argc > 3 ? std::atoi(argv[3]) : 3;
    if (itemCount < 2 || rounds < 1) {
        std::fprintf(stderr, "graph_file_bench: ITEMS must be at least 2, ROUNDS at least 1\n");
        return 2;
    }
    const std::string path = dir + "/graph_file_bench.cpd";
    std::vector<double> build, commit, close, reopen, read;
    Round last{};
    for (int i = 0; i < rounds; ++i) {
        last = RunRound(path, itemCount);
        build.push_back(last.build);
        commit.push_back(last.commit);
        close.push_back(last.close);
        reopen.push_back(last.reopen);
        read.push_back(last.read);
    }
    const double millions = itemCount / 1e6;
    std::printf("items: %u (and as many relationships less one), %d rounds, medians\n", itemCount,
                rounds);
    std::printf("build   %.3f s\n", Median(build));
    std::printf("commit  %.3f s  (%.3f s per million items)\n", Median(commit),
                Median(commit) / millions);
    std::printf("close   %.3f s\n", Median(close));
    std::printf("reopen  %.3f s  (%.3f s per million items)\n", Median(reopen),
                Median(reopen) / millions);
    std::printf("read    %.3f s  (%lu relationship ends)\n", Median(read), last.visited);
    std::printf("file    %ld bytes (%.1f per item)\n", last.fileBytes,
                static_cast<double>(last.fileBytes) / itemCount);
    std::printf("memory  %ld MiB resident before the commit, %ld MiB peak\n", last.beforeCommitMiB,
                last.peakMiB);
    return 0;
}
