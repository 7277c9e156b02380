#include "engine/vrxapp.h"
#include "messages/mtrkFunctionIds.h"
#include "messages/mtrkTrace.h"
#include "monitor/mtrkSnapshot.h"
#include "monitor/mtrkStream.h"
#include "reports/mtrkPoolList.h"
#include "reports/mtrkReports.h"

namespace {
constexpr uint32_t MSG_INSTANCE_HEADING = 23;
}

int32_t mtrkInstanceReport(const MtrkOptions* options) {
    uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_INSTANCE_REPORT);
    char* snapshot = nullptr;
    uint32_t snapshotSize = 0;

    int32_t rc = mtrkGetSnapshot(&snapshot, VRX_OBJ_INSTANCE, &snapshotSize);
    if (rc == 0) {
        rc = mtrkPrintNotice(MSG_INSTANCE_HEADING);
    }
    if (rc == 0) {
        rc = mtrkPrintPoolList(snapshot, mtrkStreamLength(snapshot, snapshotSize), options, true,
                               nullptr);
    }
    if (rc == 0) {
        mtrkTraceExit(MTRK_FID_INSTANCE_REPORT, traceFlags, rc);
    } else if (rc == -2) {
        // Nothing to report is not a failure, but it leaves the report by the
        // failure path, which the engine's trace shows without an exit.
        rc = 0;
    }
    mtrkReleaseSnapshot(&snapshot);
    return rc;
}
