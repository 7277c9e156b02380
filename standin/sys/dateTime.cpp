#include <ctime>

#include "common/export.h"
#include "common/instance.h"
#include "engine/vrxsys.h"

namespace {

constexpr int32_t kDateTimeBadArgument = static_cast<int32_t>(0x870F0040);

// Days since 1970-01-01 of a civil date (proleptic Gregorian calendar).
int64_t daysFromCivil(int64_t year, unsigned month, unsigned day) {
    year -= month <= 2;
    int64_t era = (year >= 0 ? year : year - 399) / 400;
    auto yearOfEra = static_cast<unsigned>(year - era * 400);
    unsigned dayOfYear = (153 * (month > 2 ? month - 3 : month + 9) + 2) / 5 + day - 1;
    unsigned dayOfEra = yearOfEra * 365 + yearOfEra / 4 - yearOfEra / 100 + dayOfYear;
    return era * 146097 + static_cast<int64_t>(dayOfEra) - 719468;
}

uint16_t weekdayOf(int64_t year, unsigned month, unsigned day) {
    // 1970-01-01 was a Thursday (4, counting Sunday as 0).
    int64_t weekday = (daysFromCivil(year, month, day) + 4) % 7;
    return static_cast<uint16_t>(weekday < 0 ? weekday + 7 : weekday);
}

}  // namespace

extern "C" VRX_EXPORT int32_t sqlogetdatetime(SqloDateTime* dateTime) {
    if (dateTime == nullptr)
        return kDateTimeBadArgument;
    const standin::Instance& instance = standin::currentInstance();
    if (instance.faults.getDateTime && *instance.faults.getDateTime != 0) {
        return *instance.faults.getDateTime;
    }
    SqloDateTime result{};
    if (instance.clock) {
        const standin::Clock& c = *instance.clock;
        result = SqloDateTime{c.year,   c.month, weekdayOf(c.year, c.month, c.day),
                              c.day,    c.hour,  c.minute,
                              c.second, 0};
    } else {
        timespec now{};
        clock_gettime(CLOCK_REALTIME, &now);
        std::tm local{};
        localtime_r(&now.tv_sec, &local);
        result.year = static_cast<uint16_t>(local.tm_year + 1900);
        result.month = static_cast<uint16_t>(local.tm_mon + 1);
        result.weekday = static_cast<uint16_t>(local.tm_wday);
        result.day = static_cast<uint16_t>(local.tm_mday);
        result.hour = static_cast<uint16_t>(local.tm_hour);
        result.minute = static_cast<uint16_t>(local.tm_min);
        result.second = static_cast<uint16_t>(local.tm_sec > 59 ? 59 : local.tm_sec);
        result.hundredths = static_cast<uint16_t>(now.tv_nsec / 10000000);
    }
    *dateTime = result;
    return 0;
}
