// Message fetch, failure records, the final failure report and the trace
// probes, against the stand-in engine with the terse test catalogs.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "diagRecords.h"
#include "engine/vrxwint.h"
#include "messages/mtrkMessages.h"
#include "messages/mtrkTrace.h"
#include "testInstance.h"

namespace {

using mtrktest::diagRecords;
using mtrktest::failureRecord;

class MessagesTest : public ::testing::Test {
  protected:
    void SetUp() override {
        instance_.activate();
        gLastRc = 0;
    }

    mtrktest::TempInstance instance_;
};

TEST_F(MessagesTest, FetchesWithZeroOneAndTwoInsertsIntoAClearedBuffer) {
    struct Case {
        uint32_t number;
        int64_t count;
        const char* first;
        const char* second;
        std::string expected;
    };
    const Case cases[] = {
        {41, 0, nullptr, nullptr, "invalid"},
        // A placeholder without an insert reads the one empty entry.
        {21, 0, nullptr, nullptr, "database []"},
        {21, 1, "SAMPLE", nullptr, "database [SAMPLE]"},
        {24, 2, "2026/12/06", "20:05:39", "time [2026/12/06] [20:05:39]"},
        {24, 2, "", "%1", "time [] [%1]"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.expected);
        char buffer[MTRK_TEXT_SIZE];
        memset(buffer, 'x', sizeof buffer);
        // The engine answers with the text's length; that is success.
        EXPECT_EQ(mtrkGetMessage(c.number, buffer, sizeof buffer, c.count, c.first, c.second), 0);
        EXPECT_EQ(std::string(buffer), c.expected);
        EXPECT_EQ(std::string(buffer, sizeof buffer).find_first_not_of('\0', c.expected.size()),
                  std::string::npos)
            << "the whole buffer is cleared first";
    }
    EXPECT_EQ(gLastRc, 0);
    EXPECT_EQ(instance_.diagLog(), "");
}

TEST_F(MessagesTest, AFailedFetchIsRecordedAndStoresTheCode) {
    instance_.writeJson(R"({"faults": {"messageFail": [41]}})");
    char buffer[MTRK_TEXT_SIZE] = "stale";
    EXPECT_EQ(mtrkGetMessage(41, buffer, sizeof buffer, 0), -4);
    EXPECT_LT(gLastRc, 0);
    EXPECT_EQ(buffer[0], 0) << "nothing of a failed fetch is left in the buffer";
    EXPECT_EQ(
        diagRecords(instance_.diagLog()),
        std::vector{failureRecord(0x1878001B, 150, "Error in call to sqlogmsg.\nrc=", gLastRc)});
}

// Whether a record stores its code shows in the final report of every swept
// run; an address below the first page is no text and is logged without
// being read.
TEST_F(MessagesTest, ARecordWithoutATextHasNoLength) {
    gLastRc = 11;
    EXPECT_EQ(
        mtrkLogFailure(0x18780029, 50, reinterpret_cast<const char*>(uintptr_t{4095}), 1, false),
        -4);
    EXPECT_EQ(gLastRc, 11);
    EXPECT_EQ(diagRecords(instance_.diagLog()), std::vector{failureRecord(0x18780029, 50, "", 1)});
}

TEST_F(MessagesTest, FinalFailureReportRendersTheLastCode) {
    for (int32_t code : {0, 2147483647, -2147483647 - 1}) {
        SCOPED_TRACE(code);
        gLastRc = code;
        int32_t result = -1;
        EXPECT_EQ(mtrktest::captureStdout([&] { result = mtrkReportLastFailure(); }),
                  "SQL6103 failed [" + std::to_string(code) + "]\n");
        EXPECT_EQ(result, 0);
    }
    EXPECT_EQ(instance_.diagLog(), "");
}

TEST_F(MessagesTest, EachTraceFlagBitWritesItsProbe) {
    ASSERT_NE(g_sqltCompTraceFlags, nullptr);
    uint8_t* word = g_sqltCompTraceFlags + VRX_TRACE_WORD_OFFSET;
    uint32_t saved;
    memcpy(&saved, word, sizeof saved);
    const std::pair<uint32_t, std::string> cases[] = {
        {0x00, ""},
        {0x01, "entry 0x18780013\n"},
        {0x02, "exit 0x18780013 rc=-4\n"},
        {0x80, "flight 0x18780013 rc=-4\n"},
        {0x83, "entry 0x18780013\nexit 0x18780013 rc=-4\nflight 0x18780013 rc=-4\n"},
        {0x7C, ""},  // bits other than 0, 1 and 7 ask for nothing here
    };
    for (const auto& [flags, expected] : cases) {
        SCOPED_TRACE(flags);
        instance_.writeFile("trace.log", "");
        memcpy(word, &flags, sizeof flags);
        const uint32_t answered = mtrkTraceEntry(0x18780013);
        EXPECT_EQ(answered, flags);
        mtrkTraceExit(0x18780013, answered, -4);
        EXPECT_EQ(instance_.traceLog(), expected);
    }
    memcpy(word, &saved, sizeof saved);
}

}  // namespace
