// The diagnostic log: the record layout, pdLog's variable item list, and
// records of concurrent processes that never interleave.
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <filesystem>
#include <regex>
#include <sstream>
#include <string>

#include "common/diagLog.h"
#include "engine/vrxsys.h"
#include "testInstance.h"

namespace {

// 2026-12-06 20:05:09.
std::tm when() {
    std::tm t{};
    t.tm_year = 126;
    t.tm_mon = 11;
    t.tm_mday = 6;
    t.tm_hour = 20;
    t.tm_min = 5;
    t.tm_sec = 9;
    return t;
}

TEST(DiagLogTest, RecordLayout) {
    const char text[] = "Snapshot buffer too small after retry.\nrc=";
    int32_t code = 1606;
    standin::DiagItem items[] = {{PD_ITEM_TEXT, sizeof text - 1, text}, {PD_ITEM_INT32, 4, &code}};
    EXPECT_EQ(standin::formatDiagRecord(when(), 123, 4242, 0x18780019, 100, items, 2),
              "2026-12-06T20:05:09.000123 pid=4242 func=0x18780019 probe=100\n"
              "  data#1 text(42): \"Snapshot buffer too small after retry.\\nrc=\"\n"
              "  data#2 int32(4): 1606\n"
              "\n");
    EXPECT_EQ(standin::formatDiagRecord(when(), 999999, 1, 0, 0, nullptr, 0),
              "2026-12-06T20:05:09.999999 pid=1 func=0x00000000 probe=0\n\n");
}

TEST(DiagLogTest, ItemsAreShownAsGiven) {
    struct Case {
        standin::DiagItem item;
        std::string shown;
    };
    int32_t negative = -1032;
    int32_t smallest = INT32_MIN;
    const char escapes[] = "q\"b\\n\n t\t c\x01\x7f u\xc3\xa9";
    const unsigned char raw[] = {0x00, 0xAB, 0x10};
    // Unknown item types show at most 64 bytes.
    std::string longRaw(70, 'A');
    std::string longShown = "0x00000010(70): 41";
    for (int i = 1; i < 64; ++i)
        longShown += " 41";
    longShown += " ...";
    const Case cases[] = {
        {{PD_ITEM_INT32, 4, &negative}, "int32(4): -1032"},
        {{PD_ITEM_INT32, 4, &smallest}, "int32(4): -2147483648"},
        {{PD_ITEM_INT32, 2, &negative}, "int32(2): null"},
        {{PD_ITEM_INT32, 4, nullptr}, "int32(4): null"},
        {{PD_ITEM_TEXT, sizeof escapes - 1, escapes},
         "text(17): \"q\\\"b\\\\n\\n t\\x09 c\\x01\\x7f u\xc3\xa9\""},
        // The length in the call rules, not a terminator.
        {{PD_ITEM_TEXT, 3, "abcdef"}, "text(3): \"abc\""},
        {{PD_ITEM_TEXT, 3, "a\0b"}, "text(3): \"a\\x00b\""},
        // A text whose address is too small to be real comes with length 0
        // and must not be read.
        {{PD_ITEM_TEXT, 0, reinterpret_cast<const void*>(16)}, "text(0): \"\""},
        {{PD_ITEM_TEXT, 5, nullptr}, "text(5): null"},
        {{7, 3, raw}, "0x00000007(3): 00 ab 10"},
        {{0x10, 70, longRaw.data()}, longShown},
    };
    for (const Case& c : cases) {
        std::string record = standin::formatDiagRecord(when(), 0, 1, 1, 2, &c.item, 1);
        EXPECT_EQ(record, std::string("2026-12-06T20:05:09.000000 pid=1 func=0x00000001 probe=2\n"
                                      "  data#1 ") +
                              c.shown + "\n\n");
    }
}

class PdLogTest : public ::testing::Test {
  protected:
    void SetUp() override { instance_.activate(); }
    void TearDown() override { unsetenv("VRX_INSTANCE_DIR"); }

    mtrktest::TempInstance instance_{false};
};

TEST_F(PdLogTest, AppendsOneRecordPerCall) {
    const char text[] = "Error in call to sqlogmsg.\nrc=";
    int32_t rc = -5;
    pdLog(1, 0x1878001B, 0, 150, 2, 2, PD_ITEM_TEXT, uint64_t{sizeof text - 1}, text, PD_ITEM_INT32,
          uint64_t{4}, &rc);
    pdLog(1, 0xABCDEF01u, 0, 50, 2, 0);
    std::string log = instance_.diagLog();
    std::regex expected(
        "\\d{4}-\\d\\d-\\d\\dT\\d\\d:\\d\\d:\\d\\d\\.\\d{6} pid=" + std::to_string(getpid()) +
        " func=0x1878001b probe=150\n"
        "  data#1 text\\(30\\): \"Error in call to sqlogmsg\\.\\\\nrc=\"\n"
        "  data#2 int32\\(4\\): -5\n\n"
        "\\d{4}-\\d\\d-\\d\\dT\\d\\d:\\d\\d:\\d\\d\\.\\d{6} pid=\\d+ func=0xabcdef01 probe=50\n\n");
    EXPECT_TRUE(std::regex_match(log, expected)) << log;

    // A directory that cannot be written to is passed over.
    setenv("VRX_INSTANCE_DIR", "/nonexistent/instance", 1);
    pdLog(1, 1, 0, 50, 2, 1, PD_ITEM_INT32, uint64_t{4}, &rc);
    EXPECT_EQ(instance_.diagLog(), log);
    EXPECT_FALSE(std::filesystem::exists("/nonexistent/instance"));
}

// Each record is one write on a file opened for appending, so records of
// processes that log at the same moment stay whole.
TEST_F(PdLogTest, ConcurrentProcessesNeverInterleave) {
    constexpr int kProcesses = 4;
    constexpr int kRecords = 150;
    const std::string text(3000, 'z');
    for (int p = 0; p < kProcesses; ++p) {
        pid_t pid = fork();
        ASSERT_GE(pid, 0);
        if (pid == 0) {
            for (int32_t r = 0; r < kRecords; ++r) {
                pdLog(1, static_cast<uint32_t>(p), 0, 100, 2, 2, PD_ITEM_TEXT,
                      uint64_t{text.size()}, text.data(), PD_ITEM_INT32, uint64_t{4}, &r);
            }
            _exit(0);
        }
    }
    for (int p = 0; p < kProcesses; ++p) {
        int status = 0;
        wait(&status);
        EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
    }
    std::istringstream log(instance_.diagLog());
    std::regex head("\\S+ pid=\\d+ func=0x0000000[0-3] probe=100");
    std::string textLine = "  data#1 text(3000): \"" + text + "\"";
    std::regex codeLine("  data#2 int32\\(4\\): \\d+");
    int records = 0;
    std::string line;
    while (std::getline(log, line)) {
        ASSERT_TRUE(std::regex_match(line, head)) << "record " << records;
        ASSERT_TRUE(std::getline(log, line) && line == textLine) << "record " << records;
        ASSERT_TRUE(std::getline(log, line) && std::regex_match(line, codeLine));
        ASSERT_TRUE(std::getline(log, line) && line.empty());
        ++records;
    }
    EXPECT_EQ(records, kProcesses * kRecords);
}

}  // namespace
