// Data objects of the engine (library VRXWINT).
#pragma once

#include <cstdint>

// Byte offset of the trace flag word in the block g_sqltCompTraceFlags points to.
constexpr uint32_t VRX_TRACE_WORD_OFFSET = 60;
// Trace flag bits.
constexpr uint32_t VRX_TRACE_ENTRY = 0x01;
constexpr uint32_t VRX_TRACE_EXIT = 0x02;
constexpr uint32_t VRX_TRACE_FLIGHT = 0x80;

// Byte offsets in the kernel control block.
constexpr uint32_t VRX_KRCB_MULTI_PARTITION = 8340;  // u32
constexpr uint32_t VRX_KRCB_PARTITION = 8116;        // s16
constexpr uint32_t VRX_KRCB_DEFAULT_PARTITION = 8096; // s16
constexpr uint32_t VRX_KRCB_SIZE = 8344;

extern "C" {
extern uint8_t* g_sqltCompTraceFlags;
extern uint8_t* sqlz_krcbp;
}
