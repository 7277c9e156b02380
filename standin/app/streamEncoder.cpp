#include "app/streamEncoder.h"

#include <bit>
#include <cstdlib>
#include <cstring>
#include <string_view>
#include <vector>

#include "common/poolTable.h"

namespace standin {

namespace {

// Every element: u32 data size, u16 type, u16 identifier, then the data.
constexpr uint64_t kHeader = 8;

enum ElementType : uint16_t { kNested = 1, kText = 2, kU32 = 3, kU64 = 4 };

enum ElementId : uint16_t {
    kSnapshot = 1,
    kApplication = 5,
    kPrivateMemory = 10,
    kDatabase = 13,
    kPool = 40,
    kApplicationNumber = 302,
    kDatabaseName = 321,
    kPrivateMemoryNumber = 549,
    kPoolId = 686,
    kPoolCurrent = 687,
    kPoolMaximum = 688,
    kPoolHighWater = 689,
    kBufferPoolName = 874,
};

// The sizes below are data sizes (without the element's own header); the
// writer asks for each nested element's size once, just before writing its
// header, so the whole encoding stays linear in the instance.

bool visible(const Pool& pool, const StreamScope& scope) {
    return scope.showInternalPools || !poolIsInternal(pool.id);
}

uint64_t poolDataSize(const Pool& pool) {
    uint64_t size = kHeader + 4;
    for (const auto* value : {&pool.current, &pool.maximum, &pool.highWater}) {
        if (value->has_value())
            size += kHeader + 8;
    }
    if (pool.bufferPool)
        size += kHeader + pool.bufferPool->size();
    return size;
}

uint64_t poolsSize(const std::vector<Pool>& pools, const StreamScope& scope) {
    uint64_t size = 0;
    for (const Pool& pool : pools) {
        if (visible(pool, scope))
            size += kHeader + poolDataSize(pool);
    }
    return size;
}

uint64_t databaseDataSize(const Database& db, const StreamScope& scope) {
    return kHeader + db.name.size() + poolsSize(db.pools, scope);
}

uint64_t applicationDataSize(const Application& app, const StreamScope& scope) {
    return kHeader + 4 + kHeader + app.database.size() + poolsSize(app.pools, scope);
}

uint64_t privateMemoryDataSize(const PrivateMemory& section, const StreamScope& scope) {
    return kHeader + 4 + poolsSize(section.pools, scope);
}

uint64_t snapshotDataSize(const Instance& instance, const StreamScope& scope) {
    uint64_t size = 0;
    switch (scope.kind) {
        case SnapshotKind::Instance:
            size = poolsSize(instance.pools, scope);
            break;
        case SnapshotKind::Database:
            for (const Database& db : instance.databases) {
                size += kHeader + databaseDataSize(db, scope);
            }
            break;
        case SnapshotKind::Application:
            for (const Application& app : instance.applications) {
                size += kHeader + applicationDataSize(app, scope);
            }
            for (const PrivateMemory& section : instance.privateMemory) {
                size += kHeader + privateMemoryDataSize(section, scope);
            }
            break;
    }
    return size;
}

// Writes little-endian fields straight into the caller's buffer.
class Writer {
  public:
    explicit Writer(char* out) : at_(out) {}

    void header(ElementType type, ElementId id, uint64_t size) {
        auto size32 = static_cast<uint32_t>(size);
        auto type16 = static_cast<uint16_t>(type);
        auto id16 = static_cast<uint16_t>(id);
        put(&size32, 4);
        put(&type16, 2);
        put(&id16, 2);
    }
    void u32(ElementId id, uint32_t value) {
        header(kU32, id, 4);
        put(&value, 4);
    }
    void u64(ElementId id, int64_t value) {
        header(kU64, id, 8);
        put(&value, 8);
    }
    void text(ElementId id, std::string_view value) {
        header(kText, id, value.size());
        put(value.data(), value.size());
    }
    char* position() const { return at_; }

  private:
    void put(const void* bytes, size_t n) {
        if (n != 0)
            std::memcpy(at_, bytes, n);
        at_ += n;
    }
    char* at_;
};

static_assert(std::endian::native == std::endian::little,
              "the data stream is little-endian and written in place");

void writePools(Writer& w, const std::vector<Pool>& pools, const StreamScope& scope) {
    for (const Pool& pool : pools) {
        if (!visible(pool, scope))
            continue;
        w.header(kNested, kPool, poolDataSize(pool));
        w.u32(kPoolId, pool.id);
        if (pool.current)
            w.u64(kPoolCurrent, *pool.current);
        if (pool.maximum)
            w.u64(kPoolMaximum, *pool.maximum);
        if (pool.highWater)
            w.u64(kPoolHighWater, *pool.highWater);
        if (pool.bufferPool)
            w.text(kBufferPoolName, *pool.bufferPool);
    }
}

}  // namespace

uint64_t encodedStreamSize(const Instance& instance, StreamScope scope) {
    return kHeader + snapshotDataSize(instance, scope);
}

uint64_t encodeStream(const Instance& instance, StreamScope scope, char* out) {
    uint64_t size = encodedStreamSize(instance, scope);
    Writer w(out);
    w.header(kNested, kSnapshot, size - kHeader);
    switch (scope.kind) {
        case SnapshotKind::Instance:
            writePools(w, instance.pools, scope);
            break;
        case SnapshotKind::Database:
            for (const Database& db : instance.databases) {
                w.header(kNested, kDatabase, databaseDataSize(db, scope));
                w.text(kDatabaseName, db.name);
                writePools(w, db.pools, scope);
            }
            break;
        case SnapshotKind::Application:
            for (const Application& app : instance.applications) {
                w.header(kNested, kApplication, applicationDataSize(app, scope));
                w.u32(kApplicationNumber, app.number);
                w.text(kDatabaseName, app.database);
                writePools(w, app.pools, scope);
            }
            for (const PrivateMemory& section : instance.privateMemory) {
                w.header(kNested, kPrivateMemory, privateMemoryDataSize(section, scope));
                w.u32(kPrivateMemoryNumber, section.number);
                writePools(w, section.pools, scope);
            }
            break;
    }
    // The two descriptions of the layout above must agree; a stream whose
    // headers disagree with its bytes would be worse than no engine.
    auto written = static_cast<uint64_t>(w.position() - out);
    if (written != size)
        std::abort();
    return written;
}

}  // namespace standin
