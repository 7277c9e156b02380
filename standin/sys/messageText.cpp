#include "messageText.h"

#include <cstring>
#include <vector>

namespace standin {

namespace {

bool continuesCharacter(char c) {
    return (static_cast<unsigned char>(c) & 0xC0) == 0x80;
}

// The byte offset after the first `count` characters of `text` (its size
// when it has fewer).
size_t offsetAfterCharacters(std::string_view text, size_t count) {
    size_t i = 0;
    while (i < text.size() && count > 0) {
        ++i;
        while (i < text.size() && continuesCharacter(text[i]))
            ++i;
        --count;
    }
    return i;
}

std::string_view trimTrailingSpaces(std::string_view s) {
    while (!s.empty() && s.back() == ' ')
        s.remove_suffix(1);
    return s;
}

void wrapParagraph(std::string_view paragraph, size_t width, std::vector<std::string_view>& lines) {
    size_t pos = 0;
    while (true) {
        std::string_view rest = paragraph.substr(pos);
        if (characterCount(rest) <= width) {
            lines.push_back(trimTrailingSpaces(rest));
            return;
        }
        // The line may end at a space up to and including the character
        // right after the first `width` characters: that space is dropped.
        size_t limit = pos + offsetAfterCharacters(rest, width);
        size_t breakAt = std::string_view::npos;
        for (size_t i = limit; i > pos; --i) {
            if (paragraph[i] == ' ' &&
                !trimTrailingSpaces(paragraph.substr(pos, i - pos)).empty()) {
                breakAt = i;
                break;
            }
        }
        if (breakAt == std::string_view::npos) {
            // A word longer than the width: it gets a line of its own.
            breakAt = paragraph.find(' ', limit);
            if (breakAt == std::string_view::npos) {
                lines.push_back(rest);
                return;
            }
        }
        lines.push_back(trimTrailingSpaces(paragraph.substr(pos, breakAt - pos)));
        pos = breakAt;
        while (pos < paragraph.size() && paragraph[pos] == ' ')
            ++pos;
        if (pos == paragraph.size())
            return;
    }
}

}  // namespace

size_t characterCount(std::string_view text) {
    size_t n = 0;
    for (char c : text)
        n += continuesCharacter(c) ? 0 : 1;
    return n;
}

std::string wrapLines(std::string_view text, int width) {
    std::vector<std::string_view> lines;
    size_t start = 0;
    while (true) {
        size_t end = text.find('\n', start);
        std::string_view paragraph =
            text.substr(start, end == std::string_view::npos ? text.npos : end - start);
        if (width > 0) {
            wrapParagraph(paragraph, static_cast<size_t>(width), lines);
        } else {
            lines.push_back(trimTrailingSpaces(paragraph));
        }
        if (end == std::string_view::npos)
            break;
        start = end + 1;
    }
    while (!lines.empty() && lines.back().empty())
        lines.pop_back();

    std::string out;
    for (size_t i = 0; i < lines.size(); ++i) {
        if (i > 0)
            out += '\n';
        out += lines[i];
    }
    return out;
}

size_t copyToBuffer(std::string_view text, char* buffer, size_t capacity) {
    if (capacity == 0)
        return 0;
    size_t n = text.size();
    if (n > capacity - 1) {
        n = capacity - 1;
        // Step back over a character that would be cut.
        while (n > 0 && continuesCharacter(text[n]))
            --n;
    }
    std::memcpy(buffer, text.data(), n);
    buffer[n] = '\0';
    return n;
}

}  // namespace standin
