// The pool printers over hand-built streams, with the tests' terse catalog:
// "cur [%1] [%2]", "max ...", "hwm ...", "total [%1]", "no pools".
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "messages/mtrkMessages.h"
#include "mtrkOptions.h"
#include "reports/mtrkPoolList.h"
#include "streamBuilder.h"
#include "testInstance.h"

namespace {

using mtrktest::StreamBuilder;
using mtrktest::wrapStream;

constexpr int64_t K = 1024;

// A label or size text left-justified in a 12-character column.
std::string col(const std::string& text) {
    return text.size() >= 12 ? text : text + std::string(12 - text.size(), ' ');
}

class PoolPrinterTest : public testing::Test {
  protected:
    void SetUp() override {
        instance_.activate();
        gLastRc = 0;
    }

    // Prints the pools of `stream` as the instance report does.
    std::string printList(const std::string& stream, bool show = true, int64_t* total = nullptr) {
        return mtrktest::captureStdout([&] {
            rc_ = mtrkPrintPoolList(stream.data(), static_cast<uint32_t>(stream.size()), &options_,
                                    show, total);
        });
    }

    std::string printDatabasePool(const std::string& stream, const char* name, int64_t* total) {
        return mtrktest::captureStdout([&] {
            rc_ = mtrkPrintDatabasePool(stream.data(), static_cast<uint32_t>(stream.size()),
                                        &options_, name, total);
        });
    }

    mtrktest::TempInstance instance_;
    MtrkOptions options_{};
    int32_t rc_ = -99;
};

TEST_F(PoolPrinterTest, ThreePoolsInOnePairOfColumns) {
    std::string stream =
        wrapStream(StreamBuilder().pool(18, 64 * K).pool(12, 192 * K).pool(11, 500).str());
    int64_t total = -1;
    EXPECT_EQ(printList(stream, true, &total),
              "   utilh       pckcacheh   other       \n"
              "   64.0K       192.0K      500         \n\n");
    EXPECT_EQ(rc_, 0);
    EXPECT_EQ(total, 64 * K + 192 * K + 500);
}

TEST_F(PoolPrinterTest, SevenPoolsFlushAfterTheSixth) {
    StreamBuilder body;
    const char* names[] = {"agsh", "appctlh", "apph", "bph", "catcacheh", "dbh", "dlfmh"};
    for (uint32_t id = 0; id < 7; ++id) {
        body.pool(id, (id + 1) * K * K);
    }
    std::string first;
    std::string firstSizes;
    for (uint32_t id = 0; id < 6; ++id) {
        first += col(names[id]);
        firstSizes += col(std::to_string(id + 1) + ".0M");
    }
    EXPECT_EQ(printList(wrapStream(body.str())),
              "   " + first + "\n   " + firstSizes + "\n\n" +  //
                  "   " + col("dlfmh") + "\n   " + col("7.0M") + "\n\n");
    EXPECT_EQ(rc_, 0);
}

TEST_F(PoolPrinterTest, ZeroSizeFillsTheLabelWidth) {
    std::string out = printList(wrapStream(StreamBuilder().pool(4, 0).str()));
    EXPECT_EQ(out, "   catcacheh   \n   0           \n\n");
}

TEST_F(PoolPrinterTest, LongLabelsShiftTheFollowingSizesLeft) {
    // "bph (USERBUFFERPOOL1)" is 21 characters; its size text only 14, so the
    // next size starts seven characters left of its label.
    std::string stream = wrapStream(
        StreamBuilder()
            .pool(3, 8448 * K, std::nullopt, std::nullopt, std::string("USERBUFFERPOOL1"))
            .pool(5, 1000)
            .str());
    EXPECT_EQ(printList(stream),
              "   bph (USERBUFFERPOOL1)dbh         \n"
              "   8.2M          1.0K          \n\n");
}

TEST_F(PoolPrinterTest, SystemBufferPoolsShowShortNamesAndFlagOffShowsNone) {
    std::string stream = wrapStream(
        StreamBuilder()
            .pool(3, 4096, std::nullopt, std::nullopt, std::string("System 8k buffer pool"))
            .pool(3, 4096, std::nullopt, std::nullopt, std::string("System"))
            .str());
    EXPECT_EQ(printList(stream, true),
              "   bph (S8K)   bph (System)\n"
              "   4.0K        4.0K        \n\n");
    EXPECT_EQ(printList(stream, false),
              "   bph         bph         \n"
              "   4.0K        4.0K        \n\n");
}

TEST_F(PoolPrinterTest, ColumnLinesStopAt249Characters) {
    std::string bufferPool(255, 'x');
    std::string stream = wrapStream(
        StreamBuilder().pool(3, 1000, std::nullopt, std::nullopt, bufferPool).pool(5, 2000).str());
    std::string label = "bph (" + bufferPool + ")";
    EXPECT_EQ(printList(stream), "   " + label.substr(0, 249) + "\n   " + col("1.0K") + "  \n\n" +
                                     "   " + col("dbh") + "\n   " + col("2.0K") + "\n\n");
    EXPECT_EQ(rc_, 0);
}

struct VerboseCase {
    const char* name;
    uint8_t maximum;
    uint8_t highWater;
    std::string expected;
};

TEST_F(PoolPrinterTest, VerboseLinesShowTheSelectedSizeAndATotal) {
    std::string stream =
        wrapStream(StreamBuilder()
                       .pool(12, 100, 1000, 600)
                       .pool(3, 200, 2000, 700, std::string("System 8k buffer pool"))
                       .str());
    const VerboseCase cases[] = {
        {"current", 0, 0,
         "cur [Package Cache] [100]\n"
         "cur [Buffer Pool Heap (System 8k buffer pool)] [200]\n"
         "total [300]\n\n"},
        {"maximum", 1, 0,
         "max [Package Cache] [1000]\n"
         "max [Buffer Pool Heap (System 8k buffer pool)] [2000]\n"
         "total [3000]\n\n"},
        {"high water", 0, 1,
         "hwm [Package Cache] [600]\n"
         "hwm [Buffer Pool Heap (System 8k buffer pool)] [700]\n"
         "total [1300]\n\n"},
    };
    for (const VerboseCase& c : cases) {
        options_ = MtrkOptions{};
        options_.verbose = 1;
        options_.maximum = c.maximum;
        options_.highWater = c.highWater;
        int64_t total = 0;
        EXPECT_EQ(printList(stream, true, &total), c.expected) << c.name;
        EXPECT_EQ(rc_, 0) << c.name;
    }
}

TEST_F(PoolPrinterTest, PoolsAboveTheHighestIdentifierAreSkipped) {
    // Identifier 60 lies above the engine's 52; it lacks even its size.
    std::string stream =
        wrapStream(StreamBuilder().pool(60, std::nullopt).pool(11, 500).pool(60, 7).str());
    int64_t total = -1;
    EXPECT_EQ(printList(stream, true, &total), "   other       \n   500         \n\n");
    EXPECT_EQ(total, 500);

    options_.verbose = 1;
    std::string onlySkipped = wrapStream(StreamBuilder().pool(60, 7).str());
    EXPECT_EQ(printList(onlySkipped, true, &total), "total [0]\n\n");
    EXPECT_EQ(total, 0);
    EXPECT_EQ(rc_, 0);
}

TEST_F(PoolPrinterTest, RegionWithoutPoolsSaysSoOnce) {
    std::string stream = wrapStream(StreamBuilder().text(321, "SAMPLE").str());
    for (uint8_t verbose : {0, 1}) {
        options_.verbose = verbose;
        int64_t total = -1;
        EXPECT_EQ(printList(stream, true, &total), "   no pools\n\n");
        EXPECT_EQ(total, 0);
        EXPECT_EQ(rc_, 0);
    }
}

struct InconsistentCase {
    const char* name;
    std::string badPool;
};

TEST_F(PoolPrinterTest, InconsistentPoolDropsPendingLinesAndKeepsThePartialTotal) {
    const InconsistentCase cases[] = {
        {"no identifier", StreamBuilder().open(40).u64(687, 5).close().str()},
        {"no size", StreamBuilder().pool(5, std::nullopt, 5).str()},
        {"too short", StreamBuilder().raw(1, 40, 4, "abcd").str()},
    };
    for (uint8_t verbose : {0, 1}) {
        for (const InconsistentCase& c : cases) {
            options_.verbose = verbose;
            gLastRc = 0;
            std::string stream = wrapStream(StreamBuilder().pool(11, 100).pool(12, 200).str() +
                                            c.badPool + StreamBuilder().pool(4, 400).str());
            int64_t total = -1;
            std::string out = printList(stream, true, &total);
            if (verbose) {
                EXPECT_EQ(out, "cur [Other Memory] [100]\ncur [Package Cache] [200]\n") << c.name;
            } else {
                EXPECT_EQ(out, "") << c.name;
            }
            EXPECT_EQ(rc_, -4) << c.name;
            EXPECT_EQ(gLastRc, 1) << c.name;
            EXPECT_EQ(total, 300) << c.name;
        }
    }
    std::string log = instance_.diagLog();
    size_t records = 0;
    for (size_t at = log.find("Inconsistent Monitor output"); at != std::string::npos;
         at = log.find("Inconsistent Monitor output", at + 1)) {
        ++records;
    }
    EXPECT_EQ(records, 6u);
    EXPECT_NE(log.find("func=0x18780029 probe=50"), std::string::npos);
    EXPECT_NE(log.find("int32(4): 1\n"), std::string::npos);
}

// A database snapshot: SAMPLE with pools 5, 20 and 30; OTHER with pool 20;
// SAMPLE2 with pool 20.
std::string databaseStream() {
    StreamBuilder b;
    b.open(13).text(321, "SAMPLE").pool(5, 111).pool(20, 4000 * K).pool(30, 333).close();
    b.open(13)
        .text(321, "OTHER")
        .pool(20, 2048, std::nullopt, std::nullopt, std::string("USERBP1"));
    b.close();
    b.open(13).text(321, "SAMPLE2").pool(20, 1).close();
    return wrapStream(b.str());
}

TEST_F(PoolPrinterTest, DatabasePoolPrintsOnlyPool20OfTheNamedDatabase) {
    std::string stream = databaseStream();
    int64_t total = -1;
    EXPECT_EQ(printDatabasePool(stream, "SAMPLE", &total), "   appshrh     \n   3.9M        \n\n");
    EXPECT_EQ(rc_, 0);
    EXPECT_EQ(total, 4000 * K);

    // Never with the buffer pool name, whatever the pool stands for.
    EXPECT_EQ(printDatabasePool(stream, "OTHER", &total), "   appshrh     \n   2.0K        \n\n");
    EXPECT_EQ(total, 2048);
}

TEST_F(PoolPrinterTest, DatabasePoolOfAnUnknownDatabasePrintsNothing) {
    std::string stream = databaseStream();
    for (const char* name : {"MISSING", "SAMPL", "SAMPLE22", ""}) {
        int64_t total = -1;
        EXPECT_EQ(printDatabasePool(stream, name, &total), "") << name;
        EXPECT_EQ(rc_, 1) << name;
        EXPECT_EQ(total, 0) << name;
    }
}

TEST_F(PoolPrinterTest, DatabasePoolVerboseAddsATotalUnlessZero) {
    options_.verbose = 1;
    StreamBuilder b;
    b.open(13).text(321, "SAMPLE").pool(20, 4096).close();
    b.open(13).text(321, "EMPTY").pool(20, 0).close();
    std::string stream = wrapStream(b.str());
    int64_t total = -1;
    EXPECT_EQ(printDatabasePool(stream, "SAMPLE", &total),
              "cur [Applications Shared Heap] [4096]\ntotal [4096]\n\n");
    EXPECT_EQ(total, 4096);
    EXPECT_EQ(printDatabasePool(stream, "EMPTY", &total), "cur [Applications Shared Heap] [0]\n");
    EXPECT_EQ(rc_, 0);
    EXPECT_EQ(total, 0);
}

TEST_F(PoolPrinterTest, DatabasePoolTakesTheFirstSectionThatHoldsIt) {
    StreamBuilder b;
    b.open(13).text(321, "SAMPLE").pool(5, 10).close();
    b.open(13).text(321, "SAMPLE").pool(20, 2000).close();
    b.open(13).text(321, "SAMPLE").pool(20, 3000).close();
    int64_t total = -1;
    EXPECT_EQ(printDatabasePool(wrapStream(b.str()), "SAMPLE", &total),
              "   appshrh     \n   2.0K        \n\n");
    EXPECT_EQ(total, 2000);
}

TEST_F(PoolPrinterTest, DatabasePoolStopsAtASectionWithoutName) {
    StreamBuilder b;
    b.open(13).pool(20, 2000).close();
    b.open(13).text(321, "SAMPLE").pool(20, 3000).close();
    int64_t total = -1;
    EXPECT_EQ(printDatabasePool(wrapStream(b.str()), "SAMPLE", &total), "");
    EXPECT_EQ(rc_, 1);
    EXPECT_EQ(total, 0);
}

TEST_F(PoolPrinterTest, DatabasePoolInconsistentPoolFailsWithoutARecord) {
    StreamBuilder b;
    b.open(13).text(321, "SAMPLE").open(40).u64(687, 5).close().pool(20, 3000).close();
    int64_t total = -1;
    EXPECT_EQ(printDatabasePool(wrapStream(b.str()), "SAMPLE", &total), "");
    EXPECT_EQ(rc_, -4);
    EXPECT_EQ(gLastRc, 1);
    EXPECT_EQ(total, 0);
    EXPECT_EQ(instance_.diagLog().find("Inconsistent"), std::string::npos);
}

TEST_F(PoolPrinterTest, DatabasePoolPassesOverOtherPools) {
    // Only the identifier is read on the way to pool 20, so a pool that
    // lacks its sizes does not stop the search.
    StreamBuilder b;
    b.open(13).text(321, "SAMPLE").pool(60, std::nullopt).pool(20, 3000).close();
    int64_t total = -1;
    EXPECT_EQ(printDatabasePool(wrapStream(b.str()), "SAMPLE", &total),
              "   appshrh     \n   2.9K        \n\n");
    EXPECT_EQ(total, 3000);
}

TEST_F(PoolPrinterTest, DatabasePoolAboveTheHighestIdentifierIsNotPrinted) {
    instance_.writeJson(R"({"maxPoolId": 11})");
    StreamBuilder b;
    b.open(13).text(321, "SAMPLE").pool(20, 3000).close();
    int64_t total = -1;
    options_.verbose = 1;
    EXPECT_EQ(printDatabasePool(wrapStream(b.str()), "SAMPLE", &total), "");
    EXPECT_EQ(rc_, 0);
    EXPECT_EQ(total, 0);
}

}  // namespace
