// Pool labels and size texts.
#pragma once

#include <cstdint>

struct MtrkOptions;

constexpr uint32_t MTRK_BUFFER_POOL_NAME_SIZE = 256;
// A label's or a size's text as it stands in a column.
constexpr uint32_t MTRK_COLUMN_SIZE = 256;

int32_t mtrkGetBufferPoolName(const char* start, uint32_t length, char* buffer, uint32_t capacity);
int32_t mtrkGetBufferPoolShortName(const char* start, uint32_t length, char* buffer,
                                   uint32_t capacity);
// Writes the label into `label` (MTRK_TEXT_SIZE bytes).
void mtrkBuildPoolLabel(uint32_t poolId, const char* bufferPoolName, bool showBufferPoolName,
                        const MtrkOptions* options, char* label);
// Writes the size column text into `text` (MTRK_COLUMN_SIZE bytes: the
// smallest negative size takes 31 characters).
void mtrkFormatSize(int64_t size, char* text);
