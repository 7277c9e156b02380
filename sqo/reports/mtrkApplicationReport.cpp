#include "engine/vrxapp.h"
#include "messages/mtrkFunctionIds.h"
#include "messages/mtrkMessages.h"
#include "messages/mtrkTrace.h"
#include "monitor/mtrkSnapshot.h"
#include "monitor/mtrkStream.h"
#include "mtrkOptions.h"
#include "reports/mtrkPoolList.h"
#include "reports/mtrkRegion.h"
#include "reports/mtrkReports.h"

namespace {

constexpr uint32_t MSG_APPLICATION_DATABASE_HEADING = 25;
constexpr uint32_t MSG_APPLICATION_HEADING = 26;
constexpr uint32_t MSG_NO_APPLICATIONS = 49;

// One walk over the application sections, grouped by database.
struct ApplicationWalk {
    const MtrkOptions* options;
    // The database snapshot; a length of 0 when it could not be taken.
    const char* databaseStream;
    uint32_t databaseLength;
    // The database of the latest application, and whether it has just
    // changed (its heading still to come).
    char heldName[MTRK_TEXT_SIZE];
    uint8_t changed;
    // Sizes printed since the database last changed.
    int64_t groupTotal;
};

int32_t printGroupTotal(ApplicationWalk* walk) {
    return walk->options->verbose ? mtrkPrintTotal(walk->groupTotal) : 0;
}

// The heading of a new group and the database's own pool for it.
int32_t openGroup(ApplicationWalk* walk) {
    int32_t rc = mtrkPrintHeading(MSG_APPLICATION_DATABASE_HEADING, walk->heldName);
    if (rc != 0) {
        return rc;
    }
    walk->changed = 0;
    if (walk->databaseLength != 0) {
        // A database that the database snapshot does not show only goes
        // without its pool; the applications are still worth printing.
        int64_t poolSize = 0;
        mtrkPrintDatabasePool(walk->databaseStream, walk->databaseLength, walk->options,
                              walk->heldName, &poolSize);
        walk->groupTotal += poolSize;
    }
    return 0;
}

int32_t printApplications(const char* stream, uint32_t streamLength, ApplicationWalk* walk) {
    const char* section = nullptr;
    const char* data = nullptr;
    uint32_t remaining = 0;
    if (mtrkFindNextElement(stream, streamLength, &section, &data, &remaining, MON_APPLICATION) !=
        0) {
        return mtrkPrintNotice(MSG_NO_APPLICATIONS);
    }
    uint32_t length = mtrkSectionLength(section, remaining);
    if (mtrkRefreshName(data, length, walk->heldName, sizeof walk->heldName, &walk->changed) != 0) {
        return 1;
    }
    for (;;) {
        int32_t rc = 0;
        if (walk->changed) {
            rc = openGroup(walk);
            if (rc != 0) {
                return rc;
            }
        }
        rc = mtrkPrintApplicationHeading(data, length);
        if (rc != 0) {
            return rc;
        }
        int64_t sectionTotal = 0;
        rc = mtrkPrintPoolList(data, length, walk->options, false, &sectionTotal);
        if (rc != 0) {
            return rc;
        }
        walk->groupTotal += sectionTotal;

        if (mtrkFindNextElement(data, remaining, &section, &data, &remaining, MON_APPLICATION) !=
            0) {
            return printGroupTotal(walk);
        }
        length = mtrkSectionLength(section, remaining);
        if (mtrkRefreshName(data, length, walk->heldName, sizeof walk->heldName, &walk->changed) !=
            0) {
            return 1;
        }
        if (walk->changed) {
            rc = printGroupTotal(walk);
            if (rc != 0) {
                return rc;
            }
            walk->groupTotal = 0;
        }
    }
}

}  // namespace

int32_t mtrkPrintApplicationHeading(const char* start, uint32_t length) {
    return mtrkPrintNumberedHeading(MTRK_FID_PRINT_APPLICATION_HEADING, MON_APPLICATION_NUMBER,
                                    MSG_APPLICATION_HEADING, start, length);
}

int32_t mtrkApplicationReport(const MtrkOptions* options) {
    ApplicationWalk walk = {};
    walk.options = options;
    walk.changed = 1;
    uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_APPLICATION_REPORT);

    char* applications = nullptr;
    uint32_t applicationsSize = 0;
    char* databases = nullptr;
    uint32_t databasesSize = 0;

    int32_t rc = mtrkGetSnapshot(&applications, VRX_OBJ_APPLICATION, &applicationsSize);
    if (rc == -2) {
        rc = mtrkPrintNotice(MSG_NO_APPLICATIONS);
    } else if (rc == 0) {
        // Whatever stops the database snapshot has been printed or recorded
        // by the snapshot step; the report goes on without the pools it
        // would have shown.
        if (mtrkGetSnapshot(&databases, VRX_OBJ_DATABASE, &databasesSize) == 0) {
            walk.databaseStream = databases;
            walk.databaseLength = mtrkStreamLength(databases, databasesSize);
        }
        rc = printApplications(applications, mtrkStreamLength(applications, applicationsSize),
                               &walk);
    }
    if (rc == -2) {
        rc = 0;
    }
    mtrkReleaseSnapshot(&applications);
    mtrkReleaseSnapshot(&databases);
    mtrkTraceExit(MTRK_FID_APPLICATION_REPORT, traceFlags, rc);
    return rc;
}
