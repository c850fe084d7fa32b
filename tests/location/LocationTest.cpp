#include <gtest/gtest.h>

#include <limits>

#include "location/Location.h"
#include "math/CoordConversion.h"

namespace {

using Location::RawLocation;

TEST(LocationTest, WorldPartFollowsRawPartAndMissingValuesStayMissing) {
    Location::Location missing(RawLocation::unknown);
    missing.latitude = 48.2f;
    missing.longitude = 16.37f;
    missing.initFromRaw();
    EXPECT_EQ(-1, missing.speedXY);
    EXPECT_EQ(-1, missing.accuracyXY);
    EXPECT_EQ(-1.0f, missing.bearingXY);

    Location::Location unknown(RawLocation::unknown);
    unknown.initFromRaw();
    int x = 0;
    int y = 0;
    CoordConversion::toXY(0.0f, 0.0f, x, y);
    EXPECT_EQ(x, unknown.x);
    EXPECT_EQ(y, unknown.y);

    Location::Location fix(RawLocation::unknown);
    fix.latitude = 60.17f;
    fix.longitude = 24.94f;
    fix.speed = 13.0f;
    fix.bearing = 271.5f;
    fix.accuracy = 8.0f;
    fix.altitude = 12.0f;
    fix.initFromRaw();
    // At 60 degrees a metre is about twice as many world units as at the equator.
    EXPECT_NEAR(53.586594f * 13.0f / kdCosf(60.17f * 0.017453292f), fix.speedXY, 1.0f);
    EXPECT_EQ(271.5f, fix.bearingXY);

    fix.updateRaw();
    EXPECT_NEAR(60.17f, fix.latitude, 2e-5f);
    EXPECT_NEAR(24.94f, fix.longitude, 2e-5f);
    EXPECT_NEAR(13.0f, fix.speed, 0.01f);
    EXPECT_NEAR(8.0f, fix.accuracy, 0.01f);
    EXPECT_EQ(271.5f, fix.bearing);
    EXPECT_EQ(-1.0f, fix.altitude);
}

struct SanitizeCase {
    const char* name;
    float latitude, longitude, speed, bearing, accuracy, altitude;
    int precision;
    bool usable;
    float speedAfter, bearingAfter, altitudeAfter;
};

const float kNaN = std::numeric_limits<float>::quiet_NaN();
const float kInf = std::numeric_limits<float>::infinity();

TEST(LocationTest, SanitizeRejectsUnusablePositionsAndClearsImpossibleOptionalValues) {
    const SanitizeCase cases[] = {
        {"plain", 52.0f, 13.0f, 3.0f, 90.0f, 5.0f, 30.0f, 2, true, 3.0f, 90.0f, 30.0f},
        {"missing optionals", 52.0f, 13.0f, -1.0f, -1.0f, 5.0f, -1.0f, 1, true, -1.0f, -1.0f, -1.0f},
        {"nan latitude", kNaN, 13.0f, 3.0f, 90.0f, 5.0f, 30.0f, 2, false, 3.0f, 90.0f, 30.0f},
        {"infinite longitude", 52.0f, kInf, 3.0f, 90.0f, 5.0f, 30.0f, 2, false, 3.0f, 90.0f, 30.0f},
        {"latitude beyond the pole", 90.5f, 13.0f, 3.0f, 90.0f, 5.0f, 30.0f, 2, false, 3.0f, 90.0f, 30.0f},
        {"longitude beyond 180", 52.0f, -180.1f, 3.0f, 90.0f, 5.0f, 30.0f, 2, false, 3.0f, 90.0f, 30.0f},
        {"negative accuracy", 52.0f, 13.0f, 3.0f, 90.0f, -1.0f, 30.0f, 2, false, 3.0f, 90.0f, 30.0f},
        {"nan accuracy", 52.0f, 13.0f, 3.0f, 90.0f, kNaN, 30.0f, 2, false, 3.0f, 90.0f, 30.0f},
        {"precision none", 52.0f, 13.0f, 3.0f, 90.0f, 5.0f, 30.0f, 0, false, 3.0f, 90.0f, 30.0f},
        {"precision unknown", 52.0f, 13.0f, 3.0f, 90.0f, 5.0f, 30.0f, 7, false, 3.0f, 90.0f, 30.0f},
        {"nan optionals", 52.0f, 13.0f, kNaN, kNaN, 5.0f, kNaN, 2, true, -1.0f, -1.0f, -1.0f},
        {"negative speed", 52.0f, 13.0f, -4.0f, 90.0f, 5.0f, 30.0f, 2, true, -1.0f, 90.0f, 30.0f},
        {"absurd speed", 52.0f, 13.0f, 1e9f, 90.0f, 5.0f, 30.0f, 2, true, -1.0f, 90.0f, 30.0f},
        {"bearing 360", 52.0f, 13.0f, 3.0f, 360.0f, 5.0f, 30.0f, 2, true, 3.0f, 0.0f, 30.0f},
        {"bearing beyond 360", 52.0f, 13.0f, 3.0f, 400.0f, 5.0f, 30.0f, 2, true, 3.0f, -1.0f, 30.0f},
        {"infinite altitude", 52.0f, 13.0f, 3.0f, 90.0f, 5.0f, -kInf, 2, true, 3.0f, 90.0f, -1.0f},
    };
    for (const SanitizeCase& c : cases) {
        RawLocation raw = {c.latitude,
                           c.longitude,
                           c.speed,
                           c.bearing,
                           c.accuracy,
                           c.altitude,
                           static_cast<Location::LocationPrecision>(c.precision),
                           0,
                           0};
        EXPECT_EQ(c.usable, raw.sanitize()) << c.name;
        EXPECT_EQ(c.speedAfter, raw.speed) << c.name;
        EXPECT_EQ(c.bearingAfter, raw.bearing) << c.name;
        EXPECT_EQ(c.altitudeAfter, raw.altitude) << c.name;
    }
}

}  // namespace
