#include "reports/mtrkPoolNames.h"

#include <cstdio>
#include <cstring>

#include "engine/vrxosse.h"
#include "engine/vrxsys.h"
#include "messages/mtrkMessages.h"
#include "monitor/mtrkStream.h"
#include "mtrkOptions.h"
#include "platform.h"

namespace {

struct SystemBufferPool {
    const char* name;
    const char* shortName;
};

// The engine's four system buffer pools, in the order they are compared.
constexpr SystemBufferPool SYSTEM_BUFFER_POOLS[] = {
    {"System 32k buffer pool", "S32K"},
    {"System 16k buffer pool", "S16K"},
    {"System 8k buffer pool", "S8K"},
    {"System 4k buffer pool", "S4K"},
};

// Unit letters after the first division by 1024. P and E go beyond what a
// pool of today reaches, but a size of 1000 T or more must still read as a
// size with its unit and never as a bare number of bytes.
constexpr char UNIT_LETTERS[] = {'K', 'M', 'G', 'T', 'P', 'E'};

constexpr float ONE_OVER_1024 = 0.0009765625f;

// Copies `text` into `buffer` of `capacity` bytes, cut to fit.
void copyBounded(char* buffer, uint32_t capacity, const char* text) {
    if (capacity == 0) {
        return;
    }
    strncpy(buffer, text, capacity - 1);
    buffer[capacity - 1] = '\0';
}

}  // namespace

int32_t mtrkGetBufferPoolName(const char* start, uint32_t length, char* buffer, uint32_t capacity) {
    return mtrkGetString(MON_BUFFER_POOL_NAME, start, length, buffer, capacity);
}

int32_t mtrkGetBufferPoolShortName(const char* start, uint32_t length, char* buffer,
                                   uint32_t capacity) {
    if (mtrkGetBufferPoolName(start, length, buffer, capacity) != 0) {
        return 1;
    }
    // Only the whole name of a system buffer pool is abbreviated: a user
    // buffer pool called "System" or "S" keeps its own name instead of
    // turning into another pool's short name.
    for (const SystemBufferPool& pool : SYSTEM_BUFFER_POOLS) {
        if (strncmp(buffer, pool.name, capacity) == 0) {
            copyBounded(buffer, capacity, pool.shortName);
            break;
        }
    }
    return 0;
}

void mtrkBuildPoolLabel(uint32_t poolId, const char* bufferPoolName, bool showBufferPoolName,
                        const MtrkOptions* options, char* label) {
    const char* engineText =
        options->verbose ? sqloGetMemPoolDescription(poolId) : sqloGetMemPoolName(poolId);
    char poolName[MTRK_TEXT_SIZE];
    ossSnprintf(poolName, sizeof poolName, "%s", engineText != nullptr ? engineText : "");

    if (showBufferPoolName && bufferPoolName[0] != '\0') {
        ossSnprintf(label, MTRK_TEXT_SIZE, "%s (%s)", poolName, bufferPoolName);
    } else {
        ossSnprintf(label, MTRK_TEXT_SIZE, "%s", poolName);
    }
}

void mtrkFormatSize(int64_t size, char* text) {
    if (size < 1000) {
        ossSnprintf(text, MTRK_COLUMN_SIZE, MTRK_I64D "           ", size);
        return;
    }
    // Single precision on purpose: the column shows one decimal, and the
    // float's rounding decides where a value tips over into the next unit.
    float value = static_cast<float>(size) * ONE_OVER_1024;
    uint32_t divisions = 0;
    while (value >= 1000.0f) {
        value *= ONE_OVER_1024;
        ++divisions;
    }
    // A signed 64-bit size stays below 8 E, so the letters always suffice;
    // the guard keeps a changed float behaviour from reading past them.
    const uint32_t last = sizeof UNIT_LETTERS - 1;
    char unit = UNIT_LETTERS[divisions <= last ? divisions : last];
    ossSnprintf(text, MTRK_COLUMN_SIZE, "%3.1f%c          ", static_cast<double>(value), unit);
}
