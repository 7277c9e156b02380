// Numbered messages of the catalog vrxmtrk.mo, failure records and the final
// failure report.
#pragma once

#include <cstdint>

#include "mtrkFunctionIds.h"

// Every message, name and label text fits in this many bytes.
constexpr uint32_t MTRK_TEXT_SIZE = 5000;
// A formatted number.
constexpr uint32_t MTRK_NUMBER_SIZE = 25;

// The code of the last recorded failure.
extern int32_t gLastRc;

// Fetches message `number` with `insertCount` text inserts (const char*)
// into `buffer`; 0, or -4 after a failure record.
int32_t mtrkGetMessage(uint32_t number, char* buffer, uint32_t bufferSize, int64_t insertCount,
                       ...);

// Writes one failure record to the engine's diagnostic log; stores `code` in
// gLastRc when `storeLastRc`. Returns -4.
int32_t mtrkLogFailure(uint32_t functionId, uint32_t probe, const char* text, int32_t code,
                       bool storeLastRc);

// Prints the engine's explanation of gLastRc; 0 or -4.
int32_t mtrkReportLastFailure(void);
