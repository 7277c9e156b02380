// The engine's SQL communication area: the status output of the client calls
// and the carrier of the SQL code and tokens that the message renderer reads.
#pragma once

#include <cstddef>
#include <cstdint>

extern "C" {

struct sqlca {
    char sqlcaid[8];
    int32_t sqlcabc;
    int32_t sqlcode;    // byte offset 12
    int16_t sqlerrml;   // byte offset 16: length of the tokens in sqlerrmc
    char sqlerrmc[70];  // byte offset 18: tokens, each followed by 0xFF
    char sqlerrp[8];
    int32_t sqlerrd[6];
    char sqlwarn[11];
    char sqlstate[5];
};

}  // extern "C"

static_assert(sizeof(sqlca) == 136, "the SQL communication area is 136 bytes");
static_assert(offsetof(sqlca, sqlcode) == 12);
static_assert(offsetof(sqlca, sqlerrml) == 16);
static_assert(offsetof(sqlca, sqlerrmc) == 18);

// SQL codes that the monitor answers with.
constexpr int32_t SQLC_BUFFER_TOO_SMALL = 1606;
constexpr int32_t SQLC_NOTHING_TO_REPORT = 1611;
constexpr int32_t SQLC_INSTANCE_STOPPED = -1032;
constexpr int32_t SQLC_NOT_AUTHORIZED = -1092;
constexpr int32_t SQLC_UNEXPECTED_FAILURE = -6103;
