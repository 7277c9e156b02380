#include <cstdio>

#include "engine/vrxsys.h"
#include "messages/mtrkMessages.h"
#include "mtrkOptions.h"

namespace {

struct MtrkLegendEntry {
    const char* shortName;
    const char* description;
};

// The pools of every instance, as the pool columns label them.
const MtrkLegendEntry gStandardPoolLegend[] = {
    {"agsh", "Application Group Shared Heap"},
    {"appctlh", "Application Control Heap"},
    {"apph", "Application Heap"},
    {"appshrh", "Applications Shared Heap"},
    {"bph", "Buffer Pool Heap"},
    {"catcacheh", "Catalog Cache Heap"},
    {"dbh", "Database Heap"},
    {"dlfmh", "DFM Heap"},
    {"fcmbp", "FCMBP Heap"},
    {"ip", "Import Pool"},
    {"lockh", "Lock Manager Heap"},
    {"monh", "Database Monitor Heap"},
    {"other", "Other Memory"},
    {"pckcacheh", "Package Cache"},
    {"queryh", "Query Heap"},
    {"shsorth", "Shared Sort Heap"},
    {"sorth", "Sort Heap"},
    {"stath", "Statistics Heap"},
    {"stmth", "Statement Heap"},
    {"utilh", "Backup/Restore/Util Heap"},
};

// The pools that the engine shows only while they are exposed (-all).
const MtrkLegendEntry gInternalPoolLegend[] = {
    {"agenth", "Agent (DDS) Heap"},
    {"apmh", "APM Heap"},
    {"apsh", "APS Heap"},
    {"bsuh", "BSU Heap"},
    {"comh", "Communication (DDS) Heap"},
    {"ctxh", "Common Client Context Heap"},
    {"dbagentsh", "Database agents shared heap"},
    {"debug", "Debug Heap"},
    {"desadv", "Design Advisor Work Heap"},
    {"mvh", "Mergevault Heap"},
    {"dri", "Drop Index Heap"},
    {"eduah", "EDU Anchor Heap"},
    {"fcm", "FCM Pool"},
    {"fcmbp", "FCM Resource Heap"},
    {"fcmchan", "FCM Channel Heap"},
    {"fcmctl", "FCMCTL Heap"},
    {"fcmsess", "FCM Session Heap"},
    {"kerh", "Kernel(BSU) Heap"},
    {"krcbh", "Kernel Control Block Heap"},
    {"mbosh", "MBOS Heap"},
    {"oledb", "OLEDB Heap"},
    {"optprofparse", "OptProf XML Parse"},
    {"ostrack", "OSS OS Resource Tracking"},
    {"persist", "Persistent Private Heap"},
    {"private", "Private Heap"},
    {"resynch", "Re-Sync Heap"},
    {"simcath", "Simulation Catalog Heap"},
    {"sqlch", "SQL Compiler Heap"},
    {"toolsmh", "ADT Monitor Heap"},
    {"undefh", "Undefined Heap"},
    {"userdatah", "User Data Private Heap"},
    {"xmlcacheh", "XML Cache Heap"},
    {"xmlparserh", "XML Parser Init Heap"},
};

// Two columns, the left one taking the first half rounded up; the last
// line of an odd count holds the left entry alone, with no padding after it.
void mtrkPrintLegend(const MtrkLegendEntry* entries, uint32_t entryCount) {
    const uint32_t rows = (entryCount + 1) / 2;
    for (uint32_t row = 0; row < rows; ++row) {
        const MtrkLegendEntry& left = entries[row];
        const uint32_t rightIndex = row + rows;
        if (rightIndex < entryCount) {
            const MtrkLegendEntry& right = entries[rightIndex];
            printf("   %-9s - %-32s%-9s - %s\n", left.shortName, left.description, right.shortName,
                   right.description);
        } else {
            printf("   %-9s - %s\n", left.shortName, left.description);
        }
    }
    printf("\n\n");
}

// Fetches a message without inserts and prints it with `wrapping`; the
// fetch's status.
int32_t mtrkPrintHelpMessage(uint32_t number, const char* wrapping) {
    char message[MTRK_TEXT_SIZE];
    const int32_t status = mtrkGetMessage(number, message, sizeof message, 0);
    if (status == 0) {
        printf(wrapping, message);
    }
    return status;
}

}  // namespace

int32_t mtrkPrintHelp(const MtrkOptions* options) {
    // Asking the engine is pointless when this run exposes the pools itself.
    const bool extended = options->allPools == 1 || sqloShouldInternalPoolsBeExposed() != 0;

    int32_t status = mtrkPrintHelpMessage(42, "%s\n");
    if (status == 0) {
        status = mtrkPrintHelpMessage(85, "%s\n");
    }
    if (status == 0 && extended) {
        status = mtrkPrintHelpMessage(81, "%s\n\n");
    }
    if (status != 0) {
        return status;
    }
    mtrkPrintLegend(gStandardPoolLegend,
                    sizeof gStandardPoolLegend / sizeof gStandardPoolLegend[0]);
    if (!extended) {
        return 0;
    }
    status = mtrkPrintHelpMessage(82, "%s\n\n");
    if (status != 0) {
        return status;
    }
    mtrkPrintLegend(gInternalPoolLegend,
                    sizeof gInternalPoolLegend / sizeof gInternalPoolLegend[0]);
    return 0;
}
