// The small services of the engine: date and time, pool identifiers.
#include <gtest/gtest.h>

#include <ctime>
#include <set>
#include <string>

#include "common/poolTable.h"
#include "engine/vrxsys.h"
#include "testInstance.h"

namespace {

std::string shown(const SqloDateTime& t) {
    char text[64];
    snprintf(text, sizeof text, "%04u-%02u-%02u %02u:%02u:%02u.%02u day %u", t.year, t.month, t.day,
             t.hour, t.minute, t.second, t.hundredths, t.weekday);
    return text;
}

class EngineServicesTest : public ::testing::Test {
  protected:
    void SetUp() override { instance_.activate(); }
    void TearDown() override { unsetenv("VRX_INSTANCE_DIR"); }

    mtrktest::TempInstance instance_{false};
};

TEST_F(EngineServicesTest, DateAndTimeFollowTheClock) {
    const std::pair<const char*, const char*> cases[] = {
        {"2026-12-06 20:05:39", "2026-12-06 20:05:39.00 day 0"},  // a Sunday
        {"2024-02-29 00:00:00", "2024-02-29 00:00:00.00 day 4"},  // a Thursday
        {"1999-12-31 23:59:59", "1999-12-31 23:59:59.00 day 5"},
        {"1900-01-01 12:00:00", "1900-01-01 12:00:00.00 day 1"},
    };
    for (const auto& [clock, expected] : cases) {
        instance_.writeJson(std::string(R"({"clock": ")") + clock + "\"}");
        SqloDateTime got{};
        ASSERT_EQ(sqlogetdatetime(&got), 0);
        EXPECT_EQ(shown(got), expected);
    }

    instance_.writeJson(R"({"clock": "2026-12-06 20:05:39", "faults": {"getDateTime": -7}})");
    SqloDateTime got{};
    EXPECT_EQ(sqlogetdatetime(&got), -7);
    EXPECT_EQ(got.year, 0);
    EXPECT_NE(sqlogetdatetime(nullptr), 0);
}

TEST_F(EngineServicesTest, DateAndTimeWithoutClockIsLocalTime) {
    std::time_t before = std::time(nullptr);
    SqloDateTime got{};
    ASSERT_EQ(sqlogetdatetime(&got), 0);
    std::time_t after = std::time(nullptr);
    std::tm parts{};
    parts.tm_year = got.year - 1900;
    parts.tm_mon = got.month - 1;
    parts.tm_mday = got.day;
    parts.tm_hour = got.hour;
    parts.tm_min = got.minute;
    parts.tm_sec = got.second;
    parts.tm_isdst = -1;
    std::time_t answered = std::mktime(&parts);
    EXPECT_GE(answered, before);
    EXPECT_LE(answered, after);
    EXPECT_EQ(got.weekday, parts.tm_wday);
    EXPECT_LT(got.hundredths, 100);
}

TEST_F(EngineServicesTest, PoolTable) {
    EXPECT_STREQ(sqloGetMemPoolName(0), "agsh");
    EXPECT_STREQ(sqloGetMemPoolDescription(7), "FCMBP Heap");
    EXPECT_STREQ(sqloGetMemPoolName(34), "fcmbp");
    EXPECT_STREQ(sqloGetMemPoolDescription(34), "FCM Resource Heap");
    EXPECT_STREQ(sqloGetMemPoolName(52), "xmlparserh");
    EXPECT_STREQ(sqloGetMemPoolDescription(52), "XML Parser Init Heap");
    for (uint32_t beyond : {53u, UINT32_MAX}) {
        EXPECT_STREQ(sqloGetMemPoolName(beyond), "unknown");
        EXPECT_STREQ(sqloGetMemPoolDescription(beyond), "Unknown Heap");
    }
    // Every identifier of the table has a distinct name but for fcmbp, and
    // a description of its own; ids 0 to 18 and 20 are the standard pools.
    std::set<std::string> names;
    std::set<std::string> descriptions;
    for (uint32_t id = 0; id <= 52; ++id) {
        names.insert(sqloGetMemPoolName(id));
        descriptions.insert(sqloGetMemPoolDescription(id));
        EXPECT_EQ(standin::poolIsInternal(id), id > 18 && id != 20) << id;
    }
    EXPECT_EQ(names.size(), 52u);
    EXPECT_EQ(descriptions.size(), 53u);
    EXPECT_FALSE(standin::poolIsInternal(53));
    EXPECT_EQ(standin::poolIdByName("private"), 45u);
    EXPECT_FALSE(standin::poolIdByName("Private"));
}

}  // namespace
