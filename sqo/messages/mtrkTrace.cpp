#include "mtrkTrace.h"

#include <cstring>

#include "engine/vrxsys.h"
#include "engine/vrxwint.h"

uint32_t mtrkTraceEntry(uint32_t functionId) {
    uint32_t traceFlags = 0;
    // The engine fills the block before main runs; without it nothing is traced.
    if (g_sqltCompTraceFlags != nullptr) {
        // The block is the engine's; the word may sit at any alignment in it.
        memcpy(&traceFlags, g_sqltCompTraceFlags + VRX_TRACE_WORD_OFFSET, sizeof traceFlags);
    }
    if ((traceFlags & VRX_TRACE_ENTRY) != 0) {
        pdtEntry(functionId);
    }
    return traceFlags;
}

void mtrkTraceExit(uint32_t functionId, uint32_t traceFlags, int32_t result) {
    if ((traceFlags & (VRX_TRACE_EXIT | VRX_TRACE_FLIGHT)) == 0) {
        return;
    }
    const int64_t widened = result;
    if ((traceFlags & VRX_TRACE_EXIT) != 0) {
        pdtExit(functionId, &widened, 0);
    }
    if ((traceFlags & VRX_TRACE_FLIGHT) != 0) {
        pdFlightRecordTrc(functionId, widened, 0, 0);
    }
}
