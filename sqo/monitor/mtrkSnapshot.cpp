#include "monitor/mtrkSnapshot.h"

#include <cstdio>
#include <cstring>

#include "engine/vrxapp.h"
#include "engine/vrxsys.h"
#include "messages/mtrkMessages.h"
#include "messages/mtrkTrace.h"

static const char* const MTRK_SOURCE_FILE = "sqlomtrk";

// A buffer too small for the stream is answered with 1606; each new
// attempt doubles the estimate's multiplier up to this one.
static constexpr uint32_t MTRK_LAST_MULTIPLIER = 128;

void mtrkReleaseSnapshot(char** buffer) {
    if (*buffer != nullptr) {
        sqlofmblkEx(MTRK_SOURCE_FILE, __LINE__, *buffer);
        *buffer = nullptr;
    }
}

// The request area names one object; the rest of its entry belongs to the
// engine and goes out zero.
static void mtrkFillRequest(MonRequest* request, uint32_t objectType) {
    memset(request, 0, sizeof(*request));
    request->objectCount = 1;
    request->reserved = 0;
    request->objectType = objectType;
}

int32_t mtrkMapMonitorCode(int32_t sqlCode) {
    uint32_t message = 0;
    switch (sqlCode) {
        case SQLC_NOT_AUTHORIZED:
            message = 48;
            break;
        case SQLC_INSTANCE_STOPPED:
            message = 45;
            break;
        case SQLC_BUFFER_TOO_SMALL:
            return SQLC_BUFFER_TOO_SMALL;
        case SQLC_NOTHING_TO_REPORT:
            return -2;
        default:
            return -4;
    }
    char text[MTRK_TEXT_SIZE];
    int32_t rc = mtrkGetMessage(message, text, MTRK_TEXT_SIZE, 0);
    if (rc != 0) {
        return rc;
    }
    printf("%s\n", text);
    return -3;
}

int32_t mtrkGetSnapshotSize(char** buffer, uint32_t* size, uint32_t objectType,
                            uint32_t multiplier) {
    static const char* const failure = "Error in call to vrxGetSnapshotSize.\nrc=";
    uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_GET_SNAPSHOT_SIZE);
    int32_t rc = 0;
    *buffer = nullptr;
    *size = 0;

    MonRequest request;
    mtrkFillRequest(&request, objectType);
    MonSizeRequest sizeRequest;
    memset(&sizeRequest, 0, sizeof(sizeRequest));
    sizeRequest.request = &request;
    sizeRequest.estimate = size;
    sizeRequest.streamVersion = VRX_STREAM_VERSION;
    sizeRequest.partition = -1;
    sizeRequest.selector = 0;
    sqlca ca;
    memset(&ca, 0, sizeof(ca));

    int32_t callRc = vrxGetSnapshotSize(VRX_MONITOR_VERSION, &sizeRequest, &ca);
    if (callRc != 0) {
        rc = mtrkLogFailure(MTRK_FID_GET_SNAPSHOT_SIZE, MTRK_PROBE_50, failure, callRc, true);
    } else if (ca.sqlcode != 0) {
        rc = mtrkMapMonitorCode(ca.sqlcode);
        if (rc == -4) {
            mtrkLogFailure(MTRK_FID_GET_SNAPSHOT_SIZE, MTRK_PROBE_100, failure, ca.sqlcode, true);
        }
    } else {
        // A product beyond 32 bits asks for the largest block there is;
        // the allocator refuses it rather than a wrapped size being taken.
        uint64_t wanted = static_cast<uint64_t>(*size) * multiplier;
        *size = wanted > 0xFFFFFFFFu ? 0xFFFFFFFFu : static_cast<uint32_t>(wanted);
        void* block = nullptr;
        if (sqlogmblkEx(0, *size, 0, &block, MTRK_SOURCE_FILE, __LINE__, 0) != 0) {
            *buffer = nullptr;
            rc = -4;
        } else {
            *buffer = static_cast<char*>(block);
        }
    }
    mtrkTraceExit(MTRK_FID_GET_SNAPSHOT_SIZE, traceFlags, rc);
    return rc;
}

int32_t mtrkTakeSnapshot(char* buffer, uint32_t size, uint32_t objectType) {
    static const char* const failure = "Error in call to vrxGetSnapshot.\nrc=";
    uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_TAKE_SNAPSHOT);
    int32_t rc = 0;

    MonRequest request;
    mtrkFillRequest(&request, objectType);
    MonSnapshotOutput output;
    memset(&output, 0, sizeof(output));
    uint32_t engineWord = 0;
    MonSnapshotRequest snapshotRequest;
    memset(&snapshotRequest, 0, sizeof(snapshotRequest));
    snapshotRequest.request = &request;
    snapshotRequest.output = &output;
    snapshotRequest.buffer = buffer;
    snapshotRequest.streamVersion = VRX_STREAM_VERSION;
    snapshotRequest.bufferSize = size;
    snapshotRequest.flags = 0;
    snapshotRequest.partition = -1;
    snapshotRequest.engineWord = &engineWord;
    snapshotRequest.selector = 0;
    sqlca ca;
    memset(&ca, 0, sizeof(ca));

    int32_t callRc = vrxGetSnapshot(VRX_MONITOR_VERSION, &snapshotRequest, &ca);
    if (callRc != 0) {
        rc = mtrkLogFailure(MTRK_FID_TAKE_SNAPSHOT, MTRK_PROBE_50, failure, callRc, true);
    } else if (ca.sqlcode != 0) {
        rc = mtrkMapMonitorCode(ca.sqlcode);
        if (rc == -4) {
            mtrkLogFailure(MTRK_FID_TAKE_SNAPSHOT, MTRK_PROBE_100, failure, ca.sqlcode, true);
        }
    }
    mtrkTraceExit(MTRK_FID_TAKE_SNAPSHOT, traceFlags, rc);
    return rc;
}

int32_t mtrkGetSnapshot(char** buffer, uint32_t objectType, uint32_t* bufferSize) {
    uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_GET_SNAPSHOT);
    int32_t rc = 0;
    uint32_t multiplier = 1;
    for (;;) {
        mtrkReleaseSnapshot(buffer);
        if (bufferSize != nullptr) {
            *bufferSize = 0;
        }
        uint32_t size = 0;
        rc = mtrkGetSnapshotSize(buffer, &size, objectType, multiplier);
        if (rc != 0) {
            break;
        }
        if (bufferSize != nullptr) {
            *bufferSize = size;
        }
        rc = mtrkTakeSnapshot(*buffer, size, objectType);
        if (rc != SQLC_BUFFER_TOO_SMALL) {
            break;
        }
        if (multiplier == MTRK_LAST_MULTIPLIER) {
            // The engine's own code, not stored: the final failure report
            // then explains whatever failed before, if anything did.
            rc = mtrkLogFailure(
                MTRK_FID_GET_SNAPSHOT, MTRK_PROBE_100,
                "Snapshot buffer too small after retry.\nrc=", SQLC_BUFFER_TOO_SMALL, false);
            break;
        }
        multiplier *= 2;
    }
    mtrkTraceExit(MTRK_FID_GET_SNAPSHOT, traceFlags, rc);
    return rc;
}
