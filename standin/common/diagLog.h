// Writing records to an instance's diag.log.
#pragma once

#include <cstdint>
#include <ctime>
#include <string>
#include <string_view>

namespace standin {

// One data item of a record, as a caller of pdLog hands it over: the type
// code (text 0x18000004, signed 32-bit number 4, anything else is shown as
// bytes), the length the caller gives and the data, which may be null.
struct DiagItem {
    uint32_t type;
    uint64_t length;
    const void* data;
};

// The text of one record:
//   2026-12-06T20:05:39.123456 pid=4242 func=0x18780019 probe=100
//     data#1 text(42): "Snapshot buffer too small after retry.\nrc="
//     data#2 int32(4): 1606
//   <empty line>
// `when` is local time; `microseconds` its fraction of a second.
std::string formatDiagRecord(const std::tm& when, long microseconds, long pid, uint32_t functionId,
                             uint32_t probe, const DiagItem* items, uint32_t itemCount);

// Appends one record stamped with the current time and process to
// <dir>/diag.log with a single write() on a file opened for appending, so
// that records of concurrent processes never interleave. A directory that
// cannot be written to is passed over silently: the log is the last resort
// for reporting trouble.
void appendDiagRecord(const char* dir, uint32_t functionId, uint32_t probe, const DiagItem* items,
                      uint32_t itemCount);

// A record that the engine writes about itself (func=0x00000000), one text,
// to the current instance directory's diag.log.
void logEngineProblem(std::string_view text, uint32_t probe = 0);

}  // namespace standin
