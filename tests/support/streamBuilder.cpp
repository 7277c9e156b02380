#include "streamBuilder.h"

#include <cstring>
#include <stdexcept>

namespace mtrktest {

StreamBuilder& StreamBuilder::header(uint16_t type, uint16_t element, uint32_t size) {
    char h[8];
    std::memcpy(h, &size, 4);
    std::memcpy(h + 4, &type, 2);
    std::memcpy(h + 6, &element, 2);
    bytes_.append(h, 8);
    return *this;
}

StreamBuilder& StreamBuilder::open(uint16_t element, uint16_t type) {
    open_.push_back(bytes_.size());
    return header(type, element, 0);
}

StreamBuilder& StreamBuilder::close() {
    if (open_.empty()) throw std::logic_error("close() without open()");
    size_t at = open_.back();
    open_.pop_back();
    auto size = static_cast<uint32_t>(bytes_.size() - at - 8);
    std::memcpy(bytes_.data() + at, &size, 4);
    return *this;
}

StreamBuilder& StreamBuilder::u32(uint16_t element, uint32_t value) {
    header(3, element, 4);
    bytes_.append(reinterpret_cast<const char*>(&value), 4);
    return *this;
}

StreamBuilder& StreamBuilder::u64(uint16_t element, int64_t value) {
    header(4, element, 8);
    bytes_.append(reinterpret_cast<const char*>(&value), 8);
    return *this;
}

StreamBuilder& StreamBuilder::text(uint16_t element, std::string_view value) {
    header(2, element, static_cast<uint32_t>(value.size()));
    bytes_.append(value);
    return *this;
}

StreamBuilder& StreamBuilder::raw(uint16_t type, uint16_t element, uint32_t size,
                                  std::string_view data) {
    header(type, element, size);
    bytes_.append(data);
    return *this;
}

StreamBuilder& StreamBuilder::pool(uint32_t id, std::optional<int64_t> current,
                                   std::optional<int64_t> maximum,
                                   std::optional<int64_t> highWater,
                                   std::optional<std::string> bufferPool) {
    open(40);
    u32(686, id);
    if (current) u64(687, *current);
    if (maximum) u64(688, *maximum);
    if (highWater) u64(689, *highWater);
    if (bufferPool) text(874, *bufferPool);
    return close();
}

std::string StreamBuilder::str() const {
    if (!open_.empty()) throw std::logic_error("unclosed element");
    return bytes_;
}

std::string wrapElement(uint16_t element, const std::string& body) {
    return StreamBuilder().raw(1, element, static_cast<uint32_t>(body.size()), body).str();
}

std::string wrapStream(const std::string& body) { return wrapElement(1, body); }

}  // namespace mtrktest
