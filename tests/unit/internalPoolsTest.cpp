// The registry variable of -all: the partition rule, the exposure with each
// answer of the registry, the restore, and the signal handler.
#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <optional>
#include <sstream>
#include <string>

#include "diagRecords.h"
#include "engine/vrxwint.h"
#include "messages/mtrkMessages.h"
#include "mtrkInternalPools.h"
#include "testInstance.h"

namespace {

using mtrktest::diagRecords;
using mtrktest::failureRecord;

// The value of NAME in a registry file's text, if it has a line.
std::optional<std::string> registryValue(const std::string& registry, const std::string& key) {
    std::istringstream lines(registry);
    std::string line;
    while (std::getline(lines, line)) {
        if (line.compare(0, key.size() + 1, key + "=") == 0)
            return line.substr(key.size() + 1);
    }
    return std::nullopt;
}

// Writes the three kernel control block fields for one test and puts the
// block back after.
class KrcbFields {
  public:
    KrcbFields() { memcpy(saved_, sqlz_krcbp, sizeof saved_); }
    ~KrcbFields() { memcpy(sqlz_krcbp, saved_, sizeof saved_); }
    void set(uint32_t multiPartition, int16_t partition, int16_t defaultPartition) {
        memcpy(sqlz_krcbp + VRX_KRCB_MULTI_PARTITION, &multiPartition, sizeof multiPartition);
        memcpy(sqlz_krcbp + VRX_KRCB_PARTITION, &partition, sizeof partition);
        memcpy(sqlz_krcbp + VRX_KRCB_DEFAULT_PARTITION, &defaultPartition, sizeof defaultPartition);
    }

  private:
    uint8_t saved_[VRX_KRCB_SIZE];
};

class InternalPoolsTest : public ::testing::Test {
  protected:
    void SetUp() override {
        ASSERT_NE(sqlz_krcbp, nullptr);
        instance_.activate();
        krcb_.set(0, 0, 0);
        gLastRc = 0;
        memset(gSavedMemTrk, 'x', sizeof gSavedMemTrk);
    }

    std::optional<std::string> memTrk(const std::string& key = "VRXMEMTRK") const {
        return registryValue(instance_.registry(), key);
    }

    mtrktest::TempInstance instance_;
    KrcbFields krcb_;
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
        krcb_.set(c.multiPartition, c.partition, c.defaultPartition);
        EXPECT_EQ(mtrkPartitionNumber(), c.expected);
    }
}

TEST_F(InternalPoolsTest, ExposeSavesTheOldValueAndSetsOne) {
    struct Case {
        const char* name;
        std::optional<std::string> registry;  // the file, if any
        const char* readFault;                // faults.registryRead, if any
        std::string saved;
    };
    const std::string longest(255, 'v');
    const Case cases[] = {
        {"a value", "OTHER=2\nVRXMEMTRK=abc\n", nullptr, "abc"},
        {"the text 0", "VRXMEMTRK=0\n", nullptr, "0"},
        {"255 characters", "VRXMEMTRK=" + longest + "\n", nullptr, longest},
        {"no line", "OTHER=2\n", nullptr, ""},
        {"no file", std::nullopt, nullptr, ""},
        {"no value code", "VRXMEMTRK=abc\n", "\"0x870F0109\"", ""},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        std::filesystem::remove(instance_.dir() / "registry");
        if (c.registry)
            instance_.writeFile("registry", *c.registry);
        instance_.writeJson(c.readFault == nullptr
                                ? std::string("{}")
                                : std::string(R"({"faults": {"registryRead": )") + c.readFault +
                                      "}}");
        memset(gSavedMemTrk, 'x', sizeof gSavedMemTrk);
        EXPECT_EQ(mtrkExposeInternalPools(gSavedMemTrk), 0);
        EXPECT_EQ(std::string(gSavedMemTrk), c.saved);
        EXPECT_EQ(memTrk(), "1");
        if (c.registry && c.registry->find("OTHER=2") != std::string::npos) {
            EXPECT_EQ(memTrk("OTHER"), "2");
        }
    }
    EXPECT_EQ(gLastRc, 0);
    EXPECT_EQ(instance_.diagLog(), "");
}

TEST_F(InternalPoolsTest, ExposeUsesThePartitionOfTheControlBlock) {
    krcb_.set(1, 3, 0);
    instance_.writeFile("registry", "VRXMEMTRK=keep\nVRXMEMTRK@3=old\n");
    ASSERT_EQ(mtrkExposeInternalPools(gSavedMemTrk), 0);
    EXPECT_STREQ(gSavedMemTrk, "old");
    EXPECT_EQ(memTrk("VRXMEMTRK@3"), "1");
    EXPECT_EQ(memTrk(), "keep");
    ASSERT_EQ(mtrkRestoreInternalPools(gSavedMemTrk), 0);
    EXPECT_EQ(memTrk("VRXMEMTRK@3"), "old");
}

TEST_F(InternalPoolsTest, FailingReadOrSetLeavesTheVariableAlone) {
    struct Case {
        const char* faults;
        uint32_t probe;
        int32_t code;
    };
    const Case cases[] = {
        {R"({"registryRead": 5})", 50, 5},
        {R"({"registryRead": "0x870F0105"})", 50, static_cast<int32_t>(0x870F0105)},
        {R"({"registryWrite": -6})", 100, -6},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.faults);
        instance_.writeFile("registry", "VRXMEMTRK=before\n");
        instance_.writeFile("diag.log", "");
        instance_.writeJson(std::string(R"({"faults": )") + c.faults + "}");
        gLastRc = 0;
        EXPECT_EQ(mtrkExposeInternalPools(gSavedMemTrk), -4);
        EXPECT_EQ(gLastRc, c.code);
        EXPECT_EQ(memTrk(), "before");
        const auto records = diagRecords(instance_.diagLog());
        ASSERT_EQ(records.size(), 1u);
        EXPECT_EQ(records[0], failureRecord(0x187800BE, c.probe,
                                            "Error in call to sqloPRegValuePE.\nrc=", c.code));
    }
}

TEST_F(InternalPoolsTest, RestoreWritesTheSavedTextBack) {
    const std::string longest(255, 'r');
    struct Case {
        std::string saved;
        std::optional<std::string> after;
    };
    const Case cases[] = {
        {"", std::nullopt},  // no value before: none after
        {"0", "0"},
        {"a b=c", "a b=c"},
        {longest, longest},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.saved.size());
        instance_.writeFile("registry", "OTHER=2\nVRXMEMTRK=1\n");
        memset(gSavedMemTrk, 0, sizeof gSavedMemTrk);
        memcpy(gSavedMemTrk, c.saved.data(), c.saved.size());
        EXPECT_EQ(mtrkRestoreInternalPools(gSavedMemTrk), 0);
        EXPECT_EQ(memTrk(), c.after);
        EXPECT_EQ(memTrk("OTHER"), "2");
    }
}

TEST_F(InternalPoolsTest, RestorePassesTheRegistryResultUp) {
    instance_.writeJson(R"({"faults": {"registryWrite": 9}})");
    instance_.writeFile("registry", "VRXMEMTRK=1\n");
    gLastRc = 3;
    EXPECT_EQ(mtrkRestoreInternalPools("old"), 9);
    EXPECT_EQ(gLastRc, 3);
    EXPECT_EQ(instance_.diagLog(), "") << "a failed restore leaves no record";
}

// The handler, reached by a real signal in a child process: it restores
// when the flag says so and the signal then ends the process.
void raiseWithHandler(int signalNumber, uint8_t changed, const char* saved) {
    strncpy(gSavedMemTrk, saved, sizeof gSavedMemTrk - 1);
    gMemTrkChanged = changed;
    signal(signalNumber, mtrkSignalHandler);
    raise(signalNumber);
    // Not reached: the raised signal ends the process.
    std::_Exit(0);
}

TEST_F(InternalPoolsTest, SignalHandlerRestoresAndEndsBySignal) {
    for (int signalNumber : {SIGINT, SIGTERM, SIGHUP, SIGPIPE}) {
        SCOPED_TRACE(signalNumber);
        instance_.writeFile("registry", "VRXMEMTRK=1\n");
        EXPECT_EXIT(raiseWithHandler(signalNumber, 1, "old"), testing::KilledBySignal(signalNumber),
                    "");
        EXPECT_EQ(memTrk(), "old");
    }
}

TEST_F(InternalPoolsTest, SignalHandlerLeavesAnUnchangedRegistryAlone) {
    instance_.writeFile("registry", "VRXMEMTRK=1\n");
    EXPECT_EXIT(raiseWithHandler(SIGINT, 0, "old"), testing::KilledBySignal(SIGINT), "");
    EXPECT_EQ(memTrk(), "1");
}

}  // namespace
