// Reading a value out of an instance's registry file in tests.
#pragma once

#include <optional>
#include <sstream>
#include <string>

namespace mtrktest {

// The value of `key` (NAME or NAME@P) in the registry file's text, if it has
// a line.
inline std::optional<std::string> registryValue(const std::string& registry,
                                                const std::string& key = "VRXMEMTRK") {
    std::istringstream lines(registry);
    std::string line;
    while (std::getline(lines, line)) {
        if (line.compare(0, key.size() + 1, key + "=") == 0)
            return line.substr(key.size() + 1);
    }
    return std::nullopt;
}

}  // namespace mtrktest
