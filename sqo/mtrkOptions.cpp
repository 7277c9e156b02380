#include "mtrkOptions.h"

#include <cstdio>
#include <cstring>

#include "messages/mtrkMessages.h"
#include "messages/mtrkTrace.h"

namespace {

constexpr int32_t MTRK_REPEAT_FOREVER = 2147483647;

// How a number argument reads, in the terms of sscanf's "%d%c": the count of
// conversions (-1 when the text holds nothing but white space), and whether
// the digits stand for a value beyond the signed 32-bit range.
struct MtrkNumberScan {
    int32_t conversions;
    int32_t value;
    bool outOfRange;
};

bool mtrkIsScanSpace(char c) {
    return c == ' ' || c == '\t' || c == '\n' || c == '\v' || c == '\f' || c == '\r';
}

// Reads the text as "%d%c" reads it, so that the same arguments are accepted
// and refused, but with the range checked: sscanf's result for digits beyond
// 32 bits is undefined, and a bad interval must not slip through as some
// wrapped value.
MtrkNumberScan mtrkScanNumber(const char* text) {
    MtrkNumberScan scan = {0, 0, false};
    const char* p = text;
    while (mtrkIsScanSpace(*p)) {
        ++p;
    }
    if (*p == '\0') {
        scan.conversions = -1;
        return scan;
    }
    bool negative = false;
    if (*p == '+' || *p == '-') {
        negative = (*p == '-');
        ++p;
    }
    if (*p < '0' || *p > '9') {
        return scan;
    }
    // Accumulated as a negative number, so that the most negative value fits.
    int64_t magnitude = 0;
    for (; *p >= '0' && *p <= '9'; ++p) {
        if (!scan.outOfRange) {
            magnitude = magnitude * 10 + (*p - '0');
            if (magnitude > static_cast<int64_t>(MTRK_REPEAT_FOREVER) + 1) {
                scan.outOfRange = true;
            }
        }
    }
    const int64_t value = negative ? -magnitude : magnitude;
    if (value > MTRK_REPEAT_FOREVER || value < -static_cast<int64_t>(MTRK_REPEAT_FOREVER) - 1) {
        scan.outOfRange = true;
    }
    if (!scan.outOfRange) {
        scan.value = static_cast<int32_t>(value);
    }
    scan.conversions = (*p == '\0') ? 1 : 2;
    return scan;
}

// Sets a flag that may be given once; false when it was given before.
bool mtrkSetOnce(uint8_t* flag) {
    if (*flag == 1) {
        return false;
    }
    *flag = 1;
    return true;
}

// Examines "-r interval [count]" starting at the interval's index; returns
// the index of the next argument to examine, or -1 for an invalid line.
int32_t mtrkParseRepeat(int32_t argc, const char* const* argv, int32_t index,
                        MtrkOptions* options) {
    if (options->interval != 0 || index >= argc) {
        return -1;
    }
    const MtrkNumberScan interval = mtrkScanNumber(argv[index]);
    if (interval.conversions == 0 || interval.conversions > 1 || interval.outOfRange) {
        return -1;
    }
    if (interval.conversions == 1) {
        options->interval = interval.value;
    }
    if (options->interval < 1) {
        return -1;
    }
    options->count = MTRK_REPEAT_FOREVER;
    ++index;
    if (index >= argc) {
        return index;
    }

    const MtrkNumberScan count = mtrkScanNumber(argv[index]);
    if (count.conversions == 0) {
        // Not a number: the argument is the next option, not the count.
        return index;
    }
    if (count.conversions > 1 || count.outOfRange) {
        return -1;
    }
    if (count.conversions == 1) {
        options->count = count.value;
    }
    // An argument of nothing but white space is taken and leaves the count.
    if (options->count < 1) {
        return -1;
    }
    return index + 1;
}

// Examines the arguments; true when every one is a valid option.
bool mtrkExamineArguments(int32_t argc, const char* const* argv, MtrkOptions* options) {
    if (argc < 2) {
        return false;
    }
    int32_t index = 1;
    while (index < argc) {
        const char* word = argv[index];
        ++index;
        bool valid = true;
        if (strcmp(word, "-m") == 0) {
            valid = options->highWater != 1 && mtrkSetOnce(&options->maximum);
        } else if (strcmp(word, "-d") == 0) {
            valid = mtrkSetOnce(&options->database);
        } else if (strcmp(word, "-i") == 0) {
            valid = mtrkSetOnce(&options->instance);
        } else if (strcmp(word, "-w") == 0) {
            valid = options->maximum != 1 && mtrkSetOnce(&options->highWater);
        } else if (strcmp(word, "-p") == 0) {
            valid = mtrkSetOnce(&options->privateMemory);
        } else if (strcmp(word, "-a") == 0) {
            valid = mtrkSetOnce(&options->application);
        } else if (strcmp(word, "-v") == 0) {
            valid = mtrkSetOnce(&options->verbose);
        } else if (strcmp(word, "-all") == 0) {
            valid = mtrkSetOnce(&options->allPools);
        } else if (strcmp(word, "-r") == 0) {
            index = mtrkParseRepeat(argc, argv, index, options);
            valid = index >= 0;
        } else if (strcmp(word, "-h") == 0) {
            options->help = 1;
        } else {
            valid = false;
        }
        if (!valid) {
            return false;
        }
    }
    // Modifiers and -r select nothing by themselves.
    return options->instance == 1 || options->database == 1 || options->privateMemory == 1 ||
           options->application == 1 || options->help == 1;
}

}  // namespace

void mtrkSetDefaultOptions(MtrkOptions* options) {
    memset(options, 0, sizeof *options);
    options->count = 1;
    options->interval = 0;
}

int32_t mtrkParseOptions(int32_t argc, const char* const* argv, MtrkOptions* options) {
    const uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_PARSE_OPTIONS);
    int32_t result = 0;
    if (!mtrkExamineArguments(argc, argv, options)) {
        char message[MTRK_TEXT_SIZE];
        if (mtrkGetMessage(41, message, sizeof message, 0) == 0) {
            printf("%s\n", message);
            if (mtrkGetMessage(42, message, sizeof message, 0) == 0) {
                printf("%s\n", message);
            }
        }
        result = -3;
    }
    mtrkTraceExit(MTRK_FID_PARSE_OPTIONS, traceFlags, result);
    return result;
}
