// Arbitrary bytes as a snapshot block: every search, iteration and read
// that the reports perform must stay inside the block and end.
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>

#include "monitor/mtrkStream.h"

namespace {

// The name buffers the reports use: a name or label text and a buffer
// pool name.
constexpr uint32_t kNameSize = 5000;
constexpr uint32_t kBufferPoolNameSize = 256;

// Keeps the values read alive, so that no read is optimised away.
volatile uint64_t gSink;

void keep(int32_t result, int64_t value) {
    gSink = gSink + static_cast<uint64_t>(result) + static_cast<uint64_t>(value);
}

void readPool(const char* data, uint32_t size) {
    uint32_t id = 0;
    int64_t value = 0;
    keep(mtrkGetPoolId(data, size, &id), id);
    keep(mtrkGetPoolCurrentSize(data, size, &value), value);
    keep(mtrkGetPoolMaximum(data, size, &value), value);
    keep(mtrkGetPoolHighWater(data, size, &value), value);
    char bufferPool[kBufferPoolNameSize];
    if (mtrkGetString(MON_BUFFER_POOL_NAME, data, size, bufferPool, sizeof(bufferPool)) == 0) {
        gSink = gSink + strlen(bufferPool);
    }
    const char* header;
    const char* found;
    if (mtrkFindElement(MON_BUFFER_POOL_NAME, data, size, &header, &found) == 0) {
        // The smallest buffer that still takes a terminator.
        char tiny[1];
        mtrkCopyString(header, tiny, sizeof(tiny));
        gSink = gSink + static_cast<uint8_t>(tiny[0]);
    }
}

// The pools of one region, as the pool list printer walks them.
void walkPools(const char* start, uint32_t length) {
    const char* header;
    const char* data;
    uint32_t remaining = 0;
    uint32_t size = 0;
    while (mtrkFindNextPool(start, length, &header, &data, &remaining, &size) == 0) {
        readPool(data, size);
        start = header;
        length = remaining;
    }
}

// The sections of one kind, as the database, application and private
// memory reports walk them.
void walkSections(const char* stream, uint32_t streamLength, uint16_t id) {
    char heldName[kNameSize];
    heldName[0] = '\0';
    char shortName[4] = "";
    const char* start = stream;
    uint32_t length = streamLength;
    const char* header;
    const char* data;
    uint32_t remaining = 0;
    while (mtrkFindNextElement(start, length, &header, &data, &remaining, id) == 0) {
        uint32_t size = mtrkReadHeader(header).size;
        uint32_t number = 0;
        keep(mtrkGetU32(MON_APPLICATION_NUMBER, data, size, &number), number);
        keep(mtrkGetU32(MON_PRIVATE_MEMORY_NUMBER, data, size, &number), number);
        char name[kNameSize];
        if (mtrkGetString(MON_DATABASE_NAME, data, size, name, sizeof(name)) == 0) {
            gSink = gSink + strlen(name);
        }
        uint8_t changed = 0;
        mtrkRefreshName(data, size, heldName, sizeof(heldName), &changed);
        gSink = gSink + changed;
        // A held name cut to its buffer must compare as the cut copy.
        mtrkRefreshName(data, size, shortName, sizeof(shortName), &changed);
        gSink = gSink + changed;
        walkPools(data, size);
        start = data;
        length = remaining;
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* bytes, size_t size) {
    if (size > UINT32_MAX) {
        return 0;
    }
    // Exactly the input's size, so that any read past it is caught.
    std::unique_ptr<char[]> block(new char[size]);
    if (size != 0) {
        memcpy(block.get(), bytes, size);
    }
    auto blockSize = static_cast<uint32_t>(size);
    uint32_t length = mtrkStreamLength(block.get(), blockSize);

    walkPools(block.get(), length);
    for (uint16_t id : {MON_DATABASE, MON_APPLICATION, MON_PRIVATE_MEMORY}) {
        walkSections(block.get(), length, id);
    }
    // A region that is the whole block, whatever its first element says.
    walkPools(block.get(), blockSize);
    walkSections(block.get(), blockSize, MON_DATABASE);
    return 0;
}
