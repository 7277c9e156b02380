// Client layer and snapshot monitor of the engine (library VRXAPP).
#pragma once

#include <cstddef>
#include <cstdint>

#include "sqlca.h"

// Interface version and data stream version of the snapshot monitor.
constexpr uint32_t VRX_MONITOR_VERSION = 9050000;  // 0x8A1790
constexpr uint32_t VRX_STREAM_VERSION = 7;

// Snapshot object types.
constexpr uint32_t VRX_OBJ_INSTANCE = 0x10001;
constexpr uint32_t VRX_OBJ_DATABASE = 0x10009;
constexpr uint32_t VRX_OBJ_APPLICATION = 0x1000A;

extern "C" {

// One object entry of a monitor request. Only the count and the type are set
// by a client; the rest of the entry belongs to the engine and stays zero.
struct MonRequest {
    uint32_t objectCount;  // 1
    uint32_t reserved;     // 0
    uint32_t objectType;   // VRX_OBJ_*
    uint8_t engineArea[36];
};

struct MonSizeRequest {
    MonRequest* request;
    uint32_t* estimate;     // receives the size estimate in bytes
    uint32_t streamVersion; // VRX_STREAM_VERSION
    int32_t partition;      // -1
    uint32_t selector;      // 0
};

// Filled by the engine on a take; a client never reads it.
struct MonSnapshotOutput {
    uint32_t bytesWritten;
    uint32_t objectsWritten;
    uint64_t reserved[2];
};

struct MonSnapshotRequest {
    MonRequest* request;
    MonSnapshotOutput* output;
    void* buffer;
    uint32_t streamVersion;  // VRX_STREAM_VERSION
    uint32_t bufferSize;
    uint32_t flags;          // 0
    int32_t partition;       // -1
    uint32_t* engineWord;    // filled by the engine; never read by a client
    uint32_t selector;       // 0
};

int32_t sqleInitApplicationEnvironment(uint32_t reserved1, uint32_t reserved2, uint32_t mode,
                                       sqlca* ca);
int32_t vrxGetSnapshotSize(uint32_t version, MonSizeRequest* request, sqlca* ca);
int32_t vrxGetSnapshot(uint32_t version, MonSnapshotRequest* request, sqlca* ca);

}  // extern "C"

static_assert(offsetof(MonRequest, objectType) == 8);
static_assert(offsetof(MonSizeRequest, estimate) == 8);
static_assert(offsetof(MonSizeRequest, streamVersion) == 16);
static_assert(offsetof(MonSizeRequest, partition) == 20);
static_assert(offsetof(MonSizeRequest, selector) == 24);
static_assert(offsetof(MonSnapshotRequest, output) == 8);
static_assert(offsetof(MonSnapshotRequest, buffer) == 16);
static_assert(offsetof(MonSnapshotRequest, streamVersion) == 24);
static_assert(offsetof(MonSnapshotRequest, bufferSize) == 28);
static_assert(offsetof(MonSnapshotRequest, flags) == 32);
static_assert(offsetof(MonSnapshotRequest, partition) == 36);
static_assert(offsetof(MonSnapshotRequest, engineWord) == 40);
static_assert(offsetof(MonSnapshotRequest, selector) == 48);
