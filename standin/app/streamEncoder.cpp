#include "app/streamEncoder.h"

#include <bit>
#include <cstring>

#include "common/poolTable.h"

namespace standin {

namespace {

// Every element: u32 data size, u16 type, u16 identifier, then the data.
constexpr uint64_t kHeader = 8;

enum ElementType : uint16_t { kNested = 1, kText = 2, kU32 = 3, kU64 = 4 };

enum ElementId : uint16_t {
    kSnapshot = 1,
    kApplication = 5,
    kPrivateMemory = 10,
    kDatabase = 13,
    kPool = 40,
    kApplicationNumber = 302,
    kDatabaseName = 321,
    kPrivateMemoryNumber = 549,
    kPoolId = 686,
    kPoolCurrent = 687,
    kPoolMaximum = 688,
    kPoolHighWater = 689,
    kBufferPoolName = 874,
};

static_assert(std::endian::native == std::endian::little,
              "the data stream is little-endian and written in place");

// The sizes below are data sizes, without the element's own header.

bool visible(const PoolRead& pool, bool showInternalPools) {
    return showInternalPools || !poolIsInternal(pool.id);
}

uint64_t poolDataSize(const PoolRead& pool) {
    return kHeader + 4 + (kHeader + 8) * (pool.hasCurrent + pool.hasMaximum + pool.hasHighWater) +
           (pool.hasBufferPool ? kHeader + pool.bufferPool.size() : 0);
}

uint64_t poolsSize(std::span<const PoolRead> pools, bool showInternalPools) {
    uint64_t size = 0;
    for (const PoolRead& pool : pools) {
        if (visible(pool, showInternalPools))
            size += kHeader + poolDataSize(pool);
    }
    return size;
}

// The section's data before its pools.
uint64_t sectionFieldsSize(PoolList list, const SectionRead& section) {
    switch (list) {
        case PoolList::Databases:
            return kHeader + section.name.size();
        case PoolList::Applications:
            return kHeader + 4 + kHeader + section.name.size();
        default:
            return kHeader + 4;
    }
}

SnapshotKind kindOf(PoolList list) {
    switch (list) {
        case PoolList::Instance:
            return SnapshotKind::Instance;
        case PoolList::Databases:
            return SnapshotKind::Database;
        default:
            return SnapshotKind::Application;
    }
}

char* header(char* at, ElementType type, ElementId id, uint64_t size) {
    auto size32 = static_cast<uint32_t>(size);
    auto type16 = static_cast<uint16_t>(type);
    auto id16 = static_cast<uint16_t>(id);
    std::memcpy(at, &size32, 4);
    std::memcpy(at + 4, &type16, 2);
    std::memcpy(at + 6, &id16, 2);
    return at + kHeader;
}

template <typename T>
char* value(char* at, ElementType type, ElementId id, T v) {
    at = header(at, type, id, sizeof v);
    std::memcpy(at, &v, sizeof v);
    return at + sizeof v;
}

// A pool's element up to its buffer pool name, which follows separately.
template <typename Put>
void writePool(Put& put, const PoolRead& pool) {
    char bytes[kHeader + (kHeader + 4) + 3 * (kHeader + 8) + kHeader];
    char* at = header(bytes, kNested, kPool, poolDataSize(pool));
    at = value(at, kU32, kPoolId, pool.id);
    if (pool.hasCurrent)
        at = value(at, kU64, kPoolCurrent, pool.current);
    if (pool.hasMaximum)
        at = value(at, kU64, kPoolMaximum, pool.maximum);
    if (pool.hasHighWater)
        at = value(at, kU64, kPoolHighWater, pool.highWater);
    if (pool.hasBufferPool)
        at = header(at, kText, kBufferPoolName, pool.bufferPool.size());
    put(bytes, static_cast<uint64_t>(at - bytes));
    if (pool.hasBufferPool)
        put(pool.bufferPool.data(), pool.bufferPool.size());
}

template <typename Put>
void writePools(Put& put, std::span<const PoolRead> pools, bool showInternalPools) {
    for (const PoolRead& pool : pools) {
        if (visible(pool, showInternalPools))
            writePool(put, pool);
    }
}

}  // namespace

void StreamSizer::restart() {
    sizes_ = StreamSizes{};
    for (auto& kind : sizes_.bytes) {
        kind[0] = kHeader;
        kind[1] = kHeader;
    }
}

void StreamSizer::instancePools(std::span<const PoolRead> pools) {
    auto& bytes = sizes_.bytes[static_cast<int>(SnapshotKind::Instance)];
    bytes[0] += poolsSize(pools, false);
    bytes[1] += poolsSize(pools, true);
}

void StreamSizer::section(PoolList list, const SectionRead& section) {
    auto& bytes = sizes_.bytes[static_cast<int>(kindOf(list))];
    uint64_t fields = kHeader + sectionFieldsSize(list, section);
    bytes[0] += fields + poolsSize(section.pools, false);
    bytes[1] += fields + poolsSize(section.pools, true);
    switch (list) {
        case PoolList::Databases:
            ++sizes_.databases;
            break;
        case PoolList::Applications:
            ++sizes_.applications;
            break;
        default:
            ++sizes_.privateSections;
            break;
    }
}

void StreamWriter::restart() {
    StreamSizer::restart();
    // The enclosing element's header is written last, when its size is known.
    at_ = kHeader;
    heldBack_.clear();
    applicationsDone_ = false;
}

void StreamWriter::put(const void* bytes, uint64_t n) {
    if (at_ <= capacity_ && n <= capacity_ - at_ && n != 0)
        std::memcpy(out_ + at_, bytes, n);
    at_ += n;
}

template <typename Put>
void StreamWriter::writeSection(Put& put, PoolList list, const SectionRead& section) const {
    bool all = scope_.showInternalPools;
    uint64_t size = sectionFieldsSize(list, section) + poolsSize(section.pools, all);
    char bytes[3 * kHeader + 4];
    char* at = bytes;
    switch (list) {
        case PoolList::Databases:
            at = header(at, kNested, kDatabase, size);
            at = header(at, kText, kDatabaseName, section.name.size());
            put(bytes, static_cast<uint64_t>(at - bytes));
            put(section.name.data(), section.name.size());
            break;
        case PoolList::Applications:
            at = header(at, kNested, kApplication, size);
            at = value(at, kU32, kApplicationNumber, section.number);
            at = header(at, kText, kDatabaseName, section.name.size());
            put(bytes, static_cast<uint64_t>(at - bytes));
            put(section.name.data(), section.name.size());
            break;
        default:
            at = header(at, kNested, kPrivateMemory, size);
            at = value(at, kU32, kPrivateMemoryNumber, section.number);
            put(bytes, static_cast<uint64_t>(at - bytes));
            break;
    }
    writePools(put, section.pools, all);
}

void StreamWriter::instancePools(std::span<const PoolRead> pools) {
    StreamSizer::instancePools(pools);
    if (scope_.kind != SnapshotKind::Instance)
        return;
    auto direct = [this](const void* bytes, uint64_t n) { put(bytes, n); };
    writePools(direct, pools, scope_.showInternalPools);
}

void StreamWriter::section(PoolList list, const SectionRead& section) {
    StreamSizer::section(list, section);
    if (kindOf(list) != scope_.kind)
        return;
    if (list == PoolList::PrivateMemory && !applicationsDone_) {
        auto holdBack = [this](const void* bytes, uint64_t n) {
            heldBack_.append(static_cast<const char*>(bytes), n);
        };
        writeSection(holdBack, list, section);
        return;
    }
    auto direct = [this](const void* bytes, uint64_t n) { put(bytes, n); };
    writeSection(direct, list, section);
}

void StreamWriter::endList(PoolList list) {
    if (list != PoolList::Applications)
        return;
    applicationsDone_ = true;
    put(heldBack_.data(), heldBack_.size());
    heldBack_.clear();
}

void StreamWriter::endDocument() {
    put(heldBack_.data(), heldBack_.size());
    heldBack_.clear();
    if (capacity_ >= kHeader) {
        header(out_, kNested, kSnapshot, at_ - kHeader);
    }
}

}  // namespace standin
