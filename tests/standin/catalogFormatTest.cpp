// Reading .mo files: both byte orders, and damaged files that must read as
// "no catalog" without any read outside the file. What msgfmt writes is read
// by every test through the built catalogs.
#include <functional>

#include "catalogFiles.h"

namespace mtrktest {
namespace {

using namespace std::string_literals;

class CatalogFormatTest : public MessageTest {
  protected:
    // Each probe catalog exists only in the instance, so a damaged one
    // leaves no other catalog to answer. Every call writes a file of its own:
    // a rewrite of the same size within one tick of the file system's clock
    // cannot be told from the cached file.
    Fetched fetchProbe(const std::string& mo, uint32_t number = 7) {
        std::string name = "probe" + std::to_string(++probes_) + ".mo";
        instance_->writeFile("msg/" + name, mo);
        return fetch(name, number);
    }

  private:
    int probes_ = 0;
};

// Layout of buildMo({{"7", ...}, {"8", ...}}): three entries sorted as "",
// "7", "8"; the original table at 28, the translation table at 52; each
// entry a length word and an offset word.
constexpr size_t kOriginals = 28;
constexpr size_t kTranslations = 52;

TEST_F(CatalogFormatTest, DamagedFilesAndEmptyTextsReadAsMissing) {
    const std::string good = buildMo({{"7", "seven"}, {"8", "eight"}});
    ASSERT_EQ(fetchProbe(good).text, "seven");

    struct Case {
        const char* name;
        std::function<void(std::string&)> damage;
    };
    const Case cases[] = {
        {"empty file", [](std::string& mo) { mo.clear(); }},
        {"header cut short", [](std::string& mo) { mo.resize(19); }},
        {"wrong magic", [](std::string& mo) { mo[0] = 'X'; }},
        {"unknown major revision", [](std::string& mo) { patchWord(mo, 4, 0x00020000); }},
        {"entry count beyond the file", [](std::string& mo) { patchWord(mo, 8, 0x10000000); }},
        {"entry count wrapping the table size",
         [](std::string& mo) { patchWord(mo, 8, 0x20000001); }},
        {"original table at the end",
         [](std::string& mo) { patchWord(mo, 12, static_cast<uint32_t>(mo.size())); }},
        {"translation table wrapping", [](std::string& mo) { patchWord(mo, 16, 0xFFFFFFF8); }},
        {"msgid length huge", [](std::string& mo) { patchWord(mo, kOriginals + 8, 0xFFFFFFFF); }},
        {"msgstr past the end",
         [](std::string& mo) {
             patchWord(mo, kTranslations + 16 + 4, static_cast<uint32_t>(mo.size() - 1));
         }},
        {"msgstr offset and length wrapping",
         [](std::string& mo) {
             patchWord(mo, kTranslations + 16, 0x20);
             patchWord(mo, kTranslations + 16 + 4, 0xFFFFFFF0);
         }},
        {"strings cut off", [](std::string& mo) { mo.resize(mo.size() - 3); }},
        {"an empty translation",
         [](std::string& mo) {
             mo = buildMo({{"7", ""}});
         }},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        std::string mo = good;
        c.damage(mo);
        auto result = fetchProbe(mo);
        EXPECT_LT(result.rc, 0) << result.text;
    }
}

TEST_F(CatalogFormatTest, AcceptedVariants) {
    struct Case {
        const char* name;
        std::string mo;
        uint32_t number;
        std::string expected;
    };
    std::string minorRevision = buildMo({{"7", "seven"}});
    patchWord(minorRevision, 4, 0x00010001);
    const Case cases[] = {
        {"little-endian", buildMo({{"7", "seven"}}), 7, "seven"},
        {"big-endian", buildMo({{"7", "seven"}}, true), 7, "seven"},
        {"revision 1.1", minorRevision, 7, "seven"},
        {"plural entry gives its first form", buildMo({{"7\0sevens"s, "one\0many"s}}), 7, "one"},
        {"many entries", buildMo({{"5", "five"}, {"10", "ten"}, {"100", "hundred"}}), 10, "ten"},
        {"UTF-8 kept as it is", buildMo({{"7", "Größe €"}}), 7, "Größe €"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        EXPECT_EQ(fetchProbe(c.mo, c.number).text, c.expected);
    }
}

}  // namespace
}  // namespace mtrktest
