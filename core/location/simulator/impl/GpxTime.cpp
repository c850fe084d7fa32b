#include "location/simulator/impl/GpxTime.h"

#include <cstdio>

namespace Simulator {
namespace GpxTime {

namespace {

const KDint64 kMsPerDay = 86400000;

// Days since 1970-01-01 of a proleptic Gregorian date (Howard Hinnant's
// days_from_civil), exact for every year a 64-bit count can hold.
KDint64 daysFromCivil(KDint64 year, int month, int day) {
    year -= month <= 2 ? 1 : 0;
    const KDint64 era = (year >= 0 ? year : year - 399) / 400;
    const KDint64 yearOfEra = year - era * 400;
    const KDint64 dayOfYear = (153 * (month + (month > 2 ? -3 : 9)) + 2) / 5 + day - 1;
    const KDint64 dayOfEra = yearOfEra * 365 + yearOfEra / 4 - yearOfEra / 100 + dayOfYear;
    return era * 146097 + dayOfEra - 719468;
}

void civilFromDays(KDint64 days, KDint64& year, int& month, int& day) {
    days += 719468;
    const KDint64 era = (days >= 0 ? days : days - 146096) / 146097;
    const KDint64 dayOfEra = days - era * 146097;
    const KDint64 yearOfEra = (dayOfEra - dayOfEra / 1460 + dayOfEra / 36524 - dayOfEra / 146096) / 365;
    const KDint64 dayOfYear = dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);
    const KDint64 monthIndex = (5 * dayOfYear + 2) / 153;
    day = static_cast<int>(dayOfYear - (153 * monthIndex + 2) / 5 + 1);
    month = static_cast<int>(monthIndex < 10 ? monthIndex + 3 : monthIndex - 9);
    year = yearOfEra + era * 400 + (month <= 2 ? 1 : 0);
}

// Reads exactly `count` digits at text[pos].
bool readDigits(const std::string& text, size_t& pos, int count, int& value) {
    value = 0;
    for (int i = 0; i < count; ++i, ++pos) {
        if (pos >= text.size() || text[pos] < '0' || text[pos] > '9') {
            return false;
        }
        value = value * 10 + (text[pos] - '0');
    }
    return true;
}

bool expect(const std::string& text, size_t& pos, char c) {
    if (pos < text.size() && text[pos] == c) {
        ++pos;
        return true;
    }
    return false;
}

// ".250" -> 250 ms; digits beyond the millisecond are read and dropped.
bool readFraction(const std::string& text, size_t& pos, int& milliseconds) {
    milliseconds = 0;
    if (!expect(text, pos, '.')) {
        return true;
    }
    int digits = 0;
    while (pos < text.size() && text[pos] >= '0' && text[pos] <= '9') {
        if (digits < 3) {
            milliseconds = milliseconds * 10 + (text[pos] - '0');
        }
        ++digits;
        ++pos;
    }
    for (int i = digits; i < 3; ++i) {
        milliseconds *= 10;
    }
    return digits > 0;
}

bool readOffset(const std::string& text, size_t& pos, int& offsetMinutes) {
    offsetMinutes = 0;
    if (expect(text, pos, 'Z')) {
        return true;
    }
    int sign = 0;
    if (expect(text, pos, '+')) {
        sign = 1;
    } else if (expect(text, pos, '-')) {
        sign = -1;
    } else {
        // No offset: xsd:dateTime leaves the zone open; GPX means UTC.
        return true;
    }
    int hours = 0;
    int minutes = 0;
    if (!readDigits(text, pos, 2, hours) || !expect(text, pos, ':') || !readDigits(text, pos, 2, minutes) ||
        hours > 14 || minutes > 59) {
        return false;
    }
    offsetMinutes = sign * (hours * 60 + minutes);
    return true;
}

bool isLeapYear(int year) {
    return (year % 4 == 0 && year % 100 != 0) || year % 400 == 0;
}

int daysInMonth(int year, int month) {
    static const int kDays[] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
    return month == 2 && isLeapYear(year) ? 29 : kDays[month - 1];
}

}  // namespace

bool parse(const std::string& text, KDint64& millisecondsSinceEpoch) {
    size_t pos = 0;
    int year = 0, month = 0, day = 0, hour = 0, minute = 0, second = 0, milliseconds = 0, offsetMinutes = 0;
    const bool wellFormed =
        readDigits(text, pos, 4, year) && expect(text, pos, '-') && readDigits(text, pos, 2, month) &&
        expect(text, pos, '-') && readDigits(text, pos, 2, day) && expect(text, pos, 'T') &&
        readDigits(text, pos, 2, hour) && expect(text, pos, ':') && readDigits(text, pos, 2, minute) &&
        expect(text, pos, ':') && readDigits(text, pos, 2, second) && readFraction(text, pos, milliseconds) &&
        readOffset(text, pos, offsetMinutes) && pos == text.size();
    if (!wellFormed || month < 1 || month > 12 || day < 1 || day > daysInMonth(year, month) || hour > 23 ||
        minute > 59 || second > 60) {
        return false;
    }
    const KDint64 seconds = daysFromCivil(year, month, day) * 86400 + hour * 3600 + minute * 60 + second -
                            static_cast<KDint64>(offsetMinutes) * 60;
    millisecondsSinceEpoch = seconds * 1000 + milliseconds;
    return true;
}

std::string format(KDint64 millisecondsSinceEpoch) {
    KDint64 days = millisecondsSinceEpoch / kMsPerDay;
    KDint64 msOfDay = millisecondsSinceEpoch % kMsPerDay;
    if (msOfDay < 0) {
        msOfDay += kMsPerDay;
        --days;
    }
    KDint64 year = 0;
    int month = 0;
    int day = 0;
    civilFromDays(days, year, month, day);
    char text[64];
    std::snprintf(text, sizeof(text), "%04lld-%02d-%02dT%02d:%02d:%02d.%03dZ", static_cast<long long>(year),
                  month, day, static_cast<int>(msOfDay / 3600000), static_cast<int>(msOfDay / 60000 % 60),
                  static_cast<int>(msOfDay / 1000 % 60), static_cast<int>(msOfDay % 1000));
    return text;
}

}  // namespace GpxTime
}  // namespace Simulator
