#include "instanceGenerator.h"

#include <cinttypes>
#include <cstring>
#include <iterator>
#include <string>

namespace standin {

namespace {

// Pools an application holds, in the order they are written; all of them
// standard pools, so that every one shows without exposing internal pools.
constexpr uint32_t kApplicationPoolIds[] = {2, 1, 17, 15, 13, 0, 16, 18};
// A database's own pools besides its buffer pools; 20 is the shared
// application heap that the application report prints for each group.
constexpr uint32_t kDatabasePoolIds[] = {20, 5, 9, 12, 4, 18, 14, 16, 10, 8, 6, 7};
constexpr uint32_t kInstancePoolIds[] = {10, 11, 7, 8, 6, 0, 13, 16};
constexpr uint32_t kPrivatePoolIds[] = {15, 11, 17, 13};
constexpr uint32_t kBufferPoolId = 3;
constexpr const char* kSystemBufferPools[] = {"System 32k buffer pool", "System 16k buffer pool",
                                              "System 8k buffer pool", "System 4k buffer pool"};

// A small, fast generator whose sequence does not depend on the C library.
struct Random {
    uint64_t state;
    uint64_t next() {
        state = state * 6364136223846793005u + 1442695040888963407u;
        return state >> 33;
    }
};

// Writes the JSON text; every call appends to one large stdio buffer.
class Writer {
  public:
    explicit Writer(FILE* out) : out_(out) {}

    void text(const char* s) { std::fputs(s, out_); }

    void pool(uint32_t id, Random& random, const char* bufferPool) {
        // Sizes spread over bytes to gigabytes, so that every unit of the
        // column form shows up; the high-water mark lies between the current
        // size and the maximum, as in a real instance.
        int shift = static_cast<int>(random.next() % 31);
        uint64_t current = (random.next() % 1024 + 1) << shift;
        uint64_t highWater = current + (current >> (random.next() % 4 + 1));
        uint64_t maximum = highWater * (random.next() % 8 + 1);
        std::fprintf(out_,
                     "{\"id\":%" PRIu32 ",\"current\":%" PRIu64 ",\"maximum\":%" PRIu64
                     ",\"highWater\":%" PRIu64,
                     id, current, maximum, highWater);
        if (bufferPool != nullptr)
            std::fprintf(out_, ",\"bufferPool\":\"%s\"", bufferPool);
        std::fputc('}', out_);
    }

    // `count` pools taken in turn from `ids`.
    template <size_t N>
    void pools(const uint32_t (&ids)[N], uint32_t count, Random& random) {
        text("\"pools\":[");
        for (uint32_t i = 0; i < count; ++i) {
            if (i != 0)
                std::fputc(',', out_);
            pool(ids[i % N], random, nullptr);
        }
        std::fputc(']', out_);
    }

  private:
    FILE* out_;
};

std::string databaseName(uint32_t index) {
    char name[16];
    std::snprintf(name, sizeof name, "DB%05" PRIu32, index);
    return name;
}

// A database's own pools, then its buffer pools: the four system ones first
// (they print abbreviated), then user buffer pools by name.
void writeDatabase(Writer& w, uint32_t index, const InstanceShape& shape, Random& random) {
    w.text("{\"name\":\"");
    w.text(databaseName(index).c_str());
    w.text("\",\"pools\":[");
    for (uint32_t p = 0; p < shape.databasePools; ++p) {
        w.text(p == 0 ? "" : ",");
        w.pool(kDatabasePoolIds[p % std::size(kDatabasePoolIds)], random, nullptr);
    }
    for (uint32_t b = 0; b < shape.bufferPools; ++b) {
        w.text(shape.databasePools + b == 0 ? "" : ",");
        char name[32];
        const char* bufferPool = name;
        if (b < std::size(kSystemBufferPools)) {
            bufferPool = kSystemBufferPools[b];
        } else {
            std::snprintf(name, sizeof name, "USERBP%zu", b - std::size(kSystemBufferPools) + 1);
        }
        w.pool(kBufferPoolId, random, bufferPool);
    }
    w.text("]}");
}

void writeDatabases(Writer& w, const InstanceShape& shape, Random& random) {
    w.text("\"databases\":[\n");
    for (uint32_t d = 0; d < shape.databases; ++d) {
        w.text(d == 0 ? "" : ",\n");
        writeDatabase(w, d, shape, random);
    }
    w.text("\n],\n");
}

// Applications go round the databases, `run` at a time.
void writeApplications(Writer& w, const InstanceShape& shape, Random& random) {
    w.text("\"applications\":[\n");
    for (uint64_t a = 0; a < shape.applications; ++a) {
        w.text(a == 0 ? "" : ",\n");
        auto database = static_cast<uint32_t>((a / shape.run) % shape.databases);
        char head[96];
        std::snprintf(head, sizeof head, "{\"number\":%" PRIu64 ",\"database\":\"%s\",", a + 1,
                      databaseName(database).c_str());
        w.text(head);
        w.pools(kApplicationPoolIds, shape.applicationPools, random);
        w.text("}");
    }
    w.text("\n],\n");
}

void writePrivateMemory(Writer& w, const InstanceShape& shape, Random& random) {
    w.text("\"privateMemory\":[\n");
    for (uint32_t s = 0; s < shape.privateSections; ++s) {
        w.text(s == 0 ? "" : ",\n");
        char head[48];
        std::snprintf(head, sizeof head, "{\"number\":%" PRIu32 ",", s);
        w.text(head);
        w.pools(kPrivatePoolIds, shape.privatePools, random);
        w.text("}");
    }
    w.text("\n]\n");
}

}  // namespace

void writeInstance(FILE* out, const InstanceShape& shape) {
    Random random{shape.seed};
    Writer w(out);
    w.text("{\n\"clock\":\"2026-12-06 20:05:39\",\n");
    w.pools(kInstancePoolIds, shape.instancePools, random);
    w.text(",\n");
    writeDatabases(w, shape, random);
    writeApplications(w, shape, random);
    writePrivateMemory(w, shape, random);
    w.text("}\n");
}

uint64_t poolCount(const InstanceShape& shape) {
    return shape.instancePools +
           uint64_t{shape.databases} * (shape.databasePools + shape.bufferPools) +
           shape.applications * shape.applicationPools +
           uint64_t{shape.privateSections} * shape.privatePools;
}

}  // namespace standin
