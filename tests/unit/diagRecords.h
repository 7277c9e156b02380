// Reading the engine's diagnostic log in tests: each record without its
// time stamp and process id, and the expected form of a program's failure
// record.
#pragma once

#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

namespace mtrktest {

// The records of a diag.log, each starting at "func=".
inline std::vector<std::string> diagRecords(const std::string& log) {
    std::vector<std::string> records;
    size_t start = 0;
    while (start < log.size()) {
        size_t end = log.find("\n\n", start);
        if (end == std::string::npos)
            end = log.size();
        std::string record = log.substr(start, end - start);
        const size_t func = record.find("func=");
        records.push_back(func == std::string::npos ? record : record.substr(func));
        start = end + 2;
    }
    return records;
}

// A failure record of the program: the text item (with its escaped line
// feed) and the code.
inline std::string failureRecord(uint32_t functionId, uint32_t probe, const std::string& text,
                                 int32_t code) {
    char head[64];
    snprintf(head, sizeof head, "func=0x%08x probe=%u\n", functionId, probe);
    std::string escaped;
    for (char c : text)
        escaped += (c == '\n') ? std::string("\\n") : std::string(1, c);
    return head + std::string("  data#1 text(") + std::to_string(text.size()) + "): \"" + escaped +
           "\"\n  data#2 int32(4): " + std::to_string(code);
}

}  // namespace mtrktest
