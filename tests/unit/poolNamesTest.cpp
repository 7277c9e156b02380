// Pool labels and the size texts of the column layout.
#include <gtest/gtest.h>

#include <cctype>
#include <cstdint>
#include <limits>
#include <optional>
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

constexpr int64_t K = 1024;
constexpr int64_t kMin = std::numeric_limits<int64_t>::min();
constexpr int64_t kMax = std::numeric_limits<int64_t>::max();

TEST(FormatSize, BytesBelowOneThousandAndUnitsFromThere) {
    const std::pair<int64_t, std::string> cases[] = {
        {0, "0"},
        {999, "999"},
        {-1, "-1"},
        {kMin, "-9223372036854775808"},
        // The unit changes at 1000, not 1024.
        {1000, "1.0K"},
        {1023, "1.0K"},
        {192 * K, "192.0K"},
        // Just below 1000 K stays in K and rounds up to 1000.0.
        {1000 * K - 1, "1000.0K"},
        {1000 * K, "1.0M"},
        {8448 * K, "8.2M"},
        {K * K * K, "1.0G"},
        {999 * K * K * K * K, "999.0T"},
        {1000 * K * K * K * K, "1.0P"},
        {512 * K * K * K * K * K, "512.0P"},
        {K * K * K * K * K * K, "1.0E"},
        // The float rounds the largest size up to exactly 8 E.
        {kMax, "8.0E"},
    };
    for (const auto& [size, text] : cases) {
        // Plain numbers are followed by eleven spaces, sizes with a unit by ten.
        EXPECT_EQ(formatSize(size), text + std::string(isdigit(text.back()) ? 11 : 10, ' '))
            << "size " << size;
    }
    for (int64_t size = 1; size > 0 && size < kMax / 3; size = size * 3 + 1) {
        const size_t length = formatSize(size).size();
        EXPECT_GE(length, 12u) << "every size fills at least the name column: " << size;
        EXPECT_LE(length, 17u) << "size " << size;
    }
}

// One pool element's data region, as the printers hand it over.
struct PoolRegion {
    explicit PoolRegion(std::optional<std::string> bufferPool)
        : bytes(StreamBuilder().pool(3, 8192, std::nullopt, std::nullopt, bufferPool).str()) {}
    const char* data() const { return bytes.data() + 8; }
    uint32_t length() const { return static_cast<uint32_t>(bytes.size() - 8); }
    std::string bytes;
};

TEST(BufferPoolName, OnlyWholeSystemNamesAreAbbreviated) {
    const std::pair<std::string, std::string> cases[] = {
        {"System 32k buffer pool", "S32K"},
        {"System 16k buffer pool", "S16K"},
        {"System 8k buffer pool", "S8K"},
        {"System 4k buffer pool", "S4K"},
        // Beginnings of a system name, or a system name with more after it,
        // are user buffer pools of their own.
        {"System", "System"},
        {"S", "S"},
        {"System 8k buffer poolX", "System 8k buffer poolX"},
        {"System 8k buffer poo", "System 8k buffer poo"},
        {"system 8k buffer pool", "system 8k buffer pool"},
        {std::string(300, 'b'), std::string(255, 'b')},  // cut to the buffer
    };
    for (const auto& [name, shortName] : cases) {
        SCOPED_TRACE(name);
        const PoolRegion pool(name);
        char buffer[MTRK_BUFFER_POOL_NAME_SIZE] = {};
        EXPECT_EQ(mtrkGetBufferPoolShortName(pool.data(), pool.length(), buffer, sizeof buffer), 0);
        EXPECT_EQ(buffer, shortName);
        EXPECT_EQ(mtrkGetBufferPoolName(pool.data(), pool.length(), buffer, sizeof buffer), 0);
        EXPECT_EQ(buffer, name.substr(0, 255)) << "the full name is never abbreviated";
    }
    const PoolRegion none(std::nullopt);
    char buffer[MTRK_BUFFER_POOL_NAME_SIZE] = {};
    EXPECT_EQ(mtrkGetBufferPoolShortName(none.data(), none.length(), buffer, sizeof buffer), 1);
    EXPECT_EQ(mtrkGetBufferPoolName(none.data(), none.length(), buffer, sizeof buffer), 1);
    EXPECT_STREQ(buffer, "");
}

TEST(PoolLabel, NameOrDescriptionWithTheBufferPoolWhenShown) {
    struct Case {
        uint32_t poolId;
        const char* bufferPool;
        bool show;
        bool verbose;
        std::string label;
    };
    const Case cases[] = {
        {3, "S8K", true, false, "bph (S8K)"},
        {3, "USERBP1", false, false, "bph"},
        {3, "", true, false, "bph"},
        {12, "", false, false, "pckcacheh"},
        {3, "System 8k buffer pool", true, true, "Buffer Pool Heap (System 8k buffer pool)"},
        {3, "USERBP1", false, true, "Buffer Pool Heap"},
        {3, "", true, true, "Buffer Pool Heap"},
        {7, "", true, true, "FCMBP Heap"},
    };
    for (const Case& c : cases) {
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
