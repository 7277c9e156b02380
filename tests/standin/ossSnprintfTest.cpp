// ossSnprintf keeps vsnprintf's contract: bounded, always terminated, and
// the length that the whole text would have.
#include <gtest/gtest.h>

#include <cstring>

#include "engine/vrxosse.h"

namespace {

TEST(OssSnprintfTest, BoundsAndTerminatesTheText) {
    struct Case {
        size_t size;
        const char* expected;
    };
    const Case cases[] = {
        {32, "pool 42: 8650752"},
        {17, "pool 42: 8650752"},
        {16, "pool 42: 865075"},
        {1, ""},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.size);
        char buffer[40];
        std::memset(buffer, '#', sizeof buffer);
        int length = ossSnprintf(buffer, c.size, "pool %u: %lld", 42u, 8650752LL);
        EXPECT_EQ(length, 16);
        EXPECT_STREQ(buffer, c.expected);
        EXPECT_EQ(buffer[c.size], '#') << "wrote past the given size";
    }
}

TEST(OssSnprintfTest, SizeZeroOnlyMeasures) {
    char buffer[4] = "abc";
    EXPECT_EQ(ossSnprintf(buffer, 0, "%-12s|", "utilh"), 13);
    EXPECT_STREQ(buffer, "abc");
    EXPECT_EQ(ossSnprintf(nullptr, 0, "%d", -6103), 5);
}

}  // namespace
