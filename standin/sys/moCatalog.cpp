#include "moCatalog.h"

#include <sys/stat.h>

#include <cstdint>
#include <fstream>
#include <map>
#include <mutex>
#include <sstream>

namespace standin {

namespace {

constexpr uint32_t kMagic = 0x950412de;
constexpr uint32_t kMagicSwapped = 0xde120495;
// Catalogs are a few kilobytes; anything this large is not one of ours and
// is refused rather than read into memory.
constexpr uint64_t kMaxCatalogBytes = uint64_t{64} << 20;

uint32_t readWord(std::string_view bytes, uint64_t offset, bool bigEndian) {
    auto b = [&](uint64_t i) { return static_cast<uint32_t>(static_cast<uint8_t>(bytes[i])); };
    uint64_t o = offset;
    if (bigEndian)
        return b(o) << 24 | b(o + 1) << 16 | b(o + 2) << 8 | b(o + 3);
    return b(o) | b(o + 1) << 8 | b(o + 2) << 16 | b(o + 3) << 24;
}

// A string of a table entry: `length` bytes at `offset`, both checked in 64
// bits so that no sum can wrap. Plural forms follow the first form after a
// NUL; only the first is used.
std::optional<std::string_view> readString(std::string_view bytes, uint32_t length,
                                           uint32_t offset) {
    if (uint64_t{offset} + length > bytes.size())
        return std::nullopt;
    std::string_view s = bytes.substr(offset, length);
    if (auto nul = s.find('\0'); nul != std::string_view::npos)
        s = s.substr(0, nul);
    return s;
}

}  // namespace

std::optional<MoCatalog> MoCatalog::parse(std::string_view bytes) {
    constexpr uint64_t kHeaderBytes = 20;
    if (bytes.size() < kHeaderBytes)
        return std::nullopt;
    bool bigEndian;
    uint32_t magic = readWord(bytes, 0, false);
    if (magic == kMagic) {
        bigEndian = false;
    } else if (magic == kMagicSwapped) {
        bigEndian = true;
    } else {
        return std::nullopt;
    }
    // Major revisions 0 and 1 share the layout of the two tables; a later
    // major revision may not.
    uint32_t revision = readWord(bytes, 4, bigEndian);
    if ((revision >> 16) > 1)
        return std::nullopt;
    uint32_t count = readWord(bytes, 8, bigEndian);
    uint32_t originals = readWord(bytes, 12, bigEndian);
    uint32_t translations = readWord(bytes, 16, bigEndian);
    uint64_t tableBytes = uint64_t{count} * 8;
    if (originals + tableBytes > bytes.size() || translations + tableBytes > bytes.size()) {
        return std::nullopt;
    }

    MoCatalog catalog;
    for (uint32_t i = 0; i < count; ++i) {
        uint64_t o = originals + uint64_t{i} * 8;
        uint64_t t = translations + uint64_t{i} * 8;
        auto msgid =
            readString(bytes, readWord(bytes, o, bigEndian), readWord(bytes, o + 4, bigEndian));
        auto msgstr =
            readString(bytes, readWord(bytes, t, bigEndian), readWord(bytes, t + 4, bigEndian));
        if (!msgid || !msgstr)
            return std::nullopt;
        // The entry with the empty msgid is the catalog's header, no message.
        if (msgid->empty())
            continue;
        catalog.texts_.emplace(std::string(*msgid), std::string(*msgstr));
    }
    return catalog;
}

std::optional<std::string_view> MoCatalog::find(std::string_view msgid) const {
    auto it = texts_.find(std::string(msgid));
    if (it == texts_.end() || it->second.empty())
        return std::nullopt;
    return std::string_view(it->second);
}

namespace {

struct FileStamp {
    uint64_t size = 0;
    uint64_t inode = 0;
    int64_t mtimeSeconds = 0;
    int64_t mtimeNanoseconds = 0;
    bool operator==(const FileStamp&) const = default;
};

struct CacheEntry {
    FileStamp stamp;
    std::shared_ptr<const MoCatalog> catalog;  // null: the file is damaged
};

std::optional<FileStamp> stampOf(const char* path) {
    struct stat st {};
    if (stat(path, &st) != 0 || !S_ISREG(st.st_mode))
        return std::nullopt;
    return FileStamp{static_cast<uint64_t>(st.st_size), static_cast<uint64_t>(st.st_ino),
                     static_cast<int64_t>(st.st_mtim.tv_sec),
                     static_cast<int64_t>(st.st_mtim.tv_nsec)};
}

std::shared_ptr<const MoCatalog> readCatalogFile(const char* path, const FileStamp& stamp) {
    if (stamp.size > kMaxCatalogBytes)
        return nullptr;
    std::ifstream in(path, std::ios::binary);
    if (!in)
        return nullptr;
    std::ostringstream content;
    content << in.rdbuf();
    if (in.bad())
        return nullptr;
    auto parsed = MoCatalog::parse(content.view());
    if (!parsed)
        return nullptr;
    return std::make_shared<const MoCatalog>(std::move(*parsed));
}

}  // namespace

std::shared_ptr<const MoCatalog> loadCatalog(const char* path) {
    static std::mutex mutex;
    // Looked up by the caller's text, without making a key of it each time.
    static std::map<std::string, CacheEntry, std::less<>> cache;

    auto stamp = stampOf(path);
    std::lock_guard lock(mutex);
    auto it = cache.find(std::string_view(path));
    if (!stamp) {
        if (it != cache.end())
            cache.erase(it);
        return nullptr;
    }
    if (it != cache.end() && it->second.stamp == *stamp)
        return it->second.catalog;
    CacheEntry entry{*stamp, readCatalogFile(path, *stamp)};
    cache.insert_or_assign(std::string(path), entry);
    return entry.catalog;
}

}  // namespace standin
