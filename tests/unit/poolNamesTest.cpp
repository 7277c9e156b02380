// Pool labels and the size texts of the column layout.
#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <string>

#include "messages/mtrkMessages.h"
#include "mtrkOptions.h"
#include "reports/mtrkPoolNames.h"
#include "streamBuilder.h"

namespace {

using mtrktest::StreamBuilder;

std::string formatSize(int64_t size) {
    char text[MTRK_COLUMN_SIZE];
    mtrkFormatSize(size, text);
    return text;
}

std::string spaces(size_t n) {
    return std::string(n, ' ');
}

constexpr int64_t K = 1024;

struct SizeCase {
    int64_t size;
    std::string text;
};

TEST(FormatSize, BytesBelowOneThousandAndUnitsFromThere) {
    const SizeCase cases[] = {
        {0, "0" + spaces(11)},
        {1, "1" + spaces(11)},
        {999, "999" + spaces(11)},
        // The unit changes at 1000, not 1024.
        {1000, "1.0K" + spaces(10)},
        {1023, "1.0K" + spaces(10)},
        {1024, "1.0K" + spaces(10)},
        {64 * K, "64.0K" + spaces(10)},
        {192 * K, "192.0K" + spaces(10)},
        // Just below 1000 K stays in K and rounds up to 1000.0.
        {1000 * K - 1, "1000.0K" + spaces(10)},
        {1000 * K, "1.0M" + spaces(10)},
        {1536 * K, "1.5M" + spaces(10)},
        {8448 * K, "8.2M" + spaces(10)},
        {K * K * K, "1.0G" + spaces(10)},
        {K * K * K * K, "1.0T" + spaces(10)},
        {999 * K * K * K * K, "999.0T" + spaces(10)},
    };
    for (const SizeCase& c : cases) {
        EXPECT_EQ(formatSize(c.size), c.text) << "size " << c.size;
    }
}

TEST(FormatSize, NegativeSizesPrintInFull) {
    EXPECT_EQ(formatSize(-1), "-1" + spaces(11));
    EXPECT_EQ(formatSize(-1048576), "-1048576" + spaces(11));
    EXPECT_EQ(formatSize(std::numeric_limits<int64_t>::min()), "-9223372036854775808" + spaces(11));
}

TEST(FormatSize, PetabytesAndExabytesKeepTheirUnit) {
    const SizeCase cases[] = {
        {1000 * K * K * K * K, "1.0P" + spaces(10)},
        {K * K * K * K * K, "1.0P" + spaces(10)},
        {512 * K * K * K * K * K, "512.0P" + spaces(10)},
        {K * K * K * K * K * K, "1.0E" + spaces(10)},
        // The float rounds the largest size up to exactly 8 E.
        {std::numeric_limits<int64_t>::max(), "8.0E" + spaces(10)},
    };
    for (const SizeCase& c : cases) {
        EXPECT_EQ(formatSize(c.size), c.text) << "size " << c.size;
    }
}

TEST(FormatSize, EverySizeFillsAtLeastTheNameColumn) {
    for (int64_t size = 1; size > 0 && size < std::numeric_limits<int64_t>::max() / 3;
         size = size * 3 + 1) {
        size_t length = formatSize(size).size();
        EXPECT_GE(length, 12u) << "size " << size;
        EXPECT_LE(length, 17u) << "size " << size;
    }
}

// One pool element's data region, as the printers hand it over.
struct PoolRegion {
    std::string bytes;
    const char* data() const { return bytes.data() + 8; }
    uint32_t length() const { return static_cast<uint32_t>(bytes.size() - 8); }
};

PoolRegion poolWithBufferPool(const std::string& bufferPool) {
    return {StreamBuilder().pool(3, 8192, std::nullopt, std::nullopt, bufferPool).str()};
}

std::string shortName(const PoolRegion& pool) {
    char buffer[MTRK_BUFFER_POOL_NAME_SIZE] = {};
    EXPECT_EQ(mtrkGetBufferPoolShortName(pool.data(), pool.length(), buffer, sizeof buffer), 0);
    return buffer;
}

TEST(BufferPoolName, SystemBufferPoolsAreAbbreviated) {
    const std::pair<std::string, std::string> cases[] = {
        {"System 32k buffer pool", "S32K"},
        {"System 16k buffer pool", "S16K"},
        {"System 8k buffer pool", "S8K"},
        {"System 4k buffer pool", "S4K"},
    };
    for (const auto& [name, abbreviation] : cases) {
        EXPECT_EQ(shortName(poolWithBufferPool(name)), abbreviation) << name;
    }
}

TEST(BufferPoolName, OtherNamesKeepTheirFullText) {
    // Beginnings of a system name, or a system name with more after it, are
    // user buffer pools of their own.
    for (const std::string name : {"System", "S", "System 8k buffer poolX", "System 8k buffer poo",
                                   "IBMDEFAULTBP", "system 8k buffer pool"}) {
        EXPECT_EQ(shortName(poolWithBufferPool(name)), name);
    }
}

TEST(BufferPoolName, FullNameIsNeverAbbreviated) {
    PoolRegion pool = poolWithBufferPool("System 16k buffer pool");
    char buffer[MTRK_BUFFER_POOL_NAME_SIZE] = {};
    EXPECT_EQ(mtrkGetBufferPoolName(pool.data(), pool.length(), buffer, sizeof buffer), 0);
    EXPECT_STREQ(buffer, "System 16k buffer pool");
}

TEST(BufferPoolName, LongNameIsCutToTheBuffer) {
    std::string name(300, 'b');
    EXPECT_EQ(shortName(poolWithBufferPool(name)), name.substr(0, 255));
}

TEST(BufferPoolName, PoolWithoutBufferPoolHasNone) {
    PoolRegion pool{StreamBuilder().pool(3, 8192).str()};
    char buffer[MTRK_BUFFER_POOL_NAME_SIZE] = {};
    EXPECT_EQ(mtrkGetBufferPoolShortName(pool.data(), pool.length(), buffer, sizeof buffer), 1);
    EXPECT_EQ(mtrkGetBufferPoolName(pool.data(), pool.length(), buffer, sizeof buffer), 1);
    EXPECT_STREQ(buffer, "");
}

struct LabelCase {
    uint32_t poolId;
    const char* bufferPool;
    bool show;
    bool verbose;
    std::string label;
};

TEST(PoolLabel, NameOrDescriptionWithTheBufferPoolWhenShown) {
    const LabelCase cases[] = {
        {3, "S8K", true, false, "bph (S8K)"},
        {3, "USERBP1", true, false, "bph (USERBP1)"},
        {3, "USERBP1", false, false, "bph"},
        {3, "", true, false, "bph"},
        {12, "", false, false, "pckcacheh"},
        {3, "System 8k buffer pool", true, true, "Buffer Pool Heap (System 8k buffer pool)"},
        {3, "USERBP1", false, true, "Buffer Pool Heap"},
        {3, "", true, true, "Buffer Pool Heap"},
        {18, "", true, true, "Backup/Restore/Util Heap"},
        {7, "", true, true, "FCMBP Heap"},
    };
    for (const LabelCase& c : cases) {
        MtrkOptions options{};
        options.verbose = c.verbose;
        char label[MTRK_TEXT_SIZE];
        mtrkBuildPoolLabel(c.poolId, c.bufferPool, c.show, &options, label);
        EXPECT_EQ(std::string(label), c.label)
            << "pool " << c.poolId << " buffer pool '" << c.bufferPool << "' show " << c.show
            << " verbose " << c.verbose;
    }
}

}  // namespace
