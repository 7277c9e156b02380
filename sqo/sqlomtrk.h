// The run driver of vrxmtrk.
#pragma once

#include <cstdint>

// The whole life of one run; returns the run's result (the exit status).
int32_t mtrkMain(int32_t argc, const char* const* argv);

// Prints message 24 with the engine's local date and time; 0 or -4.
int32_t mtrkPrintTimestamp(void);
