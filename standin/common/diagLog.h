// Writing records to an instance's diag.log.
#pragma once

#include <cstdint>
#include <string_view>

namespace standin {

// One data item of a record: a text (written quoted with C escapes) or a
// signed 32-bit number.
struct DiagItem {
    bool isText;
    std::string_view text;
    int32_t number;
};

// Appends one record with a single write() on a file opened for appending:
//   2026-12-06T20:05:39.123456 pid=4242 func=0x18780019 probe=100
//     data#1 text(42): "Snapshot buffer too small after retry.\nrc="
//     data#2 int32(4): 1606
//   <empty line>
// Async-signal-safe when called with a preformatted directory path.
void appendDiagRecord(const char* dir, uint32_t functionId, uint32_t probe, const DiagItem* items,
                      uint32_t itemCount);

// A record that the engine writes about itself (func=0x00000000), one text.
void logEngineProblem(std::string_view text);

}  // namespace standin
