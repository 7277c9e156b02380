// The stand-in engine's model of one instance, read from
// <instance directory>/instance.json.
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace standin {

struct Pool {
    uint32_t id = 0;
    std::optional<int64_t> current;
    std::optional<int64_t> maximum;
    std::optional<int64_t> highWater;
    std::optional<std::string> bufferPool;
};

struct Database {
    std::string name;
    std::vector<Pool> pools;
};

struct Application {
    uint32_t number = 0;
    std::string database;
    std::vector<Pool> pools;
};

struct PrivateMemory {
    uint32_t number = 0;
    std::vector<Pool> pools;
};

// How the monitor answers one object type.
struct SnapshotAnswer {
    int32_t sizeRc = 0;
    int32_t sizeSqlcode = 0;
    int32_t takeRc = 0;
    int32_t takeSqlcode = 0;
    std::optional<uint32_t> estimate;
    uint32_t tooSmall = 0;
    std::optional<std::string> streamFile;  // relative to the instance directory
};

enum class SnapshotKind { Instance = 0, Database = 1, Application = 2 };

struct Faults {
    std::optional<int32_t> initApplicationEnvironment;
    std::optional<int32_t> getDateTime;
    std::optional<int32_t> registryRead;
    std::optional<int32_t> registryWrite;
    std::optional<int32_t> sqlaintp;
    std::vector<uint32_t> messageFail;
    std::optional<uint64_t> allocFailAt;
    uint64_t maxAllocBytes = uint64_t{1} << 30;
};

struct Krcb {
    uint32_t multiPartition = 0;
    int16_t partition = 0;
    int16_t defaultPartition = 0;
};

enum class State { Started, Stopped, Unauthorized };

struct Clock {
    uint16_t year, month, day, hour, minute, second;
};

struct Instance {
    std::optional<Clock> clock;  // absent: the real local time
    uint32_t traceFlags = 0;
    std::optional<uint32_t> maxPoolId;
    Krcb krcb;
    State state = State::Started;
    std::vector<Pool> pools;
    std::vector<Database> databases;
    std::vector<Application> applications;
    std::vector<PrivateMemory> privateMemory;
    SnapshotAnswer snapshots[3];
    Faults faults;
};

// The instance directory: VRX_INSTANCE_DIR when set and not empty, else the
// built-in demo instance.
std::filesystem::path instanceDirectory();

// The same path as a C string in `out` (capacity `capacity`), for the paths
// that must not allocate (the registry write and the trace probes, which a
// signal handler calls). False, with `out` empty, when it does not fit.
bool instanceDirectoryPath(char* out, size_t capacity);

// Reads and validates <dir>/instance.json. On failure returns false and
// `error` says exactly what is wrong (file, line and column for bad JSON).
bool loadInstance(const std::filesystem::path& dir, Instance& out, std::string& error);

// The same for the text of an instance.json.
bool parseInstance(const std::string& content, Instance& out, std::string& error);

// The instance as the system services see it: its settings, without the
// pool lists (pools, databases, applications and private memory stay empty;
// only the snapshot monitor reads them). Loaded on first use; checked again
// (path, size, times) when the instance directory changes or after the
// client library's next request (set-up or snapshot), so that a process that
// switches VRX_INSTANCE_DIR, or a file edited between snapshots, is
// followed. The defaults when the file cannot be read or is not valid. The
// reference stays valid across one further reload, so holding it while
// calling another service is safe. Not for signal handlers.
const Instance& currentInstance();

// faults.registryWrite of the instance in `dir`, for the registry write that
// a signal handler makes: answered without allocating or locking when
// instance.json is the file currentInstance() last loaded, or when it does
// not mention the fault at all. Only a file changed since then that does
// configure the fault is loaded the ordinary way.
std::optional<int32_t> registryWriteFault(const char* dir);

// The engine's installed data (catalogs under locale/, the demo instance
// under demo/): found relative to the library that asks, so that the build
// tree and an installed tree both work.
std::filesystem::path dataDirectory();

}  // namespace standin

// The requests of the client library that read instance.json (set-up,
// snapshot size, snapshot): the client library notes each one, and the
// system services look at their files again only when the count has grown.
// Kept by the system services' library; not part of the engine's interface.
extern "C" {
void vrxStandinNoteInstanceRequest(void);
uint64_t vrxStandinInstanceRequests(void);
}
