// The profile registry file of an instance: one value a line, NAME=VALUE for
// partition -1 and NAME@P=VALUE for partition P.
#pragma once

#include <cstddef>
#include <cstdint>

namespace standin {

// Reads NAME's value of `partition` from <dir>/registry into `value`
// (capacity `capacity`, at most 256). Returns 0, 0x870F0104 when the
// variable has no value, 0x870F0108 when the file does not exist.
// Async-signal-safe: no allocation, no stdio, no locks.
int32_t registryRead(const char* dir, const char* name, int32_t partition, char* value,
                     size_t capacity);

// Sets NAME of `partition` to `value`, or removes its line for the empty
// text; replaces the file atomically (new file, fsync, rename).
// Async-signal-safe.
int32_t registryWrite(const char* dir, const char* name, int32_t partition, const char* value);

// True when VRXMEMTRK of partition -1 holds exactly "1" in the instance
// directory `dir`: the engine then shows its internal pools.
bool internalPoolsExposed(const char* dir);

}  // namespace standin
