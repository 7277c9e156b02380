// vrxbench_snapshots: takes the snapshots that a run takes, one after the
// other, through the engine's monitor calls alone: the floor below which no
// run of the program can go. Prints how many snapshots were taken, the
// largest one's size and the pools of each object type, counted once.
//
//   vrxbench_snapshots instance database application database application
#include <cstdint>
#include <cstdio>
#include <cstring>

#include "common/monitorCall.h"
#include "engine/sqlca.h"
#include "engine/vrxapp.h"
#include "engine/vrxsys.h"

namespace {

constexpr uint16_t kPool = 40;
constexpr uint16_t kNested = 1;

struct Header {
    uint32_t size;
    uint16_t type;
    uint16_t element;
};

Header headerAt(const char* at) {
    Header h;
    std::memcpy(&h.size, at, 4);
    std::memcpy(&h.type, at + 4, 2);
    std::memcpy(&h.element, at + 6, 2);
    return h;
}

// Pool elements anywhere in a run of elements.
uint64_t countPools(const char* run, uint64_t length) {
    uint64_t pools = 0;
    for (uint64_t at = 0; at + 8 <= length;) {
        Header h = headerAt(run + at);
        if (h.element == kPool) {
            ++pools;
        } else if (h.type == kNested) {
            pools += countPools(run + at + 8, h.size);
        }
        at += 8 + uint64_t{h.size};
    }
    return pools;
}

bool objectType(const char* name, uint32_t* type) {
    if (std::strcmp(name, "instance") == 0) {
        *type = VRX_OBJ_INSTANCE;
    } else if (std::strcmp(name, "database") == 0) {
        *type = VRX_OBJ_DATABASE;
    } else if (std::strcmp(name, "application") == 0) {
        *type = VRX_OBJ_APPLICATION;
    } else {
        return false;
    }
    return true;
}

}  // namespace

int main(int argc, char** argv) {
    if (sqleInitApplicationEnvironment(0, 0, 1, nullptr) != 0) {
        std::fputs("vrxbench_snapshots: the engine does not start\n", stderr);
        return 1;
    }
    uint64_t largest = 0;
    uint64_t pools = 0;
    bool counted[3] = {};
    for (int i = 1; i < argc; ++i) {
        uint32_t type = 0;
        if (!objectType(argv[i], &type)) {
            std::fprintf(stderr, "vrxbench_snapshots: unknown object type %s\n", argv[i]);
            return 2;
        }
        standin::MonitorCall call(type);
        if (call.askSize() != 0 || call.ca.sqlcode != 0) {
            std::fprintf(stderr, "vrxbench_snapshots: no estimate for %s\n", argv[i]);
            return 1;
        }
        uint32_t estimate = call.estimate;
        void* block = nullptr;
        if (sqlogmblkEx(0, estimate, 0, &block, "bench", __LINE__, 0) != 0) {
            std::fputs("vrxbench_snapshots: no memory\n", stderr);
            return 1;
        }
        if (call.takeInto(block, estimate) != 0 || call.ca.sqlcode != 0) {
            std::fprintf(stderr, "vrxbench_snapshots: no snapshot of %s\n", argv[i]);
            return 1;
        }
        largest = estimate > largest ? estimate : largest;
        int kind = type == VRX_OBJ_INSTANCE ? 0 : type == VRX_OBJ_DATABASE ? 1 : 2;
        if (!counted[kind] && estimate >= 8) {
            counted[kind] = true;
            pools += countPools(static_cast<const char*>(block) + 8,
                                headerAt(static_cast<const char*>(block)).size);
        }
        sqlofmblkEx("bench", __LINE__, block);
    }
    std::printf("snapshots=%d largest=%llu pools=%llu\n", argc - 1,
                static_cast<unsigned long long>(largest), static_cast<unsigned long long>(pools));
    return 0;
}
