// Which catalog a message comes from: the instance's own, the user's locale
// from the most to the least specific name, then English.
#include <cstdlib>

#include "catalogFiles.h"

namespace mtrktest {
namespace {

class CatalogLookupTest : public MessageTest {};

TEST_F(CatalogLookupTest, LocaleNamesAreTriedFromMostToLeastSpecific) {
    // Each row installs catalogs under the listed locale names only and asks
    // with LANG set to the asked name; the text tells which catalog answered.
    struct Case {
        const char* asked;
        std::vector<std::string> installed;
        std::string expected;
    };
    const Case cases[] = {
        {"de_DE.UTF-8", {"de_DE.UTF-8", "de_DE", "de"}, "de_DE.UTF-8"},
        {"de_DE.UTF-8", {"de_DE", "de"}, "de_DE"},
        {"de_DE.UTF-8", {"de"}, "de"},
        {"de_DE.UTF-8", {"fr_FR", "de_AT"}, ""},
        {"de_DE.UTF-8@euro", {"de_DE.UTF-8@euro", "de_DE.UTF-8"}, "de_DE.UTF-8@euro"},
        {"de_DE.UTF-8@euro", {"de_DE.UTF-8", "de_DE"}, "de_DE.UTF-8"},
        {"de_DE@euro", {"de_DE", "de"}, "de_DE"},
        {"de.UTF-8", {"de"}, "de"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::string(c.asked) + " with " + c.installed.front());
        removeInstalledCatalogs();
        for (const auto& locale : c.installed)
            installCatalog(locale, "probe.mo", {{"7", locale}});
        setenv("LANG", localeName(c.asked).c_str(), 1);
        auto result = fetch("probe.mo", 7);
        if (c.expected.empty()) {
            EXPECT_LT(result.rc, 0) << result.text;
        } else {
            EXPECT_EQ(result.text, c.expected);
        }
    }
}

TEST_F(CatalogLookupTest, FirstNonEmptyLocaleVariableDecides) {
    std::string fr = installCatalog("fr", "probe.mo", {{"7", "fr"}});
    std::string de = installCatalog("de", "probe.mo", {{"7", "de"}});
    std::string it = installCatalog("it", "probe.mo", {{"7", "it"}});
    struct Case {
        const char* lcAll;
        const char* lcMessages;
        const char* lang;
        const char* expected;
    };
    const Case cases[] = {
        {fr.c_str(), de.c_str(), it.c_str(), "fr"}, {nullptr, de.c_str(), it.c_str(), "de"},
        {"", de.c_str(), it.c_str(), "de"},         {"", "", it.c_str(), "it"},
        {nullptr, nullptr, it.c_str(), "it"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::string(c.lcAll ? c.lcAll : "(unset)") + " / " +
                     (c.lcMessages ? c.lcMessages : "(unset)"));
        for (auto [name, value] :
             {std::pair{"LC_ALL", c.lcAll}, std::pair{"LC_MESSAGES", c.lcMessages},
              std::pair{"LANG", c.lang}}) {
            if (value) {
                setenv(name, value, 1);
            } else {
                unsetenv(name);
            }
        }
        EXPECT_EQ(fetch("probe.mo", 7).text, c.expected);
    }
}

TEST_F(CatalogLookupTest, EnglishAnswersWhenTheLocaleHasNoCatalog) {
    std::string partial = installCatalog("de", "vrxmtrk.mo", {{"41", "Befehlszeile ungueltig."}});
    struct Case {
        const char* lang;
        uint32_t number;
        bool english;
    };
    const Case cases[] = {
        {"C", 41, true},
        {"POSIX", 41, true},
        {"xx_YY.UTF-8", 41, true},
        {"../../../../etc", 41, true},
        {partial.c_str(), 41, false},
        // A locale catalog that lacks a text leaves it to English.
        {partial.c_str(), 23, true},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.lang);
        setenv("LANG", c.lang, 1);
        auto localized = fetch("vrxmtrk.mo", c.number);
        unsetenv("LANG");
        auto english = fetch("vrxmtrk.mo", c.number);
        ASSERT_GT(english.rc, 0) << "the English catalog lacks message " << c.number;
        if (c.english) {
            EXPECT_EQ(localized.text, english.text);
        } else {
            EXPECT_EQ(localized.text, "Befehlszeile ungueltig.");
        }
    }
}

TEST_F(CatalogLookupTest, MessageThatNoCatalogHoldsFails) {
    EXPECT_LT(fetch("vrxmtrk.mo", 9999).rc, 0);
    EXPECT_LT(fetch("nosuchcatalog.mo", 41).rc, 0);
    // A catalog name is a file name, not a path into other directories.
    instance_->writeFile("probe.mo", buildMo({{"7", "outside msg/"}}));
    EXPECT_LT(fetch("../probe.mo", 7).rc, 0);
}

TEST_F(CatalogLookupTest, TheInstanceCatalogComesFirstAndFollowsItsFile) {
    setenv("LANG", installCatalog("de", "probe.mo", {{"7", "installed"}, {"8", "eight"}}).c_str(),
           1);
    instanceCatalog("probe.mo", {{"7", "instance"}});
    EXPECT_EQ(fetch("probe.mo", 7).text, "instance");
    EXPECT_EQ(fetch("probe.mo", 8).text, "eight") << "texts it lacks come from the next one";
    // A replaced file is read again, a removed one no more.
    instanceCatalog("probe.mo", {{"7", "a new and longer text"}});
    EXPECT_EQ(fetch("probe.mo", 7).text, "a new and longer text");
    std::filesystem::remove(instance_->dir() / "msg" / "probe.mo");
    vrxStandinNoteInstanceRequest();
    EXPECT_EQ(fetch("probe.mo", 7).text, "installed");
    // Another instance has catalogs of its own.
    TempInstance other(false);
    other.writeFile("msg/probe.mo", buildMo({{"7", "other"}}));
    other.activate();
    EXPECT_EQ(fetch("probe.mo", 7).text, "other");
    instance_->activate();
    EXPECT_EQ(fetch("probe.mo", 7).text, "installed");
}

}  // namespace
}  // namespace mtrktest
