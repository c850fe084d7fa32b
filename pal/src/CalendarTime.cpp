// Calendar conversions of the platform: epoch seconds to broken-down time in
// UTC or the process's time zone, and broken-down UTC time back to seconds.
// Wall-clock time itself (kdTime) comes from the clock core.
#include <KD/kdext.h>

#include <ctime>

namespace {

const KDint64 kSecondsPerDay = 86400;

KDint64 floorDiv(KDint64 value, KDint64 divisor) {
    const KDint64 quotient = value / divisor;
    return (value % divisor != 0 && value < 0) ? quotient - 1 : quotient;
}

// Days from 1970-01-01 to the given proleptic Gregorian date (month 1-12).
// Counted in 400-year eras, which repeat exactly, so that any year works
// without a table and without the host's time_t limits.
KDint64 daysFromCivil(KDint64 year, KDint64 month, KDint64 day) {
    year -= month <= 2 ? 1 : 0;
    const KDint64 era = floorDiv(year, 400);
    const KDint64 yearOfEra = year - era * 400;
    const KDint64 dayOfYear = (153 * (month > 2 ? month - 3 : month + 9) + 2) / 5 + day - 1;
    const KDint64 dayOfEra = yearOfEra * 365 + yearOfEra / 4 - yearOfEra / 100 + dayOfYear;
    return era * 146097 + dayOfEra - 719468;
}

KDTm* fromHost(const std::tm& host, KDTm* result) {
    result->tm_sec = host.tm_sec;
    result->tm_min = host.tm_min;
    result->tm_hour = host.tm_hour;
    result->tm_mday = host.tm_mday;
    result->tm_mon = host.tm_mon;
    result->tm_year = host.tm_year;
    result->tm_wday = host.tm_wday;
    result->tm_yday = host.tm_yday;
    return result;
}

}  // namespace

KDTm* kdGmtime_r(const KDtime* timep, KDTm* result) {
    if (timep == nullptr || result == nullptr) {
        kdSetError(KD_EINVAL);
        return nullptr;
    }
    const std::time_t seconds = static_cast<std::time_t>(*timep);
    std::tm host;
    if (gmtime_r(&seconds, &host) == nullptr) {
        kdSetError(KD_EINVAL);
        return nullptr;
    }
    return fromHost(host, result);
}

KDTm* kdLocaltime_r(const KDtime* timep, KDTm* result) {
    if (timep == nullptr || result == nullptr) {
        kdSetError(KD_EINVAL);
        return nullptr;
    }
    // localtime_r need not look at TZ again; tzset makes a changed zone count.
    tzset();
    const std::time_t seconds = static_cast<std::time_t>(*timep);
    std::tm host;
    if (localtime_r(&seconds, &host) == nullptr) {
        kdSetError(KD_EINVAL);
        return nullptr;
    }
    return fromHost(host, result);
}

// Like timegm: fields out of their usual range carry into the next larger
// ones (second 60 is the next minute, month 12 the next January, day 0 the
// last day of the month before); tm_wday and tm_yday are ignored.
KDint64 kdMkTimeZVR(const KDTm* tm) {
    if (tm == nullptr) {
        kdSetError(KD_EINVAL);
        return -1;
    }
    const KDint64 monthsSince1900 = static_cast<KDint64>(tm->tm_year) * 12 + tm->tm_mon;
    const KDint64 year = 1900 + floorDiv(monthsSince1900, 12);
    const KDint64 month = monthsSince1900 - floorDiv(monthsSince1900, 12) * 12 + 1;
    const KDint64 days = daysFromCivil(year, month, 1) + tm->tm_mday - 1;
    return days * kSecondsPerDay + static_cast<KDint64>(tm->tm_hour) * 3600 +
           static_cast<KDint64>(tm->tm_min) * 60 + tm->tm_sec;
}
