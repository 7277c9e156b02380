// The profile registry file of an instance: one value a line, NAME=VALUE for
// partition -1 and NAME@P=VALUE for partition P of 0 or more.
#pragma once

#include <cstddef>
#include <cstdint>

namespace standin {

// Results besides 0 and the "no value" answers of a read.
constexpr int32_t kRegistryBadArgument = static_cast<int32_t>(0x870F0101);  // name, partition
constexpr int32_t kRegistryValueTooLong = static_cast<int32_t>(0x870F0102);
constexpr int32_t kRegistryIoError = static_cast<int32_t>(0x870F0103);
constexpr int32_t kRegistryNotSet = static_cast<int32_t>(0x870F0104);
constexpr int32_t kRegistryNoFile = static_cast<int32_t>(0x870F0108);

// A value holds at most this many bytes.
constexpr size_t kRegistryValueMax = 255;

// Reads NAME's value of `partition` from <dir>/registry into `value`
// (capacity `capacity`; at most 256 bytes are written, terminator included,
// a longer line in a hand-edited file being cut). Returns 0,
// kRegistryNotSet when the variable has no value (no line, or an empty one),
// kRegistryNoFile when the file does not exist. Names may not contain '=',
// '@' or line breaks; the partition is -1 or 0 and above.
// Async-signal-safe: no allocation, no stdio, no locks.
int32_t registryRead(const char* dir, const char* name, int32_t partition, char* value,
                     size_t capacity);

// Sets NAME of `partition` to `value`, or removes its line for the empty
// text; replaces the file atomically (new file in the same directory, fsync,
// rename), so a crash leaves either the old or the new registry. A registry
// left without lines is removed. A value longer than kRegistryValueMax or
// with a line break is refused. Async-signal-safe.
int32_t registryWrite(const char* dir, const char* name, int32_t partition, const char* value);

// True when VRXMEMTRK of partition -1 holds exactly "1" in the instance
// directory `dir`: the engine then shows its internal pools.
bool internalPoolsExposed(const char* dir);

}  // namespace standin
