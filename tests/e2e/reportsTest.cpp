// The four memory reports, run as an administrator runs them, against
// instance directories with the tests' terse catalogs. Outputs are compared
// byte for byte.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "streamBuilder.h"
#include "testInstance.h"

namespace {

using mtrktest::RunResult;
using mtrktest::StreamBuilder;
using mtrktest::TempInstance;
using mtrktest::wrapStream;

const std::string kClock = R"("clock": "2026-12-06 20:05:39")";
const std::string kStamp = "time [2026/12/06] [20:05:39]\n\n";

// Exit statuses as the shell sees them.
constexpr int EXIT_EXPLAINED = 253;  // -3
constexpr int EXIT_RECORDED = 252;   // -4
constexpr int EXIT_TOO_SMALL = 70;   // 1606

class ReportsTest : public testing::Test {
  protected:
    // Writes instance.json from the keys given (the fixed clock added).
    void setInstance(const std::string& keys) const {
        instance_.writeJson("{" + kClock + (keys.empty() ? "" : ", " + keys) + "}");
    }

    // Runs the program; no run may leave a snapshot or message block behind.
    RunResult run(const std::vector<std::string>& args) const {
        RunResult result = mtrktest::runProgram(instance_, args);
        EXPECT_EQ(result.signal, 0);
        EXPECT_EQ(instance_.diagLog().find("Memory block not released"), std::string::npos)
            << instance_.diagLog();
        return result;
    }

    void expectRun(const std::vector<std::string>& args, const std::string& out,
                   int exitStatus = 0) const {
        RunResult result = run(args);
        EXPECT_EQ(result.out, out) << args[0];
        EXPECT_EQ(result.exitStatus, exitStatus) << args[0];
    }

    TempInstance instance_;
};

// --- instance report -------------------------------------------------------

const std::string kInstancePools = R"("pools": [
    {"name": "utilh", "current": 65536, "maximum": 1048576, "highWater": 131072},
    {"name": "pckcacheh", "current": 196608, "maximum": 2097152, "highWater": 1000},
    {"name": "other", "current": 500, "maximum": 999, "highWater": 1024000}])";

TEST_F(ReportsTest, InstancePoolsInColumnsAndLines) {
    setInstance(kInstancePools);
    expectRun({"-i"}, kStamp +
                          "instance\n\n"
                          "   utilh       pckcacheh   other       \n"
                          "   64.0K       192.0K      500         \n\n");
    expectRun({"-i", "-m"}, kStamp +
                                "instance\n\n"
                                "   utilh       pckcacheh   other       \n"
                                "   1.0M        2.0M        999         \n\n");
    expectRun({"-i", "-w"}, kStamp +
                                "instance\n\n"
                                "   utilh       pckcacheh   other       \n"
                                "   128.0K      1.0K        1.0M        \n\n");
    expectRun({"-i", "-v"}, kStamp +
                                "instance\n\n"
                                "cur [Backup/Restore/Util Heap] [65536]\n"
                                "cur [Package Cache] [196608]\n"
                                "cur [Other Memory] [500]\n"
                                "total [262644]\n\n");
}

TEST_F(ReportsTest, InstanceWithoutPools) {
    setInstance("");
    expectRun({"-i"}, kStamp + "instance\n\n   no pools\n\n");
}

TEST_F(ReportsTest, InstancePoolWithoutTheAskedSizeEndsTheRun) {
    setInstance(R"("pools": [{"name": "utilh", "current": 65536, "maximum": 1048576},
                             {"name": "other", "current": 500}])");
    expectRun({"-i", "-m", "-d"}, kStamp + "instance\n\nSQL6103 failed [1]\n", EXIT_RECORDED);
    EXPECT_NE(instance_.diagLog().find("func=0x18780029 probe=50"), std::string::npos);
}

TEST_F(ReportsTest, InstanceTraceHasNoExitOnTheFailurePath) {
    setInstance(R"("traceFlags": 131, "snapshots": {"instance": {"sizeSqlcode": 1611}})");
    expectRun({"-i"}, kStamp);
    EXPECT_NE(instance_.traceLog().find("entry 0x18780013"), std::string::npos);
    EXPECT_EQ(instance_.traceLog().find("exit 0x18780013"), std::string::npos);

    setInstance(R"("traceFlags": 131)");
    expectRun({"-i"}, kStamp + "instance\n\n   no pools\n\n");
    EXPECT_NE(instance_.traceLog().find("exit 0x18780013 rc=0"), std::string::npos);
    EXPECT_NE(instance_.traceLog().find("flight 0x18780013 rc=0"), std::string::npos);
}

// --- the monitor's answers, per report ---------------------------------------

TEST_F(ReportsTest, MonitorAnswersPerReport) {
    // An instance that has something to show in every report.
    const std::string content = R"(
        "pools": [{"name": "other", "current": 1}],
        "databases": [{"name": "SAMPLE", "pools": [{"name": "dbh", "current": 1}]}],
        "applications": [{"number": 1, "database": "SAMPLE", "pools": []}],
        "privateMemory": [{"number": 0, "pools": []}])";
    const struct {
        const char* report;
        const char* kind;
        const char* nothingToShow;
    } reports[] = {
        {"-i", "instance", ""},
        {"-d", "database", "no databases\n\n"},
        {"-a", "application", "no applications\n\n"},
        {"-p", "application", "no private memory\n\n"},
    };
    for (const auto& r : reports) {
        const struct {
            std::string keys;
            std::string out;
            int exitStatus;
        } answers[] = {
            {R"("state": "stopped")", "stopped\n", EXIT_EXPLAINED},
            {R"("state": "unauthorized")", "not authorized\n", EXIT_EXPLAINED},
            {R"("snapshots": {")" + std::string(r.kind) + R"(": {"sizeSqlcode": 1606}})", "",
             EXIT_TOO_SMALL},
            {R"("snapshots": {")" + std::string(r.kind) + R"(": {"sizeSqlcode": 1611}})",
             r.nothingToShow, 0},
            {R"("snapshots": {")" + std::string(r.kind) + R"(": {"takeSqlcode": 1611}})",
             r.nothingToShow, 0},
        };
        for (const auto& a : answers) {
            setInstance(content + ", " + a.keys);
            RunResult result = run({r.report});
            EXPECT_EQ(result.out, kStamp + a.out) << r.report << " " << a.keys;
            EXPECT_EQ(result.exitStatus, a.exitStatus) << r.report << " " << a.keys;
        }
    }
}

TEST_F(ReportsTest, NothingToReportLetsTheNextReportRun) {
    setInstance(R"("pools": [{"name": "other", "current": 1}],
                   "snapshots": {"instance": {"sizeSqlcode": 1611}})");
    expectRun({"-i", "-d", "-a", "-p"},
              kStamp + "no databases\n\nno applications\n\nno private memory\n\n");
}

struct FetchFailureCase {
    std::vector<std::string> args;
    const char* message;
    std::string outBefore;
};

TEST_F(ReportsTest, FailedMessageFetchEndsTheRun) {
    const FetchFailureCase cases[] = {
        {{"-i"}, "23", ""},
        {{"-d"}, "21", ""},
        {{"-a"}, "25", ""},
        {{"-a"}, "26", "appdb [SAMPLE]\n\n"},
        {{"-a"}, "49", ""},
        {{"-p"}, "22", ""},
        {{"-i", "-v"}, "2", "instance\n\n"},
        {{"-a", "-v"}, "3", "appdb [SAMPLE]\n\napp [1]\n\ncur [Application Heap] [1]\n"},
    };
    for (const FetchFailureCase& c : cases) {
        // SAMPLE shows no pool 20, so only its heading precedes the
        // application; application 1 is not in the served stream of the
        // "49" case, which has no application at all.
        std::string applications =
            c.message == std::string("49") ? "[]" : R"([{"number": 1, "database": "SAMPLE",
                                              "pools": [{"name": "apph", "current": 1}]}])";
        setInstance(R"("databases": [{"name": "SAMPLE", "pools": []}],
            "pools": [{"name": "other", "current": 1}],
            "privateMemory": [{"number": 0, "pools": []}],
            "applications": )" +
                    applications + R"(, "faults": {"messageFail": [)" + c.message + "]}");
        RunResult result = run(c.args);
        EXPECT_EQ(result.exitStatus, EXIT_RECORDED) << c.message;
        std::string before = kStamp + c.outBefore;
        EXPECT_EQ(result.out.substr(0, before.size()), before) << c.message;
        // Only the engine's explanation follows, on one line.
        std::string rest = result.out.substr(std::min(before.size(), result.out.size()));
        EXPECT_EQ(rest.rfind("SQL6103 failed [-", 0), 0u) << c.message << ": " << result.out;
        EXPECT_EQ(rest.find('\n'), rest.size() - 1) << c.message << ": " << result.out;
        EXPECT_NE(instance_.diagLog().find("Error in call to sqlogmsg"), std::string::npos);
    }
}

// --- database report ---------------------------------------------------------

TEST_F(ReportsTest, SeveralDatabasesInStreamOrder) {
    setInstance(R"("databases": [
        {"name": "SAMPLE", "pools": [
            {"name": "bph", "bufferPool": "System 8k buffer pool", "current": 4194304},
            {"name": "bph", "bufferPool": "USERBP1", "current": 8650752},
            {"name": "lockh", "current": 655360}]},
        {"name": "PAYROLL", "pools": [{"name": "dbh", "current": 1048576}]},
        {"name": "SALES", "pools": []}])");
    expectRun({"-d"}, kStamp +
                          "database [SAMPLE]\n\n"
                          "   bph (S8K)   bph (USERBP1)lockh       \n"
                          "   4.0M        8.2M         640.0K      \n\n"
                          "database [PAYROLL]\n\n"
                          "   dbh         \n"
                          "   1.0M        \n\n"
                          "database [SALES]\n\n"
                          "   no pools\n\n");
    expectRun({"-d", "-v"}, kStamp +
                                "database [SAMPLE]\n\n"
                                "cur [Buffer Pool Heap (System 8k buffer pool)] [4194304]\n"
                                "cur [Buffer Pool Heap (USERBP1)] [8650752]\n"
                                "cur [Lock Manager Heap] [655360]\n"
                                "total [13500416]\n\n"
                                "database [PAYROLL]\n\n"
                                "cur [Database Heap] [1048576]\n"
                                "total [1048576]\n\n"
                                "database [SALES]\n\n"
                                "   no pools\n\n");
}

// A database stream served as it stands, for names the engine would not
// write itself.
void serveDatabaseStream(const TempInstance& instance, const std::string& body) {
    instance.writeFile("database.stream", wrapStream(body));
}

const std::string kServedDatabaseStream =
    R"("databases": [{"name": "X"}], "snapshots": {"database": {"streamFile": "database.stream"}})";

TEST_F(ReportsTest, DatabaseNamesAsTheStreamHoldsThem) {
    StreamBuilder b;
    b.open(13).text(321, std::string("SAMP\0LE", 7)).pool(5, 2048).close();
    b.open(13).text(321, "").pool(5, 1024).close();
    b.open(13).text(321, "X").close();
    serveDatabaseStream(instance_, b.str());
    setInstance(kServedDatabaseStream);
    expectRun({"-d"}, kStamp +
                          "database [SAMP]\n\n   dbh         \n   2.0K        \n\n"
                          "database []\n\n   dbh         \n   1.0K        \n\n"
                          "database [X]\n\n   no pools\n\n");
}

TEST_F(ReportsTest, DatabaseSectionWithoutNameEndsTheRunWithOne) {
    StreamBuilder b;
    b.open(13).text(321, "SAMPLE").pool(5, 2048).close();
    b.open(13).pool(5, 1024).close();
    b.open(13).text(321, "AFTER").pool(5, 1024).close();
    serveDatabaseStream(instance_, b.str());
    setInstance(kServedDatabaseStream);
    expectRun({"-d", "-a"}, kStamp + "database [SAMPLE]\n\n   dbh         \n   2.0K        \n\n",
              1);
}

TEST_F(ReportsTest, DatabaseStreamWithoutSections) {
    serveDatabaseStream(instance_, StreamBuilder().pool(5, 2048).str());
    setInstance(kServedDatabaseStream);
    expectRun({"-d"}, kStamp + "no databases\n\n");
}

// --- application report ------------------------------------------------------

const std::string kDatabasesAB = R"("databases": [
    {"name": "A", "pools": [{"name": "dbh", "current": 1000}, {"name": "appshrh", "current": 2048}]},
    {"name": "B", "pools": [{"name": "appshrh", "current": 3072}]}])";

TEST_F(ReportsTest, ApplicationsOfDatabasesABAMakeThreeGroups) {
    setInstance(kDatabasesAB + R"(, "applications": [
        {"number": 7, "database": "A", "pools": [{"name": "apph", "current": 1024},
                                                  {"name": "appctlh", "current": 2048}]},
        {"number": 8, "database": "B", "pools": [{"name": "apph", "current": 4096}]},
        {"number": 9, "database": "A", "pools": [{"name": "apph", "current": 5120}]}])");
    expectRun({"-a"}, kStamp +
                          "appdb [A]\n\n   appshrh     \n   2.0K        \n\n"
                          "app [7]\n\n   apph        appctlh     \n   1.0K        2.0K        \n\n"
                          "appdb [B]\n\n   appshrh     \n   3.0K        \n\n"
                          "app [8]\n\n   apph        \n   4.0K        \n\n"
                          "appdb [A]\n\n   appshrh     \n   2.0K        \n\n"
                          "app [9]\n\n   apph        \n   5.0K        \n\n");
    expectRun({"-a", "-v"}, kStamp +
                                "appdb [A]\n\n"
                                "cur [Applications Shared Heap] [2048]\ntotal [2048]\n\n"
                                "app [7]\n\n"
                                "cur [Application Heap] [1024]\n"
                                "cur [Application Control Heap] [2048]\ntotal [3072]\n\n"
                                "total [5120]\n\n"
                                "appdb [B]\n\n"
                                "cur [Applications Shared Heap] [3072]\ntotal [3072]\n\n"
                                "app [8]\n\n"
                                "cur [Application Heap] [4096]\ntotal [4096]\n\n"
                                "total [7168]\n\n"
                                "appdb [A]\n\n"
                                "cur [Applications Shared Heap] [2048]\ntotal [2048]\n\n"
                                "app [9]\n\n"
                                "cur [Application Heap] [5120]\ntotal [5120]\n\n"
                                "total [7168]\n\n");
}

TEST_F(ReportsTest, AdjacentApplicationsShareOneGroup) {
    setInstance(kDatabasesAB + R"(, "applications": [
        {"number": 1, "database": "B", "pools": [{"name": "apph", "current": 10}]},
        {"number": 2, "database": "B", "pools": [{"name": "apph", "current": 20}]},
        {"number": 3, "database": "B", "pools": []}])");
    expectRun({"-a", "-v"}, kStamp +
                                "appdb [B]\n\n"
                                "cur [Applications Shared Heap] [3072]\ntotal [3072]\n\n"
                                "app [1]\n\ncur [Application Heap] [10]\ntotal [10]\n\n"
                                "app [2]\n\ncur [Application Heap] [20]\ntotal [20]\n\n"
                                "app [3]\n\n   no pools\n\n"
                                "total [3102]\n\n");
}

TEST_F(ReportsTest, DatabaseWhoseNameBeginsAnotherIsAGroupOfItsOwn) {
    setInstance(R"("databases": [
        {"name": "SAMPLE", "pools": [{"name": "appshrh", "current": 1024}]},
        {"name": "SAMPLE2", "pools": [{"name": "appshrh", "current": 2048}]}],
      "applications": [
        {"number": 1, "database": "SAMPLE2", "pools": [{"name": "apph", "current": 100}]},
        {"number": 2, "database": "SAMPLE", "pools": [{"name": "apph", "current": 200}]}])");
    expectRun({"-a", "-v"}, kStamp +
                                "appdb [SAMPLE2]\n\n"
                                "cur [Applications Shared Heap] [2048]\ntotal [2048]\n\n"
                                "app [1]\n\ncur [Application Heap] [100]\ntotal [100]\n\n"
                                "total [2148]\n\n"
                                "appdb [SAMPLE]\n\n"
                                "cur [Applications Shared Heap] [1024]\ntotal [1024]\n\n"
                                "app [2]\n\ncur [Application Heap] [200]\ntotal [200]\n\n"
                                "total [1224]\n\n");
}

TEST_F(ReportsTest, EmptyFirstDatabaseNameHasNoHeading) {
    StreamBuilder b;
    b.open(5).u32(302, 1).text(321, "").pool(2, 100).close();
    b.open(5).u32(302, 2).text(321, "A").pool(2, 200).close();
    instance_.writeFile("application.stream", wrapStream(b.str()));
    setInstance(kDatabasesAB +
                R"(, "snapshots": {"application": {"streamFile": "application.stream"}})");
    expectRun({"-a", "-v"}, kStamp +
                                "app [1]\n\ncur [Application Heap] [100]\ntotal [100]\n\n"
                                "total [100]\n\n"
                                "appdb [A]\n\n"
                                "cur [Applications Shared Heap] [2048]\ntotal [2048]\n\n"
                                "app [2]\n\ncur [Application Heap] [200]\ntotal [200]\n\n"
                                "total [2248]\n\n");
    expectRun({"-a"}, kStamp +
                          "app [1]\n\n   apph        \n   100         \n\n"
                          "appdb [A]\n\n   appshrh     \n   2.0K        \n\n"
                          "app [2]\n\n   apph        \n   200         \n\n");
}

const std::string kApplicationsOfA = R"(, "applications": [
    {"number": 7, "database": "A", "pools": [{"name": "apph", "current": 1024}]},
    {"number": 8, "database": "C", "pools": [{"name": "apph", "current": 2048}]}])";

TEST_F(ReportsTest, FailingDatabaseSnapshotLeavesOnlyTheApplicationPools) {
    const std::string applicationsOnly = kStamp +
                                         "appdb [A]\n\n"
                                         "app [7]\n\ncur [Application Heap] [1024]\n"
                                         "total [1024]\n\ntotal [1024]\n\n"
                                         "appdb [C]\n\n"
                                         "app [8]\n\ncur [Application Heap] [2048]\n"
                                         "total [2048]\n\ntotal [2048]\n\n";
    setInstance(kDatabasesAB + kApplicationsOfA + R"(, "snapshots": {"database": {"sizeRc": 5}})");
    expectRun({"-a", "-v"}, applicationsOnly);
    EXPECT_NE(instance_.diagLog().find("Error in call to vrxGetSnapshotSize"), std::string::npos);

    // A refusal is printed where the snapshot was taken, and the report goes
    // on.
    setInstance(kDatabasesAB + kApplicationsOfA +
                R"(, "snapshots": {"database": {"takeSqlcode": -1032}})");
    expectRun({"-a", "-v"}, kStamp + "stopped\n" + applicationsOnly.substr(kStamp.size()));
}

TEST_F(ReportsTest, ApplicationOfAnUnknownDatabaseHasNoDatabasePool) {
    setInstance(kDatabasesAB + kApplicationsOfA);
    expectRun({"-a"}, kStamp +
                          "appdb [A]\n\n   appshrh     \n   2.0K        \n\n"
                          "app [7]\n\n   apph        \n   1.0K        \n\n"
                          "appdb [C]\n\n"
                          "app [8]\n\n   apph        \n   2.0K        \n\n");
}

TEST_F(ReportsTest, ApplicationSectionsLackingWhatTheyNeed) {
    const struct {
        const char* name;
        std::string second;
        std::string outAfterFirst;
    } cases[] = {
        {"no number", StreamBuilder().open(5).text(321, "B").pool(2, 1).close().str(),
         "appdb [B]\n\n   appshrh     \n   3.0K        \n\n"},
        {"no database", StreamBuilder().open(5).u32(302, 2).pool(2, 1).close().str(), ""},
    };
    for (const auto& c : cases) {
        std::string first = StreamBuilder().open(5).u32(302, 1).text(321, "A").close().str();
        instance_.writeFile("application.stream", wrapStream(first + c.second));
        setInstance(kDatabasesAB +
                    R"(, "snapshots": {"application": {"streamFile": "application.stream"}})");
        RunResult result = run({"-a", "-p"});
        EXPECT_EQ(result.out, kStamp +
                                  "appdb [A]\n\n   appshrh     \n   2.0K        \n\n"
                                  "app [1]\n\n   no pools\n\n" +
                                  c.outAfterFirst)
            << c.name;
        EXPECT_EQ(result.exitStatus, 1) << c.name;
    }
}

TEST_F(ReportsTest, ApplicationStreamWithOnlyPrivateMemory) {
    setInstance(R"("privateMemory": [{"number": 0, "pools": [{"name": "sorth", "current": 1}]}])");
    expectRun({"-a"}, kStamp + "no applications\n\n");
}

// --- private memory report ---------------------------------------------------

TEST_F(ReportsTest, PrivateMemorySectionsInStreamOrder) {
    setInstance(R"("applications": [{"number": 1, "database": "A", "pools": []}],
        "privateMemory": [
            {"number": 4, "pools": [{"name": "sorth", "current": 2097152},
                                    {"name": "stmth", "bufferPool": "USERBP1", "current": 1}]},
            {"number": 0, "pools": []}])");
    expectRun({"-p"}, kStamp +
                          "private [4]\n\n"
                          "   sorth       stmth (USERBP1)\n"
                          "   2.0M        1           \n\n"
                          "private [0]\n\n   no pools\n\n");
    expectRun({"-p", "-v"}, kStamp +
                                "private [4]\n\n"
                                "cur [Sort Heap] [2097152]\n"
                                "cur [Statement Heap (USERBP1)] [1]\n"
                                "total [2097153]\n\n"
                                "private [0]\n\n   no pools\n\n");
}

TEST_F(ReportsTest, PrivateMemorySectionWithoutNumberEndsTheRunWithOne) {
    StreamBuilder b;
    b.open(10).u32(549, 3).pool(15, 1024).close();
    b.open(10).pool(15, 2048).close();
    instance_.writeFile("application.stream", wrapStream(b.str()));
    setInstance(R"("snapshots": {"application": {"streamFile": "application.stream"}})");
    expectRun({"-p"}, kStamp + "private [3]\n\n   sorth       \n   1.0K        \n\n", 1);
}

TEST_F(ReportsTest, ApplicationsWithoutPrivateMemory) {
    setInstance(R"("applications": [{"number": 1, "database": "A", "pools": []}])");
    expectRun({"-p"}, kStamp + "no private memory\n\n");
}

}  // namespace
