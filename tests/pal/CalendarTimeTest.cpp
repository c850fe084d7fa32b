// Calendar conversions of the platform: broken-down time and back.
#include <KD/kdext.h>
#include <gtest/gtest.h>
#include <stdlib.h>

#include <ctime>
#include <string>

namespace {

KDTm utc(int year, int month, int day, int hour = 0, int minute = 0, int second = 0) {
    KDTm tm{};
    tm.tm_year = year - 1900;
    tm.tm_mon = month - 1;
    tm.tm_mday = day;
    tm.tm_hour = hour;
    tm.tm_min = minute;
    tm.tm_sec = second;
    return tm;
}

// The host's timegm, as an independent reference.
KDint64 hostTimegm(const KDTm& tm) {
    std::tm host{};
    host.tm_year = tm.tm_year;
    host.tm_mon = tm.tm_mon;
    host.tm_mday = tm.tm_mday;
    host.tm_hour = tm.tm_hour;
    host.tm_min = tm.tm_min;
    host.tm_sec = tm.tm_sec;
    return timegm(&host);
}

TEST(CalendarTimeTest, BrokenDownFieldsOfALeapDay) {
    const KDtime seconds = 1709210096;  // 2024-02-29 12:34:56 UTC, a Thursday
    KDTm tm;
    ASSERT_EQ(kdGmtime_r(&seconds, &tm), &tm);
    EXPECT_EQ(tm.tm_year, 124);
    EXPECT_EQ(tm.tm_mon, 1);
    EXPECT_EQ(tm.tm_mday, 29);
    EXPECT_EQ(tm.tm_hour, 12);
    EXPECT_EQ(tm.tm_min, 34);
    EXPECT_EQ(tm.tm_sec, 56);
    EXPECT_EQ(tm.tm_wday, 4);
    EXPECT_EQ(tm.tm_yday, 59);
}

TEST(CalendarTimeTest, MkTimeRoundTripsWithGmtime) {
    // A step that is not a whole number of days walks through every time of
    // day and, over 300 years, through every kind of leap rule.
    const KDtime step = 86400 * 7 + 3601 * 3 + 17;
    for (KDtime seconds = -2208988800LL * 2; seconds < 4102444800LL * 2; seconds += step) {
        KDTm tm;
        ASSERT_NE(kdGmtime_r(&seconds, &tm), nullptr);
        ASSERT_EQ(kdMkTimeZVR(&tm), seconds) << "year " << tm.tm_year + 1900 << " day " << tm.tm_yday;
    }
}

TEST(CalendarTimeTest, MkTimeAgreesWithTimegmOnEdgeDatesAndOutOfRangeFields) {
    const KDTm cases[] = {
        utc(1970, 1, 1),
        utc(1969, 12, 31, 23, 59, 59),
        utc(2000, 3, 1),  // century leap year
        utc(1900, 3, 1),  // 1900 and 2100 are not leap years
        utc(2100, 3, 1),
        utc(2040, 1, 1),  // past 2038
        utc(2023, 13, 1),
        utc(2023, 0, 1),
        utc(2024, -11, 15),
        utc(2024, 3, 0),
        utc(2024, 3, -30),
        utc(2023, 12, 32),
        utc(2024, 2, 30),
        utc(2024, 1, 1, 48),
        utc(2024, 1, 1, 0, -90),
        utc(2024, 6, 30, 23, 59, 60),
        utc(1969, 1, 1, -1),
        utc(1900, 1, 1, 0, 0, -1),
        utc(2000, 25, 400, 30, 70, 3700),
    };
    for (const KDTm& tm : cases) {
        SCOPED_TRACE(testing::Message() << tm.tm_year << "/" << tm.tm_mon << "/" << tm.tm_mday << " "
                                        << tm.tm_hour << ":" << tm.tm_min << ":" << tm.tm_sec);
        EXPECT_EQ(kdMkTimeZVR(&tm), hostTimegm(tm));
    }
}

TEST(CalendarTimeTest, LocalTimeFollowsTheProcessTimeZone) {
    struct RestoreTimeZone {
        ~RestoreTimeZone() {
            if (had) {
                setenv("TZ", value.c_str(), 1);
            } else {
                unsetenv("TZ");
            }
            tzset();
        }
        const bool had = getenv("TZ") != nullptr;
        const std::string value = had ? getenv("TZ") : "";
    } restore;
    const KDtime seconds = 0;
    KDTm tm;
    setenv("TZ", "ABC-3", 1);
    ASSERT_NE(kdLocaltime_r(&seconds, &tm), nullptr);
    EXPECT_EQ(tm.tm_hour, 3);
    EXPECT_EQ(tm.tm_year, 70);
    setenv("TZ", "ABC+5", 1);
    ASSERT_NE(kdLocaltime_r(&seconds, &tm), nullptr);
    EXPECT_EQ(tm.tm_hour, 19);
    EXPECT_EQ(tm.tm_mday, 31);
    EXPECT_EQ(tm.tm_year, 69);
}

}  // namespace
