// ossSnprintf: the engine's bounded formatting, with vsnprintf's contract.
#include <cstdarg>

#include "common/export.h"
#include "engine/vrxosse.h"
#include "osse/boundedFormat.h"

extern "C" VRX_EXPORT int ossSnprintf(char* buffer, size_t size, const char* format, ...) {
    va_list args;
    va_start(args, format);
    // The commonest format of all, a plain copy, needs no parsing.
    if (format[0] == '%' && format[1] == 's' && format[2] == '\0' && buffer != nullptr) {
        const char* text = va_arg(args, const char*);
        va_end(args);
        if (text != nullptr)
            return standin::copyBounded(buffer, size, text);
        va_start(args, format);
    }
    int length = standin::formatBounded(buffer, size, format, args);
    va_end(args);
    return length;
}
