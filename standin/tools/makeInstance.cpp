// vrxmkinstance: writes an instance.json of a chosen size, for measuring the
// program and the engine on instances far larger than anyone writes by hand.
//
// The instance is fully determined by the options (sizes come from a fixed
// pseudo-random sequence), so two runs with the same options write the same
// bytes and figures taken on different days compare.
#include <cerrno>
#include <cinttypes>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <string>

namespace {

struct Shape {
    uint32_t databases = 4;
    uint64_t applications = 1000;
    // How many applications of one database stand together before the next
    // database's come: 1 interleaves them completely, so that every
    // application opens a new group in the application report.
    uint32_t run = 1;
    uint32_t applicationPools = 8;
    uint32_t databasePools = 12;
    uint32_t bufferPools = 4;
    uint32_t privateSections = 16;
    uint32_t privatePools = 4;
    uint32_t instancePools = 8;
    uint64_t seed = 1;
    const char* output = nullptr;
};

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
void writeDatabase(Writer& w, uint32_t index, const Shape& shape, Random& random) {
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

void writeDatabases(Writer& w, const Shape& shape, Random& random) {
    w.text("\"databases\":[\n");
    for (uint32_t d = 0; d < shape.databases; ++d) {
        w.text(d == 0 ? "" : ",\n");
        writeDatabase(w, d, shape, random);
    }
    w.text("\n],\n");
}

// Applications go round the databases, `run` at a time.
void writeApplications(Writer& w, const Shape& shape, Random& random) {
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

void writePrivateMemory(Writer& w, const Shape& shape, Random& random) {
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

void writeInstance(FILE* out, const Shape& shape) {
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

void usage(FILE* to) {
    std::fputs(
        "usage: vrxmkinstance [options] [-o FILE]\n"
        "Writes an instance.json for the stand-in engine (to standard output\n"
        "unless -o names a file).\n"
        "  --applications N       applications (1000)\n"
        "  --databases N          databases, at least 1 (4)\n"
        "  --run N                applications of one database in a row before\n"
        "                         the next database's (1: fully interleaved)\n"
        "  --application-pools N  pools per application (8)\n"
        "  --database-pools N     pools per database besides buffer pools (12)\n"
        "  --buffer-pools N       buffer pools per database; the first four are\n"
        "                         the system buffer pools (4)\n"
        "  --private-sections N   private memory sections (16)\n"
        "  --private-pools N      pools per private memory section (4)\n"
        "  --instance-pools N     the instance's own pools (8)\n"
        "  --seed N               seed of the pool sizes (1)\n",
        to);
}

bool parseNumber(const char* text, uint64_t max, uint64_t* value) {
    if (text == nullptr || *text < '0' || *text > '9')
        return false;
    errno = 0;
    char* end = nullptr;
    unsigned long long n = std::strtoull(text, &end, 10);
    if (errno != 0 || *end != '\0' || n > max)
        return false;
    *value = n;
    return true;
}

// Returns 0 on success, 2 (with the reason printed) on a bad command line.
int parseShape(int argc, char** argv, Shape* shape) {
    struct Option {
        const char* name;
        uint64_t max;
        uint64_t* wide;
        uint32_t* narrow;
    };
    const Option options[] = {
        {"--applications", UINT32_MAX, &shape->applications, nullptr},
        {"--databases", 99999, nullptr, &shape->databases},
        {"--run", UINT32_MAX, nullptr, &shape->run},
        {"--application-pools", 100000, nullptr, &shape->applicationPools},
        {"--database-pools", 100000, nullptr, &shape->databasePools},
        {"--buffer-pools", 100000, nullptr, &shape->bufferPools},
        {"--private-sections", 10000000, nullptr, &shape->privateSections},
        {"--private-pools", 100000, nullptr, &shape->privatePools},
        {"--instance-pools", 100000, nullptr, &shape->instancePools},
        {"--seed", UINT64_MAX, &shape->seed, nullptr},
    };
    for (int i = 1; i < argc; ++i) {
        const char* arg = argv[i];
        if (std::strcmp(arg, "-h") == 0 || std::strcmp(arg, "--help") == 0) {
            usage(stdout);
            std::exit(0);
        }
        if (std::strcmp(arg, "-o") == 0 && i + 1 < argc) {
            shape->output = argv[++i];
            continue;
        }
        const Option* option = nullptr;
        for (const Option& o : options) {
            if (std::strcmp(arg, o.name) == 0)
                option = &o;
        }
        uint64_t value = 0;
        if (option == nullptr || i + 1 >= argc || !parseNumber(argv[i + 1], option->max, &value)) {
            std::fprintf(stderr, "vrxmkinstance: bad argument: %s\n", arg);
            usage(stderr);
            return 2;
        }
        ++i;
        if (option->wide != nullptr)
            *option->wide = value;
        else
            *option->narrow = static_cast<uint32_t>(value);
    }
    if (shape->databases == 0 || shape->run == 0) {
        std::fputs("vrxmkinstance: --databases and --run must be at least 1\n", stderr);
        return 2;
    }
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    Shape shape;
    if (int rc = parseShape(argc, argv, &shape))
        return rc;
    FILE* out = shape.output != nullptr ? std::fopen(shape.output, "wb") : stdout;
    if (out == nullptr) {
        std::fprintf(stderr, "vrxmkinstance: cannot write %s: %s\n", shape.output,
                     std::strerror(errno));
        return 1;
    }
    static char buffer[1 << 20];
    std::setvbuf(out, buffer, _IOFBF, sizeof buffer);
    writeInstance(out, shape);
    bool failed = std::ferror(out) != 0;
    failed = (out != stdout ? std::fclose(out) : std::fflush(out)) != 0 || failed;
    if (failed) {
        std::fprintf(stderr, "vrxmkinstance: write failed: %s\n", std::strerror(errno));
        return 1;
    }
    return 0;
}
