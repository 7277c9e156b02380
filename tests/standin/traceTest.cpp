// Trace probes and the two data objects that the engine fills at load time.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "childProcess.h"
#include "engine/vrxsys.h"
#include "engine/vrxwint.h"
#include "testInstance.h"

namespace {

TEST(TraceTest, EachProbeAppendsOneLine) {
    mtrktest::TempInstance instance(false);
    instance.activate();
    int64_t rc = -4;
    int64_t smallest = INT64_MIN;
    pdtEntry(0x18780013);
    pdtExit(0x18780013, &rc, 0);
    pdFlightRecordTrc(0x1878002A, 1606, 0, 0);
    pdtExit(0xFFFFFFFF, &smallest, 0);
    pdFlightRecordTrc(0x00000001, INT64_MAX, 0, 0);
    pdtExit(0x187801D5, nullptr, 0);
    unsetenv("VRX_INSTANCE_DIR");
    EXPECT_EQ(instance.traceLog(),
              "entry 0x18780013\n"
              "exit 0x18780013 rc=-4\n"
              "flight 0x1878002a rc=1606\n"
              "exit 0xffffffff rc=-9223372036854775808\n"
              "flight 0x00000001 rc=9223372036854775807\n"
              "exit 0x187801d5\n");
}

// Probes run inside the program's signal handler, where a changed errno
// would mislead the code it interrupted.
TEST(TraceTest, ProbesLeaveErrnoAlone) {
    setenv("VRX_INSTANCE_DIR", "/nonexistent/instance", 1);
    errno = 1234;
    pdtEntry(1);
    EXPECT_EQ(errno, 1234);
    unsetenv("VRX_INSTANCE_DIR");
}

template <typename T>
T at(const uint8_t* block, uint32_t offset) {
    T value;
    std::memcpy(&value, block + offset, sizeof value);
    return value;
}

TEST(DataObjectsTest, ZeroWhenTheInstanceCannotBeRead) {
    mtrktest::TempInstance instance(false);
    instance.writeJson(R"({"traceFlags": 1, "krcb": {"partition": 5}, "typo": 1})");
    EXPECT_TRUE(mtrktest::childTestPassed(
        "DataObjectsChild.Match",
        {{"VRX_INSTANCE_DIR", instance.dir().string()}, {"EXPECT_WORDS", "0 0 0 0"}}));
    EXPECT_TRUE(mtrktest::childTestPassed(
        "DataObjectsChild.Match",
        {{"VRX_INSTANCE_DIR", "/nonexistent/instance"}, {"EXPECT_WORDS", "0 0 0 0"}}));
}

TEST(DataObjectsChild, Match) {
    CHILD_ONLY();
    ASSERT_NE(g_sqltCompTraceFlags, nullptr);
    ASSERT_NE(sqlz_krcbp, nullptr);
    std::string words = std::to_string(at<uint32_t>(g_sqltCompTraceFlags, VRX_TRACE_WORD_OFFSET)) +
                        " " + std::to_string(at<uint32_t>(sqlz_krcbp, VRX_KRCB_MULTI_PARTITION)) +
                        " " + std::to_string(at<int16_t>(sqlz_krcbp, VRX_KRCB_PARTITION)) + " " +
                        std::to_string(at<int16_t>(sqlz_krcbp, VRX_KRCB_DEFAULT_PARTITION));
    EXPECT_EQ(words, std::getenv("EXPECT_WORDS"));
}

}  // namespace
