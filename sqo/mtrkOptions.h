// The parsed command line and the help output.
#pragma once

#include <cstdint>

struct MtrkOptions {
    uint8_t instance;       // -i
    uint8_t database;       // -d
    uint8_t highWater;      // -w
    uint8_t maximum;        // -m
    uint8_t privateMemory;  // -p
    uint8_t application;    // -a
    uint8_t verbose;        // -v
    uint8_t allPools;       // -all
    int32_t count;          // -r interval [count]
    int32_t interval;
    uint8_t help;           // -h
};

// Sets the defaults that the run driver puts in place before parsing.
void mtrkSetDefaultOptions(MtrkOptions* options);

// 0 for a valid command line; -3 after printing messages 41 and 42.
int32_t mtrkParseOptions(int32_t argc, const char* const* argv, MtrkOptions* options);

// Prints the basic or extended help; 0, or -4 when a message fetch failed.
int32_t mtrkPrintHelp(const MtrkOptions* options);
