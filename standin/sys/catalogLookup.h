// Where the engine finds the text of a message: the instance's own catalogs
// first, then the installed ones for the user's locale, then English.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace standin {

// The locale directories to try for a locale name as LC_ALL, LC_MESSAGES or
// LANG give it, most specific first: "de_DE.UTF-8@euro" gives
// "de_DE.UTF-8@euro", "de_DE.UTF-8", "de_DE", "de". The C and POSIX locales
// (with or without a codeset, as in "C.UTF-8"), and names that could leave
// the locale directory, give none.
std::vector<std::string> localeCandidates(std::string_view locale);

// The user's message locale: the first of LC_ALL, LC_MESSAGES and LANG that
// is set and not empty; "" when none is. Read from the environment at each
// call, never through the C library's locale state.
std::string messageLocale();

// The text of `msgid` from the first catalog that holds it, trying in order
// <instance>/msg/<name>, <data>/locale/<candidate>/<name> for each locale
// candidate and <data>/locale/en/<name>. A missing or damaged catalog is
// passed over; a name that is not a plain file name finds nothing. Answers
// are kept until the client library's next request (set-up or snapshot), or
// until the instance directory or the locale changes.
// Null when no catalog holds it.
std::shared_ptr<const std::string> findCatalogText(std::string_view catalogName,
                                                   std::string_view msgid);

}  // namespace standin
