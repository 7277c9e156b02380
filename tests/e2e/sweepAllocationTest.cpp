// Every block that a full run asks the engine for is refused in turn, one
// run per block: each run must end in success or in a recorded failure
// explained last, release what it took, and leave the registry as it found
// it. The runs are cut into slices of their own tests, so that each test
// stays short also under the sanitizers; the slice that meets the first run
// without a refused block checks that the sweep counted every block.
#include <gtest/gtest.h>

#include <cstdio>
#include <ostream>
#include <stdexcept>
#include <string>
#include <vector>

#include "sweepSupport.h"
#include "testInstance.h"

namespace {

using namespace mtrktest;

// Another variable besides ours, and ours holding a value of its own, so
// that a restore that loses or invents anything shows.
const std::string kRegistry = "OTHERVAR=5\nVRXMEMTRK=0\n";

constexpr double kRunSeconds = 20;

// Blocks per test, and how many blocks the slices of each variant cover:
// room for the demo instance to grow.
constexpr int kSlice = 40;
constexpr int kVerboseSlices = 10;
constexpr int kColumnSlices = 2;

struct Slice {
    const char* variant;
    bool verbose;
    int first;  // the first allocFailAt of the slice
    int last;
    bool final;  // no slice follows: the sweep must end in it
};

std::vector<Slice> slices() {
    std::vector<Slice> all;
    for (int i = 0; i < kVerboseSlices; ++i) {
        all.push_back({"verbose", true, i * kSlice + 1, (i + 1) * kSlice, i + 1 == kVerboseSlices});
    }
    for (int i = 0; i < kColumnSlices; ++i) {
        all.push_back({"columns", false, i * kSlice + 1, (i + 1) * kSlice, i + 1 == kColumnSlices});
    }
    return all;
}

class AllocationSweepTest : public testing::TestWithParam<Slice> {
  protected:
    std::vector<std::string> args(const std::vector<std::string>& reports) const {
        std::vector<std::string> all{"-all"};
        all.insert(all.end(), reports.begin(), reports.end());
        if (GetParam().verbose) {
            all.push_back("-v");
        }
        return all;
    }

    RunResult run(const std::string& json, const std::vector<std::string>& reports) {
        instance_.writeJson(json);
        instance_.writeFile("diag.log", "");
        instance_.writeFile("registry", kRegistry);
        RunOptions options;
        options.timeoutSeconds = kRunSeconds;
        return runProgram(instance_, args(reports), options);
    }

    TempInstance instance_;
};

// The lines that are catalog messages, each fetched with two blocks: with
// -v every non-empty line; in columns every line but the pool columns,
// which the program composes itself.
size_t messageLines(const std::string& out, bool verbose) {
    size_t count = 0;
    size_t start = 0;
    while (start < out.size()) {
        size_t end = out.find('\n', start);
        if (end == std::string::npos)
            end = out.size();
        const std::string line = out.substr(start, end - start);
        const bool column = line.rfind("   ", 0) == 0 && line != "   no pools";
        if (!line.empty() && (verbose || !column))
            ++count;
        start = end + 1;
    }
    return count;
}

// Whether the first line where `out` departs from `clean` is a database
// pool's line of the application report (pool 20, the applications'
// shared heap) or the total right after it.
bool lostDatabasePoolLine(const std::string& clean, const std::string& out) {
    size_t at = 0;
    while (at < clean.size() && at < out.size() && clean[at] == out[at]) {
        ++at;
    }
    const size_t lineStart = clean.rfind('\n', at == 0 ? 0 : at - 1);
    const size_t begin = lineStart == std::string::npos ? 0 : lineStart + 1;
    const std::string rest = clean.substr(begin);
    const std::string kRow = "cur [Applications Shared Heap] [";
    if (rest.rfind(kRow, 0) == 0) {
        return true;
    }
    // A total: the line right before it is the row.
    const size_t previous = clean.rfind(kRow, begin);
    return rest.rfind("total [", 0) == 0 && previous != std::string::npos &&
           clean.find('\n', previous) + 1 == begin;
}

TEST_P(AllocationSweepTest, EveryRefusedBlockEndsTheRunCleanly) {
    const Slice& slice = GetParam();
    const std::vector<std::string> reports{"-i", "-d", "-a", "-p"};
    auto failingAt = [](int n) {
        return demoJson(R"("faults": {"allocFailAt": )" + std::to_string(n) + "}");
    };

    const RunResult clean = run(demoJson(), reports);
    ASSERT_EQ(clean.exitStatus, 0) << clean.out;
    ASSERT_EQ(instance_.diagLog(), "");
    ASSERT_EQ(registryLines(instance_.registry()), registryLines(kRegistry));
    auto isClean = [&](const RunResult& r) {
        return r.exitStatus == 0 && r.out == clean.out && instance_.diagLog().empty();
    };
    // Each fetched message takes two blocks (the insert tables) and each of
    // the five snapshots one, its estimate being exact: the count that the
    // sweep found is all there are.
    auto expectAllCounted = [&](int blocks) {
        EXPECT_EQ(static_cast<size_t>(blocks), 2 * messageLines(clean.out, slice.verbose) + 5)
            << clean.out;
        std::printf("[ sweep    ] %s: %d blocks, one run each\n", slice.variant, blocks);
    };
    // A slice that the sweep does not reach: its first run already has
    // every block it asks for. It counts the blocks when the slice before
    // it ended exactly at the last one.
    if (slice.first > 1 && isClean(run(failingAt(slice.first), reports))) {
        if (!isClean(run(failingAt(slice.first - 1), reports))) {
            expectAllCounted(slice.first - 1);
        }
        return;
    }

    // When the application report loses its database snapshot, it goes on
    // without the databases' pools: what a run shows that has no database
    // snapshot for that report alone.
    const RunResult front = run(demoJson(), {"-i", "-d"});
    const RunResult back =
        run(demoJson(R"("snapshots": {"database": {"sizeSqlcode": 1611}})"), {"-a", "-p"});
    ASSERT_EQ(front.exitStatus, 0);
    ASSERT_EQ(back.exitStatus, 0);
    const std::string withoutDatabasePools = front.out + back.out.substr(kSweepStamp.size());
    ASSERT_NE(withoutDatabasePools, clean.out) << "the demo's applications show database pools";

    int blocks = -1;
    for (int n = slice.first; n <= slice.last && !HasFailure(); ++n) {
        SCOPED_TRACE("allocFailAt " + std::to_string(n));
        RunResult r;
        try {
            r = run(failingAt(n), reports);
        } catch (const std::runtime_error& e) {
            ADD_FAILURE() << e.what();
            break;
        }
        if (isClean(r)) {
            // The run asked for fewer blocks than n: every block has been
            // refused once.
            blocks = n - 1;
            break;
        }
        const std::string log = instance_.diagLog();
        ASSERT_EQ(r.signal, 0) << r.out;
        EXPECT_FALSE(hasMemoryProblem(log)) << log;
        EXPECT_EQ(registryLines(instance_.registry()), registryLines(kRegistry));

        const auto records = sweepRecords(log);
        if (r.exitStatus == 0 && records.empty()) {
            EXPECT_EQ(r.out, withoutDatabasePools);
            continue;
        }
        ASSERT_TRUE(r.exitStatus == 0 || r.exitStatus == kExitRecorded)
            << "exit status " << r.exitStatus << "\n"
            << r.out;

        // A refused snapshot block is not recorded and leaves gLastRc at 0;
        // a refused insert table is recorded with the allocator's code, and
        // inside a pool list the printer adds its own record of that code.
        int32_t lastRc = 0;
        if (!records.empty()) {
            const std::string tableText = "Error in call to sqlogmblk.\nrc=";
            const std::string& table = records[0];
            EXPECT_TRUE(table.starts_with(recordHead(0x1878001B, 50, tableText)) ||
                        table.starts_with(recordHead(0x1878001B, 100, tableText)))
                << table;
            lastRc = recordCode(table);
            EXPECT_NE(lastRc, 0) << table;
            ASSERT_LE(records.size(), 2u) << log;
            if (records.size() == 2) {
                EXPECT_EQ(records[1], failureRecord(0x18780029, 50,
                                                    "Inconsistent Monitor output.\nrc=", lastRc));
            }
        }
        if (r.exitStatus == 0) {
            // Only the application report's print of a database's pool may
            // fail without ending the run: that pool's line or its total is
            // missing, and the run goes on to the end.
            EXPECT_EQ(records.size(), 1u) << log;
            EXPECT_TRUE(lostDatabasePoolLine(clean.out, r.out)) << r.out;
            const std::string privateMemory = clean.out.substr(clean.out.find("private ["));
            EXPECT_TRUE(r.out.ends_with(privateMemory)) << r.out;
            continue;
        }
        const std::string report = finalReport(lastRc);
        ASSERT_TRUE(r.out.ends_with(report)) << r.out;
        const std::string before = r.out.substr(0, r.out.size() - report.size());
        EXPECT_TRUE(clean.out.starts_with(before))
            << "what came before the failure is the clean run's beginning:\n"
            << r.out;
    }
    if (blocks < 0) {
        EXPECT_FALSE(slice.final) << "the sweep never reached a run without a refused block";
        return;
    }
    expectAllCounted(blocks);
}

void PrintTo(const Slice& slice, std::ostream* out) {
    *out << slice.variant << " " << slice.first << " to " << slice.last;
}

INSTANTIATE_TEST_SUITE_P(Demo, AllocationSweepTest, testing::ValuesIn(slices()),
                         [](const testing::TestParamInfo<Slice>& info) {
                             return std::string(info.param.variant) + "_" +
                                    std::to_string(info.param.first) + "_to_" +
                                    std::to_string(info.param.last);
                         });

}  // namespace
