// The engine's table of memory pool identifiers: short name, description and
// whether the pool is one of the engine's internal ones.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace standin {

struct PoolTableEntry {
    const char* name;
    const char* description;
    bool internal;
};

// Number of identifiers in the table (0 .. poolTableSize() - 1).
uint32_t poolTableSize();

// The entry of `id`, or nullptr for an identifier beyond the table.
const PoolTableEntry* poolTableEntry(uint32_t id);

// The first identifier whose short name is `name`.
std::optional<uint32_t> poolIdByName(std::string_view name);

// Internal pools are hidden from snapshots unless the administrator exposes
// them; identifiers beyond the table are not internal.
bool poolIsInternal(uint32_t id);

}  // namespace standin
