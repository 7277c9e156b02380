// The program's own work over prepared streams: walking sections and pools,
// printing pool lists in both forms, and the application report with its
// grouping by database. Time per pool is the figure that must stay flat
// from 10^3 to 10^6 pools.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <map>
#include <string>

#include "benchEnvironment.h"
#include "benchStreams.h"
#include "engine/vrxapp.h"
#include "monitor/mtrkSnapshot.h"
#include "monitor/mtrkStream.h"
#include "mtrkOptions.h"
#include "reports/mtrkPoolList.h"
#include "reports/mtrkReports.h"

namespace {

using standin::SnapshotKind;

// Streams are built once per size and kept for the rest of the run.
const std::string& stream(SnapshotKind kind, bool applications, int64_t pools) {
    static std::map<std::tuple<int, bool, int64_t>, std::string> built;
    auto key = std::make_tuple(static_cast<int>(kind), applications, pools);
    auto it = built.find(key);
    if (it == built.end()) {
        auto shape = applications ? bench::applicationsOnly(static_cast<uint64_t>(pools))
                                  : bench::poolsOnly(static_cast<uint64_t>(pools));
        it = built.emplace(key, bench::encodedStream(bench::instanceText(shape), kind)).first;
    }
    return it->second;
}

uint32_t lengthOf(const std::string& s) {
    return mtrkStreamLength(s.data(), static_cast<uint32_t>(s.size()));
}

MtrkOptions options(bool verbose) {
    MtrkOptions o;
    mtrkSetDefaultOptions(&o);
    o.application = 1;
    o.verbose = verbose ? 1 : 0;
    return o;
}

// Time per pool, as the reports show it.
void perPool(benchmark::State& state, int64_t pools) {
    state.counters["pools"] = static_cast<double>(pools);
    state.counters["per_pool"] = benchmark::Counter(
        static_cast<double>(pools),
        benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
}

void walkSectionsAndPools(benchmark::State& state) {
    const std::string& s = stream(SnapshotKind::Application, true, state.range(0));
    int64_t pools = 0;
    for (auto _ : state) {
        pools = 0;
        const char* section = nullptr;
        const char* data = nullptr;
        uint32_t remaining = 0;
        int32_t found = mtrkFindNextElement(s.data(), lengthOf(s), &section, &data, &remaining,
                                            MON_APPLICATION);
        while (found == 0) {
            const char* pool = nullptr;
            const char* poolData = nullptr;
            uint32_t poolRemaining = 0;
            uint32_t poolSize = 0;
            int32_t more = mtrkFindNextPool(data, mtrkReadHeader(section).size, &pool, &poolData,
                                            &poolRemaining, &poolSize);
            while (more == 0) {
                ++pools;
                more = mtrkFindNextPool(pool, poolRemaining, &pool, &poolData, &poolRemaining,
                                        &poolSize);
            }
            found =
                mtrkFindNextElement(data, remaining, &section, &data, &remaining, MON_APPLICATION);
        }
        benchmark::DoNotOptimize(pools);
    }
    if (pools != state.range(0))
        state.SkipWithError("the walk missed pools");
    perPool(state, pools);
}

void printPoolList(benchmark::State& state) {
    const std::string& s = stream(SnapshotKind::Instance, false, state.range(0));
    const MtrkOptions o = options(state.range(1) != 0);
    for (auto _ : state) {
        if (mtrkPrintPoolList(s.data(), lengthOf(s), &o, true, nullptr) != 0)
            state.SkipWithError("the pool list failed");
        std::fflush(stdout);
    }
    perPool(state, state.range(0));
}

// The report takes its snapshots from the engine, which serves the
// prepared streams from files: servePreparedStreams shows what that costs.
void prepareReport(int64_t pools) {
    const bench::Environment& environment = bench::environment();
    environment.serve("application", stream(SnapshotKind::Application, true, pools));
    environment.serve("database", stream(SnapshotKind::Database, true, pools));
}

void applicationReport(benchmark::State& state) {
    prepareReport(state.range(0));
    const MtrkOptions o = options(state.range(1) != 0);
    for (auto _ : state) {
        if (mtrkApplicationReport(&o) != 0)
            state.SkipWithError("the report failed");
        std::fflush(stdout);
    }
    perPool(state, state.range(0));
}

void servePreparedStreams(benchmark::State& state) {
    prepareReport(state.range(0));
    for (auto _ : state) {
        char* applications = nullptr;
        char* databases = nullptr;
        if (mtrkGetSnapshot(&applications, VRX_OBJ_APPLICATION, nullptr) != 0 ||
            mtrkGetSnapshot(&databases, VRX_OBJ_DATABASE, nullptr) != 0) {
            state.SkipWithError("no snapshot");
        }
        mtrkReleaseSnapshot(&applications);
        mtrkReleaseSnapshot(&databases);
    }
    perPool(state, state.range(0));
}

void sizes(benchmark::internal::Benchmark* b) {
    for (int64_t pools : {1000, 10000, 100000, 1000000})
        b->Arg(pools);
}

void sizesAndForms(benchmark::internal::Benchmark* b) {
    b->ArgNames({"pools", "verbose"});
    for (int64_t verbose : {0, 1}) {
        for (int64_t pools : {1000, 10000, 100000, 1000000})
            b->Args({pools, verbose});
    }
}

BENCHMARK(walkSectionsAndPools)->Apply(sizes)->ArgName("pools");
BENCHMARK(printPoolList)->Apply(sizesAndForms)->Unit(benchmark::kMillisecond);
BENCHMARK(applicationReport)->Apply(sizesAndForms)->Unit(benchmark::kMillisecond);
BENCHMARK(servePreparedStreams)->Apply(sizes)->ArgName("pools")->Unit(benchmark::kMillisecond);

}  // namespace
