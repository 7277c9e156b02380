#include "common/export.h"
#include "common/instance.h"
#include "common/poolTable.h"
#include "engine/vrxsys.h"

extern "C" VRX_EXPORT uint32_t sqloGetMaxMemPoolID(void) {
    const standin::Instance& instance = standin::currentInstance();
    return instance.maxPoolId ? *instance.maxPoolId : standin::poolTableSize() - 1;
}

// An identifier beyond the table still gets a text: callers print what they
// are given and must never be handed a null pointer.
extern "C" VRX_EXPORT const char* sqloGetMemPoolName(uint32_t poolId) {
    const standin::PoolTableEntry* entry = standin::poolTableEntry(poolId);
    return entry != nullptr ? entry->name : "unknown";
}

extern "C" VRX_EXPORT const char* sqloGetMemPoolDescription(uint32_t poolId) {
    const standin::PoolTableEntry* entry = standin::poolTableEntry(poolId);
    return entry != nullptr ? entry->description : "Unknown Heap";
}
