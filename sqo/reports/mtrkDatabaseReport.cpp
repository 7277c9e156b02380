#include "engine/vrxapp.h"
#include "messages/mtrkFunctionIds.h"
#include "messages/mtrkMessages.h"
#include "messages/mtrkTrace.h"
#include "monitor/mtrkSnapshot.h"
#include "monitor/mtrkStream.h"
#include "reports/mtrkPoolList.h"
#include "reports/mtrkRegion.h"
#include "reports/mtrkReports.h"

namespace {

constexpr uint32_t MSG_DATABASE_HEADING = 21;
constexpr uint32_t MSG_NO_DATABASES = 46;

// Prints every database section of the stream; 1 when one has no name.
int32_t printDatabases(const char* stream, uint32_t streamLength, const MtrkOptions* options) {
    const char* section = nullptr;
    const char* data = nullptr;
    uint32_t remaining = 0;
    if (mtrkFindNextElement(stream, streamLength, &section, &data, &remaining, MON_DATABASE) != 0) {
        return mtrkPrintNotice(MSG_NO_DATABASES);
    }
    do {
        uint32_t length = mtrkSectionLength(section, remaining);
        // Cleared for every section, so that a short name never carries the
        // tail of a longer one before it.
        char name[MTRK_TEXT_SIZE] = {};
        if (mtrkGetString(MON_DATABASE_NAME, data, length, name, sizeof name) != 0) {
            return 1;
        }
        int32_t rc = mtrkPrintHeading(MSG_DATABASE_HEADING, name);
        if (rc == 0) {
            rc = mtrkPrintPoolList(data, length, options, true, nullptr);
        }
        if (rc != 0) {
            return rc;
        }
    } while (mtrkFindNextElement(data, remaining, &section, &data, &remaining, MON_DATABASE) == 0);
    return 0;
}

}  // namespace

int32_t mtrkDatabaseReport(const MtrkOptions* options) {
    uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_DATABASE_REPORT);
    char* snapshot = nullptr;
    uint32_t snapshotSize = 0;

    int32_t rc = mtrkGetSnapshot(&snapshot, VRX_OBJ_DATABASE, &snapshotSize);
    if (rc == -2) {
        rc = mtrkPrintNotice(MSG_NO_DATABASES);
    } else if (rc == 0) {
        rc = printDatabases(snapshot, mtrkStreamLength(snapshot, snapshotSize), options);
    }
    if (rc == -2) {
        rc = 0;
    }
    mtrkReleaseSnapshot(&snapshot);
    mtrkTraceExit(MTRK_FID_DATABASE_REPORT, traceFlags, rc);
    return rc;
}
