// The formatting behind ossSnprintf: vsnprintf's contract and its exact
// output, with the conversions that the engine's callers use most worked
// out directly (a report formats a few texts for every pool it prints).
#pragma once

#include <cstdarg>
#include <cstddef>

namespace standin {

// Writes what vsnprintf(buffer, size, format, args) writes and returns what
// it returns. Text, "%%", and %s, %c, %d, %i, %u (with l, ll or z) and %f
// (precision up to 9) with the '-' flag and a width are formatted here; any
// other conversion, flag or value that this code does not cover (a null
// text, a float that is not finite or too large) hands the whole call to
// vsnprintf.
int formatBounded(char* buffer, size_t size, const char* format, va_list args);

// What formatBounded writes and returns for the format "%s" with `text`
// (not null): as much of it as fits, terminated, and its length.
int copyBounded(char* buffer, size_t size, const char* text);

}  // namespace standin
