// sqlogmblkEx and sqlofmblkEx keep a record of every block they hand out, so
// that a release of something never handed out (or released before) is
// caught where it happens, and every block still held at process exit is
// reported with the place that asked for it.
#include <algorithm>
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <string>
#include <unordered_map>
#include <vector>

#include "common/diagLog.h"
#include "common/export.h"
#include "common/instance.h"
#include "engine/vrxsys.h"
#include "sys/memoryTracking.h"

namespace standin {

namespace {

struct BlockRecord {
    std::string file;
    uint32_t line;
    uint64_t size;
    uint64_t serial;  // order of allocation, for a stable leak report
};

struct ReleasedRecord {
    const void* address = nullptr;
    BlockRecord block;
    std::string releasedFile;
    uint32_t releasedLine = 0;
};

// Addresses come back from malloc again and again; remembering the last
// this many releases is plenty to tell a double release from a foreign
// pointer.
constexpr size_t kReleasedRemembered = 4096;

struct Tracker {
    std::mutex mutex;
    std::unordered_map<const void*, BlockRecord> held;
    // The last releases, oldest overwritten first. An address handed out
    // again stays in it: only a block that is not held is looked up here,
    // and then its latest release is the one that counts.
    std::vector<ReleasedRecord> released = std::vector<ReleasedRecord>(kReleasedRemembered);
    size_t nextReleased = 0;
    uint64_t serial = 0;

    const ReleasedRecord* lastRelease(const void* block) const {
        for (size_t i = 0; i < released.size(); ++i) {
            const ReleasedRecord& r =
                released[(nextReleased + released.size() - 1 - i) % released.size()];
            if (r.address != nullptr && r.address == block)
                return &r;
        }
        return nullptr;
    }
};

// Never destroyed: the leak report at exit, and programs that release blocks
// from their own static destructors, still need it.
Tracker& tracker() {
    static Tracker& instance = *new Tracker;
    return instance;
}

std::atomic<uint64_t> gAllocationCalls{0};

// Fresh blocks are filled with a pattern, not zeros, so that a caller that
// forgets to initialise what it reads shows up in tests.
constexpr unsigned char kFreshFill = 0xCD;

std::string place(const char* file, uint32_t line) {
    return std::string(file != nullptr ? file : "?") + ":" + std::to_string(line);
}

std::string address(const void* block) {
    char text[32];
    std::snprintf(text, sizeof text, "%p", block);
    return text;
}

__attribute__((destructor)) void reportHeldBlocks() {
    Tracker& t = tracker();
    std::vector<BlockRecord> leaks;
    {
        std::lock_guard lock(t.mutex);
        for (const auto& [block, record] : t.held)
            leaks.push_back(record);
    }
    std::sort(leaks.begin(), leaks.end(),
              [](const BlockRecord& a, const BlockRecord& b) { return a.serial < b.serial; });
    for (const BlockRecord& leak : leaks) {
        logEngineProblem("Memory block not released: " + leak.file + ":" +
                         std::to_string(leak.line) + ", " + std::to_string(leak.size) + " bytes");
    }
}

}  // namespace

std::optional<uint64_t> blockSize(const void* block) {
    Tracker& t = tracker();
    std::lock_guard lock(t.mutex);
    auto it = t.held.find(block);
    if (it == t.held.end())
        return std::nullopt;
    return it->second.size;
}

uint64_t blocksHeld() {
    Tracker& t = tracker();
    std::lock_guard lock(t.mutex);
    return t.held.size();
}

}  // namespace standin

using namespace standin;

extern "C" VRX_EXPORT int32_t sqlogmblkEx(uint32_t /*pool*/, uint64_t size, uint32_t /*flags*/,
                                          void** block, const char* file, uint32_t line,
                                          uint32_t /*reserved*/) {
    if (block == nullptr)
        return kMemoryBadBlock;
    *block = nullptr;
    uint64_t call = ++gAllocationCalls;
    const Faults& faults = currentInstance().faults;
    if (faults.allocFailAt && *faults.allocFailAt == call)
        return kMemoryNotAvailable;
    if (size > faults.maxAllocBytes || size > SIZE_MAX - 1)
        return kMemoryNotAvailable;

    // A block of size 0 is still a distinct address that must be released.
    void* memory = std::malloc(size == 0 ? 1 : static_cast<size_t>(size));
    if (memory == nullptr)
        return kMemoryNotAvailable;
    std::memset(memory, kFreshFill, size == 0 ? 1 : static_cast<size_t>(size));

    Tracker& t = tracker();
    {
        std::lock_guard lock(t.mutex);
        t.held[memory] = BlockRecord{file != nullptr ? file : "?", line, size, t.serial++};
    }
    *block = memory;
    return 0;
}

extern "C" VRX_EXPORT int32_t sqlofmblkEx(const char* file, uint32_t line, void* block) {
    Tracker& t = tracker();
    std::string problem;
    {
        std::lock_guard lock(t.mutex);
        auto it = t.held.find(block);
        if (it != t.held.end()) {
            ReleasedRecord& r = t.released[t.nextReleased];
            t.nextReleased = (t.nextReleased + 1) % t.released.size();
            r.address = block;
            r.block = std::move(it->second);
            r.releasedFile = file != nullptr ? file : "?";
            r.releasedLine = line;
            t.held.erase(it);
            std::free(block);
            return 0;
        }
        if (const ReleasedRecord* before = t.lastRelease(block)) {
            const ReleasedRecord& r = *before;
            problem = "Memory block released twice: " + place(file, line) + ", block " +
                      address(block) + " of " + std::to_string(r.block.size) + " bytes from " +
                      r.block.file + ":" + std::to_string(r.block.line) + ", already released at " +
                      r.releasedFile + ":" + std::to_string(r.releasedLine);
        } else {
            problem = "Memory block not handed out by the engine released: " + place(file, line) +
                      ", address " + address(block);
        }
    }
    logEngineProblem(problem);
    return kMemoryBadBlock;
}
