// sqlaintp_api: the SQL catalog's text for an sqlca, with its tokens put in
// and broken into lines.
#include <algorithm>
#include <cstring>
#include <optional>
#include <sstream>

#include "catalogFiles.h"
#include "engine/vrxsys.h"

namespace mtrktest {
namespace {

using namespace std::string_literals;

class SqlaintpTest : public MessageTest {
  protected:
    struct Rendered {
        int32_t rc = 0;
        std::string text;
    };

    // Renders `code` with `tokens` as the raw bytes of sqlerrmc (their
    // length as sqlerrml unless `tokenLength` says otherwise).
    static Rendered render(int32_t code, const std::string& tokens = "", int16_t width = 70,
                           int16_t bufferSize = 2048, std::optional<int> tokenLength = {},
                           const char* catalog = "vrxsql.mo") {
        sqlca ca;
        std::memset(&ca, 0, sizeof ca);
        ca.sqlcode = code;
        std::memcpy(ca.sqlerrmc, tokens.data(), std::min(tokens.size(), sizeof ca.sqlerrmc));
        ca.sqlerrml = static_cast<int16_t>(tokenLength.value_or(static_cast<int>(tokens.size())));
        std::vector<char> buffer(static_cast<size_t>(std::max<int16_t>(bufferSize, 0)) + 1, '\x7f');
        Rendered r;
        r.rc = sqlaintp_api(buffer.data(), bufferSize, width, catalog, &ca);
        EXPECT_EQ(buffer.back(), '\x7f') << "wrote past the buffer";
        if (r.rc >= 0) {
            r.text = buffer.data();
            EXPECT_EQ(static_cast<size_t>(r.rc), r.text.size());
        }
        return r;
    }
};

TEST_F(SqlaintpTest, LinesBreakAtSpacesWithinTheWidth) {
    struct Case {
        const char* text;
        int16_t width;
        const char* expected;
    };
    const Case cases[] = {
        {"one two three four", 9, "one two\nthree\nfour"},
        {"abc def", 7, "abc def"},
        {"abc def", 6, "abc\ndef"},
        {"abcde fgh", 5, "abcde\nfgh"},
        // A word longer than the width stands on a line of its own.
        {"a verylongword b", 5, "a\nverylongword\nb"},
        {"verylongword b", 4, "verylongword\nb"},
        {"tail averyverylongword", 8, "tail\naveryverylongword"},
        // Spaces inside a line stay; those at a break go.
        {"SQL6103N  An error", 20, "SQL6103N  An error"},
        {"SQL6103N  An error", 10, "SQL6103N\nAn error"},
        {"a    b", 3, "a\nb"},
        // Line feeds of the text are kept, each line broken on its own.
        {"first line\nsecond line", 70, "first line\nsecond line"},
        {"first line\nsecond line", 6, "first\nline\nsecond\nline"},
        {"para one\n\npara two", 70, "para one\n\npara two"},
        // No line feed and no spaces at the end.
        {"text\n", 70, "text"},
        {"text   ", 70, "text"},
        // Width 0 or below: lines as they stand.
        {"a long line that is not broken", 0, "a long line that is not broken"},
        {"a long line that is not broken", -1, "a long line that is not broken"},
        // The width counts characters, not bytes.
        {"Größe Größe", 5, "Größe\nGröße"},
    };
    CatalogEntries entries;
    for (size_t i = 0; i < std::size(cases); ++i) {
        entries.emplace_back(std::to_string(100 + i), cases[i].text);
    }
    instanceCatalog("probesql.mo", entries);
    for (size_t i = 0; i < std::size(cases); ++i) {
        SCOPED_TRACE(cases[i].text + " width "s + std::to_string(cases[i].width));
        auto r = render(static_cast<int32_t>(100 + i), "", cases[i].width, 2048, {}, "probesql.mo");
        EXPECT_EQ(r.text, cases[i].expected);
    }
}

TEST_F(SqlaintpTest, TokensAreTheInserts) {
    instanceCatalog("probesql.mo", {{"-5", "[%1] [%2]"}, {"-6", "value %1"}});
    // Tokens end in 0xFF; "|" stands for it here.
    auto tokens = [](std::string text) {
        std::replace(text.begin(), text.end(), '|', '\xFF');
        return text;
    };
    struct Case {
        const char* name;
        std::string tokens;
        std::optional<int> length;  // sqlerrml; absent: the tokens' size
        std::string expected;
    };
    const std::string seventy(70, 'x');
    const Case cases[] = {
        {"one token", tokens("5|"), {}, "[5] []"},
        {"two tokens", tokens("ab|cd|"), {}, "[ab] [cd]"},
        {"last token without its end", tokens("ab|cd"), {}, "[ab] [cd]"},
        {"no tokens", "", {}, "[] []"},
        {"length ends the tokens", tokens("ab|cd|"), 3, "[ab] []"},
        {"negative length", tokens("ab|"), -5, "[] []"},
        {"length beyond the field", seventy, 200, "[" + seventy + "] []"},
        {"empty tokens", tokens("||z|"), {}, "[] []"},
        {"a token is never a placeholder", tokens("%2|second|"), {}, "[%2] [second]"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        int length = c.length.value_or(static_cast<int>(c.tokens.size()));
        EXPECT_EQ(render(-5, c.tokens, 0, 2048, length, "probesql.mo").text, c.expected);
    }
    // A token with spaces is broken like the rest of the text.
    EXPECT_EQ(render(-6, tokens("a b c|"), 3, 2048, {}, "probesql.mo").text, "value\na b\nc");
}

TEST_F(SqlaintpTest, EngineCatalogExplainsTheMonitorsCodes) {
    struct Case {
        int32_t code;
        const char* identifier;
    };
    const Case cases[] = {
        {-6103, "SQL6103N"}, {-1032, "SQL1032N"}, {-1092, "SQL1092N"},
        {1606, "SQL1606W"},  {1611, "SQL1611W"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.code);
        auto r = render(c.code, "-2029060031\xFF");
        ASSERT_GT(r.rc, 0);
        EXPECT_EQ(r.text.rfind(c.identifier, 0), 0u) << r.text;
        EXPECT_EQ(r.text.find("No message text"), std::string::npos) << r.text;
        std::istringstream lines(r.text);
        for (std::string line; std::getline(lines, line);) {
            EXPECT_LE(line.size(), 70u) << line;
            EXPECT_FALSE(line.empty());
        }
        EXPECT_NE(r.text.back(), '\n');
    }
    // The unexpected failure names the code that caused it.
    EXPECT_NE(render(-6103, "-2029060031\xFF").text.find("-2029060031"), std::string::npos);
    EXPECT_NE(render(-6103, "0\xFF", 0).text.find("\"0\""), std::string::npos);
}

TEST_F(SqlaintpTest, UnknownCodeGetsATextThatNamesIt) {
    auto r = render(-9999, "tok\xFF");
    ASSERT_GT(r.rc, 0);
    EXPECT_NE(r.text.find("-9999"), std::string::npos) << r.text;
    EXPECT_NE(r.text.find("tok"), std::string::npos) << r.text;
    auto plain = render(4242, "", 0);
    EXPECT_NE(plain.text.find("4242"), std::string::npos) << plain.text;
    EXPECT_EQ(plain.text.find('\n'), std::string::npos);
}

TEST_F(SqlaintpTest, OutputIsCutToTheBuffer) {
    instanceCatalog("probesql.mo", {{"-5", "abcdefghij"}, {"-6", "abc def"}});
    EXPECT_EQ(render(-5, "", 70, 11, {}, "probesql.mo").text, "abcdefghij");
    EXPECT_EQ(render(-5, "", 70, 10, {}, "probesql.mo").text, "abcdefghi");
    EXPECT_EQ(render(-5, "", 70, 1, {}, "probesql.mo").text, "");
    // Lines are broken before the text is cut.
    EXPECT_EQ(render(-6, "", 3, 6, {}, "probesql.mo").text, "abc\nd");
}

TEST_F(SqlaintpTest, FailuresAnswerNegative) {
    EXPECT_LT(render(-6103, "", 70, 0).rc, 0);
    EXPECT_LT(render(-6103, "", 70, -1).rc, 0);
    char buffer[64] = "garbage";
    EXPECT_LT(sqlaintp_api(buffer, sizeof buffer, 70, "vrxsql.mo", nullptr), 0);
    EXPECT_LT(sqlaintp_api(nullptr, 64, 70, "vrxsql.mo", nullptr), 0);
}

}  // namespace
}  // namespace mtrktest
