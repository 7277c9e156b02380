// The registry variable of -all: the partition rule and the answers of the
// registry that the end-to-end runs do not provoke. The exposure and restore
// with every other answer, and the signal handler, are covered end to end.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "../e2e/registryFile.h"
#include "diagRecords.h"
#include "engine/vrxwint.h"
#include "messages/mtrkMessages.h"
#include "mtrkInternalPools.h"
#include "testInstance.h"

namespace {

using mtrktest::registryValue;

class InternalPoolsTest : public ::testing::Test {
  protected:
    void SetUp() override {
        ASSERT_NE(sqlz_krcbp, nullptr);
        memcpy(savedKrcb_, sqlz_krcbp, sizeof savedKrcb_);
        instance_.activate();
        setKrcb(0, 0, 0);
        gLastRc = 0;
    }
    void TearDown() override { memcpy(sqlz_krcbp, savedKrcb_, sizeof savedKrcb_); }

    static void setKrcb(uint32_t multiPartition, int16_t partition, int16_t defaultPartition) {
        memcpy(sqlz_krcbp + VRX_KRCB_MULTI_PARTITION, &multiPartition, sizeof multiPartition);
        memcpy(sqlz_krcbp + VRX_KRCB_PARTITION, &partition, sizeof partition);
        memcpy(sqlz_krcbp + VRX_KRCB_DEFAULT_PARTITION, &defaultPartition, sizeof defaultPartition);
    }

    mtrktest::TempInstance instance_;
    uint8_t savedKrcb_[VRX_KRCB_SIZE];
};

TEST_F(InternalPoolsTest, PartitionNumberFromTheControlBlock) {
    struct Case {
        uint32_t multiPartition;
        int16_t partition;
        int16_t defaultPartition;
        int32_t expected;
    };
    const Case cases[] = {
        {0, 5, 7, -1},                            // single partition: all of them
        {1, 5, 7, 5},                             // this partition
        {0x80000000u, 0, 7, 0},                   // any nonzero word counts
        {1, -1, 7, 7},                            // no own number: the default one
        {1, -32768, 3, 3},      {1, -1, -4, -4},  // the default is taken whatever it holds
        {1, 32767, -4, 32767},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message()
                     << c.multiPartition << "/" << c.partition << "/" << c.defaultPartition);
        setKrcb(c.multiPartition, c.partition, c.defaultPartition);
        EXPECT_EQ(mtrkPartitionNumber(), c.expected);
    }
}

TEST_F(InternalPoolsTest, AnErrorCodeLikeTheNoValueOnesIsAFailure) {
    const int32_t code = static_cast<int32_t>(0x870F0105);
    instance_.writeFile("registry", "VRXMEMTRK=before\n");
    instance_.writeJson(R"({"faults": {"registryRead": "0x870F0105"}})");
    EXPECT_EQ(mtrkExposeInternalPools(gSavedMemTrk), -4);
    EXPECT_EQ(gLastRc, code);
    EXPECT_EQ(registryValue(instance_.registry()), "before");
    EXPECT_EQ(mtrktest::diagRecords(instance_.diagLog()),
              std::vector{mtrktest::failureRecord(0x187800BE, 50,
                                                  "Error in call to sqloPRegValuePE.\nrc=", code)});
}

TEST_F(InternalPoolsTest, RestorePassesTheRegistryResultUpWithoutARecord) {
    instance_.writeJson(R"({"faults": {"registryWrite": 9}})");
    instance_.writeFile("registry", "VRXMEMTRK=1\n");
    gLastRc = 3;
    EXPECT_EQ(mtrkRestoreInternalPools("old"), 9);
    EXPECT_EQ(gLastRc, 3);
    EXPECT_EQ(instance_.diagLog(), "");
}

}  // namespace
