// Reading instance.json into the instance model. The file is written by hand
// by administrators and tests, so every mistake is reported with the path of
// the offending value; nothing unknown is ignored.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <nlohmann/json.hpp>
#include <set>
#include <string_view>

#include "common/instance.h"
#include "common/poolTable.h"

namespace standin {

namespace {

using nlohmann::json;

constexpr const char* kFileName = "instance.json";

struct Invalid {
    std::string message;
};

[[noreturn]] void fail(const std::string& path, const std::string& what) {
    throw Invalid{path.empty() ? what : path + ": " + what};
}

std::string member(const std::string& path, std::string_view key) {
    return path.empty() ? std::string(key) : path + "." + std::string(key);
}

std::string element(const std::string& path, size_t index) {
    return path + "[" + std::to_string(index) + "]";
}

// A short rendering of a value for messages: long arrays or objects must not
// flood the log.
std::string shown(const json& value) {
    std::string text = value.dump(-1, ' ', false, json::error_handler_t::replace);
    if (text.size() > 40)
        text = text.substr(0, 37) + "...";
    return text;
}

void requireObject(const json& value, const std::string& path) {
    if (!value.is_object())
        fail(path, "expected an object, got " + shown(value));
}

void requireArray(const json& value, const std::string& path) {
    if (!value.is_array())
        fail(path, "expected an array, got " + shown(value));
}

void checkKeys(const json& object, const std::string& path,
               std::initializer_list<std::string_view> known) {
    for (const auto& [key, value] : object.items()) {
        bool found = false;
        for (std::string_view k : known)
            found = found || key == k;
        if (!found)
            fail(path, "unknown key \"" + key + "\"");
    }
}

std::string readString(const json& value, const std::string& path) {
    if (!value.is_string())
        fail(path, "expected a string, got " + shown(value));
    return value.get<std::string>();
}

// An integer as written: a JSON number or a hexadecimal string. Negative
// numbers keep their two's complement bit pattern in `bits`.
struct Integer {
    bool negative = false;
    bool hex = false;
    uint64_t bits = 0;
};

Integer readInteger(const json& value, const std::string& path, const char* expected) {
    Integer result;
    if (value.is_number_unsigned()) {
        result.bits = value.get<uint64_t>();
    } else if (value.is_number_integer()) {
        int64_t number = value.get<int64_t>();
        result.negative = number < 0;
        result.bits = static_cast<uint64_t>(number);
    } else if (value.is_string()) {
        const std::string& text = value.get_ref<const std::string&>();
        bool wellFormed = text.size() > 2 && text.size() <= 18 && text[0] == '0' &&
                          (text[1] == 'x' || text[1] == 'X');
        for (size_t i = 2; wellFormed && i < text.size(); ++i) {
            char c = text[i];
            int digit = c >= '0' && c <= '9'   ? c - '0'
                        : c >= 'a' && c <= 'f' ? c - 'a' + 10
                        : c >= 'A' && c <= 'F' ? c - 'A' + 10
                                               : -1;
            if (digit < 0)
                wellFormed = false;
            result.bits = result.bits << 4 | static_cast<uint64_t>(digit);
        }
        if (!wellFormed) {
            fail(path, std::string("expected ") + expected +
                           " (a number or a hexadecimal string of at most 16 digits), got " +
                           shown(value));
        }
        result.hex = true;
    } else {
        fail(path, std::string("expected ") + expected + ", got " + shown(value));
    }
    return result;
}

[[noreturn]] void outOfRange(const json& value, const std::string& path, const char* expected) {
    fail(path, shown(value) + " is out of range for " + expected);
}

uint32_t readU32(const json& value, const std::string& path) {
    const char* expected = "an unsigned 32-bit number";
    Integer n = readInteger(value, path, expected);
    if (n.negative || n.bits > UINT32_MAX)
        outOfRange(value, path, expected);
    return static_cast<uint32_t>(n.bits);
}

uint64_t readU64(const json& value, const std::string& path) {
    const char* expected = "an unsigned 64-bit number";
    Integer n = readInteger(value, path, expected);
    if (n.negative)
        outOfRange(value, path, expected);
    return n.bits;
}

// Signed numbers in hexadecimal are bit patterns of their width, so that a
// result code reads as the engine documents it ("0x870F0104").
int32_t readS32(const json& value, const std::string& path) {
    const char* expected = "a signed 32-bit number";
    Integer n = readInteger(value, path, expected);
    if (n.hex) {
        if (n.bits > UINT32_MAX)
            outOfRange(value, path, expected);
        return static_cast<int32_t>(static_cast<uint32_t>(n.bits));
    }
    auto signedValue = static_cast<int64_t>(n.bits);
    if ((n.negative && signedValue < INT32_MIN) || (!n.negative && n.bits > INT32_MAX)) {
        outOfRange(value, path, expected);
    }
    return static_cast<int32_t>(signedValue);
}

int16_t readS16(const json& value, const std::string& path) {
    const char* expected = "a signed 16-bit number";
    Integer n = readInteger(value, path, expected);
    if (n.hex) {
        if (n.bits > UINT16_MAX)
            outOfRange(value, path, expected);
        return static_cast<int16_t>(static_cast<uint16_t>(n.bits));
    }
    auto signedValue = static_cast<int64_t>(n.bits);
    if ((n.negative && signedValue < INT16_MIN) || (!n.negative && n.bits > INT16_MAX)) {
        outOfRange(value, path, expected);
    }
    return static_cast<int16_t>(signedValue);
}

// Pool sizes are 64-bit words in the stream; a negative size is kept as its
// two's complement, and a large unsigned one simply wraps.
int64_t readSize(const json& value, const std::string& path) {
    return static_cast<int64_t>(readInteger(value, path, "a 64-bit number").bits);
}

bool isLeapYear(unsigned year) {
    return (year % 4 == 0 && year % 100 != 0) || year % 400 == 0;
}

Clock readClock(const json& value, const std::string& path) {
    std::string text = readString(value, path);
    const char* layout = "dddd-dd-dd dd:dd:dd";
    bool wellFormed = text.size() == std::strlen(layout);
    for (size_t i = 0; wellFormed && i < text.size(); ++i) {
        bool digit = text[i] >= '0' && text[i] <= '9';
        wellFormed = layout[i] == 'd' ? digit : text[i] == layout[i];
    }
    if (!wellFormed)
        fail(path, "expected \"YYYY-MM-DD HH:MM:SS\", got " + shown(value));
    auto field = [&](size_t at, size_t width) {
        return static_cast<uint16_t>(std::stoi(text.substr(at, width)));
    };
    Clock clock{field(0, 4), field(5, 2), field(8, 2), field(11, 2), field(14, 2), field(17, 2)};
    static constexpr unsigned kDays[] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
    bool valid = clock.year >= 1 && clock.month >= 1 && clock.month <= 12 && clock.day >= 1 &&
                 clock.hour <= 23 && clock.minute <= 59 && clock.second <= 59;
    if (valid) {
        unsigned days = kDays[clock.month - 1] + (clock.month == 2 && isLeapYear(clock.year));
        valid = clock.day <= days;
    }
    if (!valid)
        fail(path, "not a valid date and time: " + shown(value));
    return clock;
}

Pool readPool(const json& value, const std::string& path) {
    requireObject(value, path);
    checkKeys(value, path, {"id", "name", "current", "maximum", "highWater", "bufferPool"});
    Pool pool;
    bool hasId = value.contains("id");
    if (hasId)
        pool.id = readU32(value["id"], member(path, "id"));
    if (value.contains("name")) {
        std::string name = readString(value["name"], member(path, "name"));
        std::optional<uint32_t> id = poolIdByName(name);
        if (!id)
            fail(member(path, "name"), "no pool named \"" + name + "\" in the pool table");
        if (hasId && *id != pool.id) {
            const PoolTableEntry* entry = poolTableEntry(pool.id);
            bool sameName = entry != nullptr && name == entry->name;
            if (!sameName) {
                fail(path, "pool id " + std::to_string(pool.id) + " is not named \"" + name + "\"");
            }
        }
        if (!hasId)
            pool.id = *id;
    } else if (!hasId) {
        fail(path, "a pool needs \"id\" or \"name\"");
    }
    if (value.contains("current"))
        pool.current = readSize(value["current"], member(path, "current"));
    if (value.contains("maximum"))
        pool.maximum = readSize(value["maximum"], member(path, "maximum"));
    if (value.contains("highWater")) {
        pool.highWater = readSize(value["highWater"], member(path, "highWater"));
    }
    if (value.contains("bufferPool")) {
        pool.bufferPool = readString(value["bufferPool"], member(path, "bufferPool"));
    }
    return pool;
}

std::vector<Pool> readPools(const json& value, const std::string& path) {
    requireArray(value, path);
    std::vector<Pool> pools;
    pools.reserve(value.size());
    for (size_t i = 0; i < value.size(); ++i)
        pools.push_back(readPool(value[i], element(path, i)));
    return pools;
}

// Reads the array at `key` of `parent`, each element with `readOne`.
template <typename T, typename ReadOne>
std::vector<T> readList(const json& parent, std::string_view key, const std::string& parentPath,
                        ReadOne readOne) {
    std::vector<T> list;
    if (!parent.contains(key))
        return list;
    std::string path = member(parentPath, key);
    const json& array = parent[std::string(key)];
    requireArray(array, path);
    list.reserve(array.size());
    for (size_t i = 0; i < array.size(); ++i)
        list.push_back(readOne(array[i], element(path, i)));
    return list;
}

Database readDatabase(const json& value, const std::string& path) {
    requireObject(value, path);
    checkKeys(value, path, {"name", "pools"});
    Database database;
    if (value.contains("name"))
        database.name = readString(value["name"], member(path, "name"));
    if (value.contains("pools"))
        database.pools = readPools(value["pools"], member(path, "pools"));
    return database;
}

Application readApplication(const json& value, const std::string& path) {
    requireObject(value, path);
    checkKeys(value, path, {"number", "database", "pools"});
    Application application;
    if (value.contains("number"))
        application.number = readU32(value["number"], member(path, "number"));
    if (!value.contains("database"))
        fail(path, "an application needs \"database\"");
    application.database = readString(value["database"], member(path, "database"));
    if (value.contains("pools")) {
        application.pools = readPools(value["pools"], member(path, "pools"));
    }
    return application;
}

PrivateMemory readPrivateMemory(const json& value, const std::string& path) {
    requireObject(value, path);
    checkKeys(value, path, {"number", "pools"});
    PrivateMemory section;
    if (value.contains("number"))
        section.number = readU32(value["number"], member(path, "number"));
    if (value.contains("pools"))
        section.pools = readPools(value["pools"], member(path, "pools"));
    return section;
}

SnapshotAnswer readSnapshotAnswer(const json& value, const std::string& path) {
    requireObject(value, path);
    checkKeys(
        value, path,
        {"sizeRc", "sizeSqlcode", "takeRc", "takeSqlcode", "estimate", "tooSmall", "streamFile"});
    SnapshotAnswer answer;
    auto s32 = [&](const char* key, int32_t& out) {
        if (value.contains(key))
            out = readS32(value[key], member(path, key));
    };
    s32("sizeRc", answer.sizeRc);
    s32("sizeSqlcode", answer.sizeSqlcode);
    s32("takeRc", answer.takeRc);
    s32("takeSqlcode", answer.takeSqlcode);
    if (value.contains("estimate"))
        answer.estimate = readU32(value["estimate"], member(path, "estimate"));
    if (value.contains("tooSmall"))
        answer.tooSmall = readU32(value["tooSmall"], member(path, "tooSmall"));
    if (value.contains("streamFile")) {
        std::string file = readString(value["streamFile"], member(path, "streamFile"));
        if (file.empty() || file[0] == '/') {
            fail(member(path, "streamFile"), "expected a file relative to the instance directory");
        }
        answer.streamFile = file;
    }
    return answer;
}

Faults readFaults(const json& value, const std::string& path) {
    requireObject(value, path);
    checkKeys(value, path,
              {"initApplicationEnvironment", "getDateTime", "registryRead", "registryWrite",
               "sqlaintp", "messageFail", "allocFailAt", "maxAllocBytes"});
    Faults faults;
    auto result = [&](const char* key, std::optional<int32_t>& out) {
        if (value.contains(key))
            out = readS32(value[key], member(path, key));
    };
    result("initApplicationEnvironment", faults.initApplicationEnvironment);
    result("getDateTime", faults.getDateTime);
    result("registryRead", faults.registryRead);
    result("registryWrite", faults.registryWrite);
    result("sqlaintp", faults.sqlaintp);
    faults.messageFail = readList<uint32_t>(value, "messageFail", path, readU32);
    if (value.contains("allocFailAt")) {
        std::string at = member(path, "allocFailAt");
        faults.allocFailAt = readU64(value["allocFailAt"], at);
        if (*faults.allocFailAt == 0)
            fail(at, "calls are counted from 1");
    }
    if (value.contains("maxAllocBytes")) {
        faults.maxAllocBytes = readU64(value["maxAllocBytes"], member(path, "maxAllocBytes"));
    }
    return faults;
}

Instance readInstance(const json& root) {
    requireObject(root, "");
    checkKeys(root, "",
              {"clock", "traceFlags", "maxPoolId", "krcb", "state", "pools", "databases",
               "applications", "privateMemory", "snapshots", "faults"});
    Instance instance;
    if (root.contains("clock"))
        instance.clock = readClock(root["clock"], "clock");
    if (root.contains("traceFlags"))
        instance.traceFlags = readU32(root["traceFlags"], "traceFlags");
    if (root.contains("maxPoolId"))
        instance.maxPoolId = readU32(root["maxPoolId"], "maxPoolId");
    if (root.contains("krcb")) {
        const json& krcb = root["krcb"];
        requireObject(krcb, "krcb");
        checkKeys(krcb, "krcb", {"multiPartition", "partition", "defaultPartition"});
        if (krcb.contains("multiPartition")) {
            instance.krcb.multiPartition = readU32(krcb["multiPartition"], "krcb.multiPartition");
        }
        if (krcb.contains("partition")) {
            instance.krcb.partition = readS16(krcb["partition"], "krcb.partition");
        }
        if (krcb.contains("defaultPartition")) {
            instance.krcb.defaultPartition =
                readS16(krcb["defaultPartition"], "krcb.defaultPartition");
        }
    }
    if (root.contains("state")) {
        std::string state = readString(root["state"], "state");
        if (state == "started") {
            instance.state = State::Started;
        } else if (state == "stopped") {
            instance.state = State::Stopped;
        } else if (state == "unauthorized") {
            instance.state = State::Unauthorized;
        } else {
            fail("state",
                 "expected \"started\", \"stopped\" or \"unauthorized\", got \"" + state + "\"");
        }
    }
    if (root.contains("pools"))
        instance.pools = readPools(root["pools"], "pools");
    instance.databases = readList<Database>(root, "databases", "", readDatabase);
    instance.applications = readList<Application>(root, "applications", "", readApplication);
    instance.privateMemory = readList<PrivateMemory>(root, "privateMemory", "", readPrivateMemory);
    if (root.contains("snapshots")) {
        const json& snapshots = root["snapshots"];
        requireObject(snapshots, "snapshots");
        checkKeys(snapshots, "snapshots", {"instance", "database", "application"});
        const char* kinds[] = {"instance", "database", "application"};
        for (int kind = 0; kind < 3; ++kind) {
            if (snapshots.contains(kinds[kind])) {
                instance.snapshots[kind] =
                    readSnapshotAnswer(snapshots[kinds[kind]], member("snapshots", kinds[kind]));
            }
        }
    }
    if (root.contains("faults"))
        instance.faults = readFaults(root["faults"], "faults");
    return instance;
}

// The JSON library keeps the last of two equal keys silently; for a
// hand-written file that is as much a typo as an unknown key, so the parse
// watches the keys of every object and remembers the first duplicate.
class DuplicateKeyWatch {
  public:
    bool operator()(int /*depth*/, json::parse_event_t event, json& parsed) {
        switch (event) {
            case json::parse_event_t::object_start:
                enterValue();
                frames_.push_back({true, {}, {}, 0});
                break;
            case json::parse_event_t::array_start:
                enterValue();
                frames_.push_back({false, {}, {}, 0});
                break;
            case json::parse_event_t::object_end:
            case json::parse_event_t::array_end:
                if (!frames_.empty())
                    frames_.pop_back();
                break;
            case json::parse_event_t::key:
                if (!frames_.empty()) {
                    Frame& frame = frames_.back();
                    frame.key = parsed.get<std::string>();
                    if (!frame.keys.insert(frame.key).second && !duplicate_) {
                        duplicate_ =
                            pathOfInnermostObject() + "duplicate key \"" + frame.key + "\"";
                    }
                }
                break;
            case json::parse_event_t::value:
                enterValue();
                break;
        }
        return true;
    }

    const std::optional<std::string>& duplicate() const { return duplicate_; }

  private:
    struct Frame {
        bool object;
        std::set<std::string> keys;
        std::string key;
        size_t elements;
    };

    void enterValue() {
        if (!frames_.empty() && !frames_.back().object)
            ++frames_.back().elements;
    }

    // "databases[1].pools[0]: " for the object that the last frame is.
    std::string pathOfInnermostObject() const {
        std::string path;
        for (size_t i = 0; i + 1 < frames_.size(); ++i) {
            const Frame& frame = frames_[i];
            path = frame.object ? member(path, frame.key) : element(path, frame.elements - 1);
        }
        return path.empty() ? path : path + ": ";
    }

    std::vector<Frame> frames_;
    std::optional<std::string> duplicate_;
};

std::string syntaxError(const json::parse_error& error, const std::string& content) {
    size_t at = error.byte == 0 ? 0 : std::min<size_t>(error.byte - 1, content.size());
    size_t line = 1;
    size_t column = 1;
    for (size_t i = 0; i < at; ++i) {
        if (content[i] == '\n') {
            ++line;
            column = 1;
        } else {
            ++column;
        }
    }
    // The library's own text leads with its error number and position; keep
    // just what it says went wrong.
    std::string what = error.what();
    size_t columnAt = what.find("column ");
    size_t colon = columnAt == std::string::npos ? std::string::npos : what.find(": ", columnAt);
    if (colon != std::string::npos)
        what = what.substr(colon + 2);
    return "line " + std::to_string(line) + ", column " + std::to_string(column) + ": " + what;
}

bool readFile(const std::filesystem::path& file, std::string& content, std::string& error) {
    int fd = open(file.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) {
        error = std::string("cannot be opened: ") + std::strerror(errno);
        return false;
    }
    struct stat st {};
    if (fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) {
        close(fd);
        error = "is not a regular file";
        return false;
    }
    content.clear();
    char buffer[16384];
    for (;;) {
        ssize_t n = read(fd, buffer, sizeof buffer);
        if (n < 0 && errno == EINTR)
            continue;
        if (n < 0) {
            error = std::string("cannot be read: ") + std::strerror(errno);
            close(fd);
            return false;
        }
        if (n == 0)
            break;
        content.append(buffer, static_cast<size_t>(n));
    }
    close(fd);
    return true;
}

}  // namespace

bool parseInstance(const std::string& content, Instance& out, std::string& error) {
    try {
        DuplicateKeyWatch watch;
        json root = json::parse(content, std::ref(watch));
        if (watch.duplicate()) {
            error = std::string(kFileName) + ": " + *watch.duplicate();
            return false;
        }
        out = readInstance(root);
        return true;
    } catch (const json::parse_error& e) {
        error = std::string(kFileName) + ": " + syntaxError(e, content);
    } catch (const Invalid& e) {
        error = std::string(kFileName) + ": " + e.message;
    } catch (const json::exception& e) {
        error = std::string(kFileName) + ": " + e.what();
    }
    return false;
}

bool loadInstance(const std::filesystem::path& dir, Instance& out, std::string& error) {
    std::string content;
    if (!readFile(dir / kFileName, content, error)) {
        error = std::string(kFileName) + " " + error;
        return false;
    }
    return parseInstance(content, out, error);
}

}  // namespace standin
