// The request records of one snapshot through the monitor's two calls, set
// up as a client of the engine sets them: for the tests and the benchmark
// drivers that call the monitor directly rather than through the program.
#pragma once

#include <cstdint>

#include "engine/sqlca.h"
#include "engine/vrxapp.h"

namespace standin {

struct MonitorCall {
    MonRequest request{};
    uint32_t estimate = 0;
    MonSizeRequest size{};
    MonSnapshotOutput output{};
    uint32_t engineWord = 0;
    MonSnapshotRequest take{};
    sqlca ca{};

    explicit MonitorCall(uint32_t objectType) {
        request.objectCount = 1;
        request.objectType = objectType;
        size.request = &request;
        size.estimate = &estimate;
        size.streamVersion = VRX_STREAM_VERSION;
        size.partition = -1;
        take.request = &request;
        take.output = &output;
        take.streamVersion = VRX_STREAM_VERSION;
        take.partition = -1;
        take.engineWord = &engineWord;
    }
    // The records point at each other.
    MonitorCall(const MonitorCall&) = delete;
    MonitorCall& operator=(const MonitorCall&) = delete;

    // vrxGetSnapshotSize: the estimate lands in `estimate`.
    int32_t askSize() { return vrxGetSnapshotSize(VRX_MONITOR_VERSION, &size, &ca); }

    // vrxGetSnapshot into `buffer` of `capacity` bytes.
    int32_t takeInto(void* buffer, uint32_t capacity) {
        take.buffer = buffer;
        take.bufferSize = capacity;
        return vrxGetSnapshot(VRX_MONITOR_VERSION, &take, &ca);
    }
};

}  // namespace standin
