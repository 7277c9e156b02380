#include <limits.h>

#include <cerrno>
#include <cstdarg>

#include "common/diagLog.h"
#include "common/export.h"
#include "common/instance.h"
#include "engine/vrxsys.h"

namespace {

// More items than any caller writes; a count beyond it is a caller's
// mistake, and reading that many variable arguments would go astray.
constexpr uint32_t kMaxItems = 64;

}  // namespace

extern "C" VRX_EXPORT void pdLog(uint32_t /*flags*/, uint32_t functionId, uint32_t /*reserved*/,
                                 uint32_t probe, uint32_t /*level*/, uint32_t itemCount, ...) {
    int savedErrno = errno;
    standin::DiagItem items[kMaxItems];
    uint32_t count = itemCount < kMaxItems ? itemCount : kMaxItems;
    va_list args;
    va_start(args, itemCount);
    for (uint32_t i = 0; i < count; ++i) {
        items[i].type = va_arg(args, uint32_t);
        items[i].length = va_arg(args, uint64_t);
        items[i].data = va_arg(args, const void*);
    }
    va_end(args);
    char dir[PATH_MAX];
    if (standin::instanceDirectoryPath(dir, sizeof dir)) {
        standin::appendDiagRecord(dir, functionId, probe, items, count);
    }
    errno = savedErrno;
}
