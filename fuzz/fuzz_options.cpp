// Arbitrary command lines into the parser, the input split into arguments
// at its NUL bytes: every one must be answered with 0 or -3, twice the same
// way, and an accepted one must leave options that the run driver can use.
//
// fuzz/fuzz_options.options turns off libFuzzer's leak check after each
// input: the engine's memory tracker remembers every block released, so
// each refused line ends with more allocations than releases and would
// trigger a full leak scan every time. LeakSanitizer still runs at exit.
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "mtrkOptions.h"

namespace {

char gInstanceDir[] = "/tmp/vrxmtrk-fuzz-options-XXXXXX";

void removeInstance() {
    std::error_code ignored;
    std::filesystem::remove_all(gInstanceDir, ignored);
}

// The usage text that the parser prints for a refused line goes nowhere;
// its fetch still runs through the engine's message service, against an
// instance of its own with the built catalogs.
void prepareEngine() {
    if (freopen("/dev/null", "w", stdout) == nullptr) {
        abort();
    }
    if (mkdtemp(gInstanceDir) == nullptr) {
        abort();
    }
    atexit(removeInstance);
    const std::string json = std::string(gInstanceDir) + "/instance.json";
    FILE* file = fopen(json.c_str(), "w");
    if (file == nullptr || fputs("{}\n", file) < 0 || fclose(file) != 0) {
        abort();
    }
    setenv("VRX_INSTANCE_DIR", gInstanceDir, 1);
}

bool isFlag(uint8_t value) {
    return value == 0 || value == 1;
}

bool sameOptions(const MtrkOptions& a, const MtrkOptions& b) {
    return a.instance == b.instance && a.database == b.database && a.highWater == b.highWater &&
           a.maximum == b.maximum && a.privateMemory == b.privateMemory &&
           a.application == b.application && a.verbose == b.verbose && a.allPools == b.allPools &&
           a.count == b.count && a.interval == b.interval && a.help == b.help;
}

// What the run driver relies on after an accepted command line.
bool usable(const MtrkOptions& o) {
    const bool flags = isFlag(o.instance) && isFlag(o.database) && isFlag(o.highWater) &&
                       isFlag(o.maximum) && isFlag(o.privateMemory) && isFlag(o.application) &&
                       isFlag(o.verbose) && isFlag(o.allPools) && isFlag(o.help);
    const bool selects = o.instance || o.database || o.privateMemory || o.application || o.help;
    const bool oneSize = !(o.highWater && o.maximum);
    // Without -r one pass and no wait; with it a positive interval and count.
    const bool repeat = o.interval == 0 ? o.count == 1 : o.interval >= 1 && o.count >= 1;
    return flags && selects && oneSize && repeat;
}

int32_t parse(const std::vector<const char*>& argv, MtrkOptions* options) {
    mtrkSetDefaultOptions(options);
    return mtrkParseOptions(static_cast<int32_t>(argv.size()), argv.data(), options);
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int* /*argc*/, char*** /*argv*/) {
    prepareEngine();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* bytes, size_t size) {
    // Every argument is a NUL-terminated copy of its own, so that reading
    // past an argument's end is caught.
    std::vector<std::string> arguments;
    if (size != 0) {
        const char* text = reinterpret_cast<const char*>(bytes);
        size_t start = 0;
        for (size_t i = 0; i <= size; ++i) {
            if (i == size || text[i] == '\0') {
                arguments.emplace_back(text + start, i - start);
                start = i + 1;
            }
        }
    }
    std::vector<const char*> argv{"vrxmtrk"};
    for (const std::string& argument : arguments) {
        argv.push_back(argument.c_str());
    }

    MtrkOptions first;
    const int32_t result = parse(argv, &first);
    if (result != 0 && result != -3) {
        abort();
    }
    if (result == 0 && !usable(first)) {
        abort();
    }
    MtrkOptions second;
    if (parse(argv, &second) != result || (result == 0 && !sameOptions(first, second))) {
        abort();
    }
    return 0;
}
