// The region that a found section or pool element covers, kept inside the
// region it was found in, so that a damaged size never sends a walk past the
// snapshot buffer.
#pragma once

#include <cstdint>

#include "monitor/mtrkStream.h"

// A section found by mtrkFindNextElement: `remaining` counts from its data.
inline uint32_t mtrkSectionLength(const char* header, uint32_t remaining) {
    uint32_t size = mtrkReadHeader(header).size;
    return size < remaining ? size : remaining;
}

// A pool found by mtrkFindNextPool: `remaining` counts from its header.
inline uint32_t mtrkPoolLength(uint32_t size, uint32_t remaining) {
    uint32_t room = remaining > MON_HEADER_SIZE ? remaining - MON_HEADER_SIZE : 0;
    return size < room ? size : room;
}
