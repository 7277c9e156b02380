#include "monitor/mtrkStream.h"

#include <cstring>

#include "messages/mtrkFunctionIds.h"
#include "messages/mtrkTrace.h"

// A walk keeps the end of every enclosing run it has descended from, so
// that it can go on past a nested run without recursion: a damaged stream
// can nest headers as deep as its length allows, and the call stack must
// not depend on the bytes. The engine nests three levels (stream, section,
// pool); a run nested deeper than this is passed over, never descended.
static constexpr uint32_t MTRK_MAX_DEPTH = 128;

MonElement mtrkReadHeader(const char* at) {
    MonElement h;
    memcpy(&h.size, at, 4);
    memcpy(&h.type, at + 4, 2);
    memcpy(&h.element, at + 6, 2);
    return h;
}

uint32_t mtrkStreamLength(const char* buffer, uint32_t bufferSize) {
    if (buffer == nullptr || bufferSize < MON_HEADER_SIZE) {
        return 0;
    }
    uint64_t length = static_cast<uint64_t>(mtrkReadHeader(buffer).size) + MON_HEADER_SIZE;
    return length < bufferSize ? static_cast<uint32_t>(length) : bufferSize;
}

// Offsets are 64-bit and relative to `start`, so that no size in the
// stream can make them wrap. An element is examined only when at least one
// byte follows its header inside its run; an element whose data would pass
// the end of its run ends the walk of that run as a miss, and the walk of
// the enclosing run goes on after it.
int32_t mtrkFindElement(uint16_t id, const char* start, uint32_t length, const char** header,
                        const char** data) {
    if (length <= MON_HEADER_SIZE) {
        return 1;
    }
    uint64_t enclosingEnd[MTRK_MAX_DEPTH];
    uint32_t depth = 0;
    uint64_t at = 0;
    uint64_t end = length;
    for (;;) {
        *header = start + at;
        *data = start + at + MON_HEADER_SIZE;
        MonElement h = mtrkReadHeader(start + at);
        uint64_t next = at + MON_HEADER_SIZE + h.size;
        if (next > end) {
            // Damaged run: give it up and resume the enclosing run where
            // this one was declared to end.
            if (depth == 0) {
                return 1;
            }
            at = end;
            end = enclosingEnd[--depth];
        } else if (h.element == id) {
            return 0;
        } else if (h.type == MON_TYPE_HEADER && h.size > MON_HEADER_SIZE &&
                   depth < MTRK_MAX_DEPTH) {
            // The nested run ends exactly where the next element of this
            // run begins, so only this run's end needs keeping.
            enclosingEnd[depth++] = end;
            end = next;
            at += MON_HEADER_SIZE;
            continue;
        } else {
            at = next;
        }
        while (end <= at + MON_HEADER_SIZE) {
            if (depth == 0) {
                return 1;
            }
            at = end;
            end = enclosingEnd[--depth];
        }
    }
}

// Where a find-next walk begins: past the element at `start` when it bears
// `id`. False when nothing remains to walk.
static bool mtrkStepOver(uint16_t id, const char** start, uint32_t* length) {
    if (*length <= MON_HEADER_SIZE) {
        return false;
    }
    MonElement first = mtrkReadHeader(*start);
    if (first.element != id) {
        return true;
    }
    uint64_t step = static_cast<uint64_t>(first.size) + MON_HEADER_SIZE;
    if (step >= *length) {
        return false;
    }
    *start += step;
    *length -= static_cast<uint32_t>(step);
    return true;
}

// The walk that both find-next operations share: past the element at
// `start` when it bears `id`, then a search of the rest of the region.
static int32_t mtrkFindAfter(uint16_t id, const char* start, uint32_t length, const char** header,
                             const char** data) {
    if (!mtrkStepOver(id, &start, &length)) {
        return 1;
    }
    return mtrkFindElement(id, start, length, header, data);
}

int32_t mtrkFindNextElement(const char* start, uint32_t length, const char** header,
                            const char** data, uint32_t* remaining, uint16_t id) {
    uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_FIND_NEXT_ELEMENT);
    int32_t rc = mtrkFindAfter(id, start, length, header, data);
    if (rc == 0) {
        *remaining = static_cast<uint32_t>(start + length - *data);
    }
    mtrkTraceExit(MTRK_FID_FIND_NEXT_ELEMENT, traceFlags, rc);
    return rc;
}

int32_t mtrkFindNextPool(const char* start, uint32_t length, const char** header, const char** data,
                         uint32_t* remaining, uint32_t* size) {
    uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_FIND_NEXT_POOL);
    int32_t rc = mtrkFindAfter(MON_POOL, start, length, header, data);
    if (rc == 0) {
        *remaining = static_cast<uint32_t>(start + length - *header);
        *size = mtrkReadHeader(*header).size;
    }
    mtrkTraceExit(MTRK_FID_FIND_NEXT_POOL, traceFlags, rc);
    return rc;
}

// A value element shorter than its width is no value at all: reading it
// would take bytes of whatever follows.
static int32_t mtrkGetValue(uint16_t id, const char* start, uint32_t length, void* value,
                            uint32_t width) {
    const char* header = nullptr;
    const char* data = nullptr;
    if (mtrkFindElement(id, start, length, &header, &data) != 0) {
        return 1;
    }
    if (mtrkReadHeader(header).size < width) {
        return 1;
    }
    memcpy(value, data, width);
    return 0;
}

int32_t mtrkGetU32(uint16_t id, const char* start, uint32_t length, uint32_t* value) {
    return mtrkGetValue(id, start, length, value, 4);
}

int32_t mtrkGetU64(uint16_t id, const char* start, uint32_t length, int64_t* value) {
    return mtrkGetValue(id, start, length, value, 8);
}

int32_t mtrkGetPoolId(const char* start, uint32_t length, uint32_t* id) {
    return mtrkGetU32(MON_POOL_ID, start, length, id);
}

int32_t mtrkGetPoolCurrentSize(const char* start, uint32_t length, int64_t* size) {
    return mtrkGetU64(MON_POOL_CURRENT, start, length, size);
}

int32_t mtrkGetPoolMaximum(const char* start, uint32_t length, int64_t* size) {
    return mtrkGetU64(MON_POOL_MAXIMUM, start, length, size);
}

int32_t mtrkGetPoolHighWater(const char* start, uint32_t length, int64_t* size) {
    return mtrkGetU64(MON_POOL_HIGH_WATER, start, length, size);
}

// The number of bytes a copy fills: the text and its terminator, cut to
// the buffer.
static uint32_t mtrkCopyLength(uint32_t size, uint32_t capacity) {
    uint64_t wanted = static_cast<uint64_t>(size) + 1;
    return wanted < capacity ? static_cast<uint32_t>(wanted) : capacity;
}

void mtrkCopyString(const char* header, char* buffer, uint32_t capacity) {
    uint32_t size = mtrkReadHeader(header).size;
    uint32_t n = mtrkCopyLength(size, capacity);
    if (n == 0) {
        return;
    }
    // The stream does not terminate its texts: never read beyond the
    // element's own data, which may end the buffer.
    const char* data = header + MON_HEADER_SIZE;
    uint32_t i = 0;
    while (i < n && i < size && data[i] != '\0') {
        buffer[i] = data[i];
        ++i;
    }
    memset(buffer + i, 0, n - i);
    buffer[n - 1] = '\0';
}

int32_t mtrkGetString(uint16_t id, const char* start, uint32_t length, char* buffer,
                      uint32_t capacity) {
    const char* header = nullptr;
    const char* data = nullptr;
    if (mtrkFindElement(id, start, length, &header, &data) != 0) {
        return 1;
    }
    mtrkCopyString(header, buffer, capacity);
    return 0;
}

// Whether `held` already holds exactly what copying the element would
// leave in it: the same characters and the terminator at the same place.
static bool mtrkSameName(const char* held, uint32_t capacity, const char* header) {
    if (capacity == 0) {
        return true;
    }
    uint32_t size = mtrkReadHeader(header).size;
    const char* data = header + MON_HEADER_SIZE;
    uint32_t limit = capacity - 1;
    for (uint32_t i = 0; i < limit; ++i) {
        char fresh = (i < size) ? data[i] : '\0';
        if (held[i] != fresh) {
            return false;
        }
        if (fresh == '\0') {
            return true;
        }
    }
    return held[limit] == '\0';
}

int32_t mtrkRefreshName(const char* start, uint32_t length, char* name, uint32_t capacity,
                        uint8_t* changed) {
    const char* header = nullptr;
    const char* data = nullptr;
    if (mtrkFindElement(MON_DATABASE_NAME, start, length, &header, &data) != 0) {
        return 1;
    }
    if (mtrkSameName(name, capacity, header)) {
        if (changed != nullptr) {
            *changed = 0;
        }
        return 0;
    }
    if (changed != nullptr) {
        *changed = 1;
    }
    memset(name, 0, mtrkCopyLength(mtrkReadHeader(header).size, capacity));
    mtrkCopyString(header, name, capacity);
    return 0;
}
