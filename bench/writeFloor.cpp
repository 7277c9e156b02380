// vrxbench_write: writes the bytes of a file to standard output line by line
// through the C runtime's buffered output, twice: once as plain bytes
// (fwrite), once through the formatted print that the program writes every
// line with (printf "%s"). Prints to standard error how long each pass took
// (reading the file is not counted). Run with standard output on /dev/null,
// it measures the floor of producing a run's output bytes.
//
//   vrxbench_write out.txt > /dev/null
#include <cstdio>
#include <ctime>
#include <string>
#include <vector>

namespace {

double seconds(const timespec& t) {
    return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) / 1e9;
}

double now(clockid_t clock) {
    timespec t{};
    clock_gettime(clock, &t);
    return seconds(t);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fputs("usage: vrxbench_write FILE > /dev/null\n", stderr);
        return 2;
    }
    std::string bytes;
    if (FILE* in = std::fopen(argv[1], "rb")) {
        char chunk[1 << 16];
        size_t n;
        while ((n = std::fread(chunk, 1, sizeof chunk, in)) > 0)
            bytes.append(chunk, n);
        std::fclose(in);
    } else {
        std::perror(argv[1]);
        return 1;
    }
    std::vector<std::string> lines;
    for (size_t at = 0; at < bytes.size();) {
        size_t end = bytes.find('\n', at);
        end = end == std::string::npos ? bytes.size() : end + 1;
        lines.emplace_back(bytes, at, end - at);
        at = end;
    }

    // Standard output keeps the C runtime's own buffer, as in the program.
    auto timed = [&](auto&& writeLine) {
        double cpu = now(CLOCK_PROCESS_CPUTIME_ID);
        for (const std::string& line : lines)
            writeLine(line);
        std::fflush(stdout);
        return now(CLOCK_PROCESS_CPUTIME_ID) - cpu;
    };
    double raw =
        timed([](const std::string& line) { std::fwrite(line.data(), 1, line.size(), stdout); });
    double formatted = timed([](const std::string& line) { std::printf("%s", line.c_str()); });
    std::fprintf(stderr, "bytes=%zu lines=%zu raw=%.6f formatted=%.6f\n", bytes.size(),
                 lines.size(), raw, formatted);
    return 0;
}
