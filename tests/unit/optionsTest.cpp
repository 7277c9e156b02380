// The command line: every valid and invalid form, and the number rules of
// "-r interval [count]" checked against what "%d%c" accepts.
#include <gtest/gtest.h>

#include <climits>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "mtrkOptions.h"
#include "testInstance.h"

namespace {

// The set fields of a record, in field order, for readable comparisons.
std::string describe(const MtrkOptions& o) {
    std::string s;
    auto flag = [&](uint8_t value, const char* name) {
        if (value != 0)
            s += std::string(name) + (value == 1 ? " " : "=? ");
    };
    flag(o.instance, "instance");
    flag(o.database, "database");
    flag(o.highWater, "highWater");
    flag(o.maximum, "maximum");
    flag(o.privateMemory, "privateMemory");
    flag(o.application, "application");
    flag(o.verbose, "verbose");
    flag(o.allPools, "allPools");
    flag(o.help, "help");
    return s + "count=" + std::to_string(o.count) + " interval=" + std::to_string(o.interval);
}

struct Parsed {
    int32_t result;
    MtrkOptions options;
    std::string out;
};

class OptionsTest : public ::testing::Test {
  protected:
    void SetUp() override { instance_.activate(); }

    // Parses into a record that held garbage before the defaults were set.
    Parsed parse(const std::vector<std::string>& args) {
        std::vector<const char*> argv{"vrxmtrk"};
        for (const auto& a : args)
            argv.push_back(a.c_str());
        Parsed p{};
        memset(&p.options, 0xAB, sizeof p.options);
        mtrkSetDefaultOptions(&p.options);
        p.out = mtrktest::captureStdout([&] {
            p.result = mtrkParseOptions(static_cast<int32_t>(argv.size()), argv.data(), &p.options);
        });
        return p;
    }

    mtrktest::TempInstance instance_;
};

std::string join(const std::vector<std::string>& args) {
    std::string s;
    for (const auto& a : args)
        s += "[" + a + "]";
    return s;
}

const std::string kForever = "count=2147483647";

TEST_F(OptionsTest, ValidCommandLinesSetTheirFields) {
    struct Case {
        std::vector<std::string> args;
        std::string expected;
    };
    const std::vector<Case> cases = {
        {{"-h", "-h"}, "help count=1 interval=0"},
        {{"-i", "-d", "-a", "-p", "-v", "-all", "-w"},
         "instance database highWater privateMemory application verbose allPools count=1 "
         "interval=0"},
        {{"-m", "-d"}, "database maximum count=1 interval=0"},
        {{"-i", "-r", "10"}, "instance " + kForever + " interval=10"},
        {{"-r", "10", "3", "-i"}, "instance count=3 interval=10"},
        {{"-i", "-r", "10", "-d"}, "instance database " + kForever + " interval=10"},
        // A blank count is taken and leaves the count as it was.
        {{"-d", "-r", "5", "  ", "-i"}, "instance database " + kForever + " interval=5"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(join(c.args));
        const Parsed p = parse(c.args);
        EXPECT_EQ(p.result, 0);
        EXPECT_EQ(p.out, "");
        EXPECT_EQ(describe(p.options), c.expected);
    }
}

TEST_F(OptionsTest, InvalidCommandLinesPrintTheUsage) {
    using Lines = std::vector<std::vector<std::string>>;
    // Repeated flags, and -w with -m.
    const Lines repeated = {{"-i", "-i"},       {"-d", "-d"},       {"-a", "-a"},
                            {"-p", "-p"},       {"-v", "-v", "-i"}, {"-all", "-all", "-i"},
                            {"-w", "-w", "-i"}, {"-m", "-m", "-i"}, {"-w", "-m", "-i"},
                            {"-m", "-w", "-i"}};
    // Nothing, or modifiers and -r, which select nothing by themselves.
    const Lines unselected = {{},     {"-v"},   {"-w"},
                              {"-m"}, {"-all"}, {"-v", "-all", "-w", "-r", "5", "2"}};
    // Whole words only, case-sensitive.
    const Lines words = {{"-I"},          {"-id"},       {"-i", "-"},   {"-i", ""},   {"-i", "i"},
                         {"-i", "--all"}, {"-i", "-al"}, {"-i", "-h2"}, {"-i", " -d"}};
    // -r without an interval, twice, or with more than a count.
    const Lines repeats = {{"-i", "-r"}, {"-i", "-r", "5", "-r", "6"}, {"-i", "-r", "5", "3", "4"}};
    // Beyond 32 bits: refused rather than wrapped.
    const Lines wide = {{"-i", "-r", "2147483648"},
                        {"-i", "-r", "4294967297"},
                        {"-i", "-r", "99999999999999999999999"},
                        {"-i", "-r", "5", "2147483648"},
                        {"-i", "-r", "5", "-2147483649"},
                        {"-i", "-r", "5", "18446744073709551617"}};
    for (const Lines* lines : {&repeated, &unselected, &words, &repeats, &wide}) {
        for (const auto& args : *lines) {
            SCOPED_TRACE(join(args));
            const Parsed p = parse(args);
            EXPECT_EQ(p.result, -3);
            EXPECT_EQ(p.out, "invalid\nusage\n");
        }
    }
}

// Each text as an interval and as a count, accepted exactly when the
// engine's own reading with sscanf("%d%c") accepts it; only texts whose
// number fits in 32 bits, where that reading is defined.
TEST_F(OptionsTest, NumbersAreAcceptedExactlyAsScanfReadsThem) {
    const std::vector<std::string> texts = {
        "",    " ",  "\t", "5",   " 5",         "\n5",         "+5",          "-5",   "0",   "-0",
        "5 ",  "5s", "5.", "1e3", "0x10",       "+",           "-",           "+-5",  "--5", " +3",
        "007", "-d", "x",  "1 2", "2147483647", "-2147483648", "+2147483647", "1000",
    };
    for (const auto& text : texts) {
        SCOPED_TRACE("[" + text + "]");
        int value = 0;
        char scratch = 0;
        const int conversions = sscanf(text.c_str(), "%d%c", &value, &scratch);
        // Nothing but white space leaves the number as it was.
        const int count = conversions == EOF ? INT_MAX : value;

        const bool validInterval = conversions != 0 && conversions <= 1 && value >= 1;
        Parsed p = parse({"-i", "-r", text});
        EXPECT_EQ(p.result, validInterval ? 0 : -3);
        if (validInterval) {
            EXPECT_EQ(describe(p.options),
                      "instance " + kForever + " interval=" + std::to_string(value));
        }

        // Not a count at all: examined as the next option, and only -d is one.
        const bool validCount = conversions == 0 ? text == "-d" : conversions <= 1 && count >= 1;
        p = parse({"-i", "-r", "5", text});
        EXPECT_EQ(p.result, validCount ? 0 : -3);
        if (validCount) {
            EXPECT_EQ(p.options.count, conversions == 0 ? INT_MAX : count);
            EXPECT_EQ(p.options.interval, 5);
        }
    }
}

}  // namespace
