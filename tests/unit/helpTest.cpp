// The help output byte for byte in both forms, and how it stops when a
// message cannot be fetched.
#include <gtest/gtest.h>

#include <string>

#include "helpTexts.h"
#include "messages/mtrkMessages.h"
#include "mtrkOptions.h"
#include "testInstance.h"

namespace {

class HelpTest : public ::testing::Test {
  protected:
    void SetUp() override {
        instance_.activate();
        mtrkSetDefaultOptions(&options_);
        options_.help = 1;
        gLastRc = 0;
    }

    std::string printHelp(int32_t* result) {
        return mtrktest::captureStdout([&] { *result = mtrkPrintHelp(&options_); });
    }

    mtrktest::TempInstance instance_;
    MtrkOptions options_;
};

TEST_F(HelpTest, BasicFormWhenTheEngineHidesInternalPools) {
    // Report flags and -v play no part in the choice.
    options_.instance = 1;
    options_.verbose = 1;
    int32_t result = -1;
    EXPECT_EQ(printHelp(&result), mtrktest::kBasicHelp);
    EXPECT_EQ(result, 0);
}

TEST_F(HelpTest, ExtendedFormWithAllPools) {
    options_.allPools = 1;
    int32_t result = -1;
    EXPECT_EQ(printHelp(&result), mtrktest::kExtendedHelp);
    EXPECT_EQ(result, 0);
}

TEST_F(HelpTest, ExtendedFormWhenTheEngineAlreadyExposesInternalPools) {
    instance_.writeFile("registry", "VRXMEMTRK=1\n");
    int32_t result = -1;
    EXPECT_EQ(printHelp(&result), mtrktest::kExtendedHelp);
    EXPECT_EQ(result, 0);
}

TEST_F(HelpTest, OnlyTheValueOneExposesInternalPools) {
    instance_.writeFile("registry", "VRXMEMTRK=10\n");
    int32_t result = -1;
    EXPECT_EQ(printHelp(&result), mtrktest::kBasicHelp);
    EXPECT_EQ(result, 0);
}

TEST_F(HelpTest, AFailingFetchEndsTheHelpThere) {
    struct Case {
        int failing;
        std::string expected;
    };
    const Case cases[] = {
        {42, ""},
        {85, "usage\n"},
        {81, "usage\noptions\n"},
        {82, "usage\noptions\ninternal help\n\n" + mtrktest::kStandardLegend},
    };
    options_.allPools = 1;
    for (const auto& c : cases) {
        SCOPED_TRACE(c.failing);
        instance_.writeJson(R"({"faults": {"messageFail": [)" + std::to_string(c.failing) + "]}}");
        gLastRc = 0;
        int32_t result = 0;
        EXPECT_EQ(printHelp(&result), c.expected);
        EXPECT_EQ(result, -4);
        EXPECT_LT(gLastRc, 0) << "the message service's negative answer is the recorded code";
    }
}

}  // namespace
