// The stand-in's snapshot monitor through its C interface: the streams it
// writes, the answers instance.json shapes, request checks and buffer bounds.
#include <gtest/gtest.h>

#include <cstring>
#include <optional>
#include <string>
#include <vector>

#include "app/snapshotCodes.h"
#include "common/monitorCall.h"
#include "engine/vrxapp.h"
#include "streamBuilder.h"
#include "testInstance.h"

using mtrktest::StreamBuilder;
using mtrktest::wrapElement;
using mtrktest::wrapStream;
constexpr auto kNone = std::nullopt;

namespace {

// The argument records of both calls as a well-behaved client fills them,
// with a buffer that has guard bytes behind it.
struct Call : standin::MonitorCall {
    using MonitorCall::MonitorCall;
    // Takes into a buffer of `capacity` bytes followed by guard bytes; the
    // buffer starts out filled with a pattern.
    int32_t takeInto(uint32_t capacity) {
        bytes.assign(capacity + kGuard, '\xA5');
        return MonitorCall::takeInto(bytes.data(), capacity);
    }
    bool untouchedFrom(size_t offset) const {
        return bytes.find_first_not_of('\xA5', offset) == std::string::npos;
    }
    std::string stream() const { return bytes.substr(0, take.bufferSize); }

    static constexpr uint32_t kGuard = 16;
    std::string bytes;
};

// The whole stream of one snapshot, taken into a buffer of the estimate.
std::string served(uint32_t objectType) {
    Call call(objectType);
    EXPECT_EQ(call.askSize(), 0);
    EXPECT_EQ(call.ca.sqlcode, 0);
    EXPECT_EQ(call.takeInto(call.estimate), 0);
    EXPECT_EQ(call.ca.sqlcode, 0);
    EXPECT_TRUE(call.untouchedFrom(call.estimate)) << "written past the buffer";
    EXPECT_EQ(call.output.bytesWritten, call.estimate);
    return call.stream();
}

class SnapshotMonitor : public ::testing::Test {
  protected:
    void SetUp() override { instance.activate(); }
    mtrktest::TempInstance instance;
};

TEST_F(SnapshotMonitor, WritesTheStreamOfEachObjectType) {
    using B = StreamBuilder;
    struct Case {
        std::string json;
        uint32_t objectType;
        std::string expected;
    };
    const std::vector<Case> cases = {
        {R"({"pools": [{"id": 10, "current": 262144, "maximum": 1048576, "highWater": 327680},
                       {"name": "bph", "maximum": "0xFFFFFFFFFFFFFFFF"}]})",
         VRX_OBJ_INSTANCE,
         wrapStream(B().pool(10, 262144, 1048576, 327680).str() +
                    wrapElement(40, B().u32(686, 3).u64(688, -1).str()))},
        {R"({"pools": []})", VRX_OBJ_INSTANCE, wrapStream("")},
        {R"({"databases": [{"name": "SAMPLE", "pools": [
                {"name": "bph", "bufferPool": "USERBP1", "current": 8650752}]},
             {"name": "X", "pools": []}]})",
         VRX_OBJ_DATABASE,
         wrapStream(
             wrapElement(13,
                         B().text(321, "SAMPLE").pool(3, 8650752, kNone, kNone, "USERBP1").str()) +
             wrapElement(13, B().text(321, "X").str()))},
        {R"({"applications": [{"number": 17, "database": "SAMPLE",
                               "pools": [{"name": "apph", "current": 65536}]},
                              {"number": 9, "database": "", "pools": []}],
             "privateMemory": [{"number": 4, "pools": [{"id": 15, "highWater": 4},
                                                       {"id": 2, "current": -7}]}]})",
         VRX_OBJ_APPLICATION,
         wrapStream(wrapElement(5, B().u32(302, 17).text(321, "SAMPLE").pool(2, 65536).str()) +
                    wrapElement(5, B().u32(302, 9).text(321, "").str()) +
                    wrapElement(10, B().u32(549, 4).pool(15, kNone, kNone, 4).pool(2, -7).str()))},
    };
    for (const Case& c : cases) {
        instance.writeJson(c.json);
        EXPECT_EQ(served(c.objectType), c.expected) << c.json;
    }
}

TEST_F(SnapshotMonitor, InternalPoolsShowOnlyWhenTheRegistrySaysSo) {
    instance.writeJson(R"({"pools": [{"id": 3, "current": 1}, {"id": 19, "current": 1},
                                     {"id": 21, "current": 1}, {"id": 45, "current": 1}]})");
    const std::string standard = wrapStream(StreamBuilder().pool(3, 1).str());
    const std::string all =
        wrapStream(StreamBuilder().pool(3, 1).pool(19, 1).pool(21, 1).pool(45, 1).str());
    // Which registries expose them is the registry's own test.
    const std::pair<const char*, const std::string&> cases[] = {
        {"", standard}, {"VRXMEMTRK=1\n", all}, {"VRXMEMTRK=0\n", standard}};
    for (const auto& [registry, expected] : cases) {
        instance.writeFile("registry", registry);
        EXPECT_EQ(served(VRX_OBJ_INSTANCE), expected) << registry;
    }
}

// The answers configured per call and object type are swept end to end.
// The state and an instance with nothing to show answer a take as they
// answer the estimate, though the program never takes after such an answer.
TEST_F(SnapshotMonitor, StateAndEmptinessAnswerBothCalls) {
    struct Case {
        std::string json;
        uint32_t objectType;
        int32_t code;
    };
    const std::string db = R"("databases": [{"name": "A", "pools": []}])";
    const std::vector<Case> cases = {
        {"{" + db + R"(, "state": "stopped"})", VRX_OBJ_DATABASE, -1032},
        {"{" + db + R"(, "state": "unauthorized"})", VRX_OBJ_INSTANCE, -1092},
        {R"({"pools": []})", VRX_OBJ_DATABASE, 1611},
        {"{" + db + "}", VRX_OBJ_APPLICATION, 1611},
        {R"({"privateMemory": [{"number": 0, "pools": []}]})", VRX_OBJ_APPLICATION, 0},
    };
    for (const Case& c : cases) {
        instance.writeJson(c.json);
        Call call(c.objectType);
        EXPECT_EQ(call.askSize(), 0) << c.json;
        EXPECT_EQ(call.ca.sqlcode, c.code) << c.json;
        // A take that follows anyway answers the same, and writes nothing.
        EXPECT_EQ(call.takeInto(4096), 0) << c.json;
        EXPECT_EQ(call.ca.sqlcode, c.code) << c.json;
        EXPECT_EQ(call.untouchedFrom(0), c.code != 0) << c.json;
    }
}

TEST_F(SnapshotMonitor, EstimateAndTooSmall) {
    instance.writeJson(R"({"pools": [{"id": 1, "current": 2}],
                           "snapshots": {"instance": {"estimate": 3, "tooSmall": 2}}})");
    Call call(VRX_OBJ_INSTANCE);
    ASSERT_EQ(call.askSize(), 0);
    EXPECT_EQ(call.estimate, 3u);
    const uint32_t streamSize = 8 + 8 + 12 + 16;
    // The first two takes answer 1606 whatever the buffer; after them only
    // a buffer smaller than the stream does.
    const std::pair<uint32_t, int32_t> takes[] = {
        {4096, 1606}, {4096, 1606}, {streamSize - 1, 1606}, {streamSize, 0}, {0, 1606}};
    for (const auto& [capacity, code] : takes) {
        ASSERT_EQ(call.takeInto(capacity), 0);
        EXPECT_EQ(call.ca.sqlcode, code) << capacity;
        EXPECT_TRUE(call.untouchedFrom(code == 0 ? capacity : 0)) << capacity;
    }
    // Counted per object type: the instance's two do not use up the
    // database's one.
    instance.writeJson(R"({"databases": [{"name": "A", "pools": []}],
                           "snapshots": {"instance": {"tooSmall": 2},
                                         "database": {"tooSmall": 1}}})");
    EXPECT_FALSE(served(VRX_OBJ_INSTANCE).empty());
    Call database(VRX_OBJ_DATABASE);
    for (int32_t code : {1606, 0}) {
        ASSERT_EQ(database.takeInto(4096), 0);
        EXPECT_EQ(database.ca.sqlcode, code);
    }

    Call noBuffer(VRX_OBJ_INSTANCE);
    noBuffer.take.bufferSize = 0;
    ASSERT_EQ(vrxGetSnapshot(VRX_MONITOR_VERSION, &noBuffer.take, &noBuffer.ca), 0);
    EXPECT_EQ(noBuffer.ca.sqlcode, 1606);
}

TEST_F(SnapshotMonitor, ServesAStreamFileAsItStands) {
    std::string damaged = StreamBuilder().raw(1, 1, 1000, "not a stream").str();
    instance.writeFile("bad.bin", damaged);
    instance.writeJson(R"({"snapshots": {"database": {"streamFile": "bad.bin"}}})");
    EXPECT_EQ(served(VRX_OBJ_DATABASE), damaged) << "the 1611 rule does not apply";

    instance.writeJson(
        R"({"state": "stopped", "snapshots": {"database": {"streamFile": "bad.bin"}}})");
    Call stopped(VRX_OBJ_DATABASE);
    ASSERT_EQ(stopped.askSize(), 0);
    EXPECT_EQ(stopped.ca.sqlcode, -1032);

    instance.writeJson(R"({"snapshots": {"database": {"streamFile": "missing.bin"}}})");
    Call missing(VRX_OBJ_DATABASE);
    EXPECT_EQ(missing.askSize(), standin::kMonInstanceUnreadable);
    EXPECT_NE(instance.diagLog().find("missing.bin"), std::string::npos);
}

TEST_F(SnapshotMonitor, RefusesMalformedRequests) {
    using namespace standin;
    struct Case {
        const char* name;
        void (*spoil)(Call&);
        int32_t sizeRc;  // 0: the case concerns the take only
        int32_t takeRc;
    };
    const int32_t arg = kMonBadArgument;
    const int32_t count = kMonBadObjectCount;
    const Case cases[] = {
        {"count 0", [](Call& c) { c.request.objectCount = 0; }, count, count},
        {"count 2", [](Call& c) { c.request.objectCount = 2; }, count, count},
        {"type", [](Call& c) { c.request.objectType = 0x10002; }, kMonBadObjectType,
         kMonBadObjectType},
        {"engine area", [](Call& c) { c.request.engineArea[35] = 1; }, arg, arg},
        {"second word", [](Call& c) { c.request.reserved = 1; }, arg, arg},
        {"stream version", [](Call& c) { c.size.streamVersion = c.take.streamVersion = 6; },
         kMonBadStreamVersion, kMonBadStreamVersion},
        {"partition", [](Call& c) { c.size.partition = c.take.partition = 0; }, arg, arg},
        {"selector", [](Call& c) { c.size.selector = c.take.selector = 1; }, arg, arg},
        {"no request", [](Call& c) { c.size.request = c.take.request = nullptr; }, arg, arg},
        {"no estimate word", [](Call& c) { c.size.estimate = nullptr; }, arg, 0},
        {"flags", [](Call& c) { c.take.flags = 1; }, 0, arg},
    };
    instance.writeJson(R"({"databases": [{"name": "A", "pools": []}]})");
    for (const Case& c : cases) {
        Call call(VRX_OBJ_DATABASE);
        c.spoil(call);
        EXPECT_EQ(vrxGetSnapshotSize(VRX_MONITOR_VERSION, &call.size, &call.ca), c.sizeRc)
            << c.name;
        std::string buffer(64, '\xA5');
        call.take.buffer = buffer.data();
        call.take.bufferSize = 64;
        EXPECT_EQ(vrxGetSnapshot(VRX_MONITOR_VERSION, &call.take, &call.ca), c.takeRc) << c.name;
        if (c.takeRc != 0) {
            EXPECT_EQ(buffer, std::string(64, '\xA5')) << c.name;
        }
    }

    Call call(VRX_OBJ_DATABASE);
    EXPECT_EQ(vrxGetSnapshotSize(9050001, &call.size, &call.ca), kMonBadInterfaceVersion);
    EXPECT_EQ(vrxGetSnapshot(0, &call.take, &call.ca), kMonBadInterfaceVersion);
    EXPECT_EQ(vrxGetSnapshotSize(VRX_MONITOR_VERSION, nullptr, &call.ca), kMonBadArgument);
    EXPECT_EQ(vrxGetSnapshotSize(VRX_MONITOR_VERSION, &call.size, nullptr), kMonBadArgument);
    EXPECT_EQ(vrxGetSnapshot(VRX_MONITOR_VERSION, nullptr, &call.ca), kMonBadArgument);
    call.take.bufferSize = 10;
    EXPECT_EQ(vrxGetSnapshot(VRX_MONITOR_VERSION, &call.take, &call.ca), kMonBadArgument)
        << "a null buffer of 10 bytes";

    instance.writeJson(R"({"databases": [{"name": "A", "pools": [{"curent": 1}]}]})");
    EXPECT_EQ(call.askSize(), kMonInstanceUnreadable);
    EXPECT_NE(instance.diagLog().find("snapshot monitor: "), std::string::npos);
}

TEST_F(SnapshotMonitor, AnswersInAClearedSqlcaAndReadsTheInstanceAfresh) {
    instance.writeJson(R"({"pools": [{"id": 1, "current": 2}]})");
    Call call(VRX_OBJ_INSTANCE);
    std::memset(&call.ca, 0xEE, sizeof(call.ca));
    ASSERT_EQ(call.askSize(), 0);
    ASSERT_EQ(call.takeInto(call.estimate), 0);
    const auto* bytes = reinterpret_cast<const unsigned char*>(&call.ca);
    EXPECT_EQ(std::string(call.ca.sqlcaid, 8), "SQLCA   ");
    EXPECT_EQ(call.ca.sqlcabc, 136);
    for (size_t i = 12; i < sizeof(sqlca); ++i)
        EXPECT_EQ(bytes[i], 0) << "byte " << i;

    instance.writeJson(R"({"pools": [{"id": 1, "current": 3}]})");
    EXPECT_EQ(served(VRX_OBJ_INSTANCE), wrapStream(StreamBuilder().pool(1, 3).str()));
}

}  // namespace
