// System services of the engine (library VRXSYS): messages, memory, date and
// time, profile registry, pool names, diagnostic log and trace.
#pragma once

#include <cstdint>

#include "sqlca.h"

extern "C" {

// Local date and time as sqlogetdatetime fills it.
struct SqloDateTime {
    uint16_t year;     // offset 0
    uint16_t month;    // offset 2
    uint16_t weekday;  // offset 4, 0 = Sunday
    uint16_t day;      // offset 6
    uint16_t hour;     // offset 8
    uint16_t minute;   // offset 10
    uint16_t second;   // offset 12
    uint16_t hundredths;
};

// Fetches message `number` of `catalog` into `buffer`, replacing %1 and %2
// by the inserts. Positive: the text's length; negative: failure.
int32_t sqlogmsg(const char* catalog, uint32_t number, const uint64_t* insertLengths,
                 const char* const* inserts, char* buffer, uint32_t bufferSize,
                 uint32_t* reserved, uint16_t flags, void* reserved2, void* reserved3);

// Renders the SQL catalog's text for ca->sqlcode, its tokens as inserts,
// broken into lines of at most `lineWidth`. Negative: failure.
int32_t sqlaintp_api(char* buffer, int16_t bufferSize, int16_t lineWidth, const char* catalog,
                     sqlca* ca);

int32_t sqlogmblkEx(uint32_t pool, uint64_t size, uint32_t flags, void** block,
                    const char* file, uint32_t line, uint32_t reserved);
int32_t sqlofmblkEx(const char* file, uint32_t line, void* block);

int32_t sqlogetdatetime(SqloDateTime* dateTime);

// Registry operations.
constexpr uint32_t SQLO_REG_READ = 3;
constexpr uint32_t SQLO_REG_WRITE = 4;
// Results of a read that mean "the variable has no value".
constexpr int32_t SQLO_REG_NOT_SET = static_cast<int32_t>(0x870F0104);
constexpr int32_t SQLO_REG_NO_FILE = static_cast<int32_t>(0x870F0108);
constexpr int32_t SQLO_REG_NO_VALUE = static_cast<int32_t>(0x870F0109);
// A registry value holds at most this many characters.
constexpr uint32_t SQLO_REG_VALUE_MAX = 255;

int32_t sqloPRegValuePE(uint32_t operation, uint32_t flags, const char* name, char* value,
                        void* reserved, int32_t partition, uint32_t reserved2);

uint8_t sqloShouldInternalPoolsBeExposed(void);
uint32_t sqloGetMaxMemPoolID(void);
const char* sqloGetMemPoolName(uint32_t poolId);
const char* sqloGetMemPoolDescription(uint32_t poolId);

// Diagnostic log. After `itemCount` come, per item: the item type
// (uint32_t), its length (uint64_t) and a pointer to its data.
constexpr uint32_t PD_ITEM_TEXT = 0x18000004;
constexpr uint32_t PD_ITEM_INT32 = 4;
void pdLog(uint32_t flags, uint32_t functionId, uint32_t reserved, uint32_t probe, uint32_t level,
           uint32_t itemCount, ...);

void pdtEntry(uint32_t functionId);
void pdtExit(uint32_t functionId, const int64_t* result, uint64_t reserved);
void pdFlightRecordTrc(uint32_t functionId, int64_t result, uint64_t reserved1,
                       uint64_t reserved2);

}  // extern "C"

static_assert(sizeof(SqloDateTime) >= 14);
