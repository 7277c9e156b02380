// sqlogmsg: inserts, the caller's buffer and the failures it answers.
#include <cstring>

#include "catalogFiles.h"
#include "engine/vrxsys.h"

namespace mtrktest {
namespace {

class CatalogInsertTest : public MessageTest {};

TEST_F(CatalogInsertTest, InsertsAreReplacedInOnePass) {
    struct Case {
        const char* text;
        std::vector<std::string> inserts;
        const char* expected;
    };
    const Case cases[] = {
        {"on %1 at %2", {"2026/12/06", "20:05:39"}, "on 2026/12/06 at 20:05:39"},
        {"%2 before %1", {"one", "two"}, "two before one"},
        {"%1%1%1", {"ab"}, "ababab"},
        // An insert's own text is never read as a placeholder.
        {"[%1] [%2]", {"%2", "%1"}, "[%2] [%1]"},
        {"[%1]", {"100%%"}, "[100%%]"},
        {"100%% of %1", {"pool"}, "100% of pool"},
        {"%%1 is no placeholder", {"x"}, "%1 is no placeholder"},
        {"%%%1", {"x"}, "%x"},
        // Only %1 and %2 are placeholders.
        {"%3 %0 %a %", {"x", "y"}, "%3 %0 %a %"},
        {"ends in %", {}, "ends in %"},
        // A placeholder without an insert becomes the empty text, and the
        // entry after the tables (which hold as many entries as inserts,
        // at least one) is never read: the sanitizer build would see it.
        {"[%1] [%2]", {"only"}, "[only] []"},
        {"[%1] [%2]", {}, "[] []"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.text);
        // A catalog of its own per row, so that no cached one answers.
        std::string name = "probe" + std::to_string(&c - cases) + ".mo";
        instanceCatalog(name, {{"7", c.text}});
        EXPECT_EQ(fetch(name, 7, c.inserts).text, c.expected);
    }
}

TEST_F(CatalogInsertTest, LengthTableBoundsEachInsertAndNullTablesHoldNone) {
    instanceCatalog("probe.mo", {{"7", "[%1] [%2]"}});
    const char* inserts[2] = {"abcdef", "ghi"};
    const uint64_t lengths[2] = {3, 100};
    char buffer[64];
    // The first is cut at its length; the second ends at its terminator
    // although its length says more.
    EXPECT_EQ(sqlogmsg("probe.mo", 7, lengths, inserts, buffer, sizeof buffer, nullptr, 0, nullptr,
                       nullptr),
              11);
    EXPECT_STREQ(buffer, "[abc] [ghi]");
    EXPECT_EQ(sqlogmsg("probe.mo", 7, nullptr, nullptr, buffer, sizeof buffer, nullptr, 0, nullptr,
                       nullptr),
              5);
    EXPECT_STREQ(buffer, "[] []");
}

TEST_F(CatalogInsertTest, TextIsCutToTheBuffer) {
    // "Größe" is G r ö(2 bytes) ß(2 bytes) e: 7 bytes.
    instanceCatalog("probe.mo", {{"7", "abcdef"}, {"8", "Größe"}});
    struct Case {
        uint32_t number;
        uint32_t bufferSize;
        const char* expected;
    };
    const Case cases[] = {
        {7, 7, "abcdef"},  // exactly the text and its terminator
        {7, 6, "abcde"},   // one byte short: the last character goes
        {7, 1, ""},       {8, 8, "Größe"}, {8, 7, "Größ"}, {8, 6, "Grö"},  // never half of ß
        {8, 5, "Grö"},    {8, 4, "Gr"},                                    // never half of ö
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::to_string(c.number) + " into " + std::to_string(c.bufferSize));
        auto result = fetch("probe.mo", c.number, {}, c.bufferSize);
        EXPECT_EQ(result.text, c.expected);
        EXPECT_EQ(result.rc, static_cast<int32_t>(std::strlen(c.expected)));
    }
}

TEST_F(CatalogInsertTest, LongInsertIsCutWithTheText) {
    instanceCatalog("probe.mo", {{"7", "name: %1!"}});
    std::string longName(6000, 'n');
    auto result = fetch("probe.mo", 7, {longName});
    EXPECT_EQ(result.rc, 4999);
    EXPECT_EQ(result.text, "name: " + longName.substr(0, 4993));
    // An insert is cut where the text would be: never inside a character.
    instanceCatalog("probe.mo", {{"8", "a%1."}});
    for (auto [size, expected] : {std::pair{6u, "aöß"}, std::pair{5u, "aö"}, std::pair{4u, "aö"},
                                  std::pair{3u, "a"}, std::pair{2u, "a"}}) {
        SCOPED_TRACE(size);
        EXPECT_EQ(fetch("probe.mo", 8, {"öß"}, size).text, expected);
    }
}

TEST_F(CatalogInsertTest, FailuresAnswerNegative) {
    instanceCatalog("probe.mo", {{"7", "seven"}, {"8", "eight"}});
    // (messageFail is swept end to end over every message of the program.)
    instance_->writeJson(R"({"faults": {"messageFail": [8]}})");
    char buffer[8] = "garbage";
    const char* none[1] = {nullptr};
    const uint64_t zero[1] = {0};
    EXPECT_LT(sqlogmsg(nullptr, 7, zero, none, buffer, sizeof buffer, nullptr, 0, nullptr, nullptr),
              0);
    EXPECT_LT(sqlogmsg("probe.mo", 7, zero, none, nullptr, 8, nullptr, 0, nullptr, nullptr), 0);
    EXPECT_LT(sqlogmsg("probe.mo", 7, zero, none, buffer, 0, nullptr, 0, nullptr, nullptr), 0);
    EXPECT_STREQ(buffer, "garbage") << "a buffer of size 0 must stay untouched";
    // A failed fetch leaves an empty text, not the previous one.
    EXPECT_LT(
        sqlogmsg("probe.mo", 8, zero, none, buffer, sizeof buffer, nullptr, 0, nullptr, nullptr),
        0);
    EXPECT_STREQ(buffer, "");
}

}  // namespace
}  // namespace mtrktest
