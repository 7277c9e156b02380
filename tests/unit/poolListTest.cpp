// The pool printers over hand-built streams, with the tests' terse catalog:
// "cur [%1] [%2]", "max ...", "hwm ...", "total [%1]", "no pools".
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "diagRecords.h"
#include "messages/mtrkMessages.h"
#include "mtrkOptions.h"
#include "reports/mtrkPoolList.h"
#include "streamBuilder.h"
#include "testInstance.h"

namespace {

using mtrktest::StreamBuilder;
using mtrktest::wrapElement;
using mtrktest::wrapStream;

constexpr int64_t K = 1024;
constexpr auto kNone = std::nullopt;

// A database section with its name and the pools given.
std::string section(const std::string& name, const std::string& pools) {
    return wrapElement(13, StreamBuilder().text(321, name).str() + pools);
}

class PoolPrinterTest : public testing::Test {
  protected:
    void SetUp() override {
        instance_.activate();
        gLastRc = 0;
    }

    // Prints the pools of `stream` as the instance report does.
    std::string printList(const std::string& stream, bool show = true) {
        return mtrktest::captureStdout([&] {
            rc_ = mtrkPrintPoolList(stream.data(), static_cast<uint32_t>(stream.size()), &options_,
                                    show, &total_);
        });
    }

    mtrktest::TempInstance instance_;
    MtrkOptions options_{};
    int32_t rc_ = -99;
    int64_t total_ = -1;
};

TEST_F(PoolPrinterTest, ColumnsOfLabelsAndSizes) {
    StreamBuilder seven;
    for (uint32_t id = 0; id < 7; ++id)
        seven.pool(id, (id + 1) * K * K);
    const std::string x255(255, 'x');
    const std::string s8k = "System 8k buffer pool";
    struct Case {
        const char* name;
        std::string pools;
        bool show;
        std::string expected;
        int64_t total;
    };
    const Case cases[] = {
        {"a zero size fills the label width", StreamBuilder().pool(4, 0).str(), true,
         "   catcacheh   \n   0           \n\n", 0},
        {"seven pools flush after the sixth", seven.str(), true,
         "   agsh        appctlh     apph        bph         catcacheh   dbh         \n"
         "   1.0M        2.0M        3.0M        4.0M        5.0M        6.0M        \n\n"
         "   dlfmh       \n   7.0M        \n\n",
         28 * K * K},
        {"buffer pools not shown",
         StreamBuilder()
             .pool(3, 4096, kNone, kNone, s8k)
             .pool(3, 4096, kNone, kNone, "System")
             .str(),
         false, "   bph         bph         \n   4.0K        4.0K        \n\n", 8192},
        {"column lines stop at 249 characters",
         StreamBuilder().pool(3, 1000, kNone, kNone, x255).pool(5, 2000).str(), true,
         "   " + ("bph (" + x255 + ")").substr(0, 249) + "\n   1.0K          \n\n" +
             "   dbh         \n   2.0K        \n\n",
         3000},
        // Identifier 60 lies above the engine's 52; it lacks even its size.
        {"pools above the highest identifier are skipped",
         StreamBuilder().pool(60, kNone).pool(11, 500).pool(60, 7).str(), true,
         "   other       \n   500         \n\n", 500},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        EXPECT_EQ(printList(wrapStream(c.pools), c.show), c.expected);
        EXPECT_EQ(rc_, 0);
        EXPECT_EQ(total_, c.total);
    }
}

TEST_F(PoolPrinterTest, VerboseLinesShowTheSelectedSizeAndATotal) {
    // Lines name the buffer pool in full.
    const std::string two = StreamBuilder()
                                .pool(12, 100, 1000, 600)
                                .pool(3, 200, 2000, 700, "System 8k buffer pool")
                                .str();
    const std::string bph = "Buffer Pool Heap (System 8k buffer pool)";
    struct Case {
        std::string pools;
        uint8_t maximum;
        uint8_t highWater;
        std::string expected;
    };
    const Case cases[] = {
        {two, 1, 0, "max [Package Cache] [1000]\nmax [" + bph + "] [2000]\ntotal [3000]\n\n"},
        {two, 0, 1, "hwm [Package Cache] [600]\nhwm [" + bph + "] [700]\ntotal [1300]\n\n"},
        // Pools exist, but none that the engine knows: a total of nothing.
        {StreamBuilder().pool(60, 7).str(), 0, 0, "total [0]\n\n"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.expected);
        options_ = MtrkOptions{};
        options_.verbose = 1;
        options_.maximum = c.maximum;
        options_.highWater = c.highWater;
        EXPECT_EQ(printList(wrapStream(c.pools)), c.expected);
        EXPECT_EQ(rc_, 0);
    }
}

TEST_F(PoolPrinterTest, InconsistentPoolDropsPendingLinesAndKeepsThePartialTotal) {
    const std::pair<const char*, std::string> badPools[] = {
        {"no identifier", StreamBuilder().open(40).u64(687, 5).close().str()},
        {"no size", StreamBuilder().pool(5, kNone, 5).str()},
        {"too short", StreamBuilder().raw(1, 40, 4, "abcd").str()},
    };
    for (uint8_t verbose : {0, 1}) {
        for (const auto& [name, badPool] : badPools) {
            SCOPED_TRACE(name);
            options_.verbose = verbose;
            gLastRc = 0;
            instance_.writeFile("diag.log", "");
            const std::string stream =
                wrapStream(StreamBuilder().pool(11, 100).pool(12, 200).str() + badPool +
                           StreamBuilder().pool(4, 400).str());
            EXPECT_EQ(printList(stream),
                      verbose ? "cur [Other Memory] [100]\ncur [Package Cache] [200]\n" : "");
            EXPECT_EQ(rc_, -4);
            EXPECT_EQ(gLastRc, 1);
            EXPECT_EQ(total_, 300);
            EXPECT_EQ(mtrktest::diagRecords(instance_.diagLog()),
                      std::vector{mtrktest::failureRecord(0x18780029, 50,
                                                          "Inconsistent Monitor output.\nrc=", 1)});
        }
    }
}

// The end-to-end runs show the pool of each application's database, with
// its total, for names that begin others and for an unknown database.
TEST_F(PoolPrinterTest, DatabasePoolPrintsPool20OfTheNamedDatabase) {
    const std::string shared = StreamBuilder().pool(20, 3000).str();
    const std::string sections =
        section("SAMPLE", StreamBuilder().pool(5, 111).str() + shared) +
        section("OTHER", StreamBuilder().pool(20, 2048, kNone, kNone, "USERBP1").str());
    const std::string two = wrapStream(sections);
    const std::string column = "   appshrh     \n   2.9K        \n\n";
    struct Case {
        const char* name;
        std::string stream;
        const char* database;
        std::string maxPoolId;  // instance.json's, if any
        uint8_t verbose;
        std::string expected;
        int32_t rc;
        int64_t total;
    };
    const Case cases[] = {
        // Never with the buffer pool name, whatever the pool stands for.
        {"without its buffer pool", two, "OTHER", "", 0, "   appshrh     \n   2.0K        \n\n", 0,
         2048},
        {"a beginning of a name", two, "SAMPL", "", 0, "", 1, 0},
        {"the empty name", two, "", "", 0, "", 1, 0},
        {"verbose without a total of zero",
         wrapStream(section("EMPTY", StreamBuilder().pool(20, 0).str())), "EMPTY", "", 1,
         "cur [Applications Shared Heap] [0]\n", 0, 0},
        {"the first section that holds it",
         wrapStream(section("SAMPLE", StreamBuilder().pool(5, 10).str()) + sections), "SAMPLE", "",
         0, column, 0, 3000},
        {"a section without name ends the search",
         wrapStream(wrapElement(13, shared) + section("SAMPLE", shared)), "SAMPLE", "", 0, "", 1,
         0},
        // Only the identifier is read on the way to pool 20, so a pool that
        // lacks its sizes does not stop the search.
        {"other pools passed over",
         wrapStream(section("SAMPLE", StreamBuilder().pool(60, kNone).str() + shared)), "SAMPLE",
         "", 0, column, 0, 3000},
        {"pool 20 above the highest identifier", two, "SAMPLE", R"({"maxPoolId": 11})", 1, "", 0,
         0},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        instance_.writeJson(c.maxPoolId.empty() ? "{}" : c.maxPoolId);
        options_.verbose = c.verbose;
        int64_t total = -1;
        EXPECT_EQ(mtrktest::captureStdout([&] {
                      rc_ = mtrkPrintDatabasePool(c.stream.data(),
                                                  static_cast<uint32_t>(c.stream.size()), &options_,
                                                  c.database, &total);
                  }),
                  c.expected);
        EXPECT_EQ(rc_, c.rc);
        EXPECT_EQ(total, c.total);
    }
}

TEST_F(PoolPrinterTest, DatabasePoolInconsistentPoolFailsWithoutARecord) {
    const std::string stream = wrapStream(
        section("SAMPLE", StreamBuilder().open(40).u64(687, 5).close().pool(20, 3000).str()));
    int64_t total = -1;
    EXPECT_EQ(mtrktest::captureStdout([&] {
                  rc_ = mtrkPrintDatabasePool(stream.data(), static_cast<uint32_t>(stream.size()),
                                              &options_, "SAMPLE", &total);
              }),
              "");
    EXPECT_EQ(rc_, -4);
    EXPECT_EQ(gLastRc, 1);
    EXPECT_EQ(total, 0);
    EXPECT_EQ(instance_.diagLog(), "");
}

}  // namespace
