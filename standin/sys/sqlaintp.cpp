// sqlaintp_api: renders the SQL catalog's explanation of an sqlca.
#include <algorithm>
#include <string>
#include <vector>

#include "catalogLookup.h"
#include "common/export.h"
#include "common/instance.h"
#include "engine/vrxsys.h"
#include "messageCodes.h"
#include "messageText.h"

namespace {

constexpr char kTokenEnd = static_cast<char>(0xFF);

// The tokens of an sqlca: sqlerrml bytes of sqlerrmc, each token ended by
// 0xFF; bytes after the last 0xFF form a last token of their own.
std::vector<std::string_view> sqlcaTokens(const sqlca& ca) {
    std::vector<std::string_view> tokens;
    size_t length = static_cast<size_t>(std::clamp<int>(ca.sqlerrml, 0, sizeof ca.sqlerrmc));
    std::string_view rest(ca.sqlerrmc, length);
    while (!rest.empty()) {
        size_t end = rest.find(kTokenEnd);
        tokens.push_back(rest.substr(0, end));
        if (end == std::string_view::npos)
            break;
        rest.remove_prefix(end + 1);
    }
    return tokens;
}

// What the caller gets for a code that the catalog has no text for: it still
// learns the code and the tokens, which are often all that is needed.
std::string genericText(int32_t code, const char* catalog,
                        const std::vector<std::string_view>& tokens) {
    std::string text = "No message text is available for SQL code " + std::to_string(code) +
                       " in the message catalog \"" + catalog + "\".";
    if (!tokens.empty()) {
        text += " Message tokens:";
        for (size_t i = 0; i < tokens.size(); ++i) {
            text += i == 0 ? " \"" : ", \"";
            text += tokens[i];
            text += '"';
        }
        text += '.';
    }
    return text;
}

}  // namespace

extern "C" VRX_EXPORT int32_t sqlaintp_api(char* buffer, int16_t bufferSize, int16_t lineWidth,
                                           const char* catalog, sqlca* ca) {
    if (buffer == nullptr || bufferSize <= 0)
        return standin::kMessageBadArgument;
    buffer[0] = '\0';
    if (auto fault = standin::currentInstance().faults.sqlaintp)
        return *fault;
    if (catalog == nullptr || ca == nullptr)
        return standin::kMessageBadArgument;

    auto tokens = sqlcaTokens(*ca);
    std::string message;
    if (auto text = standin::findCatalogText(catalog, std::to_string(ca->sqlcode))) {
        message = standin::expandInserts(*text, [&](unsigned index) -> std::string_view {
            return index < tokens.size() ? tokens[index] : std::string_view{};
        });
    } else {
        message = genericText(ca->sqlcode, catalog, tokens);
    }
    std::string wrapped = standin::wrapLines(message, lineWidth);
    return static_cast<int32_t>(
        standin::copyToBuffer(wrapped, buffer, static_cast<size_t>(bufferSize)));
}
