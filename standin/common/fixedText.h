// A text built in a caller's fixed buffer, for the paths that a signal
// handler may run: no allocation, no stdio, no locale.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace standin {

class FixedText {
  public:
    FixedText(char* buffer, size_t capacity) : buffer_(buffer), capacity_(capacity) {
        if (capacity_ > 0)
            buffer_[0] = '\0';
    }

    // Appends `n` bytes, or marks the text overflowed and leaves it as it
    // was when they do not fit with the terminator.
    FixedText& add(const char* text, size_t n) {
        if (overflow_ || length_ + n >= capacity_) {
            overflow_ = true;
            return *this;
        }
        std::memcpy(buffer_ + length_, text, n);
        length_ += n;
        buffer_[length_] = '\0';
        return *this;
    }
    FixedText& add(const char* text) { return add(text, std::strlen(text)); }
    FixedText& addChar(char c) { return add(&c, 1); }

    FixedText& addDecimal(uint64_t value) {
        char digits[24];
        size_t n = 0;
        do {
            digits[sizeof digits - 1 - n++] = static_cast<char>('0' + value % 10);
            value /= 10;
        } while (value != 0);
        return add(digits + sizeof digits - n, n);
    }
    FixedText& addSigned(int64_t value) {
        if (value >= 0)
            return addDecimal(static_cast<uint64_t>(value));
        addChar('-');
        // Negating in unsigned arithmetic keeps INT64_MIN exact.
        return addDecimal(0 - static_cast<uint64_t>(value));
    }
    // Eight lower-case hexadecimal digits, as function identifiers are shown.
    FixedText& addHex32(uint32_t value) {
        static constexpr char kDigits[] = "0123456789abcdef";
        char digits[8];
        for (int i = 7; i >= 0; --i, value >>= 4)
            digits[i] = kDigits[value & 0xF];
        return add(digits, sizeof digits);
    }

    const char* text() const { return buffer_; }
    size_t length() const { return length_; }
    bool overflow() const { return overflow_; }

  private:
    char* buffer_;
    size_t capacity_;
    size_t length_ = 0;
    bool overflow_ = false;
};

}  // namespace standin
