// The streaming reader of instance.json against the thorough parser: every
// text that the fast reader vouches for must mean to it exactly what it
// means to the thorough one, and every plain text that the thorough parser
// accepts must be one that the fast reader vouches for (else large instances
// would silently take the slow road). Also the stream written while reading,
// and when a file read earlier counts as unchanged.
#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdint>
#include <ctime>
#include <string>
#include <thread>
#include <vector>

#include "common/instance.h"
#include "common/instanceReader.h"
#include "common/monitorCall.h"
#include "engine/vrxapp.h"
#include "testInstance.h"

namespace {

using standin::Instance;
using standin::InstanceSink;
using standin::PoolList;
using standin::PoolRead;
using standin::SectionRead;

standin::Pool poolOf(const PoolRead& read) {
    standin::Pool pool;
    pool.id = read.id;
    if (read.hasCurrent)
        pool.current = read.current;
    if (read.hasMaximum)
        pool.maximum = read.maximum;
    if (read.hasHighWater)
        pool.highWater = read.highWater;
    if (read.hasBufferPool)
        pool.bufferPool = std::string(read.bufferPool);
    return pool;
}

// Puts the pool lists that a reader hands on back into an instance, and
// notes the order in which the lists ended.
class Collector : public InstanceSink {
  public:
    void restart() override {
        lists = Instance{};
        ended.clear();
    }
    void instancePools(std::span<const PoolRead> pools) override {
        for (const PoolRead& pool : pools)
            lists.pools.push_back(poolOf(pool));
    }
    void section(PoolList list, const SectionRead& section) override {
        std::vector<standin::Pool> pools;
        for (const PoolRead& pool : section.pools)
            pools.push_back(poolOf(pool));
        switch (list) {
            case PoolList::Databases:
                lists.databases.push_back({std::string(section.name), pools});
                break;
            case PoolList::Applications:
                lists.applications.push_back({section.number, std::string(section.name), pools});
                break;
            default:
                lists.privateMemory.push_back({section.number, pools});
                break;
        }
    }
    void endList(PoolList list) override { ended.push_back(list); }

    Instance lists;
    std::vector<PoolList> ended;
};

// Every field of two instances, compared one by one so that a difference
// names itself.
void expectSame(const Instance& a, const Instance& b, const std::string& context) {
    SCOPED_TRACE(context);
    ASSERT_EQ(a.clock.has_value(), b.clock.has_value());
    if (a.clock) {
        EXPECT_EQ(a.clock->year, b.clock->year);
        EXPECT_EQ(a.clock->month, b.clock->month);
        EXPECT_EQ(a.clock->day, b.clock->day);
        EXPECT_EQ(a.clock->hour, b.clock->hour);
        EXPECT_EQ(a.clock->minute, b.clock->minute);
        EXPECT_EQ(a.clock->second, b.clock->second);
    }
    EXPECT_EQ(a.traceFlags, b.traceFlags);
    EXPECT_EQ(a.maxPoolId, b.maxPoolId);
    EXPECT_EQ(a.krcb.multiPartition, b.krcb.multiPartition);
    EXPECT_EQ(a.krcb.partition, b.krcb.partition);
    EXPECT_EQ(a.krcb.defaultPartition, b.krcb.defaultPartition);
    EXPECT_EQ(a.state, b.state);
    auto samePools = [](const std::vector<standin::Pool>& x, const std::vector<standin::Pool>& y) {
        ASSERT_EQ(x.size(), y.size());
        for (size_t i = 0; i < x.size(); ++i) {
            EXPECT_EQ(x[i].id, y[i].id) << i;
            EXPECT_EQ(x[i].current, y[i].current) << i;
            EXPECT_EQ(x[i].maximum, y[i].maximum) << i;
            EXPECT_EQ(x[i].highWater, y[i].highWater) << i;
            EXPECT_EQ(x[i].bufferPool, y[i].bufferPool) << i;
        }
    };
    samePools(a.pools, b.pools);
    ASSERT_EQ(a.databases.size(), b.databases.size());
    for (size_t i = 0; i < a.databases.size(); ++i) {
        EXPECT_EQ(a.databases[i].name, b.databases[i].name);
        samePools(a.databases[i].pools, b.databases[i].pools);
    }
    ASSERT_EQ(a.applications.size(), b.applications.size());
    for (size_t i = 0; i < a.applications.size(); ++i) {
        EXPECT_EQ(a.applications[i].number, b.applications[i].number);
        EXPECT_EQ(a.applications[i].database, b.applications[i].database);
        samePools(a.applications[i].pools, b.applications[i].pools);
    }
    ASSERT_EQ(a.privateMemory.size(), b.privateMemory.size());
    for (size_t i = 0; i < a.privateMemory.size(); ++i) {
        EXPECT_EQ(a.privateMemory[i].number, b.privateMemory[i].number);
        samePools(a.privateMemory[i].pools, b.privateMemory[i].pools);
    }
    for (int k = 0; k < 3; ++k) {
        const auto& x = a.snapshots[k];
        const auto& y = b.snapshots[k];
        EXPECT_EQ(x.sizeRc, y.sizeRc) << k;
        EXPECT_EQ(x.sizeSqlcode, y.sizeSqlcode) << k;
        EXPECT_EQ(x.takeRc, y.takeRc) << k;
        EXPECT_EQ(x.takeSqlcode, y.takeSqlcode) << k;
        EXPECT_EQ(x.estimate, y.estimate) << k;
        EXPECT_EQ(x.tooSmall, y.tooSmall) << k;
        EXPECT_EQ(x.streamFile, y.streamFile) << k;
    }
    const auto& f = a.faults;
    const auto& g = b.faults;
    EXPECT_EQ(f.initApplicationEnvironment, g.initApplicationEnvironment);
    EXPECT_EQ(f.getDateTime, g.getDateTime);
    EXPECT_EQ(f.registryRead, g.registryRead);
    EXPECT_EQ(f.registryWrite, g.registryWrite);
    EXPECT_EQ(f.sqlaintp, g.sqlaintp);
    EXPECT_EQ(f.messageFail, g.messageFail);
    EXPECT_EQ(f.allocFailAt, g.allocFailAt);
    EXPECT_EQ(f.maxAllocBytes, g.maxAllocBytes);
}

// The fast reader's settings with the lists it handed on.
Instance combined(Instance settings, Collector& collector) {
    settings.pools = std::move(collector.lists.pools);
    settings.databases = std::move(collector.lists.databases);
    settings.applications = std::move(collector.lists.applications);
    settings.privateMemory = std::move(collector.lists.privateMemory);
    return settings;
}

// What readInstanceFile makes of `instance`'s instance.json, with the
// order in which its pool lists ended.
struct FileRead {
    Instance instance;
    std::vector<PoolList> ended;
};

FileRead readFile(const mtrktest::TempInstance& instance) {
    Instance settings;
    Collector collector;
    std::string error;
    EXPECT_TRUE(
        standin::readInstanceFile(instance.dir().c_str(), settings, collector, error, nullptr))
        << error;
    std::vector<PoolList> ended = collector.ended;
    return {combined(settings, collector), ended};
}

struct Verdicts {
    bool fast;
    bool thorough;
};

// Reads `json` both ways; whenever the fast reader vouches for it, the
// thorough parser must accept it with the same meaning.
Verdicts readBoth(const std::string& json) {
    Instance settings;
    Collector collector;
    bool fast = standin::readInstanceText(json, settings, collector);
    Instance thorough;
    std::string error;
    bool accepted = standin::parseInstance(json, thorough, error);
    if (fast) {
        EXPECT_TRUE(accepted) << "the fast reader vouched for what is not valid:\n"
                              << json << "\n"
                              << error;
        if (accepted) {
            EXPECT_TRUE(settings.pools.empty() && settings.databases.empty() &&
                        settings.applications.empty() && settings.privateMemory.empty());
            expectSame(combined(settings, collector), thorough, json);
        }
    }
    return {fast, accepted};
}

// Touches every key, both number forms, every pool shape and the section
// keys in unusual orders.
const std::string kRich = R"({
  "clock": "2028-02-29 23:59:59", "traceFlags": "0xFFFFFFFF", "maxPoolId": 52,
  "krcb": {"multiPartition": 4294967295, "partition": -32768, "defaultPartition": "0xFFFF"},
  "state": "stopped",
  "pools": [{"id": 10, "current": 262144, "maximum": "0xFFFFFFFFFFFFFFFF", "highWater": -1},
            {"name": "other"}, {"name": "fcmbp", "id": 34, "current": 0},
            {"bufferPool": "A \"quoted\" \\ name\t/", "id": 3, "highWater": 9223372036854775807}],
  "privateMemory": [{"pools": [{"name": "private", "current": 4194304}], "number": 7},
                    {"number": 0}],
  "databases": [{"pools": [{"id": 20, "current": 1}], "name": "SAMPLE"}, {}, {"name": ""}],
  "applications": [{"database": "SAMPLE", "number": 17, "pools": [{"name": "apph", "current": -0}]},
                   {"pools": [], "database": "B"}],
  "snapshots": {"instance": {"sizeRc": -2147483648, "sizeSqlcode": "0x80000000", "takeRc": 0,
                             "takeSqlcode": 1606, "estimate": 4294967295, "tooSmall": 3,
                             "streamFile": "s/x.bin"},
                "application": {}},
  "faults": {"initApplicationEnvironment": 5, "getDateTime": -1, "registryRead": "0x870F0104",
             "registryWrite": 2, "sqlaintp": 3, "messageFail": [24, 41, 0],
             "allocFailAt": 1, "maxAllocBytes": 18446744073709551615}
}
)";

TEST(InstanceReaderTest, MeansWhatTheThoroughParserMeans) {
    const std::string valid[] = {
        kRich,
        "{}",
        " \t\r\n{ } \n",
        R"({"pools":[]})",
        R"({"pools":[{"id":0}],"databases":[],"applications":[],"privateMemory":[]})",
        R"({"faults":{"messageFail":[]},"snapshots":{},"krcb":{}})",
        R"({"pools":[{"id":4294967295,"current":"0x0","maximum":"0X10","highWater":"0xaBc"}]})",
        R"({"pools":[{"id":1,"current":-9223372036854775808,"maximum":18446744073709551615}]})",
        R"({"clock":"0001-01-01 00:00:00","state":"unauthorized","maxPoolId":-0})",
        R"({"applications":[{"database":"\/\b\f\n\r"}]})",
    };
    for (const std::string& json : valid) {
        Verdicts v = readBoth(json);
        EXPECT_TRUE(v.fast) << json;
        EXPECT_TRUE(v.thorough) << json;
    }
}

TEST(InstanceReaderTest, VouchesForNothingThatIsNotValid) {
    const std::string invalid[] = {
        "",
        "[]",
        "{}{}",
        "{} x",
        "{",
        R"({"maxPoolId":01})",
        R"({"maxPoolId":-})",
        R"({"maxPoolId":1.})",
        R"({"maxPoolId":1.0})",
        R"({"maxPoolId":1e2})",
        R"({"maxPoolId":+1})",
        R"({"maxPoolId":null})",
        R"({"maxPoolId":true})",
        R"({"maxPoolId":4294967296})",
        R"({"maxPoolId":"0x"})",
        R"({"maxPoolId":"0x100000000"})",
        R"({"maxPoolId":"x1"})",
        R"({"pools":[{"id":1,"current":18446744073709551616}]})",
        R"({"pools":[{"id":1,"current":-9223372036854775809}]})",
        R"({"pools":[{"id":1,"current":"0x00000000000000001"}]})",
        R"({"pools":[{"id":1},]})",
        R"({"pools":[{"id":1,}]})",
        R"({"pools":[{"id" 1}]})",
        R"({"pools":[{"id":1 "current":2}]})",
        R"({"pools":[{"current":2}]})",
        R"({"pools":[{"name":"nosuch"}]})",
        R"({"pools":[{"name":"apph","id":3}]})",
        R"({"pools":[{"id":1,"id":1}]})",
        R"({"pools":{}})",
        R"({"pools":[[]]})",
        R"({"databases":[{"name":1}]})",
        R"({"applications":[{"number":1}]})",
        R"({"privateMemory":[{"number":-1}]})",
        R"({"clock":"2027-02-29 00:00:00"})",
        R"({"clock":"2026-12-06T20:05:39"})",
        R"({"clock":"2026-13-06 20:05:39"})",
        R"({"state":"started "})",
        R"({"krcb":{"partition":32768}})",
        R"({"snapshots":{"instance":{"streamFile":"/abs"}}})",
        R"({"snapshots":{"instance":{"streamFile":""}}})",
        R"({"snapshots":{"other":{}}})",
        R"({"faults":{"allocFailAt":0}})",
        R"({"faults":{"sqlaintp":2147483648}})",
        R"({"faults":{"messageFail":[1,-1]}})",
        R"({"faults":{"messageFail":1}})",
        "{\"applications\":[{\"database\":\"a\x01\"}]}",
        R"({"applications":[{"database":"a\x"}]})",
        R"({"applications":[{"database":"a)",
        R"({"clock":"2026-12-06 20:05:39","clock":"2026-12-06 20:05:39"})",
    };
    for (const std::string& json : invalid) {
        Verdicts v = readBoth(json);
        EXPECT_FALSE(v.fast) << json;
        EXPECT_FALSE(v.thorough) << json;
    }
}

// What the fast reader leaves alone still reads as the thorough parser has
// it, through the same sink.
TEST(InstanceReaderTest, LeavesUnusualFormsToTheThoroughParser) {
    mtrktest::TempInstance instance(false);
    const std::string unusual[] = {
        R"({"databases":[{"name":"\u0053AMPLE","pools":[{"id":20,"current":1}]}]})",
        "{\"databases\":[{\"name\":\"M\xC3\xBCnchen\"}]}",
        "\xEF\xBB\xBF{\"maxPoolId\":3}",
        R"({"\u006daxPoolId":3})",
    };
    for (const std::string& json : unusual) {
        Verdicts v = readBoth(json);
        EXPECT_FALSE(v.fast) << json;
        ASSERT_TRUE(v.thorough) << json;

        instance.writeJson(json);
        Instance thorough;
        std::string error;
        ASSERT_TRUE(standin::parseInstance(json, thorough, error));
        expectSame(readFile(instance).instance, thorough, json);
    }
}

// Single-byte changes of a rich text, deterministically: whatever the fast
// reader vouches for is valid and means the same; whatever plain text is
// valid, it vouches for.
TEST(InstanceReaderTest, AgreesOnMutatedTexts) {
    const std::string alphabet = "{}[],:\"\\ -0123456789xaeE.tnu/";
    uint64_t state = 0x9E3779B97F4A7C15u;
    auto next = [&state] {
        state = state * 6364136223846793005u + 1442695040888963407u;
        return state >> 33;
    };
    int fastAccepted = 0;
    for (int round = 0; round < 3000; ++round) {
        std::string json = kRich;
        size_t at = next() % json.size();
        switch (next() % 3) {
            case 0:
                json[at] = alphabet[next() % alphabet.size()];
                break;
            case 1:
                json.erase(at, 1 + next() % 3);
                break;
            default:
                json.insert(at, 1, alphabet[next() % alphabet.size()]);
                break;
        }
        Verdicts v = readBoth(json);
        bool plain = json.find("\\u") == std::string::npos;
        if (v.thorough && plain) {
            EXPECT_TRUE(v.fast) << "a valid plain text left to the thorough parser:\n" << json;
        }
        fastAccepted += v.fast;
    }
    // Most changes break the text; enough must survive for the check to mean
    // something.
    EXPECT_GT(fastAccepted, 300);
}

// Writes an instance large enough that values straddle the reader's buffers.
std::string largeInstance(int applications) {
    std::string json = R"({"databases":[{"name":"DB","pools":[{"id":20,"current":5}]}],)"
                       R"("applications":[)";
    for (int a = 0; a < applications; ++a) {
        json += a == 0 ? "" : ",";
        json += R"({"number":)" + std::to_string(a) + R"(,"database":"DB)" + std::to_string(a % 7) +
                R"(","pools":[)";
        for (int p = 0; p < 8; ++p) {
            json += p == 0 ? "" : ",";
            json += R"({"name":"apph","current":)" + std::to_string(a * 1000003LL + p) +
                    R"(,"bufferPool":"BP)" + std::to_string(a) + R"("})";
        }
        json += "]}";
    }
    return json + "]}";
}

TEST(InstanceReaderTest, ReadsFilesOfAnySizeAsTheThoroughParserDoes) {
    mtrktest::TempInstance instance(false);
    for (int applications : {0, 1, 5000}) {
        std::string json = largeInstance(applications);
        instance.writeJson(json);
        Instance thorough;
        std::string error;
        ASSERT_TRUE(standin::loadInstance(instance.dir(), thorough, error)) << error;
        FileRead read = readFile(instance);
        expectSame(read.instance, thorough, std::to_string(applications));
        EXPECT_EQ(read.ended, (std::vector<PoolList>{PoolList::Databases, PoolList::Applications}));
    }
}

TEST(InstanceReaderTest, FailsWithTheThoroughParsersWords) {
    mtrktest::TempInstance instance(false);
    const std::string cases[] = {R"({"pools":[{"id":1,"curent":5}]})", "{\"maxPoolId\":", ""};
    for (const std::string& json : cases) {
        instance.writeJson(json);
        Instance settings;
        InstanceSink ignore;
        std::string fast;
        std::string thorough;
        Instance unused;
        EXPECT_FALSE(
            standin::readInstanceFile(instance.dir().c_str(), settings, ignore, fast, nullptr));
        EXPECT_FALSE(standin::loadInstance(instance.dir(), unused, thorough));
        EXPECT_EQ(fast, thorough);
    }
    std::filesystem::remove(instance.dir() / "instance.json");
    standin::FileStamp stamp;
    Instance settings;
    InstanceSink ignore;
    std::string error;
    EXPECT_FALSE(
        standin::readInstanceFile(instance.dir().c_str(), settings, ignore, error, &stamp));
    EXPECT_EQ(error, "instance.json cannot be opened: No such file or directory");
    EXPECT_FALSE(stamp.exists);
}

// The whole stream of one object type that the monitor serves for `json`,
// with the internal pools shown or not.
std::string served(const mtrktest::TempInstance& instance, const std::string& json,
                   uint32_t objectType, bool internal) {
    instance.writeJson(json);
    instance.writeFile("registry", internal ? "VRXMEMTRK=1\n" : "");
    standin::MonitorCall call(objectType);
    EXPECT_EQ(call.askSize(), 0);
    EXPECT_EQ(call.ca.sqlcode, 0);
    std::string bytes(call.estimate + 16, '\xA5');
    EXPECT_EQ(call.takeInto(bytes.data(), call.estimate), 0);
    EXPECT_EQ(call.ca.sqlcode, 0);
    EXPECT_EQ(bytes.substr(call.estimate), std::string(16, '\xA5')) << "written past the buffer";
    return bytes.substr(0, call.estimate);
}

// The order of keys and lists in the file leaves the stream alone: the
// stream has each section's fields before its pools, and the applications
// before the private memory sections.
TEST(InstanceReaderTest, StreamsDoNotDependOnTheOrderOfKeys) {
    mtrktest::TempInstance instance(false);
    instance.activate();
    const std::string canonical =
        R"({"pools":[{"id":10,"current":1},{"id":19,"current":2}],)"
        R"("databases":[{"name":"A","pools":[{"id":3,"bufferPool":"BP","current":3}]}],)"
        R"("applications":[{"number":1,"database":"A","pools":[{"id":2,"current":4}]}],)"
        R"("privateMemory":[{"number":2,"pools":[{"id":45,"current":5}]}]})";
    const std::string shuffled =
        R"({"privateMemory":[{"pools":[{"current":5,"id":45}],"number":2}],)"
        R"("applications":[{"pools":[{"current":4,"id":2}],"database":"A","number":1}],)"
        R"("databases":[{"pools":[{"current":3,"bufferPool":"BP","id":3}],"name":"A"}],)"
        R"("pools":[{"current":1,"id":10},{"current":2,"id":19}]})";
    for (uint32_t type : {VRX_OBJ_INSTANCE, VRX_OBJ_DATABASE, VRX_OBJ_APPLICATION}) {
        for (bool internal : {false, true}) {
            std::string expected = served(instance, canonical, type, internal);
            EXPECT_EQ(served(instance, shuffled, type, internal), expected)
                << type << " " << internal;
        }
    }
    // Internal pools (19, 45) are in the stream only when shown.
    EXPECT_LT(served(instance, canonical, VRX_OBJ_INSTANCE, false).size(),
              served(instance, canonical, VRX_OBJ_INSTANCE, true).size());
    EXPECT_LT(served(instance, shuffled, VRX_OBJ_APPLICATION, false).size(),
              served(instance, shuffled, VRX_OBJ_APPLICATION, true).size());
}

// Waits until the file system's clock has passed the file's last change.
void waitPastChange(const std::filesystem::path& file) {
    struct stat st {};
    ASSERT_EQ(stat(file.c_str(), &st), 0);
    for (int i = 0; i < 1500; ++i) {
        timespec now{};
        clock_gettime(CLOCK_REALTIME_COARSE, &now);
        if (now.tv_sec > st.st_ctim.tv_sec + (st.st_ctim.tv_nsec == 0 ? 1 : 0) ||
            (now.tv_sec == st.st_ctim.tv_sec && now.tv_nsec > st.st_ctim.tv_nsec)) {
            return;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    FAIL() << "the clock did not pass the file's change time";
}

TEST(InstanceReaderTest, AFileReadAfterItsChangeStaysCurrentUntilTheNextChange) {
    mtrktest::TempInstance instance(false);
    const std::filesystem::path file = instance.dir() / "instance.json";
    instance.writeJson(R"({"maxPoolId": 11})");
    waitPastChange(file);

    auto read = [&] {
        standin::FileStamp stamp;
        Instance settings;
        InstanceSink ignore;
        std::string error;
        standin::readInstanceFile(instance.dir().c_str(), settings, ignore, error, &stamp);
        return stamp;
    };
    standin::FileStamp stamp = read();
    EXPECT_TRUE(stamp.exists);
    EXPECT_TRUE(standin::stillCurrent(file.c_str(), stamp));
    EXPECT_TRUE(standin::stillCurrent(file.c_str(), stamp)) << "asking does not change it";

    // The same size, written right away: the times show it.
    instance.writeJson(R"({"maxPoolId": 22})");
    EXPECT_FALSE(standin::stillCurrent(file.c_str(), stamp));
    // Read within the tick of that change, the file may yet change unseen.
    standin::FileStamp early = read();
    timespec now{};
    clock_gettime(CLOCK_REALTIME_COARSE, &now);
    struct stat st {};
    ASSERT_EQ(stat(file.c_str(), &st), 0);
    if (early.readStart.tv_sec == st.st_ctim.tv_sec &&
        early.readStart.tv_nsec <= st.st_ctim.tv_nsec) {
        EXPECT_FALSE(standin::stillCurrent(file.c_str(), early));
    }

    std::filesystem::remove(file);
    EXPECT_FALSE(standin::stillCurrent(file.c_str(), stamp));
    standin::FileStamp missing = read();
    EXPECT_FALSE(missing.exists);
    EXPECT_TRUE(standin::stillCurrent(file.c_str(), missing));
    instance.writeJson("{}");
    EXPECT_FALSE(standin::stillCurrent(file.c_str(), missing));
}

}  // namespace
