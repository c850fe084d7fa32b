#include "util/DateTime.h"

#include <KD/kdext.h>

#include <cstdio>

namespace Util {

namespace {

const char kHoursMinutes[] = "%02d:%02d";
const char kIso8601[] = "%04d-%02d-%02dT%02d:%02d:%02dZ";
const char kCompact[] = "%02d%02d%04d:%02d%02d%02d";

}  // namespace

std::string formatDateTime(long long seconds, DateTimeFormat format, bool local) {
    const KDtime time = seconds;
    KDTm tm = {};
    if (!(local ? kdLocaltime_r(&time, &tm) : kdGmtime_r(&time, &tm))) {
        return std::string();
    }
    char text[32];
    switch (format) {
        case DATE_TIME_HOURS_MINUTES:
            kdSprintf_s(text, sizeof(text), kHoursMinutes, tm.tm_hour, tm.tm_min);
            break;
        case DATE_TIME_ISO8601:
            kdSprintf_s(text, sizeof(text), kIso8601, tm.tm_year + 1900, tm.tm_mon + 1, tm.tm_mday,
                        tm.tm_hour, tm.tm_min, tm.tm_sec);
            break;
        case DATE_TIME_COMPACT:
            kdSprintf_s(text, sizeof(text), kCompact, tm.tm_mday, tm.tm_mon + 1, tm.tm_year + 1900,
                        tm.tm_hour, tm.tm_min, tm.tm_sec);
            break;
        default:
            KD_ASSERT(false);
            return std::string();
    }
    return text;
}

bool parseDateTime(const std::string& text, DateTimeFormat format, long long& seconds) {
    KDTm tm = {};
    int year = 0;
    int month = 0;
    switch (format) {
        case DATE_TIME_HOURS_MINUTES: {
            const KDtime now = kdTime(nullptr);
            if (!kdGmtime_r(&now, &tm) ||
                std::sscanf(text.c_str(), kHoursMinutes, &tm.tm_hour, &tm.tm_min) != 2) {
                return false;
            }
            tm.tm_sec = 0;
            break;
        }
        case DATE_TIME_ISO8601:
            if (std::sscanf(text.c_str(), kIso8601, &year, &month, &tm.tm_mday, &tm.tm_hour, &tm.tm_min,
                            &tm.tm_sec) != 6) {
                return false;
            }
            tm.tm_year = year - 1900;
            tm.tm_mon = month - 1;
            break;
        case DATE_TIME_COMPACT:
            if (std::sscanf(text.c_str(), kCompact, &tm.tm_mday, &month, &year, &tm.tm_hour, &tm.tm_min,
                            &tm.tm_sec) != 6) {
                return false;
            }
            tm.tm_year = year - 1900;
            tm.tm_mon = month - 1;
            break;
        default:
            KD_ASSERT(false);
            return false;
    }
    seconds = kdMkTimeZVR(&tm);
    return true;
}

}  // namespace Util
