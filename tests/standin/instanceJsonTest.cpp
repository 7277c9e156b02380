// instance.json as the engine reads it: every value, every mistake reported
// with its path, and the instance that the services see following the
// directory and the file.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>

#include "common/instance.h"
#include "testInstance.h"

namespace {

namespace fs = std::filesystem;
using standin::Instance;

Instance parsed(const std::string& json) {
    Instance instance;
    std::string error;
    EXPECT_TRUE(standin::parseInstance(json, instance, error)) << json << "\n" << error;
    return instance;
}

std::string errorOf(const std::string& json) {
    Instance instance;
    std::string error;
    EXPECT_FALSE(standin::parseInstance(json, instance, error)) << json;
    return error;
}

// Keeps VRX_INSTANCE_DIR as the test found it.
class EnvironmentGuard : public ::testing::Test {
  protected:
    void SetUp() override {
        const char* dir = std::getenv("VRX_INSTANCE_DIR");
        hadDir_ = dir != nullptr;
        if (hadDir_)
            savedDir_ = dir;
    }
    void TearDown() override {
        if (hadDir_) {
            setenv("VRX_INSTANCE_DIR", savedDir_.c_str(), 1);
        } else {
            unsetenv("VRX_INSTANCE_DIR");
        }
    }

  private:
    bool hadDir_ = false;
    std::string savedDir_;
};

TEST(InstanceJsonTest, ReadsEveryPartOfAnInstance) {
    Instance i = parsed(R"({
      "clock": "2024-02-29 23:59:58",
      "traceFlags": "0x82",
      "maxPoolId": 60,
      "krcb": { "multiPartition": 1, "partition": -2, "defaultPartition": 3 },
      "state": "unauthorized",
      "pools": [ { "id": 10, "current": 262144, "maximum": 1048576, "highWater": 327680 } ],
      "databases": [ { "name": "SAMPLE",
                       "pools": [ { "name": "bph", "bufferPool": "USERBP1", "current": 8650752 } ] },
                     { "name": "" } ],
      "applications": [ { "number": 17, "database": "SAMPLE",
                          "pools": [ { "name": "apph", "current": 65536 } ] } ],
      "privateMemory": [ { "number": 4, "pools": [ { "name": "private", "highWater": 4 } ] } ],
      "snapshots": { "database": { "sizeRc": -1, "sizeSqlcode": 1606, "takeRc": 2,
                                   "takeSqlcode": -1032, "estimate": 100, "tooSmall": 7,
                                   "streamFile": "streams/db.bin" } },
      "faults": { "initApplicationEnvironment": 5, "getDateTime": -3,
                  "registryRead": "0x870F0104", "registryWrite": 9, "sqlaintp": -1,
                  "messageFail": [ 24, 41 ], "allocFailAt": 3, "maxAllocBytes": 4096 }
    })");
    ASSERT_TRUE(i.clock);
    EXPECT_EQ(i.clock->year, 2024);
    EXPECT_EQ(i.clock->month, 2);
    EXPECT_EQ(i.clock->day, 29);
    EXPECT_EQ(i.clock->hour, 23);
    EXPECT_EQ(i.clock->minute, 59);
    EXPECT_EQ(i.clock->second, 58);
    EXPECT_EQ(i.traceFlags, 0x82u);
    EXPECT_EQ(i.maxPoolId, 60u);
    EXPECT_EQ(i.krcb.multiPartition, 1u);
    EXPECT_EQ(i.krcb.partition, -2);
    EXPECT_EQ(i.krcb.defaultPartition, 3);
    EXPECT_EQ(i.state, standin::State::Unauthorized);

    ASSERT_EQ(i.pools.size(), 1u);
    EXPECT_EQ(i.pools[0].id, 10u);
    EXPECT_EQ(i.pools[0].current, 262144);
    EXPECT_EQ(i.pools[0].maximum, 1048576);
    EXPECT_EQ(i.pools[0].highWater, 327680);
    EXPECT_FALSE(i.pools[0].bufferPool);

    ASSERT_EQ(i.databases.size(), 2u);
    EXPECT_EQ(i.databases[0].name, "SAMPLE");
    ASSERT_EQ(i.databases[0].pools.size(), 1u);
    EXPECT_EQ(i.databases[0].pools[0].id, 3u);
    EXPECT_EQ(i.databases[0].pools[0].bufferPool, "USERBP1");
    EXPECT_FALSE(i.databases[0].pools[0].maximum);
    EXPECT_FALSE(i.databases[0].pools[0].highWater);
    EXPECT_EQ(i.databases[1].name, "");
    EXPECT_TRUE(i.databases[1].pools.empty());

    ASSERT_EQ(i.applications.size(), 1u);
    EXPECT_EQ(i.applications[0].number, 17u);
    EXPECT_EQ(i.applications[0].database, "SAMPLE");
    EXPECT_EQ(i.applications[0].pools.at(0).id, 2u);
    ASSERT_EQ(i.privateMemory.size(), 1u);
    EXPECT_EQ(i.privateMemory[0].number, 4u);
    EXPECT_EQ(i.privateMemory[0].pools.at(0).id, 45u);
    EXPECT_FALSE(i.privateMemory[0].pools.at(0).current);

    const standin::SnapshotAnswer& db =
        i.snapshots[static_cast<int>(standin::SnapshotKind::Database)];
    EXPECT_EQ(db.sizeRc, -1);
    EXPECT_EQ(db.sizeSqlcode, 1606);
    EXPECT_EQ(db.takeRc, 2);
    EXPECT_EQ(db.takeSqlcode, -1032);
    EXPECT_EQ(db.estimate, 100u);
    EXPECT_EQ(db.tooSmall, 7u);
    EXPECT_EQ(db.streamFile, "streams/db.bin");
    const standin::SnapshotAnswer& inst =
        i.snapshots[static_cast<int>(standin::SnapshotKind::Instance)];
    EXPECT_FALSE(inst.estimate);
    EXPECT_FALSE(inst.streamFile);

    EXPECT_EQ(i.faults.initApplicationEnvironment, 5);
    EXPECT_EQ(i.faults.getDateTime, -3);
    EXPECT_EQ(i.faults.registryRead, static_cast<int32_t>(0x870F0104));
    EXPECT_EQ(i.faults.registryWrite, 9);
    EXPECT_EQ(i.faults.sqlaintp, -1);
    EXPECT_EQ(i.faults.messageFail, (std::vector<uint32_t>{24, 41}));
    EXPECT_EQ(i.faults.allocFailAt, 3u);
    EXPECT_EQ(i.faults.maxAllocBytes, 4096u);
}

TEST(InstanceJsonTest, AnEmptyObjectGivesTheDefaults) {
    Instance i = parsed("{}");
    EXPECT_FALSE(i.clock);
    EXPECT_EQ(i.traceFlags, 0u);
    EXPECT_FALSE(i.maxPoolId);
    EXPECT_EQ(i.krcb.multiPartition, 0u);
    EXPECT_EQ(i.state, standin::State::Started);
    EXPECT_TRUE(i.pools.empty() && i.databases.empty() && i.applications.empty());
    EXPECT_FALSE(i.faults.initApplicationEnvironment);
    EXPECT_FALSE(i.faults.allocFailAt);
    EXPECT_EQ(i.faults.maxAllocBytes, uint64_t{1} << 30);
}

// Each width, written as a JSON number and as a hexadecimal string, at and
// beyond its limits.
TEST(InstanceJsonTest, NumbersKeepTheirWidthAndSign) {
    struct Case {
        const char* pool;  // the members of pools[0] after the id
        int64_t current;
    };
    const Case sizes[] = {
        {R"("current": -1)", -1},
        {R"("current": "0xFFFFFFFFFFFFFFFF")", -1},
        {R"("current": 18446744073709551615)", -1},
        {R"("current": "0x8000000000000000")", INT64_MIN},
        {R"("current": 9223372036854775807)", INT64_MAX},
        {R"("current": "0x10")", 16},
        {R"("current": "0X1f")", 31},
    };
    for (const Case& c : sizes) {
        Instance i = parsed(std::string(R"({"pools":[{"id":1,)") + c.pool + "}]}");
        EXPECT_EQ(i.pools.at(0).current, c.current) << c.pool;
    }

    EXPECT_EQ(parsed(R"({"faults":{"registryRead":-2147483648}})").faults.registryRead, INT32_MIN);
    EXPECT_EQ(parsed(R"({"faults":{"registryRead":"0xFFFFFFFF"}})").faults.registryRead, -1);
    EXPECT_EQ(parsed(R"({"krcb":{"partition":"0xFFFF"}})").krcb.partition, -1);
    EXPECT_EQ(parsed(R"({"krcb":{"partition":-32768}})").krcb.partition, INT16_MIN);
    EXPECT_EQ(parsed(R"({"maxPoolId":4294967295})").maxPoolId, UINT32_MAX);
    EXPECT_EQ(parsed(R"({"faults":{"maxAllocBytes":"0xFFFFFFFFFFFFFFFF"}})").faults.maxAllocBytes,
              UINT64_MAX);
}

TEST(InstanceJsonTest, NumbersOutOfRangeOrMalformedAreNamed) {
    struct Case {
        const char* json;
        const char* error;
    };
    const Case cases[] = {
        {R"({"maxPoolId":-1})",
         "instance.json: maxPoolId: -1 is out of range for an unsigned 32-bit number"},
        {R"({"maxPoolId":4294967296})",
         "instance.json: maxPoolId: 4294967296 is out of range for an unsigned 32-bit number"},
        {R"({"maxPoolId":"0x100000000"})",
         "instance.json: maxPoolId: \"0x100000000\" is out of range for an unsigned 32-bit number"},
        {R"({"faults":{"sqlaintp":2147483648}})",
         "instance.json: faults.sqlaintp: 2147483648 is out of range for a signed 32-bit number"},
        {R"({"faults":{"sqlaintp":-2147483649}})",
         "instance.json: faults.sqlaintp: -2147483649 is out of range for a signed 32-bit number"},
        {R"({"krcb":{"defaultPartition":32768}})",
         "instance.json: krcb.defaultPartition: 32768 is out of range for a signed 16-bit number"},
        {R"({"krcb":{"partition":"0x10000"}})",
         "instance.json: krcb.partition: \"0x10000\" is out of range for a signed 16-bit number"},
        {R"({"faults":{"allocFailAt":-1}})",
         "instance.json: faults.allocFailAt: -1 is out of range for an unsigned 64-bit number"},
        {R"({"traceFlags":1.5})",
         "instance.json: traceFlags: expected an unsigned 32-bit number, got 1.5"},
        {R"({"traceFlags":true})",
         "instance.json: traceFlags: expected an unsigned 32-bit number, got true"},
        {R"({"traceFlags":"12"})",
         "instance.json: traceFlags: expected an unsigned 32-bit number (a number or a "
         "hexadecimal string of at most 16 digits), got \"12\""},
        {R"({"traceFlags":"0x"})",
         "instance.json: traceFlags: expected an unsigned 32-bit number (a number or a "
         "hexadecimal string of at most 16 digits), got \"0x\""},
        {R"({"pools":[{"id":1,"current":"0x1G"}]})",
         "instance.json: pools[0].current: expected a 64-bit number (a number or a hexadecimal "
         "string of at most 16 digits), got \"0x1G\""},
        {R"({"pools":[{"id":1,"current":"0x00000000000000001"}]})",
         "instance.json: pools[0].current: expected a 64-bit number (a number or a hexadecimal "
         "string of at most 16 digits), got \"0x00000000000000001\""},
        {R"({"pools":[{"id":1,"current":1e30}]})",
         "instance.json: pools[0].current: expected a 64-bit number, got 1e+30"},
    };
    for (const Case& c : cases)
        EXPECT_EQ(errorOf(c.json), c.error) << c.json;
}

TEST(InstanceJsonTest, MistakesAreReportedWithTheirPath) {
    struct Case {
        const char* json;
        const char* error;
    };
    const Case cases[] = {
        {R"({"databases":[{"name":"A"},{"pools":[{"id":1,"curent":5}]}]})",
         "instance.json: databases[1].pools[0]: unknown key \"curent\""},
        {R"({"clok":"2026-12-06 20:05:39"})", "instance.json: unknown key \"clok\""},
        {R"({"krcb":{"partitions":1}})", "instance.json: krcb: unknown key \"partitions\""},
        {R"({"snapshots":{"tables":{}}})", "instance.json: snapshots: unknown key \"tables\""},
        {R"({"snapshots":{"application":{"toosmall":1}}})",
         "instance.json: snapshots.application: unknown key \"toosmall\""},
        {R"({"faults":{"allocFail":1}})", "instance.json: faults: unknown key \"allocFail\""},
        {R"({"applications":[{"number":1,"database":"A"},{"number":2}]})",
         "instance.json: applications[1]: an application needs \"database\""},
        {R"({"pools":[{"current":1}]})",
         "instance.json: pools[0]: a pool needs \"id\" or \"name\""},
        {R"({"privateMemory":[{"pools":[{"name":"nosuch"}]}]})",
         "instance.json: privateMemory[0].pools[0].name: no pool named \"nosuch\" in the pool "
         "table"},
        {R"({"pools":[{"id":3,"name":"dbh"}]})",
         "instance.json: pools[0]: pool id 3 is not named \"dbh\""},
        {R"({"state":"running"})",
         "instance.json: state: expected \"started\", \"stopped\" or \"unauthorized\", got "
         "\"running\""},
        {R"({"pools":{}})", "instance.json: pools: expected an array, got {}"},
        {R"({"databases":[3]})", "instance.json: databases[0]: expected an object, got 3"},
        {R"({"databases":[{"name":7}]})",
         "instance.json: databases[0].name: expected a string, got 7"},
        {R"({"pools":[{"id":1,"bufferPool":null}]})",
         "instance.json: pools[0].bufferPool: expected a string, got null"},
        {R"({"faults":{"messageFail":[1,"x"]}})",
         "instance.json: faults.messageFail[1]: expected an unsigned 32-bit number (a number or a "
         "hexadecimal string of at most 16 digits), got \"x\""},
        {R"({"faults":{"allocFailAt":0}})",
         "instance.json: faults.allocFailAt: calls are counted from 1"},
        {R"({"snapshots":{"instance":{"streamFile":"/tmp/stream"}}})",
         "instance.json: snapshots.instance.streamFile: expected a file relative to the instance "
         "directory"},
        {R"([])", "instance.json: expected an object, got []"},
        {R"({"pools":[{"id":1,"current":1,"current":2}]})",
         "instance.json: pools[0]: duplicate key \"current\""},
        {R"({"databases":[{},{"pools":[{"id":1},{"id":2,"id":3}]}]})",
         "instance.json: databases[1].pools[1]: duplicate key \"id\""},
        {R"({"state":"started","state":"stopped"})", "instance.json: duplicate key \"state\""},
    };
    for (const Case& c : cases)
        EXPECT_EQ(errorOf(c.json), c.error) << c.json;
}

TEST(InstanceJsonTest, ClockMustBeARealDateAndTime) {
    EXPECT_TRUE(parsed(R"({"clock":"2000-02-29 00:00:00"})").clock);
    EXPECT_TRUE(parsed(R"({"clock":"2026-12-31 23:59:59"})").clock);
    const char* bad[] = {
        "2026-02-29 10:00:00",  // not a leap year
        "1900-02-29 10:00:00",  // nor is a century not divisible by 400
        "2026-04-31 10:00:00", "2026-13-01 00:00:00", "2026-00-10 00:00:00", "2026-12-00 00:00:00",
        "2026-12-06 24:00:00", "2026-12-06 20:60:00", "2026-12-06 20:05:60", "0000-01-01 00:00:00",
    };
    for (const char* clock : bad) {
        EXPECT_EQ(
            errorOf(std::string(R"({"clock":")") + clock + "\"}"),
            std::string("instance.json: clock: not a valid date and time: \"") + clock + "\"");
    }
    const char* malformed[] = {"2026-12-06T20:05:39", "2026-12-06 20:05", "26-12-06 20:05:39",
                               "2026-12-06 20:05:39 ", "2026/12/06 20:05:39"};
    for (const char* clock : malformed) {
        EXPECT_EQ(errorOf(std::string(R"({"clock":")") + clock + "\"}"),
                  std::string("instance.json: clock: expected \"YYYY-MM-DD HH:MM:SS\", got \"") +
                      clock + "\"");
    }
}

TEST(InstanceJsonTest, SyntaxErrorsGiveLineAndColumn) {
    // The stray "]" stands in column 17 of line 3.
    std::string error = errorOf("{\n  \"state\": \"started\",\n  \"pools\": [ 1, ]\n}");
    EXPECT_EQ(error.rfind("instance.json: line 3, column 17: ", 0), 0u) << error;
    EXPECT_NE(error.find("syntax error"), std::string::npos) << error;

    error = errorOf("");
    EXPECT_EQ(error.rfind("instance.json: line 1, column 1: ", 0), 0u) << error;
    error = errorOf("{\"a\": 1}\n\n  x");
    EXPECT_EQ(error.rfind("instance.json: line 3, column 3: ", 0), 0u) << error;
}

TEST(InstanceJsonTest, PoolNamesTakeTheFirstIdentifier) {
    // "fcmbp" names both 7 and the internal 34.
    Instance i = parsed(R"({"pools":[{"name":"fcmbp"},{"id":34,"name":"fcmbp"},{"id":900}]})");
    EXPECT_EQ(i.pools.at(0).id, 7u);
    EXPECT_EQ(i.pools.at(1).id, 34u);
    EXPECT_EQ(i.pools.at(2).id, 900u);
}

TEST(InstanceJsonTest, LoadNamesAFileThatIsMissing) {
    mtrktest::TempInstance instance(false);
    fs::remove(instance.dir() / "instance.json");
    Instance loaded;
    std::string error;
    EXPECT_FALSE(standin::loadInstance(instance.dir(), loaded, error));
    EXPECT_EQ(error, "instance.json cannot be opened: No such file or directory");
    fs::create_directory(instance.dir() / "instance.json");
    EXPECT_FALSE(standin::loadInstance(instance.dir(), loaded, error));
    EXPECT_EQ(error, "instance.json is not a regular file");
}

using InstanceDirectoryTest = EnvironmentGuard;

TEST_F(InstanceDirectoryTest, FollowsTheEnvironmentElseTheDemo) {
    setenv("VRX_INSTANCE_DIR", "/some/where", 1);
    EXPECT_EQ(standin::instanceDirectory(), fs::path("/some/where"));
    setenv("VRX_INSTANCE_DIR", "", 1);
    EXPECT_EQ(standin::instanceDirectory(), standin::dataDirectory() / "demo");
    unsetenv("VRX_INSTANCE_DIR");
    EXPECT_EQ(standin::instanceDirectory(), standin::dataDirectory() / "demo");
    // The demo is the one the build prepared.
    EXPECT_TRUE(fs::equivalent(standin::dataDirectory(), VRX_BUILD_DATADIR));
    EXPECT_TRUE(fs::is_regular_file(standin::instanceDirectory() / "instance.json"));
}

TEST_F(InstanceDirectoryTest, SignalSafeFormRefusesWhatDoesNotFit) {
    setenv("VRX_INSTANCE_DIR", "/0123456789", 1);
    char buffer[12];
    EXPECT_TRUE(standin::instanceDirectoryPath(buffer, sizeof buffer));
    EXPECT_STREQ(buffer, "/0123456789");
    EXPECT_FALSE(standin::instanceDirectoryPath(buffer, sizeof buffer - 1));
    EXPECT_STREQ(buffer, "");
}

TEST_F(InstanceDirectoryTest, DemoInstanceIsValid) {
    unsetenv("VRX_INSTANCE_DIR");
    Instance demo;
    std::string error;
    ASSERT_TRUE(standin::loadInstance(standin::instanceDirectory(), demo, error)) << error;
    EXPECT_FALSE(demo.clock);
    EXPECT_GE(demo.databases.size(), 3u);
    EXPECT_FALSE(demo.faults.initApplicationEnvironment || demo.faults.allocFailAt);
}

using CurrentInstanceTest = EnvironmentGuard;

TEST_F(CurrentInstanceTest, FollowsSwitchesAndEdits) {
    mtrktest::TempInstance first(false);
    mtrktest::TempInstance second(false);
    first.writeJson(R"({"maxPoolId": 11})");
    second.writeJson(R"({"maxPoolId": 22})");
    first.activate();
    EXPECT_EQ(standin::currentInstance().maxPoolId, 11u);
    second.activate();
    EXPECT_EQ(standin::currentInstance().maxPoolId, 22u);
    // An edit of the same size right after the last one is still seen.
    second.writeJson(R"({"maxPoolId": 33})");
    EXPECT_EQ(standin::currentInstance().maxPoolId, 33u);
    // A file that is not valid gives the defaults, and a repaired one is
    // read again.
    second.writeJson(R"({"maxPoolId": 44,)");
    EXPECT_FALSE(standin::currentInstance().maxPoolId);
    second.writeJson(R"({"maxPoolId": 55})");
    EXPECT_EQ(standin::currentInstance().maxPoolId, 55u);
    fs::remove(second.dir() / "instance.json");
    EXPECT_FALSE(standin::currentInstance().maxPoolId);
}

}  // namespace
