// The records that sqlogmblkEx keeps of the blocks it hands out, for the
// other services of this library.
#pragma once

#include <cstdint>
#include <optional>

namespace standin {

// The size that was asked for when `block` was handed out by sqlogmblkEx,
// or nothing when the block is not currently held (never handed out, or
// already released). Lets a service bound its reads of a caller's table.
std::optional<uint64_t> blockSize(const void* block);

// The number of blocks handed out and not yet released.
uint64_t blocksHeld();

}  // namespace standin
