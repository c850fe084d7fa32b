#include <stdlib.h>

#include "support/PalTest.h"
#include "util/DateTime.h"

using namespace Util;

namespace {

// 2023-11-14 22:13:20 UTC
const long long kInstant = 1700000000;
// The virtual clock's wall time at start: 2026-01-01 00:00:00 UTC.
const long long kVirtualStart = 1767225600;

class DateTimeTest : public PalTest {};

}  // namespace

TEST_F(DateTimeTest, FormatsEachLayoutInUtcAndTheFullOnesRoundTrip) {
    EXPECT_EQ("22:13", formatDateTime(kInstant, DATE_TIME_HOURS_MINUTES, false));
    EXPECT_EQ("2023-11-14T22:13:20Z", formatDateTime(kInstant, DATE_TIME_ISO8601, false));
    EXPECT_EQ("14112023:221320", formatDateTime(kInstant, DATE_TIME_COMPACT, false));
    EXPECT_EQ("1970-01-01T00:00:00Z", formatDateTime(0, DATE_TIME_ISO8601, false));

    const long long instants[] = {0, kInstant, -86401, 951782400 /* 2000-02-29 */, 4102444799LL};
    for (long long instant : instants) {
        for (DateTimeFormat format : {DATE_TIME_ISO8601, DATE_TIME_COMPACT}) {
            long long parsed = -1;
            ASSERT_TRUE(parseDateTime(formatDateTime(instant, format, false), format, parsed));
            EXPECT_EQ(instant, parsed) << formatDateTime(instant, format, false);
        }
    }
}

TEST_F(DateTimeTest, TimeOfDayIsTakenOnTodaysUtcDateToTheMinute) {
    long long parsed = 0;
    ASSERT_TRUE(parseDateTime("13:45", DATE_TIME_HOURS_MINUTES, parsed));
    EXPECT_EQ(kVirtualStart + 13 * 3600 + 45 * 60, parsed);

    advance((30ull * 3600 + 30 * 60 + 17) * 1000000000ull);
    ASSERT_TRUE(parseDateTime("06:07", DATE_TIME_HOURS_MINUTES, parsed));
    EXPECT_EQ(kVirtualStart + 86400 + 6 * 3600 + 7 * 60, parsed);
    EXPECT_EQ("06:07", formatDateTime(parsed, DATE_TIME_HOURS_MINUTES, false));
}

TEST_F(DateTimeTest, LocalFormattingUsesTheDeviceTimeZone) {
    const char* saved = getenv("TZ");
    const std::string savedZone = saved ? saved : "";
    setenv("TZ", "XYZ-2", 1);
    const std::string local = formatDateTime(kInstant, DATE_TIME_ISO8601, true);
    if (saved) {
        setenv("TZ", savedZone.c_str(), 1);
    } else {
        unsetenv("TZ");
    }
    EXPECT_EQ("2023-11-15T00:13:20Z", local);
}

TEST_F(DateTimeTest, IncompleteTextOrAnUnknownFormatIsRefusedAndLeavesTheResult) {
    long long parsed = 42;
    EXPECT_FALSE(parseDateTime("2023-11-14T22:13Z", DATE_TIME_ISO8601, parsed));
    EXPECT_FALSE(parseDateTime("14112023:2213", DATE_TIME_COMPACT, parsed));
    EXPECT_FALSE(parseDateTime("12:", DATE_TIME_HOURS_MINUTES, parsed));
    EXPECT_FALSE(parseDateTime("", DATE_TIME_ISO8601, parsed));
    EXPECT_FALSE(parseDateTime("12:00", static_cast<DateTimeFormat>(7), parsed));
    expectAssertion("false");
    EXPECT_EQ(42, parsed);
    EXPECT_EQ("", formatDateTime(kInstant, static_cast<DateTimeFormat>(7), false));
    expectAssertion("false");
}
