// Trace probes: entry on bit 0 of the engine's trace flag word, exit on
// bit 1 and the flight record on bit 7.
#pragma once

#include <cstdint>

// Reads the flag word once and writes the entry probe when it asks for it.
// Returns the word for the matching mtrkTraceExit.
uint32_t mtrkTraceEntry(uint32_t functionId);
void mtrkTraceExit(uint32_t functionId, uint32_t traceFlags, int32_t result);
