// The snapshot getter against the stand-in engine, shaped per test through
// instance.json.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "engine/vrxapp.h"
#include "engine/vrxsys.h"
#include "engine/vrxwint.h"
#include "messages/mtrkMessages.h"
#include "monitor/mtrkSnapshot.h"
#include "monitor/mtrkStream.h"
#include "testInstance.h"

namespace {

constexpr const char* kSizeText = "Error in call to vrxGetSnapshotSize.\nrc=";
constexpr const char* kTakeText = "Error in call to vrxGetSnapshot.\nrc=";
constexpr const char* kRetryText = "Snapshot buffer too small after retry.\nrc=";

// Two databases; one pool each.
std::string databases(const std::string& answer, const std::string& more = "") {
    return R"({"databases": [{"name": "A", "pools": [{"id": 1, "current": 10}]},
                            {"name": "B", "pools": [{"id": 2, "current": 20}]}],
               "snapshots": {"database": {)" +
           answer + "}}" + more + "}";
}

// The diag.log lines of one failure record, after its time stamp and pid.
std::string record(uint32_t function, int probe, std::string text, int32_t code) {
    char head[64];
    std::snprintf(head, sizeof(head), "func=0x%08x probe=%d\n", function, probe);
    std::string escaped;
    for (char c : text)
        escaped += (c == '\n') ? std::string("\\n") : std::string(1, c);
    return head + ("  data#1 text(" + std::to_string(text.size()) + "): \"" + escaped +
                   "\"\n  data#2 int32(4): " + std::to_string(code) + "\n");
}

size_t count(const std::string& haystack, const std::string& needle) {
    size_t n = 0;
    for (size_t at = haystack.find(needle); at != std::string::npos;
         at = haystack.find(needle, at + 1)) {
        ++n;
    }
    return n;
}

uint32_t setTraceWord(uint32_t word) {
    uint32_t before;
    std::memcpy(&before, g_sqltCompTraceFlags + VRX_TRACE_WORD_OFFSET, 4);
    std::memcpy(g_sqltCompTraceFlags + VRX_TRACE_WORD_OFFSET, &word, 4);
    return before;
}

class SnapshotGetter : public ::testing::Test {
  protected:
    void SetUp() override {
        instance.activate();
        gLastRc = 77;
        savedTraceWord = setTraceWord(VRX_TRACE_ENTRY);
    }
    void TearDown() override {
        setTraceWord(savedTraceWord);
        mtrkReleaseSnapshot(&buffer);
    }
    // Number of snapshot attempts so far: each one starts with an estimate.
    size_t attempts() const { return count(instance.traceLog(), "entry 0x18780018\n"); }

    mtrktest::TempInstance instance;
    uint32_t savedTraceWord = 0;
    char* buffer = nullptr;
    uint32_t size = 12345;
};

TEST_F(SnapshotGetter, TakesTheStreamIntoABlockOfTheEstimatedSize) {
    instance.writeJson(databases(""));
    ASSERT_EQ(mtrkGetSnapshot(&buffer, VRX_OBJ_DATABASE, &size), 0);
    ASSERT_NE(buffer, nullptr);
    EXPECT_EQ(mtrkStreamLength(buffer, size), size) << "the estimate is exact";
    const char* header;
    const char* data;
    uint32_t remaining;
    ASSERT_EQ(mtrkFindNextElement(buffer, size, &header, &data, &remaining, 13), 0);
    char name[8];
    ASSERT_EQ(mtrkGetString(321, data, mtrkReadHeader(header).size, name, sizeof(name)), 0);
    EXPECT_STREQ(name, "A");
    EXPECT_EQ(attempts(), 1u);
    EXPECT_EQ(instance.diagLog(), "");
    EXPECT_EQ(gLastRc, 77);
}

TEST_F(SnapshotGetter, RetriesWithDoubledBlocksUpToEightAttempts) {
    // The stream of one database with 20 pools is 746 bytes: an estimate of
    // 10 fits only at the eighth attempt (x128 = 1280, x64 = 640).
    std::string pools;
    for (int i = 0; i < 20; ++i)
        pools += std::string(i ? "," : "") + R"({"id": 1, "current": 1})";
    std::string bigDatabase = R"({"databases": [{"name": "DB", "pools": [)" + pools +
                              R"(]}], "snapshots": {"database": )";
    instance.writeJson(bigDatabase + R"({"estimate": 10}}})");
    EXPECT_EQ(mtrkGetSnapshot(&buffer, VRX_OBJ_DATABASE, &size), 0);
    EXPECT_EQ(size, 1280u);
    EXPECT_EQ(mtrkStreamLength(buffer, size), 746u);
    EXPECT_EQ(attempts(), 8u);

    instance.writeJson(bigDatabase + R"({"estimate": 5}}})");
    EXPECT_EQ(mtrkGetSnapshot(&buffer, VRX_OBJ_DATABASE, &size), -4);
    EXPECT_EQ(size, 640u) << "the last block stays with the caller";
    EXPECT_NE(buffer, nullptr);
    EXPECT_EQ(attempts(), 16u);
}

TEST_F(SnapshotGetter, AnswersOfTooSmallAndTheEstimate) {
    struct Case {
        const char* answer;
        int32_t result;
        size_t attempts;
        bool block;
        bool retryRecord;
    };
    const Case cases[] = {
        {R"("tooSmall": 7)", 0, 8, true, false},
        {R"("tooSmall": 8)", -4, 8, true, true},
        {R"("sizeSqlcode": 1606)", 1606, 1, false, false},
    };
    for (const Case& c : cases) {
        mtrktest::TempInstance fresh;  // tooSmall counts per instance and process
        fresh.activate();
        fresh.writeJson(databases(c.answer));
        buffer = nullptr;
        ASSERT_EQ(mtrkGetSnapshot(&buffer, VRX_OBJ_DATABASE, &size), c.result) << c.answer;
        EXPECT_EQ(count(fresh.traceLog(), "entry 0x18780018\n"), c.attempts) << c.answer;
        EXPECT_EQ(buffer != nullptr, c.block) << c.answer;
        if (c.result == 0) {
            EXPECT_EQ(size, 128 * mtrkStreamLength(buffer, size)) << c.answer;
        }
        if (c.retryRecord) {
            EXPECT_EQ(count(fresh.diagLog(), "func="), 1u) << c.answer;
            EXPECT_EQ(count(fresh.diagLog(), record(0x18780019, 100, kRetryText, 1606)), 1u);
        } else {
            EXPECT_EQ(fresh.diagLog(), "") << c.answer;
        }
        EXPECT_EQ(gLastRc, 77) << c.answer << ": the retry record leaves gLastRc alone";
        mtrkReleaseSnapshot(&buffer);
    }
    instance.activate();
}

TEST_F(SnapshotGetter, MapsEveryAnswerOfEitherCall) {
    struct Case {
        std::string json;
        int32_t result;
        const char* printed;
        bool block;  // a block stays when the take answered
        std::string record;
        int32_t lastRc;
    };
    const std::vector<Case> cases = {
        {databases(R"("sizeSqlcode": 1611)"), -2, "", false, "", 77},
        {databases(R"("takeSqlcode": 1611)"), -2, "", true, "", 77},
        {R"({"snapshots": {}})", -2, "", false, "", 77},
        {databases(R"("sizeSqlcode": -1032)"), -3, "stopped\n", false, "", 77},
        {databases(R"("takeSqlcode": -1092)"), -3, "not authorized\n", true, "", 77},
        {databases("", R"(, "state": "stopped")"), -3, "stopped\n", false, "", 77},
        {databases("", R"(, "state": "unauthorized")"), -3, "not authorized\n", false, "", 77},
        {databases(R"("sizeSqlcode": 5)"), -4, "", false, record(0x18780018, 100, kSizeText, 5), 5},
        {databases(R"("takeSqlcode": -911)"), -4, "", true,
         record(0x1878001A, 100, kTakeText, -911), -911},
        {databases(R"("sizeRc": 13)"), -4, "", false, record(0x18780018, 50, kSizeText, 13), 13},
        {databases(R"("takeRc": -7)"), -4, "", true, record(0x1878001A, 50, kTakeText, -7), -7},
        {databases(R"("sizeSqlcode": -1032)", R"(, "faults": {"messageFail": [45]})"), -4, "",
         false, record(0x18780018, 100, kSizeText, -1032), -1032},
    };
    for (const Case& c : cases) {
        mtrktest::TempInstance fresh;
        fresh.activate();
        fresh.writeJson(c.json);
        gLastRc = 77;
        int32_t result = 0;
        std::string out = mtrktest::captureStdout(
            [&] { result = mtrkGetSnapshot(&buffer, VRX_OBJ_DATABASE, &size); });
        EXPECT_EQ(result, c.result) << c.json;
        EXPECT_EQ(out, c.printed) << c.json;
        EXPECT_EQ(buffer != nullptr, c.block) << c.json;
        if (c.record.empty()) {
            EXPECT_EQ(fresh.diagLog(), "") << c.json;
        } else {
            EXPECT_EQ(count(fresh.diagLog(), c.record), 1u) << c.json;
        }
        EXPECT_EQ(gLastRc, c.lastRc) << c.json;
        mtrkReleaseSnapshot(&buffer);
    }
    instance.activate();
}

TEST_F(SnapshotGetter, SizeProductSaturatesAndAFailedAllocationIsNotRecorded) {
    struct Case {
        uint32_t estimate;
        uint32_t multiplier;
        uint32_t requested;
    };
    const Case cases[] = {
        {0x50000000u, 4, 0xFFFFFFFFu},
        {0x7FFFFFFFu, 2, 0xFFFFFFFEu},
        {0x80000000u, 128, 0xFFFFFFFFu},
    };
    for (const Case& c : cases) {
        instance.writeJson(databases(R"("estimate": )" + std::to_string(c.estimate)));
        EXPECT_EQ(mtrkGetSnapshotSize(&buffer, &size, VRX_OBJ_DATABASE, c.multiplier), -4);
        EXPECT_EQ(size, c.requested) << c.estimate << " x " << c.multiplier;
        EXPECT_EQ(buffer, nullptr);
    }
    EXPECT_EQ(instance.diagLog(), "");
    EXPECT_EQ(gLastRc, 77);
}

// Runs `body` in a child process that then exits normally, and counts the
// engine's records of blocks still held at exit. The records go to an
// instance directory of their own; blocks that this process already held
// are counted as well, so a caller compares with an empty body.
size_t blocksLeftBy(const std::function<void()>& body) {
    mtrktest::TempInstance report(false);
    std::fflush(nullptr);
    pid_t pid = fork();
    if (pid == 0) {
        body();
        setenv("VRX_INSTANCE_DIR", report.dir().c_str(), 1);
        std::exit(0);
    }
    int status = 0;
    waitpid(pid, &status, 0);
    EXPECT_TRUE(WIFEXITED(status));
    return count(report.diagLog(), "Memory block not released");
}

TEST_F(SnapshotGetter, NoPathLeavesABlockBehind) {
    size_t before = blocksLeftBy([] {});
    ASSERT_EQ(blocksLeftBy([] {
                  void* block;
                  sqlogmblkEx(0, 16, 0, &block, "sqlomtrk", __LINE__, 0);
              }),
              before + 1)
        << "the leak check itself works";

    const std::string answers[] = {"", R"("tooSmall": 8)", R"("takeSqlcode": -1092)",
                                   R"("takeRc": 3)", R"("sizeSqlcode": 1606)"};
    for (const std::string& answer : answers) {
        mtrktest::TempInstance fresh;
        fresh.activate();
        fresh.writeJson(databases(answer));
        size_t left = blocksLeftBy([] {
            char* snapshot = nullptr;
            uint32_t bytes = 0;
            // A block held on entry is released before the first estimate.
            void* held = nullptr;
            sqlogmblkEx(0, 64, 0, &held, "sqlomtrk", __LINE__, 0);
            snapshot = static_cast<char*>(held);
            mtrkGetSnapshot(&snapshot, VRX_OBJ_DATABASE, &bytes);
            mtrkReleaseSnapshot(&snapshot);
        });
        EXPECT_EQ(left, before) << answer;
    }
    instance.activate();
}

}  // namespace
