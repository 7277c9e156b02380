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

constexpr uint32_t MSG_PRIVATE_MEMORY_HEADING = 22;
constexpr uint32_t MSG_NO_PRIVATE_MEMORY = 47;

int32_t printSections(const char* stream, uint32_t streamLength, const MtrkOptions* options) {
    const char* section = nullptr;
    const char* data = nullptr;
    uint32_t remaining = 0;
    if (mtrkFindNextElement(stream, streamLength, &section, &data, &remaining,
                            MON_PRIVATE_MEMORY) != 0) {
        return mtrkPrintNotice(MSG_NO_PRIVATE_MEMORY);
    }
    do {
        uint32_t length = mtrkSectionLength(section, remaining);
        int32_t rc = mtrkPrintPrivateMemoryHeading(data, length);
        if (rc == 0) {
            rc = mtrkPrintPoolList(data, length, options, true, nullptr);
        }
        if (rc != 0) {
            return rc;
        }
    } while (
        mtrkFindNextElement(data, remaining, &section, &data, &remaining, MON_PRIVATE_MEMORY) == 0);
    return 0;
}

}  // namespace

int32_t mtrkPrintPrivateMemoryHeading(const char* start, uint32_t length) {
    return mtrkPrintNumberedHeading(MTRK_FID_PRINT_PRIVATE_MEMORY_HEADING,
                                    MON_PRIVATE_MEMORY_NUMBER, MSG_PRIVATE_MEMORY_HEADING, start,
                                    length);
}

int32_t mtrkPrivateMemoryReport(const MtrkOptions* options) {
    uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_PRIVATE_MEMORY_REPORT);
    char* snapshot = nullptr;
    uint32_t snapshotSize = 0;

    int32_t rc = mtrkGetSnapshot(&snapshot, VRX_OBJ_APPLICATION, &snapshotSize);
    if (rc == -2) {
        rc = mtrkPrintNotice(MSG_NO_PRIVATE_MEMORY);
    } else if (rc == 0) {
        rc = printSections(snapshot, mtrkStreamLength(snapshot, snapshotSize), options);
    }
    if (rc == -2) {
        rc = 0;
    }
    mtrkReleaseSnapshot(&snapshot);
    mtrkTraceExit(MTRK_FID_PRIVATE_MEMORY_REPORT, traceFlags, rc);
    return rc;
}
