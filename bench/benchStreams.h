// Monitor data streams of a chosen size for the benchmarks, encoded by the
// stand-in engine's own encoder from generated instances, so that they have
// exactly the layout that a run meets.
#pragma once

#include <cstdint>
#include <string>

#include "app/streamEncoder.h"
#include "instanceGenerator.h"

namespace bench {

// The JSON text of a generated instance.
std::string instanceText(const standin::InstanceShape& shape);

// The stream of one object type (internal pools hidden) for `json`.
std::string encodedStream(const std::string& json, standin::SnapshotKind kind);

// An instance whose own pools number `pools` and that has nothing else: its
// instance snapshot is one region of that many pools.
standin::InstanceShape poolsOnly(uint64_t pools);

// An instance of `pools` / 8 applications with eight pools each, spread over
// four databases and interleaved, without private memory.
standin::InstanceShape applicationsOnly(uint64_t pools);

}  // namespace bench
