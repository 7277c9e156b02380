#include "reports/mtrkPoolList.h"

#include <cstdio>
#include <cstring>

#include "engine/vrxosse.h"
#include "engine/vrxsys.h"
#include "messages/mtrkFunctionIds.h"
#include "messages/mtrkMessages.h"
#include "messages/mtrkTrace.h"
#include "monitor/mtrkStream.h"
#include "mtrkOptions.h"
#include "platform.h"
#include "reports/mtrkPoolNames.h"
#include "reports/mtrkRegion.h"

namespace {

constexpr uint32_t MSG_POOL_MAXIMUM = 0;
constexpr uint32_t MSG_POOL_HIGH_WATER = 1;
constexpr uint32_t MSG_POOL_CURRENT = 2;
constexpr uint32_t MSG_TOTAL = 3;
constexpr uint32_t MSG_NO_POOLS = 44;

// The application report shows, for each database, this one pool.
constexpr uint32_t DATABASE_SHARED_POOL_ID = 20;

// A pool element that cannot be read marks the whole stream as damaged.
constexpr int32_t INCONSISTENT_STREAM = 1;

struct SizeSelector {
    uint16_t element;
    uint32_t message;
};

SizeSelector selectSize(const MtrkOptions* options) {
    if (options->maximum) {
        return {MON_POOL_MAXIMUM, MSG_POOL_MAXIMUM};
    }
    if (options->highWater) {
        return {MON_POOL_HIGH_WATER, MSG_POOL_HIGH_WATER};
    }
    return {MON_POOL_CURRENT, MSG_POOL_CURRENT};
}

int32_t inconsistentStream() {
    gLastRc = INCONSISTENT_STREAM;
    return -4;
}

// Appends `text` to a column line; what does not fit into the line's 249
// characters is dropped.
void appendColumn(char* line, const char* text) {
    size_t used = strlen(line);
    if (used >= MTRK_LINE_SIZE) {
        return;
    }
    size_t room = MTRK_LINE_SIZE - used;
    size_t length = 0;
    while (length < room && text[length] != '\0') {
        ++length;
    }
    memcpy(line + used, text, length);
    if (length < room) {
        line[used + length] = '\0';
    }
    line[MTRK_LINE_SIZE - 1] = '\0';
}

void printLinePair(char* namesLine, char* sizesLine) {
    printf("   %s\n", namesLine);
    printf("   %s\n\n", sizesLine);
    namesLine[0] = '\0';
    sizesLine[0] = '\0';
}

void printPendingLines(char* namesLine, char* sizesLine) {
    if (namesLine[0] != '\0') {
        printLinePair(namesLine, sizesLine);
    }
}

}  // namespace

int32_t mtrkPrintPoolRow(const char* data, uint32_t size, const MtrkOptions* options,
                         bool showBufferPoolName, int64_t* poolSize, char* namesLine,
                         char* sizesLine) {
    *poolSize = 0;
    if (size <= MON_HEADER_SIZE) {
        return inconsistentStream();
    }
    uint32_t poolId = 0;
    if (mtrkGetPoolId(data, size, &poolId) != 0) {
        return inconsistentStream();
    }
    // Pools the engine does not know by name (internal pools of another
    // build, say) are left out without a word, as if they were not there.
    if (poolId > sqloGetMaxMemPoolID()) {
        return 0;
    }

    // Empty unless the pool names its buffer pool; only the text up to its
    // terminator is ever read, so the rest of the buffer is not cleared.
    char bufferPoolName[MTRK_BUFFER_POOL_NAME_SIZE];
    bufferPoolName[0] = '\0';
    if (options->verbose) {
        mtrkGetBufferPoolName(data, size, bufferPoolName, sizeof bufferPoolName);
    } else {
        mtrkGetBufferPoolShortName(data, size, bufferPoolName, sizeof bufferPoolName);
    }

    SizeSelector selector = selectSize(options);
    int64_t value = 0;
    if (mtrkGetU64(selector.element, data, size, &value) != 0) {
        return inconsistentStream();
    }
    *poolSize = value;

    char label[MTRK_TEXT_SIZE];
    mtrkBuildPoolLabel(poolId, bufferPoolName, showBufferPoolName, options, label);

    if (options->verbose) {
        char sizeText[MTRK_NUMBER_SIZE];
        ossSnprintf(sizeText, sizeof sizeText, MTRK_I64D, value);
        char message[MTRK_TEXT_SIZE];
        int32_t rc = mtrkGetMessage(selector.message, message, sizeof message, 2, label, sizeText);
        if (rc == 0) {
            printf("%s\n", message);
        }
        return rc;
    }

    char nameColumn[MTRK_COLUMN_SIZE];
    char sizeColumn[MTRK_COLUMN_SIZE];
    ossSnprintf(nameColumn, sizeof nameColumn, "%-12s", label);
    mtrkFormatSize(value, sizeColumn);
    appendColumn(namesLine, nameColumn);
    appendColumn(sizesLine, sizeColumn);
    // A size never reaches past its label's column, so the next size starts
    // under the next label (or a little to its left, never to its right).
    sizesLine[strlen(namesLine)] = '\0';
    return 0;
}

int32_t mtrkPrintPoolList(const char* start, uint32_t length, const MtrkOptions* options,
                          bool showBufferPoolName, int64_t* total) {
    uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_PRINT_POOL_LIST);
    char namesLine[MTRK_LINE_SIZE] = {};
    char sizesLine[MTRK_LINE_SIZE] = {};
    int64_t sum = 0;
    int32_t rc = 0;

    const char* header = nullptr;
    const char* data = nullptr;
    uint32_t remaining = 0;
    uint32_t poolSize = 0;
    if (mtrkFindNextPool(start, length, &header, &data, &remaining, &poolSize) != 0) {
        char message[MTRK_TEXT_SIZE];
        rc = mtrkGetMessage(MSG_NO_POOLS, message, sizeof message, 0);
        if (rc == 0) {
            printf("   %s\n\n", message);
        }
    } else {
        for (;;) {
            int64_t size = 0;
            rc = mtrkPrintPoolRow(data, mtrkPoolLength(poolSize, remaining), options,
                                  showBufferPoolName, &size, namesLine, sizesLine);
            if (rc != 0) {
                if (rc == -4) {
                    mtrkLogFailure(MTRK_FID_PRINT_POOL_LIST, MTRK_PROBE_50,
                                   "Inconsistent Monitor output.\nrc=", gLastRc, false);
                }
                break;
            }
            sum += size;
            if (strlen(namesLine) > MTRK_LINE_FLUSH) {
                printLinePair(namesLine, sizesLine);
            }
            if (mtrkFindNextPool(header, remaining, &header, &data, &remaining, &poolSize) != 0) {
                break;
            }
        }
        if (rc == 0) {
            printPendingLines(namesLine, sizesLine);
            if (options->verbose) {
                rc = mtrkPrintTotal(sum);
            }
        }
    }

    if (total != nullptr) {
        *total = sum;
    }
    mtrkTraceExit(MTRK_FID_PRINT_POOL_LIST, traceFlags, rc);
    return rc;
}

int32_t mtrkPrintDatabasePool(const char* start, uint32_t length, const MtrkOptions* options,
                              const char* databaseName, int64_t* total) {
    char namesLine[MTRK_LINE_SIZE] = {};
    char sizesLine[MTRK_LINE_SIZE] = {};
    int32_t rc = 1;
    int64_t printed = 0;
    bool done = false;

    const char* section = nullptr;
    const char* sectionData = nullptr;
    uint32_t sectionRemaining = 0;
    int32_t found =
        mtrkFindNextElement(start, length, &section, &sectionData, &sectionRemaining, MON_DATABASE);
    while (found == 0 && !done) {
        uint32_t sectionLength = mtrkSectionLength(section, sectionRemaining);
        // Emptied, not cleared: the copy terminates what it writes, and
        // clearing 5000 bytes for every database of every application was
        // a large part of the application report's time.
        char name[MTRK_TEXT_SIZE];
        name[0] = '\0';
        if (mtrkGetString(MON_DATABASE_NAME, sectionData, sectionLength, name, sizeof name) != 0) {
            break;
        }
        if (strncmp(databaseName, name, sizeof name) == 0) {
            const char* pool = nullptr;
            const char* poolData = nullptr;
            uint32_t poolRemaining = 0;
            uint32_t poolSize = 0;
            int32_t more = mtrkFindNextPool(sectionData, sectionLength, &pool, &poolData,
                                            &poolRemaining, &poolSize);
            while (more == 0) {
                uint32_t poolLength = mtrkPoolLength(poolSize, poolRemaining);
                uint32_t poolId = 0;
                if (poolLength <= MON_HEADER_SIZE ||
                    mtrkGetPoolId(poolData, poolLength, &poolId) != 0) {
                    rc = inconsistentStream();
                    done = true;
                    break;
                }
                if (poolId == DATABASE_SHARED_POOL_ID) {
                    int64_t size = 0;
                    rc = mtrkPrintPoolRow(poolData, poolLength, options, false, &size, namesLine,
                                          sizesLine);
                    printed = rc == 0 ? size : 0;
                    done = true;
                    break;
                }
                more = mtrkFindNextPool(pool, poolRemaining, &pool, &poolData, &poolRemaining,
                                        &poolSize);
            }
        }
        if (!done) {
            found = mtrkFindNextElement(sectionData, sectionRemaining, &section, &sectionData,
                                        &sectionRemaining, MON_DATABASE);
        }
    }

    printPendingLines(namesLine, sizesLine);
    if (printed >= 1 && options->verbose) {
        int32_t totalRc = mtrkPrintTotal(printed);
        if (totalRc != 0 && rc == 0) {
            rc = totalRc;
        }
    }
    *total = printed;
    return rc;
}

int32_t mtrkPrintTotal(int64_t total) {
    char number[MTRK_NUMBER_SIZE];
    ossSnprintf(number, sizeof number, MTRK_I64D, total);
    char message[MTRK_TEXT_SIZE];
    int32_t rc = mtrkGetMessage(MSG_TOTAL, message, sizeof message, 1, number);
    if (rc == 0) {
        printf("%s\n\n", message);
    }
    return rc;
}
