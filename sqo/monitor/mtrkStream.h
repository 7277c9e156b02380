// The monitor data stream: a tree of self-describing elements, searched in
// place. A region is a start address and a length; no walk ever reads
// outside the region it was given.
#pragma once

#include <cstdint>

struct MonElement {
    uint32_t size;     // data bytes after the 8-byte header
    uint16_t type;     // 1: the data is a run of nested elements
    uint16_t element;  // element identifier
};
static_assert(sizeof(MonElement) == 8);

constexpr uint32_t MON_HEADER_SIZE = 8;
constexpr uint16_t MON_TYPE_HEADER = 1;
constexpr uint16_t MON_TYPE_STRING = 2;
constexpr uint16_t MON_TYPE_U32 = 3;
constexpr uint16_t MON_TYPE_U64 = 4;

// Element identifiers the program reads.
constexpr uint16_t MON_STREAM = 1;
constexpr uint16_t MON_APPLICATION = 5;
constexpr uint16_t MON_PRIVATE_MEMORY = 10;
constexpr uint16_t MON_DATABASE = 13;
constexpr uint16_t MON_POOL = 40;
constexpr uint16_t MON_APPLICATION_NUMBER = 302;
constexpr uint16_t MON_DATABASE_NAME = 321;
constexpr uint16_t MON_PRIVATE_MEMORY_NUMBER = 549;
constexpr uint16_t MON_POOL_ID = 686;
constexpr uint16_t MON_POOL_CURRENT = 687;
constexpr uint16_t MON_POOL_MAXIMUM = 688;
constexpr uint16_t MON_POOL_HIGH_WATER = 689;
constexpr uint16_t MON_BUFFER_POOL_NAME = 874;

// Reads the header at `at` (which need not be aligned).
MonElement mtrkReadHeader(const char* at);

// Length of the stream in a snapshot block of `bufferSize` bytes: the first
// element's size + 8, never more than the block holds.
uint32_t mtrkStreamLength(const char* buffer, uint32_t bufferSize);

// Searches, depth first, for element `id`; 0 found, 1 not.
int32_t mtrkFindElement(uint16_t id, const char* start, uint32_t length, const char** header,
                        const char** data);
int32_t mtrkFindNextElement(const char* start, uint32_t length, const char** header,
                            const char** data, uint32_t* remaining, uint16_t id);
int32_t mtrkFindNextPool(const char* start, uint32_t length, const char** header,
                         const char** data, uint32_t* remaining, uint32_t* size);

int32_t mtrkGetU32(uint16_t id, const char* start, uint32_t length, uint32_t* value);
int32_t mtrkGetU64(uint16_t id, const char* start, uint32_t length, int64_t* value);
int32_t mtrkGetPoolId(const char* start, uint32_t length, uint32_t* id);
int32_t mtrkGetPoolCurrentSize(const char* start, uint32_t length, int64_t* size);
int32_t mtrkGetPoolMaximum(const char* start, uint32_t length, int64_t* size);
int32_t mtrkGetPoolHighWater(const char* start, uint32_t length, int64_t* size);

// Copies a string element (header at `header`) into `buffer` of `capacity`
// bytes by the stream's copying rule.
void mtrkCopyString(const char* header, char* buffer, uint32_t capacity);

// Finds string element `id` in the region and copies it; 0 found, 1 not
// (buffer untouched).
int32_t mtrkGetString(uint16_t id, const char* start, uint32_t length, char* buffer,
                      uint32_t capacity);

// Updates the held database name from element 321 of the region; `changed`
// (optional) tells whether the name differs from the one held.
int32_t mtrkRefreshName(const char* start, uint32_t length, char* name, uint32_t capacity,
                        uint8_t* changed);
