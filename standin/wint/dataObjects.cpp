// The engine's two data objects. Both blocks are filled from instance.json
// when the library is loaded, before the program's main runs; an instance
// that cannot be read leaves them zero.
#include <cstring>

#include "common/export.h"
#include "common/instance.h"
#include "common/instanceReader.h"
#include "engine/vrxwint.h"

namespace {

alignas(8) uint8_t gTraceFlagBlock[64];
alignas(8) uint8_t gKernelControlBlock[VRX_KRCB_SIZE];

template <typename T>
void put(uint8_t* block, uint32_t offset, T value) {
    std::memcpy(block + offset, &value, sizeof value);
}

// After the common library has found its data directory (priority 101), so
// that the demo instance can be located.
__attribute__((constructor(200))) void fillFromInstance() {
    standin::Instance instance;
    standin::InstanceSink poolsNotNeeded;
    std::string error;
    if (!standin::readInstanceFile(standin::instanceDirectory().c_str(), instance, poolsNotNeeded,
                                   error, nullptr)) {
        return;
    }
    put(gTraceFlagBlock, VRX_TRACE_WORD_OFFSET, instance.traceFlags);
    put(gKernelControlBlock, VRX_KRCB_MULTI_PARTITION, instance.krcb.multiPartition);
    put(gKernelControlBlock, VRX_KRCB_PARTITION, instance.krcb.partition);
    put(gKernelControlBlock, VRX_KRCB_DEFAULT_PARTITION, instance.krcb.defaultPartition);
}

}  // namespace

extern "C" {
VRX_EXPORT uint8_t* g_sqltCompTraceFlags = gTraceFlagBlock;
VRX_EXPORT uint8_t* sqlz_krcbp = gKernelControlBlock;
}
