#include "catalogLookup.h"

#include <limits.h>

#include <cstdlib>
#include <memory>
#include <mutex>
#include <unordered_map>

#include "common/fixedText.h"
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
    std::string_view language = locale.substr(0, locale.find_first_of("_.@"));
    if (language == "C" || language == "POSIX" || !isPlainFileName(locale))
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

namespace {

std::optional<std::string> searchCatalogs(std::string_view catalogName, std::string_view msgid) {
    // Worked out once: the data directory cannot move while the library is
    // loaded.
    static const std::string locales = (dataDirectory() / "locale").string();
    char path[PATH_MAX];
    // Message by message: a partial translation, or an instance catalog that
    // replaces only some texts, falls back to the next catalog for the rest.
    auto textIn = [&](std::string_view dir, std::string_view subdir) -> std::optional<std::string> {
        FixedText file(path, sizeof path);
        file.add(dir.data(), dir.size()).addChar('/').add(subdir.data(), subdir.size());
        file.addChar('/').add(catalogName.data(), catalogName.size());
        if (file.overflow())
            return std::nullopt;
        auto catalog = loadCatalog(path);
        if (!catalog)
            return std::nullopt;
        if (auto text = catalog->find(msgid))
            return std::string(*text);
        return std::nullopt;
    };

    char instance[PATH_MAX];
    if (instanceDirectoryPath(instance, sizeof instance)) {
        if (auto text = textIn(instance, "msg"))
            return text;
    }
    bool englishListed = false;
    for (const auto& candidate : localeCandidates(messageLocale())) {
        if (auto text = textIn(locales, candidate))
            return text;
        englishListed = englishListed || candidate == kEnglish;
    }
    if (!englishListed)
        return textIn(locales, kEnglish);
    return std::nullopt;
}

// The answers found since the catalogs were last looked at: a run asks for
// the same few messages again and again, and the catalogs (like
// instance.json) are looked at again after each request of the client
// library, or when the instance directory or the locale changes.
struct AnswerCache {
    uint64_t requests = 0;
    std::string instance;
    std::string locale;
    std::unordered_map<std::string, std::shared_ptr<const std::string>> answers;
};

}  // namespace

std::shared_ptr<const std::string> findCatalogText(std::string_view catalogName,
                                                   std::string_view msgid) {
    if (!isPlainFileName(catalogName))
        return nullptr;
    static std::mutex& mutex = *new std::mutex;
    static AnswerCache& cache = *new AnswerCache;
    std::lock_guard lock(mutex);

    char instance[PATH_MAX];
    if (!instanceDirectoryPath(instance, sizeof instance))
        instance[0] = '\0';
    uint64_t requests = vrxStandinInstanceRequests();
    std::string locale = messageLocale();
    if (requests != cache.requests || cache.instance != instance || cache.locale != locale) {
        cache.answers.clear();
        cache.requests = requests;
        cache.instance = instance;
        cache.locale = std::move(locale);
    }
    std::string key;
    key.reserve(catalogName.size() + 1 + msgid.size());
    key.append(catalogName).append(1, '/').append(msgid);
    auto found = cache.answers.find(key);
    if (found == cache.answers.end()) {
        std::shared_ptr<const std::string> answer;
        if (auto text = searchCatalogs(catalogName, msgid))
            answer = std::make_shared<const std::string>(std::move(*text));
        found = cache.answers.emplace(std::move(key), std::move(answer)).first;
    }
    return found->second;
}

}  // namespace standin
