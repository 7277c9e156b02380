#include "osse/boundedFormat.h"

#include <cerrno>
#include <climits>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstring>

namespace standin {

namespace {

constexpr uint64_t kPowersOfTen[] = {1,      10,      100,      1000,      10000,
                                     100000, 1000000, 10000000, 100000000, 1000000000};
constexpr int kMaxPrecision = 9;

// A double's mantissa times a power of ten needs up to 83 bits.
__extension__ typedef unsigned __int128 Wide;
constexpr int kMaxWidth = 4096;

// The output so far: bytes beyond the buffer are counted, not written.
struct Output {
    char* buffer;
    size_t size;
    size_t length = 0;

    void put(const char* text, size_t count) {
        if (length < size) {
            size_t room = size - 1 - length;
            std::memcpy(buffer + length, text, count < room ? count : room);
        }
        length += count;
    }
    // A terminated text, measured as it is copied.
    void putText(const char* text) {
        if (length < size) {
            char* to = buffer + length;
            char* last = buffer + size - 1;
            while (to < last && *text != '\0')
                *to++ = *text++;
            length = static_cast<size_t>(to - buffer);
        }
        length += std::strlen(text);
    }
    void pad(size_t count) {
        if (length < size) {
            size_t room = size - 1 - length;
            std::memset(buffer + length, ' ', count < room ? count : room);
        }
        length += count;
    }
    // A field of `count` bytes, padded with spaces to the width.
    void field(const char* text, size_t count, int width, bool left) {
        size_t padding =
            static_cast<size_t>(width) > count ? static_cast<size_t>(width) - count : 0;
        if (!left)
            pad(padding);
        put(text, count);
        if (left)
            pad(padding);
    }
};

enum class Length { Int, Long, LongLong, Size };

struct Conversion {
    bool left = false;
    int width = 0;
    int precision = -1;  // none given
    Length length = Length::Int;
    char type = 0;
};

// Reads a decimal number of at most kMaxWidth; false when it is larger.
bool readNumber(const char*& at, int& value) {
    value = 0;
    while (*at >= '0' && *at <= '9') {
        value = value * 10 + (*at++ - '0');
        if (value > kMaxWidth)
            return false;
    }
    return true;
}

// The conversion after a '%', or false when this code does not cover it.
bool parseConversion(const char*& at, Conversion& c) {
    for (;; ++at) {
        if (*at == '-') {
            c.left = true;
        } else if (std::strchr("0+ #'", *at) != nullptr && *at != '\0') {
            return false;
        } else {
            break;
        }
    }
    if (!readNumber(at, c.width))
        return false;
    if (*at == '.') {
        ++at;
        if (!readNumber(at, c.precision))
            return false;
    }
    if (*at == 'l') {
        ++at;
        c.length = Length::Long;
        if (*at == 'l') {
            ++at;
            c.length = Length::LongLong;
        }
    } else if (*at == 'z') {
        ++at;
        c.length = Length::Size;
    }
    c.type = *at++;
    switch (c.type) {
        case 's':
        case 'c':
            return c.length == Length::Int && (c.type == 's' || c.precision < 0);
        case 'd':
        case 'i':
        case 'u':
            return c.precision < 0;
        case 'f':
            return c.length == Length::Int && c.precision <= kMaxPrecision;
        default:
            return false;
    }
}

// Decimal digits of `value`, written backwards from `end`; the first digit.
char* decimal(uint64_t value, char* end) {
    do {
        *--end = static_cast<char>('0' + value % 10);
        value /= 10;
    } while (value != 0);
    return end;
}

// `value` with `precision` decimals, rounded as printf rounds: the exact
// binary value to the nearest, a tie to the even last digit. False when the
// value is not finite or its digits would not fit 64 bits.
bool fixedPoint(double value, int precision, char* text, size_t& count) {
    if (!std::isfinite(value))
        return false;
    uint64_t scale = kPowersOfTen[precision];
    double magnitude = std::fabs(value);
    if (magnitude >= 1e18 / static_cast<double>(scale))
        return false;
    uint64_t bits;
    std::memcpy(&bits, &value, sizeof bits);
    uint64_t exponentField = (bits >> 52) & 0x7ff;
    uint64_t mantissa = bits & ((uint64_t{1} << 52) - 1);
    int exponent = -1074;
    if (exponentField != 0) {
        mantissa |= uint64_t{1} << 52;
        exponent = static_cast<int>(exponentField) - 1075;
    }
    // value * scale = mantissa * scale * 2^exponent: a whole number for an
    // exponent of 0 or more (the value being below 10^18, it fits), else
    // shifted right with rounding.
    Wide scaled = static_cast<Wide>(mantissa) * scale;
    uint64_t rounded = 0;
    unsigned shift = exponent < 0 ? static_cast<unsigned>(-exponent) : 0;
    if (exponent >= 0) {
        rounded = static_cast<uint64_t>(scaled << exponent);
    } else if (shift < 128) {
        Wide whole = scaled >> shift;
        Wide rest = scaled - (whole << shift);
        Wide half = static_cast<Wide>(1) << (shift - 1);
        if (rest > half || (rest == half && (whole & 1) != 0))
            ++whole;
        rounded = static_cast<uint64_t>(whole);
    }
    char digits[48];
    char* end = digits + sizeof digits;
    char* first;
    if (precision == 0) {
        first = decimal(rounded, end);
    } else {
        uint64_t fraction = rounded % scale;
        char* fractionStart = end - precision;
        for (char* at = end; at > fractionStart;) {
            *--at = static_cast<char>('0' + fraction % 10);
            fraction /= 10;
        }
        fractionStart[-1] = '.';
        first = decimal(rounded / scale, fractionStart - 1);
    }
    if (std::signbit(value))
        *--first = '-';
    count = static_cast<size_t>(end - first);
    std::memcpy(text, first, count);
    return true;
}

template <typename Signed>
size_t signedText(Signed value, char* text) {
    char digits[24];
    char* end = digits + sizeof digits;
    uint64_t magnitude =
        value < 0 ? uint64_t{0} - static_cast<uint64_t>(value) : static_cast<uint64_t>(value);
    char* first = decimal(magnitude, end);
    if (value < 0)
        *--first = '-';
    std::memcpy(text, first, static_cast<size_t>(end - first));
    return static_cast<size_t>(end - first);
}

size_t unsignedText(uint64_t value, char* text) {
    char digits[24];
    char* end = digits + sizeof digits;
    char* first = decimal(value, end);
    std::memcpy(text, first, static_cast<size_t>(end - first));
    return static_cast<size_t>(end - first);
}

// The text of an integer conversion's argument, read with its length.
size_t integerText(const Conversion& c, va_list* args, char* text) {
    bool isSigned = c.type != 'u';
    switch (c.length) {
        case Length::Int:
            return isSigned ? signedText(va_arg(*args, int), text)
                            : unsignedText(va_arg(*args, unsigned), text);
        case Length::Long:
            return isSigned ? signedText(va_arg(*args, long), text)
                            : unsignedText(va_arg(*args, unsigned long), text);
        case Length::LongLong:
            return isSigned ? signedText(va_arg(*args, long long), text)
                            : unsignedText(va_arg(*args, unsigned long long), text);
        case Length::Size:
            return isSigned ? signedText(va_arg(*args, ptrdiff_t), text)
                            : unsignedText(va_arg(*args, size_t), text);
    }
    return 0;
}

// Formats one conversion, taking its argument; false hands the call over.
bool convert(Output& out, const Conversion& c, va_list* args) {
    char text[48];
    size_t count = 0;
    switch (c.type) {
        case 's': {
            const char* s = va_arg(*args, const char*);
            if (s == nullptr)
                return false;
            if (c.precision < 0 && (c.left || c.width == 0)) {
                size_t start = out.length;
                out.putText(s);
                out.pad(static_cast<size_t>(c.width) > out.length - start
                            ? static_cast<size_t>(c.width) - (out.length - start)
                            : 0);
                return true;
            }
            count = c.precision < 0 ? std::strlen(s) : strnlen(s, static_cast<size_t>(c.precision));
            out.field(s, count, c.width, c.left);
            return true;
        }
        case 'c':
            text[0] = static_cast<char>(va_arg(*args, int));
            count = 1;
            break;
        case 'd':
        case 'i':
        case 'u':
            count = integerText(c, args, text);
            break;
        case 'f':
            if (!fixedPoint(va_arg(*args, double), c.precision < 0 ? 6 : c.precision, text, count))
                return false;
            break;
        default:
            return false;
    }
    out.field(text, count, c.width, c.left);
    return true;
}

// Terminates the output and answers as vsnprintf does.
int finish(const Output& out) {
    if (out.length > INT_MAX) {
        errno = EOVERFLOW;
        return -1;
    }
    if (out.size > 0)
        out.buffer[out.length < out.size ? out.length : out.size - 1] = '\0';
    return static_cast<int>(out.length);
}

}  // namespace

int copyBounded(char* buffer, size_t size, const char* text) {
    Output out{buffer, size};
    out.putText(text);
    return finish(out);
}

int formatBounded(char* buffer, size_t size, const char* format, va_list args) {
    // Read from a copy, so that a call handed over starts from the first
    // argument again.
    va_list work;
    va_copy(work, args);
    Output out{buffer, size};
    bool handled = buffer != nullptr || size == 0;
    for (const char* at = format; handled && *at != '\0';) {
        const char* text = at;
        while (*at != '\0' && *at != '%')
            ++at;
        out.put(text, static_cast<size_t>(at - text));
        if (*at++ == '\0')
            break;
        if (*at == '%') {
            out.put("%", 1);
            ++at;
            continue;
        }
        Conversion c;
        handled = parseConversion(at, c) && convert(out, c, &work);
    }
    int result = handled ? finish(out) : std::vsnprintf(buffer, size, format, args);
    va_end(work);
    return result;
}

}  // namespace standin
