// The stand-in engine's stream encoding: an instance read from its JSON
// text and written as an application snapshot, in memory and through the
// monitor's entry points from a file. Bytes per second count stream bytes.
#include <benchmark/benchmark.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>

#include "benchEnvironment.h"
#include "benchStreams.h"
#include "common/monitorCall.h"
#include "engine/vrxapp.h"

namespace {

standin::InstanceShape shapeOf(int64_t applications) {
    standin::InstanceShape shape;
    shape.applications = static_cast<uint64_t>(applications);
    return shape;
}

void encodeStream(benchmark::State& state) {
    const std::string json = bench::instanceText(shapeOf(state.range(0)));
    const standin::StreamScope scope{standin::SnapshotKind::Application, false};
    const std::string expected = bench::encodedStream(json, scope.kind);
    std::string buffer(expected.size(), '\0');
    for (auto _ : state) {
        standin::Instance settings;
        standin::StreamWriter writer(scope, buffer.data(), buffer.size());
        if (!standin::readInstanceText(json, settings, writer) || writer.size() != buffer.size())
            state.SkipWithError("the instance does not encode");
    }
    if (buffer != expected)
        state.SkipWithError("the stream differs from one encoded before");
    state.SetBytesProcessed(state.iterations() * static_cast<int64_t>(buffer.size()));
    state.counters["stream_MB"] = static_cast<double>(buffer.size()) / 1e6;
    state.counters["json_MB"] = static_cast<double>(json.size()) / 1e6;
}

// Both monitor calls of one application snapshot, the file read included,
// into a buffer allocated once.
void takeSnapshot(benchmark::State& state) {
    const std::filesystem::path dir = bench::environment().dir() / "take";
    std::filesystem::create_directories(dir);
    {
        std::ofstream out(dir / "instance.json", std::ios::binary | std::ios::trunc);
        out << bench::instanceText(shapeOf(state.range(0)));
    }
    std::string saved = std::getenv("VRX_INSTANCE_DIR");
    setenv("VRX_INSTANCE_DIR", dir.c_str(), 1);

    standin::MonitorCall call(VRX_OBJ_APPLICATION);
    call.askSize();
    std::string buffer(call.estimate, '\0');
    for (auto _ : state) {
        if (call.askSize() != 0 || call.ca.sqlcode != 0 ||
            call.takeInto(buffer.data(), call.estimate) != 0 || call.ca.sqlcode != 0) {
            state.SkipWithError("the snapshot failed");
        }
    }
    setenv("VRX_INSTANCE_DIR", saved.c_str(), 1);
    std::filesystem::remove_all(dir);
    state.SetBytesProcessed(state.iterations() * static_cast<int64_t>(call.estimate));
    state.counters["stream_MB"] = static_cast<double>(call.estimate) / 1e6;
}

BENCHMARK(encodeStream)
    ->ArgName("applications")
    ->Arg(1000)
    ->Arg(10000)
    ->Arg(100000)
    ->Unit(benchmark::kMillisecond);
BENCHMARK(takeSnapshot)
    ->ArgName("applications")
    ->Arg(1000)
    ->Arg(10000)
    ->Arg(100000)
    ->Unit(benchmark::kMillisecond);

}  // namespace
