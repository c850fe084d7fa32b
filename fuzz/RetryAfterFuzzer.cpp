// Retry-After values from servers through the reader the retry policy uses.
// Whatever the bytes, a value is refused or gives a wait between none and the
// reader's saturation, and the same value always gives the same wait.
#include <cstddef>
#include <cstdint>
#include <string>

#include "FuzzSupport.h"
#include "network/RetryAfter.h"

using fuzz::check;

namespace {

// Thu, 01 Jan 2026 00:00:00 GMT.
const long long kNow = 1767225600;
const long long kLongestWaitMs = 1000000000000ll;

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    const std::string value(reinterpret_cast<const char*>(data), size);
    long long delayMs = -1;
    if (!Network::RetryAfter::parse(value, kNow, delayMs)) {
        check(delayMs == -1, "a refused value leaves the wait alone");
        return 0;
    }
    check(delayMs >= 0 && delayMs <= kLongestWaitMs, "a wait is between none and the saturation");
    check(value.size() <= Network::RetryAfter::MAX_VALUE_LENGTH, "an over-long value is refused");
    long long again = -1;
    check(Network::RetryAfter::parse(value, kNow, again) && again == delayMs, "reading is repeatable");
    return 0;
}
