// Turning a catalog text into the text that a caller receives: inserts put
// in, lines broken, the result cut to the caller's buffer.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>

namespace standin {

// Replaces %1 and %2 by insert(0) and insert(1), in one pass, so that an
// insert's own text is never read as a placeholder; %% stands for one %;
// every other character, a lone % included, is copied. `insert` is called
// only for the placeholders that the text holds, once per occurrence. The
// result replaces what `out` held.
template <typename InsertFn>
void expandInserts(std::string& out, std::string_view text, InsertFn&& insert) {
    out.clear();
    for (size_t i = 0; i < text.size(); ++i) {
        char c = text[i];
        if (c == '%' && i + 1 < text.size()) {
            char next = text[i + 1];
            if (next == '1' || next == '2') {
                out += insert(static_cast<unsigned>(next - '1'));
                ++i;
                continue;
            }
            if (next == '%') {
                out += '%';
                ++i;
                continue;
            }
        }
        out += c;
    }
}

// The same, as a new text.
template <typename InsertFn>
std::string expandInserts(std::string_view text, InsertFn&& insert) {
    std::string out;
    out.reserve(text.size());
    expandInserts(out, text, std::forward<InsertFn>(insert));
    return out;
}

// The number of characters in a UTF-8 text (bytes that do not continue a
// character).
size_t characterCount(std::string_view text);

// Breaks `text` into lines of at most `width` characters at spaces: a word
// longer than the width stands on a line of its own, the spaces at a break
// are dropped, and line feeds already in the text are kept. Lines are joined
// by a line feed, without one at the end and without trailing spaces. A
// width of 0 or less keeps each line as it is.
std::string wrapLines(std::string_view text, int width);

// Copies as much of `text` as fits into `buffer` with its terminator, never
// ending in the middle of a UTF-8 character; returns the bytes copied,
// terminator not counted. Nothing is written when `capacity` is 0.
size_t copyToBuffer(std::string_view text, char* buffer, size_t capacity);

}  // namespace standin
