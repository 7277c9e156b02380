#include "benchStreams.h"

#include <cstdio>
#include <cstdlib>
#include <stdexcept>

namespace bench {

std::string instanceText(const standin::InstanceShape& shape) {
    char* text = nullptr;
    size_t size = 0;
    FILE* out = open_memstream(&text, &size);
    if (out == nullptr)
        throw std::runtime_error("open_memstream failed");
    standin::writeInstance(out, shape);
    std::fclose(out);
    std::string json(text, size);
    std::free(text);
    return json;
}

std::string encodedStream(const std::string& json, standin::SnapshotKind kind) {
    standin::Instance settings;
    standin::StreamSizer sizer;
    if (!standin::readInstanceText(json, settings, sizer))
        throw std::runtime_error("the generated instance does not read");
    standin::StreamScope scope{kind, false};
    std::string stream(sizer.sizes().of(scope), '\0');
    standin::StreamWriter writer(scope, stream.data(), stream.size());
    standin::readInstanceText(json, settings, writer);
    return stream;
}

standin::InstanceShape poolsOnly(uint64_t pools) {
    standin::InstanceShape shape;
    shape.instancePools = static_cast<uint32_t>(pools);
    shape.databases = 1;
    shape.databasePools = 0;
    shape.bufferPools = 0;
    shape.applications = 0;
    shape.privateSections = 0;
    return shape;
}

standin::InstanceShape applicationsOnly(uint64_t pools) {
    standin::InstanceShape shape;
    shape.applications = pools / shape.applicationPools;
    shape.privateSections = 0;
    return shape;
}

}  // namespace bench
