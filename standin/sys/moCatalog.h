// Message catalogs in the GNU .mo format: a header, a table of original
// strings and a table of translations, each entry a length and an offset.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>

namespace standin {

class MoCatalog {
  public:
    // Reads a catalog from the bytes of a .mo file. Every offset and length
    // is checked against the data, so damaged bytes give nullopt, never a
    // read outside them. Either byte order is accepted.
    static std::optional<MoCatalog> parse(std::string_view bytes);

    // The translation of `msgid`; nullopt when the catalog has none (an
    // empty translation counts as none, as gettext treats it).
    std::optional<std::string_view> find(std::string_view msgid) const;

    size_t size() const { return texts_.size(); }

  private:
    std::unordered_map<std::string, std::string> texts_;
};

// The catalog in file `path`, read once and kept for the life of the
// process; read again only when the file changes (size, modification time or
// inode), so that a catalog replaced under a running process is followed
// (a rewrite in place that keeps the size within one tick of the file
// system's clock goes unnoticed; replacing the file by rename never does).
// Null when the file does not exist, cannot be read or is damaged.
// Thread-safe.
std::shared_ptr<const MoCatalog> loadCatalog(const char* path);

}  // namespace standin
