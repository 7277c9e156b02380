// Turning a catalog text into the text that a caller receives: inserts put
// in, lines broken, the result cut to the caller's buffer.
#pragma once

#include <cstddef>
#include <cstring>
#include <string>
#include <string_view>
#include <utility>

namespace standin {

// Replaces %1 and %2 by insert(0) and insert(1), in one pass, so that an
// insert's own text is never read as a placeholder; %% stands for one %;
// every other character, a lone % included, is copied. `insert` is called
// only for the placeholders that the text holds, once per occurrence. The
// result goes to `put(text, length)`, piece by piece, until put says false.
template <typename InsertFn, typename PutFn>
void expandInserts(std::string_view text, InsertFn&& insert, PutFn&& givenPut) {
    // Empty pieces are not handed on: an absent insert has no data at all.
    auto put = [&](const char* piece, size_t length) {
        return length == 0 || givenPut(piece, length);
    };
    size_t plain = 0;  // start of the text not yet put
    for (size_t i = 0; i + 1 < text.size(); ++i) {
        if (text[i] != '%')
            continue;
        char next = text[i + 1];
        if (next != '1' && next != '2' && next != '%')
            continue;
        if (!put(text.data() + plain, i - plain))
            return;
        if (next == '%') {
            if (!put("%", 1))
                return;
        } else {
            std::string_view value = insert(static_cast<unsigned>(next - '1'));
            if (!put(value.data(), value.size()))
                return;
        }
        plain = i + 2;
        ++i;
    }
    put(text.data() + plain, text.size() - plain);
}

// The same, as a new text.
template <typename InsertFn>
std::string expandInserts(std::string_view text, InsertFn&& insert) {
    std::string out;
    out.reserve(text.size());
    expandInserts(text, std::forward<InsertFn>(insert), [&](const char* piece, size_t length) {
        out.append(piece, length);
        return true;
    });
    return out;
}

// Writes into `buffer` what copyToBuffer would write of the text that
// expandInserts makes, without making that text; returns the bytes written,
// terminator not counted.
template <typename InsertFn>
size_t expandInsertsInto(std::string_view text, InsertFn&& insert, char* buffer, size_t capacity) {
    if (capacity == 0)
        return 0;
    size_t n = 0;
    bool cut = false;
    char firstLeftOut = 0;
    expandInserts(text, std::forward<InsertFn>(insert), [&](const char* piece, size_t length) {
        size_t room = capacity - 1 - n;
        if (length > room) {
            std::memcpy(buffer + n, piece, room);
            n += room;
            cut = true;
            firstLeftOut = piece[room];
            return false;
        }
        std::memcpy(buffer + n, piece, length);
        n += length;
        return true;
    });
    // Step back over a character that would be cut, as copyToBuffer does.
    if (cut) {
        while (n > 0 && (static_cast<unsigned char>(firstLeftOut) & 0xC0) == 0x80)
            firstLeftOut = buffer[--n];
    }
    buffer[n] = '\0';
    return n;
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
