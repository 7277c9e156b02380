// The data stream search over hand-built streams, each copied into a heap
// block of exactly its size so that the sanitizers see any read past it.
#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "engine/vrxwint.h"
#include "monitor/mtrkStream.h"
#include "streamBuilder.h"
#include "testInstance.h"

using mtrktest::StreamBuilder;
using mtrktest::wrapElement;
using mtrktest::wrapStream;

namespace {

// A stream in a heap block of exactly its size.
struct Block {
    explicit Block(const std::string& bytes)
        : data(new char[bytes.size()]), size(static_cast<uint32_t>(bytes.size())) {
        std::memcpy(data.get(), bytes.data(), bytes.size());
    }
    const char* at(uint32_t offset = 0) const { return data.get() + offset; }
    std::unique_ptr<char[]> data;
    uint32_t size;
};

uint32_t u32At(const char* data) {
    uint32_t v;
    std::memcpy(&v, data, 4);
    return v;
}

// `inner` inside `levels` nested sections, built without recursion.
std::string nested(int levels, const std::string& inner) {
    std::string out;
    for (int i = levels; i > 0; --i)
        out += StreamBuilder().raw(1, 13, static_cast<uint32_t>(8 * (i - 1) + inner.size())).str();
    return out + inner;
}

// The value of the first u32 element 302 that the search finds, or -1.
int64_t found302(const std::string& stream) {
    const Block b(stream);
    const char* header = nullptr;
    const char* data = nullptr;
    if (mtrkFindElement(302, b.at(), b.size, &header, &data) != 0)
        return -1;
    EXPECT_EQ(data, header + 8);
    EXPECT_GE(header, b.at());
    EXPECT_LE(data + 4, b.at(b.size));
    return u32At(data);
}

TEST(StreamSearch, RegionsOfEightBytesOrLessMissAndLeaveOutputsAlone) {
    Block b(StreamBuilder().u32(302, 7).str());
    for (uint32_t length : {0u, 1u, 8u}) {
        const char* header = "sentinel";
        const char* data = header;
        EXPECT_EQ(mtrkFindElement(302, b.at(), length, &header, &data), 1) << length;
        EXPECT_STREQ(header, "sentinel");
        EXPECT_STREQ(data, "sentinel");
    }
}

TEST(StreamSearch, AnElementWithEmptyDataAtTheRegionsEndIsNeverExamined) {
    const char* h;
    const char* d;
    Block alone(StreamBuilder().text(321, "").str());
    EXPECT_EQ(mtrkFindElement(321, alone.at(), alone.size, &h, &d), 1);

    Block last(StreamBuilder().u32(686, 1).text(321, "").str());
    EXPECT_EQ(mtrkFindElement(321, last.at(), last.size, &h, &d), 1);
    EXPECT_EQ(h, last.at(0)) << "the last element examined is the first one";

    // One byte of data is enough to be examined.
    Block oneByte(StreamBuilder().u32(686, 1).text(321, "x").str());
    ASSERT_EQ(mtrkFindElement(321, oneByte.at(), oneByte.size, &h, &d), 0);
    EXPECT_EQ(h, oneByte.at(12));
    EXPECT_EQ(d, oneByte.at(20));

    // A header element that bears the identifier is found itself.
    Block sections(wrapElement(13, wrapElement(13, StreamBuilder().u32(302, 1).str())));
    ASSERT_EQ(mtrkFindElement(13, sections.at(), sections.size, &h, &d), 0);
    EXPECT_EQ(h, sections.at(0));
}

TEST(StreamSearch, SearchesDepthFirstInStreamOrderAndSurvivesDamage) {
    const std::string value1 = StreamBuilder().u32(302, 1).str();
    const std::string value2 = StreamBuilder().u32(302, 2).str();
    struct Case {
        const char* name;
        std::string stream;
        int64_t expected;
    };
    const Case cases[] = {
        {"nested before a later top-level one", wrapElement(13, value1) + value2, 1},
        {"a nested miss does not end the walk",
         wrapElement(13, StreamBuilder().u32(686, 9).str()) + wrapElement(5, value1), 1},
        {"deeper nesting first", wrapElement(1, nested(2, value1)) + value2, 1},
        {"value elements are not descended into",
         StreamBuilder().raw(2, 874, 12, value1).str() + value2, 2},
        {"a header element with empty data is stepped over", wrapElement(13, "") + value2, 2},
        // The engine nests three levels; a few dozen are still searched in full.
        {"fifty levels", nested(50, value1) + value2, 1},
        // Deeper than the walk keeps track of: passed over, but never a
        // stack exhausted or a read outside the stream.
        {"nesting as deep as the stream allows", nested(1 << 20, value1) + value2, 2},
        // A nested element claims more than its section holds: the section's
        // walk misses, the outer walk goes on after the section.
        {"a size past the enclosing section",
         wrapElement(13, StreamBuilder().raw(3, 302, 100, "abcd").str()) + value2, 2},
        // The sought element itself runs past the region: no data pointer
        // into the wild.
        {"the sought element past the region",
         StreamBuilder().u32(686, 1).raw(3, 302, 5000, "abcd").str(), -1},
        {"a size that would wrap around",
         StreamBuilder().raw(2, 874, 0xFFFFFFF8u, "12345678").str() + value2, -1},
        {"the largest size", StreamBuilder().raw(2, 874, 0xFFFFFFFFu, "12345678").str() + value2,
         -1},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        EXPECT_EQ(found302(c.stream), c.expected);
    }
}

// Walks a region the way the reports do: sections (`section` given) from
// each one's data on, pools from each one's header on. Collects each
// section's u32 302 or each pool's identifier.
std::vector<uint32_t> walk(const std::string& region, uint16_t section) {
    const Block b(region);
    std::vector<uint32_t> found;
    const char* start = b.at();
    uint32_t length = b.size;
    const char* header;
    const char* data;
    uint32_t remaining = 0;
    uint32_t size = 0;
    while (found.size() < 10) {
        if ((section != 0
                 ? mtrkFindNextElement(start, length, &header, &data, &remaining, section)
                 : mtrkFindNextPool(start, length, &header, &data, &remaining, &size)) != 0)
            break;
        start = section != 0 ? data : header;
        EXPECT_EQ(remaining, static_cast<uint32_t>(b.at(b.size) - start));
        EXPECT_EQ(size, section != 0 ? 0 : mtrkReadHeader(header).size);
        uint32_t value = 0;
        EXPECT_EQ(mtrkGetU32(section != 0 ? 302 : 686, data, mtrkReadHeader(header).size, &value),
                  0);
        found.push_back(value);
        length = remaining;
    }
    return found;
}

TEST(StreamFindNext, IteratesSectionsAndPoolsInStreamOrder) {
    StreamBuilder body;
    for (uint32_t n : {11u, 22u, 33u})
        body.open(13).u32(302, n).pool(1, 100).close();
    body.open(10).u32(549, 0).close();
    const std::string sections = wrapStream(body.str());
    const std::string pools = StreamBuilder().pool(1, 10).pool(2, 20, 21).pool(3, 30).str();
    struct Case {
        const char* name;
        std::string region;
        uint16_t section;  // 0: pools
        std::vector<uint32_t> found;
    };
    const Case cases[] = {
        {"sections", sections, 13, {11, 22, 33}},
        {"sections of another kind", sections, 5, {}},
        {"pools of a section's data", StreamBuilder().text(321, "DB").str() + pools, 0, {1, 2, 3}},
        {"a region that begins with a pool", pools, 0, {2, 3}},
        {"pools of a whole stream", wrapStream(pools), 0, {1, 2, 3}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        EXPECT_EQ(walk(c.region, c.section), c.found);
    }
}

TEST(StreamFindNext, StepsOverAStartThatBearsTheIdentifier) {
    Block b(StreamBuilder().u32(302, 1).u32(302, 2).u32(302, 3).str());
    const char* h;
    const char* d;
    uint32_t remaining = 0;
    ASSERT_EQ(mtrkFindNextElement(b.at(0), b.size, &h, &d, &remaining, 302), 0);
    EXPECT_EQ(u32At(d), 2u);
    EXPECT_EQ(remaining, b.size - 20);
    // Called with the last one, nothing remains.
    EXPECT_EQ(mtrkFindNextElement(b.at(24), 12, &h, &d, &remaining, 302), 1);
    // The first element's size + 8 covering the whole length leaves nothing.
    EXPECT_EQ(mtrkFindNextElement(b.at(0), 12, &h, &d, &remaining, 302), 1);
}

TEST(StreamFindNext, ADamagedOrEmptyRegionReadsNothing) {
    const char* h = nullptr;
    const char* d = nullptr;
    uint32_t remaining = 99;
    uint32_t size = 99;
    EXPECT_EQ(mtrkFindNextElement(nullptr, 0, &h, &d, &remaining, 13), 1);
    EXPECT_EQ(mtrkFindNextPool(nullptr, 0, &h, &d, &remaining, &size), 1);
    EXPECT_EQ(remaining, 99u);
    EXPECT_EQ(size, 99u);
    for (uint32_t claimed : {0xFFFFFFF8u, 0xFFFFFFFFu, 0xFFFFFFF0u}) {
        Block b(StreamBuilder().raw(2, 874, claimed, "12345678").u32(302, 1).str());
        EXPECT_EQ(mtrkFindNextElement(b.at(), b.size, &h, &d, &remaining, 874), 1) << claimed;
        EXPECT_EQ(mtrkFindNextPool(b.at(), b.size, &h, &d, &remaining, &size), 1) << claimed;
    }
}

TEST(StreamValues, ReadsValuesAndTreatsShortOnesAsMissing) {
    // An odd offset in the block: the values are unaligned.
    Block b(" " + StreamBuilder()
                      .u32(686, 0xDEADBEEF)
                      .u64(687, -5)
                      .u64(688, INT64_MAX)
                      .raw(4, 689, 7, "1234567")
                      .str());
    const char* start = b.at(1);
    const uint32_t length = b.size - 1;
    uint32_t id = 0;
    int64_t value = 0;
    EXPECT_EQ(mtrkGetPoolId(start, length, &id), 0);
    EXPECT_EQ(id, 0xDEADBEEFu);
    EXPECT_EQ(mtrkGetPoolCurrentSize(start, length, &value), 0);
    EXPECT_EQ(value, -5);
    EXPECT_EQ(mtrkGetPoolMaximum(start, length, &value), 0);
    EXPECT_EQ(value, INT64_MAX);
    value = 42;
    EXPECT_EQ(mtrkGetPoolHighWater(start, length, &value), 1) << "7 bytes are no u64";
    EXPECT_EQ(value, 42);

    Block shortU32(StreamBuilder().raw(3, 686, 3, "abc").u32(686, 1).str());
    EXPECT_EQ(mtrkGetPoolId(shortU32.at(), shortU32.size, &id), 1);
    EXPECT_EQ(mtrkGetU32(549, shortU32.at(), shortU32.size, &id), 1) << "absent";
}

TEST(StreamStrings, CopyingKeepsAtMostCapacityLessOneCharacters) {
    struct Case {
        std::string text;
        uint32_t capacity;
        std::string buffer;  // afterwards, one guard byte past the capacity
    };
    const Case cases[] = {
        {std::string(300, 'a'), 256, std::string(255, 'a') + '\0' + '#'},
        {std::string("ABCD\0EFG", 8), 10, std::string("ABCD\0\0\0\0\0##", 11)},  // a NUL ends it
        {"AB", 0, "#"},
        {"AB", 1, std::string("\0#", 2)},
        {"", 4, std::string("\0####", 5)},
        // Never more than the text and its terminator, so the following
        // element's bytes never come along.
        {"AB", 7, std::string("AB\0#####", 8)},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.text.substr(0, 8) + " into " + std::to_string(c.capacity));
        Block b(StreamBuilder().text(321, c.text).u32(302, 0x41414141).str());
        std::string buffer(c.capacity + 1, '#');
        mtrkCopyString(b.at(), buffer.data(), c.capacity);
        EXPECT_EQ(buffer, c.buffer);
    }

    Block b(StreamBuilder().u32(302, 1).text(874, "USERBP1").str());
    char buffer[16] = "untouched";
    EXPECT_EQ(mtrkGetString(321, b.at(), b.size, buffer, sizeof(buffer)), 1);
    EXPECT_STREQ(buffer, "untouched") << "left alone on a miss";
    EXPECT_EQ(mtrkGetString(874, b.at(), b.size, buffer, sizeof(buffer)), 0);
    EXPECT_STREQ(buffer, "USERBP1");
}

TEST(StreamStrings, RefreshNameComparesWholeNames) {
    struct Case {
        std::string held;
        std::string fresh;
        uint32_t capacity;
        uint8_t changed;
        std::string after;
    };
    const Case cases[] = {
        {"SAMPLE", "SAMPLE", 16, 0, "SAMPLE"},
        {"SAMPLE2", "SAMPLE", 16, 1, "SAMPLE"},
        {"SAMPLE", "SAMPLE2", 16, 1, "SAMPLE2"},
        {"", "", 16, 0, ""},
        {"", "A", 16, 1, "A"},
        {"A", "", 16, 1, ""},
        {"ABC", "ABCDEF", 4, 0, "ABC"},
        {"AB", std::string("AB\0CD", 5), 16, 0, "AB"},
        {"ABD", "ABCDEF", 4, 1, "ABC"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.held + " -> " + c.fresh);
        Block b(StreamBuilder().text(321, c.fresh).u32(302, 1).str());
        std::vector<char> name(c.capacity, '\0');
        std::memcpy(name.data(), c.held.data(), c.held.size());
        uint8_t changed = 7;
        ASSERT_EQ(mtrkRefreshName(b.at(), b.size, name.data(), c.capacity, &changed), 0);
        EXPECT_EQ(changed, c.changed);
        EXPECT_EQ(std::string(name.data()), c.after);
        EXPECT_EQ(mtrkRefreshName(b.at(), b.size, name.data(), c.capacity, nullptr), 0);
    }

    Block noName(StreamBuilder().u32(302, 1).str());
    char name[8] = "KEEP";
    uint8_t changed = 7;
    EXPECT_EQ(mtrkRefreshName(noName.at(), noName.size, name, sizeof(name), &changed), 1);
    EXPECT_STREQ(name, "KEEP");
    EXPECT_EQ(changed, 7);
}

TEST(StreamDamage, StreamLengthNeverExceedsTheBlock) {
    Block b(StreamBuilder().raw(1, 1, 1000, "12345678").str());
    EXPECT_EQ(mtrkStreamLength(b.at(), b.size), b.size);
    EXPECT_EQ(mtrkStreamLength(b.at(), 7), 0u);
    EXPECT_EQ(mtrkStreamLength(nullptr, 100), 0u);
    const std::string stream = wrapStream(StreamBuilder().u32(302, 1).str());
    Block exact(stream);
    EXPECT_EQ(mtrkStreamLength(exact.at(), exact.size), exact.size);
    Block withSlack(stream + "slack");
    EXPECT_EQ(mtrkStreamLength(withSlack.at(), withSlack.size), withSlack.size - 5);
}

TEST(StreamTrace, FindNextOperationsReportEntryExitAndFlightRecord) {
    mtrktest::TempInstance instance;
    instance.activate();
    Block b(StreamBuilder().pool(1, 10).pool(2, 20).str());
    uint8_t* word = g_sqltCompTraceFlags + VRX_TRACE_WORD_OFFSET;
    const uint32_t flags = VRX_TRACE_ENTRY | VRX_TRACE_EXIT | VRX_TRACE_FLIGHT;
    uint32_t saved;
    std::memcpy(&saved, word, 4);
    std::memcpy(word, &flags, 4);
    const char* h;
    const char* d;
    uint32_t remaining;
    uint32_t size;
    const int32_t poolRc = mtrkFindNextPool(b.at(), b.size, &h, &d, &remaining, &size);
    const int32_t elementRc = mtrkFindNextElement(b.at(), b.size, &h, &d, &remaining, 13);
    std::memcpy(word, &saved, 4);
    EXPECT_EQ(poolRc, 0);
    EXPECT_EQ(elementRc, 1);
    EXPECT_EQ(instance.traceLog(),
              "entry 0x18780015\nexit 0x18780015 rc=0\nflight 0x18780015 rc=0\n"
              "entry 0x18780014\nexit 0x18780014 rc=1\nflight 0x18780014 rc=1\n");
}

}  // namespace
