// The records that sqlogmblkEx keeps of the blocks it hands out, for the
// other services of this library.
#pragma once

#include <cstdint>
#include <optional>

namespace standin {

// Results of sqlogmblkEx and sqlofmblkEx besides 0.
constexpr int32_t kMemoryNotAvailable = static_cast<int32_t>(0x870F0030);  // refused or failed
constexpr int32_t kMemoryBadBlock = static_cast<int32_t>(0x870F0031);  // not held, or no pointer

// The size that was asked for when `block` was handed out by sqlogmblkEx,
// or nothing when the block is not currently held (never handed out, or
// already released). Lets a service bound its reads of a caller's table.
std::optional<uint64_t> blockSize(const void* block);

// The number of blocks handed out and not yet released.
uint64_t blocksHeld();

}  // namespace standin
