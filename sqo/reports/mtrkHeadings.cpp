#include <cstdio>

#include "engine/vrxosse.h"
#include "messages/mtrkFunctionIds.h"
#include "messages/mtrkMessages.h"
#include "messages/mtrkTrace.h"
#include "monitor/mtrkStream.h"
#include "reports/mtrkReports.h"

int32_t mtrkPrintNotice(uint32_t messageNumber) {
    char message[MTRK_TEXT_SIZE];
    int32_t rc = mtrkGetMessage(messageNumber, message, sizeof message, 0);
    if (rc == 0) {
        printf("%s\n\n", message);
    }
    return rc;
}

int32_t mtrkPrintHeading(uint32_t messageNumber, const char* text) {
    // Cleared whole by the fetch before the message service writes into it.
    char message[MTRK_TEXT_SIZE];
    uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_PRINT_HEADING);
    int32_t rc = mtrkGetMessage(messageNumber, message, sizeof message, 1, text);
    if (rc == 0) {
        printf("%s\n\n", message);
    }
    mtrkTraceExit(MTRK_FID_PRINT_HEADING, traceFlags, rc);
    return rc;
}

int32_t mtrkPrintNumberedHeading(uint32_t functionId, uint16_t numberElement,
                                 uint32_t messageNumber, const char* start, uint32_t length) {
    // Cleared whole by the fetch before the message service writes into it.
    char message[MTRK_TEXT_SIZE];
    char number[MTRK_NUMBER_SIZE] = {};
    uint32_t traceFlags = mtrkTraceEntry(functionId);
    uint32_t sectionNumber = 0;
    int32_t rc = mtrkGetU32(numberElement, start, length, &sectionNumber);
    if (rc == 0) {
        ossSnprintf(number, sizeof number, "%u", sectionNumber);
        rc = mtrkGetMessage(messageNumber, message, sizeof message, 1, number);
        if (rc == 0) {
            printf("%s\n\n", message);
        }
    }
    mtrkTraceExit(functionId, traceFlags, rc);
    return rc;
}
