// libvrxbench_split: preloaded into a run of vrxmtrk, it splits the run's
// CPU time from within the one process: the time before main (loading the
// program and the engine's libraries, which read instance.json when they
// load), the time inside the engine's set-up and snapshot calls (the size
// estimate, the allocation and release of each snapshot's buffer, the
// take), and the whole. What remains is the program's own work, measured in the same
// process and so free of the differences between one process and the next.
//
//   LD_PRELOAD=libvrxbench_split.so VRXBENCH_SPLIT=split.txt vrxmtrk -i -d -a -p
//
// writes "startup=S engine=E total=T" (seconds of CPU) to split.txt at exit.
// The library depends on the engine's client library, so that it is set up
// after every engine library has loaded its instance.
#include <dlfcn.h>

#include <cstdio>
#include <cstdlib>
#include <ctime>

#include "engine/sqlca.h"
#include "engine/vrxapp.h"
#include "engine/vrxsys.h"

namespace {

double processSeconds() {
    timespec t{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &t);
    return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) / 1e9;
}

double gStartup = 0;
double gEngine = 0;

template <typename Function>
Function next(const char* name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

// Calls the engine's own function and counts the CPU time it took.
template <typename Function, typename... Args>
int32_t timed(const char* name, Args... args) {
    static Function real = next<Function>(name);
    if (real == nullptr)
        std::abort();
    double start = processSeconds();
    int32_t rc = real(args...);
    gEngine += processSeconds() - start;
    return rc;
}

// The last block allocated, with the time its allocation took: counted
// with the snapshot calls if it becomes a snapshot's buffer.
void* gLastBlock = nullptr;
double gLastBlockSeconds = 0;
// Snapshot buffers not yet released (a run holds one or two at a time).
constexpr int kBuffers = 16;
constexpr uint64_t kTimedBlock = 64 * 1024;
void* gBuffers[kBuffers] = {};

bool takeBuffer(void* block) {
    for (void*& held : gBuffers) {
        if (held == block) {
            held = nullptr;
            return true;
        }
    }
    return false;
}

void keepBuffer(void* block) {
    for (void*& held : gBuffers) {
        if (held == nullptr) {
            held = block;
            return;
        }
    }
}

__attribute__((constructor)) void markStartup() {
    gStartup = processSeconds();
}

__attribute__((destructor)) void writeSplit() {
    double total = processSeconds();
    const char* path = std::getenv("VRXBENCH_SPLIT");
    FILE* out = path != nullptr ? std::fopen(path, "w") : stderr;
    if (out == nullptr)
        return;
    std::fprintf(out, "startup=%.6f engine=%.6f total=%.6f\n", gStartup, gEngine, total);
    if (out != stderr)
        std::fclose(out);
}

}  // namespace

extern "C" {

__attribute__((visibility("default"))) int32_t sqleInitApplicationEnvironment(uint32_t a,
                                                                              uint32_t b,
                                                                              uint32_t mode,
                                                                              sqlca* ca) {
    return timed<decltype(&sqleInitApplicationEnvironment)>("sqleInitApplicationEnvironment", a, b,
                                                            mode, ca);
}

__attribute__((visibility("default"))) int32_t vrxGetSnapshotSize(uint32_t version,
                                                                  MonSizeRequest* request,
                                                                  sqlca* ca) {
    return timed<decltype(&vrxGetSnapshotSize)>("vrxGetSnapshotSize", version, request, ca);
}

__attribute__((visibility("default"))) int32_t vrxGetSnapshot(uint32_t version,
                                                              MonSnapshotRequest* request,
                                                              sqlca* ca) {
    if (request != nullptr && request->buffer != nullptr && request->buffer == gLastBlock) {
        gEngine += gLastBlockSeconds;
        gLastBlock = nullptr;
        keepBuffer(request->buffer);
    }
    return timed<decltype(&vrxGetSnapshot)>("vrxGetSnapshot", version, request, ca);
}

__attribute__((visibility("default"))) int32_t sqlogmblkEx(uint32_t pool, uint64_t size,
                                                           uint32_t flags, void** block,
                                                           const char* file, uint32_t line,
                                                           uint32_t reserved) {
    static auto real = next<decltype(&sqlogmblkEx)>("sqlogmblkEx");
    // Reading the process clock is a system call: the program's many small
    // blocks (message tables) are not timed, so that the split does not
    // weigh on what it measures; a smaller snapshot costs too little to
    // matter.
    if (size < kTimedBlock) {
        gLastBlock = nullptr;
        return real(pool, size, flags, block, file, line, reserved);
    }
    double start = processSeconds();
    int32_t rc = real(pool, size, flags, block, file, line, reserved);
    gLastBlockSeconds = processSeconds() - start;
    gLastBlock = block != nullptr ? *block : nullptr;
    return rc;
}

__attribute__((visibility("default"))) int32_t sqlofmblkEx(const char* file, uint32_t line,
                                                           void* block) {
    static auto real = next<decltype(&sqlofmblkEx)>("sqlofmblkEx");
    if (!takeBuffer(block))
        return real(file, line, block);
    return timed<decltype(&sqlofmblkEx)>("sqlofmblkEx", file, line, block);
}
}
