// Encoding an instance into the snapshot monitor's data stream while
// instance.json is read, straight into the caller's buffer.
#pragma once

#include <cstdint>
#include <string>

#include "common/instance.h"
#include "common/instanceReader.h"

namespace standin {

// What one snapshot shows: which object type, and whether the internal
// pools are in it.
struct StreamScope {
    SnapshotKind kind;
    bool showInternalPools;
};

// The exact size of every stream that one instance gives (it may exceed 32
// bits for an instance that no snapshot buffer can hold), and the number of
// sections in each list, which decide whether a snapshot has anything to
// report.
struct StreamSizes {
    uint64_t bytes[3][2] = {};  // [object type][internal pools shown]
    uint64_t databases = 0;
    uint64_t applications = 0;
    uint64_t privateSections = 0;

    uint64_t of(StreamScope scope) const {
        return bytes[static_cast<int>(scope.kind)][scope.showInternalPools ? 1 : 0];
    }
};

// Adds up the sizes of all streams as the instance is read.
class StreamSizer : public InstanceSink {
  public:
    StreamSizer() { restart(); }
    void restart() override;
    void instancePools(std::span<const PoolRead> pools) override;
    void section(PoolList list, const SectionRead& section) override;

    const StreamSizes& sizes() const { return sizes_; }

  private:
    StreamSizes sizes_;
};

// Writes the stream of one object type into `out` as the instance is read,
// never past `capacity` bytes, and adds up every stream's size on the way.
// The stream is whole when size() is at most the capacity; the parts of a
// larger one that fit are written, the rest only counted.
class StreamWriter final : public StreamSizer {
  public:
    StreamWriter(StreamScope scope, char* out, uint64_t capacity)
        : scope_(scope), out_(out), capacity_(capacity) {
        restart();
    }
    void restart() override;
    void instancePools(std::span<const PoolRead> pools) override;
    void section(PoolList list, const SectionRead& section) override;
    void endList(PoolList list) override;
    void endDocument() override;

    uint64_t size() const { return at_; }

  private:
    void put(const void* bytes, uint64_t n);
    template <typename Put>
    void writeSection(Put& put, PoolList list, const SectionRead& section) const;

    StreamScope scope_;
    char* out_;
    uint64_t capacity_;
    uint64_t at_ = 0;
    // Private memory sections that come before the applications in the
    // file; the stream has them after the applications.
    std::string heldBack_;
    bool applicationsDone_ = false;
};

}  // namespace standin
