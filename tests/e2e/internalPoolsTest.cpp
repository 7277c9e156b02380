// -all end to end: the registry variable during and after a run, the
// internal pools that the snapshots show meanwhile, and the failing
// registry calls.
#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <vector>

#include "../unit/diagRecords.h"
#include "../unit/helpTexts.h"
#include "registryFile.h"
#include "testInstance.h"

namespace {

using mtrktest::registryValue;

// One standard pool (apph) and one internal pool (private) in the instance.
constexpr const char* kInstanceWithInternalPool =
    R"({"clock": "2026-12-06 20:05:39", "traceFlags": 1,
        "pools": [{"name": "apph", "current": 2048}, {"name": "private", "current": 4096}]})";

class InternalPoolsRunTest : public ::testing::Test {
  protected:
    void SetUp() override { instance_.writeJson(kInstanceWithInternalPool); }

    std::optional<std::string> memTrk(const std::string& key = "VRXMEMTRK") const {
        return registryValue(instance_.registry(), key);
    }
    bool traced(const char* functionId) const {
        return instance_.traceLog().find(std::string("entry ") + functionId) != std::string::npos;
    }

    mtrktest::TempInstance instance_;
};

TEST_F(InternalPoolsRunTest, ShownOnlyDuringAnAllRunAndPutBackAfter) {
    struct Case {
        const char* name;
        std::optional<std::string> registry;
        std::optional<std::string> value;
    };
    const Case cases[] = {
        {"no registry", std::nullopt, std::nullopt},
        {"no value", "OTHER=x\n", std::nullopt},
        {"a value", "VRXMEMTRK=abc\n", "abc"},
        {"the text 0", "VRXMEMTRK=0\n", "0"},
        {"255 characters", "VRXMEMTRK=" + std::string(255, 'q') + "\n", std::string(255, 'q')},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        std::filesystem::remove(instance_.dir() / "registry");
        if (c.registry)
            instance_.writeFile("registry", *c.registry);

        const auto plain = mtrktest::runProgram(instance_, {"-i"});
        EXPECT_EQ(plain.exitStatus, 0);
        EXPECT_NE(plain.out.find("apph"), std::string::npos) << plain.out;
        EXPECT_EQ(plain.out.find("private"), std::string::npos) << plain.out;

        const auto all = mtrktest::runProgram(instance_, {"-all", "-i"});
        EXPECT_EQ(all.exitStatus, 0);
        EXPECT_NE(all.out.find("apph"), std::string::npos) << all.out;
        EXPECT_NE(all.out.find("private"), std::string::npos) << all.out;
        EXPECT_EQ(memTrk(), c.value);
    }
}

TEST_F(InternalPoolsRunTest, HelpFormFollowsTheRegistryOrAll) {
    struct Case {
        std::optional<std::string> registry;
        std::vector<std::string> args;
        std::string out;
    };
    const Case cases[] = {
        {std::nullopt, {"-h"}, mtrktest::kBasicHelp},
        {"VRXMEMTRK=1\n", {"-h"}, mtrktest::kExtendedHelp},
        {"VRXMEMTRK=abc\n", {"-h", "-all"}, mtrktest::kExtendedHelp},
    };
    for (const auto& c : cases) {
        std::filesystem::remove(instance_.dir() / "registry");
        if (c.registry)
            instance_.writeFile("registry", *c.registry);
        const auto r = mtrktest::runProgram(instance_, c.args);
        EXPECT_EQ(r.out, c.out);
        EXPECT_EQ(r.exitStatus, 0);
        EXPECT_EQ(memTrk(), registryValue(c.registry.value_or("")));
    }
}

TEST_F(InternalPoolsRunTest, FailingRegistryCallsEndTheRunWithoutARestore) {
    struct Case {
        const char* faults;
        uint32_t probe;
        int32_t code;
    };
    const Case cases[] = {{R"("registryRead": 5)", 50, 5}, {R"("registryWrite": 6)", 100, 6}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.faults);
        instance_.writeFile("registry", "VRXMEMTRK=abc\n");
        instance_.writeFile("diag.log", "");
        instance_.writeFile("trace.log", "");
        instance_.writeJson(std::string(R"({"traceFlags": 1, "faults": {)") + c.faults + "}}");
        const auto r = mtrktest::runProgram(instance_, {"-all", "-i"});
        EXPECT_EQ(r.exitStatus, 252);
        EXPECT_EQ(r.out, "SQL6103 failed [" + std::to_string(c.code) + "]\n");
        EXPECT_EQ(memTrk(), "abc");
        EXPECT_TRUE(traced("0x187800be"));
        EXPECT_FALSE(traced("0x187801d5")) << "nothing was set, so nothing is restored";
        const auto records = mtrktest::diagRecords(instance_.diagLog());
        ASSERT_EQ(records.size(), 1u);
        EXPECT_EQ(records[0],
                  mtrktest::failureRecord(0x187800BE, c.probe,
                                          "Error in call to sqloPRegValuePE.\nrc=", c.code));
    }
}

TEST_F(InternalPoolsRunTest, RestoredAlsoWhenAReportFails) {
    instance_.writeJson(R"({"clock": "2026-12-06 20:05:39",
                           "snapshots": {"database": {"sizeRc": 77}}})");
    instance_.writeFile("registry", "VRXMEMTRK=abc\n");
    const auto r = mtrktest::runProgram(instance_, {"-all", "-d", "-r", "1", "5"});
    EXPECT_EQ(r.exitStatus, 252);
    EXPECT_EQ(r.out, "time [2026/12/06] [20:05:39]\n\nSQL6103 failed [77]\n");
    EXPECT_EQ(memTrk(), "abc");
}

TEST_F(InternalPoolsRunTest, PartitionOfTheControlBlockIsTheOneSetAndRestored) {
    instance_.writeJson(R"({"traceFlags": 1,
                           "krcb": {"multiPartition": 1, "partition": -1, "defaultPartition": 2},
                           "pools": [{"name": "private", "current": 4096}]})");
    instance_.writeFile("registry", "VRXMEMTRK=all\nVRXMEMTRK@2=two\n");
    const auto r = mtrktest::runProgram(instance_, {"-all", "-i"});
    EXPECT_EQ(r.exitStatus, 0);
    // The engine shows internal pools by partition -1's value only.
    EXPECT_EQ(r.out.find("private"), std::string::npos) << r.out;
    EXPECT_EQ(memTrk(), "all");
    EXPECT_EQ(memTrk("VRXMEMTRK@2"), "two");
    EXPECT_TRUE(traced("0x187801d5"));
}

}  // namespace
