// Every failure that the engine can be asked for: each snapshot answer for
// each object type, in each report that takes that type, and each of the
// other failing calls. What a run prints, the records it leaves and its exit
// status follow from the failure tables: a report stops at a failing
// snapshot and the run with it, except the application report, which goes
// on without the databases' pools when only its database snapshot fails.
#include <gtest/gtest.h>

#include <cstdio>
#include <stdexcept>
#include <string>
#include <vector>

#include "streamBuilder.h"
#include "sweepSupport.h"
#include "testInstance.h"

namespace {

using namespace mtrktest;

enum Kind { kInstance, kDatabase, kApplication };
const char* const kKindNames[] = {"instance", "database", "application"};

// What a snapshot of the failing kind comes to, for the report that takes it.
struct Outcome {
    enum Type {
        Clean,      // the answer does not stop the snapshot
        Nothing,    // -2: the report's notice, and the run goes on
        Explained,  // -3: the monitor's refusal, printed by the snapshot step
        TooSmall,   // 1606 to the estimate: nothing printed
        Recorded,   // -4 with a failure record
        Refused,    // -4 without a record: the block was refused
    } type;
    std::string printed = {};  // Explained: what the snapshot step printed
    uint32_t functionId = 0;   // Recorded: the record
    uint32_t probe = 0;
    std::string text = {};
    int32_t code = 0;
    bool storesLastRc = true;
};

struct Answer {
    std::string name;
    // instance.json keys for a failing kind; the %s stands for its name.
    std::string keys;
    Outcome outcome;
    bool everyKind = false;   // the answer applies to every object type at once
    std::string faults = {};  // the engine's faults besides
};

const char* const kEstimateText = "Error in call to vrxGetSnapshotSize.\nrc=";
const char* const kTakeText = "Error in call to vrxGetSnapshot.\nrc=";

Outcome recorded(uint32_t functionId, uint32_t probe, const char* text, int32_t code,
                 bool storesLastRc = true) {
    return {Outcome::Recorded, "", functionId, probe, text, code, storesLastRc};
}

const Outcome kNoRoomAfterRetries =
    recorded(0x18780019, 100, "Snapshot buffer too small after retry.\nrc=", 1606, false);

std::vector<Answer> answers() {
    std::vector<Answer> all = {
        {"sizeRc", R"("sizeRc": 77)", recorded(0x18780018, 50, kEstimateText, 77)},
        {"takeRc", R"("takeRc": 77)", recorded(0x1878001A, 50, kTakeText, 77)},
        {"estimate answers 1606", R"("sizeSqlcode": 1606)", {Outcome::TooSmall}},
        // A take that keeps answering 1606 is retried with doubled blocks
        // eight times; seven such answers are still survived.
        {"take answers 1606", R"("takeSqlcode": 1606)", kNoRoomAfterRetries},
        {"seven takes too small", R"("tooSmall": 7)", {Outcome::Clean}},
        {"eight takes too small", R"("tooSmall": 8)", kNoRoomAfterRetries},
        {"estimate of 0 bytes", R"("estimate": 0)", kNoRoomAfterRetries},
        // The first block is released before the doubled one is refused;
        // the other streams are far smaller than the largest block.
        {"doubled block refused",
         R"("estimate": 4000, "tooSmall": 1)",
         {Outcome::Refused},
         false,
         R"("maxAllocBytes": 5000)"},
    };
    const struct {
        const char* call;
        uint32_t functionId;
        const char* text;
    } calls[] = {{"size", 0x18780018, kEstimateText}, {"take", 0x1878001A, kTakeText}};
    for (const auto& call : calls) {
        const std::string key = std::string("\"") + call.call + "Sqlcode\": ";
        const std::string name = std::string(call.call) + " answers ";
        all.push_back({name + "1611", key + "1611", {Outcome::Nothing}});
        all.push_back({name + "-1032", key + "-1032", {Outcome::Explained, "stopped\n"}});
        all.push_back({name + "-1092", key + "-1092", {Outcome::Explained, "not authorized\n"}});
        all.push_back(
            {name + "-818", key + "-818", recorded(call.functionId, 100, call.text, -818)});
        all.push_back(
            {name + "4711", key + "4711", recorded(call.functionId, 100, call.text, 4711)});
    }
    all.push_back(
        {"stopped instance", R"("state": "stopped")", {Outcome::Explained, "stopped\n"}, true});
    all.push_back({"unauthorized user",
                   R"("state": "unauthorized")",
                   {Outcome::Explained, "not authorized\n"},
                   true});
    all.push_back({"no block above 16 bytes",
                   R"("faults": {"maxAllocBytes": 16})",
                   {Outcome::Refused},
                   true});
    return all;
}

// The small instance's reports, as a clean run prints them.
struct Report {
    const char* flag;
    Kind kind;
    std::string out;
    std::string nothingToShow;
    bool takesDatabaseToo = false;  // a second snapshot, of the databases
};

const Report kReports[] = {
    {"-i", kInstance, "instance\n\n   monh        other       \n   2.0K        1.0K        \n\n",
     ""},
    {"-d", kDatabase,
     "database [SAMPLE]\n\n   dbh         appshrh     \n   4.0K        8.0K        \n\n",
     "no databases\n\n"},
    {"-a", kApplication,
     "appdb [SAMPLE]\n\n   appshrh     \n   8.0K        \n\n"
     "app [7]\n\n   apph        \n   1.0K        \n\n",
     "no applications\n\n", true},
    {"-p", kApplication, "private [0]\n\n   sorth       \n   3.0K        \n\n",
     "no private memory\n\n"},
};
// The application report without its database snapshot.
const std::string kApplicationsAlone =
    "appdb [SAMPLE]\n\napp [7]\n\n   apph        \n   1.0K        \n\n";

const Report& report(const std::string& flag) {
    for (const Report& r : kReports) {
        if (flag == r.flag)
            return r;
    }
    throw std::invalid_argument(flag);
}

// What a run is expected to do.
struct Expected {
    std::string out;
    int exitStatus = 0;
    std::vector<std::string> records;
};

// The run driver over the reports `flags` (in their fixed order) when the
// snapshots of `failing` kinds meet `outcome`.
Expected expect(const std::vector<std::string>& flags, const std::vector<Kind>& failing,
                const Outcome& outcome) {
    auto fails = [&](Kind k) {
        for (Kind f : failing) {
            if (f == k)
                return true;
        }
        return false;
    };
    Expected e;
    e.out = kSweepStamp;
    int32_t status = 0;
    int32_t lastRc = 0;
    auto meet = [&]() {
        if (outcome.type == Outcome::Recorded) {
            e.records.push_back(
                failureRecord(outcome.functionId, outcome.probe, outcome.text, outcome.code));
            if (outcome.storesLastRc)
                lastRc = outcome.code;
        }
    };
    for (const std::string& flag : flags) {
        const Report& r = report(flag);
        if (!fails(r.kind) || outcome.type == Outcome::Clean) {
            if (r.takesDatabaseToo && fails(kDatabase) && outcome.type != Outcome::Clean) {
                // Only the application report's second snapshot fails.
                meet();
                e.out += outcome.printed + kApplicationsAlone;
            } else {
                e.out += r.out;
            }
            continue;
        }
        meet();
        switch (outcome.type) {
            case Outcome::Nothing:
                e.out += r.nothingToShow;
                break;
            case Outcome::Explained:
                e.out += outcome.printed;
                status = -3;
                break;
            case Outcome::TooSmall:
                status = 1606;
                break;
            default:
                status = -4;
                break;
        }
        if (status != 0)
            break;
    }
    switch (status) {
        case -4:
            e.exitStatus = kExitRecorded;
            e.out += finalReport(lastRc);
            break;
        case -3:
            e.exitStatus = kExitExplained;
            break;
        case 1606:
            e.exitStatus = kExitTooSmall;
            break;
        default:
            e.exitStatus = 0;
            break;
    }
    return e;
}

std::string formatKeys(const std::string& keys, Kind kind) {
    const std::string name = kKindNames[kind];
    return R"("snapshots": {")" + name + R"(": {)" + keys + "}}";
}

void expectRun(TempInstance& instance, const std::string& keys,
               const std::vector<std::string>& flags, const Expected& e) {
    instance.writeJson(sweepJson(std::string(kSmallInstance) + ", " + keys));
    instance.writeFile("diag.log", "");
    const RunResult r = runProgram(instance, flags);
    EXPECT_EQ(r.out, e.out);
    EXPECT_EQ(r.exitStatus, e.exitStatus);
    const std::string log = instance.diagLog();
    EXPECT_FALSE(hasMemoryProblem(log)) << log;
    EXPECT_EQ(sweepRecords(log), e.records);
}

// Each object type with each report that takes it; the run also holds a
// report that does not take it, to show whether the run goes on.
const struct {
    Kind kind;
    std::vector<std::string> flags;
} kTakers[] = {
    {kInstance, {"-i", "-d"}},    {kDatabase, {"-d", "-p"}},    {kDatabase, {"-a", "-p"}},
    {kApplication, {"-i", "-a"}}, {kApplication, {"-d", "-p"}},
};

TEST(EngineCallSweepTest, CleanReportsOfTheSmallInstance) {
    TempInstance instance;
    instance.writeJson(sweepJson(kSmallInstance));
    const RunResult r = runProgram(instance, {"-i", "-d", "-a", "-p"});
    EXPECT_EQ(r.out,
              kSweepStamp + kReports[0].out + kReports[1].out + kReports[2].out + kReports[3].out);
    EXPECT_EQ(r.exitStatus, 0);
}

TEST(EngineCallSweepTest, SnapshotAnswersPerObjectTypeAndReport) {
    TempInstance instance;
    int runs = 0;
    for (const Answer& a : answers()) {
        for (const auto& taker : kTakers) {
            std::string flags;
            for (const auto& f : taker.flags)
                flags += " " + f;
            SCOPED_TRACE(a.name + " for " + kKindNames[taker.kind] + ", run" + flags);
            const std::vector<Kind> failing =
                a.everyKind ? std::vector<Kind>{kInstance, kDatabase, kApplication}
                            : std::vector<Kind>{taker.kind};
            std::string keys = a.everyKind ? a.keys : formatKeys(a.keys, taker.kind);
            if (!a.faults.empty())
                keys += R"(, "faults": {)" + a.faults + "}";
            expectRun(instance, keys, taker.flags, expect(taker.flags, failing, a.outcome));
            ++runs;
        }
    }
    std::printf("[ sweep    ] %d runs with a snapshot answer\n", runs);
}

// The engine calls outside the snapshots.
TEST(EngineCallSweepTest, FailingEngineCalls) {
    const std::string instanceOut = kSweepStamp + kReports[0].out;
    const std::string registry = "OTHERVAR=5\nVRXMEMTRK=0\n";
    const std::string expose = "Error in call to sqloPRegValuePE.\nrc=";
    const struct {
        const char* name;
        std::string faults;
        std::vector<std::string> args;
        std::string out;
        int exitStatus;
        std::vector<std::string> records;
        std::string registryAfter;
    } cases[] = {
        // The command line is not even parsed.
        {"environment",
         R"("initApplicationEnvironment": 5)",
         {"-x"},
         finalReport(5),
         kExitRecorded,
         {failureRecord(0x18780046, 50,
                        "Error in call to sqleInitApplicationEnvironment.\nrc=", 5)},
         registry},
        {"date and time",
         R"("getDateTime": 9)",
         {"-i"},
         finalReport(9),
         kExitRecorded,
         {failureRecord(0x1878002E, 50, "Error in call to sqlogetdatetime.\nrc=", 9)},
         registry},
        // A failed read or set leaves the variable alone and is not undone.
        {"registry read",
         R"("registryRead": 7)",
         {"-all", "-i"},
         finalReport(7),
         kExitRecorded,
         {failureRecord(0x187800BE, 50, expose, 7)},
         registry},
        {"registry write",
         R"("registryWrite": 13)",
         {"-all", "-i"},
         finalReport(13),
         kExitRecorded,
         {failureRecord(0x187800BE, 100, expose, 13)},
         registry},
        // The three answers that mean "no value": the run goes on, and the
        // empty value it then saved is what it puts back.
        {"registry read: not set",
         R"("registryRead": "0x870F0104")",
         {"-all", "-i"},
         instanceOut,
         0,
         {},
         "OTHERVAR=5\n"},
        {"registry read: no file",
         R"("registryRead": "0x870F0108")",
         {"-all", "-i"},
         instanceOut,
         0,
         {},
         "OTHERVAR=5\n"},
        {"registry read: no value",
         R"("registryRead": "0x870F0109")",
         {"-all", "-i"},
         instanceOut,
         0,
         {},
         "OTHERVAR=5\n"},
        // The engine's explanation that cannot be rendered is only recorded.
        {"explanation",
         R"("getDateTime": 9, "sqlaintp": -1)",
         {"-i"},
         "",
         kExitRecorded,
         {failureRecord(0x1878002E, 50, "Error in call to sqlogetdatetime.\nrc=", 9),
          failureRecord(0x18780030, 50, "Error in call to sqlaintp.\nrc=", -1)},
         registry},
        {"explanation not asked for", R"("sqlaintp": -1)", {"-i"}, instanceOut, 0, {}, registry},
    };
    TempInstance instance;
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        instance.writeFile("registry", registry);
        Expected e{c.out, c.exitStatus, c.records};
        expectRun(instance, R"("faults": {)" + c.faults + "}", c.args, e);
        EXPECT_EQ(registryLines(instance.registry()), registryLines(c.registryAfter));
    }
}

// The insert tables of a message with two inserts are the first blocks
// above 8 bytes: the time stamp's fetch is refused, with the allocator's
// own code in its record and in the final failure report.
TEST(EngineCallSweepTest, InsertTablesAboveTheLargestBlock) {
    TempInstance instance;
    instance.writeJson(
        sweepJson(std::string(kSmallInstance) + R"(, "faults": {"maxAllocBytes": 8})"));
    const RunResult r = runProgram(instance, {"-i"});
    const auto records = sweepRecords(instance.diagLog());
    ASSERT_EQ(records.size(), 1u) << instance.diagLog();
    const int32_t code = recordCode(records[0]);
    EXPECT_NE(code, 0);
    EXPECT_EQ(records[0], failureRecord(0x1878001B, 50, "Error in call to sqlogmblk.\nrc=", code));
    EXPECT_EQ(r.out, finalReport(code));
    EXPECT_EQ(r.exitStatus, kExitRecorded);
    EXPECT_FALSE(hasMemoryProblem(instance.diagLog()));
}

// A stream served as it stands is an answer too. A section without the
// element that names it ends the run with 1 after what came before; a pool
// without its identifier is an inconsistent stream, recorded with 1; and a
// damaged database stream costs the application report only the databases'
// pools.
TEST(EngineCallSweepTest, DamagedStreamsPerReport) {
    using B = StreamBuilder;
    const std::string inconsistent =
        failureRecord(0x18780029, 50, "Inconsistent Monitor output.\nrc=", 1);
    const std::string privateMemory = kReports[3].out;
    // A later section of the same database with a sound pool 20, which the
    // print must not reach once a pool of the first one failed.
    const std::string kGoodSample = B().open(13).text(321, "SAMPLE").pool(20, 8192).close().str();
    const struct {
        const char* name;
        Kind kind;
        std::string body;
        std::vector<std::string> args;
        std::string out;
        int exitStatus;
        std::vector<std::string> records;
    } cases[] = {
        {"instance pool without identifier",
         kInstance,
         B().open(40).u64(687, 1024).close().str(),
         {"-i", "-d"},
         "instance\n\n" + finalReport(1),
         kExitRecorded,
         {inconsistent}},
        {"database without name",
         kDatabase,
         B().open(13).pool(5, 4096).close().str(),
         {"-d", "-p"},
         "",
         1,
         {}},
        {"first application without database",
         kApplication,
         B().open(5).u32(302, 7).close().str(),
         {"-a"},
         "",
         1,
         {}},
        {"application without number",
         kApplication,
         B().open(5).text(321, "SAMPLE").close().str(),
         {"-a"},
         "appdb [SAMPLE]\n\n   appshrh     \n   8.0K        \n\n",
         1,
         {}},
        {"private memory without number",
         kApplication,
         B().open(10).pool(15, 1024).close().str(),
         {"-p"},
         "",
         1,
         {}},
        {"database pool without identifier",
         kDatabase,
         B().open(13).text(321, "SAMPLE").open(40).u64(687, 8192).close().close().str() +
             kGoodSample,
         {"-a", "-p"},
         kApplicationsAlone + privateMemory,
         0,
         {}},
        {"empty database pool",
         kDatabase,
         B().open(13).text(321, "SAMPLE").raw(1, 40, 0).pool(20, 8192).close().str() + kGoodSample,
         {"-a", "-p"},
         kApplicationsAlone + privateMemory,
         0,
         {}},
    };
    TempInstance instance;
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        instance.writeFile("stream", wrapStream(c.body));
        expectRun(instance, formatKeys(R"("streamFile": "stream")", c.kind), c.args,
                  {kSweepStamp + c.out, c.exitStatus, c.records});
    }
}

}  // namespace
