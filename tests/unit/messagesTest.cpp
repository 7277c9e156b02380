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

TEST_F(MessagesTest, FetchesWithZeroOneAndTwoInserts) {
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
        // The engine answers with the text's length; that is success.
        EXPECT_EQ(mtrkGetMessage(c.number, buffer, sizeof buffer, c.count, c.first, c.second), 0);
        EXPECT_EQ(std::string(buffer), c.expected);
    }
    EXPECT_EQ(gLastRc, 0);
    EXPECT_EQ(instance_.diagLog(), "");
}

TEST_F(MessagesTest, ClearsTheWholeBufferFirst) {
    char buffer[MTRK_TEXT_SIZE];
    memset(buffer, 'x', sizeof buffer);
    ASSERT_EQ(mtrkGetMessage(23, buffer, sizeof buffer, 0), 0);
    ASSERT_STREQ(buffer, "instance");
    for (size_t i = strlen("instance"); i < sizeof buffer; ++i) {
        ASSERT_EQ(buffer[i], 0) << "byte " << i;
    }
}

TEST_F(MessagesTest, AFailedFetchIsRecordedAndStoresTheCode) {
    instance_.writeJson(R"({"faults": {"messageFail": [41]}})");
    char buffer[MTRK_TEXT_SIZE];
    EXPECT_EQ(mtrkGetMessage(41, buffer, sizeof buffer, 0), -4);
    EXPECT_LT(gLastRc, 0);
    EXPECT_EQ(buffer[0], 0) << "nothing of a failed fetch is left in the buffer";
    const auto records = diagRecords(instance_.diagLog());
    ASSERT_EQ(records.size(), 1u);
    EXPECT_EQ(records[0],
              failureRecord(0x1878001B, 150, "Error in call to sqlogmsg.\nrc=", gLastRc));
}

TEST_F(MessagesTest, UnknownMessageNumberFails) {
    char buffer[MTRK_TEXT_SIZE];
    EXPECT_EQ(mtrkGetMessage(9999, buffer, sizeof buffer, 0), -4);
    EXPECT_LT(gLastRc, 0);
}

TEST_F(MessagesTest, FailureRecordCarriesTextAndCode) {
    gLastRc = 11;
    EXPECT_EQ(mtrkLogFailure(0x18780046, 100, "Error in call to fflush.\nrc=", 28, true), -4);
    EXPECT_EQ(gLastRc, 28);
    EXPECT_EQ(
        mtrkLogFailure(0x18780019, 100, "Snapshot buffer too small after retry.\nrc=", 1606, false),
        -4);
    EXPECT_EQ(gLastRc, 28) << "a record that does not store leaves gLastRc alone";
    const auto records = diagRecords(instance_.diagLog());
    ASSERT_EQ(records.size(), 2u);
    EXPECT_EQ(records[0], failureRecord(0x18780046, 100, "Error in call to fflush.\nrc=", 28));
    EXPECT_EQ(records[1],
              failureRecord(0x18780019, 100, "Snapshot buffer too small after retry.\nrc=", 1606));
}

TEST_F(MessagesTest, TextBelowTheFirstPageIsLoggedWithoutLength) {
    const char* bogus = reinterpret_cast<const char*>(static_cast<uintptr_t>(4095));
    EXPECT_EQ(mtrkLogFailure(0x18780029, 50, bogus, 1, false), -4);
    const auto records = diagRecords(instance_.diagLog());
    ASSERT_EQ(records.size(), 1u);
    EXPECT_EQ(records[0], failureRecord(0x18780029, 50, "", 1));
}

TEST_F(MessagesTest, FinalFailureReportRendersTheLastCode) {
    for (int32_t code : {0, 5, -1032, 2147483647, -2147483647 - 1}) {
        SCOPED_TRACE(code);
        gLastRc = code;
        int32_t result = -1;
        const std::string out = mtrktest::captureStdout([&] { result = mtrkReportLastFailure(); });
        EXPECT_EQ(result, 0);
        EXPECT_EQ(out, "SQL6103 failed [" + std::to_string(code) + "]\n");
    }
    EXPECT_EQ(instance_.diagLog(), "");
}

TEST_F(MessagesTest, FailingRendererIsRecordedWithoutStoringItsCode) {
    instance_.writeJson(R"({"faults": {"sqlaintp": -7}})");
    gLastRc = 5;
    int32_t result = 0;
    const std::string out = mtrktest::captureStdout([&] { result = mtrkReportLastFailure(); });
    EXPECT_EQ(result, -4);
    EXPECT_EQ(out, "");
    EXPECT_EQ(gLastRc, 5);
    const auto records = diagRecords(instance_.diagLog());
    ASSERT_EQ(records.size(), 1u);
    EXPECT_EQ(records[0], failureRecord(0x18780030, 50, "Error in call to sqlaintp.\nrc=", -7));
}

// Sets the engine's trace flag word for one test and puts it back after.
class TraceTest : public MessagesTest {
  protected:
    void SetUp() override {
        MessagesTest::SetUp();
        ASSERT_NE(g_sqltCompTraceFlags, nullptr);
        memcpy(&saved_, g_sqltCompTraceFlags + VRX_TRACE_WORD_OFFSET, sizeof saved_);
    }
    void TearDown() override { setFlags(saved_); }
    static void setFlags(uint32_t flags) {
        memcpy(g_sqltCompTraceFlags + VRX_TRACE_WORD_OFFSET, &flags, sizeof flags);
    }

    uint32_t saved_ = 0;
};

TEST_F(TraceTest, EachFlagBitWritesItsProbe) {
    struct Case {
        uint32_t flags;
        std::string expected;
    };
    const Case cases[] = {
        {0x00, ""},
        {0x01, "entry 0x18780013\n"},
        {0x02, "exit 0x18780013 rc=-4\n"},
        {0x80, "flight 0x18780013 rc=-4\n"},
        {0x83, "entry 0x18780013\nexit 0x18780013 rc=-4\nflight 0x18780013 rc=-4\n"},
        // Bits other than 0, 1 and 7 ask for nothing here.
        {0x7C, ""},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.flags);
        instance_.writeFile("trace.log", "");
        setFlags(c.flags);
        const uint32_t word = mtrkTraceEntry(0x18780013);
        EXPECT_EQ(word, c.flags);
        mtrkTraceExit(0x18780013, word, -4);
        EXPECT_EQ(instance_.traceLog(), c.expected);
    }
}

}  // namespace
