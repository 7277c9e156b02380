// Every block that a full run asks the engine for is refused in turn, one
// run per block: each run must end in success or in a recorded failure
// explained last, release what it took, and leave the registry as it found
// it.
#include <gtest/gtest.h>

#include <cstdio>
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

constexpr int kMaxBlocks = 5000;
constexpr double kRunSeconds = 20;

struct Variant {
    const char* name;
    bool verbose;
};

class AllocationSweepTest : public testing::TestWithParam<Variant> {
  protected:
    void SetUp() override { instance_.writeFile("registry", kRegistry); }

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

size_t occurrences(const std::string& text, const std::string& what) {
    size_t count = 0;
    for (size_t at = text.find(what); at != std::string::npos; at = text.find(what, at + 1)) {
        ++count;
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
    const std::vector<std::string> reports{"-i", "-d", "-a", "-p"};
    const bool verbose = GetParam().verbose;

    const RunResult clean = run(demoJson(), reports);
    ASSERT_EQ(clean.exitStatus, 0) << clean.out;
    ASSERT_EQ(instance_.diagLog(), "");
    ASSERT_EQ(registryLines(instance_.registry()), registryLines(kRegistry));

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
    int runsWithoutDatabasePools = 0;
    int runsWithoutOneDatabasePoolLine = 0;
    int recordedFailures = 0;
    int32_t allocatorCode = 0;
    for (int n = 1; n <= kMaxBlocks && !HasFailure(); ++n) {
        SCOPED_TRACE("allocFailAt " + std::to_string(n));
        RunResult r;
        try {
            r = run(demoJson(R"("faults": {"allocFailAt": )" + std::to_string(n) + "}"), reports);
        } catch (const std::runtime_error& e) {
            ADD_FAILURE() << e.what();
            break;
        }
        const std::string log = instance_.diagLog();
        if (r.exitStatus == 0 && r.out == clean.out && log.empty()) {
            // The run asked for fewer blocks than n: every block has been
            // refused once.
            blocks = n - 1;
            break;
        }
        ASSERT_EQ(r.signal, 0) << r.out;
        EXPECT_FALSE(hasMemoryProblem(log)) << log;
        EXPECT_EQ(registryLines(instance_.registry()), registryLines(kRegistry));

        const auto records = sweepRecords(log);
        if (r.exitStatus == 0 && records.empty()) {
            EXPECT_EQ(r.out, withoutDatabasePools);
            ++runsWithoutDatabasePools;
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
            const std::string& table = records[0];
            const bool lengths =
                table.rfind(recordHead(0x1878001B, 50, "Error in call to sqlogmblk.\nrc="), 0) == 0;
            const bool pointers =
                table.rfind(recordHead(0x1878001B, 100, "Error in call to sqlogmblk.\nrc="), 0) ==
                0;
            EXPECT_TRUE(lengths || pointers) << table;
            lastRc = recordCode(table);
            EXPECT_NE(lastRc, 0) << table;
            if (allocatorCode == 0)
                allocatorCode = lastRc;
            EXPECT_EQ(lastRc, allocatorCode) << "the allocator refuses with one code";
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
            ++runsWithoutOneDatabasePoolLine;
            continue;
        }
        ++recordedFailures;
        const std::string report = finalReport(lastRc);
        ASSERT_GE(r.out.size(), report.size()) << r.out;
        const std::string before = r.out.substr(0, r.out.size() - report.size());
        EXPECT_EQ(r.out.substr(before.size()), report) << r.out;
        EXPECT_EQ(clean.out.compare(0, before.size(), before), 0)
            << "what came before the failure is the clean run's beginning:\n"
            << r.out;
    }
    ASSERT_GT(blocks, 0) << "the sweep never reached a run without a refused block";

    // Each fetched message takes two blocks (the insert tables) and each of
    // the five snapshots one, its estimate being exact: the count that the
    // sweep found is all there are.
    EXPECT_EQ(static_cast<size_t>(blocks), 2 * messageLines(clean.out, verbose) + 5) << clean.out;
    // The database pool of each group of applications is a line and a
    // total with -v (two fetches, four blocks), columns without.
    EXPECT_EQ(runsWithoutDatabasePools, 1);
    EXPECT_EQ(static_cast<size_t>(runsWithoutOneDatabasePoolLine),
              verbose ? 4 * occurrences(clean.out, "appdb [") : 0);
    EXPECT_EQ(recordedFailures, blocks - 1 - runsWithoutOneDatabasePoolLine);
    std::printf("[ sweep    ] %s: %d blocks, %d runs\n", GetParam().name, blocks, blocks + 1);
}

INSTANTIATE_TEST_SUITE_P(Demo, AllocationSweepTest,
                         testing::Values(Variant{"verbose", true}, Variant{"columns", false}),
                         [](const testing::TestParamInfo<Variant>& info) {
                             return info.param.name;
                         });

}  // namespace
