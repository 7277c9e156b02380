// Every message that the program prints is made to fail, at a place where
// it is printed: the run must stop (or, where a failure is tolerated, go
// on) with exactly the output that came before, the records of the failed
// fetch and of whoever passed it up, and the right exit status.
#include <gtest/gtest.h>

#include <cstdio>
#include <fstream>
#include <set>
#include <string>
#include <vector>

#include "sweepSupport.h"
#include "testInstance.h"

namespace {

using namespace mtrktest;

// Who records the failure besides the fetch itself.
enum class Record {
    Fetch,     // the fetch: 0x1878001B at 150, with the service's code
    PoolList,  // the pool list printer passing it up: 0x18780029 at 50
    Estimate,  // the snapshot's estimate whose explanation failed: 0x18780018 at 100
};

struct MessageCase {
    uint32_t message;
    std::string keys;  // instance.json besides the clock
    std::vector<std::string> args;
    // Where the output stops: the run without the fault is cut before the
    // first occurrence of this text. Empty when `out` says it all.
    std::string cutBefore;
    int exitStatus;
    std::vector<Record> records;
    // The output up to the final failure report, where it is not a cut.
    std::string out;
    int32_t sqlCode = 0;  // the monitor's answer, for Record::Estimate
};

const std::vector<std::string> kAllReports{"-i", "-d", "-a", "-p"};
const std::vector<std::string> kVerbose{"-i", "-d", "-a", "-p", "-v"};
const std::vector<std::string> kMaximum{"-i", "-d", "-a", "-p", "-m", "-v"};
const std::vector<std::string> kHighWater{"-i", "-d", "-a", "-p", "-w", "-v"};

std::vector<MessageCase> messageCases() {
    const std::string small = kSmallInstance;
    const std::string emptyDatabase = R"("databases": [{"name": "EMPTY", "pools": []}])";
    using R = Record;
    return {
        // Usage: -3 whatever the fetches did; 42 is not tried after 41 failed.
        {41, small, {}, "invalid", kExitExplained, {R::Fetch}, ""},
        {42, small, {"-x"}, "usage", kExitExplained, {R::Fetch}, ""},
        // Help: the first failing fetch ends it.
        {42, small, {"-h"}, "usage", kExitRecorded, {R::Fetch}, ""},
        {85, small, {"-h"}, "options", kExitRecorded, {R::Fetch}, ""},
        {81, small, {"-h", "-all"}, "internal help", kExitRecorded, {R::Fetch}, ""},
        {82, small, {"-h", "-all"}, "internal legend", kExitRecorded, {R::Fetch}, ""},
        // Time stamp and headings: the reports before them stand.
        {24, small, kAllReports, "time [", kExitRecorded, {R::Fetch}, ""},
        {23, small, kAllReports, "instance", kExitRecorded, {R::Fetch}, ""},
        {21, small, kAllReports, "database [", kExitRecorded, {R::Fetch}, ""},
        {25, small, kAllReports, "appdb [", kExitRecorded, {R::Fetch}, ""},
        {26, small, kAllReports, "app [", kExitRecorded, {R::Fetch}, ""},
        {22, small, kAllReports, "private [", kExitRecorded, {R::Fetch}, ""},
        // Pool lines: the pool list passes the failure up with its record.
        {2, small, kVerbose, "cur [", kExitRecorded, {R::Fetch, R::PoolList}, ""},
        {0, small, kMaximum, "max [", kExitRecorded, {R::Fetch, R::PoolList}, ""},
        {1, small, kHighWater, "hwm [", kExitRecorded, {R::Fetch, R::PoolList}, ""},
        // A total is outside the pool loop: no record of the pool list.
        {3, small, kVerbose, "total [", kExitRecorded, {R::Fetch}, ""},
        // Notices.
        {44, emptyDatabase, {"-d", "-p"}, "   no pools", kExitRecorded, {R::Fetch}, ""},
        {46, "", {"-i", "-d"}, "no databases", kExitRecorded, {R::Fetch}, ""},
        {49, "", {"-d", "-a"}, "no applications", kExitRecorded, {R::Fetch}, ""},
        {47, "", {"-a", "-p"}, "no private memory", kExitRecorded, {R::Fetch}, ""},
        // The monitor's refusals: the estimate's step records the SQL code,
        // which the final failure report then explains.
        {45,
         R"("state": "stopped")",
         {"-i"},
         "stopped",
         kExitRecorded,
         {R::Fetch, R::Estimate},
         "",
         -1032},
        {48,
         R"("state": "unauthorized")",
         {"-i"},
         "not authorized",
         kExitRecorded,
         {R::Fetch, R::Estimate},
         "",
         -1092},
        // The application report does not stop when a database's pool fails
        // to print: the application's own pool line then ends the run, and
        // with the total failing it is the application's pool total.
        {2,
         small,
         {"-a", "-v"},
         "",
         kExitRecorded,
         {R::Fetch, R::Fetch, R::PoolList},
         kSweepStamp + "appdb [SAMPLE]\n\napp [7]\n\n"},
        {3,
         small,
         {"-a", "-v"},
         "",
         kExitRecorded,
         {R::Fetch, R::Fetch},
         kSweepStamp + "appdb [SAMPLE]\n\ncur [Applications Shared Heap] [8192]\n"
                       "app [7]\n\ncur [Application Heap] [1024]\n"},
        // Nor when its database snapshot is refused and the explanation
        // cannot be fetched: the run goes on without the databases' pools.
        {45,
         small + R"(, "snapshots": {"database": {"sizeSqlcode": -1032}})",
         {"-a"},
         "",
         0,
         {R::Fetch, R::Estimate},
         kSweepStamp + "appdb [SAMPLE]\n\napp [7]\n\n   apph        \n   1.0K        \n\n",
         -1032},
    };
}

// The message numbers of the program's catalog.
std::set<uint32_t> catalogNumbers() {
    std::ifstream po(std::string(VRX_TEST_SOURCE_DIR) + "/../sqo/messages/vrxmtrk.po");
    std::set<uint32_t> numbers;
    std::string line;
    while (std::getline(po, line)) {
        const std::string head = "msgid \"";
        if (line.rfind(head, 0) == 0 && line.size() > head.size() + 1 && line[head.size()] != '"') {
            numbers.insert(static_cast<uint32_t>(std::stoul(line.substr(head.size()))));
        }
    }
    return numbers;
}

TEST(MessageSweepTest, EveryMessageOfTheCatalogIsSwept) {
    std::set<uint32_t> swept;
    for (const MessageCase& c : messageCases())
        swept.insert(c.message);
    const std::set<uint32_t> catalog = catalogNumbers();
    ASSERT_FALSE(catalog.empty());
    EXPECT_EQ(swept, catalog);
}

TEST(MessageSweepTest, FailedMessageStopsWhereTheFailureTablesSay) {
    TempInstance instance;
    int runs = 0;
    for (const MessageCase& c : messageCases()) {
        std::string args;
        for (const auto& a : c.args)
            args += " " + a;
        SCOPED_TRACE("message " + std::to_string(c.message) + " with" + args);

        std::string expected = c.out;
        if (!c.cutBefore.empty()) {
            instance.writeJson(sweepJson(c.keys));
            const RunResult clean = runProgram(instance, c.args);
            const size_t cut = clean.out.find(c.cutBefore);
            ASSERT_NE(cut, std::string::npos) << clean.out;
            expected = clean.out.substr(0, cut);
        }

        instance.writeJson(sweepJson(c.keys + (c.keys.empty() ? "" : ", ") +
                                     R"("faults": {"messageFail": [)" + std::to_string(c.message) +
                                     "]}"));
        instance.writeFile("diag.log", "");
        const RunResult r = runProgram(instance, c.args);
        ++runs;
        const std::string log = instance.diagLog();
        EXPECT_FALSE(hasMemoryProblem(log)) << log;

        const auto records = sweepRecords(log);
        ASSERT_EQ(records.size(), c.records.size()) << log;
        const int32_t code = recordCode(records[0]);
        EXPECT_LT(code, 0) << "a failed fetch is a negative answer";
        int32_t lastRc = 0;
        for (size_t i = 0; i < records.size(); ++i) {
            switch (c.records[i]) {
                case Record::Fetch:
                    EXPECT_EQ(records[i], failureRecord(0x1878001B, 150,
                                                        "Error in call to sqlogmsg.\nrc=", code));
                    lastRc = code;
                    break;
                case Record::PoolList:
                    EXPECT_EQ(
                        records[i],
                        failureRecord(0x18780029, 50, "Inconsistent Monitor output.\nrc=", lastRc));
                    break;
                case Record::Estimate:
                    EXPECT_EQ(records[i], failureRecord(0x18780018, 100,
                                                        "Error in call to vrxGetSnapshotSize.\nrc=",
                                                        c.sqlCode));
                    lastRc = c.sqlCode;
                    break;
            }
        }
        if (c.exitStatus == kExitRecorded)
            expected += finalReport(lastRc);
        EXPECT_EQ(r.out, expected);
        EXPECT_EQ(r.exitStatus, c.exitStatus);
    }
    std::printf("[ sweep    ] %d runs with a failing message\n", runs);
}

}  // namespace
