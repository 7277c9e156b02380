#include "common/instanceReader.h"

#include <fcntl.h>
#include <limits.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <limits>
#include <memory>
#include <optional>
#include <span>
#include <vector>

#include "common/fixedText.h"
#include "common/poolTable.h"

namespace standin {

namespace {

// Reads go through a buffer of this size at most; instance files of a few
// hundred bytes get a buffer of their own size.
constexpr size_t kChunkBytes = size_t{1} << 18;
// The instance's own pools are handed on in batches of this many, so that a
// long list never has to be held.
constexpr size_t kPoolBatch = 256;

// Thrown when the fast reader does not vouch for the text; the thorough
// parser then reads the file and decides.
struct GiveUp {};

[[noreturn]] void giveUp() {
    throw GiveUp{};
}

// The bytes of the text, from memory or read from a file a buffer at a time.
class Source {
  public:
    explicit Source(std::string_view text) : at_(text.data()), end_(text.data() + text.size()) {}
    Source(int fd, size_t bufferBytes)
        : fd_(fd), bufferBytes_(bufferBytes), buffer_(new char[bufferBytes]) {
        at_ = end_ = buffer_.get();
    }

    // The next byte, not consumed; -1 at the end of the text.
    int peek() {
        if (at_ == end_ && !refill())
            return -1;
        return static_cast<unsigned char>(*at_);
    }
    void skip() { ++at_; }
    int next() {
        int c = peek();
        if (c >= 0)
            ++at_;
        return c;
    }
    // The next byte that is not whitespace, not consumed.
    int peekToken() {
        for (;;) {
            while (at_ != end_) {
                char c = *at_;
                if (c != ' ' && c != '\n' && c != '\r' && c != '\t')
                    return static_cast<unsigned char>(c);
                ++at_;
            }
            if (!refill())
                return -1;
        }
    }
    void expectToken(char wanted) {
        if (peekToken() != static_cast<unsigned char>(wanted))
            giveUp();
        ++at_;
    }

    // Appends the characters of a string up to its closing quote (the
    // opening one already consumed) to `out`.
    void stringBody(std::string& out) {
        for (;;) {
            const char* start = at_;
            while (at_ != end_) {
                auto c = static_cast<unsigned char>(*at_);
                if (c == '"' || c == '\\' || c < 0x20 || c >= 0x80)
                    break;
                ++at_;
            }
            out.append(start, static_cast<size_t>(at_ - start));
            int c = peek();
            if (c == '"') {
                ++at_;
                return;
            }
            if (c == '\\') {
                ++at_;
                out += escaped(next());
            } else if (c < 0x20 || c >= 0x80) {
                // The end of the text, a control character, or a byte of a
                // UTF-8 character, whose checks the thorough parser keeps.
                giveUp();
            }
            // Otherwise the scan stopped at the end of a buffer's bytes.
        }
    }

  private:
    static char escaped(int c) {
        switch (c) {
            case '"':
                return '"';
            case '\\':
                return '\\';
            case '/':
                return '/';
            case 'b':
                return '\b';
            case 'f':
                return '\f';
            case 'n':
                return '\n';
            case 'r':
                return '\r';
            case 't':
                return '\t';
            default:
                giveUp();
        }
    }

    bool refill() {
        if (fd_ < 0)
            return false;
        for (;;) {
            ssize_t n = read(fd_, buffer_.get(), bufferBytes_);
            if (n < 0 && errno == EINTR)
                continue;
            if (n < 0)
                giveUp();
            if (n == 0)
                return false;
            at_ = buffer_.get();
            end_ = at_ + n;
            return true;
        }
    }

    const char* at_ = nullptr;
    const char* end_ = nullptr;
    int fd_ = -1;
    size_t bufferBytes_ = 0;
    std::unique_ptr<char[]> buffer_;
};

// An integer as written: a JSON number or a hexadecimal string. Negative
// numbers keep their two's complement bit pattern.
struct Integer {
    bool negative = false;
    bool hex = false;
    uint64_t bits = 0;
};

uint32_t asU32(const Integer& n) {
    if (n.negative || n.bits > UINT32_MAX)
        giveUp();
    return static_cast<uint32_t>(n.bits);
}

uint64_t asU64(const Integer& n) {
    if (n.negative)
        giveUp();
    return n.bits;
}

// Hexadecimal signed numbers are bit patterns of their width.
template <typename Signed, typename Unsigned>
Signed asSigned(const Integer& n) {
    constexpr auto kMin = static_cast<int64_t>(std::numeric_limits<Signed>::min());
    constexpr auto kMax = static_cast<uint64_t>(std::numeric_limits<Signed>::max());
    if (n.hex) {
        if (n.bits > std::numeric_limits<Unsigned>::max())
            giveUp();
        return static_cast<Signed>(static_cast<Unsigned>(n.bits));
    }
    auto value = static_cast<int64_t>(n.bits);
    if ((n.negative && value < kMin) || (!n.negative && n.bits > kMax))
        giveUp();
    return static_cast<Signed>(value);
}

int32_t asS32(const Integer& n) {
    return asSigned<int32_t, uint32_t>(n);
}

int16_t asS16(const Integer& n) {
    return asSigned<int16_t, uint16_t>(n);
}

bool isLeapYear(unsigned year) {
    return (year % 4 == 0 && year % 100 != 0) || year % 400 == 0;
}

Clock clockOf(std::string_view text) {
    const char* layout = "dddd-dd-dd dd:dd:dd";
    if (text.size() != std::strlen(layout))
        giveUp();
    for (size_t i = 0; i < text.size(); ++i) {
        bool digit = text[i] >= '0' && text[i] <= '9';
        if (layout[i] == 'd' ? !digit : text[i] != layout[i])
            giveUp();
    }
    auto field = [&](size_t at, size_t width) {
        unsigned value = 0;
        for (size_t i = at; i < at + width; ++i)
            value = value * 10 + static_cast<unsigned>(text[i] - '0');
        return static_cast<uint16_t>(value);
    };
    Clock clock{field(0, 4), field(5, 2), field(8, 2), field(11, 2), field(14, 2), field(17, 2)};
    static constexpr unsigned kDays[] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
    if (clock.year < 1 || clock.month < 1 || clock.month > 12 || clock.day < 1 || clock.hour > 23 ||
        clock.minute > 59 || clock.second > 59) {
        giveUp();
    }
    unsigned days = kDays[clock.month - 1] + (clock.month == 2 && isLeapYear(clock.year));
    if (clock.day > days)
        giveUp();
    return clock;
}

// The keys that each kind of object may hold.
constexpr std::string_view kRootKeys[] = {
    "clock",     "traceFlags",   "maxPoolId",     "krcb",      "state", "pools",
    "databases", "applications", "privateMemory", "snapshots", "faults"};
constexpr std::string_view kKrcbKeys[] = {"multiPartition", "partition", "defaultPartition"};
constexpr std::string_view kPoolKeys[] = {"id",      "name",      "current",
                                          "maximum", "highWater", "bufferPool"};
constexpr std::string_view kDatabaseKeys[] = {"name", "pools"};
constexpr std::string_view kApplicationKeys[] = {"number", "database", "pools"};
constexpr std::string_view kPrivateMemoryKeys[] = {"number", "pools"};
constexpr std::string_view kSnapshotKeys[] = {"instance", "database", "application"};
constexpr std::string_view kAnswerKeys[] = {"sizeRc",   "sizeSqlcode", "takeRc",    "takeSqlcode",
                                            "estimate", "tooSmall",    "streamFile"};
constexpr std::string_view kFaultKeys[] = {"initApplicationEnvironment",
                                           "getDateTime",
                                           "registryRead",
                                           "registryWrite",
                                           "sqlaintp",
                                           "messageFail",
                                           "allocFailAt",
                                           "maxAllocBytes"};

// The keys of one object, each allowed once.
class KeySet {
  public:
    explicit KeySet(std::span<const std::string_view> keys) : keys_(keys) {}
    // The index of `key` among the known keys; gives up on an unknown or
    // repeated key.
    size_t take(std::string_view key) {
        size_t index = 0;
        for (std::string_view known : keys_) {
            if (known == key) {
                uint32_t bit = uint32_t{1} << index;
                if ((seen_ & bit) != 0)
                    giveUp();
                seen_ |= bit;
                return index;
            }
            ++index;
        }
        giveUp();
    }

  private:
    std::span<const std::string_view> keys_;
    uint32_t seen_ = 0;
};

// Pools collected for one hand-over, with their buffer pool names kept
// apart until the hand-over, since the names' storage may move meanwhile.
class PoolBatch {
  public:
    PoolRead& add() {
        pools_.emplace_back();
        nameStarts_.push_back(names_.size());
        return pools_.back();
    }
    std::string& names() { return names_; }
    std::span<const PoolRead> settle() {
        for (size_t i = 0; i < pools_.size(); ++i) {
            PoolRead& pool = pools_[i];
            if (pool.hasBufferPool) {
                pool.bufferPool =
                    std::string_view(names_).substr(nameStarts_[i], pool.bufferPool.size());
            }
        }
        return pools_;
    }
    size_t size() const { return pools_.size(); }
    void clear() {
        pools_.clear();
        nameStarts_.clear();
        names_.clear();
    }

  private:
    std::vector<PoolRead> pools_;
    std::vector<size_t> nameStarts_;
    std::string names_;
};

class Reader {
  public:
    Reader(Source& in, Instance& settings, InstanceSink& sink)
        : in_(in), settings_(settings), sink_(sink) {}

    void document() {
        // A byte order mark is skipped by the thorough parser.
        if (in_.peek() == 0xEF)
            giveUp();
        KeySet keys(kRootKeys);
        object([&](std::string_view key) {
            switch (keys.take(key)) {
                case 0:
                    settings_.clock = clockOf(string());
                    break;
                case 1:
                    settings_.traceFlags = asU32(integer());
                    break;
                case 2:
                    settings_.maxPoolId = asU32(integer());
                    break;
                case 3:
                    krcb();
                    break;
                case 4:
                    state();
                    break;
                case 5:
                    instancePools();
                    break;
                case 6:
                    sections(PoolList::Databases);
                    break;
                case 7:
                    sections(PoolList::Applications);
                    break;
                case 8:
                    sections(PoolList::PrivateMemory);
                    break;
                case 9:
                    snapshots();
                    break;
                default:
                    faults();
                    break;
            }
        });
        if (in_.peekToken() != -1)
            giveUp();
        sink_.endDocument();
    }

  private:
    // Calls `member` with each key of an object, the reader standing at the
    // key's value, which `member` must read.
    template <typename Member>
    void object(Member&& member) {
        in_.expectToken('{');
        if (in_.peekToken() == '}') {
            in_.skip();
            return;
        }
        for (;;) {
            in_.expectToken('"');
            key_.clear();
            in_.stringBody(key_);
            in_.expectToken(':');
            member(std::string_view(key_));
            int c = in_.peekToken();
            if (c != ',' && c != '}')
                giveUp();
            in_.skip();
            if (c == '}')
                return;
        }
    }

    template <typename Element>
    void array(Element&& element) {
        in_.expectToken('[');
        if (in_.peekToken() == ']') {
            in_.skip();
            return;
        }
        for (;;) {
            element();
            int c = in_.peekToken();
            if (c != ',' && c != ']')
                giveUp();
            in_.skip();
            if (c == ']')
                return;
        }
    }

    // A string value, valid until the next string is read.
    std::string_view string() { return stringInto(text_); }

    std::string_view stringInto(std::string& out) {
        in_.expectToken('"');
        out.clear();
        in_.stringBody(out);
        return out;
    }

    Integer integer() {
        Integer n;
        int c = in_.peekToken();
        if (c == '"') {
            std::string_view text = string();
            if (text.size() <= 2 || text.size() > 18 || text[0] != '0' ||
                (text[1] != 'x' && text[1] != 'X')) {
                giveUp();
            }
            for (char h : text.substr(2)) {
                int digit = h >= '0' && h <= '9'   ? h - '0'
                            : h >= 'a' && h <= 'f' ? h - 'a' + 10
                            : h >= 'A' && h <= 'F' ? h - 'A' + 10
                                                   : -1;
                if (digit < 0)
                    giveUp();
                n.bits = n.bits << 4 | static_cast<uint64_t>(digit);
            }
            n.hex = true;
            return n;
        }
        bool minus = c == '-';
        if (minus)
            in_.skip();
        c = in_.next();
        if (c < '0' || c > '9')
            giveUp();
        uint64_t magnitude = static_cast<uint64_t>(c - '0');
        if (c == '0') {
            c = in_.peek();
            if (c >= '0' && c <= '9')
                giveUp();
        } else {
            for (c = in_.peek(); c >= '0' && c <= '9'; c = in_.peek()) {
                auto digit = static_cast<uint64_t>(c - '0');
                // Beyond 64 bits a number is a floating one, which no key takes.
                if (magnitude > (UINT64_MAX - digit) / 10)
                    giveUp();
                magnitude = magnitude * 10 + digit;
                in_.skip();
            }
        }
        if (c == '.' || c == 'e' || c == 'E')
            giveUp();
        if (minus) {
            if (magnitude > uint64_t{1} << 63)
                giveUp();
            n.negative = magnitude != 0;
            n.bits = 0 - magnitude;
        } else {
            n.bits = magnitude;
        }
        return n;
    }

    void krcb() {
        KeySet keys(kKrcbKeys);
        object([&](std::string_view key) {
            switch (keys.take(key)) {
                case 0:
                    settings_.krcb.multiPartition = asU32(integer());
                    break;
                case 1:
                    settings_.krcb.partition = asS16(integer());
                    break;
                default:
                    settings_.krcb.defaultPartition = asS16(integer());
                    break;
            }
        });
    }

    void state() {
        std::string_view state = string();
        if (state == "started") {
            settings_.state = State::Started;
        } else if (state == "stopped") {
            settings_.state = State::Stopped;
        } else if (state == "unauthorized") {
            settings_.state = State::Unauthorized;
        } else {
            giveUp();
        }
    }

    void pool(PoolBatch& batch) {
        PoolRead& pool = batch.add();
        KeySet keys(kPoolKeys);
        bool hasId = false;
        bool hasName = false;
        object([&](std::string_view key) {
            switch (keys.take(key)) {
                case 0:
                    pool.id = asU32(integer());
                    hasId = true;
                    break;
                case 1:
                    stringInto(poolName_);
                    hasName = true;
                    break;
                case 2:
                    pool.current = static_cast<int64_t>(integer().bits);
                    pool.hasCurrent = true;
                    break;
                case 3:
                    pool.maximum = static_cast<int64_t>(integer().bits);
                    pool.hasMaximum = true;
                    break;
                case 4:
                    pool.highWater = static_cast<int64_t>(integer().bits);
                    pool.hasHighWater = true;
                    break;
                default: {
                    std::string_view name = string();
                    batch.names().append(name);
                    // Only its length counts until the batch is settled.
                    pool.bufferPool = name;
                    pool.hasBufferPool = true;
                    break;
                }
            }
        });
        if (hasName) {
            std::optional<uint32_t> id = poolIdByName(poolName_);
            if (!id)
                giveUp();
            if (hasId && *id != pool.id) {
                const PoolTableEntry* entry = poolTableEntry(pool.id);
                if (entry == nullptr || poolName_ != entry->name)
                    giveUp();
            }
            if (!hasId)
                pool.id = *id;
        } else if (!hasId) {
            giveUp();
        }
    }

    void pools(PoolBatch& batch) {
        array([&] { pool(batch); });
    }

    void instancePools() {
        batch_.clear();
        array([&] {
            pool(batch_);
            if (batch_.size() == kPoolBatch) {
                sink_.instancePools(batch_.settle());
                batch_.clear();
            }
        });
        if (batch_.size() != 0)
            sink_.instancePools(batch_.settle());
        sink_.endList(PoolList::Instance);
    }

    void sections(PoolList list) {
        array([&] { section(list); });
        sink_.endList(list);
    }

    void section(PoolList list) {
        batch_.clear();
        sectionName_.clear();
        SectionRead section;
        bool hasName = false;
        auto readPools = [&] { pools(batch_); };
        switch (list) {
            case PoolList::Databases: {
                KeySet keys(kDatabaseKeys);
                object([&](std::string_view key) {
                    if (keys.take(key) == 0) {
                        stringInto(sectionName_);
                    } else {
                        readPools();
                    }
                });
                break;
            }
            case PoolList::Applications: {
                KeySet keys(kApplicationKeys);
                object([&](std::string_view key) {
                    switch (keys.take(key)) {
                        case 0:
                            section.number = asU32(integer());
                            break;
                        case 1:
                            stringInto(sectionName_);
                            hasName = true;
                            break;
                        default:
                            readPools();
                            break;
                    }
                });
                if (!hasName)
                    giveUp();
                break;
            }
            default: {
                KeySet keys(kPrivateMemoryKeys);
                object([&](std::string_view key) {
                    if (keys.take(key) == 0) {
                        section.number = asU32(integer());
                    } else {
                        readPools();
                    }
                });
                break;
            }
        }
        section.name = sectionName_;
        section.pools = batch_.settle();
        sink_.section(list, section);
    }

    void snapshotAnswer(SnapshotAnswer& answer) {
        KeySet keys(kAnswerKeys);
        object([&](std::string_view key) {
            switch (keys.take(key)) {
                case 0:
                    answer.sizeRc = asS32(integer());
                    break;
                case 1:
                    answer.sizeSqlcode = asS32(integer());
                    break;
                case 2:
                    answer.takeRc = asS32(integer());
                    break;
                case 3:
                    answer.takeSqlcode = asS32(integer());
                    break;
                case 4:
                    answer.estimate = asU32(integer());
                    break;
                case 5:
                    answer.tooSmall = asU32(integer());
                    break;
                default: {
                    std::string_view file = string();
                    if (file.empty() || file[0] == '/')
                        giveUp();
                    answer.streamFile = std::string(file);
                    break;
                }
            }
        });
    }

    void snapshots() {
        KeySet keys(kSnapshotKeys);
        object([&](std::string_view key) { snapshotAnswer(settings_.snapshots[keys.take(key)]); });
    }

    void faults() {
        Faults& faults = settings_.faults;
        KeySet keys(kFaultKeys);
        std::optional<int32_t>* results[] = {&faults.initApplicationEnvironment,
                                             &faults.getDateTime, &faults.registryRead,
                                             &faults.registryWrite, &faults.sqlaintp};
        object([&](std::string_view key) {
            size_t index = keys.take(key);
            if (index < std::size(results)) {
                *results[index] = asS32(integer());
            } else if (index == 5) {
                array([&] { faults.messageFail.push_back(asU32(integer())); });
            } else if (index == 6) {
                faults.allocFailAt = asU64(integer());
                if (*faults.allocFailAt == 0)
                    giveUp();
            } else {
                faults.maxAllocBytes = asU64(integer());
            }
        });
    }

    Source& in_;
    Instance& settings_;
    InstanceSink& sink_;
    std::string key_;
    std::string text_;
    std::string poolName_;
    std::string sectionName_;
    PoolBatch batch_;
};

bool readFast(Source& in, Instance& settings, InstanceSink& sink) {
    try {
        settings = Instance{};
        Reader(in, settings, sink).document();
        return true;
    } catch (const GiveUp&) {
        return false;
    }
}

PoolRead poolRead(const Pool& pool) {
    PoolRead read;
    read.id = pool.id;
    read.hasCurrent = pool.current.has_value();
    read.hasMaximum = pool.maximum.has_value();
    read.hasHighWater = pool.highWater.has_value();
    read.hasBufferPool = pool.bufferPool.has_value();
    read.current = pool.current.value_or(0);
    read.maximum = pool.maximum.value_or(0);
    read.highWater = pool.highWater.value_or(0);
    if (pool.bufferPool)
        read.bufferPool = *pool.bufferPool;
    return read;
}

std::vector<PoolRead> poolReads(const std::vector<Pool>& pools) {
    std::vector<PoolRead> reads;
    reads.reserve(pools.size());
    for (const Pool& pool : pools)
        reads.push_back(poolRead(pool));
    return reads;
}

// Hands a fully parsed instance to a sink as the fast reader would.
void replay(Instance& instance, InstanceSink& sink) {
    sink.restart();
    sink.instancePools(poolReads(instance.pools));
    sink.endList(PoolList::Instance);
    for (const Database& db : instance.databases) {
        std::vector<PoolRead> pools = poolReads(db.pools);
        sink.section(PoolList::Databases, SectionRead{0, db.name, pools});
    }
    sink.endList(PoolList::Databases);
    for (const Application& app : instance.applications) {
        std::vector<PoolRead> pools = poolReads(app.pools);
        sink.section(PoolList::Applications, SectionRead{app.number, app.database, pools});
    }
    sink.endList(PoolList::Applications);
    for (const PrivateMemory& section : instance.privateMemory) {
        std::vector<PoolRead> pools = poolReads(section.pools);
        sink.section(PoolList::PrivateMemory, SectionRead{section.number, {}, pools});
    }
    sink.endList(PoolList::PrivateMemory);
    sink.endDocument();
    instance.pools.clear();
    instance.databases.clear();
    instance.applications.clear();
    instance.privateMemory.clear();
}

bool sameTimes(const timespec& a, const timespec& b) {
    return a.tv_sec == b.tv_sec && a.tv_nsec == b.tv_nsec;
}

// Whether every change after `readStart` gives the file a change time other
// than `changed`. A file system that keeps times to the nanosecond stamps a
// change with the clock's time, which is past `changed` once the clock has
// passed it; one that keeps whole seconds needs the next second.
bool laterChangesShow(const timespec& changed, const timespec& readStart) {
    if (changed.tv_nsec != 0) {
        return readStart.tv_sec > changed.tv_sec ||
               (readStart.tv_sec == changed.tv_sec && readStart.tv_nsec > changed.tv_nsec);
    }
    return readStart.tv_sec > changed.tv_sec;
}

}  // namespace

bool stillCurrent(const char* path, const FileStamp& stamp) {
    struct stat st {};
    bool exists = stat(path, &st) == 0;
    if (exists != stamp.exists)
        return false;
    if (!exists)
        return true;
    const struct stat& seen = stamp.st;
    return st.st_dev == seen.st_dev && st.st_ino == seen.st_ino && st.st_size == seen.st_size &&
           sameTimes(st.st_mtim, seen.st_mtim) && sameTimes(st.st_ctim, seen.st_ctim) &&
           laterChangesShow(seen.st_ctim, stamp.readStart);
}

bool readInstanceText(std::string_view text, Instance& settings, InstanceSink& sink) {
    Source in(text);
    return readFast(in, settings, sink);
}

bool readInstanceFile(const char* dir, Instance& settings, InstanceSink& sink, std::string& error,
                      FileStamp* stamp) {
    FileStamp seen;
    clock_gettime(CLOCK_REALTIME_COARSE, &seen.readStart);
    char path[PATH_MAX + 16];
    FixedText file(path, sizeof path);
    file.add(dir).add("/instance.json");

    bool fast = false;
    int fd = file.overflow() ? -1 : open(path, O_RDONLY | O_CLOEXEC);
    if (fd >= 0) {
        seen.exists = fstat(fd, &seen.st) == 0;
        if (seen.exists && S_ISREG(seen.st.st_mode)) {
            auto size = static_cast<uint64_t>(seen.st.st_size);
            Source in(fd, size < kChunkBytes ? static_cast<size_t>(size) + 1 : kChunkBytes);
            fast = readFast(in, settings, sink);
        }
        close(fd);
    } else if (!file.overflow()) {
        // Present but not readable: the thorough parser says why.
        seen.exists = stat(path, &seen.st) == 0;
    }
    if (stamp != nullptr)
        *stamp = seen;
    if (fast)
        return true;

    Instance instance;
    if (!loadInstance(dir, instance, error))
        return false;
    replay(instance, sink);
    settings = std::move(instance);
    return true;
}

}  // namespace standin
