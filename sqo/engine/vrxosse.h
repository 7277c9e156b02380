// Bounded formatting of the engine (library VRXOSSE).
#pragma once

#include <cstddef>

extern "C" {

// snprintf's contract: writes at most `size` bytes, always NUL-terminated
// when size > 0; returns the length the whole text would have.
int ossSnprintf(char* buffer, size_t size, const char* format, ...)
    __attribute__((format(printf, 3, 4)));

}  // extern "C"
