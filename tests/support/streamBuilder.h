// Builds monitor data streams byte by byte for tests.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace mtrktest {

class StreamBuilder {
public:
    // Opens a type 1 element; close() fills in its size.
    StreamBuilder& open(uint16_t element, uint16_t type = 1);
    StreamBuilder& close();
    StreamBuilder& u32(uint16_t element, uint32_t value);
    StreamBuilder& u64(uint16_t element, int64_t value);
    StreamBuilder& text(uint16_t element, std::string_view value);
    // An element whose header claims `size` data bytes, followed by `data`
    // as it stands (for damaged streams).
    StreamBuilder& raw(uint16_t type, uint16_t element, uint32_t size, std::string_view data = {});
    // A pool (element 40) with its identifier and the sizes given.
    StreamBuilder& pool(uint32_t id, std::optional<int64_t> current,
                        std::optional<int64_t> maximum = std::nullopt,
                        std::optional<int64_t> highWater = std::nullopt,
                        std::optional<std::string> bufferPool = std::nullopt);
    // The bytes; every opened element must be closed.
    std::string str() const;

private:
    StreamBuilder& header(uint16_t type, uint16_t element, uint32_t size);
    std::string bytes_;
    std::vector<size_t> open_;
};

// A type 1 element around `body` (a section around its values and pools,
// say).
std::string wrapElement(uint16_t element, const std::string& body);

// A whole snapshot: element 1 of type 1 around `body`.
std::string wrapStream(const std::string& body);

}  // namespace mtrktest
