// The installed English catalog of the memory tracker holds every message
// that the command prints, with exactly the inserts that the command passes.
#include <sstream>

#include "catalogFiles.h"

namespace mtrktest {
namespace {

class CatalogContentTest : public MessageTest {};

TEST_F(CatalogContentTest, EveryMessageTakesItsInsertsInOrder) {
    struct Message {
        uint32_t number;
        int inserts;
    };
    const Message messages[] = {
        {0, 2},  {1, 2},  {2, 2},  {3, 1},  {21, 1}, {22, 1}, {23, 0},
        {24, 2}, {25, 1}, {26, 1}, {41, 0}, {42, 0}, {44, 0}, {45, 0},
        {46, 0}, {47, 0}, {48, 0}, {49, 0}, {81, 0}, {82, 0}, {85, 0},
    };
    const std::string first = "<first insert>";
    const std::string second = "<second insert>";
    for (const auto& m : messages) {
        SCOPED_TRACE("message " + std::to_string(m.number));
        // Both inserts are always offered; the text must use exactly the
        // ones that the command passes for it.
        auto result = fetch("vrxmtrk.mo", m.number, {first, second});
        ASSERT_GT(result.rc, 0);
        size_t a = result.text.find(first);
        size_t b = result.text.find(second);
        EXPECT_EQ(a != std::string::npos, m.inserts >= 1) << result.text;
        EXPECT_EQ(b != std::string::npos, m.inserts == 2) << result.text;
        if (m.inserts == 2) {
            EXPECT_LT(a, b) << result.text;
        }
        EXPECT_EQ(result.text.find("%1"), std::string::npos);
        EXPECT_EQ(result.text.find("%2"), std::string::npos);
    }
}

TEST_F(CatalogContentTest, UsageNamesEveryOption) {
    auto usage = fetch("vrxmtrk.mo", 42);
    EXPECT_NE(usage.text.find(
                  "vrxmtrk [-i] [-d] [-a] [-p] [-m | -w] [-v] [-all] [-r interval [count]] [-h]"),
              std::string::npos)
        << usage.text;
}

TEST_F(CatalogContentTest, OptionHelpExplainsEachOptionOnALineOfItsOwn) {
    auto help = fetch("vrxmtrk.mo", 85);
    ASSERT_GT(help.rc, 0);
    std::istringstream lines(help.text);
    std::vector<std::string> options;
    for (std::string line; std::getline(lines, line);) {
        EXPECT_LE(line.size(), 80u) << line;
        std::istringstream words(line);
        std::string word;
        words >> word;
        if (!word.empty() && word[0] == '-')
            options.push_back(word);
    }
    const std::vector<std::string> expected = {"-i", "-d", "-a",   "-p", "-m",
                                               "-w", "-v", "-all", "-r", "-h"};
    EXPECT_EQ(options, expected);
}

}  // namespace
}  // namespace mtrktest
