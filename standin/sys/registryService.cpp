#include <limits.h>

#include <cerrno>

#include "common/export.h"
#include "common/instance.h"
#include "common/registry.h"
#include "engine/vrxsys.h"

namespace {

constexpr int32_t kRegistryBadOperation = static_cast<int32_t>(0x870F0100);

}  // namespace

extern "C" VRX_EXPORT int32_t sqloPRegValuePE(uint32_t operation, uint32_t /*flags*/,
                                              const char* name, char* value, void* /*reserved*/,
                                              int32_t partition, uint32_t /*reserved2*/) {
    int savedErrno = errno;
    char dir[PATH_MAX];
    int32_t result;
    if (operation != SQLO_REG_READ && operation != SQLO_REG_WRITE) {
        result = kRegistryBadOperation;
    } else if (!standin::instanceDirectoryPath(dir, sizeof dir)) {
        result = standin::kRegistryIoError;
    } else if (operation == SQLO_REG_READ) {
        const std::optional<int32_t>& failure = standin::currentInstance().faults.registryRead;
        // The caller gives no buffer length; a value and its terminator take
        // at most SQLO_REG_VALUE_MAX + 1 bytes.
        result = failure && *failure != 0
                     ? *failure
                     : standin::registryRead(dir, name, partition, value, SQLO_REG_VALUE_MAX + 1);
    } else {
        // The program's signal handler writes too: the fault is looked up
        // the signal-safe way.
        std::optional<int32_t> failure = standin::registryWriteFault(dir);
        result = failure && *failure != 0 ? *failure
                                          : standin::registryWrite(dir, name, partition, value);
    }
    errno = savedErrno;
    return result;
}

extern "C" VRX_EXPORT uint8_t sqloShouldInternalPoolsBeExposed(void) {
    char dir[PATH_MAX];
    return standin::instanceDirectoryPath(dir, sizeof dir) && standin::internalPoolsExposed(dir);
}
