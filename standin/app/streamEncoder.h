// Encoding an instance into the snapshot monitor's data stream.
#pragma once

#include <cstdint>

#include "common/instance.h"

namespace standin {

// What one snapshot shows: which object type, and whether the internal
// pools are in it.
struct StreamScope {
    SnapshotKind kind;
    bool showInternalPools;
};

// The exact number of bytes of the stream; may exceed 32 bits for an
// instance that no snapshot buffer can hold.
uint64_t encodedStreamSize(const Instance& instance, StreamScope scope);

// Writes the stream into `out`, which must hold what encodedStreamSize
// answers for the same arguments (at most 0xFFFFFFFF bytes, so that every
// element's size fits its header). Returns the number of bytes written.
uint64_t encodeStream(const Instance& instance, StreamScope scope, char* out);

}  // namespace standin
