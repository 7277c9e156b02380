// The snapshot getter against the stand-in engine, shaped per test through
// instance.json.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "engine/vrxapp.h"
#include "engine/vrxsys.h"
#include "engine/vrxwint.h"
#include "messages/mtrkMessages.h"
#include "monitor/mtrkSnapshot.h"
#include "monitor/mtrkStream.h"
#include "streamBuilder.h"
#include "testInstance.h"

namespace {

// Two databases; one pool each.
std::string databases(const std::string& answer, const std::string& more = "") {
    return R"({"databases": [{"name": "A", "pools": [{"id": 1, "current": 10}]},
                            {"name": "B", "pools": [{"id": 2, "current": 20}]}],
               "snapshots": {"database": {)" +
           answer + "}}" + more + "}";
}

// The stream that databases() is served as.
const std::string kStream = mtrktest::wrapStream(
    mtrktest::wrapElement(13, mtrktest::StreamBuilder().text(321, "A").pool(1, 10).str()) +
    mtrktest::wrapElement(13, mtrktest::StreamBuilder().text(321, "B").pool(2, 20).str()));
const uint32_t kStreamLength = static_cast<uint32_t>(kStream.size());

size_t count(const std::string& haystack, const std::string& needle) {
    size_t n = 0;
    for (size_t at = haystack.find(needle); at != std::string::npos;
         at = haystack.find(needle, at + 1)) {
        ++n;
    }
    return n;
}

// Each snapshot attempt starts with an estimate, whose entry the trace shows.
size_t attempts(const mtrktest::TempInstance& instance) {
    return count(instance.traceLog(), "entry 0x18780018\n");
}

class SnapshotGetter : public ::testing::Test {
  protected:
    void SetUp() override {
        instance.activate();
        gLastRc = 77;
        std::memcpy(&savedTraceWord, traceWord(), 4);
        const uint32_t entries = VRX_TRACE_ENTRY;
        std::memcpy(traceWord(), &entries, 4);
    }
    void TearDown() override {
        std::memcpy(traceWord(), &savedTraceWord, 4);
        mtrkReleaseSnapshot(&buffer);
    }
    static uint8_t* traceWord() { return g_sqltCompTraceFlags + VRX_TRACE_WORD_OFFSET; }

    mtrktest::TempInstance instance;
    uint32_t savedTraceWord = 0;
    char* buffer = nullptr;
    uint32_t size = 12345;
};

// Each attempt takes a block of the estimate times 2^(attempt - 1), and the
// block of the last one stays with the caller whenever a take was tried. What
// each answer of the monitor comes to in a run (output, records, exit
// status, no block left behind) is swept end to end.
TEST_F(SnapshotGetter, RetriesWithDoubledBlocksUpToEightAttempts) {
    struct Case {
        std::string answer;
        int32_t result;
        bool block;
        size_t attempts;
    };
    const Case cases[] = {
        {"", 0, true, 1},
        {R"("tooSmall": 7)", 0, true, 8},
        {R"("tooSmall": 8)", -4, true, 8},
        {R"("takeSqlcode": -1092)", -3, true, 1},
        {R"("sizeSqlcode": 1606)", 1606, false, 1},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.answer);
        mtrktest::TempInstance fresh;  // tooSmall counts per instance and process
        fresh.activate();
        fresh.writeJson(databases(c.answer));
        int32_t result = 0;
        mtrktest::captureStdout(
            [&] { result = mtrkGetSnapshot(&buffer, VRX_OBJ_DATABASE, &size); });
        EXPECT_EQ(result, c.result);
        EXPECT_EQ(attempts(fresh), c.attempts);
        EXPECT_EQ(buffer != nullptr, c.block);
        EXPECT_EQ(size, c.block ? kStreamLength << (c.attempts - 1) : 0);
        if (result == 0) {
            EXPECT_EQ(std::string(buffer, kStreamLength), kStream);
        }
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

}  // namespace
