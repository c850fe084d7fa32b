#pragma once

#include <string>

// Date and time as text in the layouts the servers use. Any thread.
namespace Util {

enum DateTimeFormat {
    // "HH:MM"
    DATE_TIME_HOURS_MINUTES = 0,
    // "YYYY-MM-DDTHH:MM:SSZ"
    DATE_TIME_ISO8601 = 1,
    // "DDMMYYYY:HHMMSS"
    DATE_TIME_COMPACT = 2,
};

// Epoch seconds as text, in the device's time zone when local, else in UTC. Empty when the
// seconds cannot be broken down or the format is unknown.
std::string formatDateTime(long long seconds, DateTimeFormat format, bool local);

// Text read as UTC; every field of the layout must be present. A time of day alone
// (DATE_TIME_HOURS_MINUTES) means that time, to the minute, on today's UTC date.
bool parseDateTime(const std::string& text, DateTimeFormat format, long long& seconds);

}  // namespace Util
