// Measures how fast a database file is committed and opened again, next to copying the same
// file with cp on the same disk in the same run (plain, and made durable like a commit).
//
//   db_file_bench [DIR [MIB [ROUNDS]]]
//
// DIR (default: the current directory) receives the database, its temporary directories and
// the copy; MIB (default 256) is the stream data in MiB; ROUNDS (default 3) how often each is
// measured. Prints medians in MB/s and the ratios to cp, and the peak resident memory.

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "BenchMeasure.h"
#include "Qmx_CorrDb_Internal.h"
#include "Qmx_CorrStream.h"
#include "Vesk_File.h"

namespace {

using bench::Median;
using bench::Seconds;

constexpr std::size_t kStreamSize = 4 << 20;
constexpr std::size_t kBlock = 64 << 10;

// Fills the database with `streams` streams of pseudo-random bytes that compress a little,
// like handles and names do.
void FillStreams(Qmx_CorrDb& db, std::size_t streams) {
    std::vector<char> block(kBlock);
    std::uint32_t state = 12345;
    for (std::size_t s = 0; s < streams; ++s) {
        Qmx_CorrStream* stream = db.OpenStream("pool_" + std::to_string(s), 6);
        for (std::size_t done = 0; done < kStreamSize; done += kBlock) {
            for (char& c : block) {
                state = state * 1103515245u + 12345u;
                c = static_cast<char>((state >> 16) & 0x3F);
            }
            stream->write(block.data(), static_cast<unsigned>(block.size()));
        }
        db.CloseStream(stream);
    }
}

}  // namespace

int main(int argc, char** argv) {
    const std::string dir = argc > 1 ? argv[1] : ".";
    const std::size_t mib = argc > 2 ? std::strtoul(argv[2], nullptr, 10) : 256;
    const int rounds = argc > 3 ? std::atoi(argv[3]) : 3;
    const std::size_t streams = std::max<std::size_t>(1, mib * (1 << 20) / kStreamSize);
    const double megabytes = static_cast<double>(streams * kStreamSize) / 1e6;
    const std::string work = Vesk::File::tmpnam(dir.c_str());
    if (work.empty()) {
        std::fprintf(stderr, "db_file_bench: cannot make a directory in %s\n", dir.c_str());
        return 1;
    }
    const std::string path = work + "/bench.cpd";
    std::vector<double> commit, open, copy, durableCopy;
    long rssAfterFill = 0;
    for (int round = 0; round < rounds; ++round) {
        Vesk::File::remove_f(path);
        {
            Qmx_CorrDb_Internal db(path, work + "/streams-" + std::to_string(round));
            FillStreams(db, streams);
            rssAfterFill = std::max(rssAfterFill, bench::PeakResidentMiB());
            const auto start = std::chrono::steady_clock::now();
            db.Commit();
            commit.push_back(megabytes / Seconds(start));
        }
        Vesk::File::remove_r(work + "/streams-" + std::to_string(round));
        {
            const auto start = std::chrono::steady_clock::now();
            Qmx_CorrDb_Internal db(path);
            open.push_back(megabytes / Seconds(start));
        }
        const std::string command = "cp '" + path + "' '" + work + "/copy.cpd'";
        const auto start = std::chrono::steady_clock::now();
        if (std::system(command.c_str()) != 0) return 1;
        copy.push_back(megabytes / Seconds(start));
        Vesk::File::remove_f(work + "/copy.cpd");
        // A commit makes its file durable; so does this copy (sync with a file argument
        // fsyncs that file).
        const std::string durable = command + " && sync '" + work + "/copy.cpd'";
        const auto durableStart = std::chrono::steady_clock::now();
        if (std::system(durable.c_str()) != 0) return 1;
        durableCopy.push_back(megabytes / Seconds(durableStart));
        Vesk::File::remove_f(work + "/copy.cpd");
    }
    Vesk::File::remove_r(work);
    std::printf("stream data      %.0f MB in %zu streams, %d rounds (medians)\n", megabytes,
                streams, rounds);
    std::printf("cp               %8.0f MB/s\n", Median(copy));
    std::printf("cp + fsync       %8.0f MB/s\n", Median(durableCopy));
    std::printf("commit           %8.0f MB/s   %.2f x cp   %.2f x cp + fsync\n", Median(commit),
                Median(commit) / Median(copy), Median(commit) / Median(durableCopy));
    std::printf("open (unpack)    %8.0f MB/s   %.2f x cp\n", Median(open),
                Median(open) / Median(copy));
    std::printf("peak RSS         %8ld MiB (after filling: %ld MiB)\n", bench::PeakResidentMiB(),
                rssAfterFill);
    return 0;
}
