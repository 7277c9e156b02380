// The run driver as an administrator meets it: the command line, the help,
// the report loop with its waits, the exit status, the failure records and
// the final failure report.
#include <gtest/gtest.h>

#include <sys/wait.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <string>
#include <vector>

#include "../unit/diagRecords.h"
#include "../unit/helpTexts.h"
#include "testInstance.h"

namespace {

using mtrktest::diagRecords;
using mtrktest::failureRecord;

constexpr const char* kClock = R"("clock": "2026-12-06 20:05:39")";
const std::string kStamp = "time [2026/12/06] [20:05:39]\n\n";

class DriverTest : public ::testing::Test {
  protected:
    void TearDown() override {
        EXPECT_EQ(instance_.diagLog().find("Memory block not released"), std::string::npos)
            << instance_.diagLog();
    }

    // Runs the program with standard output on /dev/full; the exit status.
    int runIntoFullDisk(const std::string& args) {
        const std::string command = "VRX_INSTANCE_DIR='" + instance_.dir().string() + "' '" +
                                    mtrktest::programPath() + "' " + args + " >/dev/full";
        const int status = std::system(command.c_str());
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

    mtrktest::TempInstance instance_;
};

TEST_F(DriverTest, InvalidCommandLinesEndWithTheUsage) {
    for (const auto& args : std::vector<std::vector<std::string>>{{}, {"-x"}, {"-i", "-r", "0"}}) {
        const auto r = mtrktest::runProgram(instance_, args);
        EXPECT_EQ(r.out, "invalid\nusage\n");
        EXPECT_EQ(r.exitStatus, 253);
    }
    EXPECT_EQ(instance_.diagLog(), "");
}

TEST_F(DriverTest, HelpIsAllThatRuns) {
    instance_.writeJson(std::string("{") + kClock + "}");
    struct Case {
        std::vector<std::string> args;
        std::string expected;
    };
    const Case cases[] = {
        {{"-h"}, mtrktest::kBasicHelp},
        {{"-i", "-d", "-h", "-r", "5", "3"}, mtrktest::kBasicHelp},
        {{"-h", "-all"}, mtrktest::kExtendedHelp},
    };
    for (const auto& c : cases) {
        const auto r = mtrktest::runProgram(instance_, c.args);
        EXPECT_EQ(r.out, c.expected);
        EXPECT_EQ(r.exitStatus, 0);
    }
}

TEST_F(DriverTest, FailedEnvironmentSetUpExplainsItselfAndNothingElse) {
    instance_.writeJson(R"({"faults": {"initApplicationEnvironment": 5}})");
    // The command line is not even parsed.
    const auto r = mtrktest::runProgram(instance_, {"-x"});
    EXPECT_EQ(r.out, "SQL6103 failed [5]\n");
    EXPECT_EQ(r.exitStatus, 252);
    const auto records = diagRecords(instance_.diagLog());
    ASSERT_EQ(records.size(), 1u);
    EXPECT_EQ(
        records[0],
        failureRecord(0x18780046, 50, "Error in call to sqleInitApplicationEnvironment.\nrc=", 5));
}

TEST_F(DriverTest, RepetitionsWaitTheIntervalBetweenThem) {
    instance_.writeJson(std::string("{") + kClock + "}");
    const auto start = std::chrono::steady_clock::now();
    const auto r = mtrktest::runProgram(instance_, {"-d", "-r", "1", "2"});
    const std::chrono::duration<double> elapsed = std::chrono::steady_clock::now() - start;
    EXPECT_EQ(r.out, kStamp + "no databases\n\n" + kStamp + "no databases\n\n");
    EXPECT_EQ(r.exitStatus, 0);
    EXPECT_GE(elapsed.count(), 1.0) << "one wait of a second, none after the last";
    EXPECT_LT(elapsed.count(), 1.9);
}

TEST_F(DriverTest, ReportsRunInTheirFixedOrder) {
    instance_.writeJson(std::string("{") + kClock + "}");
    const auto r = mtrktest::runProgram(instance_, {"-p", "-a", "-d"});
    EXPECT_EQ(r.out, kStamp + "no databases\n\nno applications\n\nno private memory\n\n");
    EXPECT_EQ(r.exitStatus, 0);
}

TEST_F(DriverTest, TheFirstFailingStepEndsTheRun) {
    struct Case {
        std::string json;
        std::vector<std::string> args;
        std::string out;
        int exitStatus;
    };
    const std::string clock = std::string("{") + kClock + ", ";
    const Case cases[] = {
        // -4: a recorded failure, explained at the very end.
        {R"({"faults": {"getDateTime": 9}})", {"-d", "-r", "1", "3"}, "SQL6103 failed [9]\n", 252},
        {clock + R"("snapshots": {"database": {"sizeRc": 77}}})",
         {"-d", "-p", "-r", "1", "3"},
         kStamp + "SQL6103 failed [77]\n",
         252},
        // -3: the monitor's refusal was explained by the report itself.
        {clock + R"("state": "stopped"})", {"-d", "-p", "-r", "1", "3"}, kStamp + "stopped\n", 253},
        // Other statuses pass through as they are: 1606 is 70 to the shell.
        {clock + R"("snapshots": {"database": {"sizeSqlcode": 1606}}})",
         {"-d", "-r", "1", "3"},
         kStamp,
         70},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.json);
        instance_.writeJson(c.json);
        const auto r = mtrktest::runProgram(instance_, c.args);
        EXPECT_EQ(r.out, c.out);
        EXPECT_EQ(r.exitStatus, c.exitStatus);
    }
}

TEST_F(DriverTest, FailedTimestampIsRecorded) {
    instance_.writeJson(R"({"faults": {"getDateTime": 9}})");
    mtrktest::runProgram(instance_, {"-i"});
    const auto records = diagRecords(instance_.diagLog());
    ASSERT_EQ(records.size(), 1u);
    EXPECT_EQ(records[0],
              failureRecord(0x1878002E, 50, "Error in call to sqlogetdatetime.\nrc=", 9));
}

TEST_F(DriverTest, FailingHelpMessageEndsTheHelp) {
    instance_.writeJson(R"({"faults": {"messageFail": [85]}})");
    const auto r = mtrktest::runProgram(instance_, {"-h"});
    ASSERT_EQ(r.exitStatus, 252);
    const auto records = diagRecords(instance_.diagLog());
    ASSERT_EQ(records.size(), 1u);
    const std::string code = records[0].substr(records[0].rfind(' ') + 1);
    EXPECT_EQ(r.out, "usage\nSQL6103 failed [" + code + "]\n");
}

TEST_F(DriverTest, InsertTableAllocationFailures) {
    struct Case {
        int failAt;
        uint32_t probe;
        std::string out;
    };
    // The first fetch of the run is message 41: its two tables are the
    // first two blocks; the third block is the first table of message 42.
    const Case cases[] = {{1, 50, ""}, {2, 100, ""}, {3, 50, "invalid\n"}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.failAt);
        instance_.writeFile("diag.log", "");
        instance_.writeJson(R"({"faults": {"allocFailAt": )" + std::to_string(c.failAt) + "}}");
        const auto r = mtrktest::runProgram(instance_, {});
        EXPECT_EQ(r.out, c.out);
        EXPECT_EQ(r.exitStatus, 253) << "the usage's own failure does not change -3";
        const auto records = diagRecords(instance_.diagLog());
        ASSERT_EQ(records.size(), 1u);
        // The allocator's own code ends the record; everything before it is ours.
        std::string head =
            failureRecord(0x1878001B, c.probe, "Error in call to sqlogmblk.\nrc=", 0);
        head.pop_back();
        EXPECT_EQ(records[0].substr(0, head.size()), head);
    }
}

TEST_F(DriverTest, OutputThatCannotBeWrittenFailsTheRun) {
    instance_.writeJson(std::string("{") + kClock + "}");
    for (const char* args : {"-h", "-d", "-d -r 1 3"}) {
        SCOPED_TRACE(args);
        instance_.writeFile("diag.log", "");
        EXPECT_EQ(runIntoFullDisk(args), 252);
        const auto records = diagRecords(instance_.diagLog());
        ASSERT_EQ(records.size(), 1u);
        EXPECT_EQ(records[0],
                  failureRecord(0x18780046, 100, "Error in call to fflush.\nrc=", ENOSPC));
    }
}

TEST_F(DriverTest, RunDriverIsTraced) {
    instance_.writeJson(R"({"traceFlags": 131})");
    const auto r = mtrktest::runProgram(instance_, {"-i", "-i"});
    EXPECT_EQ(r.exitStatus, 253);
    EXPECT_EQ(instance_.traceLog(),
              "entry 0x18780046\n"
              "entry 0x1878002a\n"
              "exit 0x1878002a rc=-3\n"
              "flight 0x1878002a rc=-3\n"
              "exit 0x18780046 rc=-3\n"
              "flight 0x18780046 rc=-3\n");
}

}  // namespace
