// ossSnprintf: the engine's bounded formatting, with vsnprintf's contract.
#include <cstdarg>
#include <cstdio>

#include "common/export.h"
#include "engine/vrxosse.h"

extern "C" VRX_EXPORT int ossSnprintf(char* buffer, size_t size, const char* format, ...) {
    va_list args;
    va_start(args, format);
    int length = std::vsnprintf(buffer, size, format, args);
    va_end(args);
    return length;
}
