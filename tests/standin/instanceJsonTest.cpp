// instance.json as the engine reads it: numbers of every width, every mistake
// reported with its path, and the instance that the services see following
// the directory and the file. What each key does is tested through the
// service that it shapes.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "common/instance.h"
#include "engine/vrxapp.h"
#include "engine/vrxsys.h"
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

// The error without its "instance.json: " prefix, which every error carries.
std::string errorOf(const std::string& json) {
    Instance instance;
    std::string error;
    EXPECT_FALSE(standin::parseInstance(json, instance, error)) << json;
    const std::string prefix = "instance.json: ";
    EXPECT_EQ(error.rfind(prefix, 0), 0u) << error;
    return error.substr(std::min(prefix.size(), error.size()));
}

// Keeps VRX_INSTANCE_DIR as the test found it.
class EnvironmentGuard : public ::testing::Test {
  protected:
    void SetUp() override {
        const char* dir = std::getenv("VRX_INSTANCE_DIR");
        saved_ = dir != nullptr ? std::optional<std::string>(dir) : std::nullopt;
    }
    void TearDown() override {
        if (saved_) {
            setenv("VRX_INSTANCE_DIR", saved_->c_str(), 1);
        } else {
            unsetenv("VRX_INSTANCE_DIR");
        }
    }

  private:
    std::optional<std::string> saved_;
};

TEST(InstanceJsonTest, AnEmptyObjectGivesTheDefaults) {
    Instance i = parsed("{}");
    EXPECT_FALSE(i.clock);
    EXPECT_FALSE(i.maxPoolId);
    EXPECT_EQ(i.traceFlags, 0u);
    EXPECT_EQ(i.krcb.multiPartition, 0u);
    EXPECT_EQ(i.krcb.partition, 0);
    EXPECT_EQ(i.krcb.defaultPartition, 0);
    EXPECT_EQ(i.state, standin::State::Started);
    EXPECT_FALSE(i.faults.initApplicationEnvironment || i.faults.allocFailAt);
    EXPECT_EQ(i.faults.maxAllocBytes, uint64_t{1} << 30);
}

// Each width, written as a JSON number and as a hexadecimal string, at and
// beyond its limits.
TEST(InstanceJsonTest, NumbersKeepTheirWidthAndSign) {
    const std::pair<const char*, int64_t> sizes[] = {
        {"-1", -1},
        {"\"0xFFFFFFFFFFFFFFFF\"", -1},
        {"18446744073709551615", -1},
        {"\"0x8000000000000000\"", INT64_MIN},
        {"9223372036854775807", INT64_MAX},
        {"\"0x10\"", 16},
        {"\"0X1f\"", 31},
    };
    for (const auto& [text, current] : sizes) {
        Instance i = parsed(std::string(R"({"pools":[{"id":1,"current":)") + text + "}]}");
        EXPECT_EQ(i.pools.at(0).current, current) << text;
    }
    EXPECT_EQ(parsed(R"({"faults":{"registryRead":-2147483648}})").faults.registryRead, INT32_MIN);
    EXPECT_EQ(parsed(R"({"faults":{"registryRead":"0xFFFFFFFF"}})").faults.registryRead, -1);
    EXPECT_EQ(parsed(R"({"krcb":{"partition":"0xFFFF"}})").krcb.partition, -1);
    EXPECT_EQ(parsed(R"({"krcb":{"partition":-32768}})").krcb.partition, INT16_MIN);
    EXPECT_EQ(parsed(R"({"maxPoolId":4294967295})").maxPoolId, UINT32_MAX);
    EXPECT_EQ(parsed(R"({"faults":{"maxAllocBytes":"0xFFFFFFFFFFFFFFFF"}})").faults.maxAllocBytes,
              UINT64_MAX);
}

TEST(InstanceJsonTest, MistakesAreReportedWithTheirPath) {
    const std::string range = " is out of range for ";
    const std::string u32 = "an unsigned 32-bit number";
    const std::string hex = " (a number or a hexadecimal string of at most 16 digits), got ";
    const std::pair<std::string, std::string> cases[] = {
        // Numbers out of range or malformed.
        {R"({"maxPoolId":-1})", "maxPoolId: -1" + range + u32},
        {R"({"maxPoolId":4294967296})", "maxPoolId: 4294967296" + range + u32},
        {R"({"maxPoolId":"0x100000000"})", "maxPoolId: \"0x100000000\"" + range + u32},
        {R"({"faults":{"sqlaintp":2147483648}})",
         "faults.sqlaintp: 2147483648" + range + "a signed 32-bit number"},
        {R"({"faults":{"sqlaintp":-2147483649}})",
         "faults.sqlaintp: -2147483649" + range + "a signed 32-bit number"},
        {R"({"krcb":{"defaultPartition":32768}})",
         "krcb.defaultPartition: 32768" + range + "a signed 16-bit number"},
        {R"({"krcb":{"partition":"0x10000"}})",
         "krcb.partition: \"0x10000\"" + range + "a signed 16-bit number"},
        {R"({"faults":{"allocFailAt":-1}})",
         "faults.allocFailAt: -1" + range + "an unsigned 64-bit number"},
        {R"({"traceFlags":1.5})", "traceFlags: expected " + u32 + ", got 1.5"},
        {R"({"traceFlags":true})", "traceFlags: expected " + u32 + ", got true"},
        {R"({"traceFlags":"12"})", "traceFlags: expected " + u32 + hex + "\"12\""},
        {R"({"traceFlags":"0x"})", "traceFlags: expected " + u32 + hex + "\"0x\""},
        {R"({"faults":{"messageFail":[1,"x"]}})",
         "faults.messageFail[1]: expected " + u32 + hex + "\"x\""},
        {R"({"pools":[{"id":1,"current":"0x1G"}]})",
         "pools[0].current: expected a 64-bit number" + hex + "\"0x1G\""},
        {R"({"pools":[{"id":1,"current":"0x00000000000000001"}]})",
         "pools[0].current: expected a 64-bit number" + hex + "\"0x00000000000000001\""},
        {R"({"pools":[{"id":1,"current":1e30}]})",
         "pools[0].current: expected a 64-bit number, got 1e+30"},
        // Keys, their values and their combinations.
        {R"({"databases":[{"name":"A"},{"pools":[{"id":1,"curent":5}]}]})",
         "databases[1].pools[0]: unknown key \"curent\""},
        {R"({"clok":"2026-12-06 20:05:39"})", "unknown key \"clok\""},
        {R"({"krcb":{"partitions":1}})", "krcb: unknown key \"partitions\""},
        {R"({"snapshots":{"tables":{}}})", "snapshots: unknown key \"tables\""},
        {R"({"snapshots":{"application":{"toosmall":1}}})",
         "snapshots.application: unknown key \"toosmall\""},
        {R"({"faults":{"allocFail":1}})", "faults: unknown key \"allocFail\""},
        {R"({"applications":[{"number":1,"database":"A"},{"number":2}]})",
         "applications[1]: an application needs \"database\""},
        {R"({"pools":[{"current":1}]})", "pools[0]: a pool needs \"id\" or \"name\""},
        {R"({"privateMemory":[{"pools":[{"name":"nosuch"}]}]})",
         "privateMemory[0].pools[0].name: no pool named \"nosuch\" in the pool table"},
        {R"({"pools":[{"id":3,"name":"dbh"}]})", "pools[0]: pool id 3 is not named \"dbh\""},
        {R"({"state":"running"})",
         "state: expected \"started\", \"stopped\" or \"unauthorized\", got \"running\""},
        {R"({"pools":{}})", "pools: expected an array, got {}"},
        {R"({"databases":[3]})", "databases[0]: expected an object, got 3"},
        {R"({"databases":[{"name":7}]})", "databases[0].name: expected a string, got 7"},
        {R"({"pools":[{"id":1,"bufferPool":null}]})",
         "pools[0].bufferPool: expected a string, got null"},
        {R"({"faults":{"allocFailAt":0}})", "faults.allocFailAt: calls are counted from 1"},
        {R"({"snapshots":{"instance":{"streamFile":"/tmp/stream"}}})",
         "snapshots.instance.streamFile: expected a file relative to the instance directory"},
        {R"([])", "expected an object, got []"},
        {R"({"pools":[{"id":1,"current":1,"current":2}]})", "pools[0]: duplicate key \"current\""},
        {R"({"databases":[{},{"pools":[{"id":1},{"id":2,"id":3}]}]})",
         "databases[1].pools[1]: duplicate key \"id\""},
        {R"({"state":"started","state":"stopped"})", "duplicate key \"state\""},
    };
    for (const auto& [json, error] : cases)
        EXPECT_EQ(errorOf(json), error) << json;
}

TEST(InstanceJsonTest, ClockMustBeARealDateAndTime) {
    EXPECT_TRUE(parsed(R"({"clock":"2000-02-29 00:00:00"})").clock);
    EXPECT_TRUE(parsed(R"({"clock":"2026-12-31 23:59:59"})").clock);
    const std::vector<const char*> invalid = {
        "2026-02-29 10:00:00",  // not a leap year
        "1900-02-29 10:00:00",  // nor is a century not divisible by 400
        "2026-04-31 10:00:00", "2026-13-01 00:00:00", "2026-00-10 00:00:00", "2026-12-00 00:00:00",
        "2026-12-06 24:00:00", "2026-12-06 20:60:00", "2026-12-06 20:05:60", "0000-01-01 00:00:00",
    };
    const std::vector<const char*> malformed = {"2026-12-06T20:05:39", "2026-12-06 20:05",
                                                "26-12-06 20:05:39", "2026-12-06 20:05:39 ",
                                                "2026/12/06 20:05:39"};
    for (const auto& [clocks, reason] :
         {std::pair{invalid, "not a valid date and time: "},
          std::pair{malformed, "expected \"YYYY-MM-DD HH:MM:SS\", got "}}) {
        for (const char* clock : clocks) {
            EXPECT_EQ(errorOf(std::string(R"({"clock":")") + clock + "\"}"),
                      std::string("clock: ") + reason + "\"" + clock + "\"");
        }
    }
}

TEST(InstanceJsonTest, SyntaxErrorsGiveLineAndColumn) {
    // The stray "]" stands in column 17 of line 3.
    std::string error = errorOf("{\n  \"state\": \"started\",\n  \"pools\": [ 1, ]\n}");
    EXPECT_EQ(error.rfind("line 3, column 17: ", 0), 0u) << error;
    EXPECT_NE(error.find("syntax error"), std::string::npos) << error;
    EXPECT_EQ(errorOf("").rfind("line 1, column 1: ", 0), 0u);
    EXPECT_EQ(errorOf("{\"a\": 1}\n\n  x").rfind("line 3, column 3: ", 0), 0u);
}

TEST(InstanceJsonTest, PoolNamesTakeTheFirstIdentifier) {
    // "fcmbp" names both 7 and the internal 34.
    Instance i = parsed(R"({"pools":[{"name":"fcmbp"},{"id":34,"name":"fcmbp"},{"id":900}]})");
    EXPECT_EQ(i.pools.at(0).id, 7u);
    EXPECT_EQ(i.pools.at(1).id, 34u);
    EXPECT_EQ(i.pools.at(2).id, 900u);
}

TEST(InstanceJsonTest, LoadNamesAFileThatIsNoFile) {
    mtrktest::TempInstance instance(false);
    fs::remove(instance.dir() / "instance.json");
    fs::create_directory(instance.dir() / "instance.json");
    Instance loaded;
    std::string error;
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
    // The demo is the one the build prepared, and it is valid.
    EXPECT_TRUE(fs::equivalent(standin::dataDirectory(), VRX_BUILD_DATADIR));
    Instance demo;
    std::string error;
    ASSERT_TRUE(standin::loadInstance(standin::instanceDirectory(), demo, error)) << error;
    EXPECT_FALSE(demo.clock);
    EXPECT_GE(demo.databases.size(), 3u);
    EXPECT_FALSE(demo.faults.initApplicationEnvironment || demo.faults.allocFailAt);
}

TEST_F(InstanceDirectoryTest, SignalSafeFormRefusesWhatDoesNotFit) {
    setenv("VRX_INSTANCE_DIR", "/0123456789", 1);
    char buffer[12];
    EXPECT_TRUE(standin::instanceDirectoryPath(buffer, sizeof buffer));
    EXPECT_STREQ(buffer, "/0123456789");
    EXPECT_FALSE(standin::instanceDirectoryPath(buffer, sizeof buffer - 1));
    EXPECT_STREQ(buffer, "");
}

using CurrentInstanceTest = EnvironmentGuard;

// The services follow a switch of VRX_INSTANCE_DIR at once, and an edit of
// instance.json after the client library's next request, as the monitor
// shows it; between requests they keep what they read.
TEST_F(CurrentInstanceTest, FollowsSwitchesAndEditsAfterARequest) {
    mtrktest::TempInstance first(false);
    mtrktest::TempInstance second(false);
    first.writeJson(R"({"maxPoolId": 11})");
    second.writeJson(R"({"maxPoolId": 22})");
    first.activate();
    EXPECT_EQ(standin::currentInstance().maxPoolId, 11u);
    second.activate();
    EXPECT_EQ(standin::currentInstance().maxPoolId, 22u);
    // Written past the test support, which would note a request.
    std::ofstream(second.dir() / "instance.json", std::ios::trunc) << R"({"maxPoolId": 33})";
    EXPECT_EQ(standin::currentInstance().maxPoolId, 22u);
    // An edit of the same size right after the last read is still seen.
    vrxStandinNoteInstanceRequest();
    EXPECT_EQ(standin::currentInstance().maxPoolId, 33u);
    // A file that is not valid gives the defaults, and a repaired one is
    // read again.
    second.writeJson(R"({"maxPoolId": 44,)");
    EXPECT_FALSE(standin::currentInstance().maxPoolId);
    second.writeJson(R"({"maxPoolId": 55})");
    EXPECT_EQ(standin::currentInstance().maxPoolId, 55u);
    fs::remove(second.dir() / "instance.json");
    vrxStandinNoteInstanceRequest();
    EXPECT_FALSE(standin::currentInstance().maxPoolId);
}

// The services take the settings that the client library's set-up read,
// but only while the file is still the one it read.
TEST_F(CurrentInstanceTest, TakesTheClientLibrarysReadOnlyWhileTheFileIsUnchanged) {
    mtrktest::TempInstance instance(false);
    instance.writeJson(R"({"maxPoolId": 11})");
    instance.activate();
    ASSERT_EQ(sqleInitApplicationEnvironment(0, 0, 1, nullptr), 0);
    EXPECT_EQ(sqloGetMaxMemPoolID(), 11u);
    std::ofstream(instance.dir() / "instance.json", std::ios::trunc) << R"({"maxPoolId": 222})";
    vrxStandinNoteInstanceRequest();
    EXPECT_EQ(sqloGetMaxMemPoolID(), 222u);
    ASSERT_EQ(sqleInitApplicationEnvironment(0, 0, 1, nullptr), 0);
    EXPECT_EQ(sqloGetMaxMemPoolID(), 222u);
}

}  // namespace
