#include "mtrkInternalPools.h"

#include <csignal>
#include <cstring>

#include "engine/vrxwint.h"
#include "messages/mtrkMessages.h"
#include "messages/mtrkTrace.h"
#include "platform.h"

char gSavedMemTrk[MTRK_SAVED_MEMTRK_SIZE];
volatile uint8_t gMemTrkChanged = 0;

namespace {

constexpr const char* MTRK_MEMTRK_VARIABLE = "VRXMEMTRK";
constexpr const char* MTRK_MEMTRK_EXPOSED = "1";
constexpr int32_t MTRK_ALL_PARTITIONS = -1;

bool mtrkIsNoValueCode(int32_t rc) {
    return rc == SQLO_REG_NOT_SET || rc == SQLO_REG_NO_FILE || rc == SQLO_REG_NO_VALUE;
}

// Writes `value` to the variable. The engine's argument is not const because
// the same argument receives a read; a copy keeps the caller's text out of it.
// Async-signal-safe: the signal handler restores through it.
int32_t mtrkWriteMemTrk(const char* value, int32_t partition) {
    char copy[MTRK_SAVED_MEMTRK_SIZE];
    strncpy(copy, value, sizeof copy - 1);
    copy[sizeof copy - 1] = '\0';
    return sqloPRegValuePE(SQLO_REG_WRITE, 0, MTRK_MEMTRK_VARIABLE, copy, nullptr, partition, 0);
}

}  // namespace

int32_t mtrkPartitionNumber(void) {
    if (sqlz_krcbp == nullptr) {
        return MTRK_ALL_PARTITIONS;
    }
    // The control block is the engine's; its fields may sit at any alignment.
    uint32_t multiPartition = 0;
    memcpy(&multiPartition, sqlz_krcbp + VRX_KRCB_MULTI_PARTITION, sizeof multiPartition);
    if (multiPartition == 0) {
        return MTRK_ALL_PARTITIONS;
    }
    int16_t partition = 0;
    memcpy(&partition, sqlz_krcbp + VRX_KRCB_PARTITION, sizeof partition);
    if (partition < 0) {
        memcpy(&partition, sqlz_krcbp + VRX_KRCB_DEFAULT_PARTITION, sizeof partition);
    }
    return partition;
}

int32_t mtrkExposeInternalPools(char* saved) {
    const uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_EXPOSE_INTERNAL_POOLS);
    const int32_t partition = mtrkPartitionNumber();
    int32_t result = 0;

    // `saved` has room for the engine's longest value and its terminator.
    int32_t rc =
        sqloPRegValuePE(SQLO_REG_READ, 0, MTRK_MEMTRK_VARIABLE, saved, nullptr, partition, 0);
    if (mtrkIsNoValueCode(rc)) {
        saved[0] = '\0';
        rc = 0;
    } else if (rc == 0) {
        saved[MTRK_SAVED_MEMTRK_SIZE - 1] = '\0';
    }
    if (rc != 0) {
        result = mtrkLogFailure(MTRK_FID_EXPOSE_INTERNAL_POOLS, MTRK_PROBE_50,
                                "Error in call to sqloPRegValuePE.\nrc=", rc, true);
    } else {
        rc = mtrkWriteMemTrk(MTRK_MEMTRK_EXPOSED, partition);
        if (rc != 0) {
            result = mtrkLogFailure(MTRK_FID_EXPOSE_INTERNAL_POOLS, MTRK_PROBE_100,
                                    "Error in call to sqloPRegValuePE.\nrc=", rc, true);
        }
    }

    mtrkTraceExit(MTRK_FID_EXPOSE_INTERNAL_POOLS, traceFlags, result);
    return result;
}

int32_t mtrkRestoreInternalPools(const char* saved) {
    const uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_RESTORE_INTERNAL_POOLS);
    const int32_t result = mtrkWriteMemTrk(saved, mtrkPartitionNumber());
    mtrkTraceExit(MTRK_FID_RESTORE_INTERNAL_POOLS, traceFlags, result);
    return result;
}

// Runs on the interrupted thread: everything here, the engine's registry
// write and trace probes included, is async-signal-safe.
void mtrkSignalHandler(int signalNumber) {
    // Another of the run's signals must not start a second restore midway.
    // The mask goes back when this handler returns, and by then the raised
    // signal ends the process.
    mtrkBlockRunSignals();
    if (gMemTrkChanged == 1) {
        (void)mtrkRestoreInternalPools(gSavedMemTrk);
    }
    // This runtime leaves the handler installed; the raise must meet the
    // default action.
    signal(signalNumber, SIG_DFL);
    raise(signalNumber);
}
