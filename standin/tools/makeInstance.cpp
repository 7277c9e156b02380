// vrxmkinstance: writes an instance.json of a chosen size.
#include <cerrno>
#include <cinttypes>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "instanceGenerator.h"

namespace {

using standin::InstanceShape;

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
int parseShape(int argc, char** argv, InstanceShape* shape, const char** output) {
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
            *output = argv[++i];
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
    InstanceShape shape;
    const char* output = nullptr;
    if (int rc = parseShape(argc, argv, &shape, &output))
        return rc;
    FILE* out = output != nullptr ? std::fopen(output, "wb") : stdout;
    if (out == nullptr) {
        std::fprintf(stderr, "vrxmkinstance: cannot write %s: %s\n", output, std::strerror(errno));
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
