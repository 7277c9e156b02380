#include "catalogLookup.h"

#include <cstdlib>

#include "common/instance.h"
#include "moCatalog.h"

namespace standin {

namespace {

constexpr std::string_view kEnglish = "en";

bool isPlainFileName(std::string_view name) {
    return !name.empty() && name != "." && name != ".." &&
           name.find('/') == std::string_view::npos && name.find('\0') == std::string_view::npos;
}

}  // namespace

std::vector<std::string> localeCandidates(std::string_view locale) {
    std::vector<std::string> candidates;
    if (locale == "C" || locale == "POSIX" || !isPlainFileName(locale))
        return candidates;
    auto add = [&](std::string_view name) {
        if (!name.empty() && (candidates.empty() || candidates.back() != name)) {
            candidates.emplace_back(name);
        }
    };
    add(locale);
    std::string_view rest = locale;
    // language[_territory][.codeset][@modifier]: drop the parts from the
    // end, as far as they are present.
    if (auto at = rest.find('@'); at != std::string_view::npos) {
        rest = rest.substr(0, at);
        add(rest);
    }
    if (auto dot = rest.find('.'); dot != std::string_view::npos) {
        rest = rest.substr(0, dot);
        add(rest);
    }
    if (auto underscore = rest.find('_'); underscore != std::string_view::npos) {
        rest = rest.substr(0, underscore);
        add(rest);
    }
    return candidates;
}

std::string messageLocale() {
    for (const char* name : {"LC_ALL", "LC_MESSAGES", "LANG"}) {
        const char* value = std::getenv(name);
        if (value != nullptr && *value != '\0')
            return value;
    }
    return {};
}

std::vector<std::filesystem::path> catalogSearchPath(std::string_view catalogName) {
    std::vector<std::filesystem::path> path;
    if (!isPlainFileName(catalogName))
        return path;
    path.push_back(instanceDirectory() / "msg" / catalogName);
    const std::filesystem::path locales = dataDirectory() / "locale";
    bool englishListed = false;
    for (const auto& candidate : localeCandidates(messageLocale())) {
        path.push_back(locales / candidate / catalogName);
        englishListed = englishListed || candidate == kEnglish;
    }
    if (!englishListed)
        path.push_back(locales / kEnglish / catalogName);
    return path;
}

std::optional<std::string> findCatalogText(std::string_view catalogName, std::string_view msgid) {
    // Message by message: a partial translation, or an instance catalog that
    // replaces only some texts, falls back to the next catalog for the rest.
    for (const auto& file : catalogSearchPath(catalogName)) {
        auto catalog = loadCatalog(file);
        if (!catalog)
            continue;
        if (auto text = catalog->find(msgid))
            return std::string(*text);
    }
    return std::nullopt;
}

}  // namespace standin
