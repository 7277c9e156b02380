// The few platform specifics of the program. The engine's own platform
// spells a signed 64-bit decimal "%I64d" and waits with Sleep(milliseconds);
// this header gives the same behaviour through the C and POSIX runtimes.
#pragma once

#include <cinttypes>
#include <cstdint>

// printf conversion of a signed 64-bit decimal.
#define MTRK_I64D "%" PRId64

// Waits the given number of milliseconds in full, also across interruptions
// by signals whose handlers return.
void Sleep(uint64_t milliseconds);
