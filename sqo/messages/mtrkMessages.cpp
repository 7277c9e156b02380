#include "mtrkMessages.h"

#include <cstdarg>
#include <cstring>

#include "engine/vrxsys.h"

int32_t gLastRc = 0;

namespace {

// The catalog of the program's own messages.
constexpr const char* MTRK_CATALOG = "vrxmtrk.mo";
// The source-file name that the engine's memory tracker records for our blocks.
constexpr const char* MTRK_SOURCE_FILE = "sqlomtrk";

}  // namespace

int32_t mtrkGetMessage(uint32_t number, char* buffer, uint32_t bufferSize, int64_t insertCount,
                       ...) {
    int32_t status = 0;
    uint64_t* lengths = nullptr;
    const char** inserts = nullptr;
    // The message service reads at least one entry of each table, so a
    // message without inserts still gets one-entry tables.
    const uint64_t entries = insertCount > 0 ? static_cast<uint64_t>(insertCount) : 1;

    int32_t rc = sqlogmblkEx(0, entries * sizeof(uint64_t), 0, reinterpret_cast<void**>(&lengths),
                             MTRK_SOURCE_FILE, __LINE__, 0);
    // A block that did not come is a failed allocation, whatever the answer.
    if (rc != 0 || lengths == nullptr) {
        lengths = nullptr;
        status = mtrkLogFailure(MTRK_FID_GET_MESSAGE, MTRK_PROBE_50,
                                "Error in call to sqlogmblk.\nrc=", rc, true);
    }
    if (status == 0) {
        rc = sqlogmblkEx(0, entries * sizeof(const char*), 0, reinterpret_cast<void**>(&inserts),
                         MTRK_SOURCE_FILE, __LINE__, 0);
        if (rc != 0 || inserts == nullptr) {
            inserts = nullptr;
            status = mtrkLogFailure(MTRK_FID_GET_MESSAGE, MTRK_PROBE_100,
                                    "Error in call to sqlogmblk.\nrc=", rc, true);
        }
    }

    if (status == 0 && lengths != nullptr && inserts != nullptr) {
        if (insertCount <= 0) {
            lengths[0] = 0;
            inserts[0] = nullptr;
        } else {
            va_list args;
            va_start(args, insertCount);
            for (int64_t i = 0; i < insertCount; ++i) {
                const char* insert = va_arg(args, const char*);
                inserts[i] = insert;
                lengths[i] = strlen(insert);
            }
            va_end(args);
        }

        // A shorter message must not leave the tail of an earlier one behind.
        memset(buffer, 0, bufferSize);

        uint32_t unused = 0;
        rc = sqlogmsg(MTRK_CATALOG, number, lengths, inserts, buffer, bufferSize, &unused, 0,
                      nullptr, nullptr);
        // A positive answer is the length of the text: success.
        if (rc < 0) {
            status = mtrkLogFailure(MTRK_FID_GET_MESSAGE, MTRK_PROBE_150,
                                    "Error in call to sqlogmsg.\nrc=", rc, true);
        }
    }

    if (lengths != nullptr) {
        sqlofmblkEx(MTRK_SOURCE_FILE, __LINE__, lengths);
    }
    if (inserts != nullptr) {
        sqlofmblkEx(MTRK_SOURCE_FILE, __LINE__, inserts);
    }
    return status;
}
