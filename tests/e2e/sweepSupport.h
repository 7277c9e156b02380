// What the fault sweeps share: a small instance with something to show in
// every report, the demo instance with a fixed clock, the exit statuses as
// the shell sees them, and reading failure records back out of diag.log.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "../unit/diagRecords.h"

namespace mtrktest {

constexpr const char* kSweepClock = R"("clock": "2026-12-06 20:05:39")";
const std::string kSweepStamp = "time [2026/12/06] [20:05:39]\n\n";

// Exit statuses of the run's results -4, -3 and 1606, as the shell sees them.
constexpr int kExitRecorded = 252;
constexpr int kExitExplained = 253;
constexpr int kExitTooSmall = 70;

// One pool or section of every kind, so that every report prints, and the
// application's database shows its pool 20. Every pool has all three sizes.
constexpr const char* kSmallInstance = R"(
    "pools": [{"name": "monh", "current": 2048, "maximum": 4096, "highWater": 3072},
              {"name": "other", "current": 1024, "maximum": 8192, "highWater": 1024}],
    "databases": [{"name": "SAMPLE", "pools": [
        {"name": "dbh", "current": 4096, "maximum": 65536, "highWater": 5120},
        {"id": 20, "current": 8192, "maximum": 16384, "highWater": 9216}]}],
    "applications": [{"number": 7, "database": "SAMPLE", "pools": [
        {"name": "apph", "current": 1024, "maximum": 2048, "highWater": 1536}]}],
    "privateMemory": [{"number": 0, "pools": [
        {"name": "sorth", "current": 3072, "maximum": 6144, "highWater": 4096}]}])";

// An instance.json of the fixed clock and the keys given.
inline std::string sweepJson(const std::string& keys) {
    return std::string("{") + kSweepClock + (keys.empty() ? "" : ", " + keys) + "}";
}

// The demo instance that the build installs, with the fixed clock and the
// keys given put in front of its own.
inline std::string demoJson(const std::string& keys = "") {
    std::ifstream file(std::string(VRX_TEST_SOURCE_DIR) + "/../standin/demo/instance.json");
    std::ostringstream text;
    text << file.rdbuf();
    std::string json = text.str();
    const size_t open = json.find('{');
    if (open == std::string::npos) {
        ADD_FAILURE() << "the demo instance is not a JSON object";
        return "{}";
    }
    return json.insert(open + 1,
                       std::string(kSweepClock) + ", " + keys + (keys.empty() ? "" : ", "));
}

// The final failure report for a gLastRc, as the tests' SQL catalog words it.
inline std::string finalReport(int32_t lastRc) {
    return "SQL6103 failed [" + std::to_string(lastRc) + "]\n";
}

// A failure record of the program as it stands in diag.log without its code
// (the tail "data#2 int32(4): " and nothing after it).
inline std::string recordHead(uint32_t functionId, uint32_t probe, const std::string& text) {
    std::string head = failureRecord(functionId, probe, text, 0);
    head.pop_back();
    return head;
}

// The code at the end of a failure record, or 0 when it has none.
inline int32_t recordCode(const std::string& record) {
    const size_t space = record.rfind(' ');
    return space == std::string::npos ? 0
                                      : static_cast<int32_t>(std::atol(record.c_str() + space + 1));
}

inline std::vector<std::string> sweepRecords(const std::string& log) {
    return log.empty() ? std::vector<std::string>{} : diagRecords(log);
}

// Records that the engine writes about the program's blocks: a block still
// held at exit, released twice, or never handed out.
inline bool hasMemoryProblem(const std::string& log) {
    return log.find("Memory block") != std::string::npos;
}

// A registry file as the set of its lines: a write may reorder them.
inline std::set<std::string> registryLines(const std::string& registry) {
    std::set<std::string> lines;
    std::istringstream in(registry);
    std::string line;
    while (std::getline(in, line)) {
        if (!line.empty()) {
            lines.insert(line);
        }
    }
    return lines;
}

}  // namespace mtrktest
