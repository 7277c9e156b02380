// ossSnprintf formats the common conversions itself; whatever it writes and
// returns must be exactly what the C library's vsnprintf would, for every
// buffer size, including the conversions that it hands over.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <limits>
#include <random>
#include <string>

#include "engine/vrxosse.h"

namespace {

// Formats with both, into buffers of every size up to the full length and
// one beyond, and compares the bytes written (including what lies past the
// terminator, which must be untouched) and the results.
template <typename... Args>
void expectSameAsLibrary(const char* format, Args... args) {
    char expected[2048];
    int fullLength = std::snprintf(expected, sizeof expected, format, args...);
    ASSERT_GE(fullLength, 0) << format;
    ASSERT_LT(fullLength, 1500) << format;
    for (size_t size : {size_t{0}, size_t{1}, size_t{2}, size_t(fullLength / 2), size_t(fullLength),
                        size_t(fullLength + 1), sizeof expected}) {
        char mine[2048];
        char theirs[2048];
        std::memset(mine, '#', sizeof mine);
        std::memset(theirs, '#', sizeof theirs);
        int mineResult = ossSnprintf(mine, size, format, args...);
        int theirResult = std::snprintf(theirs, size, format, args...);
        ASSERT_EQ(mineResult, theirResult) << format << " size " << size;
        ASSERT_EQ(std::memcmp(mine, theirs, sizeof mine), 0)
            << format << " size " << size << ": \"" << std::string(mine, strnlen(mine, size))
            << "\" against \"" << std::string(theirs, strnlen(theirs, size)) << "\"";
    }
}

TEST(BoundedFormat, TextsAndIntegersAsTheLibraryWritesThem) {
    expectSameAsLibrary("plain text, no conversion");
    expectSameAsLibrary("");
    expectSameAsLibrary("100%% sure %s", "of it");
    expectSameAsLibrary("%s", "");
    expectSameAsLibrary("%s", "a text cut at every buffer size");
    expectSameAsLibrary("%s (%s)", "bph", "USERBP1");
    expectSameAsLibrary("%-12s|", "utilh");
    expectSameAsLibrary("%-12s|", "exactly12chr");
    expectSameAsLibrary("%-12s|", "a label longer than its column");
    expectSameAsLibrary("%12s|%-3s|%.3s|%-8.2s|", "right", "ab", "abcdef", "xyz");
    expectSameAsLibrary("%c%c%c", 'a', ' ', '~');
    expectSameAsLibrary("[%c]", 0);
    expectSameAsLibrary("%d %i %u", 0, -1, 4000000000u);
    expectSameAsLibrary("%d %d", std::numeric_limits<int>::min(), std::numeric_limits<int>::max());
    expectSameAsLibrary("%lld|%-25lld|%25lld", std::numeric_limits<long long>::min(),
                        std::numeric_limits<long long>::max(), -42LL);
    expectSameAsLibrary("%llu %lu %zu %zd", std::numeric_limits<unsigned long long>::max(), 7UL,
                        size_t{123456}, ptrdiff_t{-9});
    expectSameAsLibrary("%ld           ", 999L);
    expectSameAsLibrary("%04d/%02d/%02d", 2026, 12, 6);  // the '0' flag is handed over
    expectSameAsLibrary("%x %5.3d %+d % d %#o %-08d", 255, 7, 3, 4, 8, 9);
    expectSameAsLibrary("%s", static_cast<const char*>(nullptr));
    expectSameAsLibrary("%.3s", static_cast<const char*>(nullptr));
    // A format that the library refuses is refused the same way.
    char buffer[32];
    const char* loneSign = "ends with a lone %";
    EXPECT_EQ(ossSnprintf(buffer, sizeof buffer, loneSign),
              std::snprintf(buffer, sizeof buffer, loneSign));
}

TEST(BoundedFormat, FixedPointRoundsAsTheLibraryDoes) {
    // Ties go to the even digit; values just beside a tie go their own way.
    for (double v : {0.0,
                     -0.0,
                     0.05,
                     0.15,
                     0.25,
                     0.35,
                     0.45,
                     0.75,
                     1.25,
                     2.5,
                     3.5,
                     999.95,
                     999.9499999,
                     1000.0,
                     1e-300,
                     5e-324,
                     -0.04,
                     -0.05,
                     -1.25,
                     123456789.125,
                     9.999999e17,
                     4503599627370496.5,
                     9007199254740993.0,
                     1e17 + 0.5}) {
        SCOPED_TRACE(v);
        expectSameAsLibrary("%3.1f%c          ", v, 'K');
        expectSameAsLibrary("%.0f|%f|%.9f|%-12.2f|%12.3f", v, v, v, v, v);
    }
    // Handed over: not finite, or too large for 64-bit digits.
    for (double v : {double{INFINITY}, -double{INFINITY}, double{NAN}, 1e18, 1e300, -2e19}) {
        SCOPED_TRACE(v);
        expectSameAsLibrary("%3.1f|%.9f|%.12f|%lf", v, v, v, v);
    }
}

// What the pool printer formats: sizes divided by 1024 in single precision,
// widened, with one decimal; and random doubles of every scale.
TEST(BoundedFormat, RandomValuesMatchTheLibrary) {
    std::mt19937_64 random(20261206);
    for (int i = 0; i < 200000; ++i) {
        uint64_t size = random() >> (random() % 64);
        float value = static_cast<float>(size) * 0.0009765625f;
        while (value >= 1000.0f)
            value *= 0.0009765625f;
        char mine[64];
        char theirs[64];
        int a =
            ossSnprintf(mine, sizeof mine, "%3.1f%c          ", static_cast<double>(value), 'M');
        int b = std::snprintf(theirs, sizeof theirs, "%3.1f%c          ",
                              static_cast<double>(value), 'M');
        ASSERT_EQ(a, b);
        ASSERT_STREQ(mine, theirs) << "size " << size;
    }
    for (int i = 0; i < 100000; ++i) {
        uint64_t bits = random();
        double v;
        std::memcpy(&v, &bits, sizeof v);
        char format[8];
        std::snprintf(format, sizeof format, "%%.%df", static_cast<int>(random() % 10));
        char mine[512];
        char theirs[512];
        int a = ossSnprintf(mine, sizeof mine, format, v);
        int b = std::snprintf(theirs, sizeof theirs, format, v);
        ASSERT_EQ(a, b);
        ASSERT_STREQ(mine, theirs);
        // Scaled into the range formatted here.
        int exponent;
        double scaled = std::ldexp(std::frexp(v, &exponent), static_cast<int>(random() % 60) - 20);
        std::snprintf(theirs, sizeof theirs, "%.9f %.1f %.4f", scaled, scaled, scaled);
        ossSnprintf(mine, sizeof mine, "%.9f %.1f %.4f", scaled, scaled, scaled);
        ASSERT_STREQ(mine, theirs) << scaled;
    }
}

}  // namespace
