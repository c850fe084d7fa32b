#pragma once

#include <string>

namespace Network {

// Reads a Retry-After value: a number of seconds, or an HTTP date in any of
// its three forms ("Sun, 06 Nov 1994 08:49:37 GMT", "Sunday, 06-Nov-94
// 08:49:37 GMT", "Sun Nov  6 08:49:37 1994"). The value comes from a server:
// it is read in one bounded pass and nothing in it is trusted. Any thread.
class RetryAfter {
public:
    // Values longer than this are no Retry-After of any form.
    static const std::size_t MAX_VALUE_LENGTH = 64;

    // The wait the value asks for, in milliseconds from nowSeconds (wall
    // clock, seconds since 1970); 0 for a date already past. False, with
    // delayMs untouched, when the value is neither form.
    static bool parse(const std::string& value, long long nowSeconds, long long& delayMs);
};

}  // namespace Network
