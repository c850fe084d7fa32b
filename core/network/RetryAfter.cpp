#include "network/RetryAfter.h"

#include <KD/kdext.h>

#include <cstring>

namespace Network {

namespace {

// Longer than any wait anyone honours; keeps the arithmetic far from overflow.
const long long kMaxDelaySeconds = 1000000000ll;
const long long kMillisPerSecond = 1000;

const char* const kShortDays[] = {"Mon", "Tue", "Wed", "Thu", "Fri", "Sat", "Sun"};
const char* const kLongDays[] = {"Monday", "Tuesday",  "Wednesday", "Thursday",
                                 "Friday", "Saturday", "Sunday"};
const char* const kMonths[] = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                               "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};

bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

// A cursor over the value; every step moves forward or fails, so reading
// ends within the value's length.
class Reader {
public:
    Reader(const char* begin, const char* end) : position(begin), end(end) {}

    bool atEnd() const { return position == end; }

    bool literal(const char* text) {
        const std::size_t length = std::strlen(text);
        if (static_cast<std::size_t>(end - position) < length || std::memcmp(position, text, length) != 0) {
            return false;
        }
        position += length;
        return true;
    }

    bool number(int digits, int& value) {
        if (end - position < digits) {
            return false;
        }
        value = 0;
        for (int i = 0; i < digits; ++i) {
            if (!isDigit(position[i])) {
                return false;
            }
            value = value * 10 + (position[i] - '0');
        }
        position += digits;
        return true;
    }

    // Index of the first of the names that follows, or -1.
    int oneOf(const char* const* names, int count) {
        for (int i = 0; i < count; ++i) {
            if (literal(names[i])) {
                return i;
            }
        }
        return -1;
    }

private:
    const char* position;
    const char* end;
};

struct Date {
    int year = 0;
    int month = 0;
    int day = 0;
    int hour = 0;
    int minute = 0;
    int second = 0;
};

bool readMonth(Reader& reader, Date& date) {
    date.month = reader.oneOf(kMonths, 12);
    return date.month >= 0;
}

bool readTimeOfDay(Reader& reader, Date& date) {
    return reader.number(2, date.hour) && reader.literal(":") && reader.number(2, date.minute) &&
           reader.literal(":") && reader.number(2, date.second);
}

// "Sun, 06 Nov 1994 08:49:37 GMT"
bool readImfFixdate(Reader reader, Date& date) {
    return reader.oneOf(kShortDays, 7) >= 0 && reader.literal(", ") && reader.number(2, date.day) &&
           reader.literal(" ") && readMonth(reader, date) && reader.literal(" ") &&
           reader.number(4, date.year) && reader.literal(" ") && readTimeOfDay(reader, date) &&
           reader.literal(" GMT") && reader.atEnd();
}

// "Sunday, 06-Nov-94 08:49:37 GMT"; the century is settled by the caller.
bool readRfc850Date(Reader reader, Date& date) {
    return reader.oneOf(kLongDays, 7) >= 0 && reader.literal(", ") && reader.number(2, date.day) &&
           reader.literal("-") && readMonth(reader, date) && reader.literal("-") &&
           reader.number(2, date.year) && reader.literal(" ") && readTimeOfDay(reader, date) &&
           reader.literal(" GMT") && reader.atEnd();
}

// "Sun Nov  6 08:49:37 1994"
bool readAsctimeDate(Reader reader, Date& date) {
    if (!(reader.oneOf(kShortDays, 7) >= 0 && reader.literal(" ") && readMonth(reader, date) &&
          reader.literal(" "))) {
        return false;
    }
    const bool dayRead = reader.literal(" ") ? reader.number(1, date.day) : reader.number(2, date.day);
    return dayRead && reader.literal(" ") && readTimeOfDay(reader, date) && reader.literal(" ") &&
           reader.number(4, date.year) && reader.atEnd();
}

bool isValid(const Date& date) {
    // 60 is a leap second.
    return date.day >= 1 && date.day <= 31 && date.hour <= 23 && date.minute <= 59 && date.second <= 60;
}

long long toEpochSeconds(const Date& date) {
    KDTm tm = {};
    tm.tm_year = date.year - 1900;
    tm.tm_mon = date.month;
    tm.tm_mday = date.day;
    tm.tm_hour = date.hour;
    tm.tm_min = date.minute;
    tm.tm_sec = date.second;
    return kdMkTimeZVR(&tm);
}

// A two-digit year more than 50 years ahead is the same year of the century
// before.
int fullYear(int twoDigits, long long nowSeconds) {
    const KDtime now = nowSeconds;
    KDTm tm = {};
    const int currentYear = kdGmtime_r(&now, &tm) != nullptr ? tm.tm_year + 1900 : 1970;
    int year = currentYear - currentYear % 100 + twoDigits;
    if (year > currentYear + 50) {
        year -= 100;
    }
    return year;
}

bool parseSeconds(const char* begin, const char* end, long long& seconds) {
    if (begin == end) {
        return false;
    }
    seconds = 0;
    for (const char* c = begin; c != end; ++c) {
        if (!isDigit(*c)) {
            return false;
        }
        seconds = seconds * 10 + (*c - '0');
        if (seconds > kMaxDelaySeconds) {
            seconds = kMaxDelaySeconds;
        }
    }
    return true;
}

bool parseDate(const char* begin, const char* end, long long nowSeconds, long long& seconds) {
    Date date;
    if (readRfc850Date(Reader(begin, end), date)) {
        date.year = fullYear(date.year, nowSeconds);
    } else if (!readImfFixdate(Reader(begin, end), date) && !readAsctimeDate(Reader(begin, end), date)) {
        return false;
    }
    if (!isValid(date)) {
        return false;
    }
    const long long wait = toEpochSeconds(date) - nowSeconds;
    seconds = wait < 0 ? 0 : (wait > kMaxDelaySeconds ? kMaxDelaySeconds : wait);
    return true;
}

}  // namespace

bool RetryAfter::parse(const std::string& value, long long nowSeconds, long long& delayMs) {
    if (value.size() > MAX_VALUE_LENGTH) {
        return false;
    }
    const char* begin = value.data();
    const char* end = begin + value.size();
    while (begin != end && (*begin == ' ' || *begin == '\t')) {
        ++begin;
    }
    while (end != begin && (end[-1] == ' ' || end[-1] == '\t')) {
        --end;
    }
    long long seconds = 0;
    if (!parseSeconds(begin, end, seconds) && !parseDate(begin, end, nowSeconds, seconds)) {
        return false;
    }
    delayMs = seconds * kMillisPerSecond;
    return true;
}

}  // namespace Network
