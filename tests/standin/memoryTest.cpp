// Memory blocks of the engine: the configured failures, the records of
// wrong releases, and the report of blocks still held at process exit.
#include <gtest/gtest.h>

#include <regex>
#include <string>

#include "childProcess.h"
#include "engine/vrxsys.h"
#include "sys/memoryTracking.h"
#include "testInstance.h"

namespace {

class MemoryTest : public ::testing::Test {
  protected:
    void SetUp() override { instance_.activate(); }
    void TearDown() override { unsetenv("VRX_INSTANCE_DIR"); }

    mtrktest::TempInstance instance_{false};
};

TEST_F(MemoryTest, BlocksUpToTheLimitRoundTrip) {
    for (uint64_t size : {0, 1, 8, 5000, 1 << 20}) {
        void* block = reinterpret_cast<void*>(1);
        ASSERT_EQ(sqlogmblkEx(0, size, 0, &block, "sqlomtrk", 10, 0), 0) << size;
        ASSERT_NE(block, nullptr);
        // The whole block is usable (the sanitizer build checks the bounds).
        if (size > 0)
            static_cast<char*>(block)[size - 1] = 1;
        EXPECT_EQ(sqlofmblkEx("sqlomtrk", 11, block), 0);
    }
    // The default limit is 1 GiB.
    void* block = reinterpret_cast<void*>(1);
    EXPECT_EQ(sqlogmblkEx(0, (uint64_t{1} << 30) + 1, 0, &block, "sqlomtrk", 23, 0),
              standin::kMemoryNotAvailable);
    EXPECT_EQ(block, nullptr);
    EXPECT_EQ(sqlogmblkEx(0, UINT64_MAX, 0, &block, "sqlomtrk", 24, 0),
              standin::kMemoryNotAvailable);
    EXPECT_EQ(sqlogmblkEx(0, 8, 0, nullptr, "sqlomtrk", 25, 0), standin::kMemoryBadBlock);

    instance_.writeJson(R"({"faults": {"maxAllocBytes": 4096}})");
    EXPECT_EQ(sqlogmblkEx(0, 4097, 0, &block, "sqlomtrk", 20, 0), standin::kMemoryNotAvailable);
    ASSERT_EQ(sqlogmblkEx(0, 4096, 0, &block, "sqlomtrk", 21, 0), 0);
    EXPECT_EQ(sqlofmblkEx("sqlomtrk", 22, block), 0);
    EXPECT_EQ(instance_.diagLog(), "");
}

TEST_F(MemoryTest, WrongReleasesAreLoggedAndRefused) {
    void* block = nullptr;
    ASSERT_EQ(sqlogmblkEx(0, 24, 0, &block, "sqlomtrk", 30, 0), 0);
    ASSERT_EQ(sqlofmblkEx("sqlomtrk", 31, block), 0);
    EXPECT_EQ(sqlofmblkEx("sqlomtrk", 32, block), standin::kMemoryBadBlock);
    int local = 0;
    EXPECT_EQ(sqlofmblkEx("sqlomtrk", 33, &local), standin::kMemoryBadBlock);
    EXPECT_EQ(sqlofmblkEx("sqlomtrk", 34, nullptr), standin::kMemoryBadBlock);

    std::regex expected(
        "\\S+ pid=\\d+ func=0x00000000 probe=0\n"
        "  data#1 text\\(\\d+\\): \"Memory block released twice: sqlomtrk:32, block 0x[0-9a-f]+ "
        "of 24 bytes from sqlomtrk:30, already released at sqlomtrk:31\"\n\n"
        "\\S+ pid=\\d+ func=0x00000000 probe=0\n"
        "  data#1 text\\(\\d+\\): \"Memory block not handed out by the engine released: "
        "sqlomtrk:33, address 0x[0-9a-f]+\"\n\n"
        "\\S+ pid=\\d+ func=0x00000000 probe=0\n"
        "  data#1 text\\(\\d+\\): \"Memory block not handed out by the engine released: "
        "sqlomtrk:34, address \\(nil\\)\"\n\n");
    std::string log = instance_.diagLog();
    EXPECT_TRUE(std::regex_match(log, expected)) << log;
}

// Run in a fresh process: the report of held blocks is written when the
// process ends. (Which call fails by allocFailAt is checked by the run
// driver's tests and the allocation sweep.)
TEST_F(MemoryTest, BlocksStillHeldAtExitAreReported) {
    EXPECT_TRUE(mtrktest::childTestPassed("MemoryChild.LeavesTwoBlocks",
                                          {{"VRX_INSTANCE_DIR", instance_.dir().string()}}));
    std::regex expected(
        "\\S+ pid=\\d+ func=0x00000000 probe=0\n"
        "  data#1 text\\(\\d+\\): \"Memory block not released: sqlomtrk:41, 24 bytes\"\n\n"
        "\\S+ pid=\\d+ func=0x00000000 probe=0\n"
        "  data#1 text\\(\\d+\\): \"Memory block not released: report:43, 0 bytes\"\n\n");
    std::string log = instance_.diagLog();
    EXPECT_TRUE(std::regex_match(log, expected)) << log;
}

TEST(MemoryChild, LeavesTwoBlocks) {
    CHILD_ONLY();
    void* kept = nullptr;
    void* released = nullptr;
    void* empty = nullptr;
    ASSERT_EQ(sqlogmblkEx(0, 24, 0, &kept, "sqlomtrk", 41, 0), 0);
    ASSERT_EQ(sqlogmblkEx(0, 100, 0, &released, "sqlomtrk", 42, 0), 0);
    ASSERT_EQ(sqlogmblkEx(0, 0, 0, &empty, "report", 43, 0), 0);
    ASSERT_EQ(sqlofmblkEx("sqlomtrk", 44, released), 0);
}

}  // namespace
