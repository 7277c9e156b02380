#include <cstdint>
#include <cstdio>
#include <cstring>

#include "engine/sqlca.h"
#include "engine/vrxsys.h"
#include "mtrkMessages.h"

namespace {

// Addresses below this are never valid texts; the log is told "no text".
constexpr uintptr_t MTRK_LOWEST_TEXT_ADDRESS = 4096;
// The diagnostic log's severity of the program's failure records.
constexpr uint32_t MTRK_LOG_SEVERITY = 2;
constexpr uint32_t MTRK_LOG_ITEM_COUNT = 2;

// The engine's SQL catalog and the layout of its rendered explanation.
constexpr const char* MTRK_SQL_CATALOG = "vrxsql.mo";
constexpr int16_t MTRK_EXPLANATION_SIZE = 2048;
constexpr int16_t MTRK_EXPLANATION_WIDTH = 70;
// Ends every token in the tokens field of a sqlca.
constexpr unsigned char MTRK_TOKEN_END = 0xFF;

}  // namespace

int32_t mtrkLogFailure(uint32_t functionId, uint32_t probe, const char* text, int32_t code,
                       bool storeLastRc) {
    uint64_t textLength = 0;
    if (reinterpret_cast<uintptr_t>(text) >= MTRK_LOWEST_TEXT_ADDRESS) {
        textLength = strlen(text);
    }
    int32_t loggedCode = code;
    pdLog(1, functionId, 0, probe, MTRK_LOG_SEVERITY, MTRK_LOG_ITEM_COUNT, PD_ITEM_TEXT, textLength,
          text, PD_ITEM_INT32, static_cast<uint64_t>(sizeof loggedCode), &loggedCode);
    if (storeLastRc) {
        gLastRc = loggedCode;
    }
    return -4;
}

int32_t mtrkReportLastFailure(void) {
    sqlca ca;
    memset(&ca, 0, sizeof ca);
    ca.sqlcode = SQLC_UNEXPECTED_FAILURE;

    // "%d" of a 32-bit value is at most 11 characters: the token, its end
    // marker and snprintf's terminator fit the 70-byte field.
    const int tokenLength = snprintf(ca.sqlerrmc, sizeof ca.sqlerrmc, "%d", gLastRc);
    ca.sqlerrml = static_cast<int16_t>(tokenLength);
    ca.sqlerrmc[tokenLength] = static_cast<char>(MTRK_TOKEN_END);

    char explanation[MTRK_EXPLANATION_SIZE];
    memset(explanation, 0, sizeof explanation);
    const int32_t rc = sqlaintp_api(explanation, MTRK_EXPLANATION_SIZE, MTRK_EXPLANATION_WIDTH,
                                    MTRK_SQL_CATALOG, &ca);
    if (rc < 0) {
        return mtrkLogFailure(MTRK_FID_REPORT_LAST_FAILURE, MTRK_PROBE_50,
                              "Error in call to sqlaintp.\nrc=", rc, false);
    }
    printf("%s\n", explanation);
    return 0;
}
