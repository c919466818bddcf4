// Measures the pool manager: resolving handles of pools in memory, and writing and reading
// whole pools through a database's pool stream (MB/s of pool records).
//
//   pool_bench [--benchmark_filter=...]
//
// The database lives in a fresh temporary directory, removed at the end. The records are 28
// bytes, the size of an item record with the basic name repository.
#include <benchmark/benchmark.h>

#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "Qmx_CorrDb_Internal.h"
#include "Qmx_CorrObjMgrT.h"
#include "Qmx_CorrStorage.h"
#include "Qmx_CorrStorageData.h"
#include "Vesk_File.h"

namespace {

constexpr unsigned int kWords = 7;
constexpr unsigned int kRecordSize = kWords * 4;

// A fixed-size record of seven words.
class Record {
public:
    explicit Record(unsigned int seed) {
        for (unsigned int i = 0; i < kWords; ++i) m_words[i] = seed + i;
    }
    Record(Qmx_CorrStorage& storage, Qmx_CorrObjectOwner*) {
        for (unsigned int& word : m_words) word = storage.ReadUINT32();
    }
    void Archive(Qmx_CorrStorage& storage) const {
        for (unsigned int word : m_words) storage.WriteUINT32(word);
    }
    bool DbgValidateState() const { return true; }
    unsigned int First() const { return m_words[0]; }

private:
    unsigned int m_words[kWords];
};

class RecordPool : public Qmx_ObjectPoolT<Record, 128> {};

class RecordMgr : public Qmx_CorrObjMgrTData::Qmx_CorrObjMgrT<Record, unsigned int, RecordPool> {
public:
    RecordMgr() : Qmx_CorrObjMgrT("Bench_Pools", "Bench_Pools_Data", kRecordSize) {}
    unsigned int Create(unsigned int containerId, unsigned int seed) {
        return GetHandle(CreateObject(containerId, seed));
    }
};

// A database with `pools` full pools of one container, all in memory.
class Fixture {
public:
    explicit Fixture(unsigned int pools)
        : m_dir(Vesk::File::tmpnam(nullptr)), m_db(new Qmx_CorrDb_Internal(m_dir + "/bench.cpd")) {
        m_mgr.OpenDb(m_db.get(), m_data, nullptr);
        for (unsigned int i = 0; i < pools * 128; ++i) m_handles.push_back(m_mgr.Create(1, i));
    }
    ~Fixture() {
        m_mgr.CloseDb();
        m_db.reset();
        Vesk::File::remove_r(m_dir);
    }
    RecordMgr& Mgr() { return m_mgr; }
    const std::vector<unsigned int>& Handles() const { return m_handles; }
    static std::int64_t PoolBytes(unsigned int pools) {
        return static_cast<std::int64_t>(pools) * (kRecordSize * 128 + 20);
    }

private:
    std::string m_dir;
    std::unique_ptr<Qmx_CorrDb_Internal> m_db;
    Qmx_CorrStorageData m_data;
    RecordMgr m_mgr;
    std::vector<unsigned int> m_handles;
};

void GetPtrInMemory(benchmark::State& state) {
    Fixture fixture(static_cast<unsigned int>(state.range(0)));
    const std::vector<unsigned int>& handles = fixture.Handles();
    std::size_t next = 0;
    for (auto _ : state) {
        benchmark::DoNotOptimize(fixture.Mgr().GetPtr(handles[next])->First());
        next = next + 1 == handles.size() ? 0 : next + 1;
    }
    state.SetItemsProcessed(state.iterations());
}
BENCHMARK(GetPtrInMemory)->Arg(1)->Arg(64)->Arg(4096);

// Writes every pool; they stay in memory.
void FlushPools(benchmark::State& state) {
    const unsigned int pools = static_cast<unsigned int>(state.range(0));
    Fixture fixture(pools);
    for (auto _ : state) fixture.Mgr().FlushAllPools(false);
    state.SetBytesProcessed(state.iterations() * Fixture::PoolBytes(pools));
}
BENCHMARK(FlushPools)->Arg(64)->Arg(1024)->Unit(benchmark::kMillisecond);

// Reads every pool back after unloading them all (the unloading is not timed).
void LoadPools(benchmark::State& state) {
    const unsigned int pools = static_cast<unsigned int>(state.range(0));
    Fixture fixture(pools);
    for (auto _ : state) {
        state.PauseTiming();
        fixture.Mgr().FlushAllPools(true);
        state.ResumeTiming();
        for (unsigned int i = 0; i < pools; ++i)
            benchmark::DoNotOptimize(fixture.Mgr().LoadPool(i));
    }
    state.SetBytesProcessed(state.iterations() * Fixture::PoolBytes(pools));
}
BENCHMARK(LoadPools)->Arg(64)->Arg(1024)->Unit(benchmark::kMillisecond);

// Frees every other slot of the first half of every pool of one container: each release
// lists its pool as having room, which must not cost a walk over the container's pools.
void DestroyAcrossPools(benchmark::State& state) {
    const unsigned int pools = static_cast<unsigned int>(state.range(0));
    for (auto _ : state) {
        state.PauseTiming();
        auto fixture = std::make_unique<Fixture>(pools);
        state.ResumeTiming();
        for (unsigned int slot = 0; slot < 64; slot += 2) {
            for (unsigned int pool = 0; pool < pools; ++pool) {
                RecordMgr& mgr = fixture->Mgr();
                mgr.Destroy(mgr.GetPtr(fixture->Handles()[pool * 128 + slot]));
            }
        }
        state.PauseTiming();
        fixture.reset();
        state.ResumeTiming();
    }
    state.SetItemsProcessed(state.iterations() * pools * 32);
}
BENCHMARK(DestroyAcrossPools)->Arg(1024)->Unit(benchmark::kMillisecond);

// Flushes the pools of each of many containers in turn, as flushing every container does: a
// container's pools are found without looking at every other pool.
void FlushEachContainer(benchmark::State& state) {
    const unsigned int containers = static_cast<unsigned int>(state.range(0));
    Fixture fixture(0);
    for (unsigned int id = 0; id < containers; ++id) fixture.Mgr().Create(id, id);
    for (auto _ : state) {
        for (unsigned int id = 0; id < containers; ++id) fixture.Mgr().FlushPools(id, false);
    }
    state.SetItemsProcessed(state.iterations() * containers);
}
BENCHMARK(FlushEachContainer)->Arg(4096)->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
