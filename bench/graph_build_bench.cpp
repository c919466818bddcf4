// Measures building a graph in memory through the public interface: items created in
// containers of 1000, then one explicit relationship from each item to the next, so that every
// item has at most one relationship each way. Names are about 20 characters
// (u_core/alu/add_12[345]).
//
//   graph_build_bench [ITEMS [ROUNDS]]
//
// ITEMS (default 1000000) items and as many relationships less one; ROUNDS (default 3) fresh
// databases. Prints the medians of items/s and relationships/s and the resident bytes per
// item (the largest growth of the resident set over one build, relationships included).

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "BenchMeasure.h"
#include "Qmx_CorrMgr.h"

namespace {

using bench::Median;
using bench::Seconds;

constexpr unsigned kItemsPerContainer = 1000;

struct Round {
    double itemsPerSecond;
    double relsPerSecond;
    double bytesPerItem;
};

// Names are made before the clock and the memory baseline start: making them is the
// host's work, not the library's.
std::vector<std::string> MakeNames(unsigned itemCount) {
    std::vector<std::string> names;
    names.reserve(itemCount);
    char name[64];
    for (unsigned i = 0; i < itemCount; ++i) {
        std::snprintf(name, sizeof name, "u_core/alu/add_%u[%u]", i % 997, i / 997);
        names.push_back(name);
    }
    return names;
}

Round Build(const std::vector<std::string>& names) {
    const auto itemCount = static_cast<unsigned>(names.size());
    const long before = bench::ResidentBytes();
    Qmx_CorrMgr mgr("", "", Qmx_CorrMgr::DB_READ_WRITE, nullptr);
    char containerName[32];

    auto start = std::chrono::steady_clock::now();
    Qmx_CorrContainer* container = nullptr;
    for (unsigned i = 0; i < itemCount; ++i) {
        if (i % kItemsPerContainer == 0) {
            std::snprintf(containerName, sizeof containerName, "mod_%u", i / kItemsPerContainer);
            container = mgr.GetTopContainer()->CreateContainer(containerName);
        }
        container->CreateItem(names[i]);
    }
    const double itemSeconds = Seconds(start);

    // A chain through every item, container by container in item order.
    start = std::chrono::steady_clock::now();
    Qmx_CorrItem* previous = nullptr;
    unsigned relationships = 0;
    for (Qmx_CorrContainer* module : mgr.GetTopContainer()->GetContainers()) {
        for (Qmx_CorrItem* item : module->GetItems()) {
            if (previous) {
                mgr.CreateExplicitRelationship(previous, item);
                ++relationships;
            }
            previous = item;
        }
    }
    const double relSeconds = Seconds(start);

    const long after = bench::ResidentBytes();
    return {itemCount / itemSeconds, relationships / relSeconds,
            static_cast<double>(after - before) / itemCount};
}

}  // namespace

int main(int argc, char** argv) {
    if (argc > 1 && (std::string(argv[1]) == "--help" || std::string(argv[1]) == "-h")) {
        std::printf("usage: graph_build_bench [ITEMS [ROUNDS]]\n");
        return 0;
    }
    const unsigned itemCount = argc > 1 ? static_cast<unsigned>(std::atol(argv[1])) : 1000000;
    const int rounds = argc > 2 ? std::atoi(argv[2]) : 3;
    if (itemCount < 2 || rounds < 1) {
        std::fprintf(stderr, "graph_build_bench: ITEMS must be at least 2, ROUNDS at least 1\n");
        return 2;
    }
    const std::vector<std::string> names = MakeNames(itemCount);
    std::vector<double> items, rels, bytes;
    for (int round = 0; round < rounds; ++round) {
        const Round result = Build(names);
        items.push_back(result.itemsPerSecond);
        rels.push_back(result.relsPerSecond);
        bytes.push_back(result.bytesPerItem);
    }
    std::printf("items:          %u in containers of %u, %d rounds (medians)\n", itemCount,
                kItemsPerContainer, rounds);
    std::printf("items/s:        %.0f\n", Median(items));
    std::printf("relationships/s: %.0f\n", Median(rels));
    // Later rounds may reuse memory the earlier ones gave back: the largest growth is the honest
    // one.
    std::printf("resident bytes per item: %.0f (largest round)\n",
                *std::max_element(bytes.begin(), bytes.end()));
    return 0;
}
