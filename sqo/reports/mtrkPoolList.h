// Printing the memory pools of one stream region.
#pragma once

#include <cstdint>

struct MtrkOptions;

// A printed column line holds at most 249 characters.
constexpr uint32_t MTRK_LINE_SIZE = 250;
// The names line is printed once it is longer than this.
constexpr uint32_t MTRK_LINE_FLUSH = 70;

int32_t mtrkPrintPoolRow(const char* data, uint32_t size, const MtrkOptions* options,
                         bool showBufferPoolName, int64_t* poolSize, char* namesLine,
                         char* sizesLine);
int32_t mtrkPrintPoolList(const char* start, uint32_t length, const MtrkOptions* options,
                          bool showBufferPoolName, int64_t* total);
int32_t mtrkPrintDatabasePool(const char* start, uint32_t length, const MtrkOptions* options,
                              const char* databaseName, int64_t* total);
int32_t mtrkPrintTotal(int64_t total);
