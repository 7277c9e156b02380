// Writing instance.json files of a chosen size, for measuring the program
// and the engine on instances far larger than anyone writes by hand. The
// text is fully determined by the shape (sizes come from a fixed
// pseudo-random sequence), so the same shape always gives the same bytes.
#pragma once

#include <cstdint>
#include <cstdio>

namespace standin {

struct InstanceShape {
    uint32_t databases = 4;
    uint64_t applications = 1000;
    // How many applications of one database stand together before the next
    // database's come: 1 interleaves them completely, so that every
    // application opens a new group in the application report.
    uint32_t run = 1;
    uint32_t applicationPools = 8;
    uint32_t databasePools = 12;
    uint32_t bufferPools = 4;
    uint32_t privateSections = 16;
    uint32_t privatePools = 4;
    uint32_t instancePools = 8;
    uint64_t seed = 1;
};

// Writes the instance's JSON text to `out`.
void writeInstance(FILE* out, const InstanceShape& shape);

// The number of pools the instance holds: its own, its databases' (buffer
// pools included), its applications' and its private memory sections'.
uint64_t poolCount(const InstanceShape& shape);

}  // namespace standin
