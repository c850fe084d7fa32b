// Retry-After values as servers send them. The dates were written by
// Python's email.utils.formatdate and time.asctime, not by our own code.
#include <gtest/gtest.h>

#include <string>

#include "network/RetryAfter.h"

using Network::RetryAfter;

namespace {

// Sun, 06 Nov 1994 08:49:37 GMT.
const long long kNov1994 = 784111777;
// Tue, 01 Jan 2030 00:00:00 GMT.
const long long kJan2030 = 1893456000;
// The virtual clock's wall time: Thu, 01 Jan 2026 00:00:00 GMT.
const long long kJan2026 = 1767225600;

long long delayOf(const std::string& value, long long now = kJan2026) {
    long long delayMs = -7;
    EXPECT_TRUE(RetryAfter::parse(value, now, delayMs)) << value;
    return delayMs;
}

}  // namespace

TEST(RetryAfterTest, SecondsAreReadAsSecondsAndSaturateInsteadOfOverflowing) {
    EXPECT_EQ(120000, delayOf("120"));
    EXPECT_EQ(0, delayOf("0"));
    EXPECT_EQ(7000, delayOf(" \t7 "));
    EXPECT_EQ(1000000000000ll, delayOf("99999999999999999999999999"));
}

TEST(RetryAfterTest, TheThreeDateFormsGiveTheTimeUntilThatDateAndZeroForAPastOne) {
    const long long oneHourBefore = kNov1994 - 3600;
    EXPECT_EQ(3600000, delayOf("Sun, 06 Nov 1994 08:49:37 GMT", oneHourBefore));
    EXPECT_EQ(3600000, delayOf("Sun Nov  6 08:49:37 1994", oneHourBefore));
    EXPECT_EQ(3600000, delayOf("Sunday, 06-Nov-94 08:49:37 GMT", oneHourBefore));
    EXPECT_EQ(0, delayOf("Sun, 06 Nov 1994 08:49:37 GMT", kJan2026));

    // A two-digit year within 50 years ahead is in this century.
    EXPECT_EQ((kJan2030 - kJan2026) * 1000, delayOf("Tuesday, 01-Jan-30 00:00:00 GMT"));
    EXPECT_EQ((kJan2030 - kJan2026) * 1000, delayOf("Tue Jan  1 00:00:00 2030"));
    // A leap second is a valid time.
    EXPECT_EQ(1000, delayOf("Sat, 31 Dec 2016 23:59:60 GMT", 1483228799));
}

TEST(RetryAfterTest, AnythingElseIsRefusedAndLeavesTheDelayAlone) {
    const std::string refused[] = {
        "",
        "   ",
        "-5",
        "+5",
        "1.5",
        "5s",
        "0x10",
        std::string("12\0"
                    "3",
                    4),
        "Sun, 06 Nov 1994 08:49:37 UTC",
        "Sun, 06 Nov 1994 08:49:37",
        "Sun, 06 Nov 94 08:49:37 GMT",
        "Sun, 32 Nov 1994 08:49:37 GMT",
        "Sun, 00 Nov 1994 08:49:37 GMT",
        "Sun, 06 Nov 1994 24:00:00 GMT",
        "Sun, 06 Nov 1994 08:60:00 GMT",
        "Sun, 06 Foo 1994 08:49:37 GMT",
        "sun, 06 nov 1994 08:49:37 gmt",
        "Sunday, 06 Nov 1994 08:49:37 GMT",
        "Sun Nov 6 08:49:37 1994",
        "Sun Nov  6 08:49:37 1994 GMT",
        std::string(RetryAfter::MAX_VALUE_LENGTH + 1, '1'),
    };
    for (const std::string& value : refused) {
        long long delayMs = -7;
        EXPECT_FALSE(RetryAfter::parse(value, kJan2026, delayMs)) << value;
        EXPECT_EQ(-7, delayMs) << value;
    }
}
