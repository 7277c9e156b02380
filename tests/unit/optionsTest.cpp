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

    Parsed parse(const std::vector<std::string>& args) {
        std::vector<const char*> argv{"vrxmtrk"};
        for (const auto& a : args)
            argv.push_back(a.c_str());
        Parsed p{};
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

TEST_F(OptionsTest, DefaultsAreOnePassWithoutWaiting) {
    MtrkOptions o;
    memset(&o, 0xAB, sizeof o);
    mtrkSetDefaultOptions(&o);
    EXPECT_EQ(describe(o), "count=1 interval=0");
}

TEST_F(OptionsTest, ValidCommandLinesSetTheirFields) {
    struct Case {
        std::vector<std::string> args;
        std::string expected;
    };
    const std::vector<Case> cases = {
        {{"-i"}, "instance count=1 interval=0"},
        {{"-d"}, "database count=1 interval=0"},
        {{"-a"}, "application count=1 interval=0"},
        {{"-p"}, "privateMemory count=1 interval=0"},
        {{"-h"}, "help count=1 interval=0"},
        {{"-h", "-h"}, "help count=1 interval=0"},
        {{"-i", "-h"}, "instance help count=1 interval=0"},
        {{"-h", "-all"}, "allPools help count=1 interval=0"},
        {{"-i", "-d", "-a", "-p", "-v", "-all", "-w"},
         "instance database highWater privateMemory application verbose allPools count=1 "
         "interval=0"},
        {{"-m", "-d"}, "database maximum count=1 interval=0"},
        {{"-i", "-r", "10"}, "instance " + kForever + " interval=10"},
        {{"-i", "-r", "10", "3"}, "instance count=3 interval=10"},
        {{"-r", "10", "3", "-i"}, "instance count=3 interval=10"},
        {{"-i", "-r", "10", "-d"}, "instance database " + kForever + " interval=10"},
        {{"-d", "-r", "+5", "2"}, "database count=2 interval=5"},
        {{"-d", "-r", " 5", "\t2"}, "database count=2 interval=5"},
        {{"-d", "-r", "007", "010"}, "database count=10 interval=7"},
        {{"-d", "-r", "2147483647", "2147483647"}, "database count=2147483647 interval=2147483647"},
        // An empty or blank count is taken and leaves the count as it was.
        {{"-d", "-r", "5", ""}, "database " + kForever + " interval=5"},
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
    const std::vector<std::vector<std::string>> cases = {
        {},
        // Repeated flags, and -w with -m.
        {"-i", "-i"},
        {"-d", "-d"},
        {"-a", "-a"},
        {"-p", "-p"},
        {"-v", "-v", "-i"},
        {"-all", "-all", "-i"},
        {"-w", "-w", "-i"},
        {"-m", "-m", "-i"},
        {"-w", "-m", "-i"},
        {"-m", "-w", "-i"},
        // Modifiers and -r select nothing by themselves.
        {"-v"},
        {"-w"},
        {"-m"},
        {"-all"},
        {"-r", "5"},
        {"-v", "-all", "-w", "-r", "5", "2"},
        // Whole words only, case-sensitive.
        {"-I"},
        {"-id"},
        {"-i", "-"},
        {"-i", ""},
        {"-i", "i"},
        {"-i", "--all"},
        {"-i", "-al"},
        {"-i", "-h2"},
        {"-i", " -d"},
        // Bad intervals.
        {"-i", "-r"},
        {"-i", "-r", ""},
        {"-i", "-r", " "},
        {"-i", "-r", "0"},
        {"-i", "-r", "-5"},
        {"-i", "-r", "5s"},
        {"-i", "-r", "5 "},
        {"-i", "-r", "0x10"},
        {"-i", "-r", "x"},
        {"-i", "-r", "+"},
        {"-i", "-r", "-d"},
        // Bad counts; x is no count and then no option either.
        {"-i", "-r", "5", "0"},
        {"-i", "-r", "5", "-2"},
        {"-i", "-r", "5", "3x"},
        {"-i", "-r", "10", "x"},
        {"-i", "-r", "5", "-r", "6"},
        {"-i", "-r", "5", "3", "4"},
        // Beyond 32 bits: refused rather than wrapped.
        {"-i", "-r", "2147483648"},
        {"-i", "-r", "4294967297"},
        {"-i", "-r", "99999999999999999999999"},
        {"-i", "-r", "5", "2147483648"},
        {"-i", "-r", "5", "-2147483649"},
        {"-i", "-r", "5", "18446744073709551617"},
    };
    for (const auto& args : cases) {
        SCOPED_TRACE(join(args));
        const Parsed p = parse(args);
        EXPECT_EQ(p.result, -3);
        EXPECT_EQ(p.out, "invalid\nusage\n");
    }
}

TEST_F(OptionsTest, UsageWithoutMessage42WhenItCannotBeFetched) {
    instance_.writeJson(R"({"faults": {"messageFail": [42]}})");
    Parsed p = parse({"-x"});
    EXPECT_EQ(p.result, -3);
    EXPECT_EQ(p.out, "invalid\n");

    instance_.writeJson(R"({"faults": {"messageFail": [41]}})");
    p = parse({"-x"});
    EXPECT_EQ(p.result, -3);
    EXPECT_EQ(p.out, "");
}

// What the engine's own reading of an argument with sscanf("%d%c") makes of
// it; only texts whose number fits in 32 bits, where that reading is defined.
struct ScanfReading {
    int conversions;
    int value;
};

ScanfReading readLikeScanf(const std::string& text, int initial) {
    ScanfReading r{0, initial};
    char scratch = 0;
    r.conversions = sscanf(text.c_str(), "%d%c", &r.value, &scratch);
    return r;
}

const std::vector<std::string> kNumberTexts = {
    "",    " ",  "\t", "5",   " 5",         "\n5",         "+5",          "-5",   "0",   "-0",
    "5 ",  "5s", "5.", "1e3", "0x10",       "+",           "-",           "+-5",  "--5", " +3",
    "007", "-d", "x",  "1 2", "2147483647", "-2147483648", "+2147483647", "1000",
};

TEST_F(OptionsTest, IntervalIsAcceptedExactlyAsScanfReadsIt) {
    for (const auto& text : kNumberTexts) {
        SCOPED_TRACE("interval [" + text + "]");
        const ScanfReading r = readLikeScanf(text, 0);
        const bool valid = r.conversions != 0 && r.conversions <= 1 && r.value >= 1;
        const Parsed p = parse({"-i", "-r", text});
        EXPECT_EQ(p.result, valid ? 0 : -3);
        if (valid) {
            EXPECT_EQ(p.options.interval, r.value);
            EXPECT_EQ(p.options.count, INT_MAX);
        }
    }
}

TEST_F(OptionsTest, CountIsAcceptedExactlyAsScanfReadsIt) {
    for (const auto& text : kNumberTexts) {
        SCOPED_TRACE("count [" + text + "]");
        const ScanfReading r = readLikeScanf(text, INT_MAX);
        bool valid;
        int32_t count = INT_MAX;
        if (r.conversions == 0) {
            // Not a count: examined as the next option, and only -d is one.
            valid = text == "-d";
        } else {
            valid = r.conversions <= 1 && r.value >= 1;
            count = r.value;
        }
        const Parsed p = parse({"-i", "-r", "5", text});
        EXPECT_EQ(p.result, valid ? 0 : -3);
        if (valid) {
            EXPECT_EQ(p.options.count, count);
            EXPECT_EQ(p.options.interval, 5);
        }
    }
}

}  // namespace
